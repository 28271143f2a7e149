// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexSchema.h"

namespace keepsakes {

std::string_view indexSchema() {
    // Instants are seconds since 2001-01-01 UTC, positions degrees. Paths and names are bytes, for
    // nothing says that they are text. A file row stands in its folder's order, so that a rescan
    // reads a folder's rows in one sweep; records refer to it by its number, which a rename keeps.
    // Lists of handles are their numbers with blanks between; those of an interaction are read far
    // more often as a whole than searched.
    return R"sql(
CREATE TABLE meta(key TEXT PRIMARY KEY, value) WITHOUT ROWID;
CREATE TABLE folders(id INTEGER PRIMARY KEY, path BLOB NOT NULL UNIQUE);
CREATE TABLE files(
    folder INTEGER NOT NULL,
    name BLOB NOT NULL,
    id INTEGER NOT NULL,
    size INTEGER NOT NULL,
    mtime INTEGER NOT NULL,
    inode INTEGER NOT NULL,
    wanted INTEGER NOT NULL,
    state INTEGER NOT NULL,
    hash BLOB,
    reason TEXT,
    refusedAt REAL,
    mailbox INTEGER NOT NULL DEFAULT 0,
    PRIMARY KEY(folder, name)) WITHOUT ROWID;
CREATE UNIQUE INDEX filesById ON files(id);
CREATE INDEX filesRefused ON files(refusedAt) WHERE refusedAt IS NOT NULL;
CREATE INDEX filesSent ON files(id) WHERE mailbox = 1;
CREATE TABLE workouts(
    file INTEGER NOT NULL, start REAL NOT NULL, end REAL NOT NULL, type INTEGER NOT NULL);
CREATE INDEX workoutsByEnd ON workouts(end);
CREATE INDEX workoutsByFile ON workouts(file);
CREATE TABLE zones(
    file INTEGER NOT NULL, start REAL NOT NULL, end REAL NOT NULL, offset INTEGER NOT NULL);
CREATE INDEX zonesByFile ON zones(file);
CREATE TABLE photos(
    file INTEGER NOT NULL,
    number INTEGER NOT NULL,
    taken REAL NOT NULL,
    timeSource INTEGER NOT NULL,
    localTime REAL NOT NULL,
    latitude REAL,
    longitude REAL,
    words TEXT,
    keywords TEXT,  -- folded, a line each
    occasion INTEGER,
    PRIMARY KEY(file, number)) WITHOUT ROWID;
CREATE INDEX photosByTaken ON photos(taken) WHERE keywords IS NOT NULL;
CREATE TABLE occasions(
    id INTEGER PRIMARY KEY,
    identifier TEXT NOT NULL UNIQUE,
    start REAL NOT NULL,
    end REAL NOT NULL,
    photos INTEGER NOT NULL,
    content TEXT NOT NULL);
CREATE INDEX occasionsByStart ON occasions(start);
-- A file's points of one UTC day (counted from 2001-01-01), several rows where they are not in
-- order; the days whose visits are to be found anew.
CREATE TABLE points(file INTEGER NOT NULL, day INTEGER NOT NULL, data BLOB NOT NULL);
CREATE INDEX pointsByDay ON points(day);
CREATE INDEX pointsByFile ON points(file);
CREATE TABLE staleDays(day INTEGER PRIMARY KEY);
CREATE TABLE statedVisits(
    file INTEGER NOT NULL,
    firstDay INTEGER NOT NULL,
    lastDay INTEGER NOT NULL,
    start REAL NOT NULL,
    end REAL NOT NULL,
    latitude REAL NOT NULL,
    longitude REAL NOT NULL,
    name TEXT,
    use INTEGER NOT NULL,
    confidence REAL NOT NULL);
CREATE INDEX statedVisitsByFile ON statedVisits(file);
CREATE TABLE namedPlaces(
    file INTEGER NOT NULL,
    latitude REAL NOT NULL,
    longitude REAL NOT NULL,
    name TEXT NOT NULL,
    use INTEGER NOT NULL,
    origin INTEGER NOT NULL);
CREATE INDEX namedPlacesByFile ON namedPlaces(file);
-- What is found of all that: visits, stated ones with the name and use that the file gives, and the
-- places that they are at, with the owner's name and that of a map.
CREATE TABLE visits(
    id INTEGER PRIMARY KEY,
    start REAL NOT NULL,
    end REAL NOT NULL,
    latitude REAL NOT NULL,
    longitude REAL NOT NULL,
    confidence REAL NOT NULL,
    isOpen INTEGER NOT NULL,
    isStated INTEGER NOT NULL,
    name TEXT,
    use INTEGER NOT NULL,
    recorded REAL NOT NULL,
    place INTEGER);
CREATE INDEX visitsByStart ON visits(start);
CREATE INDEX visitsByEnd ON visits(end);
CREATE TABLE places(
    id INTEGER PRIMARY KEY,
    identifier TEXT NOT NULL UNIQUE,
    latitude REAL NOT NULL,
    longitude REAL NOT NULL,
    name TEXT,
    mapName TEXT,
    use INTEGER NOT NULL);
CREATE TABLE gazetteer(
    path BLOB NOT NULL, size INTEGER NOT NULL, mtime INTEGER NOT NULL, inode INTEGER NOT NULL,
    reason TEXT);
CREATE TABLE towns(latitude REAL NOT NULL, longitude REAL NOT NULL, name TEXT NOT NULL);
CREATE INDEX townsByPosition ON towns(latitude, longitude, name);
CREATE TABLE handles(
    id INTEGER PRIMARY KEY,
    handle TEXT NOT NULL UNIQUE,
    person INTEGER,
    owner INTEGER NOT NULL DEFAULT 0);
CREATE TABLE interactions(
    id INTEGER PRIMARY KEY,
    file INTEGER NOT NULL,
    identity BLOB NOT NULL,
    start REAL NOT NULL,
    end REAL NOT NULL,
    mechanism INTEGER NOT NULL,
    direction INTEGER NOT NULL,
    sender INTEGER,
    recipients TEXT NOT NULL);
CREATE INDEX interactionsByStart ON interactions(start);
CREATE INDEX interactionsByFile ON interactions(file);
CREATE TABLE links(
    file INTEGER NOT NULL,
    interaction INTEGER NOT NULL,
    start REAL NOT NULL,
    url TEXT NOT NULL,
    title TEXT NOT NULL,
    description TEXT NOT NULL,
    room TEXT NOT NULL,
    roomName TEXT NOT NULL,
    account INTEGER,
    starred INTEGER NOT NULL);
CREATE INDEX linksByStart ON links(start);
CREATE INDEX linksByFile ON links(file);
CREATE TABLE cards(
    file INTEGER NOT NULL,
    uid TEXT NOT NULL,
    name TEXT NOT NULL,
    handles TEXT NOT NULL,
    fromPhone INTEGER NOT NULL);
CREATE INDEX cardsByFile ON cards(file);
CREATE INDEX cardsByUid ON cards(uid);
CREATE TABLE relations(file INTEGER NOT NULL, relationship TEXT NOT NULL, name TEXT NOT NULL);
CREATE INDEX relationsByFile ON relations(file);
CREATE TABLE ownerHandles(file INTEGER NOT NULL, handle INTEGER NOT NULL);
CREATE INDEX ownerHandlesByFile ON ownerHandles(file);
CREATE TABLE people(
    id INTEGER PRIMARY KEY,
    identifier TEXT NOT NULL UNIQUE,
    name TEXT NOT NULL,
    score REAL NOT NULL);
CREATE TABLE calendarEvents(
    file INTEGER NOT NULL,
    identifier TEXT NOT NULL,
    start REAL NOT NULL,
    end REAL NOT NULL,
    allDay INTEGER NOT NULL,
    recurs INTEGER NOT NULL,
    title TEXT NOT NULL,
    location TEXT NOT NULL,
    calendar TEXT NOT NULL,
    attendees TEXT NOT NULL,
    category INTEGER,
    suggestion TEXT,
    origin TEXT,
    destination TEXT);
CREATE INDEX calendarEventsByFile ON calendarEvents(file);
CREATE INDEX calendarEventsByIdentifier ON calendarEvents(identifier);
CREATE INDEX calendarEventsByEnd ON calendarEvents(end);
CREATE TABLE recurrenceWindows(
    file INTEGER PRIMARY KEY, start REAL NOT NULL, end REAL NOT NULL);
CREATE TABLE trips(
    id INTEGER PRIMARY KEY,
    start REAL NOT NULL,
    end REAL NOT NULL,
    title TEXT NOT NULL,
    parts TEXT NOT NULL);
CREATE INDEX tripsByEnd ON trips(end);
)sql";
}

}  // namespace keepsakes
