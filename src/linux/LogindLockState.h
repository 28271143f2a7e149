// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <sys/types.h>

#include <atomic>
#include <filesystem>
#include <list>
#include <optional>
#include <string>

#include "linux/BusReader.h"
#include "platform/DeviceState.h"

namespace keepsakes {

class Problems;

/// The lock of the owner's session as logind tells of it, for a device that waits for the first
/// unlock. Made before the bus thread starts, outlives its stop.
///
/// The owner's session is the one the daemon belongs to, else the user's display, else one that is
/// active. It is locked while its LockedHint says so; between a request to lock and that, it is
/// "locking". An owner without a session counts as locked. Until logind has answered the state is
/// an error; should it go away or talk nonsense, the last state stays. That the device was unlocked
/// since it started is remembered in a file, for a daemon that is started again.
class LogindLockState final : public LockState, private BusFollower {
  public:
    /// Whose session; the identifier is that of the daemon's own, where it has one.
    struct Owner {
        uid_t user = 0;
        std::optional<std::string> session;
    };
    /// Candidates beyond these are not looked at.
    static constexpr std::size_t kMostSessions = 16;

    /// `memory` is the file; one that cannot be read or written is as none.
    LogindLockState(BusThread& bus, Owner owner, std::filesystem::path memory, Problems& problems);
    ~LogindLockState() override;

    bool formattedForContentProtection() const override { return true; }
    bool unlockedSinceBoot() const override { return unlockedSinceBoot_; }
    int currentState() const override { return state_; }
    Observation observe(const WorkQueue& queue, Task changed) override;

  private:
    struct Session;
    static constexpr int kUnlocked = 0;
    static constexpr int kLocked = 1;
    static constexpr int kLocking = 2;
    static constexpr int kError = -1;

    const char* service() const override;
    void becameAvailable() override { reader_.read(); }
    void becameUnavailable() override;
    void received(sd_bus_message* signal) override;

    void beginReading();
    void findUser();
    void findSessions(const std::string& userPath);
    void readSession(const std::string& path);
    void tell();
    void updateState();
    void rememberUnlock();

    const Owner owner_;
    const std::filesystem::path memory_;
    Problems& problems_;

    // Only on the bus thread.
    BusReader reader_;
    std::list<Session> candidates_;  ///< Of the reading that runs.
    bool isKnown_ = false;           ///< A reading has succeeded once.
    std::string session_;            ///< Its path; empty when the owner has none.
    bool isLocked_ = false;          ///< As its hint says.
    bool isLockRequested_ = false;   ///< By "Lock", and neither done nor taken back.

    std::atomic<bool> unlockedSinceBoot_ = false;
    std::atomic<int> state_ = kError;
    Observers<> observers_;
};

}  // namespace keepsakes
