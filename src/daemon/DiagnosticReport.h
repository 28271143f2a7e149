// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>
#include <vector>

#include "core/KSDate.h"
#include "core/WorkQueue.h"

namespace keepsakes {

class KSDaemonUniverse;
struct DaemonStatus;

/// Writes to the log what there is to know about the running daemon: every service, queue and
/// count. It waits for no service, and for the counts no longer than five seconds, so that it tells
/// of a daemon that is stuck as well. Owned by `main`; the registry outlives it.
class DiagnosticReport final {
  public:
    explicit DiagnosticReport(const KSDaemonUniverse& universe);

    /// Announces that a report has started, and writes it a little later. Any thread.
    void start();

  private:
    void write();
    std::vector<std::string> daemonLines() const;
    std::vector<std::string> deviceLines() const;
    std::vector<std::string> serviceLines() const;
    static std::vector<std::string> queueLines();
    std::vector<std::string> countLines() const;

    const KSDaemonUniverse& universe_;
    const KSDate startedAt_;
    WorkQueue queue_{"DiagnosticReport"};
};

}  // namespace keepsakes
