// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedInteractionStore.h"

#include <SQLiteCpp/SQLiteCpp.h>

#include <algorithm>
#include <cstring>
#include <set>
#include <sstream>
#include <unordered_map>

#include "core/KSUUID.h"
#include "devicedata/MailboxRole.h"

namespace keepsakes {

namespace {

const InteractionPerson kOwner{.personId = std::nullopt,
                               .identifier = std::string(kOwnerIdentifier)};

/// Whom the index's handles belong to; looked up once each.
class People {
  public:
    explicit People(SQLite::Database& index)
        : query_(index,
                 "SELECT h.handle, h.owner, p.identifier FROM handles h"
                 " LEFT JOIN people p ON p.id = h.person WHERE h.id = ?") {}

    const InteractionPerson& of(std::int64_t handle) {
        const auto known = people_.find(handle);
        return known != people_.end() ? known->second : people_[handle] = look(handle);
    }

  private:
    InteractionPerson look(std::int64_t handle) {
        query_.reset();
        query_.bind(1, handle);
        if (!query_.executeStep()) return {};
        if (query_.getColumn(1).getInt() != 0) return kOwner;
        const auto text = query_.getColumn(0).getString();
        InteractionPerson person{.personId = std::nullopt,
                                 .identifier = text.substr(text.find(':') + 1)};
        if (!query_.isColumnNull(2)) person.personId = query_.getColumn(2).getString();
        return person;
    }

    SQLite::Statement query_;
    std::unordered_map<std::int64_t, InteractionPerson> people_;
};

KSUUID identityOf(const SQLite::Column& column) {
    KSUUID identity;
    const auto size = std::min(identity.bytes.size(), static_cast<std::size_t>(column.getBytes()));
    if (size > 0) std::memcpy(identity.bytes.data(), column.getBlob(), size);
    return identity;
}

bool isSame(const InteractionPerson& a, const InteractionPerson& b) {
    return a.personId || b.personId ? a.personId == b.personId : a.identifier == b.identifier;
}

/// Who sent the row's interaction to whom.
void fillParticipants(SQLite::Statement& row, People& people, Interaction& interaction) {
    const auto told = static_cast<InteractionDirection>(row.getColumn(4).getInt());
    if (told == InteractionDirection::outgoing) {
        interaction.sender = kOwner;
    } else if (!row.isColumnNull(5)) {
        interaction.sender = people.of(row.getColumn(5).getInt64());
    }
    const bool isOutgoing = interaction.sender == kOwner;
    interaction.direction =
        isOutgoing ? InteractionDirection::outgoing : InteractionDirection::incoming;
    auto& recipients = interaction.recipients;
    const auto add = [&recipients, &interaction](const InteractionPerson& person) {
        const auto isPerson = [&person](const auto& other) { return isSame(person, other); };
        if (isPerson(interaction.sender) || std::ranges::any_of(recipients, isPerson)) return;
        recipients.push_back(person);
    };
    std::istringstream handles(row.getColumn(6).getString());
    for (std::int64_t handle = 0; handles >> handle;) add(people.of(handle));
    if (!isOutgoing) add(kOwner);
}

}  // namespace

InteractionStore::Interactions IndexedInteractionStore::queryInteractions(
    const InteractionQuery& asked) {
    std::vector<Interaction> found;
    const auto answered = index_.ask([&found, &asked](SQLite::Database& index) {
        People people(index);
        // By identity too: a conversation's identifier is made of the order of its messages.
        SQLite::Statement query(
            index,
            "SELECT i.identity, i.start, i.end, i.mechanism, i.direction, i.sender, i.recipients,"
            " f.mailbox FROM interactions i CROSS JOIN files f ON f.id = i.file"
            " WHERE i.start BETWEEN ?1 AND ?2 AND i.end <= ?2"
            " ORDER BY i.start DESC, i.identity DESC, i.file");
        query.bind(1, asked.startsFrom.seconds);
        query.bind(2, asked.endsUntil.seconds);
        std::set<KSUUID> atThisMoment;  // copies of a message have its time
        KSDate moment = KSDate::distantFuture();
        while (found.size() < asked.limit && query.executeStep()) {
            const auto mechanism =
                mechanismIn(static_cast<MailboxRole>(query.getColumn(7).getInt()),
                            static_cast<InteractionMechanism>(query.getColumn(3).getInt()));
            if (std::ranges::find(asked.mechanisms, mechanism) == asked.mechanisms.end()) continue;
            const KSDate start{query.getColumn(1).getDouble()};
            if (start != moment) atThisMoment.clear();
            moment = start;
            const auto identity = identityOf(query.getColumn(0));
            if (!atThisMoment.insert(identity).second) continue;
            Interaction interaction{.uuid = identity.string(),
                                    .startDate = start,
                                    .endDate = {query.getColumn(2).getDouble()},
                                    .mechanism = mechanism};
            fillParticipants(query, people, interaction);
            found.push_back(std::move(interaction));
        }
    });
    if (!answered) return std::unexpected(answered.error());
    return found;
}

}  // namespace keepsakes
