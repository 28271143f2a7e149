// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedPhotoAnalysis.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include "core/Json.h"
#include "devicedata/IndexSchema.h"

namespace keepsakes {

namespace {

/// The row's content (what its photos say, as JSON) completed by the row's other columns.
KSDictionary keepsake(SQLite::Statement& row) {
    KSDictionary keepsake;
    const auto content = parseJson(row.getColumn(4).getString());
    if (content && content->asDictionary()) keepsake = *content->asDictionary();
    keepsake.insert_or_assign(std::string(kKSKeyLocalIdentifier), row.getColumn(0).getString());
    keepsake.insert_or_assign(
        std::string(kKSKeyEventUniversalDateInterval),
        KSDictionary{{std::string(kKSKeyIntervalStart), KSDate{row.getColumn(1).getDouble()}},
                     {std::string(kKSKeyIntervalEnd), KSDate{row.getColumn(2).getDouble()}}});
    keepsake.insert_or_assign(std::string(kKSKeyPhotoCount), row.getColumn(3).getInt64());
    return keepsake;
}

}  // namespace

PhotoAnalysis::Summary IndexedPhotoAnalysis::summary(KSDateInterval interval) {
    return summaryOf("start <= ? AND end >= ?", [interval](SQLite::Statement& query) {
        query.bind(1, interval.end.seconds);
        query.bind(2, interval.start.seconds);
    });
}

PhotoAnalysis::Summary IndexedPhotoAnalysis::summary(std::span<const std::string> identifiers) {
    if (identifiers.size() > kMostIdentifiers) {
        return std::unexpected(KSErrorInvalidParameterCreate(
            fmt::format("identifiers.count <= {}", kMostIdentifiers)));
    }
    std::string marks;
    for (std::size_t i = 0; i < identifiers.size(); ++i) marks += i == 0 ? "?" : ",?";
    return summaryOf(fmt::format("identifier IN ({})", marks),
                     [identifiers](SQLite::Statement& query) {
                         int position = 0;
                         for (const auto& id : identifiers) query.bind(++position, id);
                     });
}

PhotoAnalysis::Summary IndexedPhotoAnalysis::summaryOf(
    const std::string& condition, const std::function<void(SQLite::Statement&)>& bind) const {
    KSArray keepsakes;
    KSDate changed = KSDate::distantPast();
    const auto answered =
        index_.ask([&keepsakes, &changed, &condition, &bind](SQLite::Database& index) {
            SQLite::Statement date(index, "SELECT value FROM meta WHERE key = ?");
            date.bind(1, std::string(kMetaLastChanged));
            if (date.executeStep()) changed = {date.getColumn(0).getDouble()};
            SQLite::Statement query(
                index, fmt::format("SELECT identifier, start, end, photos, content FROM occasions"
                                   " WHERE {} ORDER BY start, identifier",
                                   condition));
            bind(query);
            while (query.executeStep()) keepsakes.emplace_back(keepsake(query));
        });
    if (!answered) return std::unexpected(answered.error());
    return KSDictionary{{std::string(kKSKeyGraphCreationDate), changed},
                        {std::string(kKSKeyEvents), std::move(keepsakes)}};
}

}  // namespace keepsakes
