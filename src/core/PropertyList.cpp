// SPDX-License-Identifier: Apache-2.0
#include "core/PropertyList.h"

#include <fmt/format.h>

#include <array>
#include <charconv>
#include <cmath>
#include <pugixml.hpp>
#include <sstream>
#include <vector>

#include "core/Files.h"
#include "core/Text.h"

namespace keepsakes {

namespace {

constexpr std::uintmax_t kLargestFile = 16u << 20;
constexpr int kDeepestNode = 64;
constexpr std::string_view kErrorDomain = "PropertyListErrorDomain";
constexpr std::string_view kBase64 =
    "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

std::string base64(const KSValue::Bytes& bytes) {
    std::string text;
    for (std::size_t at = 0; at < bytes.size(); at += 3) {
        const std::size_t count = std::min<std::size_t>(3, bytes.size() - at);
        unsigned group = 0;
        for (std::size_t i = 0; i < 3; ++i) group = group << 8 | (i < count ? bytes[at + i] : 0u);
        for (std::size_t i = 0; i < 4; ++i) {
            text += i <= count ? kBase64[group >> (18 - 6 * i) & 63] : '=';
        }
    }
    return text;
}

std::optional<KSValue::Bytes> fromBase64(std::string_view text) {
    KSValue::Bytes bytes;
    unsigned group = 0;
    int bits = 0;
    for (char c : text) {
        if (c == '=' || c == ' ' || c == '\n' || c == '\t' || c == '\r') continue;
        const auto digit = kBase64.find(c);
        if (digit == std::string_view::npos) return std::nullopt;
        group = group << 6 | static_cast<unsigned>(digit);
        bits += 6;
        if (bits >= 8) {
            bits -= 8;
            bytes.push_back(static_cast<std::uint8_t>(group >> bits & 0xff));
        }
    }
    return bytes;
}

std::string replaceAll(std::string_view text, char character, std::string_view replacement) {
    std::string result;
    result.reserve(text.size());
    for (const char c : text) {
        if (c == character) {
            result += replacement;
        } else {
            result += c;
        }
    }
    return result;
}

void appendNode(pugi::xml_node parent, const KSValue& value);

struct AppendNode {
    pugi::xml_node parent;

    void text(const char* name, const std::string& content) {
        auto node = parent.append_child(name);
        if (content.empty()) return;
        node.append_child(pugi::node_pcdata)
            .set_value(replaceAll(content, '\0', "\xef\xbf\xbd").c_str());
    }
    void operator()(std::monostate) {}
    void operator()(bool value) { parent.append_child(value ? "true" : "false"); }
    void operator()(std::int64_t value) { text("integer", fmt::format("{}", value)); }
    void operator()(double value) { text("real", fmt::format("{}", value)); }
    void operator()(const std::string& value) { text("string", value); }
    void operator()(const KSValue::Bytes& value) { text("data", base64(value)); }
    void operator()(KSDate value) { text("date", formatISO8601({std::floor(value.seconds)})); }
    void operator()(const KSUUID& value) { text("string", value.string()); }
    void operator()(const KSArray& value) {
        auto node = parent.append_child("array");
        for (const auto& item : value) appendNode(node, item);
    }
    void operator()(const KSDictionary& value) {
        auto node = parent.append_child("dict");
        for (const auto& [key, item] : value) {
            if (item.isNull()) continue;
            AppendNode{node}.text("key", key);
            appendNode(node, item);
        }
    }
};

void appendNode(pugi::xml_node parent, const KSValue& value) { value.visit(AppendNode{parent}); }

std::unexpected<KSError> failure(int code, std::string_view description) {
    return std::unexpected(KSError::make(kErrorDomain, code, description));
}

std::unexpected<KSError> badNode(const pugi::xml_node& node) {
    return failure(1, fmt::format("property list: cannot read <{}> at byte {}", node.name(),
                                  node.offset_debug()));
}

template <class Number>
std::optional<Number> parseNumber(std::string_view text) {
    Number number{};
    const auto* end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, number);
    return error == std::errc{} && rest == end ? std::optional(number) : std::nullopt;
}

/// All the text in a node, which holds nothing else.
std::expected<std::string, KSError> textOf(const pugi::xml_node& node) {
    std::string text;
    for (const auto& child : node.children()) {
        if (child.type() != pugi::node_pcdata && child.type() != pugi::node_cdata) {
            return badNode(node);
        }
        text += child.value();
    }
    return text;
}

/// The elements in a node, which holds nothing else but blanks.
std::expected<std::vector<pugi::xml_node>, KSError> elementsOf(const pugi::xml_node& node) {
    std::vector<pugi::xml_node> elements;
    for (const auto& child : node.children()) {
        if (child.type() == pugi::node_element) {
            elements.push_back(child);
        } else if (!trimmed(child.value()).empty()) {
            return badNode(node);
        }
    }
    return elements;
}

std::expected<KSValue, KSError> readNode(const pugi::xml_node& node, int depth);

std::expected<KSValue, KSError> readDictionary(const pugi::xml_node& node, int depth) {
    const auto elements = elementsOf(node);
    if (!elements) return std::unexpected(elements.error());
    KSDictionary dictionary;
    for (std::size_t i = 0; i < elements->size(); i += 2) {
        const auto& element = (*elements)[i];
        if (std::string_view(element.name()) != "key") return badNode(element);
        const auto key = textOf(element);
        if (!key) return std::unexpected(key.error());
        if (i + 1 == elements->size()) {
            return failure(1, fmt::format("property list: key {} has no value", *key));
        }
        auto value = readNode((*elements)[i + 1], depth + 1);
        if (!value) return value;
        dictionary.insert_or_assign(*key, std::move(*value));
    }
    return dictionary;
}

std::expected<KSValue, KSError> readArray(const pugi::xml_node& node, int depth) {
    const auto elements = elementsOf(node);
    if (!elements) return std::unexpected(elements.error());
    KSArray array;
    for (const auto& element : *elements) {
        auto value = readNode(element, depth + 1);
        if (!value) return value;
        array.push_back(std::move(*value));
    }
    return array;
}

std::expected<KSValue, KSError> readNode(const pugi::xml_node& node, int depth) {
    if (depth > kDeepestNode) return failure(1, "property list: nested too deeply");
    const std::string_view kind = node.name();
    if (kind == "dict") return readDictionary(node, depth);
    if (kind == "array") return readArray(node, depth);
    if (kind == "true") return KSValue(true);
    if (kind == "false") return KSValue(false);
    auto content = textOf(node);
    if (!content) return std::unexpected(std::move(content.error()));
    if (kind == "string") return KSValue(std::move(*content));
    const auto text = trimmed(*content);
    if (kind == "integer") {
        if (auto number = parseNumber<std::int64_t>(text)) return KSValue(*number);
    } else if (kind == "real") {
        if (auto number = parseNumber<double>(text)) return KSValue(*number);
    } else if (kind == "date") {
        if (auto date = parseISO8601(text)) return KSValue(date->date);
    } else if (kind == "data") {
        if (auto bytes = fromBase64(text)) return KSValue(std::move(*bytes));
    }
    return badNode(node);
}

}  // namespace

std::string propertyListText(const KSDictionary& root) {
    pugi::xml_document document;
    auto declaration = document.append_child(pugi::node_declaration);
    declaration.append_attribute("version") = "1.0";
    declaration.append_attribute("encoding") = "UTF-8";
    auto plist = document.append_child("plist");
    plist.append_attribute("version") = "1.0";
    appendNode(plist, root);
    std::ostringstream out;
    document.save(out, "\t");
    // The only carriage returns are those in texts; unescaped, a reader takes them for line ends.
    return replaceAll(out.str(), '\r', "&#13;");
}

std::expected<KSDictionary, KSError> parsePropertyList(std::string_view text) {
    pugi::xml_document document;
    // Blanks between elements are skipped here: the parser would drop texts that are only blanks.
    const auto result =
        document.load_buffer(text.data(), text.size(), pugi::parse_default | pugi::parse_ws_pcdata);
    if (!result) {
        return failure(
            1, fmt::format("property list: {} at byte {}", result.description(), result.offset));
    }
    const auto roots = elementsOf(document.child("plist"));
    if (!roots || roots->size() != 1) return failure(1, "property list: not one root");
    auto value = readNode(roots->front(), 0);
    if (!value) return std::unexpected(std::move(value.error()));
    if (const auto* dictionary = value->asDictionary()) return *dictionary;
    return failure(1, "property list: the root is not a dictionary");
}

std::expected<KSDictionary, KSError> readPropertyListFile(const std::filesystem::path& path) {
    auto text = readFile(path, kLargestFile);
    if (!text) return std::unexpected(std::move(text.error()));
    return parsePropertyList(*text);
}

OptionalError writePropertyListFile(const std::filesystem::path& path, const KSDictionary& root) {
    return replaceFile(path, propertyListText(root));
}

}  // namespace keepsakes
