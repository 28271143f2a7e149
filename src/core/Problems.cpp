// SPDX-License-Identifier: Apache-2.0
#include "core/Problems.h"

namespace keepsakes {

void Problems::add(std::string_view line) {
    const std::lock_guard lock(mutex_);
    std::erase(newestFirst_, line);
    newestFirst_.emplace(newestFirst_.begin(), line);
    if (newestFirst_.size() > kMost) newestFirst_.pop_back();
}

std::vector<std::string> Problems::list() const {
    const std::lock_guard lock(mutex_);
    return newestFirst_;
}

}  // namespace keepsakes
