// SPDX-License-Identifier: Apache-2.0
#include "indexer/DayPoints.h"

#include <algorithm>
#include <cmath>
#include <optional>
#include <tuple>

namespace keepsakes {

namespace {

constexpr std::size_t kStepsPerDay = 8640;
constexpr double kMillisecondsPerSecond = 1e3;
constexpr double kUnitsPerDegree = 1e7;
constexpr float kWorstAccuracy = 1e6F;

std::int64_t stepOf(KSDate time) {
    return static_cast<std::int64_t>(std::floor(time.seconds / kPointStep));
}

auto rank(const TrackPoint& point) {
    const float accuracy =
        std::isnan(point.accuracyMeters) ? kWorstAccuracy * 2 : point.accuracyMeters;
    return std::tuple(stepOf(point.time), accuracy, point.time.seconds, point.position.latitude,
                      point.position.longitude);
}

void putVarint(std::string& bytes, std::uint64_t value) {
    for (; value >= 0x80; value >>= 7U) bytes += static_cast<char>((value & 0x7FU) | 0x80U);
    bytes += static_cast<char>(value);
}

/// Small numbers of either sign become small ones without.
std::uint64_t zigzag(std::int64_t value) {
    return (static_cast<std::uint64_t>(value) << 1U) ^ static_cast<std::uint64_t>(value >> 63);
}
std::int64_t unzigzag(std::uint64_t value) {
    return static_cast<std::int64_t>(value >> 1U) ^ -static_cast<std::int64_t>(value & 1U);
}

class VarintReader {
  public:
    explicit VarintReader(std::string_view bytes) : bytes_(bytes) {}

    std::optional<std::uint64_t> next() {
        std::uint64_t value = 0;
        for (unsigned shift = 0; shift < 64 && !bytes_.empty(); shift += 7) {
            const auto byte = static_cast<unsigned char>(bytes_.front());
            bytes_.remove_prefix(1);
            value |= std::uint64_t{byte & 0x7FU} << shift;
            if (byte < 0x80) return value;
        }
        return std::nullopt;
    }

  private:
    std::string_view bytes_;
};

/// A point in whole units; `time` is milliseconds of its day.
struct Units {
    std::int64_t time = 0;
    std::int64_t latitude = 0;
    std::int64_t longitude = 0;
};

}  // namespace

std::int64_t utcDayOf(KSDate time) {
    return static_cast<std::int64_t>(std::floor(time.seconds / kDay));
}

KSDate startOfUtcDay(std::int64_t day) { return {static_cast<double>(day) * kDay}; }

void DayPoints::add(const TrackPoint& point) {
    if (!points_.empty() && stepOf(points_.back().time) == stepOf(point.time)) {
        if (rank(point) < rank(points_.back())) points_.back() = point;
        return;
    }
    points_.push_back(point);
    if (points_.size() > 2 * kStepsPerDay) compact();
}

void DayPoints::compact() {
    std::ranges::sort(points_, {}, rank);
    const auto rest = std::ranges::unique(
        points_, {}, [](const TrackPoint& point) { return stepOf(point.time); });
    points_.erase(rest.begin(), rest.end());
}

std::vector<TrackPoint> DayPoints::take() {
    compact();
    return std::exchange(points_, {});
}

std::string encodePoints(std::int64_t day, const std::vector<TrackPoint>& points) {
    std::string bytes;
    bytes.reserve(points.size() * 8);
    const auto start = startOfUtcDay(day);
    Units before;
    for (const auto& point : points) {
        const Units now{.time = std::llround((point.time - start) * kMillisecondsPerSecond),
                        .latitude = std::llround(point.position.latitude * kUnitsPerDegree),
                        .longitude = std::llround(point.position.longitude * kUnitsPerDegree)};
        putVarint(bytes, zigzag(now.time - before.time));
        putVarint(bytes, zigzag(now.latitude - before.latitude));
        putVarint(bytes, zigzag(now.longitude - before.longitude));
        putVarint(bytes, std::isnan(point.accuracyMeters)
                             ? 0
                             : static_cast<std::uint64_t>(std::lround(
                                   std::clamp(point.accuracyMeters, 0.0F, kWorstAccuracy))) +
                                   1);
        before = now;
    }
    return bytes;
}

void decodePoints(std::int64_t day, std::string_view bytes, DayPoints& points) {
    const auto start = startOfUtcDay(day);
    VarintReader reader(bytes);
    Units now;
    while (true) {
        const auto time = reader.next();
        const auto latitude = reader.next();
        const auto longitude = reader.next();
        const auto accuracy = reader.next();
        if (!time || !latitude || !longitude || !accuracy) return;
        now.time += unzigzag(*time);
        now.latitude += unzigzag(*latitude);
        now.longitude += unzigzag(*longitude);
        TrackPoint point{
            .time = start + static_cast<double>(now.time) / kMillisecondsPerSecond,
            .position = {.latitude = static_cast<double>(now.latitude) / kUnitsPerDegree,
                         .longitude = static_cast<double>(now.longitude) / kUnitsPerDegree}};
        if (*accuracy > 0) point.accuracyMeters = static_cast<float>(*accuracy - 1);
        points.add(point);
    }
}

}  // namespace keepsakes
