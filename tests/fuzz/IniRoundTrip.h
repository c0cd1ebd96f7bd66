// The INI round-trip rule (docs/fuzzing.md): what is read, written and read back is the same document,
// or the writer refuses it with its own codes; escaped free text comes back from a value unchanged.
#pragma once

#include <string>
#include <string_view>

#include "framework/CodePage.h"
#include "framework/IniObj.h"
#include "framework/TEException.h"

namespace sm::testing {

// What differs between two documents, or ""; without exactQuotes a bare value may have become quoted.
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

// A refusal with one of the writer's own codes is how it declines a document it cannot carry.
inline std::string RefusalDifference(const TEException& refused) {
    const int code = refused.GetErrorCode();
    return code == TE_OPERATION_FAILED || code == TE_INVALID_OR_OUT_OF_RANGE
               ? "" : std::string("unexpected refusal: ") + refused.GetDescription();
}

// Writes the document, reads it back and writes and reads once more; "" when the rule holds.
inline std::string RoundTripDifference(const IniObj& first, bool lfOnly) {
    if (std::string failure = LookupDifference(first); !failure.empty()) return failure;
    IniObj second(first.IsSorted()), third(first.IsSorted());
    try {
        second.ReadString(first.WriteString(lfOnly));
    } catch (const TEException& refused) {
        return RefusalDifference(refused);
    }
    if (std::string failure = DocumentDifference(first, second, false); !failure.empty()) return failure;
    third.ReadString(second.WriteString(lfOnly));
    return DocumentDifference(second, third, true);
}

// Free text without its NULs, escaped, survives unescaping and, as a value, a write and a read.
inline std::string EscapedTextDifference(std::string_view input, bool quoted, bool lfOnly) {
    std::string text(input);
    std::erase(text, '\0');
    if (UnescapeIniText(EscapeIniText(text)) != text) return "escape round trip changed the text";
    IniObj written, read;
    try {
        written.Put("S", "free", EscapeIniText(text), quoted);
        read.ReadString(written.WriteString(lfOnly));
    } catch (const TEException& refused) {
        return RefusalDifference(refused);  // a lone lead byte at the end of a double-byte text
    }
    DynamicString value;
    return read.Get("S", "free", value) && value.View() == text ? "" : "escaped value changed on write and read";
}

// The first byte's bits: 0 code page 932, 1 LF line ends, 2 sorted, 3 quoted escaped text.
inline std::string CheckRoundTripOfInput(std::string_view input) {
    if (input.empty()) return "";
    const unsigned mode = static_cast<unsigned char>(input[0]);
    SetMultiByteCodePage(mode & 1 ? 932 : 1252);
    if (std::string failure = EscapedTextDifference(input.substr(1), (mode & 8) != 0, (mode & 2) != 0); !failure.empty())
        return failure;
    IniObj first((mode & 4) != 0);
    first.ReadString(input.substr(1));
    return RoundTripDifference(first, (mode & 2) != 0);
}

}  // namespace sm::testing
