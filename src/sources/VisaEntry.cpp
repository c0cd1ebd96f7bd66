#include "sources/VisaEntry.h"

#include "framework/MultiByte.h"

namespace sm {

VisaEntry MakeResourceEntry(std::string_view resource) {
    VisaEntry entry;
    entry.viName.Assign(resource);
    entry.resource.Assign(resource);
    entry.names.push_back({DynamicString(resource), VirtualInstrumentName});
    return entry;
}

VisaEntryList BuildVisaEntries(const StringVector& resources, const VisaLogicalNames& logicalNames) {
    VisaEntryList entries;
    for (const DynamicString& resource : resources) {
        VisaEntry entry = MakeResourceEntry(resource.View());
        for (const auto& [logicalName, value] : logicalNames)
            if (multibyte::Compare(value.View(), resource.View(), true) == 0)
                entry.names.push_back({logicalName, LogicalName});
        entries.push_back(std::move(entry));
    }
    return entries;
}

void AppendVisaNames(const VisaEntryList& entries, std::uint32_t options, StringVector& names) {
    for (const VisaEntry& entry : entries)
        AppendSelectedNames(entry.names, false, {}, (options & 2) != 0, (options & 1) != 0, (options & 4) != 0, names);
}

void AppendVisaStateDescription(const VisaEntryList& entries, String& text) {
    text.Append("VISA Configuration:\n");
    text.Append("   Number of resources = ").AppendUnsigned(entries.size()).Append("\n");
    std::uint64_t index = 0;
    for (const VisaEntry& entry : entries) {
        text.Append("      Resource # = ").AppendUnsigned(index++).Append("\n");
        text.Append("         ViName '").Append(entry.viName).Append("'\n");
        text.Append("         name list (").AppendUnsigned(entry.names.size()).Append("):");
        AppendNameListText(entry.names, text);
        text.Append("\n");
        text.Append("         resource '").Append(entry.resource).Append("'\n\n");
    }
    text.Append("\n");
}

}  // namespace sm
