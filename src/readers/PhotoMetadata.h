// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <optional>
#include <string>
#include <vector>

#include "core/KSDate.h"
#include "readers/FileRecords.h"
#include "readers/PhotoTime.h"

namespace keepsakes {

/// What the blocks of a photo (EXIF, XMP, IPTC) say, gathered, before any rule is applied.
struct PhotoMetadata {
    std::optional<CameraTime> time;
    std::optional<GeoPoint> position;
    std::vector<std::string> keywords;  ///< A hierarchical one as its parts.
    std::vector<std::string> persons;
    std::vector<std::string> events;
    bool hasPetRegion = false;
};

/// Reads the metadata of an open JPEG, PNG or HEIF file; no pixel is decoded.
std::expected<PhotoMetadata, std::string> readPhotoMetadata(int fd);

}  // namespace keepsakes
