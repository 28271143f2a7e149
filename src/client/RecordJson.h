// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSError.h"
#include "model/KSEvent.h"
#include "model/KSEventBundle.h"

namespace keepsakes {

/// The JSON form of records: their coding keys, dates as seconds since 2001-01-01 UTC and again as
/// ISO 8601 under "<key>ISO", intervals and locations as arrays of two numbers. Reading takes the
/// numbers and passes the ISO keys over.

/// With dates as numbers and their "ISO" siblings; numbers that are not finite become null.
KSValue jsonForm(const KSValue& value);
KSDictionary jsonForm(const KSEvent& event);
KSDictionary jsonForm(const KSEventBundle& bundle);

/// One record a line between brackets; valid JSON as a whole.
std::string jsonRecords(const KSEventArray& events);
std::string jsonRecords(const KSEventBundleArray& bundles);
std::string jsonRecords(const std::vector<KSDictionary>& records);

/// The error says what is wrong with which key, but not with which record.
std::expected<KSEventPointer, KSError> eventFromJson(const KSValue& record);
std::expected<KSEventBundlePointer, KSError> bundleFromJson(const KSValue& record);

/// An array of records; errors read "event 12: startDate: not a date".
std::expected<KSEventArray, KSError> eventsFromJson(std::string_view text);

}  // namespace keepsakes
