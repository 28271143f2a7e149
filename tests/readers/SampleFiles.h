// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>
#include <string_view>

#include "readers/FileReaders.h"

namespace keepsakes {

/// 2024-06-20: files of that week are read.
inline const ReaderContext kReadOn{parseISO8601("2024-06-20")->date};

/// What the reader of the file's kind (by `kindOf`) makes of the bytes; the error otherwise.
std::expected<FileRecords, std::string> readBytes(std::string_view bytes);

/// The records, or "error: <text>", as one line a record.
std::string told(const std::expected<FileRecords, std::string>& records);

/// The metadata that `photo` makes up, in the three forms that exiv2 writes into an image.
struct SampleMetadata {
    std::string time;  ///< EXIF DateTimeOriginal.
    std::string offset;
    std::string gpsDay;
    std::string gpsTime;    ///< Rationals, "14/1 27/1 7/1".
    std::string latitude;   ///< Rationals; north.
    std::string longitude;  ///< Rationals; east.
    std::string xmp;        ///< What stands inside rdf:Description.
    std::string keyword;    ///< IPTC.
};

enum class ImageForm { jpeg, png, heif };

/// A tiny image with that metadata. HEIF holds no IPTC block.
std::string photo(const SampleMetadata& metadata, ImageForm form = ImageForm::jpeg);

}  // namespace keepsakes
