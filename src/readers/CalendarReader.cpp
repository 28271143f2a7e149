// SPDX-License-Identifier: Apache-2.0
#include "readers/CalendarReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <map>
#include <tuple>
#include <utility>

#include "core/MurmurHash3.h"
#include "core/Text.h"
#include "readers/CalendarEntry.h"
#include "readers/CalendarZones.h"
#include "readers/CardLine.h"
#include "readers/EntryExpansion.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

/// Follows a file's components and keeps its entries.
class CalendarFile {
  public:
    /// Why the file cannot be read, or nothing.
    std::optional<std::string> take(const CardLine& line) {
        if (line.name == "BEGIN") {
            begin(lowerCased(cardText(line.text)));
        } else if (line.name == "END") {
            const auto name = lowerCased(cardText(line.text));
            if (open_.empty() || open_.back() != name) {
                return fmt::format("\"{}\" ends that did not begin, after {} entries", name,
                                   entries_.size());
            }
            open_.pop_back();
            return end(name);
        }
        if (entry_ && open_.size() == 2) {
            entry_->line(line);
        } else if (!zone_.empty() && open_.size() <= 3) {
            zoneLine(line);
        } else if (open_.size() == 1) {
            calendarLine(line);
        }
        return open_.size() > limits::kDeepestElement ? std::optional("components lie too deep")
                                                      : std::nullopt;
    }

    bool isOver() const { return open_.empty(); }
    bool wasCalendar() const { return wasCalendar_; }
    std::vector<CalendarEntry> takeEntries() {
        if (isCancelled_) {
            for (auto& entry : entries_) entry.isCancelled = true;
        }
        return std::move(entries_);
    }
    CalendarZones& zones() { return zones_; }
    const std::string& name() const { return name_; }

  private:
    void begin(std::string component) {
        open_.push_back(std::move(component));
        wasCalendar_ = wasCalendar_ || open_.front() == "vcalendar";
        if (open_.size() != 2 || open_.front() != "vcalendar") return;
        if (open_.back() == "vevent") {
            entry_.emplace();
        } else if (open_.back() == "vtimezone" && zoneCount_++ < limits::kMostZones) {
            zone_ = "BEGIN:VTIMEZONE\r\n";
            zoneName_.clear();
        }
    }

    std::optional<std::string> end(const std::string& component) {
        if (open_.size() == 1 && component == "vevent" && entry_) {
            entries_.push_back(entry_->finish());
            entry_.reset();
            if (entries_.size() > limits::kMostEntries) {
                return fmt::format("more than {} entries", limits::kMostEntries);
            }
        } else if (open_.size() == 1 && component == "vtimezone" && !zone_.empty()) {
            zone_ += "END:VTIMEZONE\r\n";
            zones_.define(zoneName_, zone_);
            zone_.clear();
        } else if (!zone_.empty()) {
            zone_ += fmt::format("END:{}\r\n", component);
        }
        return std::nullopt;
    }

    void zoneLine(const CardLine& line) {
        if (line.name == "BEGIN" && open_.size() == 2) return;
        if (line.name == "TZID" && open_.size() == 2) zoneName_ = cardText(line.text);
        if (zone_.size() + line.text.size() > limits::kLongestField) return;
        zone_ += fmt::format("{}{}{}:{}\r\n", line.name, line.parameters.empty() ? "" : ";",
                             line.parameters, line.text);
    }

    void calendarLine(const CardLine& line) {
        if (line.name == "METHOD" && lowerCased(line.text) == "cancel") isCancelled_ = true;
        if (line.name == "X-WR-CALNAME") name_ = boundedText(line.text);
    }

    std::vector<std::string> open_;
    std::optional<EntryBuilder> entry_;
    std::vector<CalendarEntry> entries_;
    CalendarZones zones_;
    std::string zone_;
    std::string zoneName_;
    std::size_t zoneCount_ = 0;
    std::string name_;
    bool isCancelled_ = false;
    bool wasCalendar_ = false;
};

/// What a folder of a calendar is called, where the file does not say.
std::string folderName(const std::string& path) {
    const auto file = path.rfind('/');
    if (file == std::string::npos || file == 0) return {};
    const auto folder = path.rfind('/', file - 1);
    const auto begin = folder == std::string::npos ? 0 : folder + 1;
    return cleanText(std::string_view(path).substr(begin, file - begin));
}

/// The entries of one UID: the entry, and overrides of its occurrences.
using Series = std::map<std::string, std::vector<CalendarEntry>>;

Series seriesOf(std::vector<CalendarEntry> entries) {
    Series series;
    for (auto& entry : entries) {
        if (entry.uid.empty()) {
            entry.uid = identifierHash(
                fmt::format("{}|{}", entry.title, entry.start ? entry.start->local.seconds : 0.0));
        }
        auto uid = entry.uid;
        series[std::move(uid)].push_back(std::move(entry));
    }
    return series;
}

}  // namespace

std::expected<FileRecords, std::string> readCalendar(const ReadBlock& read,
                                                     const ReaderContext& context) {
    CardLines lines(read);
    CalendarFile file;
    CardLine parsed;
    bool isFirst = true;
    for (std::string line;;) {
        const auto more = lines.next(line);
        if (!more) return std::unexpected(more.error());
        if (!*more) break;
        if (std::exchange(isFirst, false) && line.starts_with("\xEF\xBB\xBF")) line.erase(0, 3);
        // A line without a name is one that its writer broke; the others still tell.
        if (!parseCardLine(line, parsed)) continue;
        if (auto wrong = file.take(parsed)) return std::unexpected(std::move(*wrong));
    }
    if (!file.wasCalendar()) return std::unexpected("it holds no calendar");
    if (!file.isOver()) return std::unexpected("it ends within a calendar");
    const auto today = context.today.value_or(context.now);
    FileRecords records;
    EntryExpansion expansion(file.zones(),
                             {today - limits::kRecurrenceBack, today + limits::kRecurrenceAhead},
                             today + limits::kFarthestEntry);
    const auto calendar = file.name().empty() ? folderName(context.path) : file.name();
    for (auto& [uid, entries] : seriesOf(file.takeEntries())) {
        expansion.add(std::move(entries), calendar, records);
    }
    expansion.finish(records);
    return records;
}

}  // namespace keepsakes
