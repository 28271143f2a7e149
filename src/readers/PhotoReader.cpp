// SPDX-License-Identifier: Apache-2.0
#include <fmt/ranges.h>

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

#include "readers/FileReaders.h"
#include "readers/PhotoMetadata.h"
#include "readers/PhotoTime.h"
#include "readers/PhotoWords.h"
#include "readers/ReaderLimits.h"
#include "readers/TextFolding.h"

namespace keepsakes {

namespace {

void addDistinct(std::vector<std::string>& names, std::string name) {
    if (name.empty() || names.size() >= limits::kMostNames) return;
    if (std::ranges::find(names, name) == names.end()) names.push_back(std::move(name));
}

/// The texts that can be a name, cleaned, each once.
std::vector<std::string> distinctNames(const std::vector<std::string>& texts) {
    std::vector<std::string> names;
    for (const auto& text : texts) {
        if (text.size() <= limits::kLongestName) addDistinct(names, cleanText(text));
    }
    return names;
}

}  // namespace

std::expected<FileRecords, std::string> readPhotoFile(int fd, const ReaderContext& context) {
    auto metadata = readPhotoMetadata(fd);
    if (!metadata) return std::unexpected(std::move(metadata.error()));
    if (!metadata->time) return std::unexpected("no capture time");
    const auto capture = resolveCaptureTime(*metadata->time);
    if (!limits::isSane(capture.taken, context.now)) {
        return std::unexpected(formatISO8601(capture.taken) + " as capture time is not believed");
    }

    PhotoRecord photo;
    photo.taken = capture.taken;
    photo.timeSource = capture.source;
    photo.localTime = metadata->time->local;
    photo.position = metadata->position;
    for (const auto& keyword : metadata->keywords) {
        if (keyword.size() > limits::kLongestName) continue;
        if (const auto word = inferenceOfKeyword(keyword)) {
            addDistinct(photo.inferences, std::string(*word));
        }
        if (const auto holiday = holidayOfKeyword(keyword)) {
            addDistinct(photo.holidays, std::string(*holiday));
        }
        addDistinct(photo.keywords,
                    fmt::format("{}", fmt::join(foldedTokens(keyword, keyword.size()), " ")));
    }
    if (metadata->hasPetRegion) addDistinct(photo.inferences, std::string(kInferencePet));
    photo.persons = distinctNames(metadata->persons);
    for (auto& event : distinctNames(metadata->events)) {
        photo.publicEvents.push_back({std::move(event), {}, {}});
    }
    FileRecords records;
    records.photos.push_back(std::move(photo));
    return records;
}

}  // namespace keepsakes
