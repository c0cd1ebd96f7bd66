// One configured name of a configuration source, and the helpers every source shares for lists of
// them.
#pragma once

#include <cstdint>
#include <string_view>
#include <vector>

#include "framework/String.h"

namespace sm {

enum NameFlags : std::uint32_t {
    LogicalName = 1,
    VirtualInstrumentName = 2,
    DoNotDisplayName = 4,
};

struct NameEntry {
    DynamicString name;
    std::uint32_t flags = 0;
};

using NameEntryList = std::vector<NameEntry>;

// True when an entry's name equals name, ignoring case.
bool ContainsName(const NameEntryList& list, std::string_view name);

// Appends the entries chosen by kind (virtual instruments, logical names) that are displayable or
// wanted although hidden; with addPrefix each as prefix + "::" + name.
void AppendSelectedNames(const NameEntryList& list, bool addPrefix, std::string_view prefix,
                         bool wantVirtualInstruments, bool wantLogicalNames, bool wantHidden, StringVector& out);

// "DMM1 (LogicalName), Scope (VirtualInstrumentName, DoNotDisplayName), X (No Name Flags)".
void AppendNameListText(const NameEntryList& list, String& text);

}  // namespace sm
