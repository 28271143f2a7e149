// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <deque>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>

#include "platform/MediaStream.h"

namespace keepsakes {

/// What a player says that it plays, cleaned: texts are trimmed and short, the length is believed.
struct PlayerItem {
    std::string trackId;
    std::string title;
    std::string album;
    std::string artist;
    std::string genre;
    std::string catalogueId;
    std::optional<double> lengthSeconds;
};

enum class PlayerStatus { playing, paused, stopped };

/// What a player says of itself; what it does not mention is absent.
struct PlayerUpdate {
    std::optional<PlayerStatus> status;
    std::optional<PlayerItem> item;
    std::optional<bool> looping;
};

/// When something was heard of: by the calendar, and on a clock that stands still while the machine
/// sleeps, in seconds.
struct Moment {
    KSDate date;
    double awake = 0;
};

/// Turns what players say into records of the now-playing stream, by the rules of
/// docs/device-data.md. It knows no bus: players are keys. Used by one thread at a time; the sink
/// is called there, in the order of events.
class PlayTracker {
  public:
    using Sink = std::function<void(const NowPlayingRecord&)>;

    /// A jump to within this many seconds of the start begins the item again.
    static constexpr double kBeginningSeconds = 3;
    /// What is heard for less, and has no length, stands in for an item that is still being opened.
    static constexpr double kShortestWithoutLength = 1;
    /// Jumps within an item are told of at most this often, in seconds.
    static constexpr double kBetweenJumps = 30;
    /// So many plays of one player may begin within `kFloodSeconds`; more are not recorded.
    static constexpr std::size_t kMostPlays = 60;
    static constexpr double kFloodSeconds = 60;
    /// A play of a looped item is divided into at most so many.
    static constexpr int kMostLoops = 200;

    explicit PlayTracker(Sink sink) : sink_(std::move(sink)) {}

    /// `bundleID` is the application that new plays are recorded under.
    void update(const std::string& player, const std::string& bundleID, const PlayerUpdate& update,
                Moment now);
    /// The player jumped to a position, in seconds from the item's start.
    void jumped(const std::string& player, double position, Moment now);
    /// The player went away.
    void gone(const std::string& player, Moment now);
    /// Ends every play, as though all players had gone.
    void allGone(Moment now);

    /// Whether the title is a name, and not what stands in for one. An artist vouches for a title.
    static bool isTitle(std::string_view title, std::string_view artist);

  private:
    /// An item from the moment it began to play until it pauses, stops or gives way.
    struct Play {
        Moment start;
        double lastRecord = 0;  ///< On the awake clock.
        bool written = false;   ///< The record of its start is; it waits for a length.
        bool doubled = false;   ///< Another player already plays the same: nothing is recorded.
        bool jumped = false;
    };
    struct Player {
        std::string bundleID;
        PlayerStatus status = PlayerStatus::stopped;
        PlayerItem item;
        bool looping = false;
        std::optional<Play> play;
        std::deque<double> begun;  ///< When its last plays began, on the awake clock.
    };

    void begin(Player& player, Moment now);
    void end(Player& player, PlaybackState state, Moment now);
    void writeLoops(const Player& player, const Play& play, double length, double played);
    bool isPlayedElsewhere(const Player& player) const;
    void write(const Player& player, double length, PlaybackState state, KSDate when);
    static double playedSeconds(const Player& player, const Play& play, Moment now);

    const Sink sink_;
    std::map<std::string, Player> players_;
};

}  // namespace keepsakes
