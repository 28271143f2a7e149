// SPDX-License-Identifier: Apache-2.0
#include "platform/TopicCatalogue.h"

#include <algorithm>
#include <array>

namespace keepsakes {

namespace {

constexpr auto kTopics = std::to_array<Topic>({
    {"T-eJKWCDVS8esK0zRpsfYSg", "Toys"},           {"T-rkn5ca3TYKPBoX3Qi9rlw", "Painting"},
    {"T29E1FsjPS9yq3LTh5cEkbg", "Cookbooks"},      {"T855UdWqsRS6PpMbAIbfsmA", "National parks"},
    {"T964c-QppSCmSS-fZCbnAkA", "Fashion"},        {"T9zpN10vySSyQ7w0_t2Pu9A", "Comedy"},
    {"TAu80MaFtR021MJKgA2LXZQ", "Gardening"},      {"TFZX59DDWR22CqH8gMQt4Lw", "Food"},
    {"TFiRQeLsdTCS4KccUtig1_A", "Skiing"},         {"TKttU3a5bRomnWJgjsuafhQ", "Snowboarding"},
    {"TKxkFSVbxS06k2lWcdRrd4A", "Sports"},         {"TN5KR8Z7ESDORJr1QSxzJFA", "Hiking"},
    {"TNsTJOkvyRtepj1Y7ZNYjfg", "Shopping"},       {"TOGO6oTadSZasTKO53BR18w", "Movies"},
    {"TOoO5-mnyRcO5RMqMQPGAzw", "Film festivals"}, {"TPp26f1ofRb6ZEx3ohO017g", "Piano"},
    {"TRyRjVdQ6T8imGzUp5SpYpQ", "Music"},          {"TSVdquOY0SrWgFX8tm-dTVw", "Skateboarding"},
    {"TTuaWVYeAT8C8TkSF6Y-AoQ", "Photography"},    {"TW3OrF45nTb26t3HofbmC8A", "Travel"},
    {"TbLLGTTTORmqrfZWZWws4yw", "eSports"},        {"TbNVs0Fy-Sp27_zwf6xVIpg", "Baking"},
    {"Ti18FB7Q-QxmhoMUhINmKIw", "Sports games"},   {"TiuZfRv2mSGmA1S__tMxX4A", "Music festivals"},
    {"TjgP_CERFTj6Qhjj_6wnG6A", "Cuisines"},       {"TkBE-mNwlRvuntvrssEbLnQ", "Plants"},
    {"Tm26KZU1CSf6M0f79iSvl4A", "Furniture"},      {"TsSrp3d2xQjKm56bg4t4CZg", "Cameras"},
    {"TxljfSyRBQP-1z7oUgSIslA", "Recipes"},        {"TyooNSmEIQYah0_pPvMeqcw", "Restaurants"},
});

}  // namespace

std::span<const Topic> topicCatalogue() { return kTopics; }

std::optional<std::string_view> topicName(std::string_view identifier) {
    const auto* const found = std::ranges::find(kTopics, identifier, &Topic::identifier);
    return found == kTopics.end() ? std::nullopt : std::optional(found->name);
}

}  // namespace keepsakes
