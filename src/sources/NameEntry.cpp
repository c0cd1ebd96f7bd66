#include "sources/NameEntry.h"

#include "framework/MultiByte.h"

namespace sm {

bool ContainsName(const NameEntryList& list, std::string_view name) {
    for (const auto& entry : list)
        if (multibyte::Compare(entry.name.View(), name, true) == 0) return true;
    return false;
}

void AppendSelectedNames(const NameEntryList& list, bool addPrefix, std::string_view prefix,
                         bool wantVirtualInstruments, bool wantLogicalNames, bool wantHidden, StringVector& out) {
    for (const auto& entry : list) {
        bool wantedKind = (wantVirtualInstruments && (entry.flags & VirtualInstrumentName)) ||
                          (wantLogicalNames && (entry.flags & LogicalName));
        bool shown = !(entry.flags & DoNotDisplayName) || wantHidden;
        if (!wantedKind || !shown) continue;
        DynamicString name;
        if (addPrefix) name.Append(prefix).Append("::");
        name.Append(entry.name);
        out.push_back(name);
    }
}

void AppendNameListText(const NameEntryList& list, String& text) {
    bool firstEntry = true;
    for (const auto& entry : list) {
        if (!firstEntry) text.Append(", ");
        firstEntry = false;
        text.Append(entry.name).Append(" (");
        if (entry.flags == 0) {
            text.Append("No Name Flags");
        } else {
            bool firstFlag = true;
            auto flagWord = [&](std::uint32_t bit, const char* word) {
                if (!(entry.flags & bit)) return;
                if (!firstFlag) text.Append(", ");
                firstFlag = false;
                text.Append(word);
            };
            flagWord(LogicalName, "LogicalName");
            flagWord(VirtualInstrumentName, "VirtualInstrumentName");
            flagWord(DoNotDisplayName, "DoNotDisplayName");
        }
        text.Append(")");
    }
}

}  // namespace sm
