// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

namespace keepsakes {

/// A card as the index keeps it.
struct BookCard {
    std::string uid;
    std::string name;
    std::vector<std::string> handles;
    bool fromPhone = false;  ///< The name of a number in a backup of messages, no card of its own.
};

struct BookPerson {
    std::string identifier;  ///< The same as long as one of the person's cards stays the first.
    std::string name;        ///< Or a handle, when no card has a name.
    std::vector<std::string> handles;

    friend bool operator==(const BookPerson&, const BookPerson&) = default;
};

/// The people behind the cards, in whatever order the cards come. Cards are of one person when they
/// have the same UID, or the same name (case, accents and separators aside) and a handle in common;
/// a phone's name for a number is that of whoever has the number, and one name is one person. A
/// handle that several people give (the telephone at home) belongs to the first of them. People
/// without handles are left out.
std::vector<BookPerson> peopleOf(std::vector<BookCard> cards);

}  // namespace keepsakes
