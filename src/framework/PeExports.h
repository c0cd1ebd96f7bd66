// Export names of a 64-bit PE image, read from its bytes without loading it.
#pragma once

#include <cstddef>
#include <span>
#include <string_view>

#include "framework/String.h"

namespace sm {

// Fills names (sorted, without duplicates) with the export names that begin with a letter or "_".
// A 32-bit image or one without an export directory gives no names. A header, section or name
// reference outside the bytes raises TE_BAD_FILE_FORMAT from "ReadDLLExports".
void ReadExportNames(std::span<const unsigned char> image, StringVector& names);

// Maps the file read-only and reads its export names; the mapping is always released. A file that
// cannot be opened raises the mapped file error.
void ReadDLLExports(std::string_view path, StringVector& names);

}  // namespace sm
