// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <string>

#include "core/KSDate.h"
#include "core/KSError.h"

namespace keepsakes {

/// What a record of the now-playing stream says of its item. A play is the time from a record of
/// state `playing` to the item's next record of state `paused`, `stopped` or `replaced`.
enum class PlaybackState : std::int64_t {
    playing = 1,   ///< The item begins to play, also after a pause.
    paused = 2,    ///< It is paused.
    stopped = 3,   ///< It is stopped, or its player went away.
    replaced = 4,  ///< It gives way to another item, or begins again from its start.
    jumped = 5,    ///< It goes on playing from another position.
};

/// One record of the now-playing stream: what a media player did with an item. A plain value.
struct NowPlayingRecord {
    std::int64_t duration = 0;  ///< The item's length in whole seconds.
    std::optional<std::string> title;
    std::optional<std::string> album;
    std::optional<std::string> artist;
    std::optional<std::string> genre;
    std::optional<std::string> mediaType;
    std::optional<std::string> bundleID;                ///< The playing application.
    std::optional<std::string> storeProductIdentifier;  ///< The item's, in a public catalogue.
    PlaybackState playbackState = PlaybackState::playing;
    KSDate absoluteTimestamp;

    friend bool operator==(const NowPlayingRecord&, const NowPlayingRecord&) = default;
};

/// The media stream store's now-playing stream: what the owner's media players played. Any thread
/// may call it.
class NowPlayingStream {
  public:
    using EachRecord = std::function<void(const NowPlayingRecord&)>;

    virtual ~NowPlayingStream() = default;

    /// Calls `each` for the records from `start` to the stream's end, in the order of their
    /// arrival, then `completion` with no error; after a failure, `completion` with the error. Both
    /// are called on the calling thread before this returns.
    virtual void read(KSDate start, const EachRecord& each,
                      const std::function<void(OptionalError)>& completion) = 0;
};

}  // namespace keepsakes
