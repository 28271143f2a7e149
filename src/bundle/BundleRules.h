// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "model/KSEvent.h"

namespace keepsakes {

/// Conditions on one event, all of which must hold.
using EventPredicate = std::function<bool(const KSEvent&)>;

/// A desired experience: a cluster that has, for every predicate, at least one event that matches.
struct BundleRule {
    std::string_view name;
    std::vector<EventPredicate> predicates;
};

/// The table of rules. A new rule is a row here and a sentence in PromptLanguage.cpp.
std::vector<BundleRule> predicatesOfDesiredExperiences();

/// Symbolic keys of predicates and the properties of an event that they stand for.
std::map<std::string, std::string> propertyNameDictionary();

}  // namespace keepsakes
