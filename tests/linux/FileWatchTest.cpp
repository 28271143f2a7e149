// SPDX-License-Identifier: Apache-2.0
#include "linux/FileWatch.h"

#include <gtest/gtest.h>

#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

namespace fs = std::filesystem;

// The kernel has an event ready by the time the change is done: nothing here waits.
TEST(FileWatch, SeesEveryWayOfChangingAFile) {
    const TemporaryFolder folder;
    const auto file = folder.write("a/config.toml", "1");
    FileWatch watch(file);
    EXPECT_FALSE(watch.take());
    const struct {
        const char* way;
        std::function<void()> change;
        bool seen;
    } rows[] = {
        {"written in place", [&] { folder.write("a/config.toml", "2"); }, true},
        {"another file", [&] { folder.write("a/other", "2"); }, false},
        {"replaced", [&] { fs::rename(folder.write("a/new", "3"), file); }, true},
        {"moved away", [&] { fs::rename(file, folder / "a/old"); }, true},
        {"made again", [&] { folder.write("a/config.toml", "4"); }, true},
        {"removed", [&] { fs::remove(file); }, true},
        {"the folder removed", [&] { fs::remove_all(folder / "a"); }, true},
        {"a file beside it", [&] { folder.write("other", "5"); }, false},
        {"the folder made again", [&] { fs::create_directory(folder / "a"); }, true},
        {"the file made in it", [&] { folder.write("a/config.toml", "6"); }, true},
    };
    for (const auto& row : rows) {
        row.change();
        EXPECT_EQ(watch.take(), row.seen) << row.way;
        EXPECT_FALSE(watch.take()) << row.way << ": once";
    }
}

TEST(FileWatch, FollowsALinkAndItsTarget) {
    const TemporaryFolder folder;
    folder.write("first/settings", "1");
    folder.write("second/settings", "2");
    const auto link = folder / "link.toml";
    fs::create_symlink("first/settings", link);
    FileWatch watch(link);
    folder.write("first/settings", "3");
    EXPECT_TRUE(watch.take());
    fs::remove(link);
    fs::create_symlink("second/settings", link);
    EXPECT_TRUE(watch.take());
    folder.write("first/settings", "4");
    EXPECT_FALSE(watch.take());
    folder.write("second/settings", "5");
    EXPECT_TRUE(watch.take());
}

}  // namespace
}  // namespace keepsakes
