// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <filesystem>
#include <map>
#include <mutex>
#include <string>

#include "platform/UserDefaults.h"

namespace keepsakes {

/// The user defaults store as one property list a domain, "<folder>/<domain>.plist", which any
/// program may replace at any time. Any thread may call it; it waits for the disk and nothing else.
/// A file is read again when its device, inode, size, or times differ from the last read. One that
/// cannot be read or is damaged answers null for every key, is logged once per change of the file,
/// and is never overwritten: setting a key in it is an error.
///
/// A domain's name consists of ASCII letters, digits, '.', '-' and '_', does not begin with '.' and
/// is at most 200 bytes long; another name is an error in `setObject` and null in `object`.
class PropertyListDefaults final : public UserDefaults {
  public:
    /// The folder is made, with mode 0700, by the first write.
    explicit PropertyListDefaults(std::filesystem::path folder);

    KSValue object(std::string_view domain, std::string_view key) const override;

    /// A change by another program between this call's read and its write is lost; two callers in
    /// this process never lose each other's.
    OptionalError setObject(std::string_view domain, std::string_view key,
                            const KSValue& value) override;

  private:
    /// What tells one state of a file from another; all zero for a file that does not exist.
    struct Stamp {
        std::uint64_t device = 0;
        std::uint64_t inode = 0;
        std::int64_t size = 0;
        std::int64_t modifiedNanoseconds = 0;
        std::int64_t changedNanoseconds = 0;
        friend bool operator==(const Stamp&, const Stamp&) = default;
    };
    struct Domain {
        Stamp stamp;
        KSDictionary values;
        OptionalError error;
        bool settled = false;  // the stamp is old enough that a later write must change it
    };

    static Stamp stampOf(const std::filesystem::path& file);
    std::filesystem::path fileOf(std::string_view domain) const;
    const Domain& upToDate(std::string_view domain) const;

    const std::filesystem::path folder_;
    mutable std::mutex mutex_;
    mutable std::map<std::string, Domain, std::less<>> domains_;  // under mutex_
};

}  // namespace keepsakes
