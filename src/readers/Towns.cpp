// SPDX-License-Identifier: Apache-2.0
#include <algorithm>
#include <array>
#include <cctype>
#include <utility>
#include <vector>

#include "core/Text.h"
#include "readers/SuggestionRules.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

using Airport = std::pair<std::string_view, std::string_view>;

/// Ordered by code.
constexpr auto kAirports = std::to_array<Airport>({
    {"AGP", "Malaga"},       {"ALC", "Alicante"},     {"AMS", "Amsterdam"},
    {"ARN", "Stockholm"},    {"ATH", "Athens"},       {"ATL", "Atlanta"},
    {"AYT", "Antalya"},      {"BCN", "Barcelona"},    {"BEG", "Belgrade"},
    {"BER", "Berlin"},       {"BGO", "Bergen"},       {"BGY", "Bergamo"},
    {"BHX", "Birmingham"},   {"BKK", "Bangkok"},      {"BLQ", "Bologna"},
    {"BOD", "Bordeaux"},     {"BOM", "Mumbai"},       {"BOS", "Boston"},
    {"BRE", "Bremen"},       {"BRI", "Bari"},         {"BRU", "Brussels"},
    {"BSL", "Basel"},        {"BUD", "Budapest"},     {"BVA", "Beauvais"},
    {"CAI", "Cairo"},        {"CDG", "Paris"},        {"CGN", "Cologne"},
    {"CIA", "Rome"},         {"CMN", "Casablanca"},   {"CPH", "Copenhagen"},
    {"CPT", "Cape Town"},    {"CRL", "Charleroi"},    {"CTA", "Catania"},
    {"DEL", "Delhi"},        {"DEN", "Denver"},       {"DFW", "Dallas"},
    {"DOH", "Doha"},         {"DRS", "Dresden"},      {"DTM", "Dortmund"},
    {"DUB", "Dublin"},       {"DUS", "Düsseldorf"},   {"DXB", "Dubai"},
    {"EDI", "Edinburgh"},    {"EIN", "Eindhoven"},    {"EWR", "New York"},
    {"EZE", "Buenos Aires"}, {"FAO", "Faro"},         {"FCO", "Rome"},
    {"FLR", "Florence"},     {"FMM", "Memmingen"},    {"FNC", "Funchal"},
    {"FRA", "Frankfurt"},    {"GDN", "Gdansk"},       {"GIG", "Rio de Janeiro"},
    {"GLA", "Glasgow"},      {"GOT", "Gothenburg"},   {"GRU", "São Paulo"},
    {"GRZ", "Graz"},         {"GVA", "Geneva"},       {"HAJ", "Hanover"},
    {"HAM", "Hamburg"},      {"HEL", "Helsinki"},     {"HER", "Heraklion"},
    {"HKG", "Hong Kong"},    {"HND", "Tokyo"},        {"IAD", "Washington"},
    {"IAH", "Houston"},      {"IBZ", "Ibiza"},        {"ICN", "Seoul"},
    {"INN", "Innsbruck"},    {"IST", "Istanbul"},     {"JFK", "New York"},
    {"JNB", "Johannesburg"}, {"KBP", "Kyiv"},         {"KEF", "Reykjavik"},
    {"KIX", "Osaka"},        {"KLU", "Klagenfurt"},   {"KRK", "Krakow"},
    {"KUL", "Kuala Lumpur"}, {"LAX", "Los Angeles"},  {"LCY", "London"},
    {"LEJ", "Leipzig"},      {"LGA", "New York"},     {"LGW", "London"},
    {"LHR", "London"},       {"LIL", "Lille"},        {"LIN", "Milan"},
    {"LIS", "Lisbon"},       {"LJU", "Ljubljana"},    {"LNZ", "Linz"},
    {"LPA", "Las Palmas"},   {"LTN", "London"},       {"LUX", "Luxembourg"},
    {"LYS", "Lyon"},         {"MAD", "Madrid"},       {"MAN", "Manchester"},
    {"MEL", "Melbourne"},    {"MEX", "Mexico City"},  {"MIA", "Miami"},
    {"MLA", "Malta"},        {"MRS", "Marseille"},    {"MUC", "Munich"},
    {"MXP", "Milan"},        {"NAP", "Naples"},       {"NCE", "Nice"},
    {"NRT", "Tokyo"},        {"NTE", "Nantes"},       {"NUE", "Nuremberg"},
    {"OPO", "Porto"},        {"ORD", "Chicago"},      {"ORY", "Paris"},
    {"OSL", "Oslo"},         {"OTP", "Bucharest"},    {"PEK", "Beijing"},
    {"PHL", "Philadelphia"}, {"PMI", "Palma"},        {"PMO", "Palermo"},
    {"POZ", "Poznan"},       {"PRG", "Prague"},       {"PSA", "Pisa"},
    {"PVG", "Shanghai"},     {"RIX", "Riga"},         {"RTM", "Rotterdam"},
    {"SCL", "Santiago"},     {"SEA", "Seattle"},      {"SFO", "San Francisco"},
    {"SIN", "Singapore"},    {"SKG", "Thessaloniki"}, {"SOF", "Sofia"},
    {"STN", "London"},       {"STR", "Stuttgart"},    {"SVQ", "Seville"},
    {"SXF", "Berlin"},       {"SYD", "Sydney"},       {"SZG", "Salzburg"},
    {"TFS", "Tenerife"},     {"TIA", "Tirana"},       {"TLL", "Tallinn"},
    {"TLS", "Toulouse"},     {"TLV", "Tel Aviv"},     {"TPE", "Taipei"},
    {"TRN", "Turin"},        {"TSF", "Treviso"},      {"TXL", "Berlin"},
    {"VCE", "Venice"},       {"VIE", "Vienna"},       {"VLC", "Valencia"},
    {"VNO", "Vilnius"},      {"WAW", "Warsaw"},       {"WRO", "Wroclaw"},
    {"YUL", "Montreal"},     {"YVR", "Vancouver"},    {"YYZ", "Toronto"},
    {"ZAG", "Zagreb"},       {"ZRH", "Zurich"},
});

/// Words behind a town that say which of its stations, airports or sides; folded.
constexpr auto kStationWords = std::to_array<std::string_view>({
    "hbf",
    "hauptbahnhof",
    "bahnhof",
    "bf",
    "gare",
    "station",
    "centraal",
    "central",
    "centrale",
    "centrum",
    "termini",
    "tgv",
    "nord",
    "est",
    "sud",
    "ouest",
    "ost",
    "sud",
    "west",
    "midi",
    "zuid",
    "stn",
    "lyon",
    "montparnasse",
    "partdieu",
    "stcharles",
    "saintjean",
    "airport",
    "flughafen",
    "aeroport",
    "aeropuerto",
    "aeroporto",
    "luchthaven",
    "international",
    "intl",
    "terminal",
    "portagaribaldi",
    "santalucia",
    "smn",
    "atocha",
    "sants",
    "chamartin",
    "pancras",
    "stpancras",
    "international",
    "zoo",
    "sudkreuz",
    "ostbahnhof",
    "meidling",
});

/// What may stand around the name of a place.
constexpr std::string_view kEdges = " \t.;:-";

bool isCode(std::string_view text) {
    return text.size() == 3 &&
           std::ranges::all_of(text, [](unsigned char c) { return std::isupper(c) != 0; });
}

}  // namespace

std::string townIn(std::string_view place) {
    place = trimmed(place.substr(0, place.find_first_of("(,/|")), kEdges);
    // "ICE 597 Berlin": the number of a train or flight stands before the town.
    const auto digit = place.find_last_of("0123456789");
    if (digit != std::string_view::npos && digit + 2 < place.size() && place[digit + 1] == ' ') {
        place = trimmed(place.substr(digit + 1), kEdges);
    }
    if (isCode(place)) {
        const auto* const found = std::ranges::lower_bound(kAirports, place, {}, &Airport::first);
        return found != kAirports.end() && found->first == place ? std::string(found->second)
                                                                 : std::string(place);
    }
    while (true) {
        const auto blank = place.find_last_of(" -");
        if (blank == std::string_view::npos) break;
        const auto last = foldWord(place.substr(blank + 1));
        // "Part-Dieu" and "Saint Jean" are two words.
        const auto before = place.substr(0, blank).find_last_of(" -");
        const auto lastTwo =
            before == std::string_view::npos ? last : foldWord(place.substr(before + 1));
        const auto isWord = [](const std::string& word) {
            return std::ranges::find(kStationWords, word) != kStationWords.end();
        };
        if (before != std::string_view::npos && isWord(lastTwo)) {
            place = trimmed(place.substr(0, before), kEdges);
        } else if (isWord(last)) {
            place = trimmed(place.substr(0, blank), kEdges);
        } else {
            break;
        }
    }
    // "TOULOUSE" is Toulouse.
    std::string town(place);
    const bool isShouted = town.size() > 3 && std::ranges::all_of(town, [](unsigned char c) {
                               return std::isupper(c) != 0 || c == ' ' || c == '-';
                           });
    if (!isShouted) return town;
    // "MUNICH DE" names its country.
    if (town.size() > 4 && town[town.size() - 3] == ' ') town.resize(town.size() - 3);
    for (std::size_t i = 1; i < town.size(); ++i) {
        if (town[i - 1] != ' ' && town[i - 1] != '-') {
            town[i] = static_cast<char>(std::tolower(static_cast<unsigned char>(town[i])));
        }
    }
    return town;
}

std::string townOfAddress(std::string_view address) {
    std::vector<std::string_view> parts;
    while (!address.empty()) {
        const auto end = std::min(address.find(','), address.size());
        parts.push_back(trimmed(address.substr(0, end), kEdges));
        address.remove_prefix(std::min(end + 1, address.size()));
    }
    // "FI-02600 Espoo", "1012 AB Amsterdam": the words behind the postal code.
    for (const auto part : parts) {
        const auto digit = part.find_first_of("0123456789");
        if (digit > 3) continue;
        const auto end = std::min(part.find_first_not_of("0123456789-", digit), part.size());
        if (end - digit < 4 || end == part.size() || part[end] != ' ') continue;
        auto town = trimmed(part.substr(end), kEdges);
        if (town.size() > 3 && town[2] == ' ' &&
            std::isupper(static_cast<unsigned char>(town[1])) != 0) {
            town = trimmed(town.substr(3), kEdges);
        }
        if (!town.empty()) return std::string(town);
    }
    // Street, town, country.
    return parts.size() == 3 ? std::string(parts[1]) : std::string();
}

}  // namespace keepsakes
