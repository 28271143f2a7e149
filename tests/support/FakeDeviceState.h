// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "platform/DeviceState.h"
#include "platform/PowerSources.h"

namespace keepsakes {

class FakeLockState final : public LockState {
  public:
    std::atomic<bool> protects = false;
    std::atomic<bool> unlocked = false;
    std::atomic<int> current = 0;
    Observers<> observers;  ///< Told by the test.

    bool formattedForContentProtection() const override { return protects; }
    bool unlockedSinceBoot() const override { return unlocked; }
    int currentState() const override { return current; }
    Observation observe(const WorkQueue& queue, Task changed) override {
        return observers.add(queue, std::move(changed));
    }
};

class FakeDevicePolicy final : public DevicePolicy {
  public:
    std::atomic<bool> diagnostics = true;
    std::atomic<bool> healthData = true;
    bool diagnosticSubmissionAllowed() const override { return diagnostics; }
    bool healthDataSubmissionAllowed() const override { return healthData; }
};

class FakePowerSource final : public PowerSource {
  public:
    PowerSourceProperties properties() const override {
        const std::lock_guard lock(mutex_);
        return properties_;
    }
    Observation observe(const WorkQueue& queue,
                        std::function<void(std::uint32_t)> handler) override {
        return observers_.add(queue, std::move(handler));
    }

    void set(PowerSourceProperties properties) {
        const std::lock_guard lock(mutex_);
        properties_ = std::move(properties);
    }
    void send(std::uint32_t messageType) { observers_.notify(messageType); }

  private:
    mutable std::mutex mutex_;
    PowerSourceProperties properties_;
    Observers<std::uint32_t> observers_;
};

/// A device with the sources that the test adds, on external power unless told otherwise.
class FakePowerSources final : public PowerSources {
  public:
    void add(std::shared_ptr<PowerSource> source) {
        const std::lock_guard lock(mutex_);
        sources_.push_back(source);
        appeared_.notify(source);
    }
    void setExternalPower(bool connected) {
        if (external_.exchange(connected) != connected) externalChanged_.notify();
    }

    Observation observeSources(
        const WorkQueue& queue,
        std::function<void(const std::shared_ptr<PowerSource>&)> handler) override {
        const std::lock_guard lock(mutex_);
        auto observation = appeared_.add(queue, std::move(handler));
        for (const auto& source : sources_) appeared_.notifyOnly(observation, source);
        return observation;
    }
    bool hasExternalPower() const override { return external_; }
    Observation observeExternalPower(const WorkQueue& queue, Task changed) override {
        return externalChanged_.add(queue, std::move(changed));
    }

  private:
    std::mutex mutex_;
    std::vector<std::shared_ptr<PowerSource>> sources_;
    Observers<std::shared_ptr<PowerSource>> appeared_;
    std::atomic<bool> external_ = true;
    Observers<> externalChanged_;
};

}  // namespace keepsakes
