// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "readers/PeopleRecords.h"

namespace keepsakes {

/// Collects the header fields of one mail (RFC 5322) that tell who, when and how, line by line;
/// nothing else of the mail is kept. A plain value.
class MailHeaders {
  public:
    /// Any line of the header, also one that continues the line before.
    void line(std::string_view line);
    /// Forgets everything, for the next mail.
    void clear();

    /// The mail as an interaction, or why it is none.
    std::expected<InteractionRecord, std::string> record(KSDate now) const;

    /// Marked as deleted by a program that leaves deleted mails in its mailbox.
    bool isDeleted() const { return isDeleted_; }
    /// Marked as important to the owner by a program that keeps that in its mailbox.
    bool isStarred() const { return isStarred_; }

  private:
    /// The fields that are kept.
    enum Field : std::size_t { from, to, date, messageId, subject };
    static constexpr std::size_t kFields = 5;

    void take(Field field, std::string_view value);
    void judge(std::string_view name, std::string_view value);

    std::array<std::string, kFields> fields_;  ///< "To", "Cc" and "Bcc" stand joined in `to`.
    std::string* current_ = nullptr;           ///< What a continued line belongs to.
    bool isBulk_ = false;
    bool isAutomatic_ = false;
    bool isDraft_ = false;
    bool isDeleted_ = false;
    bool isStarred_ = false;
};

/// Whether the line begins with a field name and a colon.
bool isHeaderLine(std::string_view line);

/// Whether the line is the one that stands before each mail of an mbox file (RFC 4155): "From ",
/// a sender, and a date with a time and a year.
bool isMailSeparator(std::string_view line);

/// The mail addresses of a field's value as handles, each once, in their order; at most `most`.
/// Names, comments, groups and routes are passed over.
std::vector<std::string> addressHandles(std::string_view value, std::size_t most);

/// A date as mails write it (RFC 5322, 3.3 and 4.3).
std::optional<KSDate> parseMailDate(std::string_view text);

}  // namespace keepsakes
