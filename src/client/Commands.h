// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "client/Console.h"

namespace keepsakes {

/// The commands of keepsakesctl. Each prints what it has to say and answers the exit status.

int showStatus(const Console& console);

/// What `events` and `bundles` are narrowed by, as typed.
struct FetchWords {
    std::string since;
    std::string until;
    std::string category;
    std::optional<std::uint64_t> limit;
    bool filtered = false;
    bool brief = false;  ///< Bundles without their events.
    bool descending = false;
};
int showEvents(const Console& console, const FetchWords& words);
int showBundles(const Console& console, const FetchWords& words);
/// In the stored events, or in a file's when one is given. `now` is for a daemon whose clock was
/// set; empty for this computer's.
int showTrends(const Console& console, const std::string& file, const std::string& now);

/// One of the operations that take nothing and answer nothing.
using Work = OptionalError (ConduitClient::*)();
int doWork(const Console& console, Work work);
/// Asks on the terminal first, unless `yes`.
int clearEvents(const Console& console, bool yes);

int storeFile(const Console& console, const std::string& file);
/// To standard output when `file` is empty or "-".
int exportRecords(const Console& console, const std::string& file);
int importRecords(const Console& console, const std::string& file);

/// An empty key reads the whole domain.
int readDefault(const Console& console, const std::string& domain, const std::string& key);
int writeDefault(const Console& console, const std::string& domain, const std::string& key,
                 const std::string& value);
int deleteDefault(const Console& console, const std::string& domain, const std::string& key);

}  // namespace keepsakes
