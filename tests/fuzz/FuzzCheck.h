// What the fuzz targets share: a failed property stops the run; the mode byte picks the code page.
#pragma once

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string_view>

#include "framework/CodePage.h"

namespace sm::fuzz {

[[noreturn]] inline void Fail(const char* target, const char* what, std::string_view detail = {}) {
    std::fprintf(stderr, "%s: %s '%.*s'\n", target, what, static_cast<int>(detail.size()), detail.data());
    std::abort();
}

// Bit 0 of the mode byte: the double-byte code page 932 instead of 1252.
inline void SelectCodePage(std::uint8_t mode) { SetMultiByteCodePage(mode & 1 ? 932 : 1252); }

}  // namespace sm::fuzz
