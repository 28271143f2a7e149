// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "core/KSValue.h"

namespace keepsakes {

/// Takes events for the owner's own records. Any thread may call it; it never blocks its caller and
/// never fails: what cannot be kept is dropped and counted.
class AnalyticsService {
  public:
    virtual ~AnalyticsService() = default;
    virtual void send(std::string_view event, const KSDictionary& fields) = 0;
};

}  // namespace keepsakes
