// SPDX-License-Identifier: Apache-2.0
#include "bundle/KSEventBundleMO.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include <cstring>

#include "store/KSEventMO.h"
#include "store/ManagedObjectContext.h"

namespace keepsakes {

namespace {

void bindDate(SQLite::Statement& to, int index, const std::optional<KSDate>& date) {
    if (date) to.bind(index, date->seconds);
}

std::optional<KSDate> dateAt(SQLite::Statement& row, int index) {
    const auto column = row.getColumn(index);
    return column.isNull() ? std::nullopt : std::optional(KSDate{column.getDouble()});
}

}  // namespace

std::string KSEventBundleMO::columnNames() {
    return "pk, bundleIdentifier, creationDate, endDate, expirationDate, source, startDate, "
           "filtered, promptLanguage";
}

void KSEventBundleMO::managedObjectWithEventBundle(const KSEventBundle& bundle,
                                                   ManagedObjectContext& context) {
    auto& insert = context.statement(
        "INSERT INTO KSEventBundleMO (bundleIdentifier, creationDate, endDate, expirationDate, "
        "source, startDate, filtered, promptLanguage) VALUES (?, ?, ?, ?, ?, ?, ?, ?)");
    const auto& identifier = bundle.bundleIdentifier().bytes;
    insert.bind(1, identifier.data(), static_cast<int>(identifier.size()));
    insert.bind(2, bundle.creationDate().seconds);
    bindDate(insert, 3, bundle.endDate);
    bindDate(insert, 4, bundle.expirationDate);
    insert.bind(5, static_cast<std::int64_t>(bundle.source));
    bindDate(insert, 6, bundle.startDate);
    insert.bind(7, bundle.filtered ? 1 : 0);
    if (bundle.promptLanguage) insert.bind(8, *bundle.promptLanguage);
    insert.exec();
    const auto row = context.lastInsertedRow();

    for (const auto& event : bundle.events) {
        const auto member = KSEventMO::rowWithIdentifier(event->eventIdentifier(), context);
        if (member == 0) continue;
        auto& join = context.statement(
            "INSERT OR IGNORE INTO KSEventBundleMember (bundle, event) VALUES (?, ?)");
        join.bind(1, row);
        join.bind(2, member);
        join.exec();
    }
}

KSEventBundleMO::Stored KSEventBundleMO::initWithEventBundleMO(SQLite::Statement& row) {
    const auto bytes = row.getColumn(1);
    KSUUID identifier;
    const void* data = bytes.getBlob();
    if (bytes.getBytes() != static_cast<int>(identifier.bytes.size())) return {};
    std::memcpy(identifier.bytes.data(), data, identifier.bytes.size());
    auto bundle = KSEventBundle::initWithBundleIdentifier(identifier, dateAt(row, 2));
    if (!bundle) return {};
    bundle->endDate = dateAt(row, 3);
    bundle->expirationDate = dateAt(row, 4);
    bundle->source = static_cast<std::uint64_t>(row.getColumn(5).getInt64());
    bundle->startDate = dateAt(row, 6);
    bundle->filtered = row.getColumn(7).getInt() != 0;
    if (!row.isColumnNull(8)) bundle->promptLanguage = row.getColumn(8).getString();
    return {row.getColumn(0).getInt64(), std::move(bundle)};
}

KSEventArray KSEventBundleMO::eventsOf(std::int64_t row, ManagedObjectContext& context) {
    static const std::string text = fmt::format(
        "SELECT {} FROM KSEventBundleMember JOIN KSEventMO ON KSEventMO.pk = event "
        "WHERE bundle = ? ORDER BY startDate, pk",
        KSEventMO::columnNames("KSEventMO."));
    auto& select = context.statement(text);
    select.bind(1, row);
    KSEventArray events;
    while (select.executeStep()) {
        if (auto event = KSEventMO::initWithEventMO(select)) events.push_back(std::move(event));
    }
    return events;
}

}  // namespace keepsakes
