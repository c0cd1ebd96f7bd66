#include "framework/PeExports.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <deque>
#include <set>
#include <string>
#include <vector>

#include "framework/TEException.h"

namespace sm {

namespace {
[[noreturn]] void RaiseBadFormat() {
    TE_RAISE(TE_BAD_FILE_FORMAT, "ReadDLLExports", RaiseDetails{.source = "readdll"});
}

// Bounds-checked little-endian reads: every offset comes from the file and is trusted for nothing.
// Bytes are fetched a page at a time as they are first needed; a range is inside the file when its
// last byte is.
class ImageReader {
public:
    explicit ImageReader(const ImageFetch& fetchBytes) : fetch(fetchBytes) {}

    void Require(std::uint64_t offset, std::uint64_t length) {
        std::uint64_t end = offset + length;
        if (end < offset || (end > 0 && !HasByte(end - 1))) RaiseBadFormat();
    }
    std::uint32_t U16(std::uint64_t offset) {
        Require(offset, 2);
        return Byte(offset) | (Byte(offset + 1) << 8);
    }
    std::uint32_t U32(std::uint64_t offset) {
        Require(offset, 4);
        return static_cast<std::uint32_t>(Byte(offset)) | (static_cast<std::uint32_t>(Byte(offset + 1)) << 8) |
               (static_cast<std::uint32_t>(Byte(offset + 2)) << 16) | (static_cast<std::uint32_t>(Byte(offset + 3)) << 24);
    }
    std::string Text(std::uint64_t offset) {
        Require(offset, 1);
        std::string text;
        for (;; ++offset) {
            char next = static_cast<char>(Byte(offset));  // raises at the end: no terminating zero
            if (next == '\0') return text;
            text += next;
        }
    }

private:
    // Large enough that small images need one read, small against the images drivers ship as.
    static constexpr std::uint64_t pageSize = 16384;
    struct Page {
        std::uint64_t number;
        std::vector<unsigned char> bytes;  // shorter than a page only at the end of the file
    };

    const Page& PageOf(std::uint64_t offset) {
        std::uint64_t number = offset / pageSize;
        if (last && last->number == number) return *last;
        for (Page& page : pages)
            if (page.number == number) return *(last = &page);
        Page page{number, std::vector<unsigned char>(pageSize)};
        std::size_t got = fetch(number * pageSize, page.bytes);
        page.bytes.resize(std::min<std::size_t>(got, pageSize));
        pages.push_back(std::move(page));
        return *(last = &pages.back());
    }
    bool HasByte(std::uint64_t offset) { return offset % pageSize < PageOf(offset).bytes.size(); }
    unsigned char Byte(std::uint64_t offset) {
        const Page& page = PageOf(offset);
        if (offset % pageSize >= page.bytes.size()) RaiseBadFormat();
        return page.bytes[offset % pageSize];
    }

    const ImageFetch& fetch;
    std::deque<Page> pages;  // stable addresses while pages are added
    Page* last = nullptr;
};

struct Section {
    std::uint64_t virtualAddress, virtualSize, rawSize, rawOffset;
};

std::uint64_t RvaToOffset(ImageReader& reader, const std::vector<Section>& sections, std::uint64_t rva) {
    for (const Section& section : sections) {
        std::uint64_t extent = std::max(section.virtualSize, section.rawSize);
        if (rva >= section.virtualAddress && rva < section.virtualAddress + extent) {
            std::uint64_t offset = rva - section.virtualAddress + section.rawOffset;
            reader.Require(offset, 1);
            return offset;
        }
    }
    RaiseBadFormat();
}

bool IsExportNameStart(char first) {
    return first == '_' || (first >= 'A' && first <= 'Z') || (first >= 'a' && first <= 'z');
}
}  // namespace

void ReadExportNames(std::span<const unsigned char> image, StringVector& names) {
    ReadExportNames([&](std::uint64_t offset, std::span<unsigned char> into) -> std::size_t {
        if (offset >= image.size()) return 0;
        std::size_t count = static_cast<std::size_t>(std::min<std::uint64_t>(into.size(), image.size() - offset));
        std::memcpy(into.data(), image.data() + offset, count);
        return count;
    }, names);
}

void ReadExportNames(const ImageFetch& fetch, StringVector& names) {
    names.clear();
    ImageReader reader(fetch);
    if (reader.U16(0) != 0x5A4D) RaiseBadFormat();  // "MZ"
    std::uint64_t peOffset = reader.U32(0x3C);
    if (reader.U32(peOffset) != 0x00004550) RaiseBadFormat();  // "PE\0\0"
    std::uint64_t coff = peOffset + 4;
    std::uint32_t sectionCount = reader.U16(coff + 2);
    std::uint32_t optionalSize = reader.U16(coff + 16);
    std::uint64_t optional = coff + 20;
    if (reader.U16(optional) != 0x20B) return;  // not a 64-bit image
    reader.Require(optional, optionalSize);
    if (optionalSize < 112 + 8) return;  // too short to hold an export directory entry
    std::uint32_t directoryCount = reader.U32(optional + 108);
    if (directoryCount < 1) return;
    std::uint32_t exportRva = reader.U32(optional + 112);
    if (exportRva == 0) return;

    std::vector<Section> sections;
    std::uint64_t table = optional + optionalSize;
    reader.Require(table, static_cast<std::uint64_t>(sectionCount) * 40);
    for (std::uint32_t index = 0; index < sectionCount; ++index) {
        std::uint64_t entry = table + static_cast<std::uint64_t>(index) * 40;
        sections.push_back({reader.U32(entry + 12), reader.U32(entry + 8), reader.U32(entry + 16), reader.U32(entry + 20)});
    }

    std::uint64_t directory = RvaToOffset(reader, sections, exportRva);
    reader.Require(directory, 40);
    std::uint64_t nameCount = reader.U32(directory + 24);
    std::uint32_t namesRva = reader.U32(directory + 32);
    if (nameCount == 0) return;
    std::uint64_t nameTable = RvaToOffset(reader, sections, namesRva);
    reader.Require(nameTable, nameCount * 4);

    std::set<std::string, std::less<>> unique;
    for (std::uint64_t index = 0; index < nameCount; ++index) {
        std::string name = reader.Text(RvaToOffset(reader, sections, reader.U32(nameTable + index * 4)));
        if (!name.empty() && IsExportNameStart(name[0])) unique.emplace(std::move(name));
    }
    for (const auto& name : unique) names.emplace_back(std::string_view(name));
}

}  // namespace sm
