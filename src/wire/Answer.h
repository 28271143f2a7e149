// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <functional>
#include <string>

#include "core/KSError.h"
#include "model/KeyedCoding.h"

struct sd_bus_message;

namespace keepsakes {

/// What goes back to a caller: an error, or nothing, or a body, or an array of records. Made on
/// any thread, written on the bus thread; what the functions need they hold themselves. Private to
/// the folder.
struct Answer {
    OptionalError error = {};
    /// Appends the whole body; a negative errno when that failed.
    std::function<int(sd_bus_message*)> body = {};
    /// Writes record `index` of `count`; the body is their array.
    std::function<void(std::size_t index, KeyedEncoder&)> record = {};
    std::size_t count = 0;
};

/// Takes the answer to one call; any thread may call it. What comes after the first is dropped,
/// and when the last copy is gone without an answer, the caller is told so.
using Respond = std::function<void(Answer)>;

/// Whether a call is taken. When it is not, nothing of it was carried out.
struct Admission {
    const char* name = nullptr;  ///< The D-Bus error; none when the call is taken.
    std::string text = {};
    std::size_t cost = 0;  ///< About how much memory the call holds until it is answered.

    bool refused() const { return name != nullptr; }
};

}  // namespace keepsakes
