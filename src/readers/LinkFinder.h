// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace keepsakes {

/// A link as a message holds it. The URL is one of "http" or "https" in printable ASCII, its scheme
/// and host in lower case; what may not stand in a URL is percent-encoded (RFC 3986, 2.1). Title
/// and description are empty where the message says none.
struct FoundLink {
    std::string url;
    std::string title;
    std::string description;

    friend bool operator==(const FoundLink&, const FoundLink&) = default;
};

/// The links of one message in their order, each once, at most `limits::kMostLinks`. A plain value.
class LinkList {
  public:
    /// The first title and description of a URL count. What is no link, is too long or names a
    /// user (and mostly a password) is passed over.
    void add(FoundLink link);

    bool isFull() const;
    const std::vector<FoundLink>& links() const { return links_; }
    void clear() { links_.clear(); }

  private:
    std::vector<FoundLink> links_;
};

/// The links that stand in plain text. A full stop, comma, quote or unopened bracket behind one is
/// the sentence's.
void findLinks(std::string_view text, LinkList& links);

/// The links that a reader of the HTML text (in UTF-8) could follow, but for those it quotes. A
/// link's text, or its picture's, is its title; its "title" attribute its description.
void findHtmlLinks(std::string_view html, LinkList& links);

}  // namespace keepsakes
