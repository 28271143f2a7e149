// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "core/KSValue.h"
#include "platform/CalendarService.h"
#include "platform/ProfileEventStore.h"

namespace keepsakes {

/// {"eventIdentifiers": texts, "placemark": text}; without a placemark when nobody knows where.
KSDictionary encodeTripPart(const TripPart& part);

/// {"eventIdentifier", "title", "startDate", "endDate", "isAllDay", "location", "attendees",
/// "calendar"}; what is empty is left out.
KSDictionary encodeCalendarEvent(const CalendarEvent& event);

}  // namespace keepsakes
