// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <expected>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>

#include "core/KSError.h"
#include "core/ServiceLookup.h"
#include "core/WorkQueue.h"
#include "store/ManagedObjectContext.h"

namespace keepsakes {

class KSDispatcher;
struct PlatformServices;

/// Owns the daemon's one database: opens it on the first unlock notice or the first availability
/// check, and runs the stores' work on its single background context. Owned by the registry as
/// "PersistenceManager"; any thread may call it, except that work on the context must not wait for
/// more of it. A failed load is tried again at the next check.
class KSPersistenceManager final : public KSService {
  public:
    using AvailabilityHandler = std::function<void(bool available, OptionalError)>;
    /// Work on the open database.
    using Block = std::function<void(ManagedObjectContext&)>;

    /// Needs "TocsinNotifier". Does not open the database by itself.
    static std::shared_ptr<KSPersistenceManager> initWithUniverse(const ServiceLookup& universe);
    ~KSPersistenceManager() override;

    /// Answers at once when the database is open; otherwise opens it first. The handler is called
    /// before this returns.
    void checkAvailabilityWithCompletionHandler(const AvailabilityHandler& handler);
    bool isAvailable() const { return availability_ == Availability::available; }

    /// Runs the block on the background context, later or before returning. While the database is
    /// not open the block is not run; `performBlockAndWait` answers error 16 then.
    void performBlock(Block block);
    OptionalError performBlockAndWait(const Block& block);

    /// Hears of every saved change, on the context's queue. Set before the first change.
    void setChangeObserver(ManagedObjectContext::ChangeObserver observer);

    KSDate now() const;

    /// The last-collection file: written with the current time at the start of a collection.
    void persistCollectionDate() const;
    std::optional<KSDate> getCollectionDate() const;

  private:
    /// As in the states of the store: not yet loaded, loaded.
    enum class Availability : unsigned { notLoaded = 1, available = 2 };

    explicit KSPersistenceManager(const PlatformServices& platform);

    void registerForNotifications();
    void onLockStateChangeNotification(const KSDictionary& payload);
    OptionalError load();
    std::filesystem::path getPlistFile() const;

    const PlatformServices& platform_;
    std::shared_ptr<KSDispatcher> dispatcher_;
    std::atomic<Availability> availability_ = Availability::notLoaded;
    ManagedObjectContext::ChangeObserver changeObserver_;
    std::unique_ptr<ManagedObjectContext> managedObjectContext_;  // only on contextQueue_
    WorkQueue contextQueue_;
    WorkQueue queue_;
};

/// The error of an operation that found no database: code 16.
KSError databaseUnavailableError();

}  // namespace keepsakes
