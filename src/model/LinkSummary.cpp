// SPDX-License-Identifier: Apache-2.0
#include "model/LinkSummary.h"

#include <string_view>

namespace keepsakes {

std::string linkTitleOf(const KSEvent& event) {
    constexpr std::size_t kMostShown = 60;
    if (event.itemLinkTitle && !event.itemLinkTitle->empty()) return *event.itemLinkTitle;
    if (!event.itemURL) return {};
    std::string_view url(*event.itemURL);
    if (const auto scheme = url.find("://"); scheme != std::string_view::npos) {
        url.remove_prefix(scheme + 3);
    }
    if (url.starts_with("www.")) url.remove_prefix(4);
    // What follows is for machines.
    url = url.substr(0, url.find_first_of("?#"));
    if (url.ends_with('/')) url.remove_suffix(1);
    // URLs are ASCII.
    const bool isLong = url.size() > kMostShown;
    return std::string(url.substr(0, kMostShown)) + (isLong ? "..." : "");
}

std::string linkOriginOf(const KSEvent& event) {
    if (!event.itemDisplayName || event.itemDisplayName->empty()) return {};
    return (event.itemIsShared ? "to " : "from ") + *event.itemDisplayName;
}

}  // namespace keepsakes
