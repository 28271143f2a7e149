// SPDX-License-Identifier: Apache-2.0
#include "linux/MediaWatcher.h"

#include <fmt/format.h>
#include <pthread.h>
#include <sys/epoll.h>
#include <sys/eventfd.h>
#include <systemd/sd-event.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>
#include <exception>
#include <map>
#include <set>
#include <string>
#include <string_view>
#include <system_error>
#include <thread>
#include <utility>

#include "bus/BusHandles.h"
#include "core/Log.h"
#include "linux/Guarded.h"
#include "linux/PlayerProperties.h"

namespace keepsakes {

namespace {

struct EndEvents {
    void operator()(sd_event* event) const { sd_event_unref(event); }
    void operator()(sd_event_source* source) const { sd_event_source_disable_unref(source); }
};
using OwnedEvent = std::unique_ptr<sd_event, EndEvents>;
using OwnedEventSource = std::unique_ptr<sd_event_source, EndEvents>;

constexpr const char* kBus = "org.freedesktop.DBus";
constexpr const char* kBusPath = "/org/freedesktop/DBus";
constexpr const char* kProperties = "org.freedesktop.DBus.Properties";
constexpr const char* kPlayerPath = "/org/mpris/MediaPlayer2";
constexpr const char* kRootInterface = "org.mpris.MediaPlayer2";
constexpr const char* kPlayerInterface = "org.mpris.MediaPlayer2.Player";
constexpr std::string_view kNamePrefix = "org.mpris.MediaPlayer2.";
/// A proxy that repeats what the other players say.
constexpr std::string_view kProxy = "org.mpris.MediaPlayer2.playerctld";

KSError busError(std::string_view what, int result) {
    return KSError::make(
        kPosixErrorDomain, -result,
        fmt::format("media: {}: {}", what, std::generic_category().message(-result)));
}

}  // namespace

double awakeSeconds() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<double>(now.tv_sec) + static_cast<double>(now.tv_nsec) / 1e9;
}

/// The watcher's thread: everything here but `start` and `stop` happens on it.
class MediaWatcher::Loop {
  public:
    Loop(bus::Connection connection, PlayTracker::Sink sink, Now now)
        : connection_(std::move(connection)), now_(std::move(now)), tracker_(std::move(sink)) {}

    OptionalError start();
    void stop();

  private:
    /// A connection to the bus with one or more names of players.
    struct Player {
        Loop* loop = nullptr;
        std::string connection;       ///< Its unique name on the bus.
        std::set<std::string> names;  ///< Those of players that it owns.
        std::string application;
        bool ready = false;   ///< Its state was asked for and answered: signals count.
        bool asking = false;  ///< Its state is being asked for.
        int signals = 0;      ///< Since `countedFrom`, on the awake clock.
        double countedFrom = 0;
        bus::Slot properties, seeks, call;
        OwnedEventSource deaf;
    };

    void run();
    void prepare();
    void listen();
    void askNames();
    void addName(const std::string& name, const std::string& owner);
    void removeName(const std::string& name, const std::string& owner);
    void listenTo(Player& player);
    void askApplication(Player& player);
    void askState(Player& player);
    void apply(Player& player, const PlayerUpdate& update);
    bool countSignal(Player& player);
    void turnDeaf(Player& player);

    // Each takes a message; the bus library calls them through `handler`.
    void onNames(sd_bus_message* message);
    void onOwner(sd_bus_message* message);
    void onOwnerChanged(sd_bus_message* message);
    static void onApplication(Player& player, sd_bus_message* message);
    static void onState(Player& player, sd_bus_message* message);
    static void onPropertiesChanged(Player& player, sd_bus_message* message);
    static void onSeeked(Player& player, sd_bus_message* message);

    template <void (Loop::*Method)(sd_bus_message*)>
    static int handler(sd_bus_message* message, void* loop, sd_bus_error*);
    template <void (*Method)(Player&, sd_bus_message*)>
    static int playerHandler(sd_bus_message* message, void* player, sd_bus_error*);

    // Fixed once the thread runs:
    int wake_ = -1;
    std::thread thread_;

    // Only on the thread:
    bus::Connection connection_;
    const Now now_;
    PlayTracker tracker_;
    OwnedEvent event_;
    bus::Slot ownerChanges_, names_;
    std::map<std::string, std::unique_ptr<Player>, std::less<>> players_;  ///< By connection.
    std::map<std::string, bus::Slot> ownerCalls_;                          ///< By name.
    bool full_ = false;  ///< There are players that are not listened to.
};

template <void (MediaWatcher::Loop::*Method)(sd_bus_message*)>
int MediaWatcher::Loop::handler(sd_bus_message* message, void* loop, sd_bus_error*) {
    return guarded("media", [&] { (static_cast<Loop*>(loop)->*Method)(message); });
}

template <void (*Method)(MediaWatcher::Loop::Player&, sd_bus_message*)>
int MediaWatcher::Loop::playerHandler(sd_bus_message* message, void* player, sd_bus_error*) {
    return guarded("media", [&] { Method(*static_cast<Player*>(player), message); });
}

OptionalError MediaWatcher::Loop::start() {
    wake_ = ::eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK);
    if (wake_ < 0) return busError("eventfd", -errno);
    thread_ = std::thread([this] { run(); });
    pthread_setname_np(thread_.native_handle(), "media");
    return std::nullopt;
}

void MediaWatcher::Loop::stop() {
    if (thread_.joinable()) {
        ::eventfd_write(wake_, 1);
        thread_.join();
    }
    if (wake_ >= 0) ::close(wake_);
}

void MediaWatcher::Loop::run() {
    prepare();
    if (event_) {
        listen();
        if (const int result = sd_event_loop(event_.get()); result < 0) {
            logError(busError("the loop ended", result).description());
        }
    }
    tracker_.allGone(now_());
    ownerCalls_.clear();
    players_.clear();
    names_.reset();
    ownerChanges_.reset();
    sd_bus_detach_event(connection_.get());
    connection_.reset();
    event_.reset();
}

void MediaWatcher::Loop::prepare() {
    sd_event* made = nullptr;
    int result = sd_event_new(&made);
    OwnedEvent event(made);
    if (result >= 0) {
        result = sd_event_add_io(
            made, nullptr, wake_, EPOLLIN,
            [](sd_event_source* source, int, std::uint32_t, void*) {
                return sd_event_exit(sd_event_source_get_event(source), 0);
            },
            nullptr);
    }
    if (result >= 0) result = sd_bus_attach_event(connection_.get(), made, 0);
    if (result < 0) {
        logError(busError("the players cannot be listened to", result).description());
        return;
    }
    event_ = std::move(event);
}

/// First what comes, then what is there, so that no player falls between.
void MediaWatcher::Loop::listen() {
    sd_bus_slot* slot = nullptr;
    sd_bus_add_match_async(connection_.get(), &slot,
                           "type='signal',sender='org.freedesktop.DBus',"
                           "path='/org/freedesktop/DBus',interface='org.freedesktop.DBus',"
                           "member='NameOwnerChanged',arg0namespace='org.mpris.MediaPlayer2'",
                           &Loop::handler<&Loop::onOwnerChanged>, nullptr, this);
    ownerChanges_.reset(slot);
    askNames();
}

void MediaWatcher::Loop::askNames() {
    sd_bus_slot* slot = nullptr;
    sd_bus_call_method_async(connection_.get(), &slot, kBus, kBusPath, kBus, "ListNames",
                             &Loop::handler<&Loop::onNames>, this, "");
    names_.reset(slot);
}

void MediaWatcher::Loop::onNames(sd_bus_message* message) {
    if (sd_bus_message_is_method_error(message, nullptr) > 0) return;
    if (sd_bus_message_enter_container(message, 'a', "s") <= 0) return;
    const char* name = nullptr;
    while (sd_bus_message_read_basic(message, 's', static_cast<void*>(&name)) > 0) {
        if (!bus::view(name).starts_with(kNamePrefix)) continue;
        if (ownerCalls_.size() >= kMostPlayers) {
            full_ = true;
            return;
        }
        sd_bus_slot* slot = nullptr;
        sd_bus_call_method_async(connection_.get(), &slot, kBus, kBusPath, kBus, "GetNameOwner",
                                 &Loop::handler<&Loop::onOwner>, this, "s", name);
        ownerCalls_[name].reset(slot);
    }
}

void MediaWatcher::Loop::onOwner(sd_bus_message* message) {
    // The call is told by its slot, which is of no use any more.
    const auto* slot = sd_bus_get_current_slot(connection_.get());
    for (auto call = ownerCalls_.begin(); call != ownerCalls_.end(); ++call) {
        if (call->second.get() != slot) continue;
        const auto name = call->first;
        const char* owner = nullptr;
        if (sd_bus_message_is_method_error(message, nullptr) <= 0 &&
            sd_bus_message_read_basic(message, 's', static_cast<void*>(&owner)) > 0) {
            addName(name, owner);
        }
        ownerCalls_.erase(call);
        return;
    }
}

void MediaWatcher::Loop::onOwnerChanged(sd_bus_message* message) {
    const char* name = nullptr;
    const char* before = nullptr;
    const char* after = nullptr;
    if (sd_bus_message_read(message, "sss", &name, &before, &after) <= 0) return;
    if (!bus::view(name).starts_with(kNamePrefix)) return;
    if (!bus::view(before).empty()) removeName(name, before);
    if (!bus::view(after).empty()) addName(name, after);
}

void MediaWatcher::Loop::addName(const std::string& name, const std::string& owner) {
    if (name == kProxy) return;
    const auto known = players_.find(owner);
    if (known != players_.end()) {
        known->second->names.insert(name);
        return;
    }
    if (players_.size() >= kMostPlayers) {
        if (!full_) logWarning(fmt::format("media: more than {} players", kMostPlayers));
        full_ = true;
        return;
    }
    auto player = std::make_unique<Player>();
    player->loop = this;
    player->connection = owner;
    player->names.insert(name);
    player->application = playerApplication("", name);
    logDebug(fmt::format("media: {} is here", name));
    listenTo(*players_.emplace(owner, std::move(player)).first->second);
}

void MediaWatcher::Loop::removeName(const std::string& name, const std::string& owner) {
    const auto found = players_.find(owner);
    if (found == players_.end()) return;
    found->second->names.erase(name);
    if (!found->second->names.empty()) return;
    logDebug(fmt::format("media: {} went away", name));
    tracker_.gone(owner, now_());
    players_.erase(found);
    // There is room again for one that was not listened to.
    if (std::exchange(full_, false)) askNames();
}

void MediaWatcher::Loop::listenTo(Player& player) {
    player.countedFrom = awakeSeconds();
    player.signals = 0;
    const auto match = [&player](std::string_view interface, std::string_view member) {
        return fmt::format("type='signal',sender='{}',path='{}',interface='{}',member='{}'",
                           player.connection, kPlayerPath, interface, member);
    };
    sd_bus_slot* slot = nullptr;
    const auto changes =
        match(kProperties, "PropertiesChanged") + fmt::format(",arg0='{}'", kPlayerInterface);
    sd_bus_add_match_async(connection_.get(), &slot, changes.c_str(),
                           &Loop::playerHandler<&Loop::onPropertiesChanged>, nullptr, &player);
    player.properties.reset(slot);
    slot = nullptr;
    sd_bus_add_match_async(connection_.get(), &slot, match(kPlayerInterface, "Seeked").c_str(),
                           &Loop::playerHandler<&Loop::onSeeked>, nullptr, &player);
    player.seeks.reset(slot);
    askApplication(player);
}

void MediaWatcher::Loop::askApplication(Player& player) {
    player.asking = true;
    sd_bus_slot* slot = nullptr;
    sd_bus_call_method_async(connection_.get(), &slot, player.connection.c_str(), kPlayerPath,
                             kProperties, "Get", &Loop::playerHandler<&Loop::onApplication>,
                             &player, "ss", kRootInterface, "DesktopEntry");
    player.call.reset(slot);
}

void MediaWatcher::Loop::onApplication(Player& player, sd_bus_message* message) {
    if (sd_bus_message_is_method_error(message, nullptr) <= 0) {
        player.application = playerApplication(readPlayerText(message), *player.names.begin());
    }
    player.loop->askState(player);
}

void MediaWatcher::Loop::askState(Player& player) {
    player.asking = true;
    sd_bus_slot* slot = nullptr;
    sd_bus_call_method_async(connection_.get(), &slot, player.connection.c_str(), kPlayerPath,
                             kProperties, "GetAll", &Loop::playerHandler<&Loop::onState>, &player,
                             "s", kPlayerInterface);
    player.call.reset(slot);
}

void MediaWatcher::Loop::onState(Player& player, sd_bus_message* message) {
    player.asking = false;
    player.ready = true;
    PlayerUpdate update;
    if (sd_bus_message_is_method_error(message, nullptr) > 0) return;
    if (readPlayerProperties(message, update)) player.loop->apply(player, update);
}

void MediaWatcher::Loop::onPropertiesChanged(Player& player, sd_bus_message* message) {
    auto& loop = *player.loop;
    if (!loop.countSignal(player) || !player.ready) return;
    PlayerUpdate update;
    if (sd_bus_message_skip(message, "s") <= 0 || !readPlayerProperties(message, update)) return;
    loop.apply(player, update);
    // Some say only that something changed, and want to be asked.
    if (player.asking || sd_bus_message_enter_container(message, 'a', "s") <= 0) return;
    const char* property = nullptr;
    while (sd_bus_message_read_basic(message, 's', static_cast<void*>(&property)) > 0) {
        if (bus::view(property) != "Metadata" && bus::view(property) != "PlaybackStatus") continue;
        loop.askState(player);
        return;
    }
}

void MediaWatcher::Loop::onSeeked(Player& player, sd_bus_message* message) {
    auto& loop = *player.loop;
    if (!loop.countSignal(player) || !player.ready) return;
    std::int64_t position = 0;
    if (sd_bus_message_read_basic(message, 'x', &position) <= 0) return;
    loop.tracker_.jumped(player.connection, static_cast<double>(position) / bus::kMicroseconds,
                         loop.now_());
}

void MediaWatcher::Loop::apply(Player& player, const PlayerUpdate& update) {
    tracker_.update(player.connection, player.application, update, now_());
}

/// Whether the signal is to be heard.
bool MediaWatcher::Loop::countSignal(Player& player) {
    const double awake = awakeSeconds();
    if (awake - player.countedFrom > kFloodSeconds) {
        player.countedFrom = awake;
        player.signals = 0;
    }
    if (++player.signals <= kMostSignals) return true;
    turnDeaf(player);
    return false;
}

void MediaWatcher::Loop::turnDeaf(Player& player) {
    logWarning(fmt::format("media: {} floods the bus; it is not listened to for {} seconds",
                           player.application, kDeafSeconds));
    tracker_.gone(player.connection, now_());
    player.ready = false;
    player.properties.reset();
    player.seeks.reset();
    player.call.reset();
    sd_event_source* timer = nullptr;
    sd_event_add_time_relative(
        event_.get(), &timer, CLOCK_MONOTONIC,
        static_cast<std::uint64_t>(kDeafSeconds * bus::kMicroseconds), 0,
        [](sd_event_source*, std::uint64_t, void* data) {
            auto& heard = *static_cast<Player*>(data);
            return guarded("media", [&heard] { heard.loop->listenTo(heard); });
        },
        &player);
    player.deaf.reset(timer);
}

MediaWatcher::MediaWatcher(std::unique_ptr<Loop> loop) : loop_(std::move(loop)) {}

MediaWatcher::~MediaWatcher() { loop_->stop(); }

std::expected<std::unique_ptr<MediaWatcher>, KSError> MediaWatcher::start(PlayTracker::Sink sink,
                                                                          Now now) {
    sd_bus* opened = nullptr;
    if (const int result = sd_bus_open_user(&opened); result < 0) {
        return std::unexpected(busError("cannot connect to the session bus", result));
    }
    auto loop = std::make_unique<Loop>(bus::Connection(opened), std::move(sink), std::move(now));
    std::unique_ptr<MediaWatcher> watcher(new MediaWatcher(std::move(loop)));
    if (auto error = watcher->loop_->start()) return std::unexpected(std::move(*error));
    return watcher;
}

}  // namespace keepsakes
