// SPDX-License-Identifier: Apache-2.0
#include "analytics/KSDaemonAnalyticsManager.h"

#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <system_error>
#include <utility>

#include "analytics/AnalyticsSubmission.h"
#include "analytics/KSMetric.h"
#include "core/Clock.h"
#include "core/Files.h"
#include "core/KSAssertion.h"
#include "core/KSDate.h"
#include "core/Log.h"
#include "core/PropertyList.h"
#include "core/ResultKeys.h"
#include "notify/KSDispatcher.h"
#include "notify/KSNotifier.h"
#include "platform/PlatformServices.h"

namespace keepsakes {

namespace {

constexpr std::string_view kEvent = "com.brindle.Keepsakes.Daemon";
constexpr const char* kHistoryFile = "daemonTriggerPersistence.plist";
constexpr std::int64_t kNoEarlierTime = -1;

constexpr std::string_view kLastLaunch = "lastLaunch";
constexpr std::string_view kLastTrigger = "lastTrigger";
constexpr std::string_view kLastSuccessfulTrigger = "lastSuccessfulTrigger";

constexpr auto kSuccessFlags = std::to_array<std::string_view>(
    {kStateDatabaseAvailable, "resultWorkoutsSuccess", "resultVisitsSuccess", "resultPhotosSuccess",
     "resultTopicsSuccess", "resultSharedSuccess", "resultSuggestedSuccess", "resultTripsSuccess",
     "resultMusicSuccess", "resultContactsSuccess"});

/// A kind of work, and the keys of its times; irregular as they are, files hold them.
struct Reason {
    std::string_view name;
    std::string_view lastTrigger;
    std::string_view lastSuccessfulTrigger;
};
constexpr auto kReasons = std::to_array<Reason>({
    {"fetch", "lastFetchTrigger", "lastSuccessfulFetchTrigger"},
    {"fetchBundle", "lastFetchBundleTrigger", "lastSuccessfulFetchBundleTrigger"},
    {"collect", "lastCollectTrigger", "lastCollectSuccessfulTrigger"},
    {"compute", "lastComputeTrigger", "lastComputeSuccessfulTrigger"},
    {"purge", "lastPurgeTrigger", "lastPurgeSuccessfulTrigger"},
    {"trends", "lastTrendsTrigger", "lastTrendsSuccessfulTrigger"},
});

std::optional<double> timeIn(const KSDictionary& history, std::string_view key) {
    const auto time = valueForKey(history, key).asNumber();
    return time && std::isfinite(*time) ? time : std::nullopt;
}

void set(KSDictionary& dictionary, std::string_view key, KSValue value) {
    dictionary.insert_or_assign(std::string(key), std::move(value));
}

/// What the payload lacks.
void complete(KSDictionary& payload) {
    for (const auto flag : kSuccessFlags) payload.try_emplace(std::string(flag), false);
    payload.try_emplace(std::string(kResultOverallSuccess),
                        KSDaemonAnalyticsManager::checkTriggerSuccess(payload));
    payload.try_emplace(std::string(kResultNumberOfEvents), 0);
    payload.try_emplace(std::string(kResultNumberOfBundleEvents), 0);
}

}  // namespace

KSDaemonAnalyticsManager::KSDaemonAnalyticsManager(const PlatformServices& platform)
    : platform_(platform),
      shortBins_(KSMetric::binsFromStart(0, 4 * kDay, kHour)),
      queue_("KSDaemonAnalyticsQueue") {}

KSDaemonAnalyticsManager::~KSDaemonAnalyticsManager() {
    for (const auto& dispatcher : dispatchers_) dispatcher->invalidate();
}

std::shared_ptr<KSDaemonAnalyticsManager> KSDaemonAnalyticsManager::initWithUniverse(
    const ServiceLookup& universe) {
    const Notifiers notifiers = {universe.service<KSNotifier>("TocsinNotifier"),
                                 universe.service<KSNotifier>("EventCollectionSchedulerNotifier"),
                                 universe.service<KSNotifier>("EventComputeSchedulerNotifier"),
                                 universe.service<KSNotifier>("EventPurgeSchedulerNotifier"),
                                 universe.service<KSNotifier>("DaemonClientNotifier")};
    constexpr std::array<std::string_view, 5> kNames = {
        "tocsinNotifier", "eventCollectionSchedulerNotifier", "eventComputeSchedulerNotifier",
        "eventPurgeSchedulerNotifier", "daemonClientNotifier"};
    for (std::size_t index = 0; index < notifiers.size(); ++index) {
        if (!assertParameter(notifiers[index] != nullptr, kNames[index], kUnit, __LINE__)) {
            return nullptr;
        }
    }
    std::shared_ptr<KSDaemonAnalyticsManager> manager(
        new KSDaemonAnalyticsManager(universe.platform()));
    manager->queue_.async([raw = manager.get()] { raw->recordLaunch(); });
    manager->registerHandlers(notifiers);
    return manager;
}

void KSDaemonAnalyticsManager::registerHandlers(const Notifiers& notifiers) {
    using Manager = KSDaemonAnalyticsManager;
    const auto& [tocsin, collection, compute, purge, client] = notifiers;
    listenTo(tocsin, {1, 2, 3, 4}, &Manager::onDeviceState);
    listenTo(collection, {2}, &Manager::onWorkFinished);
    listenTo(compute, {3, 5}, &Manager::onWorkFinished);
    listenTo(purge, {4}, &Manager::onWorkFinished);
    listenTo(client, {0, 1, 2, 3, 4, 5}, &Manager::onWorkFinished);
}

void KSDaemonAnalyticsManager::listenTo(
    std::shared_ptr<KSNotifier> notifier, std::initializer_list<std::int32_t> identifiers,
    void (KSDaemonAnalyticsManager::*handler)(std::int32_t, const KSDictionary&)) {
    auto dispatcher = KSDispatcher::initWithNotifier(std::move(notifier));
    for (const auto identifier : identifiers) {
        dispatcher->registerForNotification(
            identifier, [this, handler](std::int32_t sent, const KSValue& payload) {
                const auto* entries = payload.asDictionary();
                queue_.async([this, handler, sent, copy = entries ? *entries : KSDictionary()] {
                    (this->*handler)(sent, copy);
                });
            });
    }
    dispatchers_.push_back(std::move(dispatcher));
}

KSDaemonAnalyticsManager::DeviceStates KSDaemonAnalyticsManager::deviceStates() const {
    return {stateOnCharger_, stateUnlocked_, optInDNU_, optInIHA_};
}

void KSDaemonAnalyticsManager::recordLaunch() const {
    const auto file = getDaemonPlistFileURL();
    auto history = readPersistenceTable(file);
    set(history, kLastLaunch, platform_.clock->now().seconds);
    persistDaemonMetrics(file, history);
}

void KSDaemonAnalyticsManager::onDeviceState(std::int32_t identifier, const KSDictionary& payload) {
    const auto take = [&payload](std::atomic<bool>& state, std::string_view key) {
        if (const auto told = valueForKey(payload, key).asBool()) state = *told;
    };
    switch (identifier) {
        case 1:
            take(optInDNU_, "optInDNU");
            take(optInIHA_, "optInIHA");
            break;
        case 2:
            take(stateUnlocked_, "isUnlocked");  // as the notifier names it
            take(stateUnlocked_, "stateUnlocked");
            break;
        case 4:
            take(stateOnCharger_, "stateOnCharger");
            break;
        default:
            break;
    }
}

bool KSDaemonAnalyticsManager::checkTriggerSuccess(const KSDictionary& payload) {
    const auto told = valueForKey(payload, kResultOverallSuccess).asBool();
    return told.value_or(std::ranges::all_of(kSuccessFlags, [&payload](std::string_view flag) {
        return valueForKey(payload, flag).asBool().value_or(false);
    }));
}

std::uint64_t KSDaemonAnalyticsManager::calculateDeltaTime(std::optional<double> currentTime,
                                                           std::optional<double> lastTime,
                                                           const std::vector<double>& bins) {
    const bool good =
        assertParameter(currentTime.has_value(), "currentTime != nil", kUnit, __LINE__) &&
        assertParameter(lastTime.has_value(), "lastTime != nil", kUnit, __LINE__);
    return good ? KSMetric::binForNumber(*currentTime - *lastTime, bins) : 0;
}

void KSDaemonAnalyticsManager::onWorkFinished(std::int32_t reasonIndex,
                                              const KSDictionary& payload) {
    auto completed = payload;
    complete(completed);
    const auto file = getDaemonPlistFileURL();
    auto history = readPersistenceTable(file);
    addTriggerTimes(completed, history, reasonIndex);
    persistDaemonMetrics(file, history);
    sendDataToAnalyticsService(completed);
}

void KSDaemonAnalyticsManager::addTriggerTimes(KSDictionary& payload, KSDictionary& history,
                                               std::int32_t reasonIndex) const {
    const double now = platform_.clock->now().seconds;
    const bool success = checkTriggerSuccess(payload);
    const auto since = [&](std::string_view key) -> KSValue {
        const auto time = timeIn(history, key);
        if (!time) return kNoEarlierTime;
        return calculateDeltaTime(now, time, shortBins_);
    };
    set(payload, "triggerTimeSinceLastTrigger", since(kLastTrigger));
    set(history, kLastTrigger, now);
    if (success) {
        set(payload, "triggerTimeSinceLastSuccessfulTrigger", since(kLastSuccessfulTrigger));
        set(history, kLastSuccessfulTrigger, now);
    }
    set(payload, "triggerTimeSinceLastLaunch", since(kLastLaunch));
    if (reasonIndex < 0 || std::cmp_greater_equal(reasonIndex, kReasons.size())) return;
    const auto& reason = kReasons[static_cast<std::size_t>(reasonIndex)];
    set(payload, "triggerReason", reason.name);
    set(payload, "triggerTimeSinceLastSimilarTrigger", since(reason.lastTrigger));
    set(payload, "triggerTimeSinceLastSuccessfulSimilarTrigger",
        success ? since(reason.lastSuccessfulTrigger) : KSValue(kNoEarlierTime));
    if (success) set(history, reason.lastSuccessfulTrigger, now);
    set(history, reason.lastTrigger, now);
}

std::filesystem::path KSDaemonAnalyticsManager::getDaemonPlistFileURL() const {
    return platform_.cacheFolder / kHistoryFile;
}

KSDictionary KSDaemonAnalyticsManager::readPersistenceTable(
    const std::filesystem::path& file) const {
    auto table = readPropertyListFile(file);
    if (table) return std::move(*table);
    const auto& error = table.error();
    if (error.domain != kPosixErrorDomain || error.code != ENOENT) {
        logWarning(fmt::format("{}: begun anew: {}", file.string(), error.description()));
        std::error_code ignored;  // a new one takes its place all the same
        std::filesystem::remove(file, ignored);
    }
    return {};
}

void KSDaemonAnalyticsManager::persistDaemonMetrics(const std::filesystem::path& file,
                                                    const KSDictionary& data) const {
    auto error = makePrivateFolder(file.parent_path());
    if (!error) error = writePropertyListFile(file, data);
    if (error) logWarning(error->description());
}

void KSDaemonAnalyticsManager::sendDataToAnalyticsService(const KSDictionary& payload) const {
    submitAnalyticsEvent(*platform_.analytics, kEvent, payload);
}

}  // namespace keepsakes
