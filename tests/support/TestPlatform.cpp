// SPDX-License-Identifier: Apache-2.0
#include "support/TestPlatform.h"

#include <algorithm>
#include <ranges>

#include "platform/ActivityCatalogue.h"

namespace keepsakes {

void Hold::close() {
    const std::lock_guard lock(mutex_);
    if (!gate_) gate_.emplace();
}

void Hold::open() {
    const std::lock_guard lock(mutex_);
    if (gate_) gate_->signal();
    gate_.reset();
}

void Hold::pass() {
    std::optional<Semaphore> gate;
    {
        const std::lock_guard lock(mutex_);
        gate = gate_;
    }
    if (!gate) return;
    gate->wait();
    gate->signal();  // for whoever waits behind
}

void FakeHealthStore::queryWorkouts(KSDateInterval window, std::function<void(Workouts)> handler) {
    queue_.async([this, window, handler = std::move(handler)] {
        asked.push_back(window);
        if (silent) return;
        hold.pass();
        if (nextError) {
            handler(std::unexpected(*std::exchange(nextError, std::nullopt)));
            return;
        }
        std::vector<WorkoutSample> found;
        std::ranges::copy_if(samples, std::back_inserter(found), [window](const auto& sample) {
            return sample.end >= window.start && sample.end <= window.end;
        });
        std::ranges::stable_sort(found, [](const auto& a, const auto& b) { return b.end < a.end; });
        handler(std::move(found));
    });
}

std::string FakeHealthStore::displayName(int activityType) const {
    return std::string(activityName(activityType).value_or("Other"));
}

std::expected<std::optional<DateComponents>, KSError> FakeHealthStore::dateOfBirth() const {
    if (nextError) return std::unexpected(*nextError);
    return born;
}

std::expected<std::optional<int>, KSError> FakeHealthStore::biologicalSex() const {
    if (nextError) return std::unexpected(*nextError);
    return sex;
}

KSDictionary FakePhotoAnalysis::dictionaryOf(const Keepsake& keepsake) {
    KSDictionary dictionary{
        {std::string(kKSKeyLocalIdentifier), keepsake.identifier},
        {std::string(kKSKeyEventUniversalDateInterval),
         KSDictionary{{std::string(kKSKeyIntervalStart), keepsake.interval.start},
                      {std::string(kKSKeyIntervalEnd), keepsake.interval.end}}},
        {std::string(kKSKeyInferences),
         KSArray(keepsake.inferences.begin(), keepsake.inferences.end())},
        {std::string(kKSKeyPhotoCount), keepsake.photoCount},
    };
    KSArray persons;
    for (const auto& name : keepsake.persons) {
        persons.emplace_back(KSDictionary{{std::string(kKSKeyPersonName), name}});
    }
    if (!persons.empty()) dictionary.emplace(kKSKeyPersons, std::move(persons));
    return dictionary;
}

template <class Wanted>
PhotoAnalysis::Summary FakePhotoAnalysis::summaryOf(const Wanted& wanted) {
    if (nextError) return std::unexpected(*std::exchange(nextError, std::nullopt));
    KSArray events;
    for (const auto& keepsake : keepsakes) {
        if (wanted(keepsake)) events.emplace_back(dictionaryOf(keepsake));
    }
    return KSDictionary{{std::string(kKSKeyGraphCreationDate), graphCreationDate},
                        {std::string(kKSKeyEvents), std::move(events)}};
}

PhotoAnalysis::Summary FakePhotoAnalysis::summary(KSDateInterval interval) {
    return summaryOf([interval](const Keepsake& keepsake) {
        return keepsake.interval.start <= interval.end && keepsake.interval.end >= interval.start;
    });
}

PhotoAnalysis::Summary FakePhotoAnalysis::summary(std::span<const std::string> identifiers) {
    batchSizes.push_back(identifiers.size());
    return summaryOf([identifiers](const Keepsake& keepsake) {
        return std::ranges::find(identifiers, keepsake.identifier) != identifiers.end();
    });
}

void FakeRoutineService::fetchStoredVisits(const VisitFetchOptions& options,
                                           std::function<void(Visits)> handler) {
    queue_.async([this, options, handler = std::move(handler)] {
        asked.push_back(options.interval);
        hold.pass();
        if (visitsError) {
            handler(std::unexpected(*visitsError));
            return;
        }
        std::vector<RoutineVisit> found;
        std::ranges::copy_if(stored, std::back_inserter(found), [&options](const auto& visit) {
            return visit.entry <= options.interval.end &&
                   visit.exit.value_or(KSDate::distantFuture()) >= options.interval.start;
        });
        handler(std::move(found));
    });
}

void FakeRoutineService::fetchLocationsOfInterestVisitedBetween(
    KSDate start, KSDate end, std::function<void(Locations)> handler) {
    queue_.async([this, start, end, handler = std::move(handler)] {
        askedLocations.push_back({start, end});
        handler(locationsError ? Locations(std::unexpected(*locationsError))
                               : Locations(locations));
    });
}

void FakeRoutineService::fetchRoutineModeFromLocation(GeoPoint, std::function<void(Mode)> handler) {
    queue_.async([this, handler = std::move(handler)] {
        handler(modeError ? Mode(std::unexpected(*modeError)) : Mode(modeCode));
    });
}

void FakeNowPlayingStream::read(KSDate start, const EachRecord& each,
                                const std::function<void(OptionalError)>& completion) {
    asked.push_back(start);
    hold.pass();
    if (nextError) {
        completion(std::exchange(nextError, std::nullopt));
        return;
    }
    for (const auto& record : records) {
        if (record.absoluteTimestamp >= start) each(record);
    }
    completion(std::nullopt);
}

InteractionStore::Interactions FakeInteractionStore::queryInteractions(
    const InteractionQuery& query) {
    asked.push_back(query);
    hold.pass();
    if (nextError) return std::unexpected(*std::exchange(nextError, std::nullopt));
    std::vector<Interaction> found;
    std::ranges::copy_if(interactions, std::back_inserter(found), [&query](const auto& one) {
        return one.startDate >= query.startsFrom && one.endDate <= query.endsUntil &&
               std::ranges::find(query.mechanisms, one.mechanism) != query.mechanisms.end();
    });
    std::ranges::stable_sort(
        found, [](const auto& a, const auto& b) { return b.startDate < a.startDate; });
    if (found.size() > query.limit) found.resize(query.limit);
    return found;
}

ContactStore::Contacts FakeContactStore::rankedContacts(
    std::span<const std::string> personIdentifiers) {
    hold.pass();
    if (nextError) return std::unexpected(*std::exchange(nextError, std::nullopt));
    std::vector<RankedContact> found;
    std::ranges::copy_if(contacts, std::back_inserter(found), [&](const auto& contact) {
        std::string_view person = contact.identifier;
        if (person.starts_with(kContactPrefix)) person.remove_prefix(kContactPrefix.size());
        return std::ranges::find(personIdentifiers, person) != personIdentifiers.end();
    });
    return found;
}

std::expected<std::vector<RelatedPerson>, KSError> FakeContactStore::relatedPeople() {
    if (nextError) return std::unexpected(*std::exchange(nextError, std::nullopt));
    return related;
}

NearbyDevices::Devices FakeNearbyDevices::devicesNear() {
    ++asked;
    if (nextError) return std::unexpected(*std::exchange(nextError, std::nullopt));
    return names;
}

TopicStore::Scores FakeTopicStore::scoresForTopicMapping(std::string_view mapping,
                                                         const TopicQuery& query) {
    asked.emplace_back(mapping, query);
    hold.pass();
    if (nextError) return std::unexpected(*std::exchange(nextError, std::nullopt));
    return scores;
}

void FakeSearchIndex::start(const SearchQuery& query, const FoundItems& found,
                            const Completion& completion) {
    asked.push_back(query);
    hold.pass();
    const bool isOfChats = query.queryString.starts_with(searchkey::kIsChatAutoDonating);
    if (nextError && !isOfChats) {
        completion(std::exchange(nextError, std::nullopt));
        return;
    }
    // One by one: whoever asks has to put the batches together.
    for (const auto& item : isOfChats ? donatingChats : items) found(std::span(&item, 1));
    completion(std::nullopt);
}

template <class Item>
OptionalError FakeProfileEventStore::tell(std::vector<Item> items, KSDateInterval window,
                                          const Each<Item>& each) {
    {
        const std::lock_guard lock(mutex_);
        asked.push_back(window);
    }
    hold.pass();
    std::ranges::stable_sort(items, {}, [](const Item& item) { return item.startDate; });
    for (const auto& item : items) {
        const bool overlaps = item.startDate <= window.end && item.endDate >= window.start;
        if (overlaps && !each(item)) break;
    }
    const std::lock_guard lock(mutex_);
    return std::exchange(nextError, std::nullopt);
}

OptionalError FakeProfileEventStore::iterateScoredEvents(const TripEventQuery& query,
                                                         const Each<Trip>& each) {
    return tell(trips, {query.fromDate, query.toDate}, each);
}

OptionalError FakeProfileEventStore::iterateScoredEvents(const SuggestedEventQuery& query,
                                                         const Each<SuggestedEvent>& each) {
    return tell(suggestedEvents, {query.fromDate, query.toDate}, each);
}

namespace {

class FakeCalendarStore final : public CalendarStore {
  public:
    explicit FakeCalendarStore(FakeCalendarService& service) : service_(service) {}
    Event eventWithIdentifier(const std::string& identifier) override {
        if (service_.nextError) {
            return std::unexpected(*std::exchange(service_.nextError, std::nullopt));
        }
        const auto found =
            std::ranges::find(service_.events, identifier, &CalendarEvent::eventIdentifier);
        return found == service_.events.end() ? std::nullopt : std::optional(*found);
    }

  private:
    FakeCalendarService& service_;
};

}  // namespace

std::unique_ptr<CalendarStore> FakeCalendarService::openStore(std::uint64_t options) {
    opened.push_back(options);
    return std::make_unique<FakeCalendarStore>(*this);
}

void FakeAnalytics::send(std::string_view event, const KSDictionary& fields) {
    const std::lock_guard lock(mutex_);
    sent_.emplace_back(event, fields);
}

std::vector<std::pair<std::string, KSDictionary>> FakeAnalytics::take() {
    const std::lock_guard lock(mutex_);
    return std::exchange(sent_, {});
}

KSValue FakeDefaults::object(std::string_view domain, std::string_view key) const {
    const auto found = values.find(std::string(domain) + "/" + std::string(key));
    return found == values.end() ? KSValue() : found->second;
}

OptionalError FakeDefaults::setObject(std::string_view domain, std::string_view key,
                                      const KSValue& value) {
    values[std::string(domain) + "/" + std::string(key)] = value;
    return std::nullopt;
}

ScanReport FakeDeviceData::refresh(const Progress& progress) {
    ++scans;
    progress(1, 1);
    return report;
}

namespace {

class FakeRun final : public ActivityRun {
  public:
    explicit FakeRun(std::function<void(std::string_view)> atEnd) : atEnd_(std::move(atEnd)) {}
    ~FakeRun() override { end("given up"); }
    FakeRun(const FakeRun&) = delete;
    FakeRun& operator=(const FakeRun&) = delete;
    void finish() override { end("finished"); }

  private:
    void end(std::string_view how) {
        if (!ended_.exchange(true)) atEnd_(how);
    }

    const std::function<void(std::string_view)> atEnd_;
    std::atomic<bool> ended_ = false;
};

}  // namespace

bool FakeActivities::fire(const std::string& identifier) {
    ActivityBlock block;
    {
        const std::lock_guard lock(mutex_);
        const auto found = blocks_.find(identifier);
        if (found == blocks_.end()) return false;
        block = found->second;
    }
    queue_.async([this, identifier, block] {
        block(std::make_shared<FakeRun>([this, identifier](std::string_view how) {
            const std::lock_guard lock(mutex_);
            ends_.push_back(identifier + " " + std::string(how));
        }));
    });
    return true;
}

std::vector<std::string> FakeActivities::takeEnds() {
    const std::lock_guard lock(mutex_);
    return std::exchange(ends_, {});
}

std::vector<std::string> FakeActivities::registered() const {
    const std::lock_guard lock(mutex_);
    std::vector<std::string> identifiers;
    for (const auto& [identifier, block] : blocks_) identifiers.push_back(identifier);
    return identifiers;
}

ActivityRegistration FakeActivities::schedulePreregistered(std::string_view identifier,
                                                           ActivityBlock block) {
    const std::string name(identifier);
    {
        const std::lock_guard lock(mutex_);
        blocks_[name] = std::move(block);
    }
    return ActivityRegistration([this, name] {
        {
            const std::lock_guard lock(mutex_);
            blocks_.erase(name);
        }
        if (!queue_.isCurrent()) queue_.sync([] {});
    });
}

TestPlatform::TestPlatform() {
    services.clock = &clock;
    services.devicePolicy = &policy;
    services.lockState = &lock;
    services.powerSources = &power;
    services.systemNotifications = &notifications;
    services.userDefaults = &defaults;
    services.analytics = &analytics;
    services.healthStore = &health;
    services.photoAnalysis = &photos;
    services.routineService = &routine;
    services.nowPlayingStream = &media;
    services.interactionStore = &interactions;
    services.contactStore = &contacts;
    services.topicStore = &topics;
    services.searchIndex = &search;
    services.profileEventStore = &profile;
    services.calendars = &calendars;
    services.deviceData = &deviceData;
    services.activities = &activities;
    services.problems = &problems;
    services.cacheFolder = folder / "cache";
    services.exitProcess = [this](int status) { exits.push_back(status); };
}

std::shared_ptr<KSService> TestUniverse::getService(std::string_view name) const {
    const auto found = services_.find(name);
    return found == services_.end() ? nullptr : found->second;
}

}  // namespace keepsakes
