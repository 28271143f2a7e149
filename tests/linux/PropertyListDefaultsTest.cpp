// SPDX-License-Identifier: Apache-2.0
#include "linux/PropertyListDefaults.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <string>

#include "core/Files.h"
#include "core/PropertyList.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

using testing::HasSubstr;

constexpr const char* kDomain = "com.brindle.keepsakesd";

std::size_t countOf(const std::string& text, std::string_view part) {
    std::size_t count = 0;
    for (auto at = text.find(part); at != std::string::npos; at = text.find(part, at + 1)) ++count;
    return count;
}

struct PropertyListDefaultsTest : testing::Test {
    TemporaryFolder folder;
    std::filesystem::path file = folder.path() / "defaults" / "com.brindle.keepsakesd.plist";
    PropertyListDefaults defaults{folder.path() / "defaults"};
};

TEST_F(PropertyListDefaultsTest, EveryReadSeesWhatAnyoneWroteLast) {
    EXPECT_TRUE(defaults.object(kDomain, "count").isNull());
    EXPECT_FALSE(defaults.setObject(kDomain, "count", 1));
    EXPECT_FALSE(defaults.setObject(kDomain, "words", KSArray{"a", "b"}));
    EXPECT_EQ(defaults.object(kDomain, "count"), KSValue(1));

    // The same size within the same tick of the file system's clock, in place: nothing that stat
    // tells need differ.
    for (int i = 0; i < 10; ++i) {
        const KSDictionary other{{"count", i}};
        std::ofstream(file, std::ios::trunc) << propertyListText(other);
        EXPECT_EQ(defaults.object(kDomain, "count"), KSValue(i));
    }
    EXPECT_TRUE(defaults.object(kDomain, "words").isNull());

    const PropertyListDefaults another(folder.path() / "defaults");
    EXPECT_FALSE(defaults.setObject(kDomain, "count", KSValue()));
    EXPECT_TRUE(another.object(kDomain, "count").isNull());
    std::filesystem::remove(file);
    EXPECT_FALSE(defaults.setObject(kDomain, "late", true));
    EXPECT_EQ(another.object(kDomain, "late"), KSValue(true));
    EXPECT_EQ(std::filesystem::status(file).permissions(), std::filesystem::perms(0600));
    EXPECT_EQ(std::filesystem::status(file.parent_path()).permissions(),
              std::filesystem::perms(0700));
}

TEST_F(PropertyListDefaultsTest, ADamagedFileIsLoggedOncePerChangeAndKept) {
    folder.write("defaults/com.brindle.keepsakesd.plist", "<plist><dict>");
    testing::internal::CaptureStderr();
    for (int i = 0; i < 5; ++i) EXPECT_TRUE(defaults.object(kDomain, "count").isNull());
    const auto refused = defaults.setObject(kDomain, "count", 1);
    auto log = testing::internal::GetCapturedStderr();
    EXPECT_EQ(countOf(log, file.string()), 1u) << log;
    EXPECT_TRUE(refused);
    EXPECT_EQ(readFile(file, 100), "<plist><dict>");

    folder.write("defaults/com.brindle.keepsakesd.plist", "worse, and longer");
    testing::internal::CaptureStderr();
    for (int i = 0; i < 5; ++i) EXPECT_TRUE(defaults.object(kDomain, "count").isNull());
    log = testing::internal::GetCapturedStderr();
    EXPECT_EQ(countOf(log, file.string()), 1u) << log;

    folder.write("defaults/com.brindle.keepsakesd.plist", propertyListText({{"count", 2}}));
    EXPECT_EQ(defaults.object(kDomain, "count"), KSValue(2));
}

TEST_F(PropertyListDefaultsTest, RefusesNamesThatLeaveTheFolder) {
    folder.write("outside.plist", propertyListText({{"key", 1}}));
    for (const std::string& name :
         {std::string("../outside"), std::string(".."), std::string(""), std::string(".hidden"),
          std::string("a/b"), std::string("a b"), std::string("a\0b", 3), std::string("\xc3\xa4"),
          std::string(300, 'a')}) {
        EXPECT_TRUE(defaults.object(name, "key").isNull()) << name;
        const auto error = defaults.setObject(name, "key", 2);
        ASSERT_TRUE(error) << name;
        EXPECT_THAT(error->description(), HasSubstr("is not the name of a domain"));
    }
    EXPECT_FALSE(std::filesystem::exists(folder.path() / "defaults"));
}

}  // namespace
}  // namespace keepsakes
