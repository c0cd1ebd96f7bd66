// One IVI virtual instrument seen through one IVI class, and the text rules that pick entries by
// name. Plain C++: built natively as well.
#pragma once

#include <cstddef>
#include <string_view>
#include <vector>

#include "framework/Path.h"
#include "sources/NameEntry.h"

namespace sm {

struct IviEntry {
    DynamicString viName;
    Path modulePath;
    DynamicString prefix;  // the specific driver's function prefix
    bool idQuery = true;
    bool reset = true;
    DynamicString iviClass;  // may be empty
    // viName (VirtualInstrumentName), "VInstr->" + viName (hidden), then the logical names.
    NameEntryList names;
};

using IviEntryList = std::vector<IviEntry>;

inline constexpr std::string_view VInstrPrefix = "VInstr->";

// "IviDmm::DMM1" gives ("IviDmm", "DMM1"); a name without a separator has an empty qualifier.
void SplitQualifier(std::string_view name, String& qualifier, String& rest);

// The first entry that answers to name; a class qualifier restricts the search to that class.
bool FindEntry(const IviEntryList& entries, std::string_view name, std::size_t& index);

// The store's module text as a path: "C:dir\x.dll" and "C:" become absolute on their drive.
Path MakeModulePath(std::string_view text);

}  // namespace sm
