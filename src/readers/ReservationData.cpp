// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <array>
#include <cmath>

#include "core/Json.h"
#include "readers/SuggestionRules.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

/// What a type of schema.org is, and the properties of what was reserved that name the places.
struct ReservationType {
    std::string_view type;
    SuggestionCategory category;
    std::string_view origin{};
    std::string_view destination{};
};

// ---- The types. To know another one, add its row. ----
constexpr auto kTypes = std::to_array<ReservationType>({
    {"FlightReservation", SuggestionCategory::flight, "departureAirport", "arrivalAirport"},
    {"TrainReservation", SuggestionCategory::train, "departureStation", "arrivalStation"},
    {"BusReservation", SuggestionCategory::bus, "departureBusStop", "arrivalBusStop"},
    {"BoatReservation", SuggestionCategory::boat, "departureBoatTerminal", "arrivalBoatTerminal"},
    {"RentalCarReservation", SuggestionCategory::carRentalPickup},
    {"LodgingReservation", SuggestionCategory::lodging},
    {"FoodEstablishmentReservation", SuggestionCategory::food},
    {"EventReservation", SuggestionCategory::ticket},
    {"Event", SuggestionCategory::ticket},
    {"MusicEvent", SuggestionCategory::ticket},
    {"SportsEvent", SuggestionCategory::ticket},
    {"TheaterEvent", SuggestionCategory::ticket},
    {"ScreeningEvent", SuggestionCategory::movie},
});

const KSValue kNothing;

const KSValue& at(const KSValue& value, std::string_view key) {
    const auto* dictionary = value.asDictionary();
    return dictionary ? valueForKey(*dictionary, key) : kNothing;
}

std::string textOf(const KSValue& value) {
    const auto* text = value.asString();
    return text ? cleanText(*text) : std::string();
}

std::string_view typeOf(const KSValue& value) {
    const auto* text = at(value, "@type").asString();
    return text ? std::string_view(*text) : std::string_view();
}

/// A date, also as an object with a "@value" beside its zone's name.
std::optional<ParsedDate> timeOf(const KSValue& value) {
    const auto* text = value.asString() ? value.asString() : at(value, "@value").asString();
    return text ? parseISO8601(*text) : std::nullopt;
}

std::string townOf(const KSValue& place) {
    const auto& address = at(place, "address");
    if (auto town = textOf(at(address, "addressLocality")); !town.empty()) return town;
    auto code = textOf(at(place, "iataCode"));
    if (auto town = townIn(code); !code.empty() && town != code) return town;
    if (auto town = townOfAddress(textOf(address)); !town.empty()) return town;
    const auto name = textOf(at(place, "name"));
    return name.empty() ? code : townIn(name);
}

bool isCancelled(const KSValue& reservation) {
    for (const auto* key : {"reservationStatus", "eventStatus"}) {
        const auto status = textOf(at(reservation, key));
        if (status.ends_with("Cancelled") || status.ends_with("cancelled")) return true;
    }
    return false;
}

/// How far the entry's start is from a time of the reservation, on its clocks.
double distance(const KSValue& time, KSDate localStart) {
    const auto parsed = timeOf(time);
    if (!parsed) return HUGE_VAL;
    return std::abs(parsed->date + parsed->offsetSeconds.value_or(0) - localStart);
}

std::optional<KSDateInterval> stayOf(const KSValue& reservation) {
    const auto in = timeOf(at(reservation, "checkinTime"));
    const auto out = timeOf(at(reservation, "checkoutTime"));
    if (!in || !out || !in->offsetSeconds || !out->offsetSeconds || out->date < in->date) {
        return std::nullopt;
    }
    return KSDateInterval{in->date, out->date};
}

Recognition recognitionOf(const KSValue& reservation, const ReservationType& type,
                          const EntryText& entry) {
    Recognition found{.category = type.category,
                      .title = {},
                      .origin = {},
                      .destination = {},
                      .span = std::nullopt};
    const auto& reserved = at(reservation, "reservationFor").isNull()
                               ? reservation
                               : at(reservation, "reservationFor");
    if (!type.origin.empty()) {
        found.origin = townOf(at(reserved, type.origin));
        found.destination = townOf(at(reserved, type.destination));
    }
    switch (type.category) {
        case SuggestionCategory::lodging:
            found.destination = townOf(reserved);
            if (entry.isAllDay) found.span = stayOf(reservation);
            break;
        case SuggestionCategory::carRentalPickup:
            if (distance(at(reservation, "dropoffTime"), entry.localStart) <
                distance(at(reservation, "pickupTime"), entry.localStart)) {
                found.category = SuggestionCategory::carRentalDropoff;
            }
            break;
        case SuggestionCategory::ticket:
            if (typeOf(reserved) == "ScreeningEvent" || !at(reserved, "workPresented").isNull()) {
                found.category = SuggestionCategory::movie;
            }
            break;
        default:
            break;
    }
    found.title = entry.title.empty() ? textOf(at(reserved, "name")) : entry.title;
    return found;
}

std::optional<KSValue> jsonOf(std::string_view value) {
    if (auto json = parseJson(value)) return json;
    // Some writers escape it like any text of a calendar, others do not.
    std::string plain;
    for (std::size_t i = 0; i < value.size(); ++i) {
        if (value[i] == '\\' && i + 1 < value.size()) ++i;
        plain += value[i];
    }
    return parseJson(plain);
}

}  // namespace

std::optional<Recognition> reservationIn(std::string_view value, const EntryText& entry) {
    const auto first = value.find_first_not_of(" \t");
    if (first == std::string_view::npos || (value[first] != '[' && value[first] != '{') ||
        value.find("schema.org") == std::string_view::npos) {
        return std::nullopt;
    }
    const auto json = jsonOf(value);
    if (!json) return std::nullopt;
    const auto* list = json->asArray();
    const KSArray single{*json};
    for (const auto& reservation : list ? *list : single) {
        const auto* const type =
            std::ranges::find(kTypes, typeOf(reservation), &ReservationType::type);
        if (type == kTypes.end()) continue;
        if (isCancelled(reservation)) return Recognition();
        return recognitionOf(reservation, *type, entry);
    }
    return std::nullopt;
}

}  // namespace keepsakes
