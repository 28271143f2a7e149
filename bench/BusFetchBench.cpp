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

#include "bus/BusHandles.h"
#include "client/ConduitClient.h"
#include "wire/BusListener.h"
#include "wire/MessageEncoder.h"

namespace keepsakes {
namespace {

constexpr std::uint32_t kEvents = 10000;
constexpr int kRounds = 15;
constexpr double kAllowedRatio = 3;

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

/// A message that holds the events as they are on the wire, ready to be sent again and again.
bus::Message ready(sd_bus* bus, const char* destination, const KSEventArray& events,
                   std::size_t& size) {
    sd_bus_message* made = nullptr;
    require(sd_bus_message_new_signal(bus, &made, "/raw", "x.Raw", "Raw"), "message");
    bus::Message message(made);
    MessageEncoder encoder(made);
    encoder.beginRecords();
    for (const auto& event : events) {
        encoder.appendRecord([&event](KeyedEncoder& out) { event->encodeWithCoder(out); });
    }
    encoder.endRecords();
    size = encoder.size();
    require(encoder.status(), "encode");
    require(sd_bus_message_set_destination(made, destination), "address");
    require(sd_bus_message_seal(made, 1, 0), "seal");
    return message;
}

/// One end of the raw messages: sends the bytes that it has ready, and takes those that come
/// without looking into them.
class RawEnd {
  public:
    RawEnd() {
        require(sd_bus_add_filter(bus_.get(), nullptr, &RawEnd::take, this), "filter");
        require(sd_bus_get_unique_name(bus_.get(), &name_), "name");
    }
    const char* name() const { return name_; }
    std::size_t prepare(const char* peer, const KSEventArray& events) {
        std::size_t size = 0;
        message_ = ready(bus_.get(), peer, events, size);
        return size;
    }
    void send() {
        require(sd_bus_send(bus_.get(), message_.get(), nullptr), "send");
        require(sd_bus_flush(bus_.get()), "flush");
    }
    /// Whether one came before `ending`.
    bool receive(const std::atomic<bool>& ending) {
        for (taken_ = false; !taken_ && !ending;) {
            const int result = sd_bus_process(bus_.get(), nullptr);
            require(result, "process");
            if (result == 0) sd_bus_wait(bus_.get(), 100000);
        }
        return taken_;
    }

  private:
    static int take(sd_bus_message* message, void* self, sd_bus_error*) {
        if (!sd_bus_message_is_signal(message, "x.Raw", "Raw")) return 0;
        static_cast<RawEnd*>(self)->taken_ = true;
        return 1;
    }

    bus::Connection bus_ = connect();
    const char* name_ = nullptr;
    bus::Message message_;
    bool taken_ = false;
};

/// The far end of the echo, on a thread of its own.
class EchoServer {
  public:
    EchoServer(RawEnd& near, const KSEventArray& events) {
        end_.prepare(near.name(), events);
        thread_ = std::thread([this] {
            while (end_.receive(ending_)) end_.send();
        });
    }
    ~EchoServer() {
        ending_ = true;
        thread_.join();
    }
    const char* name() const { return end_.name(); }

  private:
    RawEnd end_;
    std::atomic<bool> ending_ = false;
    std::thread thread_;
};

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
    Source source(events);
    const auto listener = BusListener::claim().value();
    listener->resume(source, source);
    const auto client = ConduitClient::connect().value();
    const double fetch = median([&client] {
        if (client->fetchEventsWithOptions({}).value().size() != kEvents) std::exit(1);
    });

    // The same body there and back, written once and read by nobody but the bus, which checks every
    // message that it passes on.
    RawEnd near;
    const EchoServer server(near, events);
    const auto size = near.prepare(server.name(), events);
    const std::atomic<bool> ending = false;
    const double echoed = median([&near, &ending] {
        near.send();
        near.receive(ending);
    });
    const double ratio = fetch / echoed;
    fmt::print("fetch 10,000 events over D-Bus ({:.1f} MB)|{:.1f} ms|{:.1f} ms|{:.2f}|{}\n",
               static_cast<double>(size) / 1e6, 1e3 * fetch, 1e3 * echoed, ratio, kAllowedRatio);
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
