// SPDX-License-Identifier: Apache-2.0
#include "indexer/ScanReporter.h"

#include <fmt/format.h>
#include <unistd.h>

#include <cstdio>

#include "core/Json.h"

namespace keepsakes {

namespace {

class JsonReporter final : public ScanReporter {
  public:
    void progress(std::uint64_t done, std::uint64_t total) override {
        write({{"progress", KSDictionary{{"done", done}, {"total", total}}}});
    }
    void problem(const std::string& line) override { write({{"problem", line}}); }
    void report(const ScanSummary& summary) override {
        KSDictionary reasons;
        for (const auto& [reason, count] : summary.refused) reasons.emplace(nameOf(reason), count);
        write({{"report", KSDictionary{{"indexed", summary.totals.files},
                                       {"refused", summary.totals.refused},
                                       {"workouts", summary.totals.workouts},
                                       {"photos", summary.totals.photos},
                                       {"occasions", summary.totals.occasions},
                                       {"visits", summary.totals.visits},
                                       {"places", summary.totals.places},
                                       {"interactions", summary.totals.interactions},
                                       {"links", summary.totals.links},
                                       {"people", summary.totals.people},
                                       {"calendarEvents", summary.totals.calendarEvents},
                                       {"suggestions", summary.totals.suggestions},
                                       {"read", summary.read},
                                       {"renamed", summary.renamed},
                                       {"removed", summary.removed},
                                       {"changed", summary.changed},
                                       {"newlyRefused", std::move(reasons)}}}});
    }

  private:
    static void write(KSDictionary object) {
        if (const auto text = jsonText(KSValue(std::move(object)))) {
            std::fputs((*text + "\n").c_str(), stdout);
            std::fflush(stdout);
        }
    }
};

class HumanReporter final : public ScanReporter {
  public:
    void progress(std::uint64_t done, std::uint64_t total) override {
        if (!isTerminal_) return;
        fmt::print("\r{} of {} files read", done, total);
        std::fflush(stdout);
        onProgressLine_ = true;
    }
    void problem(const std::string& line) override {
        endProgress();
        fmt::print("{}\n", line);
    }
    void report(const ScanSummary& summary) override {
        endProgress();
        const auto& totals = summary.totals;
        fmt::print(
            "{} files known: {} workouts; {} visits to {} places; {} photos in {} occasions; {} "
            "messages and calls with {} links; {} people; {} calendar entries, {} of them "
            "suggestions; {} files refused.\n",
            totals.files, totals.workouts, totals.visits, totals.places, totals.photos,
            totals.occasions, totals.interactions, totals.links, totals.people,
            totals.calendarEvents, totals.suggestions, totals.refused);
        fmt::print("This scan read {} new or changed files, found {} moved and {} gone.\n",
                   summary.read, summary.renamed, summary.removed);
    }

  private:
    void endProgress() {
        if (std::exchange(onProgressLine_, false)) fmt::print("\n");
    }

    const bool isTerminal_ = ::isatty(STDOUT_FILENO) == 1;
    bool onProgressLine_ = false;
};

}  // namespace

const char* nameOf(RefusalReason reason) {
    switch (reason) {
        case RefusalReason::unreadable:
            return "unreadable";
        case RefusalReason::damaged:
            return "damaged";
        case RefusalReason::wrongContent:
            return "wrongContent";
        case RefusalReason::outOfMemory:
            return "outOfMemory";
        case RefusalReason::endedIndexer:
            return "endedIndexer";
        case RefusalReason::outOfTime:
            return "outOfTime";
    }
    return "unknown";
}

std::unique_ptr<ScanReporter> makeJsonReporter() { return std::make_unique<JsonReporter>(); }
std::unique_ptr<ScanReporter> makeHumanReporter() { return std::make_unique<HumanReporter>(); }

}  // namespace keepsakes
