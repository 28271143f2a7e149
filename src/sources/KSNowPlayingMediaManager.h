// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <array>
#include <expected>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "model/KSEvent.h"
#include "sources/KSMediaPlay.h"

namespace keepsakes {

class Clock;
class KSEventStore;

/// The players whose plays count as leisure when they last a minute, by the name of their desktop
/// entry: a television player, a podcast player and five apps for streamed video.
inline constexpr std::array<std::string_view, 7> kLeisureMediaBundleId = {
    "org.kde.kaffeine",                           // digital television
    "org.gnome.Podcasts",                         // podcasts
    "tv.kodi.Kodi",                               // a media centre
    "com.github.iwalton3.jellyfin-media-player",  // a media server's films and series
    "tv.plex.PlexDesktop",                        // another media server's
    "io.freetubeapp.FreeTube",                    // video clips
    "org.kde.plasmatube",                         // video clips, on phones too
};

/// Finds media that the owner played again and again, or watched at length in a leisure app, and
/// turns them into events. Owned by the registry as "NowPlayingMediaManager"; the stream is read on
/// its queue, and what follows a reading runs there too. Rehydration and removal wait for that
/// queue and must not be called on it.
class KSNowPlayingMediaManager final : public KSService {
  public:
    using Records = std::vector<NowPlayingRecord>;
    using MediaPlays = std::vector<KSMediaPlay::Pointer>;
    using RecordsHandler = std::function<void(Records)>;
    using MediaPlaysHandler = std::function<void(MediaPlays)>;

    static constexpr double kLookBackSeconds = 1209600;  ///< 14 days.

    /// Needs "EventStore"; yields nothing on a device without the stream.
    static std::shared_ptr<KSNowPlayingMediaManager> initWithUniverse(
        const ServiceLookup& universe);
    static std::shared_ptr<KSNowPlayingMediaManager> initWithNowPlayingStream(
        NowPlayingStream* stream, Clock& clock, std::shared_ptr<KSEventStore> keepsakeStore);

    /// The records of the last 14 days, whatever dates are given. After a failed reading, which is
    /// logged, the completion is not called.
    void fetchNowPlayingEventsBetweenStartDate(KSDate start, KSDate end, RecordsHandler completion);
    /// By title. Items shorter than 31 seconds do not count.
    MediaPlays repeatingMediasFromEvents(const Records& records) const;
    /// As `fetchNowPlayingEventsBetweenStartDate`.
    void fetchRepeatedMediaPlayBetweenStartDate(KSDate start, KSDate end,
                                                MediaPlaysHandler completion);

    std::shared_ptr<KSEvent> createEventFromRepeatedMediaPlay(const KSMediaPlay& play) const;
    /// Stores an event for each play that began after the newest stored one.
    void saveRepeatedMediaPlays(const MediaPlays& plays, const ResultHandler& handler);
    /// A failed reading is the handler's error.
    void fetchAndSaveRepeatedMediaPlayBetweenStartDate(KSDate start, KSDate end,
                                                       ResultHandler handler);

    /// Copies of the events with their media fields, from a fresh reading of the stream; events
    /// whose play it no longer holds are left out.
    KSEventArray rehydratedMediaPlayEvents(const KSEventArray& events);
    /// Removes the events whose play the stream no longer holds; none after a failed reading.
    void removeMediaPlayEventsDeletedAtSource(const KSEventArray& events,
                                              const ResultHandler& handler);

    /// Returns when what was queued before has finished.
    void waitForQueueEmpty();

    /// The key by which events are matched to plays: both dates in centiseconds.
    static std::string _providerIdOfStartDate(KSDate start, KSDate end);

  private:
    KSNowPlayingMediaManager(NowPlayingStream& stream, Clock& clock,
                             std::shared_ptr<KSEventStore> keepsakeStore);

    std::expected<Records, KSError> readStream();
    std::optional<std::map<std::string, KSMediaPlay::Pointer>> playsByKey(
        const KSEventArray& events);
    void _removeMediaPlayEventsDeletedAtSource(const KSEventArray& events,
                                               const ResultHandler& handler);

    NowPlayingStream& stream_;
    Clock& clock_;
    const std::shared_ptr<KSEventStore> keepsakeStore_;
    const std::set<std::string_view> leisureMediaBundleIdSet_;
    WorkQueue queue_;
};

}  // namespace keepsakes
