// SPDX-License-Identifier: Apache-2.0
#include "support/RecordedAssertions.h"

#include <fmt/format.h>

#include <mutex>
#include <utility>

namespace keepsakes {

struct RecordedAssertions::State {
    std::mutex mutex;
    std::vector<KSAssertionFailure> failures;
};

RecordedAssertions::RecordedAssertions()
    : state_(std::make_shared<State>()),
      before_(setAssertionHandler([state = state_](const KSAssertionFailure& failure) {
          const std::lock_guard lock(state->mutex);
          state->failures.push_back(failure);
      })) {}

RecordedAssertions::~RecordedAssertions() { setAssertionHandler(std::move(before_)); }

std::vector<std::string> RecordedAssertions::take() {
    const std::lock_guard lock(state_->mutex);
    std::vector<std::string> texts;
    for (const auto& failure : std::exchange(state_->failures, {})) {
        texts.push_back(fmt::format("{} ({}:{})", failure.description, failure.unit, failure.line));
    }
    return texts;
}

std::vector<std::string> RecordedAssertions::takeDescriptions() {
    const std::lock_guard lock(state_->mutex);
    std::vector<std::string> texts;
    for (auto& failure : std::exchange(state_->failures, {})) {
        texts.push_back(std::move(failure.description));
    }
    return texts;
}

}  // namespace keepsakes
