// SPDX-License-Identifier: Apache-2.0
#include "model/ContactSummary.h"

#include <fmt/format.h>

#include <algorithm>

#include "platform/InteractionStore.h"

namespace keepsakes {

namespace {

bool isCall(const KSDictionary& interaction) {
    const auto number = valueForKey(interaction, "mechanism").asInteger();
    if (!number) return false;
    switch (static_cast<InteractionMechanism>(*number)) {
        case InteractionMechanism::phoneCall:
        case InteractionMechanism::videoCall:
        case InteractionMechanism::internetCall:
            return true;
        default:
            return false;
    }
}

std::string counted(std::size_t count, std::string_view what) {
    return fmt::format("{} {}{}", count, what, count == 1 ? "" : "s");
}

}  // namespace

std::string ContactSummary::countText() const {
    if (messages > 0 && calls > 0) {
        return fmt::format("{} and {}", counted(messages, "message"), counted(calls, "call"));
    }
    if (messages > 0) return counted(messages, "message");
    return calls > 0 ? counted(calls, "call") : std::string();
}

std::string ContactSummary::peopleText() const {
    return others == 0 || name.empty() ? name
                                       : fmt::format("{} and {}", name, counted(others, "other"));
}

ContactSummary contactSummaryOf(const KSEvent& event) {
    ContactSummary summary{.score = event.interactionContactScore};
    if (event.interactionScoredContact) {
        const auto* name = valueForKey(*event.interactionScoredContact, "name").asString();
        if (name) summary.name = *name;
    }
    if (!event.interactions) return summary;
    for (const auto& interaction : *event.interactions) {
        ++(isCall(interaction) ? summary.calls : summary.messages);
        // All interactions of an event are among the same people, the owner and the contact too.
        const auto* recipients = valueForKey(interaction, "recipients").asArray();
        const auto all = recipients ? recipients->size() + 1 : 0;
        summary.others = std::max(summary.others, all > 2 ? all - 2 : 0);
    }
    return summary;
}

}  // namespace keepsakes
