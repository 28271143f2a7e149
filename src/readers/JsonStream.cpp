// SPDX-License-Identifier: Apache-2.0
#include "readers/JsonStream.h"

#include <fmt/format.h>

#include <charconv>
#include <cmath>
#include <cstddef>
#include <iterator>
#include <nlohmann/json.hpp>

#include "readers/ReaderLimits.h"

namespace keepsakes {

namespace {

/// The document's bytes, a block at a time. Ends early when reading fails or a token is too long.
class JsonBytes {
  public:
    explicit JsonBytes(const ReadBlock& read) : read_(read), buffer_(limits::kBlockSize) {}
    explicit JsonBytes(std::string_view document) : block_(document), ended_(true) {}

    bool atEnd() {
        wasEndSeen_ = at_ == block_.size() && !refill();
        return wasEndSeen_;
    }
    bool wasEndSeen() const { return wasEndSeen_; }
    char current() const { return block_[at_]; }
    void advance() { ++at_; }

    /// A string or number was read: what the parser held of the text before it is free.
    void released() { held_ = before_ + at_; }
    std::size_t position() const { return before_ + at_; }
    const std::string& error() const { return error_; }

  private:
    bool refill() {
        if (ended_) return false;
        if (position() - held_ > limits::kLongestToken) {
            return end(fmt::format("byte {}: a value is too long", held_));
        }
        const auto count = read_(buffer_);
        if (!count) return end(count.error());
        before_ += at_;
        at_ = 0;
        block_ = {buffer_.data(), *count};
        ended_ = *count == 0;
        return !ended_;
    }

    bool end(std::string error) {
        ended_ = true;
        error_ = std::move(error);
        return false;
    }

    ReadBlock read_;
    std::vector<char> buffer_;
    std::string_view block_;
    std::size_t at_ = 0;
    std::size_t before_ = 0;  // bytes of earlier blocks
    std::size_t held_ = 0;
    bool ended_ = false;
    bool wasEndSeen_ = false;
    std::string error_;
};

/// The bytes as the parser takes them; the default one is the end.
class JsonIterator {
  public:
    using iterator_category = std::input_iterator_tag;
    using value_type = char;
    using difference_type = std::ptrdiff_t;
    using pointer = const char*;
    using reference = char;

    JsonIterator() = default;
    explicit JsonIterator(JsonBytes& bytes) : bytes_(&bytes) {}

    char operator*() const { return bytes_->current(); }
    JsonIterator& operator++() {
        bytes_->advance();
        return *this;
    }
    // The parser compares with the end alone.
    friend bool operator==(const JsonIterator& a, const JsonIterator&) { return a.bytes_->atEnd(); }

  private:
    JsonBytes* bytes_ = nullptr;
};

/// What the parser calls, handed on to the handler; false stops it.
class SaxCalls {
  public:
    SaxCalls(JsonBytes& bytes, JsonHandler& handler) : bytes_(bytes), handler_(handler) {}

    bool null() { return scalar({}); }
    bool boolean(bool) { return scalar({}); }
    bool number_integer(std::int64_t value) { return number(static_cast<double>(value)); }
    bool number_unsigned(std::uint64_t value) { return number(static_cast<double>(value)); }
    bool number_float(double value, const std::string&) { return number(value); }
    bool binary(std::vector<std::uint8_t>&) { return false; }
    bool string(const std::string& text) {
        bytes_.released();
        return scalar({.text = text});
    }
    bool key(const std::string& name) {
        bytes_.released();
        handler_.key(name);
        return true;
    }
    bool start_object(std::size_t) {
        if (!deeper()) return false;
        handler_.startObject();
        return true;
    }
    bool end_object() {
        --depth_;
        handler_.endObject();
        return true;
    }
    bool start_array(std::size_t) {
        if (!deeper()) return false;
        handler_.startArray();
        return true;
    }
    bool end_array() {
        --depth_;
        handler_.endArray();
        return true;
    }
    bool parse_error(std::size_t position, const std::string&, const std::exception&) {
        error_ = bytes_.wasEndSeen()
                     ? fmt::format("byte {}: the document ends early", bytes_.position())
                     : fmt::format("byte {}: not well-formed JSON", position);
        return false;
    }

    const std::string& error() const { return error_; }

  private:
    bool scalar(const JsonScalar& value) {
        handler_.scalar(value);
        return true;
    }
    bool number(double value) {
        bytes_.released();
        return scalar({.number = value});
    }
    bool deeper() {
        if (++depth_ <= limits::kDeepestElement) return true;
        error_ = fmt::format("byte {}: elements are nested too deep", bytes_.position());
        return false;
    }

    JsonBytes& bytes_;
    JsonHandler& handler_;
    std::size_t depth_ = 0;
    std::string error_;
};

std::expected<void, std::string> parse(JsonBytes bytes, JsonHandler& handler) {
    SaxCalls calls(bytes, handler);
    const bool done = nlohmann::json::sax_parse(JsonIterator(bytes), JsonIterator(), &calls);
    if (!bytes.error().empty()) return std::unexpected(bytes.error());
    if (!done) return std::unexpected(calls.error());
    // To the parser, a zero byte is an end too.
    if (!bytes.atEnd()) {
        return std::unexpected(fmt::format("byte {}: bytes follow the document", bytes.position()));
    }
    return {};
}

}  // namespace

std::optional<double> JsonScalar::asNumber() const {
    if (number || !text) return number;
    double value = 0;
    const auto* const last = text->data() + text->size();
    const auto [end, error] = std::from_chars(text->data(), last, value);
    if (error != std::errc() || end != last || !std::isfinite(value)) return std::nullopt;
    return value;
}

std::expected<void, std::string> readJson(const ReadBlock& read, JsonHandler& handler) {
    return parse(JsonBytes(read), handler);
}

std::expected<void, std::string> readJson(std::string_view document, JsonHandler& handler) {
    return parse(JsonBytes(document), handler);
}

}  // namespace keepsakes
