// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <string_view>

#include "core/KSValue.h"

namespace keepsakes {

inline constexpr std::string_view KSErrorDomain = "KSErrorDomain";
/// Errors of the SQLite engine; the code is SQLite's extended result code.
inline constexpr std::string_view kSQLiteErrorDomain = "SQLiteErrorDomain";
/// Errors of the operating system; the code is an errno.
inline constexpr std::string_view kPosixErrorDomain = "POSIXErrorDomain";
inline constexpr std::string_view kLocalizedDescriptionKey = "localizedDescription";

/// Codes of `KSErrorDomain`.
enum class KSErrorCode : int {
    trendAnalysisFailed = 0,
    analyticsPlansUnavailable = 5,
    invalidParameter = 7,
    waitTimedOut = 15,
    databaseUnavailable = 16,
};

/// A failure that can happen, as a value: domain, code and user info with a description.
struct KSError {
    std::string domain;
    int code = 0;
    KSDictionary userInfo;

    static KSError make(KSErrorCode code, std::string_view description);
    static KSError make(std::string_view domain, int code, std::string_view description);

    /// The description for people, or domain and code when the user info has none.
    std::string description() const;

    friend bool operator==(const KSError&, const KSError&) = default;
};

using OptionalError = std::optional<KSError>;

/// What an operation reports: an error or none, and its result dictionary.
using ResultHandler = std::function<void(OptionalError, KSDictionary)>;

/// The error for a rejected argument: code 7, "Invalid parameter not satisfying: <condition>".
KSError KSErrorInvalidParameterCreate(std::string_view condition);

}  // namespace keepsakes
