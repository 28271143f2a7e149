// SPDX-License-Identifier: Apache-2.0
#include "readers/XmlStream.h"

#include <expat.h>
#include <fmt/format.h>
#include <unistd.h>

#include <cerrno>
#include <memory>
#include <system_error>

#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

std::string_view localName(std::string_view name) {
    const auto colon = name.rfind(':');
    return colon == std::string_view::npos ? name : name.substr(colon + 1);
}

struct FreeParser {
    void operator()(XML_Parser parser) const { XML_ParserFree(parser); }
};

/// One parse: what the parser's callbacks share.
class Parse {
  public:
    explicit Parse(XmlHandler& handler) : parser_(XML_ParserCreate(nullptr)), handler_(handler) {
        if (!parser_) throw std::bad_alloc();
        XML_SetUserData(parser_.get(), this);
        XML_SetElementHandler(parser_.get(), &Parse::started, &Parse::ended);
        XML_SetCharacterDataHandler(parser_.get(), &Parse::characters);
        XML_SetEntityDeclHandler(parser_.get(), &Parse::entityDeclared);
    }

    std::expected<void, std::string> run(const ReadBlock& read) {
        std::size_t fed = 0;
        bool final = false;
        while (!final) {
            void* buffer = XML_GetBuffer(parser_.get(), static_cast<int>(limits::kBlockSize));
            if (!buffer) throw std::bad_alloc();
            const auto count = read({static_cast<char*>(buffer), limits::kBlockSize});
            if (!count) return std::unexpected(count.error());
            fed += *count;
            final = *count == 0;
            if (XML_ParseBuffer(parser_.get(), static_cast<int>(*count), final) != XML_STATUS_OK) {
                return failed(XML_ErrorString(XML_GetErrorCode(parser_.get())));
            }
            const auto done = XML_GetCurrentByteIndex(parser_.get());
            if (done >= 0 && fed - static_cast<std::size_t>(done) > limits::kLongestToken) {
                return failed("a token is too long");
            }
        }
        return {};
    }

  private:
    static Parse& self(void* data) { return *static_cast<Parse*>(data); }

    static void started(void* data, const char* name, const char** attributes) {
        auto& parse = self(data);
        if (++parse.depth_ > limits::kDeepestElement) {
            return parse.stop("elements are nested too deep");
        }
        parse.handler_.startElement(localName(name), XmlAttributes(attributes));
    }

    static void ended(void* data, const char*) {
        auto& parse = self(data);
        --parse.depth_;
        parse.handler_.endElement();
    }

    static void characters(void* data, const char* text, int length) {
        self(data).handler_.text({text, static_cast<std::size_t>(length)});
    }

    // An entity of entities grows without limit, and no track or activity file needs one.
    static void entityDeclared(void* data, const char*, int, const char*, int, const char*,
                               const char*, const char*, const char*) {
        self(data).stop("the document declares entities");
    }

    void stop(const char* reason) {
        if (!stopped_) stopped_ = reason;
        XML_StopParser(parser_.get(), XML_FALSE);
    }

    std::unexpected<std::string> failed(const char* reason) const {
        return std::unexpected(fmt::format("line {}: {}", XML_GetCurrentLineNumber(parser_.get()),
                                           stopped_ ? stopped_ : reason));
    }

    std::unique_ptr<std::remove_pointer_t<XML_Parser>, FreeParser> parser_;
    XmlHandler& handler_;
    std::size_t depth_ = 0;
    const char* stopped_ = nullptr;
};

}  // namespace

ReadBlock readDescriptor(int fd) {
    return [fd, offset = off_t{0}](
               std::span<char> into) mutable -> std::expected<std::size_t, std::string> {
        while (true) {
            const auto count = ::pread(fd, into.data(), into.size(), offset);
            if (count < 0 && errno == EINTR) continue;
            if (count < 0) {
                return std::unexpected("read: " + std::generic_category().message(errno));
            }
            offset += count;
            return static_cast<std::size_t>(count);
        }
    };
}

std::optional<std::string_view> XmlAttributes::find(std::string_view name) const {
    for (const auto* pair = pairs_; *pair; pair += 2) {
        if (localName(*pair) == name) return pair[1];
    }
    return std::nullopt;
}

std::expected<void, std::string> readXml(const ReadBlock& read, XmlHandler& handler) {
    return Parse(handler).run(read);
}

}  // namespace keepsakes
