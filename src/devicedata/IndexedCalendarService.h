// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "devicedata/IndexFile.h"
#include "platform/CalendarService.h"

namespace keepsakes {

/// The owner's calendars answered from the index, as the last scan left it. Every store is one to
/// look events up in, whatever the options; it does not need the service to stay.
class IndexedCalendarService final : public CalendarService {
  public:
    explicit IndexedCalendarService(std::filesystem::path index) : index_(std::move(index)) {}

    std::unique_ptr<CalendarStore> openStore(std::uint64_t options) override;

  private:
    const IndexFile index_;
};

}  // namespace keepsakes
