// SPDX-License-Identifier: Apache-2.0
#include "readers/SuggestionRules.h"

#include <unicode/regex.h>

#include <algorithm>
#include <array>
#include <cassert>
#include <memory>

#include "core/Text.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

using enum SuggestionCategory;

// ---- The tables. To recognise more, add rows; the first row that holds decides. ----

/// Who sends entries of one kind alone: a part of UID, organizer or URL, in lower case.
struct SenderRule {
    std::string_view part;
    SuggestionCategory category;
};
constexpr auto kSenders = std::to_array<SenderRule>({
    {"@hafas", train},
    {"trainline.", train},
    {"flixbus.", bus},
    {"@airbnb.", lodging},
    {"booking.com", lodging},
    {"opentable.", food},
    {"thefork.", food},
    {"eventbrite.", ticket},
    {"ticketmaster.", ticket},
    {"eventim.", ticket},
    {"meetup.com", social},
});

/// Words of the property CATEGORIES, folded as `foldWord` does.
struct CategoryRule {
    SuggestionCategory category;
    std::string_view words;
};
constexpr auto kCategories = std::to_array<CategoryRule>({
    {flight, "flight flights flug fluge vol vols vuelo vuelos volo voli vlucht vluchten"},
    {train, "train trains zug bahn zugfahrt bahnfahrt tren treno treni trein"},
    {bus, "bus coach fernbus autocar autobus"},
    {boat, "boat ferry cruise fahre schiff ferry traghetto veerboot kreuzfahrt croisiere"},
    {lodging, "hotel hotels lodging accommodation unterkunft hebergement alojamiento alloggio"},
    {food, "restaurant restaurants ristorante restaurante"},
    {movie, "cinema kino movie movies film cine bioscoop"},
    {ticket, "concert konzert concierto concerto theatre theater theatre teatro opera oper opera"},
    {social,
     "birthday birthdays geburtstag geburtstage anniversaire anniversaires cumpleanos"
     " compleanno compleanni verjaardag verjaardagen anniversary jahrestag hochzeit"
     " wedding mariage boda matrimonio bruiloft party feier fete fiesta festa feest"},
});

/// Phrases of titles and descriptions; regular expressions of ICU. A row holds when all of its
/// expressions are found. Words are written in the language's own spelling; (?i:…) ignores case.
struct PhraseRule {
    SuggestionCategory category;
    const char* title;
    const char* description = nullptr;
    bool needsCompany = false;  ///< Two attendees and more.
};

/// Expressions that the rows share; "@name@" in a row stands for one.
struct SharedExpression {
    std::string_view name;
    std::string_view text;
};
constexpr auto kShared = std::to_array<SharedExpression>({
    {"@car@",
     "(?i:\\b(?:car rental|rental car|hire car|mietwagen|mietauto|leihwagen|"
     "location de voiture|voiture de location|coche de alquiler|alquiler de coche|"
     "autonoleggio|noleggio auto|auto a noleggio|huurauto|autoverhuur))"},
    {"@return@",
     "(?i:\\b(?:return|drop-?off|rückgabe|abgabe|restitution|retour|devolución|"
     "riconsegna|inleveren)\\b)"},
    {"@meal@",
     "(?i:\\b(?:dinner|supper|lunch|brunch|breakfast|coffee|drinks|beer|barbecue|bbq|"
     "picnic|abendessen|mittagessen|essen|frühstück|kaffee|grillen|grillfest|grillabend|"
     "picknick|dîner|déjeuner|souper|apéro|café|pique-nique|cena|almuerzo|comida|"
     "desayuno|barbacoa|pranzo|aperitivo|colazione|grigliata|diner|etentje|borrel|"
     "koffie)\\b)"},
    // A carrier's two characters and the number.
    {"@flight@", "\\b(?:[A-Z]{2}|[A-Z][0-9]|[0-9][A-Z])\\s?[0-9]{1,4}\\b"},
    {"@train@",
     "\\b(?:ICE|ECE|TGV|THA|EST|RJX?|NJ|IC|EC|IRE|AVE|Eurostar|Thalys|Railjet|Nightjet|"
     "Ouigo|Frecciarossa|Frecciargento|Intercités|Intercity|Snälltåget|Alvia)"
     "\\s{0,4}[0-9]{2,5}\\b"},
    {"@airports@", "\\b(?<from>[A-Z]{3})\\s?(?:→|->|–|—|-|✈|to|nach)\\s?(?<to>[A-Z]{3})\\b"},
    {"@arrow@", "\\s(?:->|→|–|—|-|>)\\s"},
    {"@towards@", "\\b(?:to|from|nach|von|à|vers|pour|de|a|hacia|per|da|naar|van)\\b"},
});

constexpr auto kPhrases = std::to_array<PhraseRule>({
    {flight, "@airports@.*@flight@"},
    {flight, "@flight@.*@airports@"},
    {flight, "(?i:\\b(?:flight|flug|vol|vuelo|volo|vlucht|voo)\\b)[^0-9]{0,12}@flight@"},
    {flight, "(?i:^(?:(?:return )?flight|(?:rück|hin)?flug|vol|vuelo|volo|vlucht) @towards@)"},
    {flight, "@airports@", "@flight@"},
    {train, "@train@"},
    {train,
     "(?i:^(?:train|zug|zugfahrt|bahn|bahnfahrt|tren|treno|trein|nachtzug|night train)\\b.*"
     "@towards@)"},
    {train, "@arrow@", "@train@"},
    {train, "(?i:\\b(?:from|von|de|da|van)\\b.+\\b(?:to|nach|à|a|naar)\\b)", "@train@"},
    {bus, "(?i:^(?:flixbus|fernbus|bus|coach|autocar|autobús|autobus|pullman)\\b.*@towards@)"},
    {boat,
     "(?i:\\b(?:ferry|fähre|fährfahrt|traghetto|veerboot|cruise|kreuzfahrt|croisière|crucero|"
     "crociera|schifffahrt)\\b)"},
    {carRentalDropoff, "@car@.*@return@"},
    {carRentalDropoff, "@return@.*@car@"},
    {carRentalPickup, "@car@"},
    {lodging,
     "(?i:^(?:hotel|hôtel|hostel|airbnb|pension|ferienwohnung|ferienhaus|gasthof|"
     "jugendherberge|b&b|bed and breakfast|chambre d.hôtes?|gîte|auberge|albergo|"
     "agriturismo|hostal|posada|herberg|vakantiehuis|camping|campingplatz)\\b)"},
    {lodging, "(?i:\\b(?:check-?in|stay(?:ing)? at|übernachtung|aufenthalt)\\b)"},
    {lodging,
     "(?i:\\b(?:reservation|booking|reservierung|buchung|réservation|reserva|"
     "prenotazione|reservering|boeking)\\b.*"
     "\\b(?:hotel|hôtel|hostel|apartment|b&b|albergo))"},
    {food,
     "(?i:\\b(?:table (?:for|at)|tisch (?:für|bei|im)|tischreservierung|table pour|"
     "mesa para|tavolo per|tafel voor|dinner reservation|restaurant|ristorante|restaurante|"
     "trattoria|osteria)\\b)"},
    {movie,
     "(?i:^(?:cinema|kino|kinobesuch|movies?|movie night|cine|cinéma|filmabend|"
     "bioscoop)\\b)"},
    {ticket,
     "(?i:\\b(?:tickets? for|(?:eintritts)?karten für|billets? pour|entradas? para|"
     "biglietti per|kaartjes voor|concert|konzert|concierto|opera|oper|opéra|ópera|"
     "theatre|theater|théâtre|teatro|musical|ballet|ballett|festival|cabaret|kabarett|"
     "stand-?up comedy|exhibition|ausstellung)\\b)"},
    {social, "@meal@", nullptr, true},
    {naturalLanguage,
     "(?i:birthday|geburtstag|\\banniversaire\\b|cumpleaños|compleanno|"
     "verjaardag|\\banniversary\\b|hochzeitstag|\\baniversario\\b)"},
    {naturalLanguage,
     "(?i:\\b(?:wedding|hochzeit|polterabend|mariage|boda|matrimonio|bruiloft|"
     "baptism|taufe|baptême|graduation|housewarming|family reunion|"
     "familienfeier|familientreffen|klassentreffen|party|gartenparty|"
     "weihnachtsfeier|sommerfest|fête|fiesta|festa|feest(?:je)?)\\b)"},
    {naturalLanguage, "@meal@.*(?i:\\b(?:with|mit|bei|avec|chez|con|met|bij)\\b)"},
});

/// Where a title tells of a journey from one place to another.
constexpr auto kRoutes = std::to_array<const char*>({
    "@airports@",
    "(?i:\\b(?:from|von|de|da|van|desde)\\s+)(?<from>[^:;]{2,60}?),?\\s+"
    "(?i:to|nach|à|vers|a|hacia|per|naar)\\s+(?<to>[^,;:(]{2,60})",
    "(?:^|:\\s*)(?<from>[^:;]{2,60}?)@arrow@(?<to>[^;:]{2,60})",
    "(?i:\\b(?:to|nach|à|vers|hacia|naar)\\s+)(?<to>[^,;:(]{2,60})",
    "(?i:\\b(?:from|von|desde|van)\\s+)(?<from>[^,;:(]{2,60})",
});

/// What a title without letters in front is replaced with.
struct CategoryNoun {
    SuggestionCategory category;
    std::string_view noun;
};
constexpr auto kNouns = std::to_array<CategoryNoun>({
    {flight, "Flight"},
    {train, "Train"},
    {bus, "Bus"},
    {boat, "Boat"},
});

// ---- How they are applied. ----

/// Steps after which ICU gives an expression up; strangers write the texts.
constexpr std::int32_t kMostRegexSteps = 2000;
constexpr std::int32_t kMostStack = 1 << 20;

class Expression {
  public:
    explicit Expression(const char* text) {
        UErrorCode status = U_ZERO_ERROR;
        auto pattern = icu::UnicodeString::fromUTF8(text);
        for (const auto& shared : kShared) {
            pattern.findAndReplace(icu::UnicodeString::fromUTF8(std::string(shared.name)),
                                   icu::UnicodeString::fromUTF8(std::string(shared.text)));
        }
        pattern_.reset(icu::RegexPattern::compile(pattern, 0, status));
        assert(U_SUCCESS(status));
    }

    /// The matcher at its first find; null when there is none. `text` outlives it.
    std::unique_ptr<icu::RegexMatcher> find(const icu::UnicodeString& text) const {
        UErrorCode status = U_ZERO_ERROR;
        if (!pattern_) return nullptr;
        std::unique_ptr<icu::RegexMatcher> matcher(pattern_->matcher(text, status));
        if (U_FAILURE(status)) return nullptr;
        matcher->setTimeLimit(kMostRegexSteps, status);
        matcher->setStackLimit(kMostStack, status);
        return matcher->find(status) && U_SUCCESS(status) ? std::move(matcher) : nullptr;
    }

  private:
    std::unique_ptr<icu::RegexPattern> pattern_;
};

struct CompiledPhrase {
    explicit CompiledPhrase(const PhraseRule& row) : rule(&row), title(row.title) {
        if (row.description) description = std::make_unique<Expression>(row.description);
    }
    const PhraseRule* rule;
    Expression title;
    std::unique_ptr<Expression> description;
};

const std::vector<CompiledPhrase>& phrases() {
    static const auto compiled = [] {
        return std::vector<CompiledPhrase>(std::begin(kPhrases), std::end(kPhrases));
    }();
    return compiled;
}

const std::vector<Expression>& routes() {
    static const auto compiled = [] {
        return std::vector<Expression>(std::begin(kRoutes), std::end(kRoutes));
    }();
    return compiled;
}

std::string group(icu::RegexMatcher& matcher, const char* name) {
    UErrorCode status = U_ZERO_ERROR;
    const auto number = matcher.pattern().groupNumberFromName(name, -1, status);
    if (U_FAILURE(status)) return {};
    const auto text = matcher.group(number, status);
    std::string bytes;
    return U_SUCCESS(status) ? text.toUTF8String(bytes) : std::string();
}

bool isJourney(SuggestionCategory category) {
    return category == flight || category == train || category == bus || category == boat;
}

std::optional<SuggestionCategory> bySender(const EntryText& entry) {
    const auto origin = lowerCased(entry.origin);
    for (const auto& rule : kSenders) {
        if (origin.find(rule.part) != std::string::npos) return rule.category;
    }
    return std::nullopt;
}

std::optional<SuggestionCategory> byCategories(const EntryText& entry) {
    for (const auto& category : entry.categories) {
        const auto key = foldWord(category);
        for (const auto& rule : kCategories) {
            std::string_view words = rule.words;
            while (!words.empty()) {
                const auto end = std::min(words.find(' '), words.size());
                if (words.substr(0, end) == key) return rule.category;
                words.remove_prefix(std::min(end + 1, words.size()));
            }
        }
    }
    return std::nullopt;
}

std::optional<SuggestionCategory> byPhrases(const EntryText& entry) {
    const auto title = icu::UnicodeString::fromUTF8(entry.title);
    const auto description = icu::UnicodeString::fromUTF8(entry.description);
    for (const auto& phrase : phrases()) {
        if (phrase.rule->needsCompany && entry.attendees < 2) continue;
        if (phrase.description && !phrase.description->find(description)) continue;
        if (phrase.title.find(title)) return phrase.rule->category;
    }
    return std::nullopt;
}

void fillRoute(Recognition& found, const EntryText& entry) {
    const auto title = icu::UnicodeString::fromUTF8(entry.title);
    for (const auto& route : routes()) {
        const auto matcher = route.find(title);
        if (!matcher) continue;
        found.origin = townIn(group(*matcher, "from"));
        found.destination = townIn(group(*matcher, "to"));
        break;
    }
}

/// "#1234: From A to B" is a number to its company, and a train to its owner.
std::string titleOf(const Recognition& found, const EntryText& entry) {
    const auto first = entry.title.find_first_not_of(" #0123456789:;.-");
    const bool isNumbered = entry.title.starts_with('#') || first == std::string::npos;
    const auto* const noun = std::ranges::find(kNouns, found.category, &CategoryNoun::category);
    if (!isNumbered || noun == kNouns.end()) return entry.title;
    std::string title(noun->noun);
    if (!found.origin.empty()) title += " from " + found.origin;
    if (!found.destination.empty()) title += " to " + found.destination;
    return title;
}

}  // namespace

std::optional<Recognition> recognise(const EntryText& entry) {
    for (const auto& value : entry.extensions) {
        auto found = reservationIn(value, entry);
        if (!found) continue;
        if (found->category == none) return std::nullopt;
        return found;
    }
    auto category = bySender(entry);
    if (!category) category = byCategories(entry);
    if (!category) category = byPhrases(entry);
    if (!category) return std::nullopt;
    Recognition found{
        .category = *category, .title = {}, .origin = {}, .destination = {}, .span = std::nullopt};
    if (isJourney(*category)) fillRoute(found, entry);
    if (*category == lodging) found.destination = townOfAddress(entry.location);
    found.title = titleOf(found, entry);
    return found;
}

}  // namespace keepsakes
