// SPDX-License-Identifier: Apache-2.0
#include "sources/KSMediaPlay.h"

#include <fmt/format.h>

#include <array>
#include <functional>
#include <utility>

#include "core/KSAssertion.h"
#include "model/Description.h"
#include "sources/ArchiveErrors.h"

namespace keepsakes {

namespace {

// Keys of a now-playing record within the archive.
constexpr std::string_view kDuration = "duration";
constexpr std::string_view kPlaybackState = "playbackState";
constexpr std::string_view kAbsoluteTimestamp = "absoluteTimestamp";

struct RecordText {
    std::string_view key;
    std::optional<std::string> NowPlayingRecord::*member;
};
constexpr auto kRecordTexts = std::to_array<RecordText>({
    {"title", &NowPlayingRecord::title},
    {"album", &NowPlayingRecord::album},
    {"artist", &NowPlayingRecord::artist},
    {"genre", &NowPlayingRecord::genre},
    {"mediaType", &NowPlayingRecord::mediaType},
    {"bundleID", &NowPlayingRecord::bundleID},
    {"storeProductIdentifier", &NowPlayingRecord::storeProductIdentifier},
});

struct PlayText {
    std::string_view key;
    std::optional<std::string> KSMediaPlay::*member;
};
constexpr auto kPlayTexts = std::to_array<PlayText>({
    {"title", &KSMediaPlay::title},
    {"album", &KSMediaPlay::album},
    {"bundleId", &KSMediaPlay::bundleId},
    {"genre", &KSMediaPlay::genre},
    {"mediaType", &KSMediaPlay::mediaType},
    {"artist", &KSMediaPlay::artist},
});

std::unexpected<KSError> playError(std::string_view key, std::string_view expected,
                                   const KSValue& decoded) {
    return std::unexpected(
        unexpectedClass(KSMediaPlayOCNTErrorDomain, "KSMediaPlay", key, expected, decoded));
}

void encodeRecord(const NowPlayingRecord& record, KeyedEncoder& encoder) {
    encoder.writeUnsigned(kDuration, static_cast<std::uint64_t>(record.duration));
    for (const auto& [key, member] : kRecordTexts) coding::write(encoder, key, record.*member);
    encoder.writeUnsigned(kPlaybackState, static_cast<std::uint64_t>(record.playbackState));
    encoder.writeDate(kAbsoluteTimestamp, record.absoluteTimestamp);
}

std::optional<KSDate> dateOf(const KSValue& value) {
    if (const auto date = value.asDate()) return date;
    const auto seconds = value.asNumber();
    return seconds ? std::optional(KSDate{*seconds}) : std::nullopt;
}

std::optional<NowPlayingRecord> decodedRecord(const KSValue& value) {
    const auto* fields = value.asDictionary();
    if (!fields) return std::nullopt;
    const auto duration = valueForKey(*fields, kDuration).asInteger();
    const auto state = valueForKey(*fields, kPlaybackState).asInteger();
    const auto timestamp = dateOf(valueForKey(*fields, kAbsoluteTimestamp));
    if (!duration || !state || !timestamp) return std::nullopt;
    NowPlayingRecord record;
    record.duration = *duration;
    record.playbackState = static_cast<PlaybackState>(*state);
    record.absoluteTimestamp = *timestamp;
    for (const auto& [key, member] : kRecordTexts) {
        const auto& text = valueForKey(*fields, key);
        if (text.isNull()) continue;
        if (!text.asString()) return std::nullopt;
        record.*member = *text.asString();
    }
    return record;
}

std::expected<KSMediaPlay, KSError> decodedPlay(const KSDictionary& archive) {
    KSMediaPlay play;
    for (const auto& [key, member] : kPlayTexts) {
        const auto& value = valueForKey(archive, key);
        if (value.isNull()) continue;
        if (!value.asString()) return playError(key, "String", value);
        play.*member = *value.asString();
    }
    if (const auto& product = valueForKey(archive, "productId"); !product.isNull()) {
        if (!product.asString() && !product.asNumber()) {
            return playError("productId", "String or Number", product);
        }
        play.productId = product;
    }
    if (const auto& sum = valueForKey(archive, "sumTimePlayed"); !sum.isNull()) {
        if (!sum.asNumber()) {
            return playError("sumTimePlayed", "Number", sum);
        }
        play.sumTimePlayed = sum.asNumber();
    }
    const auto repetitions = valueForKey(archive, "repetitions").asInteger();
    if (!repetitions) {
        return std::unexpected(KSError::make(
            KSMediaPlayOCNTErrorDomain, 1, "Missing serialized value for KSMediaPlay.repetitions"));
    }
    play.repetitions = *repetitions;
    const auto& events = valueForKey(archive, "events");
    if (events.isNull()) {
        return std::unexpected(
            KSError::make(KSMediaPlayOCNTErrorDomain, 2,
                          "Retrieved nil serialized value for nonnull KSMediaPlay.events"));
    }
    if (!events.asArray()) {
        return playError("events", "Array of now-playing records", events);
    }
    for (const auto& item : *events.asArray()) {
        auto record = decodedRecord(item);
        if (!record) {
            return playError("events", "now-playing record", item);
        }
        play.events.push_back(std::move(*record));
    }
    return play;
}

template <class T>
std::size_t hashOf(const std::optional<T>& value) {
    return value ? std::hash<T>{}(*value) : 0;
}

std::size_t hashOf(const std::optional<KSValue>& product) {
    return product ? std::hash<std::string>{}(product->description()) : 0;
}

std::size_t hashOf(const std::vector<NowPlayingRecord>& events) { return events.size(); }

std::string describeProduct(const std::optional<KSValue>& product) {
    if (!product) return describe(std::optional<std::string>());
    return product->asString() ? *product->asString() : product->description();
}

std::string describeRecord(const NowPlayingRecord& record) {
    return fmt::format("<{} state {} at {}>", describe(record.title),
                       static_cast<std::int64_t>(record.playbackState),
                       formatISO8601(record.absoluteTimestamp));
}

template <class Value>
KSMediaPlay::Pointer replacing(const KSMediaPlay& play, Value KSMediaPlay::*member, Value value) {
    auto copy = std::make_shared<KSMediaPlay>(play);
    (*copy).*member = std::move(value);
    return copy;
}

bool assertEvents(const KSMediaPlay::Records& events, int line) {
    return assertParameter(events.has_value(), "events != nil", "KSMediaPlay", line);
}

}  // namespace

KSMediaPlay::Pointer KSMediaPlay::initWithTitle(Text title, Text album, Text bundleId,
                                                std::optional<KSValue> productId, Text genre,
                                                Text mediaType, Text artist,
                                                std::optional<double> sumTimePlayed,
                                                std::int64_t repetitions, Records events) {
    if (!assertEvents(events, __LINE__)) return nullptr;
    return std::make_shared<const KSMediaPlay>(
        KSMediaPlay{std::move(title), std::move(album), std::move(bundleId), std::move(productId),
                    std::move(genre), std::move(mediaType), std::move(artist), sumTimePlayed,
                    repetitions, std::move(*events)});
}

KSMediaPlay::Pointer KSMediaPlay::mediaPlayWithTitle(Text title, Text album, Text bundleId,
                                                     std::optional<KSValue> productId, Text genre,
                                                     Text mediaType, Text artist,
                                                     std::optional<double> sumTimePlayed,
                                                     std::int64_t repetitions, Records events) {
    return initWithTitle(std::move(title), std::move(album), std::move(bundleId),
                         std::move(productId), std::move(genre), std::move(mediaType),
                         std::move(artist), sumTimePlayed, repetitions, std::move(events));
}

KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementTitle(Text value) const {
    return replacing(*this, &KSMediaPlay::title, std::move(value));
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementAlbum(Text value) const {
    return replacing(*this, &KSMediaPlay::album, std::move(value));
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementBundleId(Text value) const {
    return replacing(*this, &KSMediaPlay::bundleId, std::move(value));
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementProductId(std::optional<KSValue> value) const {
    return replacing(*this, &KSMediaPlay::productId, std::move(value));
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementGenre(Text value) const {
    return replacing(*this, &KSMediaPlay::genre, std::move(value));
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementMediaType(Text value) const {
    return replacing(*this, &KSMediaPlay::mediaType, std::move(value));
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementArtist(Text value) const {
    return replacing(*this, &KSMediaPlay::artist, std::move(value));
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementSumTimePlayed(
    std::optional<double> value) const {
    return replacing(*this, &KSMediaPlay::sumTimePlayed, value);
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementRepetitions(std::int64_t value) const {
    return replacing(*this, &KSMediaPlay::repetitions, value);
}
KSMediaPlay::Pointer KSMediaPlay::copyWithReplacementEvents(Records value) const {
    if (!assertEvents(value, __LINE__)) return nullptr;
    return replacing(*this, &KSMediaPlay::events, std::move(*value));
}

std::size_t KSMediaPlay::hash() const {
    constexpr std::size_t kMultiplier = 31;
    std::size_t folded = 0;
    for (const auto part : {hashOf(title), hashOf(album), hashOf(bundleId), hashOf(productId),
                            hashOf(genre), hashOf(mediaType), hashOf(artist), hashOf(sumTimePlayed),
                            std::hash<std::int64_t>{}(repetitions), hashOf(events)}) {
        folded = folded * kMultiplier + part;
    }
    return folded;
}

std::string KSMediaPlay::description() const {
    std::vector<std::string> records;
    records.reserve(events.size());
    for (const auto& record : events) records.push_back(describeRecord(record));
    return fmt::format(
        "<KSMediaPlay | title:{} album:{} bundleId:{} productId:{} genre:{} mediaType:{} "
        "artist:{} sumTimePlayed:{} repetitions:{} events:{}>",
        describe(title), describe(album), describe(bundleId), describeProduct(productId),
        describe(genre), describe(mediaType), describe(artist), describe(sumTimePlayed),
        repetitions, describe(records));
}

void KSMediaPlay::encodeWithCoder(KeyedEncoder& encoder) const {
    for (const auto& [key, member] : kPlayTexts) coding::write(encoder, key, this->*member);
    if (productId && productId->asString()) {
        encoder.writeString("productId", *productId->asString());
    } else if (productId && productId->asNumber()) {
        encoder.writeNumber("productId", *productId->asNumber());
    }
    coding::write(encoder, "sumTimePlayed", sumTimePlayed);
    encoder.writeUnsigned("repetitions", static_cast<std::uint64_t>(repetitions));
    encoder.writeRecords("events", events.size(), [this](std::size_t index, KeyedEncoder& nested) {
        encodeRecord(events[index], nested);
    });
}

std::expected<KSMediaPlay::Pointer, KSError> KSMediaPlay::initWithCoder(KeyedDecoder& decoder) {
    KSDictionary archive;
    if (!decoder.readDictionary(archive)) {
        return std::unexpected(KSError::make(KSMediaPlayOCNTErrorDomain, 3, decoder.error()));
    }
    auto play = decodedPlay(archive);
    if (!play) {
        decoder.fail(play.error().description());
        return std::unexpected(std::move(play.error()));
    }
    return std::make_shared<const KSMediaPlay>(std::move(*play));
}

}  // namespace keepsakes
