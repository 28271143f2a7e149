// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <fmt/format.h>
#include <fmt/ranges.h>

#include <cstring>
#include <string>
#include <string_view>
#include <vector>

#include "readers/PeopleRecords.h"
#include "readers/XmlStream.h"

namespace keepsakes {

/// Writes what a reader tells of people as one line a record:
///     <mechanism> <- or -> <start>[..<end>] <sender>: <recipients>
///     link <url>[ | <title>][ | <description>][ | <room>][ | <room's name>][ | <account>][ *]
///     card <uid>, <name>: <handles> [@ <latitude> <longitude>][, <relationship> <name>...]
///     owner <handle>
class PeopleText final : public PeopleSink {
  public:
    void interaction(const InteractionRecord& record) override {
        const auto* arrow = record.direction == InteractionDirection::outgoing   ? "->"
                            : record.direction == InteractionDirection::incoming ? "<-"
                                                                                 : "--";
        const auto end = record.end == record.start ? "" : ".." + formatISO8601(record.end);
        add(fmt::format("{} {} {}{} {}: {}", static_cast<int>(record.mechanism), arrow,
                        formatISO8601(record.start), end, record.sender,
                        fmt::join(record.recipients, " ")));
        identities.push_back(record.identity);
    }
    void link(const LinkRecord& record) override {
        auto line = "link " + record.link.url;
        for (const auto& part : {record.link.title, record.link.description, record.room,
                                 record.roomName, record.account}) {
            if (!part.empty()) line += " | " + part;
        }
        add(line + (record.isStarred ? " *" : ""));
    }
    void card(const ContactCard& card) override {
        auto line =
            fmt::format("card {}, {}: {}", card.uid, card.name, fmt::join(card.handles, " "));
        if (card.position) {
            line += fmt::format(" @ {} {}", card.position->latitude, card.position->longitude);
        }
        for (const auto& relation : card.relations) {
            line += fmt::format(", {} {}", relation.relationship, relation.name);
        }
        add(line);
    }
    void ownerHandle(const std::string& handle) override { add("owner " + handle); }

    std::string text;
    std::vector<MessageIdentity> identities;

  private:
    void add(const std::string& line) { text += line + "\n"; }
};

/// The bytes, at most `most` at a time.
inline ReadBlock inPieces(std::string_view bytes, std::size_t most) {
    return [bytes, most](std::span<char> into) mutable -> std::expected<std::size_t, std::string> {
        const auto count = std::min({most, bytes.size(), into.size()});
        std::memcpy(into.data(), bytes.data(), count);
        bytes.remove_prefix(count);
        return count;
    };
}

}  // namespace keepsakes
