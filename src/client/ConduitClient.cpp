// SPDX-License-Identifier: Apache-2.0
#include "client/ConduitClient.h"

#include <fmt/format.h>

#include <array>
#include <cerrno>
#include <charconv>
#include <system_error>

#include "bus/BusHandles.h"
#include "wire/BusNames.h"
#include "wire/MessageDecoder.h"
#include "wire/MessageEncoder.h"

namespace keepsakes {

namespace {

constexpr std::uint64_t kMinutes = 60 * std::uint64_t{1000000};
constexpr std::uint64_t kAnswerTimeout = 10 * kMinutes;
constexpr std::uint64_t kHours = 60 * kMinutes;
constexpr std::uint64_t kWorkTimeout = 6 * kHours;

KSError busError(std::string_view name, std::string_view text) {
    auto error = KSError::make(kBusErrorDomain, 0, text);
    error.userInfo.emplace(kBusErrorNameKey, name);
    return error;
}

KSError busError(int result, std::string_view what) {
    return busError(result == -E2BIG ? bus::kLimitsExceeded : "",
                    fmt::format("{}: {}", what, std::generic_category().message(-result)));
}

KSError errorOf(const sd_bus_error& answered) {
    const std::string_view name = answered.name ? answered.name : "";
    const std::string_view text = answered.message ? answered.message : name;
    int code = 0;
    if (name.starts_with(bus::kErrorCodePrefix)) {
        const auto digits = name.substr(bus::kErrorCodePrefix.size());
        const auto* end = digits.data() + digits.size();
        if (std::from_chars(digits.data(), end, code).ptr == end) {
            return KSError::make(KSErrorDomain, code, text);
        }
    }
    return busError(name, text);
}

std::string_view nameOf(const KSError& error) {
    if (error.domain != kBusErrorDomain) return {};
    const auto* name = valueForKey(error.userInfo, kBusErrorNameKey).asString();
    return name ? std::string_view(*name) : std::string_view();
}

}  // namespace

bool meansNoDaemon(const KSError& error) {
    // The last one: the daemon was started and does not come up.
    constexpr std::array<std::string_view, 6> kNames{
        SD_BUS_ERROR_SERVICE_UNKNOWN, SD_BUS_ERROR_NAME_HAS_NO_OWNER,
        SD_BUS_ERROR_DISCONNECTED,    SD_BUS_ERROR_NO_SERVER,
        SD_BUS_ERROR_NO_REPLY,        "org.freedesktop.DBus.Error.TimedOut"};
    const auto name = nameOf(error);
    // What starts the daemon, the bus itself or systemd, says why it does not.
    return std::ranges::find(kNames, name) != kNames.end() ||
           name.starts_with("org.freedesktop.DBus.Error.Spawn.") ||
           name.starts_with("org.freedesktop.systemd1.");
}

bool meansTooLarge(const KSError& error) { return nameOf(error) == bus::kLimitsExceeded; }

struct ConduitClient::State {
    bus::Connection connection;
    bus::Slot progressSlot;
    ProgressHandler progress;

    using Write = std::function<void(MessageEncoder&)>;

    Result<bus::Message> make(const char* interface, const char* method) const {
        sd_bus_message* made = nullptr;
        const int result = sd_bus_message_new_method_call(connection.get(), &made, bus::kName,
                                                          bus::kPath, interface, method);
        if (result < 0) return std::unexpected(busError(result, method));
        return bus::Message(made);
    }

    static int onReply(sd_bus_message* message, void* place, sd_bus_error*) {
        static_cast<bus::Message*>(place)->reset(sd_bus_message_ref(message));
        return 1;
    }

    static int onProgress(sd_bus_message* message, void* state, sd_bus_error*) {
        const char* activity = nullptr;
        std::uint64_t done = 0;
        std::uint64_t total = 0;
        const auto& handler = static_cast<State*>(state)->progress;
        const int result = sd_bus_message_read(message, "stt", &activity, &done, &total);
        if (result >= 0 && handler) handler(activity, done, total);
        return 0;
    }

    /// Turns the connection until the reply is there, so that signals are seen meanwhile.
    Result<bus::Message> send(const bus::Message& call, std::uint64_t timeout) const {
        bus::Message reply;
        sd_bus_slot* opened = nullptr;
        int result = sd_bus_call_async(connection.get(), &opened, call.get(), &State::onReply,
                                       &reply, timeout);
        const bus::Slot slot(opened);
        while (result >= 0 && !reply) {
            result = sd_bus_process(connection.get(), nullptr);
            if (result == 0 && !reply) result = sd_bus_wait(connection.get(), UINT64_MAX);
            if (result == -EINTR) result = 0;
        }
        if (!reply) {
            return std::unexpected(busError(SD_BUS_ERROR_DISCONNECTED,
                                            fmt::format("the session bus is gone: {}",
                                                        std::generic_category().message(-result))));
        }
        if (const auto* error = sd_bus_message_get_error(reply.get())) {
            return std::unexpected(errorOf(*error));
        }
        return reply;
    }

    Result<bus::Message> call(const char* method, const Write& writeArgument,
                              std::uint64_t timeout) const {
        auto message = make(bus::kConduitInterface, method);
        if (!message) return message;
        MessageEncoder encoder(message->get());
        if (writeArgument) writeArgument(encoder);
        encoder.appendRecord(
            [](KeyedEncoder& out) { KSConduitContext::init().encodeWithCoder(out); });
        if (encoder.tooLarge()) return std::unexpected(busError(-E2BIG, method));
        if (!encoder.ok()) return std::unexpected(busError(encoder.status(), method));
        return send(*message, timeout);
    }

    OptionalError work(const char* method) const {
        const auto reply = call(method, nullptr, kWorkTimeout);
        return reply ? OptionalError() : OptionalError(reply.error());
    }

    template <class Record>
    Result<std::vector<std::shared_ptr<const Record>>> fetch(const char* method,
                                                             std::string_view what,
                                                             const Write& writeArgument) const {
        const auto reply = call(method, writeArgument, kAnswerTimeout);
        if (!reply) return std::unexpected(reply.error());
        std::vector<std::shared_ptr<const Record>> records;
        MessageDecoder decoder(reply->get(), what);
        const bool good = decoder.readRecords([&records](KeyedDecoder& in) {
            auto record = Record::initWithCoder(in);
            if (!record) return false;
            records.push_back(std::move(record));
            return true;
        });
        if (!good) return std::unexpected(busError("", "the reply: " + decoder.error()));
        return records;
    }
};

namespace {

void writeEvents(MessageEncoder& encoder, const KSEventArray& events) {
    encoder.beginRecords();
    for (const auto& event : events) {
        encoder.appendRecord([&event](KeyedEncoder& out) { event->encodeWithCoder(out); });
    }
    encoder.endRecords();
}

}  // namespace

ConduitClient::ConduitClient(std::unique_ptr<State> state) : state_(std::move(state)) {}
ConduitClient::~ConduitClient() = default;

ConduitClient::Result<std::unique_ptr<ConduitClient>> ConduitClient::connect() {
    sd_bus* opened = nullptr;
    if (const int result = sd_bus_open_user(&opened); result < 0) {
        return std::unexpected(
            busError(SD_BUS_ERROR_NO_SERVER,
                     fmt::format("no session bus: {}", std::generic_category().message(-result))));
    }
    auto state = std::make_unique<State>();
    state->connection.reset(opened);
    return std::unique_ptr<ConduitClient>(new ConduitClient(std::move(state)));
}

void ConduitClient::setProgressHandler(ProgressHandler handler) {
    state_->progress = std::move(handler);
    if (state_->progressSlot) return;
    sd_bus_slot* slot = nullptr;
    sd_bus_match_signal(state_->connection.get(), &slot, bus::kName, bus::kPath,
                        bus::kStatusInterface, "Progress", &State::onProgress, state_.get());
    state_->progressSlot.reset(slot);
}

OptionalError ConduitClient::storeEvents(const KSEventArray& events) {
    const auto reply = state_->call(
        "StoreEvents", [&events](MessageEncoder& out) { writeEvents(out, events); },
        kAnswerTimeout);
    return reply ? OptionalError() : OptionalError(reply.error());
}

ConduitClient::Result<KSEventArray> ConduitClient::fetchEventsWithOptions(
    const KSEventFetchOptions& options) {
    return state_->fetch<KSEvent>(
        "FetchEventsWithOptions", "event", [&options](MessageEncoder& encoder) {
            encoder.appendRecord([&](KeyedEncoder& out) { options.encodeWithCoder(out); });
        });
}

ConduitClient::Result<KSEventBundleArray> ConduitClient::fetchEventBundlesWithOptions(
    const KSEventBundleFetchOptions& options) {
    return state_->fetch<KSEventBundle>(
        "FetchEventBundlesWithOptions", "bundle", [&options](MessageEncoder& encoder) {
            encoder.appendRecord([&](KeyedEncoder& out) { options.encodeWithCoder(out); });
        });
}

ConduitClient::Result<KSEventArray> ConduitClient::analyzeTrendsInEvents(
    const KSEventArray& events) {
    return state_->fetch<KSEvent>(
        "AnalyzeTrendsInEvents", "event",
        [&events](MessageEncoder& encoder) { writeEvents(encoder, events); });
}

ConduitClient::Result<KSDictionary> ConduitClient::fetchPhotoAnalyticsMetrics() {
    const auto reply = state_->call("FetchPhotoAnalyticsMetrics", nullptr, kAnswerTimeout);
    if (!reply) return std::unexpected(reply.error());
    KSDictionary metrics;
    MessageDecoder decoder(reply->get(), "metrics");
    const bool good = decoder.readWhole(metrics);
    if (!good) return std::unexpected(busError("", "the reply: " + decoder.error()));
    return metrics;
}

OptionalError ConduitClient::clearEvents() { return state_->work("ClearEvents"); }
OptionalError ConduitClient::collectEvents() { return state_->work("CollectEvents"); }
OptionalError ConduitClient::bundleEvents() { return state_->work("BundleEvents"); }
OptionalError ConduitClient::purgeEvents() { return state_->work("PurgeEvents"); }
OptionalError ConduitClient::runAnalytics() { return state_->work("RunAnalytics"); }

namespace {

/// The reader for each property; what is missing keeps its default.
bool readProperty(std::string_view name, KeyedDecoder& in, DaemonStatus& status) {
    if (name == "Version") return in.readString(status.version);
    if (name == "DatabaseAvailable") return in.readBool(status.databaseAvailable);
    if (name == "LastCollection") return in.readNumber(status.lastCollection);
    if (name == "CollectEnabled") return in.readBool(status.collectEnabled);
    if (name == "ComputeEnabled") return in.readBool(status.computeEnabled);
    if (name == "PurgeEnabled") return in.readBool(status.purgeEnabled);
    if (name == "EventCount") return in.readUnsigned(status.eventCount);
    if (name == "BundleCount") return in.readUnsigned(status.bundleCount);
    if (name == "FilesIndexed") return in.readUnsigned(status.filesIndexed);
    if (name == "FilesRefused") return in.readUnsigned(status.filesRefused);
    if (name == "Problems") return in.readStrings(status.problems);
    return in.skip();
}

}  // namespace

ConduitClient::Result<DaemonStatus> ConduitClient::status() {
    const auto call = state_->make("org.freedesktop.DBus.Properties", "GetAll");
    if (!call) return std::unexpected(call.error());
    if (const int result = sd_bus_message_append(call->get(), "s", bus::kStatusInterface);
        result < 0) {
        return std::unexpected(busError(result, "GetAll"));
    }
    const auto reply = state_->send(*call, kAnswerTimeout);
    if (!reply) return std::unexpected(reply.error());
    DaemonStatus status;
    MessageDecoder decoder(reply->get(), "status");
    const bool good = decoder.readRecord([&status](std::string_view name, KeyedDecoder& in) {
        return readProperty(name, in, status);
    });
    if (!good) return std::unexpected(busError("", "the reply: " + decoder.error()));
    return status;
}

}  // namespace keepsakes
