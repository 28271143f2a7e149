// SPDX-License-Identifier: Apache-2.0
#include "sources/KSLinkshelfManager.h"

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <algorithm>
#include <utility>

#include "core/Clock.h"
#include "core/KSAssertion.h"
#include "core/Log.h"
#include "model/KSExtensions.h"
#include "platform/PlatformServices.h"
#include "platform/UserDefaults.h"
#include "sources/IdentifiedEvents.h"
#include "sources/Lifetimes.h"
#include "store/KSEventStore.h"

namespace keepsakes {

namespace {

constexpr std::string_view kSharingDomain = "com.brindle.Sharelane";
constexpr std::string_view kEnabledKey = "LinkshelfEnabled";
constexpr std::string_view kLinkType = "lnk";
/// How far the dates asked for reach beyond the events', whose start and end are the same.
constexpr double kMarginSeconds = 1;

std::vector<std::string> fetchedAttributes() {
    using namespace searchkey;
    std::vector<std::string> names;
    for (const auto name :
         {kUniqueIdentifier, kURL, kContentCreationDate, kAttributeChangeDate, kAuthorAddresses,
          kAuthorContactIdentifiers, kAccountHandles, kRecipientAddresses, kDisplayName, kIsShared,
          kSyndicationStatus, kGroupPhotoPath, kLinkTitle, kLinkDescription,
          kHighlightedContentServerDate, kResolvedURL, kFromMe}) {
        names.emplace_back(name);
    }
    return names;
}

std::string queryStringOf(KSDate start, KSDate end, bool anyChatDonates) {
    using namespace searchkey;
    // Whatever a client stored: what ISO 8601 cannot tell would be no query.
    const auto told = [](KSDate date) {
        return formatISO8601(std::clamp(date, KSDate::distantPast(), KSDate::distantFuture()));
    };
    const std::vector<std::string> clauses{
        fmt::format("{}=\"{}\"", kIndexType, kLinkType), fmt::format("{}=*", kURL),
        anyChatDonates ? fmt::format("InRange({}, 1, 2)", kIsHighlightedContent)
                       : fmt::format("{}=2", kIsHighlightedContent),
        fmt::format("InRange({}, iso({}), iso({}))", kContentCreationDate, told(start), told(end))};
    return fmt::format("{}", fmt::join(clauses, " && "));
}

std::optional<std::string> textOf(const SearchableItem& item, std::string_view key) {
    const auto* text = valueForKey(item, key).asString();
    return text ? std::optional(*text) : std::nullopt;
}

/// Of an attribute of the messaging application's own, the first value.
std::optional<std::string> firstTextOf(const SearchableItem& item, std::string_view key) {
    const auto* values = valueForKey(item, key).asArray();
    const auto* text = values && !values->empty() ? values->front().asString() : nullptr;
    return text ? std::optional(*text) : std::nullopt;
}

std::optional<std::vector<std::string>> textsOf(const SearchableItem& item, std::string_view key) {
    const auto* values = valueForKey(item, key).asArray();
    if (!values) return std::nullopt;
    std::vector<std::string> texts;
    for (const auto& value : *values) {
        if (const auto* text = value.asString()) texts.push_back(*text);
    }
    return texts;
}

KSEventPointer rehydratedEvent(const KSEvent& event, const SearchableItem& item) {
    using namespace searchkey;
    auto copy = event.copy();
    copy->identifierFromProvider = textOf(item, kUniqueIdentifier);
    copy->itemUniqueIdentifier = textOf(item, kUniqueIdentifier);
    copy->itemURL = textOf(item, kURL);
    copy->itemContentCreationDate = valueForKey(item, kContentCreationDate).asDate();
    copy->itemAuthorAddresses = textsOf(item, kAuthorAddresses);
    copy->itemAuthorContactIdentifiers = textsOf(item, kAuthorContactIdentifiers);
    copy->itemAccountHandles = textsOf(item, kAccountHandles);
    copy->itemRecipientAddresses = textsOf(item, kRecipientAddresses);
    copy->itemDisplayName = textOf(item, kDisplayName);
    copy->itemLinkTitle = firstTextOf(item, kLinkTitle);
    copy->itemLinkDescription = firstTextOf(item, kLinkDescription);
    copy->itemIsShared = valueForKey(item, kIsShared).asBool().value_or(false);
    copy->itemSyndicationStatus =
        static_cast<std::uint32_t>(valueForKey(item, kSyndicationStatus).asInteger().value_or(0));
    return copy;
}

}  // namespace

KSLinkshelfManager::KSLinkshelfManager(SearchIndex& searchIndex, const UserDefaults& userDefaults,
                                       Clock& clock, std::shared_ptr<KSEventStore> keepsakeStore)
    : searchIndex_(searchIndex),
      userDefaults_(userDefaults),
      clock_(clock),
      keepsakeStore_(std::move(keepsakeStore)),
      queue_("KSLinkshelfManager") {}

std::shared_ptr<KSLinkshelfManager> KSLinkshelfManager::initWithUniverse(
    const ServiceLookup& universe) {
    auto keepsakeStore = universe.service<KSEventStore>("EventStore");
    if (!assertParameter(keepsakeStore != nullptr, "[universe getService:@\"EventStore\"]",
                         "KSLinkshelfManager", 45)) {
        return nullptr;
    }
    const auto& platform = universe.platform();
    if (!platform.searchIndex) return nullptr;
    return std::shared_ptr<KSLinkshelfManager>(new KSLinkshelfManager(
        *platform.searchIndex, *platform.userDefaults, *platform.clock, std::move(keepsakeStore)));
}

bool KSLinkshelfManager::_linkshelfEnabled() const {
    const auto value = userDefaults_.object(kSharingDomain, kEnabledKey);
    return value.asBool().value_or(value.asNumber().value_or(0) != 0);
}

void KSLinkshelfManager::_fetchAutoDonatingChatWithCompletionHandler(
    const std::function<void(const AccountIdentifiers&)>& completion) const {
    AccountIdentifiers chats;
    searchIndex_.start(
        {.queryString = fmt::format("{}=1", searchkey::kIsChatAutoDonating),
         .fetchAttributes = {std::string(searchkey::kAccountIdentifier)},
         .bundleIDs = {std::string(kParleyBundleIdentifier)}},
        [&chats](std::span<const SearchableItem> items) {
            for (const auto& item : items) {
                const auto chat = textOf(item, searchkey::kAccountIdentifier);
                if (chat) chats.insert(*chat);
            }
        },
        [](const OptionalError& error) {
            if (error) logWarning(error->description());
        });
    completion(chats);
}

std::optional<KSLinkshelfManager::Items> KSLinkshelfManager::querySharedContent(KSDate start,
                                                                                KSDate end) const {
    Items items;
    if (!_linkshelfEnabled()) return items;
    bool anyChatDonates = false;
    _fetchAutoDonatingChatWithCompletionHandler(
        [&anyChatDonates](const AccountIdentifiers& chats) { anyChatDonates = !chats.empty(); });
    OptionalError failed;
    searchIndex_.start(
        {.queryString = queryStringOf(start, end, anyChatDonates),
         .fetchAttributes = fetchedAttributes(),
         .bundleIDs = {std::string(kParleyBundleIdentifier)}},
        [&items](std::span<const SearchableItem> found) {
            items.insert(items.end(), found.begin(), found.end());
        },
        [&failed](OptionalError error) { failed = std::move(error); });
    if (!failed) return items;
    logWarning(failed->description());
    return std::nullopt;
}

void KSLinkshelfManager::fetchSharedContentBetweenStartDate(KSDate start, KSDate end,
                                                            ItemsHandler completion) {
    queue_.async([this, start, end, completion = std::move(completion)] {
        if (const auto items = querySharedContent(start, end)) completion(*items);
    });
}

std::shared_ptr<KSEvent> KSLinkshelfManager::createEventFromSharedContent(
    const SearchableItem& item) const {
    auto identifier = textOf(item, searchkey::kUniqueIdentifier);
    const auto created = valueForKey(item, searchkey::kContentCreationDate).asDate();
    if (!identifier || !created) return nullptr;
    const KSDate now = clock_.now();
    auto event =
        KSEvent::initWithEventIdentifier(KSUUID::random(), created, created, now,
                                         KSEventProvider::foresight, KSEventCategory::linkshelf);
    event->expirationDate = now + lifetime::kFourWeeks;
    event->identifierFromProvider = identifier;
    event->itemUniqueIdentifier = std::move(identifier);
    return event;
}

void KSLinkshelfManager::saveSharedContents(const Items& items, const ResultHandler& handler) {
    KSEventPointer newest;
    OptionalError failed;
    keepsakeStore_->fetchLastEventOfCategory(
        KSEventCategory::linkshelf,
        [&newest, &failed](const KSEventPointer& event, const OptionalError& error) {
            newest = event;
            failed = error;
        });
    if (failed) {
        handler(failed, {});
        return;
    }
    KSEventArray fresh;
    for (const auto& item : items) {
        auto event = createEventFromSharedContent(item);
        if (!event || (newest && event->startDate() <= newest->startDate())) continue;
        fresh.push_back(std::move(event));
    }
    keepsakeStore_->storeEvents(fresh, handler);
}

void KSLinkshelfManager::fetchAndSaveSharedContentBetweenStartDate(KSDate start, KSDate end,
                                                                   ResultHandler handler) {
    fetchSharedContentBetweenStartDate(start, end,
                                       [this, handler = std::move(handler)](const Items& items) {
                                           saveSharedContents(items, handler);
                                       });
}

std::optional<KSLinkshelfManager::ItemIndex> KSLinkshelfManager::itemsBetween(
    std::optional<KSDateInterval> dates) {
    if (!dates) return std::nullopt;
    std::optional<ItemIndex> index;
    fetchSharedContentBetweenStartDate(dates->start, dates->end, [&index](const Items& items) {
        index.emplace();
        for (const auto& item : items) {
            if (auto identifier = textOf(item, searchkey::kUniqueIdentifier)) {
                index->insert_or_assign(std::move(*identifier), item);
            }
        }
    });
    waitForQueueEmpty();
    return index;
}

KSEventArray KSLinkshelfManager::rehydratedSharedContentEvents(const KSEventArray& events) {
    KSEventArray filled;
    auto dates = KSExtensions::getDurationOfKSEventArray(events);
    if (dates) *dates = {dates->start - kMarginSeconds, dates->end + kMarginSeconds};
    const auto items = itemsBetween(dates);
    if (!items) return filled;
    forEachFoundIn(*items, events, [&filled](const KSEvent& event, const SearchableItem& item) {
        filled.push_back(rehydratedEvent(event, item));
    });
    return filled;
}

void KSLinkshelfManager::removeSharedContentsDeletedAtSource(const KSEventArray& events,
                                                             const ResultHandler& handler) {
    _removeSharedContentsDeletedAtSource(events, handler);
}

void KSLinkshelfManager::_removeSharedContentsDeletedAtSource(const KSEventArray& events,
                                                              const ResultHandler& handler) {
    const auto items = itemsBetween(KSExtensions::getDurationOfKSEventArray(events));
    if (!items) {
        handler(KSError::make(KSErrorCode::databaseUnavailable,
                              "nil query result from shared content fetching, no events removed"),
                {});
        return;
    }
    keepsakeStore_->removeEvents(eventsMissingIn(*items, events), handler);
}

void KSLinkshelfManager::waitForQueueEmpty() {
    queue_.sync([] {});
}

}  // namespace keepsakes
