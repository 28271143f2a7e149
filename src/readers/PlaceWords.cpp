// SPDX-License-Identifier: Apache-2.0
#include "readers/PlaceWords.h"

#include <algorithm>

#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

// English, German, French, Spanish, Italian and Dutch; "residence" is how receivers
// name the symbol of a house.
constexpr std::string_view kHome =
    "home my-home residence zuhause daheim zu-hause wohnung maison chez-moi domicile casa mi-casa "
    "hogar casa-mia thuis huis";
constexpr std::string_view kWork =
    "work my-work office workplace arbeit büro arbeitsplatz travail bureau trabajo oficina lavoro "
    "ufficio werk kantoor";

bool isOneOf(const std::vector<std::string>& words, const std::string& word) {
    return std::ranges::find(words, word) != words.end();
}

}  // namespace

PlaceUse useOfPlaceName(std::string_view name) {
    static const auto home = foldedWords(kHome);
    static const auto work = foldedWords(kWork);
    const auto word = foldWord(name);
    if (isOneOf(home, word)) return PlaceUse::home;
    return isOneOf(work, word) ? PlaceUse::work : PlaceUse::unknown;
}

}  // namespace keepsakes
