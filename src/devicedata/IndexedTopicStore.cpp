// SPDX-License-Identifier: Apache-2.0
#include "devicedata/IndexedTopicStore.h"

#include <SQLiteCpp/SQLiteCpp.h>
#include <fmt/format.h>

#include <array>
#include <utility>

#include "core/Log.h"
#include "core/Problems.h"
#include "devicedata/IndexSchema.h"
#include "devicedata/TopicScores.h"
#include "devicedata/TopicWords.h"
#include "folding/TextFolding.h"
#include "platform/ActivityCatalogue.h"
#include "platform/MediaStream.h"

namespace keepsakes {

namespace {

constexpr std::string_view kMapping = "keepsakes-topics";
constexpr double kShortestPlaySeconds = 30;

std::string textOf(const SQLite::Column& column) { return column.getString(); }

std::string activityOf(const SQLite::Column& column) {
    return fmt::format("workout {}", activityName(column.getInt()).value_or(""));
}

/// Evidence that the index holds. The query answers when it was (a date) and what tells of topics,
/// between two dates.
struct IndexedEvidence {
    EvidenceKind kind;
    std::string (*text)(const SQLite::Column&);
    const char* query;
};

constexpr auto kIndexed = std::to_array<IndexedEvidence>({
    {{"photo", 0.25},
     textOf,
     "SELECT taken, keywords FROM photos WHERE keywords IS NOT NULL AND taken BETWEEN ? AND ?"},
    {{"workout", 0.5}, activityOf, "SELECT end, type FROM workouts WHERE end BETWEEN ? AND ?"},
    {{"calendar", 0.35}, textOf, "SELECT end, title FROM calendarEvents WHERE end BETWEEN ? AND ?"},
    {{"link", 0.2}, textOf, "SELECT start, title FROM links WHERE start BETWEEN ? AND ?"},
});
constexpr EvidenceKind kPlay{"play", 0.15};

/// A title, its genre, and each word of the genre as such.
std::string textOf(const NowPlayingRecord& record) {
    auto text = record.title.value_or("");
    const auto genre = record.genre.value_or("");
    text += '\n' + genre;
    for (const auto& word : foldedTokens(genre, TopicWords::kMostTokens)) {
        text += "\ngenre " + word;
    }
    return text;
}

KSError notYet(std::string_view what) {
    return KSError::make("KSTopicStoreErrorDomain", 1, fmt::format("score topics: {}", what));
}

}  // namespace

IndexedTopicStore::IndexedTopicStore(std::filesystem::path index, std::filesystem::path words,
                                     NowPlayingStream& stream, Problems& problems)
    : index_(std::move(index)), ownWords_(std::move(words)), stream_(stream), problems_(problems) {}

TopicStore::Scores IndexedTopicStore::scoresForTopicMapping(std::string_view mapping,
                                                            const TopicQuery& query) {
    if (mapping != kMapping) {
        return std::unexpected(KSErrorInvalidParameterCreate(
            fmt::format("mapping == \"{}\" (it is \"{}\")", kMapping, mapping)));
    }
    const auto table = words();
    TopicScores scores(query);
    if (auto error = addFromIndex(table, query, scores)) return std::unexpected(*error);
    if (auto error = addPlays(table, query, scores)) return std::unexpected(*error);
    return scores.scores();
}

TopicWords IndexedTopicStore::words() {
    TopicWords table;
    if (ownWords_.empty()) return table;
    auto problems = table.addFile(ownWords_);
    const std::lock_guard lock(mutex_);
    if (problems == told_) return table;
    for (const auto& problem : problems) {
        logWarning(problem);
        problems_.add(problem);
    }
    told_ = std::move(problems);
    return table;
}

OptionalError IndexedTopicStore::addFromIndex(const TopicWords& words, const TopicQuery& query,
                                              TopicScores& scores) const {
    bool isWhole = true;
    const auto answered = index_.ask([&](SQLite::Database& index) {
        SQLite::Statement stale(index, "SELECT 1 FROM meta WHERE key = ? AND value <> 0");
        stale.bind(1, std::string(kMetaOccasionsStale));
        isWhole = !stale.executeStep();
        for (const auto& evidence : kIndexed) {
            SQLite::Statement rows(index, evidence.query);
            rows.bind(1, query.fromDate.seconds);
            rows.bind(2, query.toDate.seconds);
            while (rows.executeStep()) {
                scores.add(evidence.kind, {rows.getColumn(0).getDouble()},
                           words.topicsOf(evidence.text(rows.getColumn(1))));
            }
        }
    });
    if (!answered) return answered.error();
    if (!*answered) return notYet("the owner's files have not been looked at yet");
    if (!isWhole) return notYet("the owner's files are being looked at");
    return std::nullopt;
}

OptionalError IndexedTopicStore::addPlays(const TopicWords& words, const TopicQuery& query,
                                          TopicScores& scores) {
    OptionalError failed;
    std::optional<NowPlayingRecord> begun;
    stream_.read(
        query.fromDate,
        [&](const NowPlayingRecord& record) {
            if (begun && query.toDate < begun->absoluteTimestamp) return;
            if (record.playbackState == PlaybackState::jumped) return;
            const bool isEnd = begun && record.playbackState != PlaybackState::playing &&
                               record.title == begun->title;
            if (isEnd &&
                record.absoluteTimestamp - begun->absoluteTimestamp >= kShortestPlaySeconds) {
                scores.add(kPlay, begun->absoluteTimestamp, words.topicsOf(textOf(*begun)));
            }
            begun.reset();
            if (record.playbackState == PlaybackState::playing) begun = record;
        },
        [&failed](OptionalError error) { failed = std::move(error); });
    return failed;
}

}  // namespace keepsakes
