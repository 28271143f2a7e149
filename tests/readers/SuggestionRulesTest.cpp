// SPDX-License-Identifier: Apache-2.0
#include "readers/SuggestionRules.h"

#include <fmt/format.h>
#include <gtest/gtest.h>

namespace keepsakes {
namespace {

/// "<category> <origin> > <destination>", or "-".
std::string told(const EntryText& entry) {
    const auto found = recognise(entry);
    if (!found) return "-";
    auto text = fmt::format("{}", static_cast<int>(found->category));
    if (!found->origin.empty()) text += " " + found->origin;
    if (!found->destination.empty()) text += " > " + found->destination;
    return text;
}

TEST(SuggestionRules, RecogniseByTheWordsOfTitles) {
    const std::vector<std::pair<std::string, std::string>> cases{
        {"Flight AB 8075 from HEL to TXL", "1 Helsinki > Berlin"},
        {"TP 583 GRZ - LIS", "1 Graz > Lisbon"},
        {"Flug nach TOULOUSE FR", "1 > Toulouse"},
        {"Vol AF1234 Paris – Nice", "1 Paris > Nice"},
        {"Train 5186 from Nîmes Gare to Lyon Part-Dieu", "3 Nîmes > Lyon"},
        {"ICE 597 Berlin Hbf → München Hbf", "3 Berlin > München"},
        {"Zug nach Wien", "3 > Wien"},
        {"FlixBus to Prague", "4 > Prague"},
        {"Fähre nach Helgoland", "5 > Helgoland"},
        {"Mietwagen Abholung", "6"},
        {"Return of rental car", "7"},
        {"Mietwagen: Rückgabe", "7"},
        {"Concert: Die Drei", "8"},
        {"Karten für Faust", "8"},
        {"Kino: Der dritte Mann", "9"},
        {"Hotel reservation: Glo Hotel Sello", "10"},
        {"Übernachtung bei Zürich", "10"},
        {"Table for 4 at Da Mario", "2"},
        {"Tisch für zwei", "2"},
        {"Annas Geburtstag", "12"},
        {"Wedding of A and B", "12"},
        {"Abendessen mit Jakob", "12"},
        {"Cena con Lucía", "12"},
        {"Fix ticket 1234", "-"},
        {"Team meeting", "-"},
        {"Lunch", "-"},
        {"Voltage review", "-"},
        {"IC 5 board review", "-"},
        {"Flight planning", "-"},
        {"Training", "-"},
        {"", "-"},
    };
    for (const auto& [title, expected] : cases) {
        EXPECT_EQ(told({.title = title}), expected) << title;
    }
}

TEST(SuggestionRules, AlsoLookAtTheRest) {
    EXPECT_EQ(told({.title = "Lunch", .attendees = 2}), "11");
    EXPECT_EQ(told({.title = "Team meeting", .attendees = 9}), "-");
    EXPECT_EQ(told({.title = "Anna", .categories = {"x", "Geburtstag"}}), "11");
    EXPECT_EQ(
        told({.title = "Frankfurt(Main)Hbf -> Paris Nord", .description = "ab 10:26 (ICE   16)"}),
        "3 Frankfurt > Paris");
    EXPECT_EQ(told({.title = "#12: From Vienna, Hbf, to Brno, dolní nádraží, seat: 1/42",
                    .description = "(RJ, RJ 1234)"}),
              "3 Vienna > Brno");
    EXPECT_EQ(recognise({.title = "#12: From Vienna to Brno", .description = "RJ 1234"})->title,
              "Train from Vienna to Brno");
    EXPECT_EQ(told({.title = "Paul (HMABC)", .origin = " x@airbnb.com"}), "10");
    EXPECT_EQ(
        told({.title = "Hotel Sello", .location = "Leppävaarankatu 1, FI-02600 Espoo, Finland"}),
        "10 > Espoo");
    EXPECT_EQ(told({.title = "January Meetup", .origin = "event_1@meetup.com"}), "11");
}

TEST(SuggestionRules, BelieveReservationsFirst) {
    const std::string flight =
        R"([{"@context":"http://schema.org","@type":"FlightReservation","reservationFor":{)"
        R"("departureAirport":{"iataCode":"HEL","name":"Helsinki"},"arrivalAirport":)"
        R"({"iataCode":"TXL","name":"Berlin Tegel"}}}])";
    std::string escaped;
    for (const char c : flight) escaped += c == ',' ? "\\," : std::string(1, c);
    for (const auto& value : {flight, escaped}) {
        EXPECT_EQ(told({.title = "Concert", .extensions = {value}}), "1 Helsinki > Berlin");
    }
    const std::string start = R"({"@context":"http://schema.org","@type":)";
    const std::vector<std::pair<std::string, std::string>> cases{
        {R"("LodgingReservation","reservationFor":{"address":{"addressLocality":"Espoo"}}})",
         "10 > Espoo"},
        {R"("EventReservation","reservationFor":{"@type":"ScreeningEvent"}})", "9"},
        {R"("Event","name":"37C3"})", "8"},
        {R"("FoodEstablishmentReservation"})", "2"},
        {R"("RentalCarReservation","pickupTime":"2024-06-10T10:00:00Z",)"
         R"("dropoffTime":"2024-06-12T10:00:00Z"})",
         "7"},
        {R"("FlightReservation","reservationStatus":"http://schema.org/ReservationCancelled"})",
         "-"},
        {R"("Person"})", "12"},
        {R"("LodgingReservation",)", "12"},
    };
    for (const auto& [rest, expected] : cases) {
        EXPECT_EQ(told({.title = "Birthday",
                        .extensions = {start + rest},
                        .localStart = parseISO8601("2024-06-12T11:00:00Z")->date}),
                  expected)
            << rest;
    }
}

TEST(SuggestionRules, KnowTheHoursOfAStay) {
    const auto found =
        recognise({.title = "Hotel",
                   .extensions = {R"({"@context":"http://schema.org","@type":"LodgingReservation",)"
                                  R"("checkinTime":{"@value":"2017-09-19T15:00:00+03:00"},)"
                                  R"("checkoutTime":"2017-09-20T12:00:00+03:00"})"},
                   .isAllDay = true});
    ASSERT_TRUE(found && found->span);
    EXPECT_EQ(formatISO8601(found->span->start), "2017-09-19T12:00:00Z");
    EXPECT_EQ(formatISO8601(found->span->end), "2017-09-20T09:00:00Z");
}

}  // namespace
}  // namespace keepsakes
