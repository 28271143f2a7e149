// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <span>
#include <string>

#include "core/KSDate.h"
#include "indexer/IndexWriter.h"

namespace keepsakes {

/// Of so many mails in the mailboxes of what is sent, one must come from an address for it to be
/// the owner's.
inline constexpr double kSentMailsPerAddress = 10;
/// Scores are made anew after so many seconds, since they fade.
inline constexpr double kSecondsPerRanking = 12 * 3600.0;

/// Works out who is who from what the files tell: the owner's own handles (`ownerAddresses` of the
/// configuration, those that files name, and the senders of the sent mails), the people of the
/// address books, and how they rank. Does nothing when nothing changed since and the scores are
/// fresh; whether it did something.
bool updatePeople(IndexWriter& index, std::span<const std::string> ownerAddresses, KSDate now);

}  // namespace keepsakes
