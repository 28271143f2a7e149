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

std::expected<std::vector<RelatedPerson>, KSError> IndexedContactStore::relatedPeople() {
    std::vector<RelatedPerson> related;
    const auto answered = index_.ask([&related](SQLite::Database& index) {
        // A card names another one by its identifier, with the prefix of URIs or without.
        SQLite::Statement query(
            index,
            "SELECT DISTINCT relationship, coalesce(cards.name, relations.name) AS person"
            " FROM relations LEFT JOIN cards ON cards.uid <> ''"
            " AND cards.uid IN (relations.name, 'urn:uuid:' || relations.name)"
            " WHERE person <> '' ORDER BY relationship, person");
        while (query.executeStep()) {
            related.push_back({.relationship = query.getColumn(0).getString(),
                               .name = query.getColumn(1).getString()});
        }
    });
    if (!answered) return std::unexpected(answered.error());
    return related;
}

}  // namespace keepsakes
