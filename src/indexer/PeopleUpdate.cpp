// SPDX-License-Identifier: Apache-2.0
#include "indexer/PeopleUpdate.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cmath>
#include <cstring>
#include <functional>
#include <set>
#include <unordered_set>
#include <vector>

#include "indexer/AddressBook.h"
#include "indexer/ContactRanking.h"
#include "platform/InteractionStore.h"
#include "readers/Handles.h"
#include "readers/PeopleRecords.h"

namespace keepsakes {

namespace {

using Ids = std::vector<std::int64_t>;
constexpr std::size_t kNobody = static_cast<std::size_t>(-1);

/// The numbers of a list as the index keeps it.
Ids idsOf(std::string_view list) {
    Ids ids;
    while (!list.empty()) {
        std::int64_t id = 0;
        const auto [end, error] = std::from_chars(list.data(), list.data() + list.size(), id);
        if (error != std::errc()) break;
        ids.push_back(id);
        list.remove_prefix(static_cast<std::size_t>(end - list.data()));
        if (list.starts_with(' ')) list.remove_prefix(1);
    }
    return ids;
}

bool isPersonal(InteractionMechanism mechanism) {
    return std::ranges::find(kPersonalMechanisms, mechanism) != kPersonalMechanisms.end();
}

double hashOf(std::span<const std::string> addresses) {
    std::string joined;
    for (const auto& address : addresses) joined += address + "\n";
    // What a double holds exactly.
    return static_cast<double>(std::hash<std::string>()(joined) >> 12U);
}

class PeopleUpdate {
  public:
    PeopleUpdate(IndexWriter& index, std::span<const std::string> ownerAddresses, KSDate now)
        : database_(index.database()), ownerAddresses_(ownerAddresses), now_(now) {}

    void run() {
        loadHandles();
        findOwner();
        findPeople();
        rank();
        write();
    }

    /// Forgets the handles that no record names any more.
    void dropLooseHandles() {
        std::unordered_set<std::int64_t> used;
        const auto use = [this, &used](const char* text) {
            SQLite::Statement query(database_, text);
            while (query.executeStep()) {
                if (!query.isColumnNull(0)) used.insert(query.getColumn(0).getInt64());
                for (const auto id : idsOf(query.getColumn(1).getString())) used.insert(id);
            }
        };
        use("SELECT sender, recipients FROM interactions");
        use("SELECT NULL, handles FROM cards");
        use("SELECT handle, '' FROM ownerHandles");
        use("SELECT DISTINCT account, '' FROM links");
        Ids loose;
        SQLite::Statement all(database_, "SELECT id FROM handles");
        while (all.executeStep()) {
            if (!used.contains(all.getColumn(0).getInt64())) {
                loose.push_back(all.getColumn(0).getInt64());
            }
        }
        SQLite::Statement remove(database_, "DELETE FROM handles WHERE id = ?");
        for (const auto id : loose) {
            remove.reset();
            remove.bind(1, id);
            remove.exec();
        }
    }

  private:
    struct Handle {
        std::string text;
        std::size_t person = kNobody;
        bool isOwner = false;
    };

    /// Those of the address books; a mailbox of strangers has far more of them than memory should.
    void loadHandles() {
        SQLite::Statement cards(database_, "SELECT handles FROM cards");
        SQLite::Statement handle(database_, "SELECT handle FROM handles WHERE id = ?");
        while (cards.executeStep()) {
            for (const auto id : idsOf(cards.getColumn(0).getString())) {
                if (handles_.contains(id)) continue;
                handle.reset();
                handle.bind(1, id);
                if (handle.executeStep()) add(id, handle.getColumn(0).getString());
            }
        }
    }

    void add(std::int64_t id, const std::string& text) {
        handles_[id].text = text;
        byText_.emplace(text, id);
    }

    Handle* find(std::int64_t id) {
        const auto found = handles_.find(id);
        return found == handles_.end() ? nullptr : &found->second;
    }

    Handle* find(const std::string& text) {
        const auto found = byText_.find(text);
        return found == byText_.end() ? nullptr : find(found->second);
    }

    void findOwner() {
        SQLite::Statement known(database_, "SELECT id FROM handles WHERE handle = ?");
        for (const auto& address : ownerAddresses_) {
            known.reset();
            known.bind(1, handleOf(address));
            if (known.executeStep()) handles_[known.getColumn(0).getInt64()].isOwner = true;
        }
        SQLite::Statement told(database_, "SELECT DISTINCT handle FROM ownerHandles");
        while (told.executeStep()) handles_[told.getColumn(0).getInt64()].isOwner = true;
        SQLite::Statement sent(database_,
                               "SELECT i.sender, count(*) FROM files f CROSS JOIN interactions i"
                               " ON i.file = f.id WHERE f.mailbox = 1 AND i.sender IS NOT NULL"
                               " GROUP BY i.sender");
        std::vector<std::pair<std::int64_t, double>> senders;
        double all = 0;
        while (sent.executeStep()) {
            senders.emplace_back(sent.getColumn(0).getInt64(), sent.getColumn(1).getDouble());
            all += senders.back().second;
        }
        for (const auto& [sender, count] : senders) {
            if (count * kSentMailsPerAddress >= all) handles_[sender].isOwner = true;
        }
    }

    std::vector<BookCard> loadCards() {
        std::vector<BookCard> cards;
        SQLite::Statement query(database_, "SELECT uid, name, handles, fromPhone FROM cards");
        while (query.executeStep()) {
            auto& card = cards.emplace_back();
            card.uid = query.getColumn(0).getString();
            card.name = query.getColumn(1).getString();
            card.fromPhone = query.getColumn(3).getInt() != 0;
            for (const auto id : idsOf(query.getColumn(2).getString())) {
                if (const auto* handle = find(id)) card.handles.push_back(handle->text);
            }
        }
        return cards;
    }

    /// The owner's own card tells more of the owner's handles, and is nobody else.
    void findPeople() {
        for (auto& person : peopleOf(loadCards())) {
            const bool isOwner = std::ranges::any_of(person.handles, [this](const auto& text) {
                const auto* handle = find(text);
                return handle && handle->isOwner;
            });
            for (const auto& text : person.handles) {
                auto* handle = find(text);
                if (!handle) continue;
                handle->isOwner = isOwner;
                if (!isOwner) handle->person = people_.size();
            }
            if (!isOwner) people_.push_back(std::move(person));
        }
    }

    void rank() {
        tallies_.assign(people_.size(), ContactTally(now_));
        if (people_.empty()) return;
        SQLite::Statement query(database_,
                                "SELECT i.identity, i.start, i.mechanism, i.direction, i.sender,"
                                " i.recipients, f.mailbox FROM interactions i"
                                " CROSS JOIN files f ON f.id = i.file"
                                " WHERE i.start > ? AND i.start <= ? ORDER BY i.start");
        query.bind(1, (now_ - kRankingSpan).seconds);
        query.bind(2, now_.seconds);
        std::set<std::string> atThisMoment;  // copies of a message have its time
        double moment = 0;
        while (query.executeStep()) {
            const auto mechanism =
                mechanismIn(static_cast<MailboxRole>(query.getColumn(6).getInt()),
                            static_cast<InteractionMechanism>(query.getColumn(2).getInt()));
            if (!isPersonal(mechanism)) continue;
            const double start = query.getColumn(1).getDouble();
            if (start != moment) atThisMoment.clear();
            moment = start;
            if (atThisMoment.insert(query.getColumn(0).getString()).second) {
                count(query, {start}, mechanism == InteractionMechanism::phoneCall);
            }
        }
    }

    void count(SQLite::Statement& row, KSDate when, bool isCall) {
        const auto direction = static_cast<InteractionDirection>(row.getColumn(3).getInt());
        const auto* sender = row.isColumnNull(4) ? nullptr : find(row.getColumn(4).getInt64());
        const bool isOutgoing =
            direction == InteractionDirection::outgoing || (sender && sender->isOwner);
        std::set<std::size_t> persons;
        double others = isOutgoing ? 0 : 1;
        for (const auto id : idsOf(row.getColumn(5).getString())) {
            const auto* handle = find(id);
            if (handle && handle->isOwner) continue;
            ++others;
            if (handle && handle->person != kNobody) persons.insert(handle->person);
        }
        if (!isOutgoing) {
            persons.clear();
            if (sender && sender->person != kNobody) persons.insert(sender->person);
        }
        for (const auto person : persons) {
            if (isOutgoing || isCall) tallies_[person].addSent(when, others);
            if (!isOutgoing || isCall) tallies_[person].addReceived(when, others);
        }
    }

    void write() {
        database_.exec("DELETE FROM people");
        SQLite::Statement add(database_,
                              "INSERT INTO people(id, identifier, name, score) VALUES(?, ?, ?, ?)");
        for (std::size_t i = 0; i < people_.size(); ++i) {
            add.reset();
            add.bind(1, static_cast<std::int64_t>(i));
            add.bind(2, people_[i].identifier);
            add.bind(3, people_[i].name);
            add.bind(4, tallies_[i].score());
            add.exec();
        }
        database_.exec(
            "UPDATE handles SET person = NULL, owner = 0 WHERE person IS NOT NULL OR owner <> 0");
        SQLite::Statement set(database_, "UPDATE handles SET person = ?, owner = ? WHERE id = ?");
        for (const auto& [id, handle] : handles_) {
            if (handle.person == kNobody && !handle.isOwner) continue;
            set.reset();
            set.clearBindings();
            if (handle.person != kNobody) set.bind(1, static_cast<std::int64_t>(handle.person));
            set.bind(2, handle.isOwner ? 1 : 0);
            set.bind(3, id);
            set.exec();
        }
    }

    SQLite::Database& database_;
    const std::span<const std::string> ownerAddresses_;
    const KSDate now_;
    std::unordered_map<std::int64_t, Handle> handles_;
    std::unordered_map<std::string, std::int64_t> byText_;
    std::vector<BookPerson> people_;
    std::vector<ContactTally> tallies_;
};

}  // namespace

bool updatePeople(IndexWriter& index, std::span<const std::string> ownerAddresses, KSDate now) {
    const auto owner = hashOf(ownerAddresses);
    const bool isStale = index.meta(kMetaPeopleStale, 0) != 0;
    // An index without anything about people stays as it is.
    const auto ranked = index.meta(kMetaPeopleRanked, KSDate::kDistantPast);
    const bool isEver = ranked != KSDate::kDistantPast;
    if (!isStale && !isEver) return false;
    if (!isStale && std::abs(now.seconds - ranked) < kSecondsPerRanking &&
        index.meta(kMetaPeopleOwner, 0) == owner) {
        return false;
    }
    index.begin();
    PeopleUpdate update(index, ownerAddresses, now);
    if (index.meta(kMetaHandlesLoose, 0) != 0) update.dropLooseHandles();
    update.run();
    index.setMeta(kMetaPeopleStale, 0);
    index.setMeta(kMetaHandlesLoose, 0);
    index.setMeta(kMetaPeopleRanked, now.seconds);
    index.setMeta(kMetaPeopleOwner, owner);
    return true;
}

}  // namespace keepsakes
