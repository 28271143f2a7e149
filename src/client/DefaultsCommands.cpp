// SPDX-License-Identifier: Apache-2.0
#include <fmt/format.h>

#include <cerrno>
#include <charconv>
#include <filesystem>

#include "client/Commands.h"
#include "client/RecordJson.h"
#include "config/Environment.h"
#include "core/Files.h"
#include "core/Json.h"
#include "core/PropertyList.h"

namespace keepsakes {

namespace {

namespace fs = std::filesystem;

bool isDomain(std::string_view domain) {
    return !domain.empty() && domain.front() != '.' && !domain.contains('/');
}

int refuseDomain(const Console& console, const std::string& domain) {
    return console.usage(fmt::format("\"{}\" is not a domain", domain));
}

fs::path fileOf(const StandardFolders& folders, const std::string& domain) {
    return folders.defaultsFolder() / (domain + ".plist");
}

/// A domain without a file has no values.
std::expected<KSDictionary, KSError> load(const std::string& domain) {
    const auto folders = StandardFolders::find();
    if (!folders) return std::unexpected(folders.error());
    auto values = readPropertyListFile(fileOf(*folders, domain));
    if (!values && values.error().code == ENOENT) return KSDictionary();
    return values;
}

OptionalError save(const std::string& domain, const KSDictionary& values) {
    const auto folders = StandardFolders::find();
    if (!folders) return folders.error();
    if (auto error = makePrivateFolder(folders->defaultsFolder())) return error;
    return writePropertyListFile(fileOf(*folders, domain), values);
}

template <class Number>
std::optional<Number> number(const std::string& text) {
    Number read = 0;
    const auto* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, read);
    return error == std::errc() && stop == end ? std::optional(read) : std::nullopt;
}

/// By its form: true or false, an integer, another number, an ISO 8601 date, else text.
KSValue typed(const std::string& text) {
    if (text == "true") return true;
    if (text == "false") return false;
    if (const auto integer = number<std::int64_t>(text)) return *integer;
    const bool numeric = text.find_first_not_of("0123456789+-.eE") == std::string::npos;
    if (const auto real = number<double>(text); real && numeric) return *real;
    if (const auto date = parseISO8601(text)) return date->date;
    return text;
}

std::string shown(const KSValue& value) {
    if (const auto* text = value.asString()) return printable(*text);
    return printable(value.description());
}

}  // namespace

int readDefault(const Console& console, const std::string& domain, const std::string& key) {
    if (!isDomain(domain)) return refuseDomain(console, domain);
    const auto values = load(domain);
    if (!values) return console.fail(values.error());
    if (key.empty()) {
        if (console.json()) return console.print(jsonText(jsonForm(*values)).value_or("{}") + "\n");
        Table table({"Key", "Value"});
        for (const auto& [name, value] : *values) table.add({name, shown(value)});
        return console.print(table.text(console.screen()));
    }
    const auto found = values->find(key);
    if (found == values->end()) {
        return console.fail(KSError::make(kPosixErrorDomain, ENOENT,
                                          fmt::format("{} has no value for \"{}\"", domain, key)));
    }
    const auto json = [&] { return jsonText(jsonForm(found->second)).value_or("null"); };
    return console.print((console.json() ? json() : shown(found->second)) + "\n");
}

int writeDefault(const Console& console, const std::string& domain, const std::string& key,
                 const std::string& value) {
    if (!isDomain(domain)) return refuseDomain(console, domain);
    auto values = load(domain);
    if (!values) return console.fail(values.error());
    values->insert_or_assign(key, typed(value));
    if (const auto error = save(domain, *values)) return console.fail(*error);
    return console.print(console.json() ? "{\"done\":true}\n" : "");
}

int deleteDefault(const Console& console, const std::string& domain, const std::string& key) {
    if (!isDomain(domain)) return refuseDomain(console, domain);
    auto values = load(domain);
    if (!values) return console.fail(values.error());
    if (values->erase(key) > 0) {
        if (const auto error = save(domain, *values)) return console.fail(*error);
    }
    return console.print(console.json() ? "{\"done\":true}\n" : "");
}

}  // namespace keepsakes
