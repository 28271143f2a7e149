// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <functional>
#include <memory>

#include "core/KSValue.h"
#include "model/KSEvent.h"
#include "trends/TrendFindings.h"

namespace keepsakes {

class KSVitalsManager;
struct PlatformServices;

/// Compares yesterday with the four weeks before it, one plan at a time, and records what it finds
/// as a trends event: provider "Post Analytics", the plan's category, and a dictionary with the
/// plan, the summaries and the verdict. Made for one run and owned by whoever runs it, on that
/// one's queue; handlers are called before an operation returns. The platform must outlive it.
class KSTrendsAnalyzer {
  public:
    /// The trends event, when there is one, and the verdict.
    using ResultHandler = std::function<void(const KSEventPointer&, KSTrendsVerdict)>;
    /// The trends events, and each plan's verdict (an integer) under its keyword.
    using Handler = std::function<void(KSEventArray, KSDictionary)>;

    /// The vitals manager, which only metrics need, may be missing.
    KSTrendsAnalyzer(const PlatformServices& platform,
                     std::shared_ptr<KSVitalsManager> vitalsManager);
    ~KSTrendsAnalyzer();
    KSTrendsAnalyzer(const KSTrendsAnalyzer&) = delete;
    KSTrendsAnalyzer& operator=(const KSTrendsAnalyzer&) = delete;

    /// Today's.
    KSTrendsAnalyzerPlans buildAnalyticsPlans() const;

    /// Takes events of any kind in ascending order of start, the stored trends events among them.
    void analyzeEvents(const KSEventArray& events, const KSTrendsAnalyzerPlans& plans,
                       const Handler& handler) const;
    void analyzeEvents(const KSEventArray& events, const KSTrendsAnalyzerOptions& plan,
                       const ResultHandler& handler) const;

    /// A trends event of the plan that takes over identity and history of the stored one, if any.
    /// Nothing for a plan of every category: no event is of that.
    std::shared_ptr<KSEvent> eventWithOptions(const KSTrendsAnalyzerOptions& plan,
                                              const KSEventPointer& originalTrendsData) const;
    /// The first of the stored trends events that tells of the same plan, or none.
    static KSEventPointer lookupTrendsDataWithOptions(const KSTrendsAnalyzerOptions& plan,
                                                      const KSEventArray& events);

    static void updateTrendsData(KSDictionary& trends, const KSDictionary& prevTrendsData);
    /// `lastEventInterval` is that between the two newest events; the largest double for none. What
    /// is recorded is never longer than the time since the newest event of the run before.
    void updateTrendsData(KSDictionary& trends, KSDate lastEventDate,
                          double lastEventInterval) const;
    static void updateTrendsData(KSDictionary& trends, const KSTukeyOutlierDetector& model);
    static void updateTrendsData(KSDictionary& trends, KSTrendsVerdict result);

    /// For clients: 1 normal, 2 higher, 3 lower, 0 anything else.
    static int trendsfromAnalyticsResult(std::int64_t code);

    /// Sends one analytics event for each trends event. With leave to submit health data asks the
    /// vitals manager for the owner's age and sex first, and waits up to an hour for each.
    void sendMetricsForTrendsEvents(const KSEventArray& events) const;

    static constexpr double kVitalsWaitSeconds = 3600;

  private:
    KSDictionary setCommonFields() const;

    const PlatformServices& platform_;
    const std::shared_ptr<KSVitalsManager> vitalsManager_;
};

}  // namespace keepsakes
