// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>

#include "linux/PlayTracker.h"

struct sd_bus_message;

namespace keepsakes {

/// Texts of players are cut at so many bytes.
inline constexpr std::size_t kLongestPlayerText = 512;

/// Reads a dictionary of the properties of org.mpris.MediaPlayer2.Player (`a{sv}`), on which the
/// message stands. What is not known or of another type than it should be is passed over. False
/// when the message is no such dictionary.
bool readPlayerProperties(sd_bus_message* message, PlayerUpdate& update);

/// The one string in a variant, cleaned; empty for a value of another type.
std::string readPlayerText(sd_bus_message* message);

/// Trimmed, without control characters, and cut between characters. Takes UTF-8.
std::string cleanPlayerText(std::string_view text);

/// The application of a player: its desktop entry, with or without its ending, or else what tells
/// its bus name from others.
std::string playerApplication(std::string_view desktopEntry, std::string_view busName);

}  // namespace keepsakes
