// SPDX-License-Identifier: Apache-2.0
#include "indexer/PeopleRows.h"

#include <cmath>

#include "indexer/IndexWriter.h"

namespace keepsakes {

namespace {

/// Handles kept in memory; a mailbox of strangers has no end of them.
constexpr std::size_t kMostKnown = 50000;

}  // namespace

PeopleRows::PeopleRows(IndexWriter& index)
    : index_(index),
      addHandle_(index.database(), "INSERT OR IGNORE INTO handles(handle) VALUES(?)"),
      findHandle_(index.database(), "SELECT id FROM handles WHERE handle = ?"),
      addInteraction_(index.database(),
                      "INSERT INTO interactions(file, identity, start, end, mechanism, direction,"
                      " sender, recipients) VALUES(?, ?, ?, ?, ?, ?, ?, ?)"),
      addLink_(index.database(),
               "INSERT INTO links(file, interaction, start, url, title, description, room,"
               " roomName, account, starred) VALUES(?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"),
      addCard_(index.database(),
               "INSERT INTO cards(file, uid, name, handles, fromPhone) VALUES(?, ?, ?, ?, ?)"),
      addRelation_(index.database(),
                   "INSERT INTO relations(file, relationship, name) VALUES(?, ?, ?)"),
      addOwner_(index.database(), "INSERT INTO ownerHandles(file, handle) VALUES(?, ?)") {}

void PeopleRows::begin(std::int64_t file) {
    file_ = file;
    count_ = 0;
    failure_ = nullptr;
    interaction_ = 0;
    index_.removePeople(file);
}

void PeopleRows::drop() {
    if (count_ > 0) index_.removePeople(file_);
}

void PeopleRows::finish() {
    if (failure_) std::rethrow_exception(failure_);
}

template <class Work>
void PeopleRows::guarded(const Work& work) {
    if (failure_) return;
    try {
        work();
    } catch (const SQLite::Exception&) {
        failure_ = std::current_exception();
    }
}

void PeopleRows::changed() {
    ++count_;
    if (count_ == 1) index_.setMeta(kMetaPeopleStale, 1);
}

void PeopleRows::interaction(const InteractionRecord& record) {
    interaction_ = 0;
    if (!std::isfinite(record.start.seconds) || !std::isfinite(record.end.seconds)) return;
    guarded([this, &record] {
        changed();
        const auto recipients = idsOf(record.recipients);
        addInteraction_.clearBindings();
        addInteraction_.bind(1, file_);
        addInteraction_.bind(2, record.identity.data(), static_cast<int>(record.identity.size()));
        addInteraction_.bind(3, record.start.seconds);
        addInteraction_.bind(4, record.end.seconds);
        addInteraction_.bind(5, static_cast<int>(record.mechanism));
        addInteraction_.bind(6, static_cast<int>(record.direction));
        if (!record.sender.empty()) addInteraction_.bind(7, idOf(record.sender));
        addInteraction_.bindNoCopy(8, recipients);
        runOnce(addInteraction_);
        interaction_ = index_.database().getLastInsertRowid();
        start_ = record.start;
    });
}

void PeopleRows::link(const LinkRecord& link) {
    if (interaction_ == 0) return;
    guarded([this, &link] {
        changed();
        addLink_.clearBindings();
        addLink_.bind(1, file_);
        addLink_.bind(2, interaction_);
        // Whole seconds, which the queries of a search index are written in.
        addLink_.bind(3, std::floor(start_.seconds));
        addLink_.bind(4, link.link.url);
        addLink_.bind(5, link.link.title);
        addLink_.bind(6, link.link.description);
        addLink_.bind(7, link.room);
        addLink_.bind(8, link.roomName);
        if (!link.account.empty()) addLink_.bind(9, idOf(link.account));
        addLink_.bind(10, link.isStarred ? 1 : 0);
        runOnce(addLink_);
    });
}

void PeopleRows::card(const ContactCard& card) {
    guarded([this, &card] {
        changed();
        const auto handles = idsOf(card.handles);
        addCard_.clearBindings();
        addCard_.bind(1, file_);
        addCard_.bind(2, card.uid);
        addCard_.bind(3, card.name);
        addCard_.bindNoCopy(4, handles);
        addCard_.bind(5, card.fromPhone ? 1 : 0);
        runOnce(addCard_);
        for (const auto& relation : card.relations) {
            addRelation_.bind(1, file_);
            addRelation_.bind(2, relation.relationship);
            addRelation_.bind(3, relation.name);
            runOnce(addRelation_);
        }
    });
}

void PeopleRows::ownerHandle(const std::string& handle) {
    guarded([this, &handle] {
        changed();
        addOwner_.bind(1, file_);
        addOwner_.bind(2, idOf(handle));
        runOnce(addOwner_);
    });
}

std::int64_t PeopleRows::idOf(const std::string& handle) {
    if (const auto known = known_.find(handle); known != known_.end()) return known->second;
    if (known_.size() >= kMostKnown) known_.clear();
    addHandle_.bind(1, handle);
    runOnce(addHandle_);
    findHandle_.bind(1, handle);
    findHandle_.executeStep();
    const auto id = findHandle_.getColumn(0).getInt64();
    findHandle_.reset();
    known_.emplace(handle, id);
    return id;
}

std::string PeopleRows::idsOf(std::span<const std::string> handles) {
    std::string ids;
    for (const auto& handle : handles) {
        if (!ids.empty()) ids += ' ';
        ids += std::to_string(idOf(handle));
    }
    return ids;
}

}  // namespace keepsakes
