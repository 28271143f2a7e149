// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedContactStore.h"

#include <SQLiteCpp/SQLiteCpp.h>

namespace keepsakes {

ContactStore::Contacts IndexedContactStore::rankedContacts(
    std::span<const std::string> personIdentifiers) {
    std::vector<RankedContact> contacts;
    const auto answered = index_.ask([&contacts, personIdentifiers](SQLite::Database& index) {
        SQLite::Statement query(index, "SELECT name, score FROM people WHERE identifier = ?");
        for (const auto& person : personIdentifiers) {
            query.reset();
            query.bind(1, person);
            if (!query.executeStep()) continue;
            contacts.push_back({.identifier = std::string(kContactPrefix) + person,
                                .name = query.getColumn(0).getString(),
                                .score = query.getColumn(1).getDouble()});
        }
    });
    if (!answered) return std::unexpected(answered.error());
    return contacts;
}

}  // namespace keepsakes
