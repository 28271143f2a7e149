// SPDX-License-Identifier: Apache-2.0
#include "support/TestEvents.h"

#include "model/KSEventBundle.h"
#include "model/ValueCoding.h"

namespace keepsakes {

KSUUID testUUID(std::uint32_t number) {
    KSUUID id;
    for (std::size_t byte = 0; byte < 4; ++byte) {
        id.bytes[15 - byte] = static_cast<std::uint8_t>(number >> (8 * byte));
    }
    return id;
}

std::shared_ptr<KSEvent> makeEvent(std::uint32_t number, double start, double end,
                                   KSEventProvider provider, KSEventCategory category) {
    return KSEvent::initWithEventIdentifier(testUUID(number), KSDate{start}, KSDate{end},
                                            KSDate{end + 1}, provider, category);
}

std::shared_ptr<KSEvent> makeWorkout(std::uint32_t number, double start, double end,
                                     std::string type) {
    auto event = makeEvent(number, start, end, KSEventProvider::health, KSEventCategory::workout);
    event->workoutType = std::move(type);
    return event;
}

std::shared_ptr<KSEvent> makePhotos(std::uint32_t number, double start, double end,
                                    std::vector<std::string> inferences) {
    auto event =
        makeEvent(number, start, end, KSEventProvider::photo, KSEventCategory::photoKeepsake);
    auto attributes =
        KSEventExtendedAttributes::initWithLocalIdentifier("keepsake" + std::to_string(number));
    attributes->photoKeepsakeInferences = std::move(inferences);
    event->identifierFromProvider = attributes->photoKeepsakeLocalIdentifier;
    event->extendedAttributes = std::move(attributes);
    return event;
}

std::shared_ptr<KSEvent> makeVisit(std::uint32_t number, double start, double end,
                                   std::string placeName) {
    auto event = makeEvent(number, start, end, KSEventProvider::routine, KSEventCategory::visit);
    event->placeName = std::move(placeName);
    return event;
}

template <class Record>
KSValue archiveOf(const Record& record) {
    ValueEncoder encoder;
    record.encodeWithCoder(encoder);
    return encoder.take();
}

template KSValue archiveOf(const KSEvent&);
template KSValue archiveOf(const KSEventBundle&);

}  // namespace keepsakes
