// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string_view>

#include "platform/InteractionStore.h"

namespace keepsakes {

/// What a mailbox is for, by its name (column "mailbox" of "files").
enum class MailboxRole : int { other = 0, sent = 1, drafts = 2, junk = 3 };

/// By the names of the file and of the folders that it lies in: a Maildir or a folder above it, a
/// Maildir++ folder (".Sent"), or an mbox file may be named like what is sent, drafted or junk, in
/// English, German, French, Spanish, Italian or Dutch. A Maildir file flagged as a draft is one.
MailboxRole mailboxRole(std::string_view path);

/// Whether a Maildir file of this name is flagged as important to the owner, or as deleted.
bool isFlaggedMail(std::string_view name);
bool isTrashedMail(std::string_view name);

/// The mechanism of a mail that lies in such a mailbox.
InteractionMechanism mechanismIn(MailboxRole role, InteractionMechanism mechanism);

}  // namespace keepsakes
