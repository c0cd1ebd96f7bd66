// Turning the configuration document into virtual instruments and logical names: plain rules over
// an IniObj, tested natively.
#include "framework/MultiByte.h"
#include "framework/TEException.h"
#include "sources/VxipnpInfo.h"

namespace sm {

namespace {
constexpr std::string_view vinstrPrefix = "VPPVInstr->";

void ReadLogicalNames(const IniObj& configuration, std::string_view section, LogicalNameList& list) {
    const SectionEntry* found = configuration.FindSection(section);
    if (!found) return;
    // Each item's own value: a name given twice must not take the first one's value twice.
    for (const ItemEntry& item : found->items)
        list.emplace_back(DynamicString(std::string_view(item.name)), DynamicString(UnescapeIniText(item.value)));
}

// A module path too long for a path leaves out its instrument only, not the whole source.
bool ReadModulePath(const IniObj& configuration, std::string_view section, Path& path) {
    try {
        return configuration.Get(section, "ModulePath", path);
    } catch (const TEException& error) {
        if (error.GetApiErrorCode() != InvalidPath) throw;
        return false;
    }
}

// The preferred boolean when present, else the plain one; a value that is no boolean raises.
bool ReadDefault(const IniObj& configuration, std::string_view section, std::string_view preferred,
                 std::string_view plain, bool& value) {
    for (std::string_view item : {preferred, plain}) {
        bool invalid = false;
        if (configuration.Get(section, item, value, &invalid)) return true;
        if (invalid) RaiseIniError("VxipnpInfo::GetConfigurationLists", InvalidBooleanValue);
    }
    return false;
}
}  // namespace

void VxipnpInfo::Parse(const IniObj& configuration) {
    vinstrs.clear();
    visaLogicalNames.clear();
    vxipnpLogicalNames.clear();
    ReadLogicalNames(configuration, "VXIPNP Logical Names", vxipnpLogicalNames);
    ReadLogicalNames(configuration, "VISA Logical Names", visaLogicalNames);

    for (const SectionEntry& section : configuration.GetSections()) {
        if (!multibyte::BeginsWith(section.name, vinstrPrefix, true)) continue;
        VxipnpVInstr instrument;
        instrument.name.Assign(std::string_view(section.name).substr(vinstrPrefix.size()));
        if (!ReadModulePath(configuration, section.name, instrument.modulePath)) continue;
        if (!configuration.Get(section.name, "Prefix", instrument.prefix)) continue;
        if (!configuration.Get(section.name, "Resource", instrument.resource)) continue;
        if (!ReadDefault(configuration, section.name, "QVSessionManager_IDQuery", "IDQuery", instrument.idQuery)) continue;
        if (!ReadDefault(configuration, section.name, "QVSessionManager_Reset", "Reset", instrument.reset)) continue;
        if (instrument.resource.IsEmpty()) continue;
        instrument.names.push_back({instrument.name, VirtualInstrumentName});
        for (const auto& [logicalName, target] : vxipnpLogicalNames)
            if (multibyte::Compare(target.View(), section.name, true) == 0)
                instrument.names.push_back({logicalName, LogicalName});
        vinstrs.push_back(std::move(instrument));
    }
}

void VxipnpInfo::ListNames(std::string_view, std::uint32_t options, const StringVector& filters, StringVector& names) {
    names.clear();
    GetConfigurationLists();
    for (const VxipnpVInstr& instrument : vinstrs) {
        if (!filters.empty() && ExcludedBySpecificPrefix(filters, instrument.prefix.View())) continue;
        AppendSelectedNames(instrument.names, false, {}, (options & 2) != 0, (options & 1) != 0, (options & 4) != 0,
                            names);
    }
}

bool VxipnpInfo::FindVInstr(std::string_view name, VxipnpVInstr& found) {
    GetConfigurationLists();
    for (const VxipnpVInstr& instrument : vinstrs) {
        if (ContainsName(instrument.names, name)) {
            found = instrument;
            return true;
        }
    }
    return false;
}

}  // namespace sm
