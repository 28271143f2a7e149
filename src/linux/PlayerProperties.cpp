// SPDX-License-Identifier: Apache-2.0
#include "linux/PlayerProperties.h"

#include <systemd/sd-bus.h>

#include <array>
#include <cmath>
#include <cstdint>
#include <optional>

#include "bus/BusHandles.h"

namespace keepsakes {

namespace {

constexpr std::string_view kNoTrack = "/org/mpris/MediaPlayer2/TrackList/NoTrack";
/// Longer than any recording; live streams say that they last for ever.
constexpr double kLongestItem = 100 * 3600.0;
/// Entries of a list, such as artists, beyond these are not read.
constexpr int kMostInList = 16;

/// The signature of what comes next, which is entered when it is a variant; empty at the end.
class Variant {
  public:
    explicit Variant(sd_bus_message* message) : message_(message) {
        char type = 0;
        const char* contents = nullptr;
        if (sd_bus_message_peek_type(message, &type, &contents) <= 0 || type != 'v') return;
        entered_ = sd_bus_message_enter_container(message, 'v', contents) > 0;
        if (entered_) signature_ = bus::view(contents);
    }
    ~Variant() {
        if (entered_) leave();
    }
    Variant(const Variant&) = delete;
    Variant& operator=(const Variant&) = delete;

    const std::string& signature() const { return signature_; }
    void passOver() { sd_bus_message_skip(message_, nullptr); }

  private:
    // A container is left at its end only.
    void leave() {
        while (sd_bus_message_at_end(message_, 0) == 0) {
            if (sd_bus_message_skip(message_, nullptr) <= 0) break;
        }
        sd_bus_message_exit_container(message_);
    }

    sd_bus_message* const message_;
    bool entered_ = false;
    std::string signature_;
};

std::string_view basicText(sd_bus_message* message, char type) {
    const char* text = nullptr;
    return sd_bus_message_read_basic(message, type, static_cast<void*>(&text)) > 0 ? bus::view(text)
                                                                                   : "";
}

/// Several texts, such as artists, as one.
std::string listText(sd_bus_message* message) {
    std::string all;
    if (sd_bus_message_enter_container(message, 'a', "s") <= 0) return all;
    for (int count = 0; sd_bus_message_at_end(message, 0) == 0; ++count) {
        const auto text = cleanPlayerText(basicText(message, 's'));
        if (text.empty() || count >= kMostInList) continue;
        if (!all.empty()) all += ", ";
        all += text;
    }
    sd_bus_message_exit_container(message);
    return cleanPlayerText(all);
}

template <class Number>
double basicNumber(sd_bus_message* message, char type) {
    Number number{};
    return sd_bus_message_read_basic(message, type, &number) > 0 ? static_cast<double>(number) : 0;
}

/// A number of any type; players do not agree on the one to use.
std::optional<double> number(sd_bus_message* message, char type) {
    switch (type) {
        case SD_BUS_TYPE_INT64:
            return basicNumber<std::int64_t>(message, type);
        case SD_BUS_TYPE_UINT64:
            return basicNumber<std::uint64_t>(message, type);
        case SD_BUS_TYPE_INT32:
            return basicNumber<std::int32_t>(message, type);
        case SD_BUS_TYPE_UINT32:
            return basicNumber<std::uint32_t>(message, type);
        case SD_BUS_TYPE_DOUBLE:
            return basicNumber<double>(message, type);
        default:
            return std::nullopt;
    }
}

std::optional<double> readLength(sd_bus_message* message) {
    const Variant variant(message);
    const auto& signature = variant.signature();
    const auto length = signature.size() == 1 ? number(message, signature[0]) : std::nullopt;
    if (!length || !std::isfinite(*length)) return std::nullopt;
    const double seconds = *length / bus::kMicroseconds;
    return seconds >= 1 && seconds <= kLongestItem ? std::optional(seconds) : std::nullopt;
}

struct TextEntry {
    std::string_view key;
    std::string PlayerItem::*member;
};
constexpr auto kTextEntries = std::to_array<TextEntry>({
    {"mpris:trackid", &PlayerItem::trackId},
    {"xesam:title", &PlayerItem::title},
    {"xesam:album", &PlayerItem::album},
    {"xesam:artist", &PlayerItem::artist},
    {"xesam:genre", &PlayerItem::genre},
    {"mb:trackId", &PlayerItem::catalogueId},
});

/// Calls `entry` with each key of a dictionary, standing on its value; `entry` reads that.
template <class Entry>
bool readEntries(sd_bus_message* message, const Entry& entry) {
    if (sd_bus_message_enter_container(message, 'a', "{sv}") <= 0) return false;
    while (sd_bus_message_enter_container(message, 'e', "sv") > 0) {
        entry(basicText(message, 's'));
        if (sd_bus_message_exit_container(message) < 0) return false;
    }
    return sd_bus_message_exit_container(message) >= 0;
}

void readItemEntry(sd_bus_message* message, std::string_view key, PlayerItem& item) {
    if (key == "mpris:length") {
        item.lengthSeconds = readLength(message);
        return;
    }
    for (const auto& [known, member] : kTextEntries) {
        if (key != known) continue;
        item.*member = readPlayerText(message);
        return;
    }
    sd_bus_message_skip(message, "v");
}

PlayerItem readItem(sd_bus_message* message) {
    const Variant variant(message);
    PlayerItem item;
    if (variant.signature() != "a{sv}") return item;
    readEntries(message,
                [message, &item](std::string_view key) { readItemEntry(message, key, item); });
    return item.trackId == kNoTrack ? PlayerItem() : item;
}

std::optional<PlayerStatus> statusOf(std::string_view word) {
    if (word == "Playing") return PlayerStatus::playing;
    if (word == "Paused") return PlayerStatus::paused;
    if (word == "Stopped") return PlayerStatus::stopped;
    return std::nullopt;
}

}  // namespace

std::string readPlayerText(sd_bus_message* message) {
    const Variant variant(message);
    const auto& signature = variant.signature();
    if (signature == "s" || signature == "o") {
        return cleanPlayerText(basicText(message, signature[0]));
    }
    return signature == "as" ? listText(message) : std::string();
}

bool readPlayerProperties(sd_bus_message* message, PlayerUpdate& update) {
    return readEntries(message, [message, &update](std::string_view key) {
        if (key == "PlaybackStatus") {
            update.status = statusOf(readPlayerText(message));
        } else if (key == "LoopStatus") {
            const auto word = readPlayerText(message);
            update.looping = word == "Track" || word == "Playlist";
        } else if (key == "Metadata") {
            update.item = readItem(message);
        } else {
            sd_bus_message_skip(message, "v");
        }
    });
}

std::string cleanPlayerText(std::string_view text) {
    if (text.size() > kLongestPlayerText) {
        std::size_t end = kLongestPlayerText;
        while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) --end;
        text = text.substr(0, end);
    }
    std::string clean;
    for (const char byte : text) {
        const auto code = static_cast<unsigned char>(byte);
        const bool blank = code <= ' ' || code == 0x7F;
        if (!blank) {
            clean += byte;
        } else if (!clean.empty() && clean.back() != ' ') {
            clean += ' ';
        }
    }
    if (!clean.empty() && clean.back() == ' ') clean.pop_back();
    return clean;
}

std::string playerApplication(std::string_view desktopEntry, std::string_view busName) {
    constexpr std::string_view kEnding = ".desktop";
    constexpr std::string_view kInstance = ".instance";
    if (desktopEntry.ends_with(kEnding)) desktopEntry.remove_suffix(kEnding.size());
    if (!desktopEntry.empty()) return std::string(desktopEntry);
    constexpr std::string_view kPrefix = "org.mpris.MediaPlayer2.";
    if (busName.starts_with(kPrefix)) busName.remove_prefix(kPrefix.size());
    return std::string(busName.substr(0, busName.find(kInstance)));
}

}  // namespace keepsakes
