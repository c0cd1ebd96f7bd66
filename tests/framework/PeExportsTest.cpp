// Export names read straight from image bytes: what counts as a name, and every out-of-file
// reference caught instead of read.
#include <gtest/gtest.h>

#include "CatchTE.h"

#include <cstdint>
#include <string>
#include <vector>

#include "framework/PeExports.h"
#include "framework/TEException.h"

using namespace sm;

namespace {
// Builds a small 64-bit image: headers, then one section at file offset 0x200 (RVA 0x1000) holding
// the export directory, the name pointer table and the names.
class ImageBuilder {
public:
    std::vector<std::string> exportNames;
    std::uint16_t magic = 0x20B;
    bool withExportDirectory = true;

    std::vector<unsigned char> Build() const {
        std::vector<unsigned char> image(0x200, 0);
        Put16(image, 0, 0x5A4D);
        Put32(image, 0x3C, peOffset);
        Put32(image, peOffset, 0x00004550);
        std::uint32_t coff = peOffset + 4;
        Put16(image, coff + 2, 1);           // one section
        Put16(image, coff + 16, optionalSize);
        std::uint32_t optional = coff + 20;
        Put16(image, optional, magic);
        Put32(image, optional + 108, 16);    // data directories
        if (withExportDirectory) Put32(image, optional + 112, sectionRva);
        Put32(image, optional + 116, 40);
        std::uint32_t section = optional + optionalSize;
        image[section] = '.';
        // Section body: export directory (40 bytes), name pointers, then the names.
        std::vector<unsigned char> body(40, 0);
        Put32(body, 24, static_cast<std::uint32_t>(exportNames.size()));
        Put32(body, 32, sectionRva + 40);
        std::uint32_t namesStart = 40 + 4 * static_cast<std::uint32_t>(exportNames.size());
        body.resize(namesStart);
        for (std::size_t index = 0; index < exportNames.size(); ++index) {
            Put32(body, 40 + 4 * static_cast<std::uint32_t>(index), sectionRva + static_cast<std::uint32_t>(body.size()));
            body.insert(body.end(), exportNames[index].begin(), exportNames[index].end());
            body.push_back(0);
        }
        Put32(image, section + 8, static_cast<std::uint32_t>(body.size()));   // virtual size
        Put32(image, section + 12, sectionRva);
        Put32(image, section + 16, static_cast<std::uint32_t>(body.size()));  // raw size
        Put32(image, section + 20, 0x200);
        image.insert(image.end(), body.begin(), body.end());
        return image;
    }

    static constexpr std::uint32_t peOffset = 0x80;
    static constexpr std::uint16_t optionalSize = 240;
    static constexpr std::uint32_t sectionRva = 0x1000;
    static constexpr std::uint32_t optionalOffset = peOffset + 24;

    static void Put16(std::vector<unsigned char>& bytes, std::size_t at, std::uint32_t value) {
        bytes[at] = static_cast<unsigned char>(value);
        bytes[at + 1] = static_cast<unsigned char>(value >> 8);
    }
    static void Put32(std::vector<unsigned char>& bytes, std::size_t at, std::uint32_t value) {
        for (int shift = 0; shift < 4; ++shift) bytes[at + shift] = static_cast<unsigned char>(value >> (8 * shift));
    }
};

std::vector<std::string> Read(const std::vector<unsigned char>& image) {
    StringVector names;
    ReadExportNames(image, names);
    std::vector<std::string> plain;
    for (const auto& name : names) plain.emplace_back(name.View());
    return plain;
}

void ExpectBadFormat(const std::vector<unsigned char>& image) {
    StringVector names;
    sm::testing::ExpectTE([&] { ReadExportNames(image, names); }, TE_BAD_FILE_FORMAT, "Incorrect file format.",
                          "ReadDLLExports");
}
}  // namespace

TEST(ExportNames, SortedUniqueAndStartingWithALetterOrUnderscore) {
    ImageBuilder builder;
    builder.exportNames = {"zeta_init", "abc_close", "_private", "1numeric", "?mangled@@", "abc_close", "Abc_Reset"};
    EXPECT_EQ(Read(builder.Build()), (std::vector<std::string>{"Abc_Reset", "_private", "abc_close", "zeta_init"}));
}

TEST(ExportNames, ThirtyTwoBitImagesAndMissingDirectoriesGiveNone) {
    ImageBuilder builder;
    builder.exportNames = {"abc_init"};
    builder.magic = 0x10B;
    EXPECT_TRUE(Read(builder.Build()).empty());
    builder.magic = 0x20B;
    builder.withExportDirectory = false;
    EXPECT_TRUE(Read(builder.Build()).empty());
    builder.withExportDirectory = true;
    builder.exportNames.clear();
    EXPECT_TRUE(Read(builder.Build()).empty());
}

TEST(ExportNames, SignaturesAreRequired) {
    ImageBuilder builder;
    builder.exportNames = {"abc_init"};
    auto noDosSignature = builder.Build();
    noDosSignature[0] = 'X';
    ExpectBadFormat(noDosSignature);
    auto noPeSignature = builder.Build();
    noPeSignature[ImageBuilder::peOffset + 1] = 'X';
    ExpectBadFormat(noPeSignature);
    ExpectBadFormat({});
    ExpectBadFormat({'M', 'Z'});
}

TEST(ExportNames, EveryOutOfFileReferenceIsCaught) {
    ImageBuilder builder;
    builder.exportNames = {"abc_init", "abc_close"};
    const auto good = builder.Build();
    ASSERT_EQ(Read(good).size(), 2u);

    auto peOutside = good;
    ImageBuilder::Put32(peOutside, 0x3C, 0xFFFFFFF0);
    ExpectBadFormat(peOutside);

    auto sectionsOutside = good;
    ImageBuilder::Put16(sectionsOutside, ImageBuilder::peOffset + 4 + 2, 0xFFFF);
    ExpectBadFormat(sectionsOutside);

    auto directoryNowhere = good;
    ImageBuilder::Put32(directoryNowhere, ImageBuilder::optionalOffset + 112, 0x9000);
    ExpectBadFormat(directoryNowhere);

    auto rawOutside = good;
    std::size_t section = ImageBuilder::optionalOffset + ImageBuilder::optionalSize;
    ImageBuilder::Put32(rawOutside, section + 20, 0x7FFFFFFF);
    ExpectBadFormat(rawOutside);

    auto tooManyNames = good;
    ImageBuilder::Put32(tooManyNames, 0x200 + 24, 0x40000000);
    ExpectBadFormat(tooManyNames);

    auto nameOutside = good;
    ImageBuilder::Put32(nameOutside, 0x200 + 40, 0x1000 + 0x5000);
    ExpectBadFormat(nameOutside);

    // A name that runs to the end of the file without its terminator.
    std::vector<unsigned char> truncated(good.begin(), good.end() - 1);
    ExpectBadFormat(truncated);
}
