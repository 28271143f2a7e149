// SPDX-License-Identifier: Apache-2.0
// Fetches 10,000 events over the session bus, decoded by the client, and beside it echoes a raw
// message of the same bytes over the same bus.

#include <fmt/format.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdlib>
#include <thread>
#include <vector>

#include "client/ConduitClient.h"
#include "wire/BusHandles.h"
#include "wire/BusListener.h"
#include "wire/MessageEncoder.h"

namespace keepsakes {
namespace {

constexpr std::uint32_t kEvents = 10000;
constexpr int kRounds = 15;
constexpr double kAllowedRatio = 3;
constexpr const char* kEchoPath = "/echo";

void require(int result, const char* what) {
    if (result >= 0) return;
    fmt::print(stderr, "{}: {}\n", what, result);
    std::exit(1);
}

/// As a collection leaves them: visits, workouts and played media by turns.
KSEventArray makeEvents() {
    KSEventArray events;
    for (std::uint32_t number = 0; number < kEvents; ++number) {
        const KSDate start{700000000.0 + 900.0 * number};
        const auto category = number % 3 == 0   ? KSEventCategory::visit
                              : number % 3 == 1 ? KSEventCategory::workout
                                                : KSEventCategory::mediaOnRepeat;
        auto event = KSEvent::initWithEventIdentifier(
            KSUUID::random(), start, start + 600, start + 700, KSEventProvider::routine, category);
        event->expirationDate = start + 2419200;
        if (category == KSEventCategory::mediaOnRepeat) {
            event->mediaTitle = fmt::format("A song with a title {}", number);
            event->mediaArtist = "Somebody";
            event->mediaAlbum = "An album of songs";
            event->mediaRepetitions = 12;
            event->mediaSumTimePlayed = 2400;
        } else {
            event->placeName = fmt::format("Some place {}", number);
            event->location = KSLocation{48.1 + 1e-5 * number, 11.5};
            event->workoutType = "hiking";
            if (number % 10 == 0)
                event->scoredTopics = KSDictionary{{"outdoors", 0.7}, {"sport", 0.3}};
        }
        events.push_back(std::move(event));
    }
    return events;
}

class Source final : public KSKeepsakesConduitProtocol, public StatusSource {
  public:
    explicit Source(KSEventArray events) : events_(std::move(events)) {}
    void storeEvents(KSEventArray, KSConduitContext, Reply reply) override { reply({}); }
    void fetchEventsWithOptions(KSEventFetchOptions, KSConduitContext, EventsReply reply) override {
        reply(events_, {});
    }
    void fetchEventBundlesWithOptions(KSEventBundleFetchOptions, KSConduitContext,
                                      BundlesReply reply) override {
        reply({}, {});
    }
    void clearEvents(KSConduitContext, Reply reply) override { reply({}); }
    void collectEvents(KSConduitContext, Reply reply) override { reply({}); }
    void bundleEvents(KSConduitContext, Reply reply) override { reply({}); }
    void purgeEvents(KSConduitContext, Reply reply) override { reply({}); }
    void runAnalytics(KSConduitContext, Reply reply) override { reply({}); }
    void analyzeTrendsInEvents(KSEventArray events, KSConduitContext, EventsReply reply) override {
        reply(std::move(events), {});
    }
    void fetchPhotoAnalyticsMetrics(KSConduitContext, DictionaryReply reply) override {
        reply({}, {});
    }
    void status(std::function<void(DaemonStatus)> reply) override { reply({}); }

  private:
    const KSEventArray events_;
};

bus::Connection connect() {
    sd_bus* opened = nullptr;
    require(sd_bus_open_user(&opened), "connect");
    return bus::Connection(opened);
}

int echo(sd_bus_message* call, void*, sd_bus_error*) {
    const void* bytes = nullptr;
    std::size_t size = 0;
    require(sd_bus_message_read_array(call, 'y', &bytes, &size), "read");
    sd_bus_message* reply = nullptr;
    require(sd_bus_message_new_method_return(call, &reply), "reply");
    const bus::Message owned(reply);
    require(sd_bus_message_append_array(reply, 'y', bytes, size), "append");
    return sd_bus_send(nullptr, reply, nullptr);
}

/// The other end of the raw messages, on a thread of its own.
class EchoServer {
  public:
    EchoServer() {
        require(sd_bus_add_object(bus_.get(), nullptr, kEchoPath, echo, nullptr), "export");
        const char* name = nullptr;
        require(sd_bus_get_unique_name(bus_.get(), &name), "name");
        name_ = name;
        thread_ = std::thread([this] {
            while (!ending_) {
                const int result = sd_bus_process(bus_.get(), nullptr);
                require(result, "process");
                if (result == 0) sd_bus_wait(bus_.get(), 100000);
            }
        });
    }
    ~EchoServer() {
        ending_ = true;
        thread_.join();
    }
    const std::string& name() const { return name_; }

  private:
    bus::Connection bus_ = connect();
    std::string name_;
    std::atomic<bool> ending_ = false;
    std::thread thread_;
};

std::size_t encodedSize(const KSEventArray& events) {
    const auto bus = connect();
    sd_bus_message* made = nullptr;
    require(sd_bus_message_new_signal(bus.get(), &made, "/x", "x.x", "X"), "message");
    const bus::Message message(made);
    MessageEncoder encoder(made);
    encoder.beginRecords();
    for (const auto& event : events) {
        encoder.appendRecord([&event](KeyedEncoder& out) { event->encodeWithCoder(out); });
    }
    encoder.endRecords();
    return encoder.size();
}

template <class Work>
double median(const Work& work) {
    std::vector<double> times;
    for (int round = 0; round < kRounds; ++round) {
        const auto start = std::chrono::steady_clock::now();
        work();
        const std::chrono::duration<double> taken = std::chrono::steady_clock::now() - start;
        times.push_back(taken.count());
    }
    std::ranges::nth_element(times, times.begin() + kRounds / 2);
    return times[kRounds / 2];
}

int run() {
    const auto events = makeEvents();
    const std::vector<std::uint8_t> raw(encodedSize(events), 'x');
    Source source(events);
    const auto listener = BusListener::claim().value();
    listener->resume(source, source);
    const auto client = ConduitClient::connect().value();
    const double fetch = median([&client] {
        if (client->fetchEventsWithOptions({}).value().size() != kEvents) std::exit(1);
    });

    const EchoServer server;
    const auto bus = connect();
    const double echoed = median([&] {
        sd_bus_message* call = nullptr;
        require(sd_bus_message_new_method_call(bus.get(), &call, server.name().c_str(), kEchoPath,
                                               "x.Echo", "Echo"),
                "call");
        const bus::Message owned(call);
        require(sd_bus_message_append_array(call, 'y', raw.data(), raw.size()), "append");
        sd_bus_message* reply = nullptr;
        require(sd_bus_call(bus.get(), call, 0, nullptr, &reply), "echo");
        const bus::Message answered(reply);
    });
    const double ratio = fetch / echoed;
    fmt::print("fetch 10,000 events over D-Bus ({:.1f} MB)|{:.1f} ms|{:.1f} ms|{:.2f}|{}\n",
               static_cast<double>(raw.size()) / 1e6, 1e3 * fetch, 1e3 * echoed, ratio,
               kAllowedRatio);
    return ratio <= kAllowedRatio ? 0 : 1;
}

}  // namespace
}  // namespace keepsakes

int main(int, char** argv) {
    // A bus of its own, so that nobody else's traffic is measured.
    if (!std::getenv("KEEPSAKES_BENCH_BUS")) {
        setenv("KEEPSAKES_BENCH_BUS", "1", 1);
        execlp("dbus-run-session", "dbus-run-session", "--", argv[0], nullptr);
        fmt::print(stderr, "dbus-run-session is missing\n");
        return 1;
    }
    return keepsakes::run();
}
