// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/KSAssertion.h"

namespace keepsakes {

/// Collects the assertion failures of a test while it lives, in place of the handler before it.
class RecordedAssertions {
  public:
    RecordedAssertions();
    ~RecordedAssertions();
    RecordedAssertions(const RecordedAssertions&) = delete;
    RecordedAssertions& operator=(const RecordedAssertions&) = delete;

    /// "<description> (<unit>:<line>)" of each, in order; forgets them.
    std::vector<std::string> take();

    /// As `take`, the descriptions alone.
    std::vector<std::string> takeDescriptions();

  private:
    struct State;
    std::shared_ptr<State> state_;
    KSAssertionHandler before_;
};

}  // namespace keepsakes
