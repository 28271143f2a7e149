// SPDX-License-Identifier: Apache-2.0
#include "readers/MailReader.h"

#include <fmt/format.h>

#include <utility>

#include "readers/LineReader.h"
#include "readers/MailBody.h"
#include "readers/MailHeaders.h"

namespace keepsakes {

namespace {

/// The links of the mail that was told last.
void tellLinks(MailBody& body, bool isStarred, PeopleSink& sink) {
    for (auto& link : body.takeLinks()) {
        sink.link({.link = std::move(link),
                   .room = {},
                   .roomName = {},
                   .account = {},
                   .isStarred = isStarred});
    }
}

}  // namespace

std::expected<void, std::string> readMail(const ReadBlock& read, const ReaderContext& context,
                                          PeopleSink& sink) {
    LineReader lines(read);
    MailHeaders headers;
    MailBody body;
    bool isWhole = false;  // Else the file was cut within its last field.
    for (std::string_view line;;) {
        const auto more = lines.next(line);
        if (!more) return std::unexpected(more.error());
        if (!*more) break;
        isWhole = lines.hasEnd();
        if (line.empty() || !isWhole) break;
        if (isMailSeparator(line)) continue;
        headers.line(line);
        body.headerLine(line);
    }
    if (!isWhole) return std::unexpected("the mail's header is cut");
    if (headers.isDeleted()) return {};
    const auto record = headers.record(context.now);
    if (!record) return std::unexpected(record.error());
    sink.interaction(*record);
    for (std::string_view line; body.wantsMore();) {
        const auto more = lines.next(line);
        if (!more) return std::unexpected(more.error());
        if (!*more) break;
        body.line(line);
    }
    tellLinks(body, headers.isStarred(), sink);
    return {};
}

namespace {

/// One mailbox while it is read: where one mail ends and the next begins.
class Mailbox {
  public:
    Mailbox(const ReaderContext& context, PeopleSink& sink) : context_(context), sink_(sink) {}

    void line(std::string_view line) {
        if (std::exchange(isSeparated_, false)) {
            if (isHeaderLine(line)) {
                endMail();
                headers_.clear();
                part_ = Part::header;
                header(line);
                return;
            }
            part_ = part_ == Part::start ? Part::body : part_;
        }
        // A separator follows an empty line; programs that are careless of it end headers with one.
        isSeparated_ = (wasEmpty_ || part_ != Part::body) && isMailSeparator(line);
        wasEmpty_ = line.empty();
        if (isSeparated_) return;
        if (part_ == Part::body && isTaken_) body_.line(line);
        if (part_ != Part::header) return;
        if (line.empty()) {
            take();
            part_ = Part::body;
        } else {
            header(line);
        }
    }

    /// What the file held, when it held anything that can be read.
    std::expected<void, std::string> finish(bool isWhole) {
        if (part_ == Part::header && isWhole) take();
        endMail();
        if (taken_ == 0 && reason_) {
            return std::unexpected(fmt::format("no mail of it can be read: {}", *reason_));
        }
        return {};
    }

  private:
    enum class Part { start, header, body };

    void header(std::string_view line) {
        headers_.line(line);
        body_.headerLine(line);
    }

    /// Tells the links of the mail that ends.
    void endMail() {
        if (std::exchange(isTaken_, false)) {
            tellLinks(body_, headers_.isStarred(), sink_);
        } else {
            body_ = {};
        }
    }

    void take() {
        if (headers_.isDeleted()) return;
        if (const auto record = headers_.record(context_.now)) {
            sink_.interaction(*record);
            isTaken_ = true;
            ++taken_;
        } else if (!reason_) {
            reason_ = record.error();
        }
    }

    const ReaderContext& context_;
    PeopleSink& sink_;
    MailHeaders headers_;
    MailBody body_;
    bool isTaken_ = false;  ///< The mail was told, and its links may follow.
    Part part_ = Part::start;
    bool isSeparated_ = false;  ///< The line before was a separator, if a header follows it.
    bool wasEmpty_ = true;
    std::uint64_t taken_ = 0;
    std::optional<std::string> reason_;  ///< Of the first mail passed over.
};

}  // namespace

std::expected<void, std::string> readMailbox(const ReadBlock& read, const ReaderContext& context,
                                             PeopleSink& sink) {
    LineReader lines(read);
    Mailbox mailbox(context, sink);
    for (std::string_view line;;) {
        const auto more = lines.next(line);
        if (!more) return std::unexpected(more.error());
        if (!*more) return mailbox.finish(true);
        if (!lines.hasEnd()) return mailbox.finish(false);
        mailbox.line(line);
    }
}

}  // namespace keepsakes
