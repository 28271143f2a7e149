// SPDX-License-Identifier: Apache-2.0
#include "readers/ContactReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <string>
#include <unordered_map>

#include "readers/CardLine.h"
#include "readers/Handles.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

/// "geo:47.07,15.43;u=10" of vCard 4.0, "47.07;15.43" before it, "47.07,15.43" by mistake.
std::optional<GeoPoint> positionOf(std::string_view text) {
    if (text.starts_with("geo:")) text.remove_prefix(4);
    std::array<double, 2> degrees{};
    for (auto& one : degrees) {
        while (text.starts_with(' ') || text.starts_with('+')) text.remove_prefix(1);
        const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), one);
        if (error != std::errc() || !std::isfinite(one)) return std::nullopt;
        text.remove_prefix(static_cast<std::size_t>(end - text.data()));
        if (&one == &degrees.front()) {
            if (!text.starts_with(',') && !text.starts_with(';')) return std::nullopt;
            text.remove_prefix(1);
        }
    }
    const bool isOnEarth = std::abs(degrees[0]) <= 90 && std::abs(degrees[1]) <= 180;
    if (!isOnEarth || (degrees[0] == 0 && degrees[1] == 0)) return std::nullopt;
    return GeoPoint{.latitude = degrees[0], .longitude = degrees[1]};
}

struct RelationWords {
    std::string_view relationship;
    std::string_view words;  ///< Apart by blanks.
};

// RFC 6350, 6.6.6; categories in English, German, French, Spanish, Italian and Dutch; properties of
// widespread address books.
constexpr auto kRelations = std::to_array<RelationWords>({
    {"family",
     "family child parent sibling spouse kin familie famille familia famiglia verwandte x-spouse "
     "x-evolution-spouse x-kaddressbook-x-spousesname"},
    {"friend", "friend friends freund freunde ami amis amigo amigos amico amici vriend vrienden"},
    {"colleague",
     "colleague colleagues co-worker kollege kollegen collègue collègues colega colegas collega "
     "colleghi collega's x-manager x-assistant x-evolution-manager x-evolution-assistant "
     "x-kaddressbook-x-managersname x-kaddressbook-x-assistantsname"},
    {"neighbor",
     "neighbor neighbors neighbour neighbours co-resident nachbar nachbarn voisin voisins vecino "
     "vecinos vicino vicini buur buren"},
    {"sweetheart", "sweetheart date crush muse"},
    {"acquaintance", "acquaintance acquaintances contact met bekannte"},
});

/// Nothing for any other word: what is counted under a relationship never holds a text of the
/// owner's.
std::string_view relationshipOf(std::string_view word) {
    static const auto table = [] {
        std::unordered_map<std::string, std::string_view> made;
        for (const auto& row : kRelations) {
            for (auto& key : foldedWords(row.words)) made.emplace(std::move(key), row.relationship);
        }
        return made;
    }();
    const auto found = table.find(foldWord(word));
    return found == table.end() ? std::string_view() : found->second;
}

/// One card while its lines are read.
class Card {
  public:
    void line(const CardLine& line) {
        if (line.name == "FN") {
            set(formatted_, cardText(line.text));
        } else if (line.name == "N") {
            const auto parts = cardParts(line.text);
            auto name = parts.size() > 1 ? parts[1] : std::string();
            if (!name.empty() && !parts[0].empty()) name += ' ';
            set(structured_, name + parts[0]);
        } else if (line.name == "NICKNAME") {
            set(nickname_, cardText(line.text));
        } else if (line.name == "UID") {
            set(card_.uid, cardText(line.text));
        } else if (line.name == "TEL") {
            add(phoneHandle(cardText(line.text)));
        } else if (line.name == "EMAIL") {
            add(mailHandle(cardText(line.text)));
        } else if (line.name == "IMPP" || line.name == "X-JABBER" || line.name == "X-MATRIX") {
            add(chatHandle(cardText(line.text)));
        } else if (line.name == "GEO") {
            if (!card_.position) card_.position = positionOf(cardText(line.text));
        } else if (line.name == "KIND" || line.name == "X-ADDRESSBOOKSERVER-KIND") {
            isPerson_ = foldWord(line.text) == "individual";
        } else if (line.name == "CATEGORIES") {
            addRelations(line.text, "");
        } else if (line.name == "RELATED") {
            addRelations(line.parameter("TYPE"), cardText(line.text));
        } else {
            addRelations(line.name, cardText(line.text));
        }
    }

    /// The card, when it is a person's.
    std::optional<ContactCard> finish() {
        if (!isPerson_) return std::nullopt;
        for (auto* name : {&formatted_, &structured_, &nickname_}) {
            if (card_.name.empty()) card_.name = std::move(*name);
        }
        // A category tells of the card's own person.
        for (auto& relation : card_.relations) {
            if (relation.name.empty()) relation.name = card_.name;
        }
        return std::move(card_);
    }

  private:
    static void set(std::string& field, const std::string& text) {
        if (field.empty() && text.size() <= limits::kLongestName) field = text;
    }

    void add(const std::string& handle) {
        auto& handles = card_.handles;
        if (handle.empty() || isServiceCode(handle) || handles.size() >= limits::kMostHandles ||
            std::ranges::find(handles, handle) != handles.end()) {
            return;
        }
        handles.push_back(handle);
    }

    /// A relation to `name` for each of the words, which commas separate, that stands for one.
    void addRelations(std::string_view words, std::string_view name) {
        constexpr std::string_view kUuid = "urn:uuid:";
        if (name.starts_with(kUuid)) name.remove_prefix(kUuid.size());
        if (name.size() > limits::kLongestName) return;
        while (!words.empty()) {
            const auto end = std::min(words.find(','), words.size());
            const auto relationship = relationshipOf(words.substr(0, end));
            words.remove_prefix(std::min(end + 1, words.size()));
            if (relationship.empty() || card_.relations.size() >= limits::kMostNames) continue;
            CardRelation relation{std::string(relationship), std::string(name)};
            if (std::ranges::find(card_.relations, relation) == card_.relations.end()) {
                card_.relations.push_back(std::move(relation));
            }
        }
    }

    ContactCard card_;
    std::string formatted_;
    std::string structured_;
    std::string nickname_;
    bool isPerson_ = true;
};

}  // namespace

std::expected<void, std::string> readContacts(const ReadBlock& read, PeopleSink& sink) {
    CardLines lines(read);
    std::optional<Card> card;
    std::size_t depth = 0;  // A card may hold that of an agent, who is nobody's contact.
    std::size_t count = 0;
    CardLine parsed;
    for (std::string line;;) {
        const auto more = lines.next(line);
        if (!more) return std::unexpected(more.error());
        if (!*more) break;
        if (count == 0 && depth == 0 && line.starts_with("\xEF\xBB\xBF")) line.erase(0, 3);
        if (!parseCardLine(line, parsed)) continue;
        const bool isOfCard = foldWord(parsed.text) == "vcard";
        if (parsed.name == "BEGIN" && isOfCard) {
            if (depth++ == 0) card.emplace();
        } else if (parsed.name == "END" && isOfCard && depth > 0) {
            if (--depth > 0) continue;
            if (++count > limits::kMostCards) {
                return std::unexpected(fmt::format("more than {} cards", limits::kMostCards));
            }
            if (const auto found = card->finish()) sink.card(*found);
        } else if (depth == 1) {
            card->line(parsed);
        }
    }
    if (depth > 0) return std::unexpected("the last card does not end");
    if (count == 0) return std::unexpected("it holds no card");
    return {};
}

}  // namespace keepsakes
