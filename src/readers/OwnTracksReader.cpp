// SPDX-License-Identifier: Apache-2.0
#include "readers/OwnTracksReader.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <optional>
#include <vector>

#include "readers/JsonStream.h"
#include "readers/Position.h"
#include "readers/ReaderLimits.h"
#include "readers/StatedPlaces.h"

namespace keepsakes {

namespace {

enum class OwnTracksPlace : std::uint8_t {
    document,
    ignored,
    type,
    latitude,
    longitude,
    time,
    accuracy,
    description,
};

/// One message of the device, as the recorder keeps it.
class Message final : public JsonPlaces<OwnTracksPlace> {
  public:
    std::string type;
    std::optional<double> latitude;
    std::optional<double> longitude;
    std::optional<ParsedDate> time;
    float accuracyMeters = std::numeric_limits<float>::quiet_NaN();
    std::string description;

  protected:
    OwnTracksPlace placeOf(OwnTracksPlace parent, std::string_view name) const override {
        if (parent != OwnTracksPlace::document) return OwnTracksPlace::ignored;
        if (name == "_type") return OwnTracksPlace::type;
        if (name == "lat") return OwnTracksPlace::latitude;
        if (name == "lon") return OwnTracksPlace::longitude;
        if (name == "tst") return OwnTracksPlace::time;
        if (name == "acc") return OwnTracksPlace::accuracy;
        if (name == "desc") return OwnTracksPlace::description;
        return OwnTracksPlace::ignored;
    }

    void enter(OwnTracksPlace) override {}
    void leave(OwnTracksPlace) override {}

    void take(OwnTracksPlace place, const JsonScalar& value) override {
        switch (place) {
            case OwnTracksPlace::type:
                type = value.text.value_or("");
                break;
            case OwnTracksPlace::latitude:
                latitude = value.asNumber();
                break;
            case OwnTracksPlace::longitude:
                longitude = value.asNumber();
                break;
            case OwnTracksPlace::time:
                time = timeOf(value);
                break;
            case OwnTracksPlace::accuracy:
                accuracyMeters = accuracyOf(value);
                break;
            case OwnTracksPlace::description:
                description = nameOf(value);
                break;
            default:
                break;
        }
    }
};

class Recording {
  public:
    Recording(const ReaderContext& context, LocationSink& places)
        : times_(context.now), places_(places) {}

    void line(std::string_view text) {
        if (text.ends_with('\r')) text.remove_suffix(1);
        if (text.empty()) return;
        ++lines_;
        const auto afterTime = text.find('\t');
        const auto afterKind = text.find('\t', std::min(afterTime, text.size() - 1) + 1);
        if (afterKind == std::string_view::npos) return;
        const auto recorded = parseISO8601(text.substr(0, afterTime));
        if (!recorded) return;
        Message message;
        // Not every message is one in JSON; a line may also be cut, when the recorder ended.
        if (readJson(text.substr(afterKind + 1), message)) tell(message, *recorded);
        ++readable_;
    }

    std::expected<FileRecords, std::string> finish() const {
        if (lines_ > 0 && readable_ == 0) {
            return std::unexpected("no line has a time, a kind and a message");
        }
        if (auto complaint = times_.complaint()) return std::unexpected(std::move(*complaint));
        return FileRecords{};
    }

  private:
    void tell(const Message& message, const ParsedDate& recorded) {
        const auto position = geoPoint(message.latitude, message.longitude);
        if (!position) return;
        if (message.type == "location" || message.type == "transition") {
            const auto time = times_.take(message.time ? message.time : recorded);
            if (time) places_.point({time->date, *position, message.accuracyMeters});
        } else if (message.type == "waypoint" && !message.description.empty()) {
            times_.addPlace();
            places_.place({.position = *position,
                           .name = message.description,
                           .use = useOfPlaceName(message.description)});
        }
    }

    TimeTally times_;
    LocationSink& places_;
    std::uint64_t lines_ = 0;
    std::uint64_t readable_ = 0;
};

/// Calls for each line, also for the last one without its end.
std::expected<void, std::string> readLines(const ReadBlock& read, Recording& recording) {
    std::vector<char> block(limits::kBlockSize);
    std::string line;
    while (true) {
        const auto count = read(block);
        if (!count) return std::unexpected(count.error());
        std::string_view rest(block.data(), *count);
        while (!rest.empty() || *count == 0) {
            const auto end = rest.find('\n');
            // A longer line is no location; cut, its message is none either.
            line += rest.substr(0, end).substr(0, limits::kLongestLine - line.size());
            if (end == std::string_view::npos && *count > 0) break;
            recording.line(line);
            line.clear();
            if (*count == 0) return {};
            rest.remove_prefix(end + 1);
        }
    }
}

}  // namespace

std::expected<FileRecords, std::string> readOwnTracks(const ReadBlock& read,
                                                      const ReaderContext& context,
                                                      LocationSink& places) {
    Recording recording(context, places);
    if (auto done = readLines(read, recording); !done) {
        return std::unexpected(std::move(done.error()));
    }
    return recording.finish();
}

std::expected<FileRecords, std::string> readOwnTracksFile(int fd, const ReaderContext& context,
                                                          LocationSink& places) {
    return readOwnTracks(readDescriptor(fd), context, places);
}

}  // namespace keepsakes
