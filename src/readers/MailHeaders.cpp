// SPDX-License-Identifier: Apache-2.0
#include "readers/MailHeaders.h"

#include <fmt/format.h>

#include <algorithm>
#include <charconv>

#include "core/MurmurHash3.h"
#include "core/Text.h"
#include "readers/Handles.h"
#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

constexpr std::uint32_t kMailIdentitySeed = 0x6d61696c;

bool same(std::string_view text, std::string_view lowerCase) {
    return std::ranges::equal(text, lowerCase, {}, lowerAscii);
}

bool startsWith(std::string_view text, std::string_view lowerCase) {
    return same(text.substr(0, lowerCase.size()), lowerCase);
}

/// Walks a field of addresses and gives each one's text, without names and comments.
class AddressList {
  public:
    explicit AddressList(std::string_view value) : rest_(value) {}

    /// False at the end.
    bool next(std::string& address) {
        while (!rest_.empty()) {
            word_.clear();
            angle_.reset();
            readOne();
            const auto& found = angle_ ? *angle_ : word_;
            address = trimmed(found);
            if (!address.empty()) return true;
        }
        return false;
    }

  private:
    void readOne() {
        while (!rest_.empty()) {
            const char c = rest_.front();
            rest_.remove_prefix(1);
            switch (c) {
                case ',':
                case ';':
                    return;
                case ':':  // what stood before names a group
                    word_.clear();
                    break;
                case '"':
                    skipQuoted();
                    break;
                case '(':
                    skipComment();
                    break;
                case '<':
                    readAngle();
                    break;
                default:
                    word_ += c;
            }
        }
    }

    void skipQuoted() {
        while (!rest_.empty()) {
            const char c = rest_.front();
            rest_.remove_prefix(c == '\\' ? std::min<std::size_t>(2, rest_.size()) : 1);
            if (c == '"') return;
        }
    }

    void skipComment() {
        for (int depth = 1; depth > 0 && !rest_.empty();) {
            const char c = rest_.front();
            rest_.remove_prefix(c == '\\' ? std::min<std::size_t>(2, rest_.size()) : 1);
            if (c == '(') ++depth;
            if (c == ')') --depth;
        }
    }

    void readAngle() {
        const auto end = std::min(rest_.find('>'), rest_.size());
        auto inside = rest_.substr(0, end);
        rest_.remove_prefix(std::min(end + 1, rest_.size()));
        // A route of old mails: <@one,@two:person@three>
        if (inside.starts_with('@'))
            inside.remove_prefix(std::min(inside.find(':'), inside.size()));
        if (inside.starts_with(':')) inside.remove_prefix(1);
        angle_ = std::string(inside);
    }

    std::string_view rest_;
    std::string word_;
    std::optional<std::string> angle_;
};

/// "andy at example.org", as public archives of mailing lists write it.
bool isVeiled(std::string_view from) {
    std::string address;
    return AddressList(from).next(address) && address.find('@') == std::string::npos &&
           address.find(" at ") != std::string::npos;
}

}  // namespace

bool isHeaderLine(std::string_view line) {
    const auto colon = line.find(':');
    if (colon == 0 || colon == std::string_view::npos) return false;
    const auto name = line.substr(0, colon);
    return std::ranges::all_of(name, [](char c) { return c > ' ' && c < 0x7f; });
}

bool isMailSeparator(std::string_view line) {
    if (!line.starts_with("From ") || line.size() > limits::kLongestValue) return false;
    bool hasTime = false;
    bool hasYear = false;
    for (std::size_t i = 5; i + 3 < line.size(); ++i) {
        hasTime |= line[i] == ':' && isDigit(line[i - 1]) && isDigit(line[i + 1]);
        hasYear |= line[i - 1] == ' ' && (line.substr(i, 2) == "19" || line.substr(i, 2) == "20") &&
                   isDigit(line[i + 2]) && isDigit(line[i + 3]) &&
                   (i + 4 == line.size() || line[i + 4] == ' ');
    }
    return hasTime && hasYear;
}

std::vector<std::string> addressHandles(std::string_view value, std::size_t most) {
    std::vector<std::string> handles;
    AddressList list(value);
    for (std::string address; handles.size() < most && list.next(address);) {
        auto handle = mailHandle(address);
        if (handle.empty() || std::ranges::find(handles, handle) != handles.end()) continue;
        handles.push_back(std::move(handle));
    }
    return handles;
}

void MailHeaders::line(std::string_view line) {
    if (line.starts_with(' ') || line.starts_with('\t')) {
        if (current_ && current_->size() + line.size() <= limits::kLongestField) *current_ += line;
        return;
    }
    current_ = nullptr;
    const auto colon = line.find(':');
    if (colon == std::string_view::npos) return;
    const auto name = trimmed(line.substr(0, colon));
    const auto value = trimmed(line.substr(colon + 1));
    if (same(name, "from")) {
        take(from, value);
    } else if (same(name, "to") || same(name, "cc") || same(name, "bcc")) {
        take(to, value);
    } else if (same(name, "date")) {
        take(date, value);
    } else if (same(name, "message-id")) {
        take(messageId, value);
    } else if (same(name, "subject")) {
        take(subject, value);
    } else {
        judge(name, value);
    }
}

void MailHeaders::take(Field field, std::string_view value) {
    auto& text = fields_[field];
    // Of what may stand once only, the first counts.
    if (!text.empty() && field != to) return;
    if (!text.empty()) text += ", ";
    if (text.size() + value.size() <= limits::kLongestField) text += value;
    current_ = &text;
}

void MailHeaders::clear() {
    for (auto& text : fields_) text.clear();
    current_ = nullptr;
    isBulk_ = isAutomatic_ = isDraft_ = isDeleted_ = isStarred_ = false;
}

void MailHeaders::judge(std::string_view name, std::string_view value) {
    if (startsWith(name, "list-")) {
        isBulk_ = true;
    } else if (same(name, "precedence")) {
        isBulk_ |= same(value, "bulk") || same(value, "list") || same(value, "junk");
        isAutomatic_ |= same(value, "auto_reply");
    } else if (same(name, "auto-submitted")) {
        isAutomatic_ |= !startsWith(value, "no");
    } else if (same(name, "return-path")) {
        isAutomatic_ |= value == "<>";
    } else if (same(name, "content-type")) {
        isAutomatic_ |= startsWith(value, "multipart/report");
    } else if (same(name, "x-spam-flag")) {
        isBulk_ |= same(value, "yes");
    } else if (same(name, "x-mozilla-draft-info")) {
        isDraft_ = true;
    } else if (same(name, "x-mozilla-status")) {
        constexpr unsigned kExpunged = 0x0008;
        constexpr unsigned kMarked = 0x0004;
        unsigned flags = 0;
        std::from_chars(value.data(), value.data() + value.size(), flags, 16);
        isDeleted_ |= (flags & kExpunged) != 0;
        isStarred_ |= (flags & kMarked) != 0;
    } else if (same(name, "x-status")) {
        isDeleted_ |= value.find('D') != std::string_view::npos;
        isDraft_ |= value.find('T') != std::string_view::npos;
        isStarred_ |= value.find('F') != std::string_view::npos;
    }
}

std::expected<InteractionRecord, std::string> MailHeaders::record(KSDate now) const {
    if (fields_[from].empty()) return std::unexpected("the mail has no sender");
    if (fields_[date].empty()) return std::unexpected("the mail has no date");
    const auto sent = parseMailDate(fields_[date]);
    if (!sent) return std::unexpected("the mail's date cannot be read");
    if (!limits::isSane(*sent, now)) {
        return std::unexpected(
            fmt::format("{} as the mail's date is not believed", formatISO8601(*sent)));
    }
    InteractionRecord record;
    record.start = *sent;
    record.end = *sent;
    const auto senders = addressHandles(fields_[from], 1);
    if (!senders.empty()) record.sender = senders.front();
    record.recipients = addressHandles(fields_[to], limits::kMostRecipients + 1);
    std::erase(record.recipients, record.sender);
    const bool isCrowd = record.recipients.size() > limits::kMostRecipients;
    if (isCrowd) record.recipients.clear();
    if (isDraft_) {
        record.mechanism = InteractionMechanism::unsentMessage;
    } else if (isAutomatic_) {
        record.mechanism = InteractionMechanism::automaticMail;
    } else if (isBulk_ || isCrowd || isVeiled(fields_[from])) {
        record.mechanism = InteractionMechanism::bulkMail;
    } else if (isMachineAddress(record.sender)) {
        record.mechanism = InteractionMechanism::serviceMessage;
    }
    const auto& named = fields_[messageId];
    record.identity =
        murmurHash3(named.empty() ? fmt::format("{}\n{}\n{}\n{}", fields_[date], fields_[from],
                                                fields_[to], fields_[subject])
                                  : named,
                    kMailIdentitySeed);
    return record;
}

}  // namespace keepsakes
