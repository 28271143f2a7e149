// SPDX-License-Identifier: Apache-2.0
#include "linux/PlayTracker.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <utility>

#include "core/Text.h"

namespace keepsakes {

namespace {

/// What players say while they do not know an item's title, lower-cased.
constexpr auto kPlaceholders = std::to_array<std::string_view>({
    "-",
    "--",
    "?",
    "advertisement",
    "loading",
    "loading...",
    "loading…",
    "n/a",
    "no title",
    "none",
    "null",
    "undefined",
    "unknown",
    "unknown title",
    "untitled",
    "(unknown)",
});
/// What browsers say of a private window.
constexpr std::string_view kPrivateEnding = " is playing media";

bool mayBeSame(const std::string& a, const std::string& b) {
    return a == b || a.empty() || b.empty();
}

/// Items are told apart by title, track and artist; the latter two may become known later.
bool isSameItem(const PlayerItem& a, const PlayerItem& b) {
    return a.title == b.title && mayBeSame(a.trackId, b.trackId) && mayBeSame(a.artist, b.artist);
}

/// The newer words on one item; what they leave out is taken from the older ones.
PlayerItem merged(PlayerItem newer, const PlayerItem& older) {
    for (const auto member : {&PlayerItem::trackId, &PlayerItem::album, &PlayerItem::artist,
                              &PlayerItem::genre, &PlayerItem::catalogueId}) {
        if ((newer.*member).empty()) newer.*member = older.*member;
    }
    if (!newer.lengthSeconds) newer.lengthSeconds = older.lengthSeconds;
    return newer;
}

std::optional<std::string> unlessEmpty(const std::string& text) {
    return text.empty() ? std::nullopt : std::optional(text);
}

PlaybackState endOf(PlayerStatus status) {
    return status == PlayerStatus::paused ? PlaybackState::paused : PlaybackState::stopped;
}

}  // namespace

bool PlayTracker::isTitle(std::string_view title, std::string_view artist) {
    if (title.empty()) return false;
    if (!artist.empty()) return true;
    const auto lowered = lowerCased(title);
    return !lowered.ends_with(kPrivateEnding) &&
           std::ranges::find(kPlaceholders, lowered) == kPlaceholders.end();
}

void PlayTracker::update(const std::string& key, const std::string& bundleID,
                         const PlayerUpdate& update, Moment now) {
    auto& player = players_[key];
    const bool newItem = update.item && !isSameItem(player.item, *update.item);
    if (newItem && player.play) end(player, PlaybackState::replaced, now);
    if (update.status) player.status = *update.status;
    if (player.play && player.status != PlayerStatus::playing) {
        end(player, endOf(player.status), now);
    }
    player.bundleID = bundleID;
    if (update.looping) player.looping = *update.looping;
    if (update.item) player.item = newItem ? *update.item : merged(*update.item, player.item);
    if (player.status == PlayerStatus::playing && !player.play) begin(player, now);
}

void PlayTracker::jumped(const std::string& key, double position, Moment now) {
    const auto found = players_.find(key);
    if (found == players_.end() || !found->second.play) return;
    auto& player = found->second;
    auto& play = *player.play;
    // Many players tell the position of a new item in the same way.
    if (now.awake - play.start.awake < kBeginningSeconds) return;
    if (position < kBeginningSeconds) {
        end(player, PlaybackState::replaced, now);
        begin(player, now);
        return;
    }
    play.jumped = true;
    if (!play.written || now.awake - play.lastRecord < kBetweenJumps) return;
    play.lastRecord = now.awake;
    write(player, player.item.lengthSeconds.value_or(0), PlaybackState::jumped,
          play.start.date + (now.awake - play.start.awake));
}

void PlayTracker::gone(const std::string& key, Moment now) {
    const auto found = players_.find(key);
    if (found == players_.end()) return;
    if (found->second.play) end(found->second, PlaybackState::stopped, now);
    players_.erase(found);
}

void PlayTracker::allGone(Moment now) {
    for (auto& [key, player] : players_) {
        if (player.play) end(player, PlaybackState::stopped, now);
    }
    players_.clear();
}

void PlayTracker::begin(Player& player, Moment now) {
    if (!isTitle(player.item.title, player.item.artist)) return;
    auto& begun = player.begun;
    while (!begun.empty() && now.awake - begun.front() >= kFloodSeconds) begun.pop_front();
    if (begun.size() >= kMostPlays) return;
    begun.push_back(now.awake);
    Play play{.start = now, .lastRecord = now.awake};
    play.doubled = isPlayedElsewhere(player);
    player.play = play;
    if (play.doubled || !player.item.lengthSeconds) return;
    write(player, *player.item.lengthSeconds, PlaybackState::playing, now.date);
    player.play->written = true;
}

void PlayTracker::end(Player& player, PlaybackState state, Moment now) {
    const auto play = *std::exchange(player.play, std::nullopt);
    if (play.doubled) return;
    const double played = playedSeconds(player, play, now);
    // An item without a length lasts at least as long as was heard of it.
    const double length = player.item.lengthSeconds.value_or(played);
    if (!play.written && played < kShortestWithoutLength) return;
    if (!play.written) write(player, length, PlaybackState::playing, play.start.date);
    if (player.looping && !play.jumped) writeLoops(player, play, length, played);
    write(player, length, state, play.start.date + played);
}

/// How long the item was heard, at most its own length when it was heard once and straight on:
/// players that hang or buffer say that they play all the while.
double PlayTracker::playedSeconds(const Player& player, const Play& play, Moment now) {
    const double elapsed = std::max(0.0, now.awake - play.start.awake);
    const auto& length = player.item.lengthSeconds;
    if (!length || player.looping || play.jumped) return elapsed;
    return std::min(elapsed, *length);
}

/// Players that loop without saying when they begin again: one play for each time round.
void PlayTracker::writeLoops(const Player& player, const Play& play, double length, double played) {
    for (int loop = 1; loop <= kMostLoops && loop * length < played - 1; ++loop) {
        const auto turn = play.start.date + loop * length;
        write(player, length, PlaybackState::replaced, turn);
        write(player, length, PlaybackState::playing, turn);
    }
}

bool PlayTracker::isPlayedElsewhere(const Player& player) const {
    return std::ranges::any_of(players_, [&player](const auto& entry) {
        const auto& other = entry.second;
        return &other != &player && other.play && !other.play->doubled &&
               other.item.title == player.item.title;
    });
}

void PlayTracker::write(const Player& player, double length, PlaybackState state, KSDate when) {
    NowPlayingRecord record;
    record.duration = static_cast<std::int64_t>(length);
    record.title = player.item.title;
    record.album = unlessEmpty(player.item.album);
    record.artist = unlessEmpty(player.item.artist);
    record.genre = unlessEmpty(player.item.genre);
    record.bundleID = unlessEmpty(player.bundleID);
    record.storeProductIdentifier = unlessEmpty(player.item.catalogueId);
    record.playbackState = state;
    record.absoluteTimestamp = when;
    sink_(record);
}

}  // namespace keepsakes
