// SPDX-License-Identifier: Apache-2.0
// Sending a notification to five listeners, against the time that it may take.
#include <memory>
#include <vector>

#include "Bench.h"
#include "notify/KSDaemonSPINotifier.h"
#include "notify/KSDispatcher.h"

using namespace keepsakes;

int main() {
    constexpr int kListeners = 5;
    constexpr int kNotifications = 10000;
    constexpr int kRuns = 5;
    constexpr double kLimitMilliseconds = 0.020;

    const auto notifier = std::make_shared<KSDaemonSPINotifier>("bench");
    std::vector<std::shared_ptr<KSDispatcher>> dispatchers;
    std::size_t heard = 0;
    for (int listener = 0; listener < kListeners; ++listener) {
        dispatchers.push_back(KSDispatcher::initWithNotifier(notifier));
        dispatchers.back()->registerForNotification(2,
                                                    [&heard](std::int32_t, const KSValue& payload) {
                                                        heard += payload.asDictionary()->size();
                                                    });
    }
    // What a finished collection is announced with.
    KSDictionary payload{{"resultNumberOfEvents", 12},
                         {"resultOverallSuccess", true},
                         {"stateDatabaseAvailable", true},
                         {"triggerSource", "client"}};
    for (const auto* source : {"Workouts", "Visits", "Photos", "Topics", "Shared", "Suggested",
                               "Trips", "Music", "Contacts"}) {
        payload.emplace(std::string("result") + source + "Success", true);
    }
    const auto hear = [&notifier] { notifier->queue().sync([] {}); };
    const double inARow = bench::bestMilliseconds(kRuns, [&notifier, &payload, &hear] {
        for (int sent = 0; sent < kNotifications; ++sent) notifier->sendNotification(2, payload);
        hear();
    });
    // Here every notification also wakes a thread, and is waited for.
    const double oneByOne = bench::bestMilliseconds(kRuns, [&notifier, &payload, &hear] {
        for (int sent = 0; sent < kNotifications; ++sent) {
            notifier->sendNotification(2, payload);
            hear();
        }
    });
    if (heard != payload.size() * 2 * kRuns * kListeners * kNotifications) return 1;
    const double limit = kNotifications * kLimitMilliseconds;
    bench::report("10,000 notifications to five listeners in a row, 20 µs each", inARow, limit, 1);
    bench::note("the same one by one", oneByOne, limit);
    for (const auto& dispatcher : dispatchers) dispatcher->invalidate();
}
