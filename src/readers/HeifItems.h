// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <expected>
#include <string>

namespace keepsakes {

/// The metadata items of a HEIF file; empty where the file has none.
struct HeifItems {
    std::string exif;  ///< A TIFF block.
    std::string xmp;   ///< An XMP packet.
};

/// Finds the Exif and XMP items of an open file by its boxes (ISO/IEC 14496-12, 8.11: meta, iinf,
/// iloc; ISO/IEC 23008-12, annex A). Only the meta box and these items are read, within
/// `limits::kLargestMetaBox` and `limits::kLargestItem`, and no box is followed to any depth: exiv2
/// nests as deep as a file does, and keeps a copy of each box on the way.
std::expected<HeifItems, std::string> readHeifItems(int fd);

}  // namespace keepsakes
