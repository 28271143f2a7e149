// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

#include "linux/BusThread.h"

namespace keepsakes {

/// Reads the whole state of a service by several calls, so that what belongs together changes
/// together. One reading runs at a time; a change during it has another one follow. Owned by a
/// follower of the service, used on the bus thread only.
class BusReader final {
  public:
    /// Makes the reading's first calls, into a state that it has emptied.
    using Begin = std::function<void()>;
    /// Every call was answered and none failed.
    using Complete = std::function<void()>;
    /// The service is missing (see `BusReply`).
    using Missing = std::function<void()>;
    using Take = std::function<void(sd_bus_message* answer)>;
    using OnRefusal = std::function<void()>;

    BusReader(BusThread& bus, const char* service, Begin begin, Complete complete, Missing missing);

    /// Begins a reading, or has one follow the reading that runs.
    void read();
    /// Forgets the reading that runs: nothing of it is handed over any more.
    void abandon();

    /// Part of the reading that runs: calls a method. An error is the reading's failure; one that
    /// the service itself answered goes to `onRefusal` where there is one.
    void ask(const std::string& path, const char* interface, const char* member,
             const BusThread::Build& build, Take take, OnRefusal onRefusal = nullptr);
    void askProperties(const std::string& path, const char* interface, Take take,
                       OnRefusal onRefusal = nullptr);

    /// The reading that runs changes nothing, for this reason. Logged once for a row of failures.
    void fail(std::string_view reason);

  private:
    void failBy(const BusReply& reply);
    void leave();

    BusThread& bus_;
    const char* const service_;
    const Begin begin_;
    const Complete complete_;
    const Missing missing_;

    std::uint64_t number_ = 0;  ///< Of the reading that runs or ran last.
    int open_ = 0;              ///< Its calls without an answer, and whoever still makes some.
    bool isDue_ = false;
    bool isMissing_ = false;
    std::string failure_;
    bool wasFailing_ = false;
};

}  // namespace keepsakes
