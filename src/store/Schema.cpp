// SPDX-License-Identifier: Apache-2.0
#include "store/Schema.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include <array>

namespace keepsakes::schema {

namespace {

// Step n takes a file of version n to version n + 1. A released step is never changed; the next
// schema is a step more.
//
// An event may be a member of several bundles: a hike is in the hike's bundle and in the one of
// cardio workouts, and replacing a bundle looks for the events it shares with its successor.
// `photoKeepsakeID` and `tripDestinations` are reserved and not written.
constexpr std::array kSteps = {
    R"sql(
CREATE TABLE KSEventMO (
    pk INTEGER PRIMARY KEY,
    category INTEGER NOT NULL,
    creationDate REAL NOT NULL,
    endDate REAL NOT NULL,
    eventIdentifier BLOB NOT NULL,
    expirationDate REAL,
    photoKeepsakeID BLOB,
    identifierFromProvider TEXT,
    placeName TEXT,
    provider INTEGER NOT NULL,
    sourceCreationDate REAL,
    startDate REAL NOT NULL,
    workoutType TEXT,
    suggestedEventCategory INTEGER,
    suggestedEventIdentifier TEXT,
    suggestedEventTitle TEXT,
    trends BLOB,
    tripTitle TEXT,
    tripDestinations BLOB,
    mediaTitle TEXT,
    mediaAlbum TEXT,
    mediaPlayerBundleId TEXT,
    mediaProductId TEXT,
    mediaGenre TEXT,
    mediaRepetitions REAL,
    itemUniqueIdentifier TEXT,
    itemURL TEXT,
    itemContentCreationDate REAL,
    itemAuthorAddresses BLOB,
    itemAuthorContactIdentifiers BLOB,
    itemAccountHandles BLOB,
    itemRecipientAddresses BLOB,
    itemDisplayName TEXT,
    itemIsShared INTEGER,
    itemSyndicationStatus INTEGER,
    interactionContactScore REAL,
    interactionUuid TEXT,
    interactionMechanism INTEGER,
    interactionDirection INTEGER,
    interactionBundleId TEXT,
    mode INTEGER
);
CREATE INDEX KSEventMO_eventIdentifier ON KSEventMO (eventIdentifier);
CREATE INDEX KSEventMO_startDate ON KSEventMO (startDate);
CREATE INDEX KSEventMO_category ON KSEventMO (category, startDate);

CREATE TABLE KSEventBundleMO (
    pk INTEGER PRIMARY KEY,
    bundleIdentifier BLOB NOT NULL,
    creationDate REAL NOT NULL,
    endDate REAL,
    expirationDate REAL,
    source INTEGER,
    startDate REAL,
    filtered INTEGER,
    promptLanguage TEXT
);
CREATE INDEX KSEventBundleMO_bundleIdentifier ON KSEventBundleMO (bundleIdentifier);
CREATE INDEX KSEventBundleMO_startDate ON KSEventBundleMO (startDate);

CREATE TABLE KSEventBundleMember (
    bundle INTEGER NOT NULL REFERENCES KSEventBundleMO (pk) ON DELETE CASCADE,
    event INTEGER NOT NULL REFERENCES KSEventMO (pk) ON DELETE CASCADE,
    PRIMARY KEY (bundle, event)
) WITHOUT ROWID;
CREATE INDEX KSEventBundleMember_event ON KSEventBundleMember (event);
)sql",
};

}  // namespace

int currentVersion() { return static_cast<int>(kSteps.size()); }

int versionOf(SQLite::Database& database) {
    return database.execAndGet("PRAGMA user_version").getInt();
}

void migrate(SQLite::Database& database) {
    for (int version = versionOf(database); version < currentVersion(); ++version) {
        SQLite::Transaction step(database);
        database.exec(kSteps[static_cast<std::size_t>(version)]);
        database.exec(fmt::format("PRAGMA user_version = {}", version + 1));
        step.commit();
    }
}

}  // namespace keepsakes::schema
