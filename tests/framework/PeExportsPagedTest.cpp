// Export names read from pages fetched on demand: only the pages that hold headers, the export
// directory and the names are fetched, and a name that runs across a page boundary is read whole.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "framework/PeExports.h"

using namespace sm;

namespace {
void Put16(std::vector<unsigned char>& bytes, std::size_t at, std::uint32_t value) {
    bytes[at] = static_cast<unsigned char>(value);
    bytes[at + 1] = static_cast<unsigned char>(value >> 8);
}
void Put32(std::vector<unsigned char>& bytes, std::size_t at, std::uint32_t value) {
    for (int shift = 0; shift < 4; ++shift) bytes[at + shift] = static_cast<unsigned char>(value >> (8 * shift));
}

// A 256 KB image: headers at 0, one section whose raw bytes start at 0xBF00 (RVA 0x10000) with the
// export directory, two name pointers and two names, the second starting before 0xC000 (a page
// boundary: pages are 16 KB) and ending after it. Everything else is filler.
std::vector<unsigned char> StraddlingImage() {
    std::vector<unsigned char> image(0x40000, 0xCC);
    std::fill(image.begin(), image.begin() + 0x200, 0);
    const std::uint32_t pe = 0x80, optional = pe + 24, section = optional + 240, raw = 0xBF00, rva = 0x10000;
    Put16(image, 0, 0x5A4D);
    Put32(image, 0x3C, pe);
    Put32(image, pe, 0x00004550);
    Put16(image, pe + 6, 1);
    Put16(image, pe + 20, 240);
    Put16(image, optional, 0x20B);
    Put32(image, optional + 108, 16);
    Put32(image, optional + 112, rva);
    Put32(image, section + 8, 0x200);
    Put32(image, section + 12, rva);
    Put32(image, section + 16, 0x200);
    Put32(image, section + 20, raw);
    Put32(image, raw + 24, 2);         // two names
    Put32(image, raw + 32, rva + 40);  // name pointers right after the directory
    const char first[] = "drv_init";
    const std::uint32_t secondAt = 0xC000 - raw - 6;  // six bytes before the page boundary
    std::string second = "drv_close_with_a_long_name";
    Put32(image, raw + 40, rva + 48);
    Put32(image, raw + 44, rva + secondAt);
    std::memcpy(&image[raw + 48], first, sizeof first);
    std::memcpy(&image[raw + secondAt], second.c_str(), second.size() + 1);
    return image;
}
}  // namespace

// Catches a reader that fetches the whole file, or that cuts or garbles a name at a page boundary.
TEST(ExportNamesPaged, FetchesOnlyNeededPagesAndReadsNamesAcrossPageBoundaries) {
    auto image = StraddlingImage();
    std::set<std::uint64_t> fetchedPages;
    std::uint64_t fetchedBytes = 0;
    StringVector names;
    ReadExportNames([&](std::uint64_t offset, std::span<unsigned char> into) -> std::size_t {
        std::size_t count = offset < image.size() ? std::min<std::size_t>(into.size(), image.size() - offset) : 0;
        std::memcpy(into.data(), image.data() + offset, count);
        fetchedPages.insert(offset / 16384);
        fetchedBytes += count;
        return count;
    }, names);
    ASSERT_EQ(names.size(), 2u);
    EXPECT_EQ(std::string(names[0].View()), "drv_close_with_a_long_name");
    EXPECT_EQ(std::string(names[1].View()), "drv_init");
    EXPECT_EQ(fetchedPages, (std::set<std::uint64_t>{0, 2, 3}));
    EXPECT_EQ(fetchedBytes, 3u * 16384u);
}
