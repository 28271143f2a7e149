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
    constexpr int kNotifications = 20000;
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
    const double took = bench::bestMilliseconds(5, [&notifier, &payload] {
        for (int sent = 0; sent < kNotifications; ++sent) notifier->sendNotification(2, payload);
        notifier->queue().sync([] {});
    });
    if (heard != payload.size() * 5 * kListeners * kNotifications) return 1;
    bench::report("20,000 notifications to five listeners, 20 µs each", took,
                  kNotifications * kLimitMilliseconds, 1);
    for (const auto& dispatcher : dispatchers) dispatcher->invalidate();
}
