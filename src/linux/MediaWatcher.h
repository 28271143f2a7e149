// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <functional>
#include <memory>

#include "core/KSError.h"
#include "linux/PlayTracker.h"

namespace keepsakes {

/// Listens to the media players of a message bus (org.mpris.MediaPlayer2.*) and tells what they
/// play, record by record. It has a connection and a thread of its own, on which the sink is
/// called; the thread sleeps while no player says anything. Nothing that a player sends or leaves
/// out disturbs the others: one that floods the bus is not listened to for a while.
class MediaWatcher final {
  public:
    /// What tells a moment; asked on the watcher's thread.
    using Now = std::function<Moment()>;

    /// Players beyond these are not listened to until others go.
    static constexpr std::size_t kMostPlayers = 32;
    /// A player that sends more signals than these within `kFloodSeconds` is not listened to for
    /// `kDeafSeconds`.
    static constexpr int kMostSignals = 500;
    static constexpr double kFloodSeconds = 10;
    static constexpr double kDeafSeconds = 60;

    /// On the session bus. An error when there is none.
    static std::expected<std::unique_ptr<MediaWatcher>, KSError> start(PlayTracker::Sink sink,
                                                                       Now now);
    /// Ends every play that is under way and returns when its records are told.
    ~MediaWatcher();
    MediaWatcher(const MediaWatcher&) = delete;
    MediaWatcher& operator=(const MediaWatcher&) = delete;

  private:
    class Loop;
    explicit MediaWatcher(std::unique_ptr<Loop> loop);

    const std::unique_ptr<Loop> loop_;
};

/// Seconds on a clock that stands still while the machine sleeps.
double awakeSeconds();

}  // namespace keepsakes
