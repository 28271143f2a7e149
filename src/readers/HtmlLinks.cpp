// SPDX-License-Identifier: Apache-2.0
#include <libxml/HTMLparser.h>

#include <memory>
#include <new>
#include <optional>
#include <utility>

#include "readers/LinkFinder.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

std::string_view textOf(const xmlChar* bytes) {
    return bytes ? std::string_view(reinterpret_cast<const char*>(bytes)) : std::string_view();
}

/// One line without more blanks than one between words, cut to the length of a name.
std::string oneLine(std::string_view text) {
    std::string line;
    for (const char c : text) {
        const bool isBlank = c == ' ' || c == '\t' || c == '\r' || c == '\n';
        if (isBlank && (line.empty() || line.back() == ' ')) continue;
        line += isBlank ? ' ' : c;
    }
    line = cleanText(line);
    if (line.size() > limits::kLongestName) {
        auto end = limits::kLongestName;
        while (end > 0 && (static_cast<unsigned char>(line[end]) & 0xC0U) == 0x80U) --end;
        line.resize(end);
    }
    return cleanText(line);
}

/// Is told what the parser finds, and tells it when it is enough.
class Anchors {
  public:
    explicit Anchors(LinkList& links) : links_(links) {}

    void read(std::string_view html) {
        xmlSAXHandler handler{};
        handler.startElement = [](void* self, const xmlChar* name, const xmlChar** attributes) {
            static_cast<Anchors*>(self)->start(textOf(name), attributes);
        };
        handler.endElement = [](void* self, const xmlChar* name) {
            static_cast<Anchors*>(self)->end(textOf(name));
        };
        handler.characters = [](void* self, const xmlChar* bytes, int length) {
            static_cast<Anchors*>(self)->text(
                {reinterpret_cast<const char*>(bytes), static_cast<std::size_t>(length)});
        };
        handler.ignorableWhitespace = handler.characters;
        const std::unique_ptr<htmlParserCtxt, decltype(&htmlFreeParserCtxt)> parser(
            htmlCreatePushParserCtxt(&handler, this, nullptr, 0, nullptr, XML_CHAR_ENCODING_UTF8),
            &htmlFreeParserCtxt);
        if (!parser) throw std::bad_alloc();
        htmlCtxtUseOptions(parser.get(), HTML_PARSE_RECOVER | HTML_PARSE_NOERROR |
                                             HTML_PARSE_NOWARNING | HTML_PARSE_NONET |
                                             HTML_PARSE_IGNORE_ENC);
        parser_ = parser.get();
        htmlParseChunk(parser.get(), html.data(), static_cast<int>(html.size()), 0);
        htmlParseChunk(parser.get(), nullptr, 0, 1);
        finish();
    }

  private:
    /// Elements within elements. The parser compares each end with all that are open.
    static constexpr std::size_t kDeepest = 256;

    static std::string_view attribute(const xmlChar** attributes, std::string_view name) {
        for (; attributes && attributes[0]; attributes += 2) {
            if (textOf(attributes[0]) == name) return textOf(attributes[1]);
        }
        return {};
    }

    void start(std::string_view name, const xmlChar** attributes) {
        if (++depth_ > kDeepest || links_.isFull()) xmlStopParser(parser_);
        if (name == "blockquote") ++quotes_;
        if (name == "img") text(attribute(attributes, "alt"));
        if (name != "a") return;
        finish();
        if (quotes_ > 0) return;
        anchor_ = FoundLink{.url = cleanText(attribute(attributes, "href")),
                            .title = {},
                            .description = oneLine(attribute(attributes, "title"))};
    }

    void end(std::string_view name) {
        if (depth_ > 0) --depth_;
        if (name == "blockquote" && quotes_ > 0) --quotes_;
        if (name == "a") finish();
    }

    void text(std::string_view piece) {
        if (anchor_ && anchor_->title.size() < limits::kLongestUrl) {
            anchor_->title += piece.substr(0, limits::kLongestUrl);
        }
    }

    void finish() {
        if (!anchor_) return;
        auto link = *std::move(anchor_);
        anchor_.reset();
        link.title = oneLine(link.title);
        // A URL in the place of a title is none.
        if (link.title.contains("://") || link.url.ends_with("//" + link.title)) link.title.clear();
        if (link.description == link.title || link.description.contains("://")) {
            link.description.clear();
        }
        links_.add(std::move(link));
    }

    LinkList& links_;
    htmlParserCtxtPtr parser_ = nullptr;
    std::size_t depth_ = 0;
    std::size_t quotes_ = 0;
    std::optional<FoundLink> anchor_;
};

}  // namespace

void findHtmlLinks(std::string_view html, LinkList& links) {
    if (!html.empty()) Anchors(links).read(html.substr(0, limits::kLongestText));
}

}  // namespace keepsakes
