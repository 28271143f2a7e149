// SPDX-License-Identifier: Apache-2.0
#include "metrics/UsageMetrics.h"

#include <gmock/gmock.h>

#include <cmath>
#include <fstream>
#include <map>
#include <set>

#include "StoreFixture.h"
#include "bundle/BundleRules.h"
#include "bundle/KSEventBundler.h"
#include "core/Json.h"
#include "linux/AnalyticsLog.h"
#include "metrics/KSEventData.h"
#include "metrics/KSPromptMetrics.h"
#include "metrics/KSUserData.h"
#include "metrics/MetricValues.h"
#include "model/ValueCoding.h"
#include "sources/KSVitalsManager.h"
#include "support/SampleRecords.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr double kHour = 3600;

std::vector<std::string> ruleNames() {
    std::vector<std::string> names;
    for (const auto& rule : predicatesOfDesiredExperiences()) names.emplace_back(rule.name);
    return names;
}

/// What is neither 0 nor "no bin".
std::string textOf(const KSMetric& metric) {
    KSDictionary telling;
    for (const auto& [key, value] : metric.metrics) {
        if (value != KSValue(0) && value != KSValue(-1)) telling.emplace(key, value);
    }
    return KSValue(telling).description();
}

TEST(EventData, CountsByProviderAndCategoryAndTellsMediansAsBins) {
    FakeAnalytics analytics;
    const KSDate start{700000000};
    KSEventArray events;
    const auto add = [&](double lasts, double latency, KSEventProvider provider,
                         KSEventCategory category) {
        const auto number = static_cast<std::uint32_t>(events.size() + 1);
        const auto end = start + lasts;
        auto event = KSEvent::initWithEventIdentifier(testUUID(number), start, end, end + 9 * kHour,
                                                      provider, category);
        event->storedSourceCreationDate = event->creationDate() - latency;
        events.push_back(event);
    };
    add(10 * 60, kHour - 1, KSEventProvider::routine, KSEventCategory::visit);
    add(50 * 60, kHour, KSEventProvider::routine, KSEventCategory::visit);
    add(50 * 60, 1000 * kHour, KSEventProvider::routine, KSEventCategory::visit);
    add(99 * kHour, -5, KSEventProvider::photo, KSEventCategory::photoKeepsake);
    add(0, 0, KSEventProvider{77}, KSEventCategory{6});
    KSEventData data(analytics);
    EXPECT_FALSE(data.setEvents(events, {start, start + 24 * kHour}, start + 72 * kHour + 5));
    EXPECT_EQ(textOf(data),
              R"({"durationOther": 1, "durationPhotoKeepsake": 49, "durationVisit": 4, )"
              R"("eventsFromOther": 1, "eventsFromPhoto": 1, "eventsFromRoutine": 3, )"
              R"("latencyOther": 1, "latencyVisit": 2, "numberOfEvents": 5, )"
              R"("numberOfEventsOther": 1, "numberOfEventsPhotoKeepsake": 1, )"
              R"("numberOfEventsVisit": 3, "windowEnd": 48, "windowStart": 72})");
    EXPECT_EQ(data.metrics["latencyPhotoKeepsake"], KSValue(0)) << "before the source's own record";
    EXPECT_EQ(data.metrics["latencyWorkout"], KSValue(-1)) << "no events";
    EXPECT_FALSE(data.submitMetrics()) << "the keys are those that are declared";

    KSEventData none(analytics);
    EXPECT_FALSE(none.setEvents({}, {start, start}, start));
    EXPECT_EQ(textOf(none), "{}");
    EXPECT_FALSE(none.submitMetrics());
}

TEST(PromptMetrics, CountsWhatAStepMadeOfItsEvents) {
    FakeAnalytics analytics;
    KSEventArray events = {makeWorkout(1, 0, 7200, "Hiking"), makePhotos(2, 60, 120, {"baby"}),
                           makePhotos(3, 200, 300, {}), makeVisit(4, 20000, 21000, "Museum")};
    const auto bundler = KSEventBundler::initWithStartDate(KSDate{0}, KSDate{30000}, KSDate{30000});
    const auto clusters = bundler->calculateEventBundlesFromEvents(events);
    const auto& bundles = bundler->pruneEventBundles(clusters);
    KSPromptMetrics prompts(analytics, ruleNames());
    EXPECT_FALSE(prompts.setStep(7 * 24 * kHour, events, clusters, bundles));
    EXPECT_EQ(textOf(prompts),
              R"({"bundlesActiveBabyParent": 1, "bundlesBabyParent": 1, )"
              R"("bundlesCardioActivity": 1, "bundlesHealth": 2, "bundlesPhoto": 2, )"
              R"("clustersOf1": 1, "clustersOf3To5": 1, "clustersWithBundles": 1, )"
              R"("eventsInBundles": 2, "largestCluster": 3, "numberOfBundles": 3, )"
              R"("numberOfClusters": 2, "numberOfEvents": 4, "numberOfEventsPhotoKeepsake": 2, )"
              R"("numberOfEventsVisit": 1, "numberOfEventsWorkout": 1, "windowLength": 168})");
    EXPECT_FALSE(prompts.submitMetrics());
}

TEST(UserData, TellsTheAgeAsABucketAndTheSexAsAWord) {
    FakeAnalytics analytics;
    const struct {
        std::optional<int> years, code;
        std::string text;
    } rows[] = {
        {17, 1, R"({"ageBucket": 0, "biologicalSex": "female"})"},
        {18, 2, R"({"ageBucket": 1, "biologicalSex": "male"})"},
        {44, 0, R"({"ageBucket": 3, "biologicalSex": "not set"})"},
        {120, 4, R"({"ageBucket": 6, "biologicalSex": "not set"})"},
        {std::nullopt, std::nullopt, R"({"ageBucket": -1, "biologicalSex": "not set"})"},
    };
    for (const auto& row : rows) {
        KSUserData user(analytics);
        EXPECT_FALSE(user.setOwner(row.years, row.code));
        EXPECT_EQ(KSValue(user.metrics).description(), row.text);
        EXPECT_FALSE(user.submitMetrics());
    }
}

class Usage : public StoreFixture {
  protected:
    Usage() {
        universe->add("EventStore", store);
        universe->add("VitalsManager", KSVitalsManager::initWithUniverse(*universe));
        platform.health.born = DateComponents{1980, 5, 17};
        platform.health.sex = 1;
        platform.services.analytics = &sink;
    }

    /// Hands over the sample set as a bundling pass does.
    void submit() {
        const auto metrics = UsageMetrics::initWithUniverse(*universe, ruleNames());
        const KSDate end = events.back()->endDate() + 7200;
        const KSDate start = end - 28 * 24 * kHour;
        const auto bundler = KSEventBundler::initWithStartDate(start, end, end);
        const auto clusters = bundler->calculateEventBundlesFromEvents(events);
        metrics->submitMetricForEventBundle(end - start, events, clusters,
                                            bundler->pruneEventBundles(clusters));
        metrics->submitKSEventData(events, start, end, end);
        WorkerThreads::shared().settle();
        sink.flush();
    }

    /// Every event's fields that the sink wrote since the last call, by name.
    std::map<std::string, KSDictionary> takeWritten() {
        std::map<std::string, KSDictionary> written;
        std::ifstream in(file);
        for (std::string line; std::getline(in, line);) {
            const auto parsed = parseJson(line);
            const auto& root = *parsed->asDictionary();
            written.emplace(*valueForKey(root, "event").asString(),
                            *valueForKey(root, "fields").asDictionary());
        }
        std::filesystem::remove(file);
        return written;
    }

    /// An event of each category, among them each provider, with every detail there is.
    static KSEventArray sampleSet() {
        KSEventArray set;
        for (const auto category : metric::kCategories) {
            const auto number = static_cast<std::uint32_t>(category);
            auto archive = *archiveOf(*samples::fullEvent(number)).asDictionary();
            archive["category"] = number;
            archive["provider"] = 1 + number % 5;
            const KSValue changed(archive);
            ValueDecoder decoder(changed);
            set.push_back(KSEvent::initWithCoder(decoder));
        }
        return set;
    }

    /// Texts of more than three letters and numbers that are not small, as JSON would show them.
    static void collectTexts(const KSValue& value, std::set<std::string>& texts) {
        if (const auto* members = value.asDictionary()) {
            for (const auto& [key, member] : *members) collectTexts(member, texts);
        } else if (const auto* items = value.asArray()) {
            for (const auto& item : *items) collectTexts(item, texts);
        } else if (const auto text = jsonText(value).value_or(""); text.size() > 3) {
            texts.insert(text.starts_with('"') ? text.substr(1, text.size() - 2) : text);
        }
    }

    /// What in the fields of an event tells more than a count or a coarse value.
    std::vector<std::string> indiscretionsIn(const KSDictionary& fields) const {
        std::vector<std::string> found;
        KSArray values;  // keys are declared, and stand for kinds and rules
        for (const auto& [key, value] : fields) {
            values.push_back(value);
            const auto number = value.asInteger();
            const auto* word = value.asString();
            const bool isCoarse = number && std::abs(*number) < 1000;
            const bool isSex = key == "biologicalSex" && word && *word == "female";
            if (!isCoarse && !isSex) found.push_back(key);
        }
        const auto text = jsonText(values).value_or("");
        std::set<std::string> forbidden;
        for (const auto& event : events) collectTexts(archiveOf(*event), forbidden);
        for (const auto& one : forbidden) {
            if (text.find(one) != std::string::npos) found.push_back(one);
        }
        return found;
    }

    const std::filesystem::path file = platform.folder / "analytics.jsonl";
    AnalyticsLog sink{file, platform.clock};
    KSEventArray events = sampleSet();
};

TEST_F(Usage, NothingInTheSinkTellsAnIdentifierANameATimeOrAPlace) {
    submit();
    const auto written = takeWritten();
    std::vector<std::string> names;
    for (const auto& [name, fields] : written) {
        names.push_back(name);
        EXPECT_THAT(indiscretionsIn(fields), IsEmpty()) << name;
    }
    EXPECT_THAT(
        names, ElementsAre("com.brindle.Keepsakes.EventData", "com.brindle.Keepsakes.PromptMetrics",
                           "com.brindle.Keepsakes.UserData"));
    const auto& counts = written.at("com.brindle.Keepsakes.EventData");
    for (const auto category : metric::kCategories) {
        EXPECT_EQ(valueForKey(counts, metric::key("numberOfEvents", category)), KSValue(1));
    }
    const auto& event = *events[0];
    for (const KSDictionary& planted : {KSDictionary{{"place", *event.placeName}},
                                        {{"when", event.startDate().seconds}},
                                        {{"latitude", event.location->latitude}},
                                        {{"of", event.eventIdentifier()}}}) {
        EXPECT_EQ(indiscretionsIn(planted).size(), 2u) << "this check can fail";
    }
}

TEST_F(Usage, TellsWhatTheOwnerAllows) {
    platform.policy.healthData = false;
    submit();
    EXPECT_FALSE(takeWritten().contains("com.brindle.Keepsakes.UserData"));
    platform.policy.diagnostics = false;
    platform.policy.healthData = true;
    submit();
    EXPECT_THAT(takeWritten(), IsEmpty());
}

}  // namespace
}  // namespace keepsakes
