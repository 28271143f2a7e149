// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSEventBundler.h"

#include <fmt/format.h>

#include <algorithm>

#include "bundle/BundleRules.h"
#include "bundle/KSGraph.h"
#include "core/KSAssertion.h"
#include "core/Log.h"

namespace keepsakes {

namespace {

/// Widens each event on both sides before events are compared.
constexpr double kMarginSeconds = 0;
constexpr double kOverlapAbove = 0;

bool mayOverlap(const KSEvent& event) {
    switch (event.category()) {
        case KSEventCategory::topic:
        case KSEventCategory::socialEvent:
        case KSEventCategory::linkshelf:
        case KSEventCategory::significantContact:
            return false;
        default:
            break;
    }
    return event.provider() != KSEventProvider::postAnalytics && !event.isHomeWorkVisit();
}

struct Span {
    double start;
    double end;
    int index;
};

/// Spans that can overlap anything, by start.
std::vector<Span> sortedSpans(const KSEventArray& events) {
    std::vector<Span> spans;
    spans.reserve(events.size());
    for (std::size_t index = 0; index < events.size(); ++index) {
        const auto& event = *events[index];
        if (!mayOverlap(event)) continue;
        const double start = event.startDate().seconds - kMarginSeconds;
        const double end = event.endDate().seconds + kMarginSeconds;
        if (end - start > kOverlapAbove) spans.push_back({start, end, static_cast<int>(index)});
    }
    std::ranges::sort(spans, {}, &Span::start);
    return spans;
}

/// An edge from each span to the longest-reaching one before it that it overlaps. Spans sorted by
/// start overlap an earlier one exactly when they overlap that one, so that the components are
/// those of all overlapping pairs.
std::vector<KSGraph::Edge> edgesBetween(const std::vector<Span>& spans) {
    std::vector<KSGraph::Edge> edges;
    const Span* furthest = nullptr;
    for (const auto& span : spans) {
        if (furthest && std::min(furthest->end, span.end) - span.start > kOverlapAbove) {
            edges.emplace_back(furthest->index, span.index);
        }
        if (!furthest || span.end > furthest->end) furthest = &span;
    }
    return edges;
}

void logClusters(const KSEventBundler::Clusters& clusters) {
    for (const auto& [label, events] : clusters) {
        for (const auto& event : events) {
            logDebug(fmt::format("cluster {}: {}", label, event->description()));
        }
    }
}

/// The events that a rule takes from a cluster; none unless each predicate matches one.
KSEventArray eventsMatching(const BundleRule& rule, const KSEventArray& cluster) {
    std::vector<bool> taken(cluster.size());
    for (const auto& predicate : rule.predicates) {
        bool matched = false;
        for (std::size_t index = 0; index < cluster.size(); ++index) {
            if (!predicate(*cluster[index])) continue;
            taken[index] = true;
            matched = true;
        }
        if (!matched) return {};
    }
    KSEventArray events;
    for (std::size_t index = 0; index < cluster.size(); ++index) {
        if (taken[index]) events.push_back(cluster[index]);
    }
    return events;
}

}  // namespace

KSEventBundler::KSEventBundler(KSDate startDate, KSDate endDate, KSDate now)
    : startDate_(startDate), endDate_(endDate), now_(now) {}

std::unique_ptr<KSEventBundler> KSEventBundler::initWithStartDate(std::optional<KSDate> startDate,
                                                                  std::optional<KSDate> endDate,
                                                                  KSDate now) {
    const bool good = assertParameter(startDate.has_value(), "startDate", kUnit, __LINE__) &&
                      assertParameter(endDate.has_value(), "endDate", kUnit, __LINE__);
    if (!good) return nullptr;
    return std::unique_ptr<KSEventBundler>(new KSEventBundler(*startDate, *endDate, now));
}

std::function<bool(const KSEvent&)> KSEventBundler::predicateForBasicFilteringOfEvents() {
    return [](const KSEvent& event) { return event.category() != KSEventCategory::unknown; };
}

KSEventBundler::Clusters KSEventBundler::calculateEventBundlesFromEvents(
    KSEventArray& events) const {
    const auto keep = predicateForBasicFilteringOfEvents();
    std::erase_if(events, [&keep](const auto& event) { return !keep(*event); });
    Clusters clusters;
    if (events.empty()) return clusters;

    auto graph = KSGraph::initWithNumVertices(static_cast<unsigned>(events.size()),
                                              edgesBetween(sortedSpans(events)));
    const auto& membership =
        graph->calculateConnectedComponentWithGraphTraversal(KSGraph::kBreadthFirst);
    if (membership.size() != events.size()) {
        assertionFailed(fmt::format("The events and membership arrays have to be of the same size. "
                                    "(in {}:{})",
                                    kUnit, __LINE__),
                        kUnit, __LINE__);
        return clusters;
    }
    for (std::size_t index = 0; index < events.size(); ++index) {
        clusters[membership[index]].push_back(events[index]);
    }
    if (logsDebug()) {
        logDebug(fmt::format("{} events between {} and {} are {} clusters", events.size(),
                             formatISO8601(startDate_), formatISO8601(endDate_), clusters.size()));
        logClusters(clusters);
    }
    return clusters;
}

const KSEventBundler::Bundles& KSEventBundler::pruneEventBundles(const Clusters& clusters) {
    const auto rules = predicatesOfDesiredExperiences();
    for (const auto& [label, cluster] : clusters) {
        for (const auto& rule : rules) {
            auto matching = eventsMatching(rule, cluster);
            if (matching.empty()) continue;
            auto bundle = KSEventBundle::initWithEventSet(std::move(matching), true, now_);
            bundle->bundleType = rule.name;
            eventBundleDict_.emplace(++counter_, std::move(bundle));
        }
    }
    return eventBundleDict_;
}

}  // namespace keepsakes
