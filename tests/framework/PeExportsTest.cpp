// Export names from image bytes: every out-of-file reference caught, pages fetched only as needed.
#include <gtest/gtest.h>

#include "CatchTE.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <set>
#include <string>
#include <vector>

#include "framework/PeExports.h"
#include "framework/TEException.h"

using namespace sm;
using Names = std::vector<std::string>;

namespace {
void Put16(std::vector<unsigned char>& bytes, std::size_t at, std::uint32_t value) {
    bytes[at] = static_cast<unsigned char>(value);
    bytes[at + 1] = static_cast<unsigned char>(value >> 8);
}
void Put32(std::vector<unsigned char>& bytes, std::size_t at, std::uint32_t value) {
    for (int shift = 0; shift < 4; ++shift) bytes[at + shift] = static_cast<unsigned char>(value >> (8 * shift));
}

constexpr std::uint32_t peOffset = 0x80, optionalOffset = peOffset + 24, optionalSize = 240, sectionRva = 0x1000;
constexpr std::uint32_t sectionHeader = optionalOffset + optionalSize;

// A small 64-bit image: headers, then one section at file offset `raw` (RVA 0x1000) holding the export
// directory, the name pointer table and the names; filler up to `size` bytes.
struct ImageBuilder {
    Names exportNames;
    std::uint16_t magic = 0x20B;
    bool withExportDirectory = true;
    std::uint32_t raw = 0x200, size = 0;

    std::vector<unsigned char> Build() const {
        std::vector<unsigned char> image(0x200, 0);
        Put16(image, 0, 0x5A4D);
        Put32(image, 0x3C, peOffset);
        Put32(image, peOffset, 0x00004550);
        Put16(image, peOffset + 6, 1);  // one section
        Put16(image, peOffset + 20, optionalSize);
        Put16(image, optionalOffset, magic);
        Put32(image, optionalOffset + 108, 16);  // data directories
        if (withExportDirectory) Put32(image, optionalOffset + 112, sectionRva);
        Put32(image, optionalOffset + 116, 40);
        image[sectionHeader] = '.';
        // Section body: export directory (40 bytes), name pointers, then the names.
        std::vector<unsigned char> body(40 + 4 * exportNames.size(), 0);
        Put32(body, 24, static_cast<std::uint32_t>(exportNames.size()));
        Put32(body, 32, sectionRva + 40);
        for (std::size_t index = 0; index < exportNames.size(); ++index) {
            Put32(body, 40 + 4 * index, sectionRva + static_cast<std::uint32_t>(body.size()));
            body.insert(body.end(), exportNames[index].c_str(), exportNames[index].c_str() + exportNames[index].size() + 1);
        }
        Put32(image, sectionHeader + 8, static_cast<std::uint32_t>(body.size()));  // virtual size
        Put32(image, sectionHeader + 12, sectionRva);
        Put32(image, sectionHeader + 16, static_cast<std::uint32_t>(body.size()));  // raw size
        Put32(image, sectionHeader + 20, raw);
        image.resize(raw, 0xCC);
        image.insert(image.end(), body.begin(), body.end());
        image.resize(std::max<std::size_t>(image.size(), size), 0xCC);
        return image;
    }
};

Names Plain(const StringVector& names) {
    Names plain;
    for (const auto& name : names) plain.emplace_back(name.View());
    return plain;
}

Names Read(const std::vector<unsigned char>& image) {
    StringVector names;
    ReadExportNames(image, names);
    return Plain(names);
}

void ExpectBadFormat(const std::vector<unsigned char>& image) {
    StringVector names;
    sm::testing::ExpectTE([&] { ReadExportNames(image, names); }, TE_BAD_FILE_FORMAT, "Incorrect file format.",
                          "ReadDLLExports");
}
}  // namespace

TEST(ExportNames, ThirtyTwoBitImagesAndMissingDirectoriesGiveNone) {
    EXPECT_EQ(Read(ImageBuilder{{"abc_init"}, 0x10B}.Build()), Names{});
    EXPECT_EQ(Read(ImageBuilder{{"abc_init"}, 0x20B, false}.Build()), Names{});
}

TEST(ExportNames, EveryOutOfFileReferenceIsCaught) {
    const auto good = ImageBuilder{{"abc_init", "abc_close"}}.Build();
    ASSERT_EQ(Read(good).size(), 2u);
    ExpectBadFormat({});
    ExpectBadFormat({'M', 'Z'});
    ExpectBadFormat(std::vector<unsigned char>(good.begin(), good.end() - 1));  // the last name's terminator cut off
    const struct { std::size_t at; int bytes; std::uint32_t value; } corruptions[] = {
        {0, 1, 'X'}, {peOffset + 1, 1, 'X'},  // the DOS and PE signatures
        {0x3C, 4, 0xFFFFFFF0}, {peOffset + 6, 2, 0xFFFF}, {optionalOffset + 112, 4, 0x9000},
        {sectionHeader + 20, 4, 0x7FFFFFFF}, {0x200 + 24, 4, 0x40000000}, {0x200 + 40, 4, 0x6000}};
    for (const auto& c : corruptions) {
        auto image = good;
        if (c.bytes == 1) image[c.at] = static_cast<unsigned char>(c.value);
        else if (c.bytes == 2) Put16(image, c.at, c.value);
        else Put32(image, c.at, c.value);
        SCOPED_TRACE(c.at);
        ExpectBadFormat(image);
    }
}

// Catches a reader that fetches the whole file, or that cuts or garbles a name at a page boundary:
// in a 256 KB image the second name starts six bytes before 0xC000 (pages are 16 KB).
TEST(ExportNamesPaged, FetchesOnlyNeededPagesAndReadsNamesAcrossPageBoundaries) {
    const std::string first = "drv_init_" + std::string(192, 'p');  // 0xBF30 to 0xBFF9
    const auto image = ImageBuilder{{first, "drv_close_with_a_long_name"}, 0x20B, true, 0xBF00, 0x40000}.Build();
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
    EXPECT_EQ(Plain(names), (Names{"drv_close_with_a_long_name", first}));
    EXPECT_EQ(fetchedPages, (std::set<std::uint64_t>{0, 2, 3}));
    EXPECT_EQ(fetchedBytes, 3u * 16384u);
}
