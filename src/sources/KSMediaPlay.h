// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <expected>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "model/KeyedCoding.h"
#include "platform/MediaStream.h"

namespace keepsakes {

inline constexpr std::string_view KSMediaPlayOCNTErrorDomain = "KSMediaPlayOCNTErrorDomain";

/// A media item that was played again and again or at length, with the records that tell so. Built
/// once, then shared and not changed.
struct KSMediaPlay {
    std::optional<std::string> title;
    std::optional<std::string> album;
    std::optional<std::string> bundleId;
    std::optional<KSValue> productId;  ///< A string or a number, as the record gives it.
    std::optional<std::string> genre;
    std::optional<std::string> mediaType;
    std::optional<std::string> artist;
    std::optional<double> sumTimePlayed;  ///< Seconds.
    std::int64_t repetitions = 0;
    std::vector<NowPlayingRecord> events;

    using Pointer = std::shared_ptr<const KSMediaPlay>;
    using Text = std::optional<std::string>;
    using Records = std::optional<std::vector<NowPlayingRecord>>;

    /// Missing records fail the assertion and yield nothing.
    static Pointer initWithTitle(Text title, Text album, Text bundleId,
                                 std::optional<KSValue> productId, Text genre, Text mediaType,
                                 Text artist, std::optional<double> sumTimePlayed,
                                 std::int64_t repetitions, Records events);
    /// As `initWithTitle`.
    static Pointer mediaPlayWithTitle(Text title, Text album, Text bundleId,
                                      std::optional<KSValue> productId, Text genre, Text mediaType,
                                      Text artist, std::optional<double> sumTimePlayed,
                                      std::int64_t repetitions, Records events);

    // A new value with one field replaced.
    Pointer copyWithReplacementTitle(Text value) const;
    Pointer copyWithReplacementAlbum(Text value) const;
    Pointer copyWithReplacementBundleId(Text value) const;
    Pointer copyWithReplacementProductId(std::optional<KSValue> value) const;
    Pointer copyWithReplacementGenre(Text value) const;
    Pointer copyWithReplacementMediaType(Text value) const;
    Pointer copyWithReplacementArtist(Text value) const;
    Pointer copyWithReplacementSumTimePlayed(std::optional<double> value) const;
    Pointer copyWithReplacementRepetitions(std::int64_t value) const;
    /// Missing records fail the assertion and yield nothing.
    Pointer copyWithReplacementEvents(Records value) const;

    bool isEqualToMediaPlay(const KSMediaPlay& other) const { return *this == other; }
    bool isEqual(const Pointer& other) const {
        return other && (other.get() == this || isEqualToMediaPlay(*other));
    }
    std::size_t hash() const;
    std::string description() const;

    void encodeWithCoder(KeyedEncoder& encoder) const;
    /// An archive that is not of a media play is an error of `KSMediaPlayOCNTErrorDomain`, which
    /// the decoder is given up with: 1 "repetitions" is missing, 2 "events" is missing, 3 a value
    /// is of the wrong class.
    static std::expected<Pointer, KSError> initWithCoder(KeyedDecoder& decoder);

    friend bool operator==(const KSMediaPlay&, const KSMediaPlay&) = default;
};

}  // namespace keepsakes
