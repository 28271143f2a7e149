// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <expected>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>

namespace keepsakes {

/// Fills the span from the start and answers how many bytes it wrote, 0 at the end of the file; or
/// the reason why the file cannot be read.
using ReadBlock = std::function<std::expected<std::size_t, std::string>(std::span<char>)>;

/// Reads a file from its start, wherever the descriptor stands. The descriptor stays the caller's.
ReadBlock readDescriptor(int fd);

/// The attributes of the element that starts; valid during the call that passes it.
class XmlAttributes {
  public:
    explicit XmlAttributes(const char* const* pairs) : pairs_(pairs) {}

    /// By the name without its prefix; nothing when absent.
    std::optional<std::string_view> find(std::string_view name) const;

  private:
    const char* const* pairs_;
};

/// Is told what the document holds, in its order. Text comes in UTF-8, in pieces of any size.
class XmlHandler {
  public:
    virtual ~XmlHandler() = default;
    virtual void startElement(std::string_view localName, XmlAttributes attributes) = 0;
    virtual void endElement() = 0;
    virtual void text(std::string_view piece) = 0;
};

/// Reads a document of any size in flat memory. Answers an error (with its line) for what is not
/// well-formed, for a document that declares entities, and for one beyond the limits of depth and
/// token length; the handler has then seen a part of it.
std::expected<void, std::string> readXml(const ReadBlock& read, XmlHandler& handler);

}  // namespace keepsakes
