// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "devicedata/IndexFile.h"
#include "platform/InteractionStore.h"

namespace keepsakes {

/// Stands for the owner among the participants.
inline constexpr std::string_view kOwnerIdentifier = "OWNER";

/// The interaction store answered from the index of the owner's files. A message that several files
/// hold is one. The owner, under whatever address, is `kOwnerIdentifier` without a person; whoever
/// wrote to the owner's mailbox wrote to the owner. Each participant stands there once. Before the
/// first scan there are no interactions.
class IndexedInteractionStore final : public InteractionStore {
  public:
    explicit IndexedInteractionStore(std::filesystem::path index) : index_(std::move(index)) {}

    Interactions queryInteractions(const InteractionQuery& query) override;

  private:
    const IndexFile index_;
};

}  // namespace keepsakes
