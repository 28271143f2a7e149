// SPDX-License-Identifier: Apache-2.0
// Property: a call whose arguments hold anything at all is refused in plain words and nothing of it
// carried out, or it is carried out once, and the events it brought are sent again as they came.
#include <sys/socket.h>

#include <algorithm>
#include <random>
#include <string>

#include "MessageForge.h"
#include "core/Text.h"
#include "model/ValueCoding.h"
#include "support/SampleRecords.h"
#include "wire/BusNames.h"
#include "wire/ConduitCalls.h"
#include "wire/MessageDecoder.h"

namespace {

using namespace keepsakes;

/// Where a call arrives.
class Arrivals final : public KSKeepsakesConduitProtocol {
  public:
    void storeEvents(KSEventArray brought, KSConduitContext, Reply) override {
        ++calls;
        events = std::move(brought);
    }
    void analyzeTrendsInEvents(KSEventArray brought, KSConduitContext, EventsReply) override {
        ++calls;
        events = std::move(brought);
    }
    void fetchEventsWithOptions(KSEventFetchOptions, KSConduitContext, EventsReply) override {
        ++calls;
    }
    void fetchEventBundlesWithOptions(KSEventBundleFetchOptions, KSConduitContext,
                                      BundlesReply) override {
        ++calls;
    }
    void clearEvents(KSConduitContext, Reply) override { ++calls; }
    void collectEvents(KSConduitContext, Reply) override { ++calls; }
    void bundleEvents(KSConduitContext, Reply) override { ++calls; }
    void purgeEvents(KSConduitContext, Reply) override { ++calls; }
    void runAnalytics(KSConduitContext, Reply) override { ++calls; }
    void fetchPhotoAnalyticsMetrics(KSConduitContext, DictionaryReply) override { ++calls; }

    int calls = 0;
    KSEventArray events;
};

/// Half a connection: messages are made for one, and these are never sent.
sd_bus* connection() {
    static const bus::Connection opened = [] {
        int sockets[2] = {};
        sd_bus* made = nullptr;
        check(::socketpair(AF_UNIX, SOCK_STREAM, 0, sockets) == 0, "a pair of sockets");
        check(sd_bus_new(&made) >= 0 && sd_bus_set_fd(made, sockets[0], sockets[0]) >= 0 &&
                  sd_bus_start(made) >= 0,
              "a connection");
        return bus::Connection(made);
    }();
    return opened.get();
}

bus::Message newCall(const ConduitMethod& method) {
    sd_bus_message* made = nullptr;
    check(sd_bus_message_new_method_call(connection(), &made, bus::kName, bus::kPath,
                                         bus::kConduitInterface, method.name.data()) >= 0,
          "a message");
    return bus::Message(made);
}

void seal(const bus::Message& message) {
    check(sd_bus_message_seal(message.get(), 1, 0) >= 0, "a message is sealed");
    check(sd_bus_message_rewind(message.get(), true) >= 0, "a message is rewound");
}

bool appendArguments(const ConduitMethod& method, sd_bus_message* message, Choices& choices) {
    MessageForge forge(message, choices);
    if (method.signature.starts_with("aa{sv}")) {
        forge.beginRecords();
        for (unsigned number = choices.of(3); number > 0; --number) {
            const auto event = samples::fullEvent(number);
            forge.appendRecord([&event](KeyedEncoder& out) { event->encodeWithCoder(out); });
        }
        forge.endRecords();
    } else if (method.name == "FetchEventsWithOptions") {
        const KSEventFetchOptions options{
            .dateInterval = {{{1}, {2}}}, .category = KSEventCategory::visit, .limit = 3};
        forge.appendRecord([&options](KeyedEncoder& out) { options.encodeWithCoder(out); });
    } else if (method.signature == "a{sv}a{sv}") {
        const KSEventBundleFetchOptions options{
            .dateInterval = {{{1}, {2}}}, .limit = 3, .filterBundle = true};
        forge.appendRecord([&options](KeyedEncoder& out) { options.encodeWithCoder(out); });
    }
    const auto context = KSConduitContext::init();
    forge.appendRecord([&context](KeyedEncoder& out) { context.encodeWithCoder(out); });
    return forge.ok();
}

std::string textOf(const KSEvent& event) {
    ValueEncoder encoder;
    event.encodeWithCoder(encoder);
    return KSValue(encoder.take()).description();
}

void checkSentAgain(const ConduitMethod& method, const KSEventArray& events) {
    const auto message = newCall(method);
    MessageEncoder encoder(message.get());
    encoder.beginRecords();
    for (const auto& event : events) {
        encoder.appendRecord([&event](KeyedEncoder& out) { event->encodeWithCoder(out); });
    }
    encoder.endRecords();
    check(encoder.ok(), "what was taken can be sent");
    seal(message);
    MessageDecoder decoder(message.get(), "event");
    std::size_t index = 0;
    decoder.readRecords([&](KeyedDecoder& in) {
        const auto again = KSEvent::initWithCoder(in);
        if (!again) return false;
        check(textOf(*again) == textOf(*events[index++]), "what is sent again is the same");
        return true;
    });
    check(decoder.error().empty() && index == events.size(), "what is sent can be taken");
}

}  // namespace

/// Begins with enough decisions for a call that goes wrong in a place or two.
extern "C" std::size_t LLVMFuzzerCustomMutator(std::uint8_t* data, std::size_t size,
                                               std::size_t most, unsigned seed) {
    std::string first(512, '\0');
    std::minstd_rand random(seed);
    std::ranges::generate(first, [&random] { return static_cast<char>(random() >> 8U); });
    return beginOrMutate(first, data, size, most);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static constexpr auto kNames =
        std::to_array<std::string_view>({"StoreEvents", "AnalyzeTrendsInEvents",
                                         "FetchEventsWithOptions", "FetchEventBundlesWithOptions"});
    Choices choices(data, size);
    const auto* method = findConduitMethod(kNames[choices.of(kNames.size())]);
    check(method != nullptr, "the method is there");
    const auto message = newCall(*method);
    if (!appendArguments(*method, message.get(), choices)) return 0;
    seal(message);

    Arrivals arrivals;
    const auto admission = method->call(message.get(), arrivals, [](const Answer&) {});
    if (admission.refused()) {
        check(arrivals.calls == 0, "nothing of what is refused is carried out");
        check(!admission.text.empty() && isPlainUtf8(admission.text), "a refusal has a reason");
        check(admission.text.size() < 10000, "a reason of bounded length");
        return 0;
    }
    check(arrivals.calls == 1, "what is taken is carried out once");
    checkSentAgain(*method, arrivals.events);
    return 0;
}
