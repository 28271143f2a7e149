// SPDX-License-Identifier: Apache-2.0
#include "sources/KSRoutineServiceManager.h"

#include <gmock/gmock.h>

#include "StoreFixture.h"
#include "core/Calendar.h"
#include "sources/KSVisitExtensions.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

const KSUUID kInn = testUUID(77);

RoutineVisit visit(double entry, double exit, const std::string& name = "Inn") {
    return {
        .entry = KSDate{entry},
        .exit = KSDate{exit},
        .date = {exit + 60},
        .type = kVisitWhole,
        .location = GeoPoint{47.5, 13.6},
        .placeInference = PlaceInference{
            .preferredName = name, .mapItem = std::nullopt, .userType = 2, .loiIdentifier = kInn}};
}

LocationOfInterest inn(std::vector<double> entries) {
    LocationOfInterest location{.identifier = kInn, .visits = {}};
    for (const double entry : entries) {
        location.visits.push_back({.location = {}, .entryDate = KSDate{entry}, .exitDate = {}});
    }
    return location;
}

class Routine : public StoreFixture {
  protected:
    Routine() {
        setenv("TZ", "UTC", 1);
        universe->add("EventStore", store);
        routine = KSRoutineServiceManager::initWithUniverse(*universe);
    }

    Answer collect(double start, double end) {
        Answer answer{.error = "(no answer)"};
        routine->fetchAndSaveVisitsBetweenStartDate({start}, {end}, into(answer));
        WorkerThreads::shared().settle();
        return answer;
    }

    KSEventArray rehydrate(const KSEventArray& events, std::string* failed = nullptr) {
        KSEventArray refreshed;
        routine->rehydrateVisits(events, [&](KSEventArray answer, const OptionalError& error) {
            refreshed = std::move(answer);
            if (failed) *failed = error ? error->description() : "";
        });
        WorkerThreads::shared().settle();
        return refreshed;
    }

    Answer remove(const KSEventArray& events) {
        Answer answer{.error = "(no answer)"};
        routine->removeVisitsDeletedAtSource(events, into(answer));
        WorkerThreads::shared().settle();
        return answer;
    }

    std::vector<double> storedStarts() {
        std::vector<double> starts;
        for (const auto& event : fetch({.ascending = true})) {
            starts.push_back(event->startDate().seconds);
        }
        return starts;
    }

    std::shared_ptr<KSRoutineServiceManager> routine;
};

TEST_F(Routine, MakesAnEventOfEachVisitWithAllThatIsKnownOfIt) {
    platform.routine.stored = {visit(1000, 5000)};
    platform.routine.locations = {inn({1000, -90000})};
    platform.routine.modeCode = 2;
    EXPECT_EQ(collect(0, 10000), (Answer{"", 1}));
    const auto event = rehydrate(fetch({})).at(0);
    const auto now = platform.clock.now();
    EXPECT_EQ(event->startDate(), KSDate{1000});
    EXPECT_EQ(event->endDate(), KSDate{5000});
    EXPECT_EQ(event->creationDate(), now);
    EXPECT_EQ(event->provider(), KSEventProvider::routine);
    EXPECT_EQ(event->category(), KSEventCategory::visit);
    EXPECT_EQ(event->expirationDate, now + 604800);
    EXPECT_EQ(event->sourceCreationDate(), KSDate{5060});
    EXPECT_EQ(event->placeName, "Inn");
    EXPECT_EQ(event->location, (KSLocation{47.5, 13.6}));
    EXPECT_EQ(event->placeUserType, 2u);
    EXPECT_EQ(event->placeDiscovery, 2u);
    EXPECT_EQ(event->mode, KSPlaceMode::tourist);
    EXPECT_EQ(event->identifierFromProvider, std::nullopt);
    EXPECT_THAT(platform.routine.askedLocations.front(),
                (KSDateInterval{KSDate::distantPast(), {10000}}));
}

TEST_F(Routine, TakesOnlyVisitsThatAreWholeLongEnoughAndNew) {
    auto open = visit(9000, 0);
    open.exit.reset();
    auto arrival = visit(8000, 9000);
    arrival.type = kVisitArrival;
    platform.routine.stored = {visit(999, 5000),  visit(1000, 5000), visit(5100, 5399.99),
                               visit(5400, 5700), arrival,           open};
    EXPECT_EQ(collect(999, 10000), (Answer{"", 2}));
    EXPECT_THAT(storedStarts(), ElementsAre(1000, 5400)) << "strictly after the start";

    platform.routine.stored.push_back(visit(5401, 5900));
    EXPECT_EQ(collect(0, 10000), (Answer{"", 1})) << "strictly after the newest stored one";
    EXPECT_EQ(platform.routine.asked.back(), (KSDateInterval{{5400}, {10000}}));
    EXPECT_EQ(collect(0, 10000), (Answer{"", -1}));
    const auto questions = platform.routine.asked.size();
    EXPECT_EQ(collect(0, 5000), (Answer{"", -1})) << "ends before the newest stored one";
    EXPECT_EQ(platform.routine.asked.size(), questions);
}

TEST_F(Routine, AFailedQuestionEndsTheCollectionButForTheMode) {
    platform.routine.stored = {visit(1000, 5000)};
    platform.routine.locationsError = KSError::make("Routine", 1, "no places");
    platform.routine.visitsError = KSError::make("Routine", 2, "no visits");
    EXPECT_EQ(collect(0, 10000), (Answer{"no places", -1}));
    platform.routine.locationsError.reset();
    EXPECT_EQ(collect(0, 10000), (Answer{"no visits", -1}));
    platform.routine.visitsError.reset();
    platform.routine.modeError = KSError::make("Routine", 3, "no mode");
    EXPECT_EQ(collect(0, 10000), (Answer{"", 1}));
    platform.routine.modeError.reset();
    platform.routine.modeCode = 3;
    platform.routine.stored.push_back(visit(6000, 7000));
    EXPECT_EQ(collect(0, 10000), (Answer{"", 1}));
    for (const auto& event : fetch({})) EXPECT_EQ(event->mode, KSPlaceMode::unknown);
}

TEST_F(Routine, APlaceIsNewUntilTheDayAfterTheFirstVisit) {
    const double day = 20 * 86400;
    struct Case {
        const char* what;
        std::vector<LocationOfInterest> locations;
        std::uint64_t discovery;
    };
    const Case cases[] = {
        {"no locations", {}, 1},
        {"another one", {{.identifier = testUUID(1), .visits = inn({0}).visits}}, 1},
        {"earlier on the same day", {inn({day, day + 100})}, 1},
        {"the day before", {inn({day - 1, day + 500})}, 2},
        {"later", {inn({day + 86400})}, 1},
    };
    for (const auto& c : cases) {
        const auto event = routine->createEventFromVisit(visit(day + 500, day + 900), c.locations);
        EXPECT_EQ(event->placeDiscovery, c.discovery) << c.what;
    }
    auto unlabelled = visit(day + 500, day + 900);
    unlabelled.placeInference->loiIdentifier.reset();
    EXPECT_EQ(routine->createEventFromVisit(unlabelled, {inn({0})})->placeDiscovery, 1u);
    unlabelled.placeInference.reset();
    unlabelled.exit.reset();
    const auto bare = routine->createEventFromVisit(unlabelled, {inn({0})});
    EXPECT_EQ(bare->endDate(), platform.clock.now()) << "the owner may still be there";
    EXPECT_EQ(bare->placeUserType, 0u);
}

TEST_F(Routine, RehydratesWhatIsStillThereAndKeepsTheMode) {
    const auto stored = makeVisit(1, 1000, 5000, "old name");
    stored->mode = KSPlaceMode::local;
    const KSEventArray events{makeVisit(2, 6000, 6500, "gone"), stored,
                              makeVisit(3, 1000, 5001, "other end")};
    platform.routine.stored = {visit(0, 400), visit(1000, 5000), visit(5500, 5900)};
    platform.routine.locationsError = KSError::make("Routine", 1, "no places");
    std::string error;
    const auto refreshed = rehydrate(events, &error);
    EXPECT_EQ(error, "");
    ASSERT_EQ(numbersOf(refreshed), std::vector{1});
    EXPECT_EQ(refreshed[0]->placeName, "Inn");
    EXPECT_EQ(refreshed[0]->mode, KSPlaceMode::local);
    EXPECT_EQ(refreshed[0]->placeDiscovery, 1u) << "without locations every place is new";
    EXPECT_EQ(stored->placeName, "old name");
    platform.routine.visitsError = KSError::make("Routine", 2, "no visits");
    EXPECT_THAT(rehydrate(events, &error), IsEmpty());
    EXPECT_EQ(error, "no visits");
    EXPECT_THAT(rehydrate({}, &error), IsEmpty());
    EXPECT_EQ(error, "");
}

TEST_F(Routine, RemovesEventsWhoseVisitIsGone) {
    const auto kept = makeVisit(1, 1000, 5000, "kept");
    const auto gone = makeVisit(2, 6000, 6500, "gone");
    storeAll({kept, gone});
    platform.routine.stored = {visit(1000, 5000)};
    platform.routine.visitsError = KSError::make("Routine", 2, "no visits");
    EXPECT_EQ(remove({kept, gone}), (Answer{"", 0})) << "a failed question removes nothing";
    platform.routine.visitsError.reset();
    EXPECT_EQ(remove({kept, gone}), (Answer{"", 1}));
    EXPECT_EQ(numbersOf(fetch({})), std::vector{1});
    EXPECT_EQ(remove({}), (Answer{"", 0}));
}

TEST_F(Routine, FindsAVisitByItsExactTimesAmongAnyNumber) {
    for (std::size_t count = 0; count < 8; ++count) {
        std::vector<RoutineVisit> visits;
        for (std::size_t i = 0; i < count; ++i) {
            const auto start = 100.0 * static_cast<double>(i);
            visits.push_back(visit(start, start + 50));
        }
        const auto find = [&visits](double start, double end) {
            return KSRoutineServiceManager::findMatchingVisitFor(*makeVisit(1, start, end, ""),
                                                                 visits);
        };
        for (std::size_t i = 0; i < count; ++i) {
            const auto start = 100.0 * static_cast<double>(i);
            EXPECT_EQ(find(start, start + 50), &visits[i]);
            EXPECT_EQ(find(start, start + 50.001), nullptr);
        }
        EXPECT_EQ(find(-1, 50), nullptr) << "before the first";
        EXPECT_EQ(find(10000, 10050), nullptr);
    }
    auto open = visit(0, 0);
    open.exit.reset();
    EXPECT_FALSE(KSExtensions::isEqualToVisitKeepsake(open, *makeVisit(1, 0, 0, "")));
}

TEST(KSVisitExtensions, NamesAndComparesVisits) {
    auto named = visit(1, 2, "mine");
    named.placeInference->mapItem = MapItem{"map"};
    EXPECT_EQ(KSExtensions::getPlaceName(named), "mine");
    named.placeInference->preferredName.reset();
    EXPECT_EQ(KSExtensions::getPlaceName(named), "map");
    named.placeInference->mapItem.reset();
    EXPECT_EQ(KSExtensions::getPlaceName(named), std::nullopt);

    LocationOfInterestVisit other{named.location, named.entry, named.exit};
    EXPECT_TRUE(KSExtensions::isEqualToLoiVisit(named, other));
    other.exitDate.reset();
    EXPECT_FALSE(KSExtensions::isEqualToLoiVisit(named, other));
    named.exit.reset();
    EXPECT_TRUE(KSExtensions::isEqualToLoiVisit(named, other));
    other.location->latitude += 1;
    EXPECT_FALSE(KSExtensions::isEqualToLoiVisit(named, other));
}

TEST_F(Routine, NeedsTheStoreAndTheService) {
    RecordedAssertions assertions;
    TestUniverse empty(platform.services);
    EXPECT_EQ(KSRoutineServiceManager::initWithUniverse(empty), nullptr);
    EXPECT_THAT(assertions.take(), ElementsAre("Invalid parameter not satisfying: eventStore "
                                               "(KSRoutineServiceManager:46)"));
    platform.services.routineService = nullptr;
    EXPECT_EQ(KSRoutineServiceManager::initWithUniverse(*universe), nullptr);
    EXPECT_THAT(assertions.take(), ElementsAre());
}

}  // namespace
}  // namespace keepsakes
