// The configuration source of the category "VISA": the instrument resources the VISA library finds
// on the machine, joined with the VISA logical names of the manager's configuration file. The
// resource scan is cached until the list is invalidated; the name groups are rebuilt after that, after
// the configuration file was read anew, and after a failed build.
#pragma once

#include "sources/InfoBase.h"
#include "sources/VisaEntry.h"
#include "sources/VisaLink.h"
#include "sources/VxipnpInfo.h"

namespace sm {

class VisaInfo : public InfoBase {
public:
    // configuration gives the VISA logical names and the generation of the file they come from.
    explicit VisaInfo(VxipnpInfo& configuration) : configuration(configuration) {}

    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;
    // The first group that answers to name.
    bool FindEntry(std::string_view name, VisaEntry& found);
    // Accepts a resource name VISA can parse although no scan listed it; FindEntry then finds it
    // until the groups are rebuilt.
    bool ParseResource(std::string_view name, VisaEntry& found);
    // A VISA logical name of the configuration file whose value VISA can parse.
    bool FindLogicalName(std::string_view name, VisaEntry& found);
    // The next listing searches the system for resources again.
    void InvalidateResourceList() { resourcesValid = false; }
    void AppendStateDescription(String& text);

private:
    void RefreshEntries();
    void ScanResources();

    VxipnpInfo& configuration;
    VisaLink link;
    VisaEntryList entries;
    bool entriesValid = false;
    std::int32_t lastConfigGeneration = 0;
    bool resourcesValid = false;
    StringVector resources;
};

}  // namespace sm
