// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSEventBundleStore.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include <utility>

#include "bundle/KSEventBundleMO.h"
#include "core/KSAssertion.h"
#include "core/ResultKeys.h"
#include "store/KSPersistenceManager.h"

namespace keepsakes {

namespace {

constexpr ManagedObjectContext::Changes kTouchesBundles{.events = false, .bundles = true};

KSDictionary countResult(std::size_t count) {
    return {{std::string(kResultNumberOfBundleEvents), count}};
}

std::string selectText(const KSEventBundleFetchOptions& options) {
    std::string conditions;
    if (options.filterBundle) conditions += "filtered = 1";
    if (options.dateInterval) {
        conditions += conditions.empty() ? "" : " AND ";
        conditions += "startDate <= ? AND endDate >= ?";
    }
    return fmt::format("SELECT {} FROM KSEventBundleMO {}{} ORDER BY startDate {}{}",
                       KSEventBundleMO::columnNames(), conditions.empty() ? "" : "WHERE ",
                       conditions, options.ascending ? "ASC" : "DESC",
                       options.limit ? " LIMIT ?" : "");
}

KSEventBundleArray fetchBundles(const KSEventBundleFetchOptions& options,
                                ManagedObjectContext& context) {
    auto& select = context.statement(selectText(options));
    int index = 0;
    if (options.dateInterval) {
        select.bind(++index, options.dateInterval->end.seconds);
        select.bind(++index, options.dateInterval->start.seconds);
    }
    if (options.limit) select.bind(++index, rowLimit(*options.limit));
    KSEventBundleArray bundles;
    while (select.executeStep()) {
        auto stored = KSEventBundleMO::initWithEventBundleMO(select);
        if (!stored.bundle) continue;
        stored.bundle->events = KSEventBundleMO::eventsOf(stored.row, context);
        bundles.push_back(std::move(stored.bundle));
    }
    return bundles;
}

}  // namespace

KSEventBundleStore::KSEventBundleStore(std::shared_ptr<KSPersistenceManager> persistenceManager)
    : persistenceManager_(std::move(persistenceManager)) {}

std::shared_ptr<KSEventBundleStore> KSEventBundleStore::initWithUniverse(
    const ServiceLookup& universe) {
    auto manager = universe.service<KSPersistenceManager>("PersistenceManager");
    if (!assertParameter(manager != nullptr, "persistenceManager", "KSEventBundleStore",
                         __LINE__)) {
        return nullptr;
    }
    return std::shared_ptr<KSEventBundleStore>(new KSEventBundleStore(std::move(manager)));
}

void KSEventBundleStore::storeEventBundles(const KSEventBundleArray& bundles,
                                           const ResultHandler& handler) {
    if (bundles.empty()) {
        if (handler) handler(std::nullopt, countResult(0));
        return;
    }
    OptionalError failed;
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        failed = context.save(kTouchesBundles, [&] {
            for (const auto& bundle : bundles) {
                if (!bundle || bundle->events.empty()) continue;
                KSEventBundleMO::managedObjectWithEventBundle(*bundle, context);
            }
        });
        if (handler) handler(failed, countResult(bundles.size()));
    });
    if (error && handler) handler(error, {});
}

void KSEventBundleStore::removeEventBundles(const KSEventBundleArray& bundles,
                                            const ResultHandler& handler) {
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        const auto failed = context.save(kTouchesBundles, [&] {
            for (const auto& bundle : bundles) {
                auto& statement =
                    context.statement("DELETE FROM KSEventBundleMO WHERE bundleIdentifier = ?");
                const auto& bytes = bundle->bundleIdentifier().bytes;
                statement.bind(1, bytes.data(), static_cast<int>(bytes.size()));
                statement.exec();
            }
        });
        handler(failed, {});
    });
    if (error) handler(error, {});
}

void KSEventBundleStore::purgeExpiredEventBundles(const ResultHandler& handler) {
    const KSDate now = persistenceManager_->now();
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        std::size_t removed = 0;
        const auto failed = context.save(kTouchesBundles, [&] {
            auto& statement =
                context.statement("DELETE FROM KSEventBundleMO WHERE expirationDate < ?");
            statement.bind(1, now.seconds);
            removed = static_cast<std::size_t>(statement.exec());
        });
        handler(failed, failed ? KSDictionary() : countResult(removed));
    });
    if (error) handler(error, {});
}

void KSEventBundleStore::fetchEventBundleWithOptions(const KSEventBundleFetchOptions& options,
                                                     const BundlesHandler& handler) {
    const auto error = persistenceManager_->performBlockAndWait([&](ManagedObjectContext& context) {
        KSEventBundleArray bundles;
        const auto failed = context.perform([&] { bundles = fetchBundles(options, context); });
        if (failed) bundles.clear();
        handler(std::move(bundles), failed);
    });
    if (error) handler({}, error);
}

}  // namespace keepsakes
