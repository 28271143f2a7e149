// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/Clock.h"
#include "notify/KSNotifier.h"

namespace keepsakes {

/// A sample source: while somebody listens it sends identifier 0 with a running count every
/// second, and identifier 1 every sixtieth time.
class KSExampleNotifier final : public KSNotifier {
  public:
    KSExampleNotifier(std::string_view name, Clock& clock);
    ~KSExampleNotifier() override;

  protected:
    void onEnable() override;

  private:
    void tick();

    Clock& clock_;
    // Only on the queue.
    std::int32_t count_ = 0;
    Timer next_;
};

}  // namespace keepsakes
