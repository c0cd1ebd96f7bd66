// Export names of a 64-bit PE image, read from its bytes without loading it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <span>
#include <string_view>

#include "framework/String.h"

namespace sm {

// Fills names (sorted, without duplicates) with the export names that begin with a letter or "_".
// A 32-bit image or one without an export directory gives no names. A header, section or name
// reference outside the bytes raises TE_BAD_FILE_FORMAT from "ReadDLLExports".
void ReadExportNames(std::span<const unsigned char> image, StringVector& names);

// The same over an image of imageSize bytes that are fetched on demand: fetch(offset, into) fills
// into with the bytes at offset (never past the end), so only the headers, the export directory
// and the names are ever read.
using ImageFetch = std::function<void(std::uint64_t offset, std::span<unsigned char> into)>;
void ReadExportNames(std::uint64_t imageSize, const ImageFetch& fetch, StringVector& names);

// Reads the export names from the file's headers and export table only. A file that cannot be
// opened or read raises the mapped file error.
void ReadDLLExports(std::string_view path, StringVector& names);

}  // namespace sm
