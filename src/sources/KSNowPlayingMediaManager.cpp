// SPDX-License-Identifier: Apache-2.0
#include "sources/KSNowPlayingMediaManager.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <iterator>
#include <utility>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "model/KSExtensions.h"
#include "platform/PlatformServices.h"
#include "sources/Lifetimes.h"
#include "store/KSEventStore.h"

namespace keepsakes {

namespace {

constexpr std::int64_t kShortestItemSeconds = 31;
constexpr double kRepetitionAboveSeconds = 30;
constexpr double kRepetitionBelowSeconds = 86400;
constexpr std::int64_t kFewestRepetitions = 3;
constexpr double kLeisureSeconds = 60;

bool endsPlay(PlaybackState state) {
    return state == PlaybackState::paused || state == PlaybackState::stopped ||
           state == PlaybackState::replaced;
}

/// What the records of one title add up to.
struct PlayTally {
    double sumTimePlayed = 0;
    std::int64_t repetitions = 0;
    const NowPlayingRecord* last = nullptr;  ///< The last record that counts.
};

PlayTally tallyOf(const std::vector<NowPlayingRecord>& records) {
    PlayTally tally;
    for (const auto& record : records) {
        if (record.playbackState == PlaybackState::jumped) continue;
        const auto* previous = std::exchange(tally.last, &record);
        if (!previous || previous->playbackState != PlaybackState::playing ||
            !endsPlay(record.playbackState)) {
            continue;
        }
        const double span = record.absoluteTimestamp - previous->absoluteTimestamp;
        tally.sumTimePlayed += span;
        if (span > kRepetitionAboveSeconds && span < kRepetitionBelowSeconds) ++tally.repetitions;
    }
    return tally;
}

std::optional<std::string> textOf(const std::optional<KSValue>& product) {
    if (!product) return std::nullopt;
    return product->asString() ? *product->asString() : product->description();
}

KSEventPointer rehydratedEvent(const KSEvent& event, const KSMediaPlay& play) {
    auto copy = event.copy();
    copy->mediaTitle = play.title;
    copy->mediaAlbum = play.album;
    copy->mediaPlayerBundleId = play.bundleId;
    copy->mediaProductId = textOf(play.productId);
    copy->mediaGenre = play.genre;
    copy->mediaType = play.mediaType;
    copy->mediaArtist = play.artist;
    copy->mediaRepetitions = static_cast<double>(play.repetitions);
    copy->mediaSumTimePlayed = play.sumTimePlayed;
    return copy;
}

}  // namespace

KSNowPlayingMediaManager::KSNowPlayingMediaManager(NowPlayingStream& stream, Clock& clock,
                                                   std::shared_ptr<KSEventStore> keepsakeStore)
    : stream_(stream),
      clock_(clock),
      keepsakeStore_(std::move(keepsakeStore)),
      leisureMediaBundleIdSet_(kLeisureMediaBundleId.begin(), kLeisureMediaBundleId.end()),
      queue_("KSNowPlayingMediaManager") {}

std::shared_ptr<KSNowPlayingMediaManager> KSNowPlayingMediaManager::initWithUniverse(
    const ServiceLookup& universe) {
    const auto& platform = universe.platform();
    return initWithNowPlayingStream(platform.nowPlayingStream, *platform.clock,
                                    universe.service<KSEventStore>("EventStore"));
}

std::shared_ptr<KSNowPlayingMediaManager> KSNowPlayingMediaManager::initWithNowPlayingStream(
    NowPlayingStream* stream, Clock& clock, std::shared_ptr<KSEventStore> keepsakeStore) {
    if (!assertParameter(keepsakeStore != nullptr, "keepsakeStore", "KSNowPlayingMediaManager",
                         68)) {
        return nullptr;
    }
    if (!stream) return nullptr;
    return std::shared_ptr<KSNowPlayingMediaManager>(
        new KSNowPlayingMediaManager(*stream, clock, std::move(keepsakeStore)));
}

std::expected<KSNowPlayingMediaManager::Records, KSError> KSNowPlayingMediaManager::readStream() {
    Records records;
    OptionalError failed;
    stream_.read(
        clock_.now() - kLookBackSeconds,
        [&records](const NowPlayingRecord& record) { records.push_back(record); },
        [&failed](OptionalError error) { failed = std::move(error); });
    if (!failed) return records;
    logWarning(failed->description());
    return std::unexpected(std::move(*failed));
}

void KSNowPlayingMediaManager::fetchNowPlayingEventsBetweenStartDate(KSDate /*start*/,
                                                                     KSDate /*end*/,
                                                                     RecordsHandler completion) {
    queue_.async([this, completion = std::move(completion)] {
        if (auto records = readStream()) completion(std::move(*records));
    });
}

KSNowPlayingMediaManager::MediaPlays KSNowPlayingMediaManager::repeatingMediasFromEvents(
    const Records& records) const {
    std::map<std::string, Records> byTitle;
    for (const auto& record : records) {
        if (record.duration < kShortestItemSeconds) continue;
        if (!record.title || record.title->empty()) continue;
        byTitle[*record.title].push_back(record);
    }
    MediaPlays plays;
    for (auto& [title, group] : byTitle) {
        const auto tally = tallyOf(group);
        if (!tally.last) continue;
        const auto& last = *tally.last;
        const bool leisure = tally.sumTimePlayed >= kLeisureSeconds && last.bundleID &&
                             leisureMediaBundleIdSet_.contains(*last.bundleID);
        if (tally.repetitions < kFewestRepetitions && !leisure) continue;
        plays.push_back(KSMediaPlay::mediaPlayWithTitle(
            last.title, last.album, last.bundleID, last.storeProductIdentifier, last.genre,
            last.mediaType, last.artist, tally.sumTimePlayed, tally.repetitions, group));
    }
    return plays;
}

void KSNowPlayingMediaManager::fetchRepeatedMediaPlayBetweenStartDate(
    KSDate start, KSDate end, MediaPlaysHandler completion) {
    fetchNowPlayingEventsBetweenStartDate(
        start, end, [this, completion = std::move(completion)](const Records& records) {
            completion(repeatingMediasFromEvents(records));
        });
}

std::shared_ptr<KSEvent> KSNowPlayingMediaManager::createEventFromRepeatedMediaPlay(
    const KSMediaPlay& play) const {
    if (play.events.empty()) return nullptr;
    const KSDate now = clock_.now();
    const bool leisure = play.sumTimePlayed.value_or(0) >= kLeisureSeconds && play.bundleId &&
                         leisureMediaBundleIdSet_.contains(*play.bundleId);
    auto event = KSEvent::initWithEventIdentifier(
        KSUUID::random(), play.events.front().absoluteTimestamp,
        play.events.back().absoluteTimestamp, now, KSEventProvider::foresight,
        leisure ? KSEventCategory::leisureMedia : KSEventCategory::mediaOnRepeat);
    event->expirationDate = now + lifetime::kFourWeeks;
    return event;
}

void KSNowPlayingMediaManager::saveRepeatedMediaPlays(const MediaPlays& plays,
                                                      const ResultHandler& handler) {
    KSEventPointer newest;
    keepsakeStore_->fetchLastEventOfCategories(
        {KSEventCategory::mediaOnRepeat, KSEventCategory::leisureMedia},
        [&newest](const KSEventPointer& event, const OptionalError&) { newest = event; });
    KSEventArray fresh;
    for (const auto& play : plays) {
        auto event = createEventFromRepeatedMediaPlay(*play);
        if (!event || (newest && event->startDate() <= newest->startDate())) continue;
        fresh.push_back(std::move(event));
    }
    keepsakeStore_->storeEvents(fresh, handler);
}

void KSNowPlayingMediaManager::fetchAndSaveRepeatedMediaPlayBetweenStartDate(
    KSDate /*start*/, KSDate /*end*/, ResultHandler handler) {
    queue_.async([this, handler = std::move(handler)] {
        const auto records = readStream();
        if (records) {
            saveRepeatedMediaPlays(repeatingMediasFromEvents(*records), handler);
        } else {
            handler(records.error(), {});
        }
    });
}

std::optional<std::map<std::string, KSMediaPlay::Pointer>> KSNowPlayingMediaManager::playsByKey(
    const KSEventArray& events) {
    const auto span = KSExtensions::getDurationOfKSEventArray(events);
    if (!span) return std::nullopt;
    std::optional<MediaPlays> plays;
    fetchRepeatedMediaPlayBetweenStartDate(
        span->start, span->end, [&plays](MediaPlays found) { plays = std::move(found); });
    waitForQueueEmpty();
    if (!plays) return std::nullopt;
    std::map<std::string, KSMediaPlay::Pointer> byKey;
    for (auto& play : *plays) {
        auto key = _providerIdOfStartDate(play->events.front().absoluteTimestamp,
                                          play->events.back().absoluteTimestamp);
        byKey.insert_or_assign(std::move(key), std::move(play));
    }
    return byKey;
}

KSEventArray KSNowPlayingMediaManager::rehydratedMediaPlayEvents(const KSEventArray& events) {
    KSEventArray filled;
    const auto plays = playsByKey(events);
    if (!plays) return filled;
    for (const auto& event : events) {
        const auto play = plays->find(_providerIdOfStartDate(event->startDate(), event->endDate()));
        if (play != plays->end()) filled.push_back(rehydratedEvent(*event, *play->second));
    }
    return filled;
}

void KSNowPlayingMediaManager::removeMediaPlayEventsDeletedAtSource(const KSEventArray& events,
                                                                    const ResultHandler& handler) {
    _removeMediaPlayEventsDeletedAtSource(events, handler);
}

void KSNowPlayingMediaManager::_removeMediaPlayEventsDeletedAtSource(const KSEventArray& events,
                                                                     const ResultHandler& handler) {
    const auto plays = playsByKey(events);
    if (!plays) {
        // Whoever joins this purge with others waits for an answer.
        handler(std::nullopt, {});
        return;
    }
    KSEventArray gone;
    std::ranges::copy_if(events, std::back_inserter(gone), [&plays](const auto& event) {
        return !plays->contains(_providerIdOfStartDate(event->startDate(), event->endDate()));
    });
    keepsakeStore_->removeEvents(gone, handler);
}

void KSNowPlayingMediaManager::waitForQueueEmpty() {
    queue_.sync([] {});
}

std::string KSNowPlayingMediaManager::_providerIdOfStartDate(KSDate start, KSDate end) {
    const auto centiseconds = [](KSDate date) {
        constexpr double kCentisecond = 0.01;
        constexpr double kMost = 9e18;  // a client may store any date
        return static_cast<std::int64_t>(
            std::clamp(std::trunc(date.seconds / kCentisecond), -kMost, kMost));
    };
    return fmt::format("{},{}", centiseconds(start), centiseconds(end));
}

}  // namespace keepsakes
