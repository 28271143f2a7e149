// SPDX-License-Identifier: Apache-2.0
#include "linux/AnalyticsLog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <algorithm>
#include <csignal>
#include <limits>
#include <string>
#include <thread>
#include <vector>

#include "core/Files.h"
#include "core/Json.h"
#include "support/TemporaryFolder.h"
#include "support/VirtualClock.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

/// The lines of a file, each checked to be whole; none when there is no file.
std::vector<KSDictionary> linesOf(const std::filesystem::path& file) {
    const auto text = readFile(file, 64u << 20).value_or("");
    std::vector<KSDictionary> lines;
    for (std::size_t at = 0; at < text.size();) {
        const auto end = text.find('\n', at);
        if (end == std::string::npos) {
            ADD_FAILURE() << "half a line at the end: " << text.substr(at, 80);
            break;
        }
        const auto value = parseJson(std::string_view(text).substr(at, end - at));
        const auto* line = value ? value->asDictionary() : nullptr;
        if (!line) ADD_FAILURE() << "not an object: " << text.substr(at, 80);
        if (line) lines.push_back(*line);
        at = end + 1;
    }
    return lines;
}

/// As on a full disk: no file may grow beyond `bytes` while this lives.
class FileSizeLimit {
  public:
    explicit FileSizeLimit(rlim_t bytes) : handler_(std::signal(SIGXFSZ, SIG_IGN)) {
        getrlimit(RLIMIT_FSIZE, &before_);
        const rlimit limit{bytes, before_.rlim_max};
        setrlimit(RLIMIT_FSIZE, &limit);
    }
    ~FileSizeLimit() {
        setrlimit(RLIMIT_FSIZE, &before_);
        std::signal(SIGXFSZ, handler_);
    }
    FileSizeLimit(const FileSizeLimit&) = delete;
    FileSizeLimit& operator=(const FileSizeLimit&) = delete;

  private:
    rlimit before_{};
    void (*handler_)(int);
};

struct AnalyticsLogTest : testing::Test {
    TemporaryFolder folder;
    VirtualClock clock{KSDate{1000.5}};
    std::filesystem::path file = folder.path() / "state" / "analytics.jsonl";
    std::filesystem::path oldFile = folder.path() / "state" / "analytics.jsonl.1";
};

TEST_F(AnalyticsLogTest, WritesOneObjectALineAfterWhatIsThere) {
    folder.write("state/analytics.jsonl", "{\"event\":\"before\"}\n{\"event\":\"cut off by a po");
    {
        AnalyticsLog log(file, clock);
        log.send("first", {{"text", "two\nlines"}, {"count", 3}});
        log.flush();
        std::filesystem::remove(oldFile);
        std::filesystem::rename(file, oldFile);  // as the owner may at any time
        clock.step(1);
        log.send("second", {});
        log.send("bad", {{"number", std::numeric_limits<double>::infinity()}});
        log.send("large", {{"text", std::string(AnalyticsLog::kLongestLine, 'x')}});
        EXPECT_EQ(log.dropped(), 2u);
    }
    EXPECT_THAT(
        linesOf(oldFile),
        ElementsAre(KSDictionary{{"event", "before"}},
                    KSDictionary{{"time", 1000.5},
                                 {"event", "first"},
                                 {"fields", KSDictionary{{"text", "two\nlines"}, {"count", 3}}}}));
    EXPECT_THAT(linesOf(file),
                ElementsAre(KSDictionary{
                    {"time", 1001.5}, {"event", "second"}, {"fields", KSDictionary{}}}));
}

TEST_F(AnalyticsLogTest, KeepsTwoFilesOfBoundedSizeWithTheNewestEvents) {
    AnalyticsLog log(file, clock);
    const std::string padding(200u << 10, 'x');
    constexpr int kEvents = 70;  // about 14 MB
    for (int i = 0; i < kEvents; ++i) {
        log.send("event", {{"number", i}, {"padding", padding}});
        log.flush();
    }
    EXPECT_EQ(log.dropped(), 0u);
    EXPECT_LE(std::filesystem::file_size(file), AnalyticsLog::kLargestFile);
    EXPECT_LE(std::filesystem::file_size(oldFile), AnalyticsLog::kLargestFile);
    auto kept = linesOf(oldFile);
    for (auto& line : linesOf(file)) kept.push_back(std::move(line));
    auto expected = kEvents - static_cast<int>(kept.size());
    EXPECT_LT(expected, kEvents - 20);
    for (const auto& line : kept) {
        EXPECT_EQ(valueForKey(*valueForKey(line, "fields").asDictionary(), "number"),
                  KSValue(expected++));
    }
}

TEST_F(AnalyticsLogTest, AFullDiskDropsWholeLinesAndTellsTheCount) {
    testing::internal::CaptureStderr();
    {
        AnalyticsLog log(file, clock);
        const auto sendAll = [&log](const char* event, int count) {
            for (int i = 0; i < count; ++i) {
                log.send(event, {{"padding", std::string(100, 'x')}});
            }
            log.flush();
        };
        const auto sendToFullDisk = [&](int count) {
            const FileSizeLimit limit(std::filesystem::file_size(file) + 20);
            sendAll("lost", count);
        };
        sendAll("fits", 50);  // more than is logged, which the limit holds for as well
        sendToFullDisk(100);
        sendAll("fits again", 1);
        sendToFullDisk(2);
        EXPECT_EQ(log.dropped(), 102u);
    }
    const auto logged = testing::internal::GetCapturedStderr();
    EXPECT_EQ(linesOf(file).size(), 51u);
    // Each count once, in this order and no other.
    std::size_t at = 0;
    for (const char* told : {" 1 so far", " 10 so far", " 100 so far", " 100 were dropped",
                             " 101 so far", " 102 analytics events were dropped"}) {
        at = logged.find(told, at);
        ASSERT_NE(at, std::string::npos) << told << " in " << logged;
        ++at;
    }
    EXPECT_EQ(std::ranges::count(logged, '\n'), 6) << logged;
}

TEST_F(AnalyticsLogTest, AnUnusablePlaceDropsAndNeverWaits) {
    std::filesystem::create_directory(file.parent_path());
    ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
    AnalyticsLog log(file, clock);
    log.send("into a pipe", {});
    log.flush();
    std::filesystem::remove(file);
    std::filesystem::create_directory(file);
    log.send("into a folder", {});
    log.flush();
    EXPECT_EQ(log.dropped(), 2u);
    std::filesystem::remove(file);
    log.send("kept", {});
    log.flush();
    EXPECT_EQ(linesOf(file).size(), 1u);
}

TEST_F(AnalyticsLogTest, EveryEventOfAFloodIsEitherWrittenOrCounted) {
    constexpr int kSenders = 4;
    constexpr int kEvents = 10;
    std::uint64_t dropped = 0;
    {
        AnalyticsLog log(file, clock);
        const KSDictionary fields{{"padding", std::string(150u << 10, 'x')}};
        std::vector<std::thread> senders;
        for (int sender = 0; sender < kSenders; ++sender) {
            senders.emplace_back([&log, &fields] {
                for (int i = 0; i < kEvents; ++i) log.send("flood", fields);
            });
        }
        for (auto& sender : senders) sender.join();
        log.flush();
        dropped = log.dropped();
    }
    EXPECT_EQ(linesOf(file).size() + linesOf(oldFile).size() + dropped,
              static_cast<std::size_t>(kSenders * kEvents));
    EXPECT_THAT(linesOf(file), Not(IsEmpty()));
}

}  // namespace
}  // namespace keepsakes
