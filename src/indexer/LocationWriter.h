// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <exception>
#include <functional>
#include <list>
#include <utility>

#include "indexer/DayPoints.h"
#include "indexer/IndexWriter.h"
#include "readers/LocationRecords.h"

namespace keepsakes {

// What one file may hold; the rest is left out.
inline constexpr std::uint64_t kMostStatedVisits = 50000;
inline constexpr std::uint64_t kMostNamedPlaces = 20000;
/// A stay that a file states for more seconds than 31 days is none.
inline constexpr double kLongestStatedVisit = 31 * kDay;

/// Takes what the file being read tells of places into the index, inside its pending changes, a day
/// of points at a time: memory does not grow with the file. Lives with the scan, on its thread.
class LocationWriter final : public LocationSink {
  public:
    /// `alive` is called now and then while points come in.
    LocationWriter(IndexWriter& index, std::function<void()> alive)
        : index_(index), alive_(std::move(alive)) {}

    /// What comes from now on is the file's, in place of what it had.
    void begin(std::int64_t file);
    /// The file is read: everything is in the index. Throws what went wrong with the index while
    /// the file was read, for a reader is not made for exceptions of its sink.
    void finish();

    void point(const TrackPoint& point) override;
    void visit(StatedVisit visit) override;
    void place(NamedPlace place) override;

  private:
    struct OpenDay {
        std::int64_t day;
        DayPoints points;
    };
    /// Days that grow at the same time, for files that are not in order; beyond it the one that has
    /// waited longest is written.
    static constexpr std::size_t kMostOpenDays = 32;

    DayPoints& dayOf(KSDate time);
    void write(OpenDay& day);
    template <class Work>
    void guarded(const Work& work);

    IndexWriter& index_;
    const std::function<void()> alive_;
    std::int64_t file_ = 0;
    std::list<OpenDay> days_;  ///< The one that grew last comes first.
    std::uint64_t points_ = 0;
    std::uint64_t visits_ = 0;
    std::uint64_t namedPlaces_ = 0;
    std::exception_ptr failure_;
};

}  // namespace keepsakes
