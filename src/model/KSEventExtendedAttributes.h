// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "core/KSValue.h"
#include "model/KeyedCoding.h"

namespace keepsakes {

/// A person recognised on a photo. A plain value.
struct KSPerson {
    std::optional<std::string> localIdentifier;
    std::optional<std::string> name;
    std::optional<std::string> contactIdentifier;
    std::optional<std::string> family;

    static KSPerson initWithPersonDictionary(const KSDictionary& dictionary);
    std::string description() const;
    void encodeWithCoder(KeyedEncoder& encoder) const;
    static bool initWithCoder(KeyedDecoder& decoder, KSPerson& person);

    friend bool operator==(const KSPerson&, const KSPerson&) = default;
};

/// A public event that photos were taken at. A plain value.
struct KSPublicEvent {
    std::optional<std::string> name;
    std::optional<std::vector<std::string>> performers;
    std::optional<std::string> venue;

    static KSPublicEvent initWithEventDictionary(const KSDictionary& dictionary);
    std::string description() const;
    void encodeWithCoder(KeyedEncoder& encoder) const;
    static bool initWithCoder(KeyedDecoder& decoder, KSPublicEvent& event);

    friend bool operator==(const KSPublicEvent&, const KSPublicEvent&) = default;
};

/// What the photo analysis inferred about one keepsake. Built once, then shared and not changed;
/// the same keepsake when the local identifiers are equal.
struct KSEventExtendedAttributes {
    std::string photoKeepsakeLocalIdentifier;
    std::optional<std::vector<std::string>> photoKeepsakeInferences;  ///< Lower-cased.
    std::optional<std::vector<std::string>> photoKeepsakeHolidays;    ///< Lower-cased.
    std::optional<std::vector<KSPublicEvent>> photoKeepsakePublicEvents;
    std::optional<std::vector<KSPerson>> photoKeepsakePersons;
    /// How many photos the keepsake holds, when its source says so. For texts; not coded.
    std::optional<std::int64_t> photoCount;

    using Pointer = std::shared_ptr<const KSEventExtendedAttributes>;

    /// A missing identifier fails the assertion and yields nothing.
    static std::shared_ptr<KSEventExtendedAttributes> initWithLocalIdentifier(
        std::optional<std::string> identifier);
    /// From a keepsake dictionary of the photo analysis service.
    static Pointer initWithKeepsake(const KSDictionary& keepsake);
    static std::vector<std::string> lowerCaseArrayOfStrings(
        const std::vector<std::string>& strings);

    bool isEqual(const KSEventExtendedAttributes& other) const {
        return photoKeepsakeLocalIdentifier == other.photoKeepsakeLocalIdentifier;
    }
    std::string description() const;
    void encodeWithCoder(KeyedEncoder& encoder) const;
    static bool initWithCoder(KeyedDecoder& decoder, Pointer& attributes);
};

/// The array's strings; elements of other kinds are left out.
std::vector<std::string> stringsOf(const KSArray& array);

}  // namespace keepsakes
