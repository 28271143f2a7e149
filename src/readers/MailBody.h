// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "readers/LinkFinder.h"

namespace keepsakes {

/// Finds the links in the text parts of one mail (RFC 2045 and 2046), line by line and in bounded
/// memory; nothing else of the text is kept. What is attached, what a reply quotes and what stands
/// behind a signature's "-- " or a line of underscores is passed over. A plain value.
class MailBody {
  public:
    /// Any line of the mail's header.
    void headerLine(std::string_view line) { part_.line(line); }
    /// Any line behind the header, after the empty one that ends it.
    void line(std::string_view line);

    /// False when what is still to come would not be looked at.
    bool wantsMore() const { return !isOver_; }

    /// Ends the mail, forgets it for the next one, and answers its links.
    std::vector<FoundLink> takeLinks();

  private:
    enum class Encoding { none, quotedPrintable, base64 };
    enum class Kind { other, plain, html };

    /// The fields of a part's header that tell how to read it.
    class Header {
      public:
        void line(std::string_view line);
        bool isType(std::string_view type) const;
        bool isAttached() const;
        Encoding encoding() const;
        /// A parameter of the content type; empty when there is none.
        std::string parameter(std::string_view name) const;

      private:
        std::string type_;
        std::string encoding_;
        std::string disposition_;
        std::string* current_ = nullptr;
    };

    void begin();
    void beginPart();
    void endPart();
    bool isBoundary(std::string_view line);
    void addText(std::string_view line);
    void addQuotedPrintable(std::string_view line);
    void addBase64(std::string_view line);
    void findInPlain(std::string_view text);

    Header part_;
    bool hasBegun_ = false;
    bool inHeader_ = false;  ///< Of a part.
    bool isOver_ = false;
    Kind kind_ = Kind::other;
    Encoding encoding_ = Encoding::none;
    std::string charset_;
    std::vector<std::string> boundaries_;  ///< Of the multiparts around, the outermost first.
    std::string text_;                     ///< The part's, decoded.
    std::uint32_t bits_ = 0;               ///< Of base64, not yet a byte.
    unsigned bitCount_ = 0;
    std::size_t bytes_ = 0;
    LinkList links_;
};

}  // namespace keepsakes
