// SPDX-License-Identifier: Apache-2.0
#include "indexer/GazetteerUpdate.h"

#include <fmt/format.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <numbers>
#include <system_error>

#include "indexer/FolderListing.h"
#include "indexer/OpenFile.h"
#include "platform/GeoPoint.h"
#include "readers/GazetteerReader.h"

namespace keepsakes {

namespace {

struct KnownGazetteer {
    std::string path;
    FileStamp stamp;
    std::optional<std::string> reason;
};

std::optional<KnownGazetteer> known(SQLite::Database& database) {
    SQLite::Statement query(database, "SELECT path, size, mtime, inode, reason FROM gazetteer");
    if (!query.executeStep()) return std::nullopt;
    KnownGazetteer gazetteer{.path = query.getColumn(0).getString(),
                             .stamp = {.size = query.getColumn(1).getInt64(),
                                       .mtime = query.getColumn(2).getInt64(),
                                       .inode = query.getColumn(3).getInt64()},
                             .reason = std::nullopt};
    if (!query.isColumnNull(4)) gazetteer.reason = query.getColumn(4).getString();
    return gazetteer;
}

void forget(IndexWriter& index) {
    index.setMeta(kMetaPlacesStale, 1);
    index.database().exec("DELETE FROM towns; DELETE FROM gazetteer");
}

void remember(SQLite::Database& database, const KnownGazetteer& gazetteer) {
    SQLite::Statement put(database, "INSERT INTO gazetteer VALUES(?, ?, ?, ?, ?)");
    put.bind(1, gazetteer.path.data(), static_cast<int>(gazetteer.path.size()));
    put.bind(2, gazetteer.stamp.size);
    put.bind(3, gazetteer.stamp.mtime);
    put.bind(4, gazetteer.stamp.inode);
    if (gazetteer.reason) put.bind(5, *gazetteer.reason);
    put.exec();
}

std::optional<std::string> takeTowns(SQLite::Database& database, int fd) {
    SQLite::Statement put(database, "INSERT INTO towns(latitude, longitude, name) VALUES(?, ?, ?)");
    const auto read = readGazetteer(readDescriptor(fd), [&put](const Town& town) {
        put.reset();
        put.bind(1, town.position.latitude);
        put.bind(2, town.position.longitude);
        put.bind(3, town.name);
        put.exec();
    });
    if (read) return std::nullopt;
    database.exec("DELETE FROM towns");
    return read.error();
}

std::optional<std::string> problemOf(const std::string& path,
                                     const std::optional<std::string>& reason) {
    if (!reason) return std::nullopt;
    return fmt::format("passed over the gazetteer {}: {}", escaped(path), *reason);
}

}  // namespace

std::optional<std::string> updateGazetteer(IndexWriter& index, const std::filesystem::path& path,
                                           ReadMark& mark) {
    auto& database = index.database();
    const auto before = known(database);
    if (path.empty()) {
        if (before) forget(index);
        return std::nullopt;
    }
    const auto name = std::filesystem::absolute(path).lexically_normal().string();
    const OpenFile file(name);
    const auto stamp = file.stamp();
    if (!stamp) {
        return problemOf(name, file.error() != 0 ? std::generic_category().message(file.error())
                                                 : std::string("not a file"));
    }
    if (before && before->path == name && before->stamp == *stamp) {
        return problemOf(name, before->reason);
    }
    forget(index);
    KnownGazetteer now{.path = name, .stamp = *stamp, .reason = std::nullopt};
    const auto& left = mark.leftBehind();
    if (left && left->path == name && left->stamp == *stamp) {
        now.reason =
            left->outOfTime ? "reading it took too long" : "it ended the indexer that read it";
    } else {
        mark.begin(name, *stamp);
        now.reason = takeTowns(database, file.get());
        mark.end();
    }
    remember(database, now);
    return problemOf(name, now.reason);
}

TownFinder::TownFinder(SQLite::Database& database)
    : query_(database,
             "SELECT latitude, longitude, name FROM towns"
             " WHERE latitude BETWEEN ? AND ? AND longitude BETWEEN ? AND ?") {}

std::string TownFinder::nearest(const GeoPoint& point, double metres) {
    const double reach = metres / kMetresPerDegree;
    const double narrowing = std::cos(point.latitude * std::numbers::pi / 180);
    double width = reach / std::max(narrowing, 1e-3) * 1.01;
    // Beyond the date line and around the poles every longitude may be near.
    if (std::abs(point.longitude) + width > 180) width = 360;
    query_.reset();
    query_.bind(1, point.latitude - reach);
    query_.bind(2, point.latitude + reach);
    query_.bind(3, point.longitude - width);
    query_.bind(4, point.longitude + width);
    std::string name;
    while (query_.executeStep()) {
        const GeoPoint town{query_.getColumn(0).getDouble(), query_.getColumn(1).getDouble()};
        const double away = distanceBetween(point, town);
        if (away > metres || (away == metres && !name.empty())) continue;
        metres = away;
        name = query_.getColumn(2).getString();
    }
    return name;
}

}  // namespace keepsakes
