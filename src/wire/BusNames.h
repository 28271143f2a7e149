// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <string_view>

namespace keepsakes::bus {

/// What the daemon is called on the owner's session bus. Plain C strings, as the bus library wants
/// them.
inline constexpr const char* kName = "com.brindle.keepsakesd";
inline constexpr const char* kPath = "/com/brindle/keepsakesd";
inline constexpr const char* kConduitInterface = "com.brindle.KSKeepsakesConduitProtocol";
inline constexpr const char* kStatusInterface = "com.brindle.keepsakesd.Status";

inline constexpr const char* kInvalidArgs = "org.freedesktop.DBus.Error.InvalidArgs";
inline constexpr const char* kLimitsExceeded = "org.freedesktop.DBus.Error.LimitsExceeded";
/// Errors of other domains than `KSErrorDomain`.
inline constexpr const char* kFailed = "org.freedesktop.DBus.Error.Failed";
/// The code of a `KSErrorDomain` error follows.
inline constexpr std::string_view kErrorCodePrefix = "com.brindle.KSErrorDomain.Code";

/// The D-Bus Specification's bounds: bytes of one array, and levels of nested containers.
inline constexpr std::size_t kLargestArray = std::size_t{64} << 20;
inline constexpr std::size_t kDeepestMessage = 64;

/// Levels of arrays and dictionaries inside one field of a record. A level costs up to three
/// containers, and a bundle's event stands eight deep, so that what was taken can be sent again.
inline constexpr std::size_t kDeepestValue = 16;
static_assert(8 + 3 * kDeepestValue <= kDeepestMessage);

}  // namespace keepsakes::bus
