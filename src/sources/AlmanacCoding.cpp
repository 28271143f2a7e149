// SPDX-License-Identifier: Apache-2.0
#include "sources/AlmanacCoding.h"

namespace keepsakes {

KSDictionary encodeTripPart(const TripPart& part) {
    const auto& identifiers = part.eventIdentifiers;
    KSDictionary dictionary{{"eventIdentifiers", KSArray(identifiers.begin(), identifiers.end())}};
    if (part.placemark) dictionary.emplace("placemark", *part.placemark);
    return dictionary;
}

KSDictionary encodeCalendarEvent(const CalendarEvent& event) {
    KSDictionary dictionary{{"eventIdentifier", event.eventIdentifier},
                            {"title", event.title},
                            {"startDate", event.startDate},
                            {"endDate", event.endDate},
                            {"isAllDay", event.isAllDay}};
    if (!event.location.empty()) dictionary.emplace("location", event.location);
    if (!event.calendar.empty()) dictionary.emplace("calendar", event.calendar);
    if (!event.attendees.empty()) {
        dictionary.emplace("attendees", KSArray(event.attendees.begin(), event.attendees.end()));
    }
    return dictionary;
}

}  // namespace keepsakes
