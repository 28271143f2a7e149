// SPDX-License-Identifier: Apache-2.0
#include "devicedata/MailboxRole.h"

#include <algorithm>
#include <array>
#include <string>

#include "core/Text.h"

namespace keepsakes {

namespace {

struct RoleName {
    std::string_view name;
    MailboxRole role;
};

// Names as mail programs give them, in lower case; of those with accents also the form that IMAP
// servers keep on disk (RFC 3501, 5.1.3).
constexpr auto kNames = std::to_array<RoleName>({
    {"sent", MailboxRole::sent},
    {"sent mail", MailboxRole::sent},
    {"sent-mail", MailboxRole::sent},
    {"sent items", MailboxRole::sent},
    {"sent messages", MailboxRole::sent},
    {"outbox-sent", MailboxRole::sent},
    {"gesendet", MailboxRole::sent},
    {"gesendete objekte", MailboxRole::sent},
    {"gesendete elemente", MailboxRole::sent},
    {"envoyés", MailboxRole::sent},
    {"envoy&aok-s", MailboxRole::sent},
    {"éléments envoyés", MailboxRole::sent},
    {"enviados", MailboxRole::sent},
    {"elementos enviados", MailboxRole::sent},
    {"inviati", MailboxRole::sent},
    {"posta inviata", MailboxRole::sent},
    {"verzonden", MailboxRole::sent},
    {"verzonden items", MailboxRole::sent},
    {"drafts", MailboxRole::drafts},
    {"draft", MailboxRole::drafts},
    {"templates", MailboxRole::drafts},
    {"outbox", MailboxRole::drafts},
    {"unsent messages", MailboxRole::drafts},
    {"entwürfe", MailboxRole::drafts},
    {"entw&apw-rfe", MailboxRole::drafts},
    {"postausgang", MailboxRole::drafts},
    {"brouillons", MailboxRole::drafts},
    {"borradores", MailboxRole::drafts},
    {"bozze", MailboxRole::drafts},
    {"concepten", MailboxRole::drafts},
    {"junk", MailboxRole::junk},
    {"junk mail", MailboxRole::junk},
    {"junk e-mail", MailboxRole::junk},
    {"spam", MailboxRole::junk},
    {"bulk mail", MailboxRole::junk},
    {"trash", MailboxRole::junk},
    {"deleted items", MailboxRole::junk},
    {"deleted messages", MailboxRole::junk},
    {"papierkorb", MailboxRole::junk},
    {"gelöschte elemente", MailboxRole::junk},
    {"corbeille", MailboxRole::junk},
    {"papelera", MailboxRole::junk},
    {"cestino", MailboxRole::junk},
    {"prullenbak", MailboxRole::junk},
});

MailboxRole roleOfName(std::string_view name) {
    auto plain = lowerCased(name);
    if (plain.ends_with(".mbox")) plain.resize(plain.size() - 5);
    // Maildir++ joins the folders with dots; IMAP servers put a namespace in front.
    const auto last = std::string_view(plain).substr(plain.rfind('.') + 1);
    const auto* const found = std::ranges::find_if(kNames, [&plain, last](const RoleName& known) {
        return known.name == plain || known.name == last;
    });
    return found == kNames.end() ? MailboxRole::other : found->role;
}

/// The flags of a Maildir file's name, "unique:2,FLAGS" (cr.yp.to/proto/maildir.html).
bool hasFlag(std::string_view name, char flag) {
    const auto info = name.rfind(":2,");
    return info != std::string_view::npos && name.find(flag, info + 3) != std::string_view::npos;
}

}  // namespace

MailboxRole mailboxRole(std::string_view path) {
    auto slash = path.rfind('/');
    const auto name = path.substr(slash + 1);
    if (hasFlag(name, 'D')) return MailboxRole::drafts;
    if (const auto role = roleOfName(name); role != MailboxRole::other) return role;
    // The folder, and when that is a part of a Maildir, the Maildir; beyond, a Gmail-like parent
    // such as "[Gmail]/Sent Mail" needs no more.
    for (int level = 0; level < 2 && slash != std::string_view::npos; ++level) {
        path = path.substr(0, slash);
        slash = path.rfind('/');
        const auto folder = path.substr(slash + 1);
        if (const auto role = roleOfName(folder); role != MailboxRole::other) return role;
        if (folder != "cur" && folder != "new") break;
    }
    return MailboxRole::other;
}

bool isFlaggedMail(std::string_view name) { return hasFlag(name, 'F'); }

bool isTrashedMail(std::string_view name) { return hasFlag(name, 'T'); }

InteractionMechanism mechanismIn(MailboxRole role, InteractionMechanism mechanism) {
    if (mechanism != InteractionMechanism::mail) return mechanism;
    if (role == MailboxRole::drafts) return InteractionMechanism::unsentMessage;
    return role == MailboxRole::junk ? InteractionMechanism::bulkMail : mechanism;
}

}  // namespace keepsakes
