// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <algorithm>
#include <cmath>
#include <set>
#include <string>
#include <vector>

#include "ReaderCheck.h"
#include "readers/Handles.h"

namespace keepsakes {

/// Checks whatever a reader tells of people, and keeps it.
class PeopleCheck final : public PeopleSink {
  public:
    void interaction(const InteractionRecord& record) override {
        check(limits::isSane(record.start, kFuzzNow.now), "a sane time");
        const double length = record.end - record.start;
        check(length >= 0 && length <= limits::kLongestCall, "a call of a day at most");
        check(record.recipients.size() <= limits::kMostRecipients, "no crowds");
        std::set<std::string> people(record.recipients.begin(), record.recipients.end());
        check(people.size() == record.recipients.size(), "each recipient once");
        check(!people.contains(record.sender), "nobody writes to himself or herself");
        if (!record.sender.empty()) people.insert(record.sender);
        for (const auto& handle : people) checkHandle(handle);
        interactions_.push_back(record);
    }
    void link(const LinkRecord& link) override {
        check(!interactions_.empty(), "a link stands in a message");
        const auto& [url, title, description] = link.link;
        check(url.starts_with("http://") || url.starts_with("https://"), "a link of the web");
        check(url.size() <= limits::kLongestUrl, "a link of bounded length");
        check(std::ranges::all_of(url, [](char c) { return c > ' ' && c < 0x7f; }),
              "a link in ASCII");
        for (const auto& text : {title, description, link.room, link.roomName}) {
            check(text.size() <= 4 * limits::kLongestName, "words of bounded length");
            check(std::ranges::none_of(text, [](char c) { return c == '\n' || c == '\0'; }),
                  "words of one line");
        }
        LinkList again;
        again.add(link.link);
        check(again.links() == std::vector{link.link}, "a link in its own form");
        links_.push_back(link);
    }
    void card(const ContactCard& card) override {
        check(card.name.size() <= 4 * limits::kLongestName, "a name of bounded length");
        check(std::ranges::none_of(card.name, [](char c) { return c == '\n' || c == '\0'; }),
              "a name of one line");
        check(card.handles.size() <= limits::kMostHandles, "not too many handles");
        for (const auto& handle : card.handles) checkHandle(handle);
        if (card.position) {
            check(std::abs(card.position->latitude) <= 90 &&
                      std::abs(card.position->longitude) <= 180,
                  "a position on earth");
        }
        cards_.push_back(card);
    }
    void ownerHandle(const std::string& handle) override {
        checkHandle(handle);
        owner_.push_back(handle);
    }

    friend bool operator==(const PeopleCheck& a, const PeopleCheck& b) {
        return a.interactions_ == b.interactions_ && a.links_ == b.links_ && a.cards_ == b.cards_ &&
               a.owner_ == b.owner_;
    }

  private:
    /// Made again of what people see of it, a handle is the same.
    static void checkHandle(const std::string& handle) {
        const std::string shown(shownHandle(handle));
        const auto again = handle.starts_with("mailto:") ? mailHandle(shown)
                           : handle.starts_with("im:")   ? chatHandle(shown)
                                                         : phoneHandle(shown);
        check(again == handle, "a handle in its own form");
    }

    std::vector<InteractionRecord> interactions_;
    std::vector<LinkRecord> links_;
    std::vector<ContactCard> cards_;
    std::vector<std::string> owner_;
};

}  // namespace keepsakes
