// SPDX-License-Identifier: Apache-2.0
#include "core/Files.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <filesystem>
#include <string>
#include <vector>

#include "core/Log.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;

std::vector<std::string> namesIn(const std::filesystem::path& folder) {
    std::vector<std::string> names;
    for (const auto& entry : std::filesystem::directory_iterator(folder)) {
        names.push_back(entry.path().filename().string());
    }
    return names;
}

TEST(Files, ReadRegularFilesOfBoundedSizeOnly) {
    const TemporaryFolder folder;
    const std::string content("a\0b\n", 4);
    const auto file = folder.write("file", content);
    EXPECT_EQ(readFile(file, 4), content);
    EXPECT_EQ(readFile(folder.write("empty", ""), 0), "");
    ASSERT_EQ(mkfifo((folder / "pipe").c_str(), 0600), 0);
    struct Case {
        std::filesystem::path path;
        std::uintmax_t largest;
        int code;
    };
    const Case cases[] = {{file, 3, EFBIG},           {folder / "none", 9, ENOENT},
                          {folder.path(), 9, EINVAL}, {folder / "pipe", 9, EINVAL},
                          {"/dev/zero", 9, EINVAL},   {folder / "file/below", 9, ENOTDIR}};
    for (const auto& [path, largest, code] : cases) {
        const auto read = readFile(path, largest);
        ASSERT_FALSE(read) << path;
        EXPECT_EQ(read.error().code, code) << path;
        EXPECT_THAT(read.error().description(), HasSubstr(path.string()));
    }
}

TEST(Files, AFailedReplacementLeavesTheOldFileAndNothingBeside) {
    const TemporaryFolder folder;
    const auto file = folder.write("file", "old");
    {
        // As on a full disk.
        auto* const handler = std::signal(SIGXFSZ, SIG_IGN);
        rlimit before{};
        getrlimit(RLIMIT_FSIZE, &before);
        const rlimit limit{1000, before.rlim_max};
        setrlimit(RLIMIT_FSIZE, &limit);
        const auto error = replaceFile(file, std::string(5000, 'x'));
        setrlimit(RLIMIT_FSIZE, &before);
        std::signal(SIGXFSZ, handler);
        ASSERT_TRUE(error);
        EXPECT_EQ(error->code, EFBIG);
    }
    EXPECT_EQ(readFile(file, 100), "old");
    EXPECT_THAT(namesIn(folder.path()), ElementsAre("file"));

    EXPECT_FALSE(replaceFile(file, "new"));
    EXPECT_EQ(readFile(file, 100), "new");
    EXPECT_EQ(std::filesystem::status(file).permissions(), std::filesystem::perms(0600));

    std::filesystem::remove(file);
    std::filesystem::create_directories(file / "occupied");
    EXPECT_TRUE(replaceFile(file, "into a folder"));
    EXPECT_TRUE(std::filesystem::exists(file / "occupied"));
    EXPECT_THAT(namesIn(folder.path()), ElementsAre("file"));
    EXPECT_TRUE(replaceFile(folder / "none/file", "no folder"));
}

TEST(Files, PrivateFoldersAreMadeWithThoseAbove) {
    const TemporaryFolder folder;
    const auto made = folder / "a/b/c";
    EXPECT_FALSE(makePrivateFolder(made));
    EXPECT_FALSE(makePrivateFolder(made)) << "it exists already";
    for (const auto& each : {made, made.parent_path(), folder / "a"}) {
        EXPECT_EQ(std::filesystem::status(each).permissions(), std::filesystem::perms(0700));
    }
    folder.write("file", "");
    EXPECT_EQ(makePrivateFolder(folder / "file")->code, ENOTDIR);
    EXPECT_EQ(makePrivateFolder(folder / "file/below")->code, ENOTDIR);
}

TEST(Log, OneMessageIsOneBoundedLine) {
    testing::internal::CaptureStderr();
    logWarning("photo \"a\nb\r\x1b[2J\x7f\" is damaged");
    logDebug("below the level");
    logError("{} %s %n {0}");
    logInfo(std::string(100000, 'x'));
    const auto text = testing::internal::GetCapturedStderr();
    EXPECT_EQ(std::count(text.begin(), text.end(), '\n'), 3) << text.substr(0, 500);
    EXPECT_THAT(text, HasSubstr(R"(photo "a\x0ab\x0d\x1b[2J\x7f" is damaged)"));
    EXPECT_THAT(text, HasSubstr("{} %s %n {0}\n"));
    EXPECT_EQ(text.find("below"), std::string::npos);
    EXPECT_LT(text.size(), 10000u);
}

}  // namespace
}  // namespace keepsakes
