// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <unistd.h>

#include <sstream>
#include <string>
#include <vector>

#include "indexer/FileReader.h"

namespace keepsakes {

/// Reads what a test writes, a record a line:
///     workout START END ACTIVITY      photo TAKEN [LATITUDE LONGITUDE]
///     zone START END OFFSET           local TAKEN LOCAL          (a photo by the owner's zone)
///     word WORD, keyword WORD         (an inference, a keyword of the photo before)
///     point TIME LATITUDE LONGITUDE       still FROM TO LATITUDE LONGITUDE    (a point a minute)
///     visit START END LATITUDE LONGITUDE [NAME]       place LATITUDE LONGITUDE NAME
///     broken REASON
/// A file that begins with anything else is of another kind.
class TextReader : public FileReader {
  public:
    std::expected<std::optional<FileRecords>, std::string> read(int fd, int, const ReaderContext&,
                                                                LocationSink& places,
                                                                PeopleSink&) override {
        std::string content(65536, '\0');
        const auto count = ::pread(fd, content.data(), content.size(), 0);
        content.resize(count > 0 ? static_cast<std::size_t>(count) : 0);
        reads.push_back(content);
        return parse(content, places);
    }

    std::vector<std::string> reads;  ///< The content of each file read, in order.

  protected:
    static std::expected<std::optional<FileRecords>, std::string> parse(const std::string& content,
                                                                        LocationSink& places) {
        FileRecords records;
        std::istringstream lines(content);
        for (std::string line; std::getline(lines, line);) {
            std::istringstream in(line);
            std::string word;
            in >> word;
            if (word == "workout") {
                auto& workout = records.workouts.emplace_back();
                in >> workout.start.seconds >> workout.end.seconds >> workout.activityType;
            } else if (word == "photo" || word == "local") {
                auto& photo = records.photos.emplace_back();
                photo.timeSource = word == "photo" ? TimeSource::offset : TimeSource::ownerZone;
                in >> photo.taken.seconds;
                photo.localTime = photo.taken;
                if (word == "local") in >> photo.localTime.seconds;
                GeoPoint place;
                if (in >> place.latitude >> place.longitude) photo.position = place;
            } else if (word == "zone") {
                auto& zone = records.zones.emplace_back();
                in >> zone.span.start.seconds >> zone.span.end.seconds >> zone.offsetSeconds;
            } else if (word == "word") {
                in >> records.photos.back().inferences.emplace_back();
            } else if (word == "keyword") {
                in >> records.photos.back().keywords.emplace_back();
            } else if (word == "point" || word == "still") {
                TrackPoint point;
                in >> point.time.seconds;
                auto last = point.time;
                if (word == "still") in >> last.seconds;
                in >> point.position.latitude >> point.position.longitude;
                for (; point.time <= last; point.time = point.time + 60) places.point(point);
            } else if (word == "visit") {
                StatedVisit visit;
                in >> visit.stay.start.seconds >> visit.stay.end.seconds >>
                    visit.position.latitude >> visit.position.longitude >> visit.name;
                places.visit(visit);
            } else if (word == "place") {
                NamedPlace place;
                in >> place.position.latitude >> place.position.longitude >> place.name;
                places.place(place);
            } else if (word == "broken") {
                return std::unexpected(line.substr(7));
            } else {
                return std::nullopt;
            }
        }
        return records;
    }
};

}  // namespace keepsakes
