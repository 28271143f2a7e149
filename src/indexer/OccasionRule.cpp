// SPDX-License-Identifier: Apache-2.0
#include "indexer/OccasionRule.h"

#include <nettle/sha2.h>

#include <algorithm>
#include <limits>
#include <map>
#include <numeric>
#include <tuple>

#include "platform/PhotoAnalysis.h"

namespace keepsakes {

namespace {

/// How many spans before a time are looked at; only heaps of overlapping tracks need more.
constexpr std::size_t kMostSpansLookedAt = 256;

/// An occasion that further photos may join.
struct Open {
    std::size_t occasion;
    KSDate first;
    KSDate last;
    std::optional<GeoPoint> place;  ///< Of the last photo that has one.
};

bool reaches(const Open& open, KSDate time) {
    return time - open.last <= kLongestGap && time - open.first <= kLongestOccasion;
}

/// The open occasion that the photo joins; `open` is ordered by growth, the latest last.
std::vector<Open>::iterator joined(std::vector<Open>& open, const OccasionPhoto& photo) {
    auto best = open.end();
    double nearest = std::numeric_limits<double>::infinity();
    for (auto it = open.begin(); it != open.end(); ++it) {
        // No position on one side: time alone decides, but a known near place goes before it.
        const double metres = photo.position && it->place
                                  ? distanceBetween(*photo.position, *it->place)
                                  : kLongestDistance;
        if (metres <= kLongestDistance && metres <= nearest) {
            nearest = metres;
            best = it;
        }
    }
    return best;
}

bool earlier(const OccasionPhoto& a, const OccasionPhoto& b) {
    const auto place = [](const OccasionPhoto& photo) {
        return photo.position ? std::tuple(1, photo.position->latitude, photo.position->longitude)
                              : std::tuple(0, 0.0, 0.0);
    };
    return std::tuple(a.taken.seconds, place(a)) < std::tuple(b.taken.seconds, place(b));
}

/// Distinct entries, the most frequent first, then by their own order.
template <class T>
std::vector<T> byFrequency(const std::map<T, std::size_t>& counts) {
    std::vector<std::pair<T, std::size_t>> entries(counts.begin(), counts.end());
    std::ranges::stable_sort(entries, std::ranges::greater{}, &std::pair<T, std::size_t>::second);
    std::vector<T> values;
    values.reserve(entries.size());
    for (auto& entry : entries) values.push_back(std::move(entry.first));
    return values;
}

KSArray strings(const std::vector<std::string>& values) { return {values.begin(), values.end()}; }

}  // namespace

std::vector<OccasionMembers> formOccasions(std::span<const OccasionPhoto> photos) {
    std::vector<std::uint32_t> order(photos.size());
    std::iota(order.begin(), order.end(), 0u);
    std::ranges::stable_sort(order, [photos](std::uint32_t a, std::uint32_t b) {
        return earlier(photos[a], photos[b]);
    });
    std::vector<OccasionMembers> occasions;
    std::vector<Open> open;
    for (const auto index : order) {
        const auto& photo = photos[index];
        std::erase_if(open, [&photo](const Open& o) { return !reaches(o, photo.taken); });
        Open grown{};
        if (const auto found = joined(open, photo); found != open.end()) {
            grown = *found;
            open.erase(found);
        } else {
            if (open.size() == kMostOpenOccasions) open.erase(open.begin());
            grown = {.occasion = occasions.size(), .first = photo.taken, .last = {}, .place = {}};
            occasions.emplace_back();
        }
        occasions[grown.occasion].push_back(index);
        grown.last = photo.taken;
        if (photo.position) grown.place = photo.position;
        open.push_back(grown);
    }
    return occasions;
}

std::vector<std::optional<std::int64_t>> continuedOccasions(
    std::span<const OccasionPhoto> photos, std::span<const OccasionMembers> occasions) {
    // The occasion that holds the earliest photo left of each former one.
    std::map<std::int64_t, std::pair<KSDate, std::size_t>> heirs;
    for (std::size_t i = 0; i < occasions.size(); ++i) {
        for (const auto member : occasions[i]) {
            const auto& photo = photos[member];
            if (!photo.before) continue;
            const auto [heir, isFirst] = heirs.try_emplace(*photo.before, photo.taken, i);
            if (!isFirst && photo.taken < heir->second.first) heir->second = {photo.taken, i};
        }
    }
    std::vector<std::optional<std::int64_t>> continued(occasions.size());
    for (const auto& [former, heir] : heirs) {
        if (!continued[heir.second]) continued[heir.second] = former;
    }
    return continued;
}

TrackZones::TrackZones(std::vector<ZoneSpan> spans) : spans_(std::move(spans)) {
    const auto key = [](const ZoneSpan& zone) {
        return std::tuple(zone.span.start.seconds + zone.offsetSeconds, zone.span.end.seconds,
                          zone.offsetSeconds);
    };
    std::ranges::sort(spans_, {}, key);
    double latest = -std::numeric_limits<double>::infinity();
    for (const auto& zone : spans_) {
        latest = std::max(latest, zone.span.end.seconds + zone.offsetSeconds);
        latestEnd_.push_back(latest);
    }
}

std::optional<int> TrackZones::offsetAt(KSDate localTime) const {
    const auto after = std::ranges::upper_bound(
        spans_, localTime.seconds, {},
        [](const ZoneSpan& zone) { return zone.span.start.seconds + zone.offsetSeconds; });
    const ZoneSpan* shortest = nullptr;
    auto i = static_cast<std::size_t>(after - spans_.begin());
    for (std::size_t looked = 0; i > 0 && looked < kMostSpansLookedAt; ++looked) {
        --i;
        if (latestEnd_[i] < localTime.seconds) break;
        const auto& zone = spans_[i];
        if (zone.span.end.seconds + zone.offsetSeconds < localTime.seconds) continue;
        if (!shortest || zone.span.duration() < shortest->span.duration()) shortest = &zone;
    }
    return shortest ? std::optional(shortest->offsetSeconds) : std::nullopt;
}

KSDictionary occasionContent(std::span<const OccasionWords> photos) {
    std::map<std::string, std::size_t> inferences;
    std::map<std::string, std::size_t> holidays;
    std::map<std::string, std::size_t> persons;
    std::map<std::tuple<std::string, std::string, std::vector<std::string>>, std::size_t> events;
    for (const auto& photo : photos) {
        for (const auto& word : photo.inferences) ++inferences[word];
        for (const auto& name : photo.holidays) ++holidays[name];
        for (const auto& name : photo.persons) ++persons[name];
        for (const auto& e : photo.publicEvents) ++events[{e.name, e.venue, e.performers}];
    }
    KSArray personDictionaries;
    for (const auto& name : byFrequency(persons)) {
        personDictionaries.emplace_back(KSDictionary{
            {std::string(kKSKeyPersonLocalIdentifier), identifierOf("person\n" + name).string()},
            {std::string(kKSKeyPersonName), name}});
    }
    KSArray eventDictionaries;
    for (const auto& [name, venue, performers] : byFrequency(events)) {
        KSDictionary event{{std::string(kKSKeyName), name}};
        if (!performers.empty()) event.emplace(kKSKeyPerformers, strings(performers));
        if (!venue.empty()) event.emplace(kKSKeyVenue, venue);
        eventDictionaries.emplace_back(std::move(event));
    }
    return {{std::string(kKSKeyInferences), strings(byFrequency(inferences))},
            {std::string(kKSKeyHolidays), strings(byFrequency(holidays))},
            {std::string(kKSKeyPersons), std::move(personDictionaries)},
            {std::string(kKSKeyPublicEvents), std::move(eventDictionaries)}};
}

KSUUID identifierOf(std::string_view text) {
    sha256_ctx context{};
    sha256_init(&context);
    sha256_update(&context, text.size(), reinterpret_cast<const std::uint8_t*>(text.data()));
    KSUUID id;
    sha256_digest(&context, id.bytes.size(), id.bytes.data());
    // Version 8, "made by a rule of its own" (RFC 9562).
    id.bytes[6] = static_cast<std::uint8_t>((id.bytes[6] & 0x0f) | 0x80);
    id.bytes[8] = static_cast<std::uint8_t>((id.bytes[8] & 0x3f) | 0x80);
    return id;
}

}  // namespace keepsakes
