// SPDX-License-Identifier: Apache-2.0
#include "indexer/AddressBook.h"

#include <algorithm>
#include <map>
#include <tuple>
#include <unordered_map>
#include <utility>

#include "core/MurmurHash3.h"
#include "readers/Handles.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

std::string keyOf(const BookCard& card) {
    if (!card.uid.empty()) return "uid:" + card.uid;
    return card.handles.empty() ? "name:" + card.name : *std::ranges::min_element(card.handles);
}

/// Which cards are of one person; the first of them stands for all.
class Groups {
  public:
    explicit Groups(std::size_t count) : first_(count) {
        for (std::size_t i = 0; i < count; ++i) first_[i] = i;
    }

    std::size_t of(std::size_t card) {
        while (first_[card] != card) card = first_[card] = first_[first_[card]];
        return card;
    }

    void join(std::size_t a, std::size_t b) {
        const auto first = of(a);
        const auto second = of(b);
        first_[std::max(first, second)] = std::min(first, second);
    }

  private:
    std::vector<std::size_t> first_;
};

}  // namespace

std::vector<BookPerson> peopleOf(std::vector<BookCard> cards) {
    std::ranges::sort(cards, {}, [](const BookCard& card) {
        return std::tuple(card.fromPhone, keyOf(card), card.name, card.handles);
    });
    Groups groups(cards.size());
    std::unordered_map<std::string, std::size_t> byUid;
    std::map<std::pair<std::string, std::string>, std::size_t> byNameAndHandle;
    std::unordered_map<std::string, std::size_t> byHandle;
    std::unordered_map<std::string, std::size_t> byPhoneName;
    for (std::size_t i = 0; i < cards.size(); ++i) {
        const auto& card = cards[i];
        if (!card.uid.empty()) groups.join(i, byUid.try_emplace(card.uid, i).first->second);
        const auto name = foldWord(card.name);
        if (card.fromPhone) groups.join(i, byPhoneName.try_emplace(name, i).first->second);
        for (const auto& handle : card.handles) {
            const auto holder = byHandle.try_emplace(handle, i).first->second;
            if (card.fromPhone) groups.join(i, holder);
            if (name.empty()) continue;
            groups.join(i, byNameAndHandle.try_emplace({name, handle}, i).first->second);
        }
    }
    std::map<std::size_t, BookPerson> people;
    for (std::size_t i = 0; i < cards.size(); ++i) {
        const auto group = groups.of(i);
        auto& person = people[group];
        if (person.identifier.empty()) person.identifier = identifierHash(keyOf(cards[group]));
        if (person.name.empty()) person.name = cards[i].name;
        for (const auto& handle : cards[i].handles) {
            const bool isHis = groups.of(byHandle.at(handle)) == group;
            if (!isHis || std::ranges::find(person.handles, handle) != person.handles.end()) {
                continue;
            }
            person.handles.push_back(handle);
        }
    }
    std::vector<BookPerson> found;
    for (auto& [group, person] : people) {
        if (person.handles.empty()) continue;
        if (person.name.empty()) person.name = shownHandle(person.handles.front());
        found.push_back(std::move(person));
    }
    return found;
}

}  // namespace keepsakes
