// SPDX-License-Identifier: Apache-2.0
#include "readers/FitReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <optional>
#include <vector>

#include "platform/ActivityCatalogue.h"
#include "readers/ActivityWords.h"
#include "readers/FitMessages.h"
#include "readers/FitSports.h"
#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/StatedPlaces.h"
#include "readers/TrackSummary.h"

namespace keepsakes {

namespace {

// Profile of the FIT SDK: numbers of messages, and below of their fields.
constexpr std::uint16_t kFileIdMessage = 0;
constexpr std::uint16_t kSportMessage = 12;
constexpr std::uint16_t kSessionMessage = 18;
constexpr std::uint16_t kRecordMessage = 20;
constexpr std::uint16_t kActivityMessage = 34;

constexpr std::int64_t kActivityFile = 4;

struct Session {
    KSDateInterval span;
    std::optional<std::int64_t> sport;
    std::optional<std::int64_t> subSport;
};

std::optional<double> scaled(std::optional<std::int64_t> value, double by) {
    if (!value) return std::nullopt;
    return static_cast<double>(*value) * by;
}

class FitFile final : public FitHandler {
  public:
    FitFile(const ReaderContext& context, LocationSink& places)
        : now_(context.now), places_(places), times_(context.now) {}

    void startFile() override {
        isActivity_ = true;
        isClosed_ = false;
        track_ = TrackSummary(true);
        sessions_.clear();
        sport_.reset();
        subSport_.reset();
        span_.reset();
        offset_.reset();
    }

    void message(const FitMessage& message) override {
        switch (message.number()) {
            case kFileIdMessage:
                // Courses and workouts are plans; what monitors write is none of an activity.
                isActivity_ = message.integer(0).value_or(kActivityFile) == kActivityFile;
                break;
            case kSportMessage:
                sport_ = message.integer(0);
                subSport_ = message.integer(1);
                break;
            case kSessionMessage:
                isClosed_ = true;
                session(message);
                break;
            case kRecordMessage:
                if (isActivity_) record(message);
                break;
            case kActivityMessage:
                isClosed_ = true;
                zone(message);
                break;
            default:
                break;
        }
    }

    bool isClosed() const override { return isClosed_; }

    void endFile() override {
        if (!isActivity_) return;
        if (span_ && offset_) addZone(records_.zones, *span_, *offset_);
        if (sessions_.size() > 1) return endSessions();
        if (!sessions_.empty()) {
            sport_ = sessions_[0].sport;
            subSport_ = sessions_[0].subSport;
            track_.addLap(sessions_[0].span);
        }
        if (sport_ == kFitTransition) return;
        track_.setType(wordOfFitSport(sport_, subSport_));
        if (const auto workout = track_.workout()) add(*workout);
    }

    std::expected<FileRecords, std::string> finish() {
        if (tooMany_) {
            return std::unexpected(fmt::format("more than {} workouts", limits::kMostWorkouts));
        }
        if (auto complaint = times_.complaint()) return std::unexpected(std::move(*complaint));
        return std::move(records_);
    }

  private:
    void record(const FitMessage& message) {
        constexpr double kSemicircle = 180.0 / 2147483648.0;
        constexpr double kCentimetre = 0.01;
        if (!message.rawTime()) return;
        const auto stated = message.time();
        const auto time =
            times_.take(stated ? std::optional<ParsedDate>({*stated, std::nullopt}) : std::nullopt);
        if (!time) return;
        const auto position = geoPoint(scaled(message.integer(0), kSemicircle),
                                       scaled(message.integer(1), kSemicircle));
        widen({time->date, time->date});
        track_.addPoint({.time = time->date,
                         .position = position,
                         .distance = scaled(message.integer(5), kCentimetre)});
        if (!position) return;
        const auto accuracy = message.integer(31);  // metres
        places_.point({time->date, *position, accuracyOf({.number = scaled(accuracy, 1)})});
    }

    void session(const FitMessage& message) {
        constexpr double kMillisecond = 0.001;
        const auto start = message.date(2);
        auto end = message.time();
        if (const auto elapsed = message.integer(7); elapsed && start) {
            end = *start + static_cast<double>(*elapsed) * kMillisecond;
        }
        if (!start || !end || *end <= *start || *end - *start > limits::kLongestWorkout) return;
        if (!limits::isSane(*start, now_) || !limits::isSane(*end, now_)) return;
        if (sessions_.size() == limits::kMostWorkouts) {
            tooMany_ = true;
            return;
        }
        widen({*start, *end});
        sessions_.push_back({{*start, *end}, message.integer(5), message.integer(6)});
    }

    /// Local time stands beside the timestamp; zones differ by quarters of an hour.
    void zone(const FitMessage& message) {
        constexpr double kQuarter = 900;
        const auto time = message.time();
        const auto local = message.date(5);
        if (!time || !local) return;
        const double quarters = (*local - *time) / kQuarter;
        // UTC is also what devices write that know no zone.
        if (quarters == 0 || quarters != std::round(quarters)) return;
        if (std::abs(*local - *time) > 86400) return;
        offset_ = static_cast<int>(*local - *time);
    }

    void endSessions() {
        for (const auto& session : sessions_) {
            if (session.sport == kFitTransition) continue;
            const auto word = activityOfWord(wordOfFitSport(session.sport, session.subSport));
            if (word.meaning == ActivityWord::Meaning::transport) continue;
            // The profile of speed is that of all sessions together and tells nothing of one.
            const int code = word.meaning == ActivityWord::Meaning::activity
                                 ? word.code
                                 : activityCode("Other").value();
            add({session.span.start, session.span.end, code});
        }
    }

    void add(const WorkoutSample& workout) {
        tooMany_ = tooMany_ || records_.workouts.size() == limits::kMostWorkouts;
        if (!tooMany_) records_.workouts.push_back(workout);
    }

    void widen(KSDateInterval by) {
        if (!span_) span_ = by;
        span_->start = std::min(span_->start, by.start);
        span_->end = std::max(span_->end, by.end);
    }

    KSDate now_;
    LocationSink& places_;
    TimeTally times_;
    FileRecords records_;
    bool tooMany_ = false;

    // Of the file that is read, of several behind one another.
    bool isActivity_ = true;
    bool isClosed_ = false;
    TrackSummary track_{true};
    std::vector<Session> sessions_;
    std::optional<std::int64_t> sport_;
    std::optional<std::int64_t> subSport_;
    std::optional<KSDateInterval> span_;
    std::optional<int> offset_;
};

}  // namespace

std::expected<FileRecords, std::string> readFit(const ReadBlock& read, const ReaderContext& context,
                                                LocationSink& places) {
    FitFile file(context, places);
    if (auto done = readFitMessages(read, file); !done) {
        return std::unexpected(std::move(done.error()));
    }
    return file.finish();
}

std::expected<FileRecords, std::string> readFitFile(int fd, const ReaderContext& context,
                                                    LocationSink& places) {
    return readFit(readDescriptor(fd), context, places);
}

}  // namespace keepsakes
