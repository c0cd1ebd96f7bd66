// A usable VISA name group and the plain rules that build, list and describe the groups: which
// resource each VISA logical name of the configuration file joins, which names a listing shows, and
// the "VISA Configuration" text. Free of the VISA library, so the rules run natively too.
#pragma once

#include <cstdint>
#include <string_view>
#include <utility>
#include <vector>

#include "framework/String.h"
#include "sources/NameEntry.h"

namespace sm {

// One VISA resource and the names it can be asked for by.
struct VisaEntry {
    DynamicString viName;    // passed to viOpen
    NameEntryList names;     // the resource name first, then its logical names
    DynamicString resource;  // shown as "resource" in descriptions
};

using VisaEntryList = std::vector<VisaEntry>;
using VisaLogicalNames = std::vector<std::pair<DynamicString, DynamicString>>;

// An entry that carries only the resource name itself.
VisaEntry MakeResourceEntry(std::string_view resource);

// One entry per scanned resource, in scan order, joined by the logical names (in file order) whose
// value names that resource, ignoring case. Logical names of no scanned resource give nothing here.
VisaEntryList BuildVisaEntries(const StringVector& resources, const VisaLogicalNames& logicalNames);

// Appends the names a listing with these GetNamesOptions bits shows, bare, in entry order.
void AppendVisaNames(const VisaEntryList& entries, std::uint32_t options, StringVector& names);

// The "VISA Configuration:" block of the manager's state description.
void AppendVisaStateDescription(const VisaEntryList& entries, String& text);

}  // namespace sm
