// SPDX-License-Identifier: Apache-2.0
#include "store/KSEventMO.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include <array>
#include <cstring>

#include "store/ManagedObjectContext.h"
#include "store/Transformers.h"

namespace keepsakes {

namespace {

using Statement = SQLite::Statement;
using SQLite::Column;

void bind(Statement& to, int index, std::uint64_t value) {
    to.bind(index, static_cast<std::int64_t>(value));
}
void bind(Statement& to, int index, bool value) { to.bind(index, value ? 1 : 0); }
void bind(Statement& to, int index, double value) { to.bind(index, value); }
void bind(Statement& to, int index, KSDate value) { to.bind(index, value.seconds); }
void bind(Statement& to, int index, const std::string& value) { to.bindNoCopy(index, value); }
void bind(Statement& to, int index, const KSUUID& value) {
    to.bind(index, value.bytes.data(), static_cast<int>(value.bytes.size()));
}
void bindBytes(Statement& to, int index, const std::optional<KSValue::Bytes>& bytes) {
    if (!bytes) return;
    // An empty vector may have no data, and that would be stored as nothing.
    to.bind(index, bytes->empty() ? static_cast<const void*>("") : bytes->data(),
            static_cast<int>(bytes->size()));
}
void bind(Statement& to, int index, const std::vector<std::string>& value) {
    bindBytes(to, index,
              KSStringArrayTransformer::transformedValue(KSArray(value.begin(), value.end())));
}
void bind(Statement& to, int index, const KSDictionary& value) {
    bindBytes(to, index, KSDictionaryTransformer::transformedValue(value));
}
template <class T>
void bind(Statement& to, int index, const std::optional<T>& value) {
    if (value) bind(to, index, *value);  // what is not bound is null
}

KSValue::Bytes bytesOf(const Column& column) {
    const auto* data = static_cast<const std::uint8_t*>(column.getBlob());
    return {data, data + column.getBytes()};
}

void read(const Column& column, bool& value) { value = column.getInt64() != 0; }
void read(const Column& column, std::uint64_t& value) {
    value = static_cast<std::uint64_t>(column.getInt64());
}
void read(const Column& column, double& value) { value = column.getDouble(); }
void read(const Column& column, KSDate& value) { value.seconds = column.getDouble(); }
void read(const Column& column, std::string& value) { value = column.getString(); }
void read(const Column& column, std::vector<std::string>& value) {
    value = KSStringArrayTransformer::reverseTransformedValue(bytesOf(column))
                .value_or(std::vector<std::string>());
}
void read(const Column& column, KSDictionary& value) {
    value =
        KSDictionaryTransformer::reverseTransformedValue(bytesOf(column)).value_or(KSDictionary());
}
template <class T>
void read(const Column& column, std::optional<T>& value) {
    read(column, value.emplace());
}

/// One column: how it is written, and how it is read back when it is part of the record's details.
struct Attribute {
    std::string_view name;
    void (*write)(Statement&, int index, const KSEvent&);
    void (*read)(const Column&, KSEvent&);
};

template <auto Member>
constexpr Attribute detail(std::string_view name) {
    return {name,
            [](Statement& to, int index, const KSEvent& event) { bind(to, index, event.*Member); },
            [](const Column& column, KSEvent& event) { read(column, event.*Member); }};
}

template <class Get>
constexpr Attribute core(std::string_view name, Get) {
    return {name,
            [](Statement& to, int index, const KSEvent& event) { bind(to, index, Get{}(event)); },
            nullptr};
}

void readMode(const Column& column, KSEvent& event) {
    // Read back as 32 bits, whatever was written.
    event.mode = static_cast<KSPlaceMode>(static_cast<std::uint32_t>(column.getInt64()));
}

void writeNothing(Statement&, int, const KSEvent&) {}
void writeZero(Statement& to, int index, const KSEvent&) { to.bind(index, 0); }

// The first columns are the core, in the order in which `initWithEventMO` takes them.
constexpr auto kColumns = std::to_array<Attribute>({
    core("eventIdentifier", [](const KSEvent& event) { return event.eventIdentifier(); }),
    core("startDate", [](const KSEvent& event) { return event.startDate(); }),
    core("endDate", [](const KSEvent& event) { return event.endDate(); }),
    core("creationDate", [](const KSEvent& event) { return event.creationDate(); }),
    core("provider",
         [](const KSEvent& event) { return static_cast<std::uint64_t>(event.provider()); }),
    core("category",
         [](const KSEvent& event) { return static_cast<std::uint64_t>(event.category()); }),
    detail<&KSEvent::expirationDate>("expirationDate"),
    detail<&KSEvent::identifierFromProvider>("identifierFromProvider"),
    detail<&KSEvent::placeName>("placeName"),
    {"sourceCreationDate",
     [](Statement& to, int index, const KSEvent& event) {
         bind(to, index, event.sourceCreationDate());
     },
     [](const Column& column, KSEvent& event) { read(column, event.storedSourceCreationDate); }},
    detail<&KSEvent::workoutType>("workoutType"),
    detail<&KSEvent::suggestedEventCategory>("suggestedEventCategory"),
    detail<&KSEvent::suggestedEventIdentifier>("suggestedEventIdentifier"),
    detail<&KSEvent::suggestedEventTitle>("suggestedEventTitle"),
    detail<&KSEvent::trends>("trends"),
    detail<&KSEvent::tripTitle>("tripTitle"),
    detail<&KSEvent::mediaTitle>("mediaTitle"),
    detail<&KSEvent::mediaAlbum>("mediaAlbum"),
    detail<&KSEvent::mediaPlayerBundleId>("mediaPlayerBundleId"),
    detail<&KSEvent::mediaProductId>("mediaProductId"),
    detail<&KSEvent::mediaGenre>("mediaGenre"),
    detail<&KSEvent::mediaRepetitions>("mediaRepetitions"),
    detail<&KSEvent::itemUniqueIdentifier>("itemUniqueIdentifier"),
    detail<&KSEvent::itemURL>("itemURL"),
    detail<&KSEvent::itemContentCreationDate>("itemContentCreationDate"),
    detail<&KSEvent::itemAuthorAddresses>("itemAuthorAddresses"),
    detail<&KSEvent::itemAuthorContactIdentifiers>("itemAuthorContactIdentifiers"),
    detail<&KSEvent::itemAccountHandles>("itemAccountHandles"),
    detail<&KSEvent::itemRecipientAddresses>("itemRecipientAddresses"),
    detail<&KSEvent::itemDisplayName>("itemDisplayName"),
    detail<&KSEvent::itemIsShared>("itemIsShared"),
    detail<&KSEvent::itemSyndicationStatus>("itemSyndicationStatus"),
    detail<&KSEvent::interactionContactScore>("interactionContactScore"),
    {"interactionUuid", writeNothing, nullptr},
    {"interactionMechanism", writeZero, nullptr},
    {"interactionDirection", writeZero, nullptr},
    {"interactionBundleId", writeNothing, nullptr},
    {"mode",
     [](Statement& to, int index,
        const KSEvent& event) { bind(to, index, static_cast<std::uint64_t>(event.mode)); },
     readMode},
});

constexpr int kColumnCount = static_cast<int>(kColumns.size());

void bindAll(Statement& to, const KSEvent& event) {
    for (int column = 0; column < kColumnCount; ++column) {
        kColumns[static_cast<std::size_t>(column)].write(to, column + 1, event);
    }
}

std::string insertText() {
    std::string marks = "?";
    for (int column = 1; column < kColumnCount; ++column) marks += ", ?";
    return fmt::format("INSERT INTO KSEventMO ({}) VALUES ({})", KSEventMO::columnNames(), marks);
}

std::string updateText() {
    std::string sets;
    for (const auto& column : kColumns) {
        if (!sets.empty()) sets += ", ";
        sets += fmt::format("{} = ?", column.name);
    }
    return fmt::format("UPDATE KSEventMO SET {} WHERE pk = ?", sets);
}

}  // namespace

std::string KSEventMO::columnNames(std::string_view prefix) {
    std::string names;
    for (const auto& column : kColumns) {
        if (!names.empty()) names += ", ";
        names += fmt::format("{}{}", prefix, column.name);
    }
    return names;
}

std::int64_t KSEventMO::managedObjectWithEvent(const KSEvent& event,
                                               ManagedObjectContext& context) {
    static const std::string text = insertText();
    auto& insert = context.statement(text);
    bindAll(insert, event);
    insert.exec();
    return context.lastInsertedRow();
}

void KSEventMO::setPropertiesOfEventMO(std::int64_t row, const KSEvent& event,
                                       ManagedObjectContext& context) {
    static const std::string text = updateText();
    auto& update = context.statement(text);
    bindAll(update, event);
    update.bind(kColumnCount + 1, row);
    update.exec();
}

std::int64_t KSEventMO::rowWithIdentifier(const KSUUID& identifier, ManagedObjectContext& context) {
    static const std::string text =
        "SELECT pk FROM KSEventMO WHERE eventIdentifier = ? ORDER BY pk DESC LIMIT 1";
    auto& select = context.statement(text);
    bind(select, 1, identifier);
    return select.executeStep() ? select.getColumn(0).getInt64() : 0;
}

KSEventPointer KSEventMO::initWithEventMO(SQLite::Statement& statement, int firstColumn) {
    const auto column = [&](int index) { return statement.getColumn(firstColumn + index); };
    const auto provider = static_cast<KSEventProvider>(column(4).getInt64());
    const auto category = static_cast<KSEventCategory>(column(5).getInt64());
    const auto identifier = column(0);
    KSUUID uuid;
    const void* bytes = identifier.getBlob();
    if (identifier.getBytes() != static_cast<int>(uuid.bytes.size()) ||
        provider == KSEventProvider::unknown || category == KSEventCategory::unknown) {
        return nullptr;
    }
    std::memcpy(uuid.bytes.data(), bytes, uuid.bytes.size());
    auto event = KSEvent::initWithEventIdentifier(
        uuid, KSDate{column(1).getDouble()}, KSDate{column(2).getDouble()},
        KSDate{column(3).getDouble()}, provider, category);
    for (int index = 0; index < kColumnCount; ++index) {
        const auto& attribute = kColumns[static_cast<std::size_t>(index)];
        if (attribute.read && !statement.isColumnNull(firstColumn + index)) {
            attribute.read(column(index), *event);
        }
    }
    return event;
}

}  // namespace keepsakes
