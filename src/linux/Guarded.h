// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>

#include <exception>
#include <string_view>

#include "core/Log.h"

namespace keepsakes {

/// Does the work inside a callback of a C library, through which nothing thrown may pass: it is
/// logged as failed by `who`. Answers 0, which lets the library go on.
template <class Work>
int guarded(std::string_view who, const Work& work) {
    try {
        work();
    } catch (const std::exception& exception) {
        logError(fmt::format("{}: {}", who, exception.what()));
    }
    return 0;
}

}  // namespace keepsakes
