// SPDX-License-Identifier: Apache-2.0
#include "wire/ConduitCalls.h"

#include <algorithm>
#include <array>

#include "wire/BusNames.h"
#include "wire/MessageDecoder.h"
#include "wire/MessageEncoder.h"

namespace keepsakes {

namespace {

using Protocol = KSKeepsakesConduitProtocol;

Admission admissionOf(const MessageDecoder& decoder) {
    if (decoder.error().empty()) return {.cost = decoder.cost()};
    return {decoder.tooCostly() ? bus::kLimitsExceeded : bus::kInvalidArgs, decoder.error()};
}

Admission readEvents(sd_bus_message* message, KSEventArray& events) {
    MessageDecoder decoder(message, "event");
    decoder.readRecords([&events](KeyedDecoder& in) {
        auto event = KSEvent::initWithCoder(in);
        if (!event) return false;
        events.push_back(std::move(event));
        return true;
    });
    return admissionOf(decoder);
}

/// Any record with a static `initWithCoder(decoder, record)`.
template <class Record>
Admission readArgument(sd_bus_message* message, std::string_view what, Record& record) {
    MessageDecoder decoder(message, what);
    Record::initWithCoder(decoder, record);
    return admissionOf(decoder);
}

Protocol::Reply plainReply(Respond respond) {
    return [respond = std::move(respond)](OptionalError error) {
        respond({.error = std::move(error)});
    };
}

template <class Array>
std::function<void(Array, OptionalError)> recordsReply(Respond respond) {
    // NOLINTNEXTLINE(performance-unnecessary-value-param): moved from; unseen inside a template
    return [respond = std::move(respond)](Array records, OptionalError error) {
        const auto count = records.size();
        const auto shared = std::make_shared<const Array>(std::move(records));
        respond({.error = std::move(error),
                 .record = [shared](std::size_t index,
                                    KeyedEncoder& out) { (*shared)[index]->encodeWithCoder(out); },
                 .count = count});
    };
}

Protocol::DictionaryReply dictionaryReply(Respond respond) {
    return [respond = std::move(respond)](KSDictionary metrics, OptionalError error) {
        const auto shared = std::make_shared<const KSDictionary>(std::move(metrics));
        respond({.error = std::move(error), .body = [shared](sd_bus_message* message) {
                     MessageEncoder encoder(message);
                     encoder.appendDictionary(*shared);
                     return encoder.status();
                 }});
    };
}

/// The methods that take nothing but the context.
template <auto Method>
Admission callPlain(sd_bus_message* message, Protocol& protocol, Respond respond) {
    KSConduitContext context;
    auto admission = readArgument(message, "context", context);
    if (!admission.refused())
        (protocol.*Method)(std::move(context), plainReply(std::move(respond)));
    return admission;
}

template <class Options, class Array, auto Method>
Admission callFetch(sd_bus_message* message, Protocol& protocol, Respond respond) {
    Options options;
    KSConduitContext context;
    auto admission = readArgument(message, "options", options);
    if (!admission.refused()) admission = readArgument(message, "context", context);
    if (!admission.refused()) {
        (protocol.*Method)(std::move(options), std::move(context),
                           recordsReply<Array>(std::move(respond)));
    }
    return admission;
}

template <auto Method, auto MakeReply>
Admission callWithEvents(sd_bus_message* message, Protocol& protocol, Respond respond) {
    KSEventArray events;
    KSConduitContext context;
    auto admission = readEvents(message, events);
    if (admission.refused()) return admission;
    const auto cost = admission.cost;
    admission = readArgument(message, "context", context);
    admission.cost += cost;
    if (!admission.refused()) {
        (protocol.*Method)(std::move(events), std::move(context), MakeReply(std::move(respond)));
    }
    return admission;
}

Admission callMetrics(sd_bus_message* message, Protocol& protocol, Respond respond) {
    KSConduitContext context;
    auto admission = readArgument(message, "context", context);
    if (!admission.refused()) {
        protocol.fetchPhotoAnalyticsMetrics(std::move(context),
                                            dictionaryReply(std::move(respond)));
    }
    return admission;
}

constexpr auto kMethods = std::to_array<ConduitMethod>({
    {"StoreEvents", "aa{sv}a{sv}", callWithEvents<&Protocol::storeEvents, plainReply>},
    {"FetchEventsWithOptions", "a{sv}a{sv}",
     callFetch<KSEventFetchOptions, KSEventArray, &Protocol::fetchEventsWithOptions>},
    {"FetchEventBundlesWithOptions", "a{sv}a{sv}",
     callFetch<KSEventBundleFetchOptions, KSEventBundleArray,
               &Protocol::fetchEventBundlesWithOptions>},
    {"ClearEvents", "a{sv}", callPlain<&Protocol::clearEvents>},
    {"CollectEvents", "a{sv}", callPlain<&Protocol::collectEvents>},
    {"BundleEvents", "a{sv}", callPlain<&Protocol::bundleEvents>},
    {"PurgeEvents", "a{sv}", callPlain<&Protocol::purgeEvents>},
    {"RunAnalytics", "a{sv}", callPlain<&Protocol::runAnalytics>},
    {"AnalyzeTrendsInEvents", "aa{sv}a{sv}",
     callWithEvents<&Protocol::analyzeTrendsInEvents, recordsReply<KSEventArray>>},
    {"FetchPhotoAnalyticsMetrics", "a{sv}", callMetrics},
});

}  // namespace

const ConduitMethod* findConduitMethod(std::string_view name) {
    const auto* found = std::ranges::find(kMethods, name, &ConduitMethod::name);
    return found == kMethods.end() ? nullptr : found;
}

}  // namespace keepsakes
