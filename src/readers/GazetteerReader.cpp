// SPDX-License-Identifier: Apache-2.0
#include "readers/GazetteerReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

constexpr std::size_t kColumns = 19;
constexpr std::size_t kName = 1;
constexpr std::size_t kLatitude = 4;
constexpr std::size_t kLongitude = 5;
constexpr std::size_t kFeatureClass = 6;
constexpr std::size_t kFeatureCode = 7;

// Populated places that are no more: historical, destroyed, abandoned, historical capitals.
constexpr auto kGone = std::to_array<std::string_view>({"PPLH", "PPLW", "PPLQ", "PPLCH"});

std::optional<double> number(std::string_view text) {
    double value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size()) return std::nullopt;
    return value;
}

class Gazetteer {
  public:
    explicit Gazetteer(const std::function<void(Town&&)>& town) : town_(town) {}

    void line(std::string_view text) {
        std::array<std::string_view, kColumns> columns;
        std::size_t count = 0;
        while (count < kColumns) {
            const auto tab = text.find('\t');
            columns.at(count++) = text.substr(0, tab);
            if (tab == std::string_view::npos) break;
            text.remove_prefix(tab + 1);
        }
        if (count < kColumns) return;
        const auto position = geoPoint(number(columns[kLatitude]), number(columns[kLongitude]));
        if (!position) return;
        ++places_;
        if (columns[kFeatureClass] != "P" ||
            std::ranges::find(kGone, columns[kFeatureCode]) != kGone.end() ||
            columns[kName].size() > limits::kLongestName) {
            return;
        }
        auto name = cleanText(columns[kName]);
        if (name.empty()) return;
        if (++towns_ <= limits::kMostTowns) town_({.position = *position, .name = std::move(name)});
    }

    std::expected<void, std::string> finish() const {
        if (places_ == 0) return std::unexpected("no line of it is a place of a gazetteer");
        if (towns_ > limits::kMostTowns) {
            return std::unexpected(fmt::format("more than {} towns", limits::kMostTowns));
        }
        return {};
    }

  private:
    const std::function<void(Town&&)>& town_;
    std::uint64_t places_ = 0;
    std::uint64_t towns_ = 0;
};

}  // namespace

std::expected<void, std::string> readGazetteer(const ReadBlock& read,
                                               const std::function<void(Town&&)>& town) {
    Gazetteer gazetteer(town);
    std::vector<char> block(limits::kBlockSize);
    std::string pending;
    bool isTooLong = false;
    while (true) {
        const auto count = read(block);
        if (!count) return std::unexpected(count.error());
        if (*count == 0) break;
        std::string_view bytes(block.data(), *count);
        for (auto end = bytes.find('\n'); end != std::string_view::npos; end = bytes.find('\n')) {
            pending += bytes.substr(0, end);
            if (!isTooLong) gazetteer.line(pending);
            isTooLong = false;
            pending.clear();
            bytes.remove_prefix(end + 1);
        }
        pending += bytes;
        if (pending.size() > limits::kLongestToken) {
            isTooLong = true;
            pending.clear();
        }
    }
    if (!isTooLong && !pending.empty()) gazetteer.line(pending);
    return gazetteer.finish();
}

}  // namespace keepsakes
