// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <deque>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "core/Problems.h"
#include "core/Semaphore.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "platform/AnalyticsService.h"
#include "platform/BackgroundActivities.h"
#include "platform/CalendarService.h"
#include "platform/ContactStore.h"
#include "platform/DeviceDataIndex.h"
#include "platform/HealthStore.h"
#include "platform/InteractionStore.h"
#include "platform/MediaStream.h"
#include "platform/NearbyDevices.h"
#include "platform/PhotoAnalysis.h"
#include "platform/PlatformServices.h"
#include "platform/ProfileEventStore.h"
#include "platform/RoutineService.h"
#include "platform/SearchIndex.h"
#include "platform/SystemNotifications.h"
#include "platform/TopicStore.h"
#include "platform/UserDefaults.h"
#include "support/FakeDeviceState.h"
#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

namespace keepsakes {

/// Where a fake that was asked stays until the test lets it answer. Open before the fake's asker is
/// destroyed.
class Hold {
  public:
    void close();
    void open();
    /// Returns at once while it is open.
    void pass();

  private:
    std::mutex mutex_;
    std::optional<Semaphore> gate_;
};

/// A health store in memory: holds workouts, fails or stays silent when told to, tells what it was
/// asked.
class FakeHealthStore final : public HealthStore {
  public:
    std::vector<WorkoutSample> samples;
    std::optional<DateComponents> born;
    std::optional<int> sex;
    std::optional<KSError> nextError;
    bool silent = false;
    Hold hold;
    std::vector<KSDateInterval> asked;

    void queryWorkouts(KSDateInterval window, std::function<void(Workouts)> handler) override;
    std::string displayName(int activityType) const override;
    std::expected<std::optional<DateComponents>, KSError> dateOfBirth() const override;
    std::expected<std::optional<int>, KSError> biologicalSex() const override;

  private:
    WorkQueue queue_{"FakeHealthStore"};
};

/// A photo analysis in memory, likewise.
class FakePhotoAnalysis final : public PhotoAnalysis {
  public:
    struct Keepsake {
        std::string identifier;
        KSDateInterval interval;
        std::vector<std::string> inferences;
        std::int64_t photoCount = 1;
        std::vector<std::string> persons;
    };
    std::vector<Keepsake> keepsakes;
    KSDate graphCreationDate{1000};
    std::optional<KSError> nextError;
    std::vector<std::size_t> batchSizes;

    Summary summary(KSDateInterval interval) override;
    Summary summary(std::span<const std::string> identifiers) override;

    static KSDictionary dictionaryOf(const Keepsake& keepsake);

  private:
    template <class Wanted>
    Summary summaryOf(const Wanted& wanted);
};

/// A routine service in memory, likewise. Questions and answers go over its queue.
class FakeRoutineService final : public RoutineService {
  public:
    std::vector<RoutineVisit> stored;
    std::vector<LocationOfInterest> locations;
    std::uint64_t modeCode = 0;
    std::optional<KSError> visitsError;
    std::optional<KSError> locationsError;
    std::optional<KSError> modeError;
    Hold hold;
    std::vector<KSDateInterval> asked;           ///< For visits.
    std::vector<KSDateInterval> askedLocations;  ///< For locations of interest.

    void fetchStoredVisits(const VisitFetchOptions& options,
                           std::function<void(Visits)> handler) override;
    void fetchLocationsOfInterestVisitedBetween(KSDate start, KSDate end,
                                                std::function<void(Locations)> handler) override;
    void fetchRoutineModeFromLocation(GeoPoint location,
                                      std::function<void(Mode)> handler) override;

  private:
    WorkQueue queue_{"FakeRoutineService"};
};

/// A now-playing stream in memory, likewise.
class FakeNowPlayingStream final : public NowPlayingStream {
  public:
    std::vector<NowPlayingRecord> records;
    std::optional<KSError> nextError;
    Hold hold;
    std::vector<KSDate> asked;

    void read(KSDate start, const EachRecord& each,
              const std::function<void(OptionalError)>& completion) override;
};

/// A record of communications in memory: answers as the real one does, fails when told to, tells
/// what it was asked.
class FakeInteractionStore final : public InteractionStore {
  public:
    std::vector<Interaction> interactions;
    std::optional<KSError> nextError;
    Hold hold;
    std::vector<InteractionQuery> asked;

    Interactions queryInteractions(const InteractionQuery& query) override;
};

/// The owner's contacts in memory, likewise.
class FakeContactStore final : public ContactStore {
  public:
    std::vector<RankedContact> contacts;
    std::optional<KSError> nextError;
    Hold hold;

    std::vector<RelatedPerson> related;

    Contacts rankedContacts(std::span<const std::string> personIdentifiers) override;
    std::expected<std::vector<RelatedPerson>, KSError> relatedPeople() override;
};

/// A radio in memory: knows devices, fails when told to, counts how often it was asked.
class FakeNearbyDevices final : public NearbyDevices {
  public:
    std::vector<std::string> names;
    std::optional<KSError> nextError;
    int asked = 0;

    Devices devicesNear() override;
    void stop() override {}
};

/// A topic store in memory, likewise: the same scores for every interval.
class FakeTopicStore final : public TopicStore {
  public:
    std::map<std::string, double> scores;
    std::optional<KSError> nextError;
    Hold hold;
    std::vector<std::pair<std::string, TopicQuery>> asked;

    Scores scoresForTopicMapping(std::string_view mapping, const TopicQuery& query) override;
};

/// A search index in memory: answers every query with its items, those of chats apart; fails when
/// told to, tells what it was asked.
class FakeSearchIndex final : public SearchIndex {
  public:
    std::vector<SearchableItem> items;
    std::vector<SearchableItem> donatingChats;
    std::optional<KSError> nextError;
    Hold hold;
    std::vector<SearchQuery> asked;

    void start(const SearchQuery& query, const FoundItems& found,
               const Completion& completion) override;
};

/// Trips and suggested events in memory, likewise; an error comes after the items.
class FakeProfileEventStore final : public ProfileEventStore {
  public:
    std::vector<Trip> trips;
    std::vector<SuggestedEvent> suggestedEvents;
    std::optional<KSError> nextError;
    Hold hold;
    std::vector<KSDateInterval> asked;

    OptionalError iterateScoredEvents(const TripEventQuery& query, const Each<Trip>& each) override;
    OptionalError iterateScoredEvents(const SuggestedEventQuery& query,
                                      const Each<SuggestedEvent>& each) override;

  private:
    template <class Item>
    OptionalError tell(std::vector<Item> items, KSDateInterval window, const Each<Item>& each);

    std::mutex mutex_;  // trips and suggested events are asked for on queues of their own
};

/// The owner's calendars in memory, likewise.
class FakeCalendarService final : public CalendarService {
  public:
    std::vector<CalendarEvent> events;
    std::optional<KSError> nextError;
    std::vector<std::uint64_t> opened;  ///< The options of each store.

    std::unique_ptr<CalendarStore> openStore(std::uint64_t options) override;
};

class FakeAnalytics final : public AnalyticsService {
  public:
    void send(std::string_view event, const KSDictionary& fields) override;
    std::vector<std::pair<std::string, KSDictionary>> take();

  private:
    std::mutex mutex_;
    std::vector<std::pair<std::string, KSDictionary>> sent_;
};

class FakeDefaults final : public UserDefaults {
  public:
    std::map<std::string, KSValue, std::less<>> values;  ///< By "<domain>/<key>".
    KSValue object(std::string_view domain, std::string_view key) const override;
    OptionalError setObject(std::string_view domain, std::string_view key,
                            const KSValue& value) override;
};

class FakeDeviceData final : public DeviceDataIndex {
  public:
    ScanReport report;
    std::atomic<int> scans = 0;
    ScanReport refresh(const Progress& progress) override;
    ScanReport lastReport() const override { return report; }
    void stop() override {}
};

/// Activities that start when the test says so, on a queue of their own.
class FakeActivities final : public BackgroundActivities {
  public:
    /// Starts a run; false when nothing is registered under the identifier.
    bool fire(const std::string& identifier);
    /// "<identifier> <finished or given up>" of each run that ended; forgets them.
    std::vector<std::string> takeEnds();
    std::vector<std::string> registered() const;

    ActivityRegistration schedulePreregistered(std::string_view identifier,
                                               ActivityBlock block) override;
    std::string describe(std::string_view) const override { return "fired by the test"; }
    void stop() override {}

  private:
    mutable std::mutex mutex_;
    std::map<std::string, ActivityBlock> blocks_;
    std::vector<std::string> ends_;
    WorkQueue queue_{"FakeActivities"};
};

/// Everything the daemon needs of a device, in memory, with a folder of its own and a clock that
/// the test moves.
struct TestPlatform {
    TestPlatform();

    TemporaryFolder folder;
    VirtualClock clock;
    Problems problems;
    FakeHealthStore health;
    FakePhotoAnalysis photos;
    FakeRoutineService routine;
    FakeNowPlayingStream media;
    FakeInteractionStore interactions;
    FakeContactStore contacts;
    FakeTopicStore topics;
    FakeNearbyDevices nearby;  ///< Not among the services until a test puts it there.
    FakeSearchIndex search;
    FakeProfileEventStore profile;
    FakeCalendarService calendars;
    FakeAnalytics analytics;
    FakeDefaults defaults;
    FakeLockState lock;
    FakePowerSources power;
    SystemNotifications notifications;
    FakeDevicePolicy policy;
    FakeDeviceData deviceData;
    FakeActivities activities;
    std::vector<int> exits;
    PlatformServices services;
};

/// A registry that a test fills itself.
class TestUniverse final : public ServiceLookup {
  public:
    explicit TestUniverse(const PlatformServices& platform) : platform_(platform) {}

    std::shared_ptr<KSService> getService(std::string_view name) const override;
    const PlatformServices& platform() const override { return platform_; }
    void add(const std::string& name, std::shared_ptr<KSService> service) {
        services_[name] = std::move(service);
    }

  private:
    const PlatformServices& platform_;
    std::map<std::string, std::shared_ptr<KSService>, std::less<>> services_;
};

}  // namespace keepsakes
