// SPDX-License-Identifier: Apache-2.0
#include "devicedata/LinkItems.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <algorithm>
#include <cmath>
#include <sstream>
#include <utility>

#include "core/MurmurHash3.h"
#include "core/Text.h"
#include "devicedata/IndexedSearchIndex.h"
#include "devicedata/MailboxRole.h"

namespace keepsakes {

namespace {

constexpr const char* kLinksQuery =
    "SELECT l.start, l.url, l.title, l.description, l.room, l.roomName, l.account, l.starred,"
    " i.identity, i.mechanism, i.direction, i.sender, i.recipients, f.mailbox, f.name, f.mtime"
    " FROM links l CROSS JOIN interactions i ON i.id = l.interaction"
    " CROSS JOIN files f ON f.id = l.file"
    " WHERE l.start BETWEEN ? AND ? ORDER BY l.start, l.rowid";
/// The columns of the query.
enum Column : int {
    kStart,
    kUrl,
    kTitle,
    kDescription,
    kRoom,
    kRoomName,
    kAccount,
    kStarred,
    kIdentity,
    kMechanism,
    kDirection,
    kSender,
    kRecipients,
    kMailbox,
    kFileName,
    kFileTime
};

/// Whether the handle, "tel:512345678" or the like, is what the owner calls `address`. Numbers are
/// compared by their end, since country and trunk prefixes make no difference.
bool isAddress(std::string_view handle, std::string_view address) {
    const auto shown = handle.substr(handle.find(':') + 1);
    if (!handle.starts_with("tel:")) return lowerCased(address) == shown;
    std::string digits;
    for (const char c : address) {
        if (c >= '0' && c <= '9') digits += c;
    }
    return digits.ends_with(shown);
}

void add(SearchableItem& item, std::string_view key, const std::string& text) {
    if (!text.empty()) item.emplace(key, text);
}

/// As the messaging application's own attributes come.
void addOwn(SearchableItem& item, std::string_view key, KSValue value) {
    item.emplace(key, KSArray{std::move(value)});
}

}  // namespace

const LinkItems::Person& LinkItems::personOf(std::int64_t handle) {
    const auto [entry, isNew] = known_.try_emplace(handle);
    auto& person = entry->second;
    if (!isNew) return person;
    people_.reset();
    people_.bind(1, handle);
    if (!people_.executeStep()) return person;
    person.handle = people_.getColumn(0).getString();
    person.address = person.handle.substr(person.handle.find(':') + 1);
    person.isOwner = people_.getColumn(1).getInt() != 0;
    person.identifier = people_.getColumn(2).getString();
    person.name = people_.getColumn(3).getString();
    person.score = people_.getColumn(4).getDouble();
    return person;
}

LinkItems::Sharing LinkItems::sharingOf(SQLite::Statement& row) {
    Sharing sharing{.room = row.getColumn(kRoom).getString(),
                    .roomName = row.getColumn(kRoomName).getString()};
    if (!row.isColumnNull(kSender)) sharing.sender = &personOf(row.getColumn(kSender).getInt64());
    if (!row.isColumnNull(kAccount)) {
        sharing.account = &personOf(row.getColumn(kAccount).getInt64());
    }
    const auto told = static_cast<InteractionDirection>(row.getColumn(kDirection).getInt());
    sharing.isFromMe =
        told == InteractionDirection::outgoing || (sharing.sender && sharing.sender->isOwner);
    std::istringstream handles(row.getColumn(kRecipients).getString());
    for (std::int64_t handle = 0; handles >> handle;) {
        sharing.recipients.push_back(&personOf(handle));
    }
    return sharing;
}

bool LinkItems::isDonated(const Sharing& sharing) const {
    const auto* other = sharing.sender;
    if (sharing.isFromMe) other = sharing.recipients.size() == 1 ? sharing.recipients[0] : nullptr;
    return std::ranges::any_of(donatingChats_, [&sharing, other](const std::string& chat) {
        if (!sharing.room.empty()) {
            return lowerCased(chat) == lowerCased(sharing.room) ||
                   lowerCased(chat) == lowerCased(sharing.roomName);
        }
        return other && isAddress(other->handle, chat);
    });
}

std::int64_t LinkItems::highlightOf(bool isStarred, const Sharing& sharing) const {
    if (isStarred) return 2;
    const bool isFromSomebodyClose = !sharing.isFromMe && sharing.sender &&
                                     sharing.sender->score >= IndexedSearchIndex::kLeastScore;
    return isFromSomebodyClose || isDonated(sharing) ? 1 : 0;
}

/// What a list of chats would call it: the room, or the others who take part.
std::string LinkItems::displayNameOf(const Sharing& sharing) {
    constexpr std::size_t kMostNamed = 3;
    if (!sharing.roomName.empty()) return sharing.roomName;
    if (!sharing.room.empty()) return sharing.room;
    std::vector<std::string> names;
    const auto add = [&names](const Person* person) {
        if (!person || person->isOwner) return;
        const auto& name = person->name.empty() ? person->address : person->name;
        if (!name.empty() && std::ranges::find(names, name) == names.end()) names.push_back(name);
    };
    add(sharing.sender);
    std::ranges::for_each(sharing.recipients, add);
    if (names.size() <= kMostNamed) return fmt::format("{}", fmt::join(names, ", "));
    const auto others = names.size() - kMostNamed;
    names.resize(kMostNamed);
    return fmt::format("{} and {} other{}", fmt::join(names, ", "), others, others == 1 ? "" : "s");
}

SearchableItem LinkItems::itemOf(SQLite::Statement& row) {
    const auto sharing = sharingOf(row);
    const bool isStarred = row.getColumn(kStarred).getInt() != 0 ||
                           isFlaggedMail(row.getColumn(kFileName).getString());
    const auto url = row.getColumn(kUrl).getString();
    SearchableItem item;
    item.emplace(searchkey::kUniqueIdentifier,
                 identifierHash(row.getColumn(kIdentity).getString() + url));
    item.emplace(searchkey::kURL, url);
    item.emplace(searchkey::kContentCreationDate, KSDate{row.getColumn(kStart).getDouble()});
    item.emplace(searchkey::kAttributeChangeDate,
                 KSDate::fromUnix(std::floor(row.getColumn(kFileTime).getDouble() / 1e9)));
    item.emplace(searchkey::kIsShared, sharing.isFromMe);
    add(item, searchkey::kDisplayName, displayNameOf(sharing));
    KSArray accounts;
    KSArray recipients;
    if (sharing.account) accounts.emplace_back(sharing.account->address);
    for (const auto* person : sharing.recipients) {
        recipients.emplace_back(person->address);
        if (person->isOwner) accounts.emplace_back(person->address);
    }
    const auto* author = sharing.sender     ? sharing.sender
                         : sharing.isFromMe ? sharing.account
                                            : nullptr;
    if (author) {
        item.emplace(searchkey::kAuthorAddresses, KSArray{author->address});
        if (sharing.isFromMe && accounts.empty()) accounts.emplace_back(author->address);
        if (!author->identifier.empty()) {
            item.emplace(searchkey::kAuthorContactIdentifiers, KSArray{author->identifier});
        }
    }
    if (!accounts.empty()) item.emplace(searchkey::kAccountHandles, std::move(accounts));
    if (!recipients.empty()) item.emplace(searchkey::kRecipientAddresses, std::move(recipients));
    const auto highlight = highlightOf(isStarred, sharing);
    item.emplace(searchkey::kSyndicationStatus, highlight);
    addOwn(item, searchkey::kIsHighlightedContent, highlight);
    addOwn(item, searchkey::kIndexType, "lnk");
    addOwn(item, searchkey::kFromMe, sharing.isFromMe);
    for (const auto& [key, column] :
         {std::pair(searchkey::kLinkTitle, kTitle), {searchkey::kLinkDescription, kDescription}}) {
        const auto text = row.getColumn(column).getString();
        if (!text.empty()) addOwn(item, key, text);
    }
    return item;
}

void LinkItems::forEach(KSDateInterval dates, const std::function<void(SearchableItem&&)>& visit) {
    SQLite::Statement query(index_, kLinksQuery);
    query.bind(1, dates.start.seconds);
    query.bind(2, dates.end.seconds);
    std::set<std::string> atThisMoment;  // copies of a message have its time
    double moment = 0;
    while (query.executeStep()) {
        const auto role = static_cast<MailboxRole>(query.getColumn(kMailbox).getInt());
        const auto mechanism =
            static_cast<InteractionMechanism>(query.getColumn(kMechanism).getInt());
        if (role == MailboxRole::drafts || role == MailboxRole::junk ||
            mechanism == InteractionMechanism::unsentMessage ||
            isTrashedMail(query.getColumn(kFileName).getString())) {
            continue;
        }
        const double start = query.getColumn(kStart).getDouble();
        if (std::exchange(moment, start) != start) atThisMoment.clear();
        auto item = itemOf(query);
        if (atThisMoment.insert(*valueForKey(item, searchkey::kUniqueIdentifier).asString())
                .second) {
            visit(std::move(item));
        }
    }
}

}  // namespace keepsakes
