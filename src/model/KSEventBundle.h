// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "model/KSEvent.h"

namespace keepsakes {

/// A group of events that is offered to the owner as one suggestion. Built on the bundle manager's
/// queue or read from the database or a message, then shared as `KSEventBundlePointer` and not
/// changed. Identity, equality and hash are the identifier's alone.
class KSEventBundle final {
  public:
    /// A missing argument fails the assertion that names it and yields nothing.
    static std::shared_ptr<KSEventBundle> initWithBundleIdentifier(
        std::optional<KSUUID> bundleIdentifier, std::optional<KSDate> creationDate);

    /// A new bundle of these events (distinct ones), made at `now`.
    static std::shared_ptr<KSEventBundle> initWithEventSet(KSEventArray events, bool filtered,
                                                           KSDate now);

    const KSUUID& bundleIdentifier() const { return bundleIdentifier_; }
    KSDate creationDate() const { return creationDate_; }

    bool isEqual(const KSEventBundle& other) const {
        return bundleIdentifier_ == other.bundleIdentifier_;
    }

    /// Takes the span, the latest expiration date and the providers' bits from the events. Bits
    /// that are set stay set. Without events the span is from the distant future to the distant
    /// past.
    void setPropertiesBasedOnEvents();

    /// Whether both hold equal events, compared one by one in order of their start.
    bool containTheSameEventSet(const KSEventBundle& other) const;

    /// Whether an event of this has the identifier of an event of the other.
    bool shareEvents(const KSEventBundle& other) const;

    /// One line for logs.
    std::string description() const;

    void encodeWithCoder(KeyedEncoder& encoder) const;
    /// Without "bundleIdentifier" or "creationDate" the decoder fails and nothing is yielded.
    static std::shared_ptr<KSEventBundle> initWithCoder(KeyedDecoder& decoder);

    bool filtered = false;  ///< Made by a rule.
    std::optional<KSDate> startDate;
    std::optional<KSDate> endDate;
    std::optional<KSDate> expirationDate;  ///< The bundle is purged after it.
    std::uint64_t source = 0;              ///< Bit (provider - 1) for each of the providers 1 to 4.
    std::string bundleType;                ///< The rule's name; neither stored nor coded.
    std::optional<std::string> promptLanguage;  ///< What a client shows with the bundle.
    KSEventArray events;

  private:
    static constexpr std::string_view kUnit = "KSEventBundle";

    KSEventBundle(const KSUUID& bundleIdentifier, KSDate creationDate)
        : bundleIdentifier_(bundleIdentifier), creationDate_(creationDate) {}

    KSUUID bundleIdentifier_;
    KSDate creationDate_;
};

using KSEventBundlePointer = std::shared_ptr<const KSEventBundle>;
using KSEventBundleArray = std::vector<KSEventBundlePointer>;

}  // namespace keepsakes
