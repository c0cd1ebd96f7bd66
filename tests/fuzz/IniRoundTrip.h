// The INI round-trip rule of the fuzz target (and its corpus replay): a document read from any text and
// written must read back with the same sections, items, names and values (a quoted value stays quoted),
// and a second write-read must give the very same document. A document the writer cannot carry
// faithfully must be refused with the writer's own codes, never written wrongly. Escaped free text
// must come back from a value unchanged.
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

// Free text without its NULs, escaped, survives unescaping, and as an item's value (bare or quoted)
// a write and a read with the decoding Get.
inline std::string EscapedTextDifference(std::string_view input, bool quoted, bool lfOnly) {
    std::string text(input);
    std::erase(text, '\0');
    if (UnescapeIniText(EscapeIniText(text)) != text) return "escape round trip changed the text";
    IniObj written, read;
    try {
        written.Put("S", "free", EscapeIniText(text), quoted);
        read.ReadString(written.WriteString(lfOnly));
    } catch (const TEException& refused) {
        // A text the writer cannot carry (a lone lead byte at its end) is refused with its own codes.
        return refused.GetErrorCode() == TE_OPERATION_FAILED || refused.GetErrorCode() == TE_INVALID_OR_OUT_OF_RANGE
                   ? "" : std::string("unexpected refusal: ") + refused.GetDescription();
    }
    DynamicString value;
    return read.Get("S", "free", value) && value.View() == text ? "" : "escaped value changed on write and read";
}

// The fuzz input form: the first byte picks the code page (bit 0: double-byte 932), the line ends
// (bit 1: LF only), the sorted index (bit 2) and quoting of the escaped text (bit 3); the rest is the text.
inline RoundTripResult CheckRoundTripOfInput(std::string_view input) {
    if (input.empty()) return {};
    const unsigned mode = static_cast<unsigned char>(input[0]);
    SetMultiByteCodePage(mode & 1 ? 932 : 1252);
    if (std::string failure = EscapedTextDifference(input.substr(1), (mode & 8) != 0, (mode & 2) != 0); !failure.empty())
        return {false, failure};
    IniObj first((mode & 4) != 0);
    first.ReadString(input.substr(1));
    return CheckRoundTrip(first, (mode & 2) != 0);
}

}  // namespace sm::testing
