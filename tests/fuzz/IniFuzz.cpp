// libFuzzer target for INI text: read any bytes, write the document, read the text back. The second
// read must hold the same sections, items, names and values as the first, and a third read of the
// second one's text must equal the second exactly (quoted flags included). A document the writer
// cannot write faithfully must be refused with the writer's own codes, never written wrongly.
//
// The first input byte picks the code page (bit 0: double-byte 932), the line ends (bit 1: LF only)
// and the sorted index (bit 2); the rest is the text.
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <string_view>

#include "framework/CodePage.h"
#include "framework/IniObj.h"
#include "framework/TEException.h"

using namespace sm;

namespace {

[[noreturn]] void Fail(const char* what, std::string_view detail = {}) {
    std::fprintf(stderr, "IniFuzz: %s %.*s\n", what, static_cast<int>(detail.size()), detail.data());
    std::abort();
}

void ExpectSameText(const IniObj& first, const IniObj& second) {
    const auto& a = first.GetSections();
    const auto& b = second.GetSections();
    if (a.size() != b.size()) Fail("section count differs");
    for (std::size_t s = 0; s < a.size(); ++s) {
        if (a[s].name != b[s].name) Fail("section name differs", a[s].name);
        if (a[s].items.size() != b[s].items.size()) Fail("item count differs in", a[s].name);
        for (std::size_t i = 0; i < a[s].items.size(); ++i) {
            if (a[s].items[i].name != b[s].items[i].name) Fail("item name differs", a[s].items[i].name);
            if (a[s].items[i].value != b[s].items[i].value) Fail("value differs", a[s].items[i].name);
            // A quoted value stays quoted; a bare one may become quoted when bare text cannot carry it.
            if (a[s].items[i].quoted && !b[s].items[i].quoted) Fail("quotes lost", a[s].items[i].name);
        }
    }
}

void ExpectIdentical(const IniObj& first, const IniObj& second) {
    ExpectSameText(first, second);
    const auto& a = first.GetSections();
    const auto& b = second.GetSections();
    for (std::size_t s = 0; s < a.size(); ++s)
        for (std::size_t i = 0; i < a[s].items.size(); ++i)
            if (a[s].items[i].quoted != b[s].items[i].quoted) Fail("quoted flag differs", a[s].items[i].name);
}

// Every item is found by its section and name (the first of its name in the first such section).
void ExpectLookups(const IniObj& ini) {
    for (const SectionEntry& section : ini.GetSections()) {
        const SectionEntry* found = ini.FindSection(section.name);
        if (!found || found->name != section.name) Fail("section lookup failed", section.name);
        for (const ItemEntry& item : found->items) {
            const ItemEntry* hit = ini.FindItem(section.name, item.name);
            if (!hit || hit->name != item.name) Fail("item lookup failed", item.name);
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    const std::uint8_t mode = data[0];
    SetMultiByteCodePage(mode & 1 ? 932 : 1252);
    const bool lfOnly = (mode & 2) != 0;
    const bool sorted = (mode & 4) != 0;
    std::string_view text(reinterpret_cast<const char*>(data + 1), size - 1);

    IniObj first(sorted);
    first.ReadString(text);
    ExpectLookups(first);
    std::string written;
    try {
        written = first.WriteString(lfOnly);
    } catch (const TEException& refused) {
        if (refused.GetErrorCode() != TE_OPERATION_FAILED && refused.GetErrorCode() != TE_INVALID_OR_OUT_OF_RANGE)
            Fail("unexpected refusal", refused.GetDescription());
        return 0;
    }
    IniObj second(sorted);
    second.ReadString(written);
    ExpectSameText(first, second);
    IniObj third(sorted);
    third.ReadString(second.WriteString(lfOnly));
    ExpectIdentical(second, third);
    return 0;
}
