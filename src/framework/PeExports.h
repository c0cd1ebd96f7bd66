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

// The same over an image whose bytes are fetched on demand: fetch(offset, into) fills into with the
// bytes at offset and returns how many it gave, fewer only at the end of the file. Only the pages
// that hold the headers, the export directory and the names are fetched; the file's size is never
// asked for (a reference past the end shows as a short fetch).
using ImageFetch = std::function<std::size_t(std::uint64_t offset, std::span<unsigned char> into)>;
void ReadExportNames(const ImageFetch& fetch, StringVector& names);

// Reads the export names from the file's headers and export table only. A file that cannot be
// opened or read raises the mapped file error.
void ReadDLLExports(std::string_view path, StringVector& names);

}  // namespace sm
