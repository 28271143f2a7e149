// SPDX-License-Identifier: Apache-2.0
#include "config/Configuration.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <string>

#include "config/Period.h"
#include "support/TemporaryFolder.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;

Environment environmentOf(std::map<std::string, std::string> values) {
    return [values = std::move(values)](const std::string& name) -> std::optional<std::string> {
        const auto found = values.find(name);
        return found == values.end() ? std::nullopt : std::optional(found->second);
    };
}

const Environment kAda = environmentOf({{"HOME", "/home/ada"}, {"PHOTOS", "/srv/photos"}});

TEST(Configuration, ReadsEveryKeyAndKeepsDefaultsOfTheOthers) {
    const TemporaryFolder folder;
    const auto file = folder.write("config.toml", R"([policy]
diagnostics = false
health_data = false
[device_data]
tracks = ["~/Tracks", "~/Tracks/", "relative/walks"]
photos = ["$PHOTOS/new", "${PHOTOS}2"]
calendars = ["~"]
messages = []
contacts = ["/"]
places = ["/srv/../etc/places"]
gazetteer = "~/towns.txt"
media = false
[owner]
date_of_birth = 1990-05-01
biological_sex = "other"
addresses = ["ada@example.org", "+43 660/555"]
[links]
chats = ["anna@example.org", "Family"]
[device]
content_protection = true
[activities]
collection = "90m"
compute = "0"
purge = "2d"
require_external_power = true
[nearby]
devices = true
scan = true
)");
    const auto read = loadConfiguration(file, kAda);
    ASSERT_TRUE(read) << read.error().description();
    EXPECT_FALSE(read->policy.diagnostics);
    EXPECT_FALSE(read->policy.healthData);
    EXPECT_THAT(read->deviceData.tracks,
                ElementsAre("/home/ada/Tracks", folder.path() / "relative/walks"));
    EXPECT_THAT(read->deviceData.photos, ElementsAre("/srv/photos/new", "/srv/photos2"));
    EXPECT_THAT(read->deviceData.calendars, ElementsAre("/home/ada"));
    EXPECT_THAT(read->deviceData.messages, ElementsAre());
    EXPECT_THAT(read->deviceData.contacts, ElementsAre("/"));
    EXPECT_THAT(read->deviceData.places, ElementsAre("/etc/places"));
    EXPECT_EQ(read->deviceData.gazetteer, "/home/ada/towns.txt");
    EXPECT_FALSE(read->deviceData.media);
    EXPECT_EQ(read->owner.dateOfBirth, (Configuration::Day{1990, 5, 1}));
    EXPECT_EQ(read->owner.biologicalSex, 3);
    EXPECT_THAT(read->links.chats, ElementsAre("anna@example.org", "Family"));
    EXPECT_THAT(read->owner.addresses, ElementsAre("ada@example.org", "+43 660/555"));
    EXPECT_TRUE(read->device.contentProtection);
    EXPECT_EQ(read->activities.collection, 5400);
    EXPECT_EQ(read->activities.compute, 0);
    EXPECT_EQ(read->activities.purge, 2 * 86400);
    EXPECT_TRUE(read->activities.requireExternalPower);
    EXPECT_TRUE(read->nearby.devices);
    EXPECT_TRUE(read->nearby.scan);

    const auto some = loadConfiguration(folder.write("some.toml", "nearby.scan = true\n"), kAda);
    ASSERT_TRUE(some) << some.error().description();
    EXPECT_TRUE(some->nearby.scan);
    EXPECT_TRUE(some->policy.diagnostics);
    EXPECT_EQ(some->activities.compute, 6 * 3600);
    EXPECT_THAT(some->deviceData.photos, ElementsAre("/home/ada/Pictures"));
}

TEST(Configuration, NamesFileLineAndKeyOfTheFirstMistake) {
    struct Case {
        const char* text;
        const char* error;  // after "<file>:"
    };
    const Case cases[] = {
        {"\n[extra]\nkey = 1\n", "2: extra: unknown key"},
        {"stray = 1\n", "1: stray: unknown key"},
        {"policy = true\n", "1: policy: must be a table"},
        {"[[policy]]\ndiagnostics = true\n", "1: policy: must be a table"},
        {"[policy]\n\nDiagnostics = true\n", "3: policy.Diagnostics: unknown key"},
        {"[nearby]\nscan = 1\n", "2: nearby.scan: must be true or false"},
        {"[nearby]\nscan = \"true\"\n", "2: nearby.scan: must be true or false"},
        {"[device_data]\ntracks = \"~/Tracks\"\n",
         "2: device_data.tracks: must be an array of folders"},
        {"[device_data]\ntracks = [\n \"/a\",\n 7]\n",
         "4: device_data.tracks: must hold strings only"},
        {"[device_data]\nphotos = [\"$NOWHERE/2024\"]\n",
         "2: device_data.photos: \"$NOWHERE/2024\" needs $NOWHERE, which is not set"},
        {"[device_data]\nphotos = [\"/a/${PHOTOS\"]\n",
         "2: device_data.photos: \"/a/${PHOTOS\" has a $ that no variable name follows"},
        {"[device_data]\nphotos = [\"~eve/x\"]\n",
         "2: device_data.photos: \"~eve/x\" cannot expand another user's home folder"},
        {"[device_data]\ngazetteer = [\"a\"]\n", "2: device_data.gazetteer: must be a file's name"},
        {"[device_data]\nphotos = [\"\"]\n", "2: device_data.photos: \"\" must not be empty"},
        {"[owner]\ndate_of_birth = \"1990-05-01\"\n", "2: owner.date_of_birth: must be a date"},
        {"[owner]\ndate_of_birth = 1990-05-01T00:00:00Z\n", "2: owner.date_of_birth: must be a"},
        {"[owner]\ndate_of_birth = 1990-02-30\n", "2: "},
        {"[owner]\nbiological_sex = \"f\"\n", "2: owner.biological_sex: must be \"not set\""},
        {"[links]\nchats = [\"a\", 1]\n", "2: links.chats: must hold strings only"},
        {"[owner]\naddresses = \"ada@x\"\n", "2: owner.addresses: must be an array of addresses"},
        {"[owner]\naddresses = [\"a@x\",\n\"Ada\"]\n",
         "3: owner.addresses: \"Ada\" is neither an address nor a telephone number"},
        {"[owner]\nbiological_sex = 1\n", "2: owner.biological_sex: must be \"not set\""},
        {"[activities]\npurge = 0\n", "2: activities.purge: must be a period"},
        {"[activities]\npurge = \"soon\"\n", "2: activities.purge: must be a period"},
        {"[policy]\ndiagnostics = maybe\n", "2: "},
        {"[policy]\ndiagnostics = true\ndiagnostics = true\n", "3: "},
        {"[policy]\n# \xff\n", "2: "},
        {"[nearby]\nscan = 2\n[activities]\npurge = 3\n", "2: nearby.scan"},
    };
    const TemporaryFolder folder;
    for (const auto& [text, error] : cases) {
        const auto file = folder.write("config.toml", text);
        const auto read = loadConfiguration(file, kAda);
        ASSERT_FALSE(read) << text;
        EXPECT_EQ(read.error().domain, kConfigurationErrorDomain);
        EXPECT_THAT(read.error().description(), StartsWith(file.string() + ":" + error)) << text;
        EXPECT_EQ(read.error().description().find('\n'), std::string::npos) << text;
    }
    const auto nested = "policy = " + std::string(100000, '[') + std::string(100000, ']');
    EXPECT_FALSE(loadConfiguration(folder.write("nested.toml", nested), kAda));
}

TEST(Configuration, OnlyTheDefaultFileMayBeMissing) {
    const TemporaryFolder folder;
    const auto missing = folder / "config.toml";
    const auto named = loadConfiguration(missing, kAda);
    ASSERT_FALSE(named);
    EXPECT_THAT(named.error().description(), HasSubstr(missing.string()));

    const auto defaults = loadConfigurationIfAny(missing, kAda);
    ASSERT_TRUE(defaults);
    EXPECT_THAT(defaults->deviceData.messages, ElementsAre("/home/ada/Mail"));
    EXPECT_FALSE(loadConfigurationIfAny(folder.path(), kAda)) << "a folder is not a missing file";
    EXPECT_FALSE(loadConfigurationIfAny(folder.write("bad.toml", "="), kAda));
}

TEST(Configuration, TakesPeriodsWithOneUnitOnly) {
    for (const auto& [text, seconds] : std::map<std::string, double>{
             {"0", 0}, {"0h", 0}, {"1s", 1}, {"90m", 5400}, {"24h", 86400}, {"7d", 604800}}) {
        EXPECT_EQ(parsePeriod(text), seconds) << text;
    }
    for (const char* text : {"", "h", "1", "-1h", "+1h", "1.5h", "1 h", " 1h", "1h ", "1h30m", "1w",
                             "4000d", "99999999999h", "0x1h"}) {
        EXPECT_FALSE(parsePeriod(text)) << text;
    }
}

TEST(StandardFolders, IgnoreVariablesThatHoldNoAbsolutePath) {
    const auto plain = StandardFolders::find(kAda);
    ASSERT_TRUE(plain);
    EXPECT_EQ(plain->cache, "/home/ada/.cache/com.brindle.keepsakesd");
    EXPECT_EQ(plain->configurationFile(), "/home/ada/.config/keepsakesd/config.toml");
    EXPECT_EQ(plain->analyticsFile(), "/home/ada/.local/state/keepsakesd/analytics.jsonl");

    const auto set = StandardFolders::find(environmentOf(
        {{"XDG_CACHE_HOME", "/c"}, {"XDG_CONFIG_HOME", "relative"}, {"HOME", "/home/ada"}}));
    ASSERT_TRUE(set);
    EXPECT_EQ(set->cache, "/c/com.brindle.keepsakesd");
    EXPECT_EQ(set->config, "/home/ada/.config/keepsakesd");
    EXPECT_FALSE(StandardFolders::find(environmentOf({{"XDG_CACHE_HOME", "/c"}})));
}

}  // namespace
}  // namespace keepsakes
