// SPDX-License-Identifier: Apache-2.0
#include "linux/PropertyListDefaults.h"

#include <fmt/format.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <ctime>
#include <utility>

#include "core/Files.h"
#include "core/Log.h"
#include "core/PropertyList.h"

namespace keepsakes {

namespace {

constexpr std::int64_t kNanoseconds = 1'000'000'000;
constexpr std::size_t kLongestName = 200;

/// Times of files advance in steps (of the kernel's tick, or of two seconds on the coarsest file
/// systems): within one step a second write may leave the same stamp as the first.
constexpr std::int64_t kCoarsestStep = 2 * kNanoseconds;

bool isDomainName(std::string_view name) {
    constexpr std::string_view kAllowed =
        "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789.-_";
    return !name.empty() && name.size() <= kLongestName && !name.starts_with('.') &&
           name.find_first_not_of(kAllowed) == std::string_view::npos;
}

std::int64_t nanoseconds(const timespec& time) {
    return static_cast<std::int64_t>(time.tv_sec) * kNanoseconds + time.tv_nsec;
}

std::int64_t fileClockNow() {
    timespec now{};
    clock_gettime(CLOCK_REALTIME_COARSE, &now);
    return nanoseconds(now);
}

}  // namespace

PropertyListDefaults::PropertyListDefaults(std::filesystem::path folder)
    : folder_(std::move(folder)) {}

PropertyListDefaults::Stamp PropertyListDefaults::stampOf(const std::filesystem::path& file) {
    struct stat info {};
    if (::stat(file.c_str(), &info) != 0) return {};
    return {info.st_dev, info.st_ino, info.st_size, nanoseconds(info.st_mtim),
            nanoseconds(info.st_ctim)};
}

std::filesystem::path PropertyListDefaults::fileOf(std::string_view domain) const {
    return folder_ / fmt::format("{}.plist", domain);
}

const PropertyListDefaults::Domain& PropertyListDefaults::upToDate(std::string_view domain) const {
    const auto file = fileOf(domain);
    auto& known = domains_[std::string(domain)];
    // Taken before the read: a write that comes between the two is seen by the next caller.
    const auto stamp = stampOf(file);
    if (known.settled && known.stamp == stamp) return known;

    const bool changed = known.stamp != stamp;
    auto read = readPropertyListFile(file);
    known.stamp = stamp;
    const auto newest = std::max(stamp.modifiedNanoseconds, stamp.changedNanoseconds);
    known.settled = std::abs(fileClockNow() - newest) > kCoarsestStep;
    const bool missing =
        !read && read.error().domain == kPosixErrorDomain && read.error().code == ENOENT;
    const bool wasBroken = known.error.has_value();
    known.error = std::nullopt;
    known.values.clear();
    if (read) {
        known.values = std::move(*read);
    } else if (!missing) {
        known.error = std::move(read.error());
        if (changed || !wasBroken) {
            logWarning(fmt::format("user defaults of {} are not readable: {} ({})", domain,
                                   known.error->description(), file.string()));
        }
    }
    return known;
}

KSValue PropertyListDefaults::object(std::string_view domain, std::string_view key) const {
    if (!isDomainName(domain)) return {};
    const std::lock_guard lock(mutex_);
    return valueForKey(upToDate(domain).values, key);
}

OptionalError PropertyListDefaults::setObject(std::string_view domain, std::string_view key,
                                              const KSValue& value) {
    if (!isDomainName(domain)) {
        return KSError::make(kPosixErrorDomain, EINVAL,
                             fmt::format("\"{}\" is not the name of a domain", domain));
    }
    const std::lock_guard lock(mutex_);
    const auto& known = upToDate(domain);
    if (known.error) return known.error;
    auto values = known.values;
    if (value.isNull()) {
        values.erase(std::string(key));
    } else {
        values.insert_or_assign(std::string(key), value);
    }
    if (values == known.values) return std::nullopt;
    if (auto error = makePrivateFolder(folder_)) return error;
    return writePropertyListFile(fileOf(domain), values);
}

}  // namespace keepsakes
