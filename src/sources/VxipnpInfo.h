// VXIplug&play virtual instruments and logical names from the manager's configuration file.
#pragma once

#include <cstdint>
#include <utility>
#include <vector>

#include "framework/IniObj.h"
#include "framework/Path.h"
#include "sources/InfoBase.h"
#include "sources/NameEntry.h"

namespace sm {

// A virtual instrument of the configuration file, as handed to a new VXIplug&play session.
struct VxipnpVInstr {
    DynamicString name;
    NameEntryList names;  // the name itself, then every logical name that refers to it
    Path modulePath;
    DynamicString prefix;
    DynamicString resource;
    bool idQuery = true;
    bool reset = true;
};

using LogicalNameList = std::vector<std::pair<DynamicString, DynamicString>>;

class VxipnpInfo : public InfoBase {
public:
    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;
    // The first virtual instrument that answers to name, copied out.
    bool FindVInstr(std::string_view name, VxipnpVInstr& found);
    void AppendStateDescription(String& text);

    // Brings the lists up to date with the file; gives the generation they were built from.
    std::int32_t GetConfigurationLists();
    const std::vector<VxipnpVInstr>& VirtualInstruments() const { return vinstrs; }
    const LogicalNameList& VisaLogicalNames() const { return visaLogicalNames; }
    const LogicalNameList& VxipnpLogicalNames() const { return vxipnpLogicalNames; }

    // Builds the three lists from a configuration document. Sections that break the rules of a
    // virtual instrument are skipped; a non-boolean IDQuery or Reset raises.
    void Parse(const IniObj& configuration);

private:
    std::vector<VxipnpVInstr> vinstrs;
    LogicalNameList visaLogicalNames;
    LogicalNameList vxipnpLogicalNames;
    std::int32_t parsedGeneration = 0;
};

}  // namespace sm
