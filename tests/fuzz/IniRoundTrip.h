// The INI round-trip rule, shared by the fuzz target (and its corpus replay) and the INI tests: a document
// read from any text and written must read back with the same sections, items, names and values (a
// quoted value stays quoted), and a second write-read must give the very same document. A document
// the writer cannot carry faithfully must be refused with the writer's own codes, never written wrongly.
#pragma once

#include <string>
#include <string_view>

#include "framework/CodePage.h"
#include "framework/IniObj.h"
#include "framework/TEException.h"

namespace sm::testing {

// What differs between two documents, or "" when nothing does. With exactQuotes the quoted flags
// must match too; without, a bare value may have become quoted.
inline std::string DocumentDifference(const IniObj& first, const IniObj& second, bool exactQuotes) {
    const auto& a = first.GetSections();
    const auto& b = second.GetSections();
    if (a.size() != b.size()) return "section count differs";
    for (std::size_t s = 0; s < a.size(); ++s) {
        if (a[s].name != b[s].name) return "section name differs: " + a[s].name;
        if (a[s].items.size() != b[s].items.size()) return "item count differs in " + a[s].name;
        for (std::size_t i = 0; i < a[s].items.size(); ++i) {
            const ItemEntry& x = a[s].items[i];
            const ItemEntry& y = b[s].items[i];
            if (x.name != y.name) return "item name differs: " + x.name;
            if (x.value != y.value) return "value differs: " + x.name;
            if (x.quoted && !y.quoted) return "quotes lost: " + x.name;
            if (exactQuotes && x.quoted != y.quoted) return "quoted flag differs: " + x.name;
        }
    }
    return "";
}

// Every item is found by its section and name (the first of its name in the first such section).
inline std::string LookupDifference(const IniObj& ini) {
    for (const SectionEntry& section : ini.GetSections()) {
        const SectionEntry* found = ini.FindSection(section.name);
        if (!found || found->name != section.name) return "section lookup failed: " + section.name;
        for (const ItemEntry& item : found->items) {
            const ItemEntry* hit = ini.FindItem(section.name, item.name);
            if (!hit || hit->name != item.name) return "item lookup failed: " + item.name;
        }
    }
    return "";
}

struct RoundTripResult {
    bool refused = false;  // the writer refused the document, with one of its own codes
    std::string failure;   // "" when the rule holds
};

// Writes the document, reads it back and writes and reads once more.
inline RoundTripResult CheckRoundTrip(const IniObj& first, bool lfOnly) {
    RoundTripResult result;
    if (!(result.failure = LookupDifference(first)).empty()) return result;
    std::string written;
    try {
        written = first.WriteString(lfOnly);
    } catch (const TEException& refused) {
        result.refused = true;
        if (refused.GetErrorCode() != TE_OPERATION_FAILED && refused.GetErrorCode() != TE_INVALID_OR_OUT_OF_RANGE)
            result.failure = std::string("unexpected refusal: ") + refused.GetDescription();
        return result;
    }
    IniObj second(first.IsSorted()), third(first.IsSorted());
    second.ReadString(written);
    if (!(result.failure = DocumentDifference(first, second, false)).empty()) return result;
    third.ReadString(second.WriteString(lfOnly));
    result.failure = DocumentDifference(second, third, true);
    return result;
}

// The fuzz input form: the first byte picks the code page (bit 0: double-byte 932), the line ends
// (bit 1: LF only) and the sorted index (bit 2); the rest is the text.
inline RoundTripResult CheckRoundTripOfInput(std::string_view input) {
    if (input.empty()) return {};
    const unsigned mode = static_cast<unsigned char>(input[0]);
    SetMultiByteCodePage(mode & 1 ? 932 : 1252);
    IniObj first((mode & 4) != 0);
    first.ReadString(input.substr(1));
    return CheckRoundTrip(first, (mode & 2) != 0);
}

}  // namespace sm::testing
