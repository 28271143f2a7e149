// SPDX-License-Identifier: Apache-2.0
#include "sources/KSMediaPlay.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "model/ValueCoding.h"
#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

using testing::ElementsAre;

KSMediaPlay::Pointer fullPlay() {
    NowPlayingRecord record;
    record.duration = 200;
    record.title = "Song";
    record.bundleID = "player";
    record.storeProductIdentifier = "id";
    record.playbackState = PlaybackState::paused;
    record.absoluteTimestamp = {1234.5};
    return KSMediaPlay::mediaPlayWithTitle("Song", "Album", "player", KSValue("id"), "jazz", "song",
                                           "Artist", 300.5, 3, {{record, NowPlayingRecord()}});
}

KSDictionary archived(const KSMediaPlay& play) {
    ValueEncoder encoder;
    play.encodeWithCoder(encoder);
    return encoder.take();
}

std::expected<KSMediaPlay::Pointer, KSError> unarchived(const KSValue& archive) {
    ValueDecoder decoder(archive);
    auto play = KSMediaPlay::initWithCoder(decoder);
    EXPECT_EQ(decoder.error(), play ? "" : play.error().description());
    return play;
}

TEST(KSMediaPlay, ComesBackFromItsArchive) {
    const auto play = fullPlay();
    EXPECT_TRUE(play->isEqual(unarchived(archived(*play)).value()));
    const auto numbered = play->copyWithReplacementProductId(KSValue(42.0));
    EXPECT_TRUE(numbered->isEqual(unarchived(archived(*numbered)).value()));
    const auto bare = KSMediaPlay::initWithTitle({}, {}, {}, {}, {}, {}, {}, {}, -1, {{}});
    EXPECT_TRUE(bare->isEqual(unarchived(archived(*bare)).value()));
}

TEST(KSMediaPlay, SaysWhatIsWrongWithAnArchive) {
    const auto archive = archived(*fullPlay());
    const auto broken = [&archive](const std::string& key, KSValue value) {
        auto copy = archive;
        copy.erase(key);
        if (!value.isNull()) copy.emplace(key, std::move(value));
        const auto error = unarchived(copy).error();
        EXPECT_EQ(error.domain, "KSMediaPlayOCNTErrorDomain");
        return std::to_string(error.code) + " " + error.description();
    };
    EXPECT_EQ(broken("repetitions", {}), "1 Missing serialized value for KSMediaPlay.repetitions");
    EXPECT_EQ(broken("events", {}),
              "2 Retrieved nil serialized value for nonnull KSMediaPlay.events");
    const auto unexpected = [](const std::string& key, const std::string& classes) {
        return "3 Unarchived unexpected class for KSMediaPlay key \"" + key + "\" (" + classes +
               ")";
    };
    EXPECT_EQ(broken("title", 7), unexpected("title", "expected String, decoded Integer"));
    EXPECT_EQ(broken("artist", KSArray()), unexpected("artist", "expected String, decoded Array"));
    EXPECT_EQ(broken("productId", true),
              unexpected("productId", "expected String or Number, decoded Boolean"));
    EXPECT_EQ(broken("sumTimePlayed", "long"),
              unexpected("sumTimePlayed", "expected Number, decoded String"));
    EXPECT_EQ(broken("events", KSArray{1}),
              unexpected("events", "expected now-playing record, decoded Integer"));
    EXPECT_EQ(broken("events", KSArray{KSDictionary{{"title", "no state"}}}),
              unexpected("events", "expected now-playing record, decoded Dictionary"));
}

TEST(KSMediaPlay, ReplacesOneFieldAtATime) {
    const auto play = fullPlay();
    const auto same = play->copyWithReplacementTitle("Song");
    EXPECT_TRUE(play->isEqual(same));
    EXPECT_EQ(play->hash(), same->hash());
    EXPECT_FALSE(play->isEqual(nullptr));
    const std::vector<KSMediaPlay::Pointer> others = {
        play->copyWithReplacementTitle("x"),     play->copyWithReplacementAlbum("x"),
        play->copyWithReplacementBundleId("x"),  play->copyWithReplacementProductId(KSValue("x")),
        play->copyWithReplacementGenre("x"),     play->copyWithReplacementMediaType("x"),
        play->copyWithReplacementArtist("x"),    play->copyWithReplacementSumTimePlayed(1),
        play->copyWithReplacementRepetitions(1), play->copyWithReplacementEvents({{}}),
    };
    for (const auto& other : others) {
        EXPECT_FALSE(play->isEqual(other)) << other->description();
        EXPECT_NE(play->hash(), other->hash()) << other->description();
        for (const auto& another : others) EXPECT_EQ(other->isEqual(another), other == another);
    }
    EXPECT_EQ(play->copyWithReplacementEvents({{}})->description(),
              "<KSMediaPlay | title:Song album:Album bundleId:player productId:id genre:jazz "
              "mediaType:song artist:Artist sumTimePlayed:300.5 repetitions:3 events:()>");
}

TEST(KSMediaPlay, NeedsItsRecords) {
    RecordedAssertions assertions;
    EXPECT_EQ(KSMediaPlay::initWithTitle({}, {}, {}, {}, {}, {}, {}, {}, 1, {}), nullptr);
    EXPECT_EQ(fullPlay()->copyWithReplacementEvents({}), nullptr);
    const std::string text = "Invalid parameter not satisfying: events != nil";
    EXPECT_THAT(assertions.takeDescriptions(), ElementsAre(text, text));
}

}  // namespace
}  // namespace keepsakes
