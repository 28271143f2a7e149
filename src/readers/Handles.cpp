// SPDX-License-Identifier: Apache-2.0
#include "readers/Handles.h"

#include <algorithm>
#include <array>

#include "core/Text.h"

namespace keepsakes {

namespace {

constexpr std::size_t kComparedDigits = 9;
constexpr std::size_t kFewestDigits = 7;
constexpr std::size_t kMostDigits = 20;
constexpr std::size_t kShortestCode = 3;
/// RFC 5321, 4.5.3.1.3: a path of 256 octets with its brackets.
constexpr std::size_t kLongestAddress = 254;

/// Takes the scheme away, whatever its case.
std::string_view withoutScheme(std::string_view text, std::string_view scheme) {
    const bool has =
        text.size() >= scheme.size() &&
        std::ranges::equal(text.substr(0, scheme.size()), scheme, {}, lowerAscii, lowerAscii);
    return has ? text.substr(scheme.size()) : text;
}

/// Lower case of an address of one "@" between two parts without blanks; empty otherwise.
std::string plainAddress(std::string_view address) {
    const auto at = address.rfind('@');
    if (at == std::string_view::npos || at == 0 || at + 1 == address.size()) return {};
    if (address.size() > kLongestAddress || !isPlainUtf8(address)) return {};
    std::string plain(address);
    for (char& c : plain) {
        if (static_cast<unsigned char>(c) <= ' ' || c == 0x7f || c == '<' || c == '>') return {};
        c = lowerAscii(c);
    }
    return plain;
}

}  // namespace

std::string phoneHandle(std::string_view number) {
    number = withoutScheme(trimmed(number), "tel:");
    number = number.substr(0, number.find_first_of(";,"));
    std::string digits;
    for (const char c : number) {
        if (isDigit(c)) {
            digits += c;
        } else if (std::string_view("+-./() \t").find(c) == std::string_view::npos &&
                   (static_cast<unsigned char>(c) & 0x80U) == 0) {
            return {};
        }
        // Bytes beyond ASCII are the odd blanks and dashes that address books put between digits.
    }
    if (digits.size() < kShortestCode || digits.size() > kMostDigits) return {};
    if (digits.size() < kFewestDigits) return "code:" + digits;
    if (digits.size() > kComparedDigits) digits.erase(0, digits.size() - kComparedDigits);
    return "tel:" + digits;
}

std::string mailHandle(std::string_view address) {
    address = trimmed(address);
    for (auto bare = withoutScheme(address, "mailto:"); bare.size() < address.size();
         bare = withoutScheme(address, "mailto:")) {
        address = bare;
    }
    const auto plain = plainAddress(address);
    return plain.empty() ? plain : "mailto:" + plain;
}

std::string chatHandle(std::string_view address) {
    address = trimmed(address);
    for (const auto* scheme : {"xmpp:", "matrix:u/", "matrix:", "im:"}) {
        address = withoutScheme(address, scheme);
    }
    address = address.substr(0, address.find_first_of("/?"));
    if (address.starts_with('@') || (address.find(':') != std::string_view::npos)) {
        // Matrix: @localpart:server
        const auto colon = address.find(':');
        if (colon == std::string_view::npos || colon + 1 == address.size()) return {};
        std::string plain = address.starts_with('@') ? "" : "@";
        plain += address;
        if (plain.size() > kLongestAddress || plain.size() < 4 || !isPlainUtf8(plain)) return {};
        for (char& c : plain) {
            if (static_cast<unsigned char>(c) <= ' ') return {};
            c = lowerAscii(c);
        }
        return "im:" + plain;
    }
    const auto plain = plainAddress(address);
    return plain.empty() ? plain : "im:" + plain;
}

std::string handleOf(std::string_view text) {
    text = trimmed(text);
    if (text.starts_with('@')) return chatHandle(text);
    for (const auto* scheme : {"xmpp:", "matrix:", "im:"}) {
        if (withoutScheme(text, scheme).size() < text.size()) return chatHandle(text);
    }
    auto handle = phoneHandle(text);
    return handle.empty() ? mailHandle(text) : handle;
}

bool isServiceCode(std::string_view handle) { return handle.starts_with("code:"); }

bool isMachineAddress(std::string_view mailHandle) {
    static constexpr auto kLocalParts = std::to_array<std::string_view>(
        {"noreply", "no-reply", "no_reply", "donotreply", "do-not-reply", "do_not_reply",
         "mailer-daemon", "postmaster", "bounce", "bounces", "notification", "notifications",
         "nicht-antworten", "ne-pas-repondre", "noresponder"});
    auto local = shownHandle(mailHandle);
    local = local.substr(0, local.rfind('@'));
    return std::ranges::any_of(kLocalParts, [local](std::string_view part) {
        return local == part || (local.starts_with(part) && local[part.size()] == '+') ||
               (local.ends_with(part) && local[local.size() - part.size() - 1] == '-') ||
               (local.starts_with(part) && local[part.size()] == '-');
    });
}

std::string_view shownHandle(std::string_view handle) {
    return handle.substr(handle.find(':') + 1);
}

}  // namespace keepsakes
