// SPDX-License-Identifier: Apache-2.0
#include "sources/KSConversation.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "support/RecordedAssertions.h"

namespace keepsakes {
namespace {

const RankedContact kRankedAnna{.identifier = "CN:anna", .name = "Anna", .score = 0.75};
const Interaction kMessage{.uuid = "u1",
                           .startDate = {100},
                           .endDate = {101.5},
                           .mechanism = InteractionMechanism::textMessage,
                           .direction = InteractionDirection::incoming,
                           .sender = {"anna", "123456789"},
                           .recipients = {{std::nullopt, "OWNER"}, {}}};

KSConversation::Pointer conversation() {
    return KSConversation::conversationWithContactIdentifier("OWNER_anna", kRankedAnna,
                                                             {{kMessage}});
}

TEST(KSConversation, NeedsIdentifierAndInteractions) {
    RecordedAssertions assertions;
    EXPECT_EQ(KSConversation::initWithContactIdentifier(std::nullopt, kRankedAnna, {{kMessage}}),
              nullptr);
    EXPECT_EQ(conversation()->copyWithReplacementInteractions(std::nullopt), nullptr);
    EXPECT_THAT(assertions.takeDescriptions(),
                testing::ElementsAre("Invalid parameter not satisfying: contactIdentifier != nil",
                                     "Invalid parameter not satisfying: interactions != nil"));
}

TEST(KSConversation, IsEqualWhenEachFieldIs) {
    const auto one = conversation();
    EXPECT_TRUE(one->isEqual(*conversation()));
    EXPECT_EQ(one->hash(), conversation()->hash());
    for (const auto& other : {one->copyWithReplacementContactIdentifier("x"),
                              one->copyWithReplacementScoredContact(std::nullopt),
                              one->copyWithReplacementInteractions({{}})}) {
        EXPECT_FALSE(one->isEqual(*other)) << other->description();
        EXPECT_NE(one->hash(), other->hash()) << other->description();
    }
}

TEST(KSConversation, ComesBackFromItsArchive) {
    for (const auto& one : {conversation(), conversation()->copyWithReplacementScoredContact({}),
                            conversation()->copyWithReplacementInteractions({{}})}) {
        OptionalError error;
        const auto read = KSConversation::initWithCoder(one->encodeWithCoder(), error);
        ASSERT_TRUE(read) << error->description();
        EXPECT_TRUE(read->isEqual(*one)) << read->description();
    }
}

TEST(KSConversation, AnArchiveThatLacksAFieldIsRefused) {
    struct Case {
        std::string key;
        KSValue value;
        int code;
        std::string text;
    };
    const std::string missing = "Retrieved nil serialized value for nonnull KSConversation.";
    const std::string unexpected = "Unarchived unexpected class for KSConversation key ";
    const std::vector<Case> cases{
        {"contactIdentifier", {}, 2, missing + "contactIdentifier"},
        {"interactions", {}, 2, missing + "interactions"},
        {"contactIdentifier", KSArray(), 3,
         unexpected + "\"contactIdentifier\" (expected String, decoded Array)"},
        {"interactions", "x", 3, unexpected + "\"interactions\" (expected Array, decoded String)"},
        {"interactions", KSArray{1}, 3,
         unexpected + "\"interactions\" (expected Interaction, decoded Integer)"},
        {"scoredContact", 1.5, 3,
         unexpected + "\"scoredContact\" (expected RankedContact, decoded Number)"},
    };
    for (const auto& [key, value, code, text] : cases) {
        auto archive = conversation()->encodeWithCoder();
        archive.insert_or_assign(key, value);
        OptionalError error;
        EXPECT_EQ(KSConversation::initWithCoder(archive, error), nullptr);
        EXPECT_EQ(error, KSError::make("KSConversationOCNTErrorDomain", code, text));
    }
    OptionalError earlier = KSError::make("Earlier", 1, "the archive is cut");
    EXPECT_EQ(KSConversation::initWithCoder({}, earlier), nullptr);
    EXPECT_EQ(earlier->domain, "Earlier");
}

}  // namespace
}  // namespace keepsakes
