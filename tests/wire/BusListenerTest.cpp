// SPDX-License-Identifier: Apache-2.0
#include "wire/BusListener.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fmt/format.h>

#include <cerrno>
#include <cstdlib>
#include <thread>

#include "RawCaller.h"
#include "client/ConduitClient.h"
#include "model/ValueCoding.h"
#include "support/FakeConduit.h"
#include "support/SampleRecords.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

template <class Record>
KSDictionary archived(const Record& record) {
    ValueEncoder encoder;
    record.encodeWithCoder(encoder);
    return encoder.take();
}

class BusListenerTest : public testing::Test {
  protected:
    BusListenerTest() { listener_->resume(conduit_, conduit_); }

    FakeConduit conduit_;
    std::unique_ptr<BusListener> listener_ = BusListener::claim().value();
    std::unique_ptr<ConduitClient> client_ = ConduitClient::connect().value();
};

TEST_F(BusListenerTest, CarriesEveryFieldOfEventsAndBundles) {
    const auto full = samples::fullEvent(1);
    const auto small = samples::event(2);
    EXPECT_EQ(client_->storeEvents({full, small}), std::nullopt);
    ASSERT_EQ(conduit_.events().size(), 2u);
    EXPECT_EQ(archived(*conduit_.events()[0]), archived(*full));

    const auto fetched = client_->fetchEventsWithOptions({{}, true, {}, {}}).value();
    ASSERT_EQ(fetched.size(), 2u);
    EXPECT_EQ(archived(*fetched[0]), archived(*full));
    EXPECT_EQ(archived(*fetched[1]), archived(*small));

    const auto bundle = samples::bundle({full, small});
    conduit_.setBundles({bundle});
    const auto bundles = client_->fetchEventBundlesWithOptions({}).value();
    ASSERT_EQ(bundles.size(), 1u);
    EXPECT_EQ(archived(*bundles[0]), archived(*bundle));
}

TEST_F(BusListenerTest, TellsErrorsOfEveryDomain) {
    conduit_.failWith(KSError::make(KSErrorCode::databaseUnavailable, "no database"));
    EXPECT_EQ(client_->collectEvents(),
              KSError::make(KSErrorCode::databaseUnavailable, "no database"));
    for (const auto& error : {KSError::make(kSQLiteErrorDomain, 13, "disk full"),
                              KSError::make(KSErrorDomain, -1, "odd code")}) {
        conduit_.failWith(error);
        const auto answered = client_->storeEvents({}).value();
        EXPECT_EQ(answered.description(), error.description());
        EXPECT_EQ(valueForKey(answered.userInfo, kBusErrorNameKey), KSValue(bus::kFailed));
    }
}

TEST_F(BusListenerTest, TheStatusSeesWhatWasStored) {
    conduit_.setProblems({"a file could not be read", "bad \xff"});
    EXPECT_EQ(client_->storeEvents({samples::event(1), samples::event(2)}), std::nullopt);
    const auto status = client_->status().value();
    EXPECT_EQ(status.version, "1.2.3");
    EXPECT_TRUE(status.databaseAvailable && status.purgeEnabled && !status.collectEnabled);
    EXPECT_EQ(status.lastCollection, 700000000.5);
    EXPECT_EQ(status.eventCount, 2u);
    EXPECT_THAT(status.problems, ElementsAre("a file could not be read", "bad \uFFFD"));

    RawCaller caller;
    const auto get = [&caller](const char* interface, const char* name) {
        return caller.call("org.freedesktop.DBus.Properties", "Get", [=](sd_bus_message* message) {
            return sd_bus_message_append(message, "ss", interface, name);
        });
    };
    EXPECT_EQ(get(bus::kStatusInterface, "EventCount"), "");
    std::uint64_t count = 0;
    EXPECT_GT(sd_bus_message_read(caller.reply(), "v", "t", &count), 0);
    EXPECT_EQ(count, 2u);
    EXPECT_THAT(get(bus::kStatusInterface, "Colour"), HasSubstr("UnknownProperty"));
    EXPECT_THAT(get(bus::kConduitInterface, "EventCount"), HasSubstr("UnknownProperty"));
    const auto set =
        caller.call("org.freedesktop.DBus.Properties", "Set", [](sd_bus_message* message) {
            return sd_bus_message_append(message, "ssv", bus::kStatusInterface, "EventCount", "t",
                                         std::uint64_t{0});
        });
    EXPECT_THAT(set, HasSubstr("PropertyReadOnly"));
    EXPECT_EQ(caller.call("org.freedesktop.DBus.Introspectable", "Introspect", nullptr), "");
}

TEST_F(BusListenerTest, SignalsAndProgressArriveBeforeTheReplyThatFollowsThem) {
    std::vector<std::string> seen;
    client_->setProgressHandler(
        [&seen](std::string_view activity, std::uint64_t done, std::uint64_t total) {
            seen.push_back(fmt::format("{} {}/{}", activity, done, total));
        });
    conduit_.whileWorking([this] {
        listener_->emitEventsChanged();
        listener_->emitProgress("scan", 3, 0);
        listener_->emitProgress("collect", 1, 2);
    });
    EXPECT_EQ(client_->collectEvents(), std::nullopt);
    EXPECT_THAT(seen, ElementsAre("scan 3/0", "collect 1/2"));
}

TEST_F(BusListenerTest, ASecondDaemonIsToldThatTheNameIsTaken) {
    const auto second = BusListener::claim();
    ASSERT_FALSE(second.has_value());
    EXPECT_EQ(second.error().code, EEXIST);
    EXPECT_THAT(second.error().description(), HasSubstr("taken"));
    listener_->invalidate();
    EXPECT_TRUE(BusListener::claim().has_value());
    setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/nonexistent", 1);
    EXPECT_THAT(BusListener::claim().error().description(), HasSubstr("no session bus"));
}

TEST_F(BusListenerTest, CarriesRepliesUpToTheLargestMessageAndSaysSoBeyond) {
    const auto withNotes = [](std::uint32_t number, std::size_t bytes) {
        auto event = samples::event(number);
        event->placeName = std::string(bytes, 'x');
        return event;
    };
    KSEventArray events;
    for (std::uint32_t number = 0; number < 320; ++number) {
        events.push_back(withNotes(number, 100 << 10));
    }
    conduit_.setEvents(events);
    for (int round = 0; round < 3; ++round) {
        const auto fetched = client_->fetchEventsWithOptions({});
        ASSERT_TRUE(fetched.has_value()) << fetched.error().description();
        EXPECT_EQ(fetched->size(), 320u);
        EXPECT_EQ((*fetched)[319]->placeName, events[0]->placeName);
    }
    while (events.size() < 700) events.push_back(withNotes(1000, 100 << 10));
    conduit_.setEvents(events);
    const auto refused = client_->fetchEventsWithOptions({});
    ASSERT_FALSE(refused.has_value());
    EXPECT_TRUE(meansTooLarge(refused.error()));
    EXPECT_THAT(refused.error().description(), HasSubstr("limit"));
    EXPECT_TRUE(meansTooLarge(client_->storeEvents(events).value()));
    EXPECT_EQ(client_->fetchEventsWithOptions({{}, false, {}, 5})->size(), 5u);
}

TEST_F(BusListenerTest, StoresAHundredThousandEventsInOneCall) {
    KSEventArray events;
    for (std::uint32_t number = 0; number < 100000; ++number) {
        events.push_back(samples::event(number));
    }
    EXPECT_EQ(client_->storeEvents(events), std::nullopt);
    EXPECT_EQ(conduit_.events().size(), events.size());
    EXPECT_EQ(conduit_.events().back()->startDate(), events.back()->startDate());
}

TEST_F(BusListenerTest, AFloodWaitsInTheBusAndIsAnsweredInTheEnd) {
    constexpr std::size_t kCalls = 10000;
    conduit_.setEvents({samples::event(1), samples::event(2)});
    conduit_.hold();
    RawCaller flood;
    for (std::size_t call = 0; call < kCalls; ++call) {
        flood.send(flood.make(bus::kConduitInterface, "FetchEventsWithOptions",
                              [](sd_bus_message* message) {
                                  return sd_bus_message_append(message, "a{sv}a{sv}", 0, 0);
                              }),
                   true);
    }
    RawCaller::require(sd_bus_flush(flood.connection()), "flush");
    conduit_.waitForCalls(BusListener::kMostRequests);
    // All of the flood is with the bus by now; what the listener took is all that it will take.
    EXPECT_EQ(conduit_.calls().size(), BusListener::kMostRequests);
    conduit_.release();
    conduit_.waitForCalls(kCalls);
    EXPECT_TRUE(client_->status().has_value());
}

TEST_F(BusListenerTest, RepliesThatComeAfterTheEndAreDropped) {
    conduit_.hold();
    RawCaller caller;
    const auto clear = [](sd_bus_message* message) {
        return sd_bus_message_append(message, "a{sv}", 0);
    };
    caller.send(caller.make(bus::kConduitInterface, "ClearEvents", clear), true);
    conduit_.waitForCalls(1);
    listener_->invalidate();
    listener_->emitEventsChanged();
    conduit_.release();
    conduit_.settle();
    EXPECT_TRUE(meansNoDaemon(client_->collectEvents().value()));
}

TEST_F(BusListenerTest, ReadyRepliesLeaveBeforeTheEnd) {
    KSEventArray events;
    for (std::uint32_t number = 0; number < 20000; ++number) {
        events.push_back(samples::event(number));
    }
    conduit_.setEvents(events);
    std::thread ender([this] {
        conduit_.waitForCalls(1);
        conduit_.settle();
        listener_->invalidate();
    });
    const auto fetched = client_->fetchEventsWithOptions({});
    ender.join();
    ASSERT_TRUE(fetched.has_value()) << fetched.error().description();
    EXPECT_EQ(fetched->size(), events.size());
}

}  // namespace
}  // namespace keepsakes
