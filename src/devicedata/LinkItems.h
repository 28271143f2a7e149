// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <SQLiteCpp/SQLiteCpp.h>

#include <cstdint>
#include <functional>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <unordered_map>
#include <vector>

#include "platform/SearchIndex.h"

namespace keepsakes {

/// Makes items of the search index out of the rows of an open index, for one question. Throws
/// `SQLite::Exception`.
class LinkItems {
  public:
    LinkItems(SQLite::Database& index, std::span<const std::string> donatingChats)
        : index_(index), donatingChats_(donatingChats), people_(index, kPeopleQuery) {}

    /// Each link of the dates, both included, in the order of time.
    void forEach(KSDateInterval dates, const std::function<void(SearchableItem&&)>& visit);

  private:
    static constexpr const char* kPeopleQuery =
        "SELECT h.handle, h.owner, p.identifier, p.name, p.score FROM handles h"
        " LEFT JOIN people p ON p.id = h.person WHERE h.id = ?";

    struct Person {
        std::string handle;  ///< With what tells its kind.
        std::string address;
        bool isOwner = false;
        std::string identifier;  ///< Empty for nobody of the address books.
        std::string name;
        double score = 0;
    };
    /// Who shared a link with whom, where.
    struct Sharing {
        bool isFromMe = false;
        const Person* sender = nullptr;
        const Person* account = nullptr;
        std::vector<const Person*> recipients;
        std::string room;
        std::string roomName;
    };

    const Person& personOf(std::int64_t handle);
    Sharing sharingOf(SQLite::Statement& row);
    bool isDonated(const Sharing& sharing) const;
    std::int64_t highlightOf(bool isStarred, const Sharing& sharing) const;
    static std::string displayNameOf(const Sharing& sharing);
    SearchableItem itemOf(SQLite::Statement& row);

    SQLite::Database& index_;
    const std::span<const std::string> donatingChats_;
    SQLite::Statement people_;
    std::unordered_map<std::int64_t, Person> known_;
};

}  // namespace keepsakes
