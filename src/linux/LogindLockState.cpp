// SPDX-License-Identifier: Apache-2.0
#include "linux/LogindLockState.h"

#include <fmt/format.h>
#include <systemd/sd-bus.h>

#include <algorithm>
#include <fstream>
#include <utility>
#include <vector>

#include "core/Files.h"
#include "core/Log.h"
#include "core/Problems.h"
#include "linux/BusProperties.h"

namespace keepsakes {

// Names: org.freedesktop.login1(5).
namespace {

constexpr const char* kLoginService = "org.freedesktop.login1";
constexpr const char* kLoginPath = "/org/freedesktop/login1";
constexpr const char* kLoginManager = "org.freedesktop.login1.Manager";
constexpr const char* kUserInterface = "org.freedesktop.login1.User";
constexpr const char* kSessionInterface = "org.freedesktop.login1.Session";

constexpr std::string_view kNobodyTells =
    "content_protection is on, but there is no logind to tell of the session's lock: until there "
    "is, the device counts as locked and the database stays closed";

/// Another one after each start of the machine; nothing where the kernel tells none.
std::string bootIdentifier() {
    std::ifstream in("/proc/sys/kernel/random/boot_id");
    std::string identifier;
    std::getline(in, identifier);
    return identifier;
}

constexpr std::uintmax_t kLongestMemory = 256;

BusThread::Build text(std::string argument) {
    return [argument = std::move(argument)](sd_bus_message* message) {
        return sd_bus_message_append_basic(message, 's', argument.c_str());
    };
}

}  // namespace

struct LogindLockState::Session {
    std::string path;
    std::optional<bool> isActive;
    std::optional<bool> isLocked;
};

LogindLockState::LogindLockState(BusThread& bus, Owner owner, std::filesystem::path memory,
                                 Problems& problems)
    : owner_(std::move(owner)),
      memory_(std::move(memory)),
      problems_(problems),
      reader_(
          bus, kLoginService, [this] { beginReading(); }, [this] { tell(); },
          [this] { becameUnavailable(); }) {
    bus.follow(*this);
    const auto remembered = readFile(memory_, kLongestMemory);
    unlockedSinceBoot_ = remembered && !remembered->empty() && *remembered == bootIdentifier();
}

LogindLockState::~LogindLockState() = default;

Observation LogindLockState::observe(const WorkQueue& queue, Task changed) {
    return observers_.add(queue, std::move(changed));
}

const char* LogindLockState::service() const { return kLoginService; }

void LogindLockState::becameUnavailable() {
    reader_.abandon();
    if (isKnown_) return;
    logWarning(kNobodyTells);
    problems_.add(kNobodyTells);
}

void LogindLockState::received(sd_bus_message* signal) {
    const auto path = bus::pathOf(signal);
    const auto isFromManager = [signal](const char* member) {
        return sd_bus_message_is_signal(signal, kLoginManager, member) > 0;
    };
    if (isFromManager("SessionNew") || isFromManager("SessionRemoved") ||
        bus::tellsOfChange(signal, kUserInterface, {"Display", "Sessions"})) {
        reader_.read();
        return;
    }
    if (session_.empty() || path != session_) return;
    if (sd_bus_message_is_signal(signal, kSessionInterface, "Lock") > 0) {
        isLockRequested_ = true;
        updateState();
    } else if (sd_bus_message_is_signal(signal, kSessionInterface, "Unlock") > 0) {
        isLockRequested_ = false;
        updateState();
    } else if (bus::tellsOfChange(signal, kSessionInterface, {"LockedHint", "Active"})) {
        reader_.read();
    }
}

void LogindLockState::beginReading() {
    candidates_.clear();
    if (!owner_.session) {
        findUser();
        return;
    }
    reader_.ask(
        kLoginPath, kLoginManager, "GetSession", text(*owner_.session),
        [this](sd_bus_message* answer) {
            const char* path = nullptr;
            if (sd_bus_message_read_basic(answer, 'o', static_cast<void*>(&path)) > 0) {
                readSession(path);
            } else {
                reader_.fail("a session that makes no sense");
            }
        },
        // The daemon has outlived the session it was started in.
        [this] { findUser(); });
}

void LogindLockState::findUser() {
    reader_.ask(
        kLoginPath, kLoginManager, "GetUser",
        [user = static_cast<std::uint32_t>(owner_.user)](sd_bus_message* message) {
            return sd_bus_message_append_basic(message, 'u', &user);
        },
        [this](sd_bus_message* answer) {
            const char* path = nullptr;
            if (sd_bus_message_read_basic(answer, 'o', static_cast<void*>(&path)) > 0) {
                findSessions(path);
            } else {
                reader_.fail("a user that makes no sense");
            }
        },
        [] {});  // not logged in
}

void LogindLockState::findSessions(const std::string& userPath) {
    reader_.askProperties(
        userPath, kUserInterface,
        [this](sd_bus_message* answer) {
            std::vector<std::string> display;
            std::vector<std::string> sessions;
            if (!bus::readProperties(answer, {{"Display", bus::pathInto(display, "s")},
                                              {"Sessions", bus::pathsInto(sessions, "s")}})) {
                reader_.fail("a user that makes no sense");
                return;
            }
            for (const auto& path : display.empty() ? sessions : display) {
                if (candidates_.size() < kMostSessions) readSession(path);
            }
        },
        [] {});  // logged out meanwhile
}

void LogindLockState::readSession(const std::string& path) {
    auto& session = candidates_.emplace_back(Session{.path = path});
    reader_.askProperties(
        path, kSessionInterface,
        [this, &session](sd_bus_message* answer) {
            if (!bus::readProperties(answer, {{"Active", bus::into(session.isActive)},
                                              {"LockedHint", bus::into(session.isLocked)}})) {
                reader_.fail(session.path + " makes no sense");
            }
        },
        [] {});  // ended meanwhile
}

void LogindLockState::tell() {
    // One that has ended told nothing.
    std::erase_if(candidates_, [](const Session& session) { return !session.isLocked; });
    auto chosen = std::ranges::find_if(
        candidates_, [](const Session& session) { return session.isActive.value_or(false); });
    if (chosen == candidates_.end()) chosen = candidates_.begin();

    isKnown_ = true;
    const bool isThere = chosen != candidates_.end();
    const auto path = isThere ? chosen->path : std::string();
    const bool isLocked = !isThere || *chosen->isLocked;
    // Done, or another session's business.
    if (isLocked || path != session_) isLockRequested_ = false;
    session_ = path;
    isLocked_ = isLocked;
    updateState();
}

void LogindLockState::updateState() {
    const int state = isLocked_ ? kLocked : (isLockRequested_ ? kLocking : kUnlocked);
    if (state == kUnlocked && !unlockedSinceBoot_.exchange(true)) rememberUnlock();
    if (state_.exchange(state) != state) observers_.notify();
}

void LogindLockState::rememberUnlock() {
    auto error = makePrivateFolder(memory_.parent_path());
    if (!error) error = replaceFile(memory_, bootIdentifier());
    if (error) {
        logWarning(fmt::format("the first unlock is not remembered: {}", error->description()));
    }
}

}  // namespace keepsakes
