// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "core/KSDate.h"
#include "core/KSUUID.h"
#include "core/KSValue.h"
#include "model/KSEventExtendedAttributes.h"

namespace keepsakes {

/// Who produced an event. Values above 5 are kept and displayed as unknown.
enum class KSEventProvider : std::uint64_t {
    unknown = 0,
    health = 1,
    photo = 2,
    foresight = 3,
    routine = 4,
    postAnalytics = 5,
};

/// What kind of thing happened. 6 is unused; values above 12 are kept and displayed as unknown.
enum class KSEventCategory : std::uint64_t {
    unknown = 0,
    visit = 1,
    workout = 2,
    mediaOnRepeat = 3,
    leisureMedia = 4,
    photoKeepsake = 5,
    topic = 7,
    travel = 8,
    linkshelf = 9,
    significantContact = 10,
    structuredEvent = 11,
    socialEvent = 12,
};

enum KSSuggestedEventCategory : std::uint64_t {
    KSSuggestedEventCategoryNone,
    KSSuggestedEventCategoryFlight,
    KSSuggestedEventCategoryFood,
    KSSuggestedEventCategoryTrain,
    KSSuggestedEventCategoryBus,
    KSSuggestedEventCategoryBoat,
    KSSuggestedEventCategoryCarRentalPickup,
    KSSuggestedEventCategoryCarRentalDropoff,
    KSSuggestedEventCategoryTicket,
    KSSuggestedEventCategoryMovie,
    KSSuggestedEventCategoryLodging,
    KSSuggestedEventCategorySocial,
    KSSuggestedEventCategoryNLEvent,
};

enum class KSPlaceMode : std::uint64_t { unknown = 0, local = 1, tourist = 2 };

/// A place on Earth in degrees.
struct KSLocation {
    double latitude = 0;
    double longitude = 0;

    friend bool operator==(const KSLocation&, const KSLocation&) = default;
};

/// One thing that happened to the owner during a span of time: a fixed core, set by the
/// initialiser, and optional details, of which each source fills its category's own. A source
/// builds an event on its queue; once handed on it is shared as `KSEventPointer` and not changed.
/// Identity, equality and hash are the identifier's alone.
class KSEvent final {
  public:
    /// The one way to make an event. A missing argument, provider 0 or category 0 fails the
    /// assertion that names it and yields nothing. The start need not precede the end.
    static std::shared_ptr<KSEvent> initWithEventIdentifier(std::optional<KSUUID> eventIdentifier,
                                                            std::optional<KSDate> startDate,
                                                            std::optional<KSDate> endDate,
                                                            std::optional<KSDate> creationDate,
                                                            KSEventProvider provider,
                                                            KSEventCategory category);

    const KSUUID& eventIdentifier() const { return eventIdentifier_; }
    KSDate startDate() const { return startDate_; }
    KSDate endDate() const { return endDate_; }
    KSDate creationDate() const { return creationDate_; }
    KSEventProvider provider() const { return provider_; }
    KSEventCategory category() const { return category_; }

    /// When the source made its own record; the end date where the source does not say.
    KSDate sourceCreationDate() const { return storedSourceCreationDate.value_or(endDate_); }

    bool isEqual(const KSEvent& other) const { return eventIdentifier_ == other.eventIdentifier_; }

    /// A visit to the owner's home or work place.
    bool isHomeWorkVisit() const;

    /// A new record with the core, the expiration and source creation dates and the mode; all
    /// other details stay behind.
    std::shared_ptr<KSEvent> copy() const;

    static std::string describeProvider(KSEventProvider provider);
    static std::string describeCategory(KSEventCategory category);
    std::string describeProvider() const { return describeProvider(provider_); }
    std::string describeCategory() const { return describeCategory(category_); }
    static std::string_view _descriptionOf(std::uint64_t suggestedEventCategory);
    static std::string_view descriptionOfMode(KSPlaceMode mode);
    /// Full date style, long time style; nothing for nothing.
    static std::optional<std::string> FormatDate(std::optional<KSDate> date);
    /// The same scores under the topics' display names.
    static KSDictionary _displayNameOfScoredTopics(const KSDictionary& topics);

    /// One line for logs.
    std::string description() const;

    void encodeWithCoder(KeyedEncoder& encoder) const;
    /// Reads an archive; one that lacks a core field or holds a field of another kind fails the
    /// decoder and yields nothing.
    static std::shared_ptr<KSEvent> initWithCoder(KeyedDecoder& decoder);

    std::optional<KSDate> storedSourceCreationDate;
    std::optional<KSDate> expirationDate;
    std::optional<std::string> identifierFromProvider;

    std::uint64_t placeUserType = 0;
    std::optional<std::string> placeName;
    std::uint64_t placeDiscovery = 0;  ///< 1 when the place is new to the owner.
    std::optional<KSLocation> location;
    KSPlaceMode mode = KSPlaceMode::unknown;

    std::optional<std::string> workoutType;

    KSEventExtendedAttributes::Pointer extendedAttributes;

    std::optional<std::string> suggestedEventTitle;
    std::optional<std::string> suggestedEventIdentifier;
    std::uint64_t suggestedEventCategory = KSSuggestedEventCategoryNone;
    std::optional<KSDictionary> suggestedEvent;

    std::optional<std::string> tripTitle;
    std::optional<std::vector<KSDictionary>> tripParts;

    std::optional<std::string> mediaTitle;
    std::optional<std::string> mediaAlbum;
    std::optional<std::string> mediaPlayerBundleId;
    std::optional<std::string> mediaProductId;
    std::optional<std::string> mediaGenre;
    std::optional<std::string> mediaType;
    std::optional<std::string> mediaArtist;
    std::optional<double> mediaRepetitions;
    std::optional<double> mediaSumTimePlayed;  ///< Seconds.

    std::optional<std::string> itemUniqueIdentifier;
    std::optional<std::string> itemURL;
    std::optional<KSDate> itemContentCreationDate;
    std::optional<std::vector<std::string>> itemAuthorAddresses;
    std::optional<std::vector<std::string>> itemAuthorContactIdentifiers;
    std::optional<std::vector<std::string>> itemAccountHandles;
    std::optional<std::vector<std::string>> itemRecipientAddresses;
    std::optional<std::string> itemDisplayName;
    std::optional<std::string> itemLinkTitle;
    std::optional<std::string> itemLinkDescription;
    bool itemIsShared = false;
    std::uint64_t itemSyndicationStatus = 0;

    std::optional<double> interactionContactScore;
    std::optional<KSDictionary> interactionScoredContact;
    std::optional<std::vector<KSDictionary>> interactions;

    std::optional<KSDictionary> scoredTopics;  ///< Topic identifier to score.
    std::optional<KSDictionary> trends;

  private:
    static constexpr std::string_view kUnit = "KSEvent";

    KSEvent(const KSUUID& eventIdentifier, KSDate startDate, KSDate endDate, KSDate creationDate,
            KSEventProvider provider, KSEventCategory category);
    KSEvent(const KSEvent&) = default;

    std::string describeDetails() const;

    KSUUID eventIdentifier_;
    KSDate startDate_;
    KSDate endDate_;
    KSDate creationDate_;
    KSEventProvider provider_;
    KSEventCategory category_;
};

using KSEventPointer = std::shared_ptr<const KSEvent>;
using KSEventArray = std::vector<KSEventPointer>;

}  // namespace keepsakes
