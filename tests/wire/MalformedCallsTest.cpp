// SPDX-License-Identifier: Apache-2.0
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>

#include "RawCaller.h"
#include "support/FakeConduit.h"
#include "support/SampleRecords.h"
#include "wire/BusListener.h"
#include "wire/MessageEncoder.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::StartsWith;

constexpr const char* kUUID = "01234567-89ab-cdef-0123-456789abcdef";
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

class MalformedCallsTest : public testing::Test {
  protected:
    MalformedCallsTest() { listener_->resume(conduit_, conduit_); }

    std::string conduitCall(const char* method, const RawCaller::Build& build) {
        return caller_.call(bus::kConduitInterface, method, build);
    }

    FakeConduit conduit_;
    std::unique_ptr<BusListener> listener_ = BusListener::claim().value();
    RawCaller caller_;
};

KSDictionary goodEvent() {
    return {{"eventIdentifier", kUUID}, {"startDate", 1.0}, {"endDate", 2.0},
            {"creationDate", 3.0},      {"provider", 4},    {"category", 1}};
}

/// Two events, the second with `value` under `key` (null: without the key), and no context.
RawCaller::Build eventWith(std::string key, KSValue value) {
    return [key = std::move(key), value = std::move(value)](sd_bus_message* message) {
        auto changed = goodEvent();
        changed.insert_or_assign(key, value);
        MessageEncoder encoder(message);
        encoder.beginRecords();
        encoder.appendDictionary(goodEvent());
        encoder.appendDictionary(changed);
        encoder.endRecords();
        encoder.appendDictionary({});
        return encoder.status();
    };
}

/// As `eventWith`, the value appended with the library's type string.
template <class... Values>
RawCaller::Build rawEventWith(const char* key, const char* type, Values... values) {
    return [=](sd_bus_message* message) {
        auto check = [](int result) { RawCaller::require(result, "append"); };
        check(sd_bus_message_open_container(message, 'a', "a{sv}"));
        check(sd_bus_message_open_container(message, 'a', "{sv}"));
        check(sd_bus_message_append(message, "{sv}", "eventIdentifier", "s", kUUID));
        for (const char* date : {"startDate", "endDate", "creationDate"}) {
            if (std::string_view(date) != key) {
                check(sd_bus_message_append(message, "{sv}", date, "d", 1.0));
            }
        }
        for (const char* code : {"provider", "category"}) {
            if (std::string_view(code) != key) {
                check(sd_bus_message_append(message, "{sv}", code, "t", std::uint64_t{2}));
            }
        }
        check(sd_bus_message_append(message, "{sv}", key, type, values...));
        check(sd_bus_message_close_container(message));
        check(sd_bus_message_close_container(message));
        return sd_bus_message_append(message, "a{sv}", 0);
    };
}

KSValue nested(std::size_t levels) {
    KSValue value = "deep";
    for (std::size_t level = 0; level < levels; ++level) {
        value = level % 2 ? KSValue(KSArray{value, 1}) : KSValue(KSDictionary{{"k", value}});
    }
    return value;
}

TEST_F(MalformedCallsTest, AreRefusedWithThePlaceNamedAndNotCarriedOut) {
    const struct {
        const char* what;
        const char* method;
        RawCaller::Build build;
        const char* text;
    } rows[] = {
        {"text as date", "StoreEvents", eventWith("startDate", "today"),
         "event 1: startDate: not a date"},
        {"no date", "StoreEvents", eventWith("endDate", {}), "event 1: endDate is missing"},
        {"date not a number", "StoreEvents", eventWith("creationDate", kNaN),
         "event 1: creationDate: not a finite date"},
        {"infinite date", "StoreEvents", eventWith("expirationDate", -HUGE_VAL),
         "event 1: expirationDate: not a finite date"},
        {"no provider", "StoreEvents", eventWith("provider", 0), "event 1: provider is 0"},
        {"no category", "StoreEvents", eventWith("category", 0), "event 1: category is 0"},
        {"negative", "StoreEvents", eventWith("category", -1), "event 1: category: negative"},
        {"fraction", "StoreEvents", eventWith("provider", 1.0),
         "event 1: provider: not an integer"},
        {"bad UUID", "StoreEvents", eventWith("eventIdentifier", "0123"),
         "event 1: eventIdentifier: not a UUID"},
        {"number as text", "StoreEvents", eventWith("placeName", 7),
         "event 1: placeName: not a string"},
        {"number as boolean", "StoreEvents", eventWith("itemIsShared", 1),
         "event 1: itemIsShared: not a boolean"},
        {"text as strings", "StoreEvents", eventWith("itemAccountHandles", "a"),
         "event 1: itemAccountHandles: not an array of strings"},
        {"nested place", "StoreEvents",
         eventWith("extendedAttributes",
                   KSDictionary{{"photoKeepsakePersons",
                                 KSArray{KSDictionary{}, KSDictionary{{"localIdentifier", 1}}}}}),
         "event 1: extendedAttributes.photoKeepsakePersons[1].localIdentifier: not a string"},
        {"JSON text that is none", "StoreEvents", eventWith("trends", KSValue::Bytes{'{', '1'}),
         "event 1: trends: not a JSON object"},
        {"one number as location", "StoreEvents", rawEventWith("location", "d", 1.0),
         "event 0: location: not a location"},
        {"text in location", "StoreEvents", rawEventWith("location", "(ds)", 1.0, "x"),
         "event 0: location: not a location"},
        {"too deep", "StoreEvents", eventWith("suggestedEvent", nested(17)), "nested too deeply"},
        {"bad interval", "FetchEventsWithOptions",
         [](sd_bus_message* message) {
             return sd_bus_message_append(message, "a{sv}a{sv}", 1, "dateInterval", "(dd)", kNaN,
                                          1.0, 0);
         },
         "options: dateInterval: not a finite date interval"},
        {"negative limit", "FetchEventBundlesWithOptions",
         [](sd_bus_message* message) {
             return sd_bus_message_append(message, "a{sv}a{sv}", 1, "limit", "d", -1.0, 0);
         },
         "options: limit: not a count"},
        {"bad context", "ClearEvents",
         [](sd_bus_message* message) {
             return sd_bus_message_append(message, "a{sv}", 1, "ProcessName", "i", 1);
         },
         "context: ProcessName: not a string"},
        {"bad context behind good events", "StoreEvents",
         [](sd_bus_message* message) {
             return sd_bus_message_append(message, "aa{sv}a{sv}", 0, 1, "ProcessName", "b", 1);
         },
         "context: ProcessName: not a string"},
        {"other arguments", "StoreEvents",
         [](sd_bus_message* message) { return sd_bus_message_append(message, "s", "x"); },
         "StoreEvents takes arguments of type \"aa{sv}a{sv}\", not \"s\""},
        {"no arguments", "CollectEvents", nullptr, "CollectEvents takes arguments of type"},
    };
    for (const auto& row : rows) {
        const auto answer = conduitCall(row.method, row.build);
        EXPECT_THAT(answer, StartsWith(std::string(bus::kInvalidArgs) + ": ")) << row.what;
        EXPECT_THAT(answer, HasSubstr(row.text)) << row.what;
    }
    EXPECT_THAT(conduitCall("Nonsense", nullptr), HasSubstr("UnknownMethod"));
    EXPECT_THAT(conduit_.calls(), IsEmpty());
}

TEST_F(MalformedCallsTest, UnusualButRightArgumentsAreTaken) {
    const std::string long_(10 << 20, 'x');
    const struct {
        const char* what;
        RawCaller::Build build;
    } rows[] = {
        {"a byte as code", rawEventWith("provider", "y", 3)},
        {"a signed integer as code", rawEventWith("category", "i", 5)},
        {"a whole number as date", rawEventWith("startDate", "n", -7)},
        {"an unsigned number as date", rawEventWith("endDate", "t", std::uint64_t{7})},
        {"whole numbers as location", rawEventWith("location", "(iu)", -48, 11u)},
        {"no text at all", rawEventWith("placeName", "s", "")},
        {"ten megabytes of text", eventWith("placeName", long_)},
        {"an unknown key", rawEventWith("colour", "a(sv)", 1, "x", "aai", 1, 2, 3, 4)},
        {"an unknown key that nests deep",
         [](sd_bus_message* message) {
             MessageEncoder encoder(message);
             encoder.beginRecords();
             encoder.endRecords();
             auto check = [](int result) { RawCaller::require(result, "append"); };
             check(sd_bus_message_open_container(message, 'a', "{sv}"));
             check(sd_bus_message_open_container(message, 'e', "sv"));
             check(sd_bus_message_append(message, "s", "deep"));
             constexpr int kLevels = 61;  // With what is around them, all that the bus allows.
             for (int level = 0; level < kLevels; ++level) {
                 check(sd_bus_message_open_container(message, 'v', "v"));
             }
             check(sd_bus_message_append(message, "v", "i", 1));
             for (int level = 0; level < kLevels + 2; ++level) {
                 check(sd_bus_message_close_container(message));
             }
             return 0;
         }},
    };
    std::size_t calls = 0;
    for (const auto& row : rows) {
        EXPECT_EQ(conduitCall("StoreEvents", row.build), "") << row.what;
        EXPECT_EQ(conduit_.calls().size(), ++calls) << row.what;
    }
    EXPECT_EQ(conduit_.events()[0]->provider(), KSEventProvider::foresight);
    EXPECT_EQ(conduit_.events()[4]->location, (KSLocation{-48, 11}));
    EXPECT_EQ(conduit_.events()[7]->placeName, long_);
}

TEST_F(MalformedCallsTest, ASenderWhoIsGoneIsServedAllTheSame) {
    RawCaller brief;
    brief.send(brief.make(bus::kConduitInterface, "StoreEvents", eventWith("placeName", "x")),
               true);
    sd_bus_flush(brief.connection());
    brief.disconnect();
    conduit_.waitForCalls(1);
    caller_.send(caller_.make(bus::kConduitInterface, "PurgeEvents",
                              [](sd_bus_message* message) {
                                  return sd_bus_message_append(message, "a{sv}", 0);
                              }),
                 false);
    conduit_.waitForCalls(2);
    EXPECT_EQ(caller_.call("org.freedesktop.DBus.Peer", "Ping", nullptr), "");
    EXPECT_THAT(conduit_.calls(), ElementsAre("storeEvents", "purgeEvents"));
    conduit_.settle();
    EXPECT_EQ(conduit_.events().size(), 2u);
}

TEST_F(MalformedCallsTest, TextThatIsNotUnicodeAndDeepValuesDoNotBreakAReply) {
    const auto event = samples::event();
    event->placeName = std::string("a\xff\xc3(\0b", 6);
    event->suggestedEvent = KSDictionary{{"top", nested(40)}};
    event->location = KSLocation{kNaN, 1};
    conduit_.setEvents({event});
    conduit_.setBundles({samples::bundle({event})});
    const auto noOptions = [](sd_bus_message* message) {
        return sd_bus_message_append(message, "a{sv}a{sv}", 0, 0);
    };
    EXPECT_EQ(conduitCall("FetchEventBundlesWithOptions", noOptions), "");
    EXPECT_EQ(conduitCall("FetchEventsWithOptions", noOptions), "");
    conduit_.failWith(KSError::make(KSErrorCode::waitTimedOut, "bad \xff text"));
    EXPECT_EQ(conduitCall("FetchEventsWithOptions", noOptions),
              "com.brindle.KSErrorDomain.Code15: bad \uFFFD text");
}

}  // namespace
}  // namespace keepsakes
