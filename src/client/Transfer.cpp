// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <span>
#include <unordered_map>
#include <unordered_set>

#include "client/Commands.h"
#include "client/RecordJson.h"
#include "core/Files.h"
#include "core/Json.h"

namespace keepsakes {

namespace {

/// Events sent in one message; halved where even those are too large for one.
constexpr std::size_t kBatch = 5000;
constexpr std::string_view kKind = "kind";

OptionalError storeSome(ConduitClient& client, std::span<const KSEventPointer> events) {
    auto error = client.storeEvents(KSEventArray(events.begin(), events.end()));
    if (!error || !meansTooLarge(*error) || events.size() < 2) return error;
    const auto half = events.size() / 2;
    error = storeSome(client, events.first(half));
    return error ? error : storeSome(client, events.subspan(half));
}

/// Stores all in batches; how many were stored until an error came.
std::pair<std::size_t, OptionalError> storeAll(ConduitClient& client, const KSEventArray& events) {
    std::size_t stored = 0;
    while (stored < events.size()) {
        const auto batch = std::span(events).subspan(stored);
        const auto some = batch.first(std::min(kBatch, batch.size()));
        if (auto error = storeSome(client, some)) return {stored, std::move(error)};
        stored += some.size();
    }
    return {stored, std::nullopt};
}

int reportStored(const Console& console, std::size_t stored, std::size_t all,
                 const OptionalError& error, std::size_t bundles) {
    if (error) {
        fmt::print(stderr, "keepsakesctl: {} of {} events were stored\n", stored, all);
        return console.fail(*error);
    }
    if (console.json()) {
        return console.print(fmt::format("{{\"events\":{},\"bundles\":{}}}\n", stored, bundles));
    }
    auto text = fmt::format("stored {} events\n", stored);
    if (bundles > 0) {
        text += fmt::format(
            "of {} bundles their events were stored; the daemon bundles anew by itself\n", bundles);
    }
    return console.print(text);
}

const KSUUID& identifierOf(const KSEvent& event) { return event.eventIdentifier(); }
const KSUUID& identifierOf(const KSEventBundle& bundle) { return bundle.bundleIdentifier(); }

/// Fetches every record, in parts by time where all at once are too large for a message. A record
/// that spans several parts is taken once.
template <class Options, class Array>
class Everything {
  public:
    using Fetch = ConduitClient::Result<Array> (ConduitClient::*)(const Options&);

    Everything(ConduitClient& client, Fetch fetch) : client_(client), fetch_(fetch) {}

    std::expected<Array, KSError> run() {
        if (auto error = take({})) {
            if (!meansTooLarge(*error)) return std::unexpected(*error);
            error = takeParts();
            if (error) return std::unexpected(*error);
        }
        return std::move(found_);
    }

  private:
    /// Parts shorter than this are not divided further.
    static constexpr double kShortest = 1;

    OptionalError take(const std::optional<KSDateInterval>& window) {
        Options options;
        options.ascending = true;
        options.dateInterval = window;
        auto records = (client_.*fetch_)(options);
        if (!records) return records.error();
        for (auto& record : *records) {
            if (seen_.insert(identifierOf(*record)).second) found_.push_back(std::move(record));
        }
        return std::nullopt;
    }

    /// The records begin between the first one's start and the last one's.
    OptionalError takeParts() {
        KSDateInterval window;
        for (const bool ascending : {true, false}) {
            Options options;
            options.ascending = ascending;
            options.limit = 1;
            const auto edge = (client_.*fetch_)(options);
            if (!edge) return edge.error();
            if (edge->empty()) return std::nullopt;
            (ascending ? window.start : window.end) = startOf(*edge->front());
        }
        return divide({window.start - kShortest, window.end + kShortest});
    }

    OptionalError divide(const KSDateInterval& window) {
        const auto middle = window.start + window.duration() / 2;
        for (const auto& part :
             {KSDateInterval{window.start, middle}, KSDateInterval{middle, window.end}}) {
            auto error = take(part);
            if (error && meansTooLarge(*error) && part.duration() > kShortest) error = divide(part);
            if (error) return error;
        }
        return std::nullopt;
    }

    static KSDate startOf(const KSEvent& event) { return event.startDate(); }
    static KSDate startOf(const KSEventBundle& bundle) {
        return bundle.startDate.value_or(bundle.creationDate());
    }

    ConduitClient& client_;
    Fetch fetch_;
    Array found_;
    std::unordered_set<KSUUID> seen_;
};

template <class Array>
std::string lines(std::string_view kind, const Array& records) {
    std::string text;
    for (const auto& record : records) {
        auto form = jsonForm(*record);
        form.insert_or_assign(std::string(kKind), kind);
        text += jsonText(form).value_or("{}") + "\n";
    }
    return text;
}

/// What an export file holds.
struct Imported {
    KSEventArray events;
    std::size_t bundles = 0;
};

class ImportReader {
  public:
    /// Reads one line; the reason when it cannot be.
    std::optional<std::string> read(std::string_view line) {
        const auto parsed = parseJson(line);
        if (!parsed || !parsed->asDictionary()) return "not a JSON object";
        const auto* kind = valueForKey(*parsed->asDictionary(), kKind).asString();
        if (kind && *kind == "event") {
            auto event = eventFromJson(*parsed);
            if (!event) return event.error().description();
            take(std::move(*event), true);
            return std::nullopt;
        }
        if (!kind || *kind != "bundle") return "kind: neither \"event\" nor \"bundle\"";
        auto bundle = bundleFromJson(*parsed);
        if (!bundle) return bundle.error().description();
        ++result.bundles;
        for (const auto& event : (*bundle)->events) take(event, false);
        return std::nullopt;
    }

    Imported result;

  private:
    /// The event's own line wins over what a bundle holds of it.
    void take(KSEventPointer event, bool own) {
        const auto [place, isNew] =
            places_.try_emplace(event->eventIdentifier(), result.events.size());
        if (isNew) {
            result.events.push_back(std::move(event));
        } else if (own) {
            result.events[place->second] = std::move(event);
        }
    }

    std::unordered_map<KSUUID, std::size_t> places_;
};

}  // namespace

int storeFile(const Console& console, const std::string& file) {
    const auto text = readInput(file);
    if (!text) return console.fail(text.error());
    const auto events = eventsFromJson(*text);
    if (!events) return console.fail(events.error());
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    const auto [stored, error] = storeAll(**client, *events);
    return reportStored(console, stored, events->size(), error, 0);
}

int exportRecords(const Console& console, const std::string& file) {
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    const auto events = Everything<KSEventFetchOptions, KSEventArray>(
                            **client, &ConduitClient::fetchEventsWithOptions)
                            .run();
    if (!events) return console.fail(events.error());
    const auto bundles = Everything<KSEventBundleFetchOptions, KSEventBundleArray>(
                             **client, &ConduitClient::fetchEventBundlesWithOptions)
                             .run();
    if (!bundles) return console.fail(bundles.error());
    const auto text = lines("event", *events) + lines("bundle", *bundles);
    if (file.empty() || file == "-") return console.print(text);
    if (const auto error = replaceFile(file, text)) return console.fail(*error);
    if (console.json()) {
        return console.print(
            fmt::format("{{\"events\":{},\"bundles\":{}}}\n", events->size(), bundles->size()));
    }
    return console.print(
        fmt::format("exported {} events and {} bundles\n", events->size(), bundles->size()));
}

// Everything is read before anything is stored: a broken line costs nothing.
int importRecords(const Console& console, const std::string& file) {
    const auto text = readInput(file);
    if (!text) return console.fail(text.error());
    ImportReader reader;
    std::size_t number = 0;
    for (std::string_view rest = *text; !rest.empty();) {
        const auto end = std::min(rest.find('\n'), rest.size());
        const auto line = rest.substr(0, end);
        rest.remove_prefix(std::min(end + 1, rest.size()));
        ++number;
        if (line.find_first_not_of(" \t\r") == std::string_view::npos) continue;
        if (const auto reason = reader.read(line)) {
            return console.fail(KSError::make(KSErrorCode::invalidParameter,
                                              fmt::format("line {}: {}", number, *reason)));
        }
    }
    const auto client = console.connect();
    if (!client) return console.fail(client.error());
    const auto [stored, error] = storeAll(**client, reader.result.events);
    return reportStored(console, stored, reader.result.events.size(), error, reader.result.bundles);
}

}  // namespace keepsakes
