// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/KSDate.h"

namespace keepsakes::limits {

// Time.

/// 1990-01-01: no receiver or camera recorded a true time before it; clocks that were never set
/// show the years 1970 and 1980.
inline constexpr KSDate kEarliestTime = KSDate::fromUnix(631152000);
/// How far after now a time is still believed, in seconds: clocks and zones differ, by a day at
/// most.
inline constexpr double kFutureTolerance = 86400;
/// Local time is between so many seconds behind and ahead of UTC anywhere.
inline constexpr int kLowestOffset = -12 * 3600;
inline constexpr int kHighestOffset = 14 * 3600;

inline constexpr bool isSane(KSDate time, KSDate now) {
    return time >= kEarliestTime && time <= now + kFutureTolerance;
}
inline constexpr bool isOffset(int seconds) {
    return seconds >= kLowestOffset && seconds <= kHighestOffset;
}

// XML and JSON.

/// Bytes per read.
inline constexpr std::size_t kBlockSize = std::size_t{64} * 1024;
/// A single tag, comment or the like may be so long. The XML parser looks at an unfinished one
/// again with each block, so that a longer one would cost its length squared. The JSON parser holds
/// the text back to the last string or number.
inline constexpr std::size_t kLongestToken = std::size_t{1024} * 1024;
/// Elements within elements.
inline constexpr std::size_t kDeepestElement = 64;
/// The values read (times, numbers, types) are short; a longer text is no such value.
inline constexpr std::size_t kLongestValue = 256;

// Tracks.

/// Workouts, and spans of a known zone, that one file may hold.
inline constexpr std::size_t kMostWorkouts = 10000;
inline constexpr std::size_t kMostZoneSpans = 10000;
/// A track that spans more seconds than 31 days holds a wrong timestamp or is no workout.
inline constexpr double kLongestWorkout = 31 * 86400.0;

// Gazetteers.

inline constexpr std::size_t kMostTowns = 1'000'000;

// Location histories.

/// Points of a path whose times stand apart from them, and which wait for those.
inline constexpr std::size_t kMostPathPoints = 500000;
/// A stay of more seconds than a year holds a wrong timestamp.
inline constexpr double kLongestStay = 366 * 86400.0;
/// Bytes of a line of a recording.
inline constexpr std::size_t kLongestLine = std::size_t{64} * 1024;

// Photos.

inline constexpr std::uint64_t kLargestPhoto = std::uint64_t{256} * 1024 * 1024;
/// Bytes of a HEIF file's table of items, and of one metadata item.
inline constexpr std::uint64_t kLargestMetaBox = std::uint64_t{8} * 1024 * 1024;
inline constexpr std::uint64_t kLargestItem = std::uint64_t{16} * 1024 * 1024;
/// How far, in seconds, the camera's clock may be from a multiple of 15 minutes off GPS time for
/// the zone to be told from it. Beyond it the clock is wrong or the fix is an old one.
inline constexpr double kLargestClockError = 180;
/// Properties of a photo looked at, and names taken from it.
inline constexpr std::size_t kMostProperties = 10000;
inline constexpr std::size_t kMostNames = 100;
/// Bytes of a keyword or a name; a longer one is passed over.
inline constexpr std::size_t kLongestName = 256;

// People.

/// Bytes of a header field or of a card's line that are looked at.
inline constexpr std::size_t kLongestField = std::size_t{64} * 1024;
/// A mail to more is one to a crowd.
inline constexpr std::size_t kMostRecipients = 50;
/// Cards of one file, and numbers and addresses of one card.
inline constexpr std::size_t kMostCards = 100000;
inline constexpr std::size_t kMostHandles = 100;
/// A call lasts a day at most, in seconds.
inline constexpr double kLongestCall = 86400;
/// Links of one message, and bytes of one: what is longer is no link that somebody meant to share.
inline constexpr std::size_t kMostLinks = 16;
inline constexpr std::size_t kLongestUrl = 2048;
/// Bytes of a message's text that are searched for links, and of a mail behind its header.
inline constexpr std::size_t kLongestText = std::size_t{256} * 1024;
inline constexpr std::size_t kLongestMail = std::size_t{1024} * 1024;
/// Bytes of a messenger's database with its log: it is copied into memory.
inline constexpr std::uint64_t kLargestChatHistory = std::uint64_t{256} * 1024 * 1024;

// Calendars.

/// Entries of one file, overrides of single occurrences included.
inline constexpr std::size_t kMostEntries = 100000;
/// Occurrences of one entry, and steps of a rule until its window is over: a thousand years of
/// days.
inline constexpr std::size_t kMostOccurrences = 2000;
inline constexpr std::size_t kMostRuleSteps = 400000;
/// Records of one file from which on no more occurrences of recurring entries are added.
inline constexpr std::size_t kMostOccurrencesOfFile = 100000;
/// Recurring entries are followed so many seconds back from the scan (two years and more) and
/// ahead (a year and more); the file is read again before that window is used up.
inline constexpr double kRecurrenceBack = 800 * 86400.0;
inline constexpr double kRecurrenceAhead = 400 * 86400.0;
/// An entry lies at most so many seconds ahead: fifty years.
inline constexpr double kFarthestEntry = 50 * 366 * 86400.0;
/// A longer one holds a wrong date, in seconds: a year and a day.
inline constexpr double kLongestEntry = 367 * 86400.0;
/// Rules, extra dates and exceptions of one entry, attendees, and definitions of zones in a file.
inline constexpr std::size_t kMostRules = 8;
inline constexpr std::size_t kMostDates = 5000;
inline constexpr std::size_t kMostAttendees = 100;
inline constexpr std::size_t kMostZones = 200;
/// Bytes of a description or of structured data that the rules look at.
inline constexpr std::size_t kLongestDescription = std::size_t{16} * 1024;

}  // namespace keepsakes::limits
