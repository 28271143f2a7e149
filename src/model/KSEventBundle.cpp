// SPDX-License-Identifier: Apache-2.0
#include "model/KSEventBundle.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <unordered_set>

#include "core/KSAssertion.h"
#include "model/Description.h"
#include "model/KSExtensions.h"

namespace keepsakes {

namespace {

using Bundle = KSEventBundle;

void writeEvents(KeyedEncoder& out, std::string_view key, const Bundle& bundle) {
    out.writeRecords(key, bundle.events.size(), [&bundle](std::size_t index, KeyedEncoder& nested) {
        bundle.events[index]->encodeWithCoder(nested);
    });
}

bool readEvents(KeyedDecoder& in, Bundle& bundle) {
    bundle.events.clear();
    return in.readRecords([&bundle](KeyedDecoder& nested) {
        auto event = KSEvent::initWithCoder(nested);
        if (!event) return false;
        bundle.events.push_back(std::move(event));
        return true;
    });
}

/// In the archive's order, behind the identifier and the creation date.
constexpr auto kBundleFields = std::to_array<KeyedField<Bundle>>({
    coding::field<&Bundle::startDate>("startDate"),
    coding::field<&Bundle::endDate>("endDate"),
    coding::field<&Bundle::expirationDate>("expirationDate"),
    coding::field<&Bundle::source>("source"),
    {"events", writeEvents, readEvents},
    coding::field<&Bundle::filtered>("filtered"),
    coding::field<&Bundle::promptLanguage>("promptLanguage"),
});

}  // namespace

std::shared_ptr<KSEventBundle> KSEventBundle::initWithBundleIdentifier(
    std::optional<KSUUID> bundleIdentifier, std::optional<KSDate> creationDate) {
    const bool good =
        assertParameter(bundleIdentifier.has_value(), "bundleIdentifier", kUnit, __LINE__) &&
        assertParameter(creationDate.has_value(), "creationDate", kUnit, __LINE__);
    if (!good) return nullptr;
    return std::shared_ptr<KSEventBundle>(new KSEventBundle(*bundleIdentifier, *creationDate));
}

std::shared_ptr<KSEventBundle> KSEventBundle::initWithEventSet(KSEventArray events, bool filtered,
                                                               KSDate now) {
    auto bundle = initWithBundleIdentifier(KSUUID::random(), now);
    bundle->events = std::move(events);
    bundle->setPropertiesBasedOnEvents();
    bundle->filtered = filtered;
    return bundle;
}

void KSEventBundle::setPropertiesBasedOnEvents() {
    startDate = KSDate::distantFuture();
    endDate = KSDate::distantPast();
    expirationDate = KSDate::distantPast();
    for (const auto& event : events) {
        startDate->seconds = std::min(startDate->seconds, event->startDate().seconds);
        endDate->seconds = std::max(endDate->seconds, event->endDate().seconds);
        if (event->expirationDate) {
            expirationDate->seconds =
                std::max(expirationDate->seconds, event->expirationDate->seconds);
        }
        const auto provider = static_cast<std::uint64_t>(event->provider());
        if (provider >= 1 && provider <= 4) source |= 1u << (provider - 1);
    }
}

bool KSEventBundle::containTheSameEventSet(const KSEventBundle& other) const {
    return std::ranges::equal(KSExtensions::sortKSEventArrayByStartDate(events),
                              KSExtensions::sortKSEventArrayByStartDate(other.events),
                              [](const auto& a, const auto& b) { return a->isEqual(*b); });
}

bool KSEventBundle::shareEvents(const KSEventBundle& other) const {
    std::unordered_set<KSUUID> own;
    for (const auto& event : events) own.insert(event->eventIdentifier());
    return std::ranges::any_of(
        other.events, [&own](const auto& event) { return own.contains(event->eventIdentifier()); });
}

std::string KSEventBundle::description() const {
    return fmt::format(
        "<KSEventBundle bundleIdentifier, {}, startDate, {}, endDate, {}, creationDate, {}, "
        "source, {}, expirationDate, {}, filtered, {}, promptLanguage, {} , events, {},>",
        bundleIdentifier_.string(), describe(KSEvent::FormatDate(startDate)),
        describe(KSEvent::FormatDate(endDate)), describe(KSEvent::FormatDate(creationDate_)),
        source, describe(KSEvent::FormatDate(expirationDate)), filtered ? "Yes" : "No",
        describe(promptLanguage), describe(events));
}

void KSEventBundle::encodeWithCoder(KeyedEncoder& encoder) const {
    encoder.writeUUID("bundleIdentifier", bundleIdentifier_);
    encoder.writeDate("creationDate", creationDate_);
    encodeFields<Bundle>(encoder, *this, kBundleFields);
}

std::shared_ptr<KSEventBundle> KSEventBundle::initWithCoder(KeyedDecoder& decoder) {
    static const KeyedFieldIndex<Bundle> index{std::span<const KeyedField<Bundle>>(kBundleFields)};
    std::optional<KSUUID> identifier;
    std::optional<KSDate> created;
    std::shared_ptr<KSEventBundle> bundle(new KSEventBundle({}, {}));
    const bool good = decoder.readRecord([&](std::string_view key, KeyedDecoder& in) {
        if (key == "bundleIdentifier") return coding::read(in, identifier);
        if (key == "creationDate") return coding::read(in, created);
        return index.read(key, in, *bundle);
    });
    if (!good) return nullptr;
    if (!identifier || !created) {
        decoder.fail(identifier ? "creationDate is missing" : "bundleIdentifier is missing");
        return nullptr;
    }
    bundle->bundleIdentifier_ = *identifier;
    bundle->creationDate_ = *created;
    return bundle;
}

}  // namespace keepsakes
