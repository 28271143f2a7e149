// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <expected>
#include <functional>
#include <memory>
#include <string_view>

#include "core/KSError.h"
#include "wire/KSKeepsakesConduitProtocol.h"

namespace keepsakes {

/// Errors that the bus or the daemon's end of it answered; the user info holds the D-Bus name.
inline constexpr std::string_view kBusErrorDomain = "DBusErrorDomain";
inline constexpr std::string_view kBusErrorNameKey = "name";

/// Whether the error says that no daemon could be reached.
bool meansNoDaemon(const KSError& error);
/// Whether the error says that a reply or a call was larger than a message may be.
bool meansTooLarge(const KSError& error);

/// The calling side of the daemon's protocol: each operation sends one call and waits for its
/// reply. Errors of `KSErrorDomain` come back as the daemon made them, others in
/// `kBusErrorDomain`. An instance belongs to one thread.
class ConduitClient final {
  public:
    using ProgressHandler =
        std::function<void(std::string_view activity, std::uint64_t done, std::uint64_t total)>;
    template <class T>
    using Result = std::expected<T, KSError>;

    /// Connects to the owner's session bus; the daemon need not run yet.
    static Result<std::unique_ptr<ConduitClient>> connect();
    ~ConduitClient();

    /// Called with the daemon's progress while an operation waits.
    void setProgressHandler(ProgressHandler handler);

    /// One message; what is too large for it is refused here.
    OptionalError storeEvents(const KSEventArray& events);
    Result<KSEventArray> fetchEventsWithOptions(const KSEventFetchOptions& options);
    Result<KSEventBundleArray> fetchEventBundlesWithOptions(
        const KSEventBundleFetchOptions& options);
    Result<KSEventArray> analyzeTrendsInEvents(const KSEventArray& events);
    Result<KSDictionary> fetchPhotoAnalyticsMetrics();

    // These take as long as the work takes.
    OptionalError clearEvents();
    OptionalError collectEvents();
    OptionalError bundleEvents();
    OptionalError purgeEvents();
    OptionalError runAnalytics();

    Result<DaemonStatus> status();

  private:
    struct State;
    explicit ConduitClient(std::unique_ptr<State> state);

    std::unique_ptr<State> state_;
};

}  // namespace keepsakes
