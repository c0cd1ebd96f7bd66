// VISA resources found on the system and VISA logical names of the configuration file. The VISA
// library is not searched yet: the source knows no resources, so every lookup answers "not configured".
#pragma once

#include "sources/InfoBase.h"

namespace sm {

// A VISA resource, as handed to a new VISA session.
struct VisaEntry {
    DynamicString resourceName;
};

class VisaInfo : public InfoBase {
public:
    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;
    bool FindEntry(std::string_view name, VisaEntry& found);
    bool ParseResource(std::string_view name, VisaEntry& found);
    bool FindLogicalName(std::string_view name, VisaEntry& found);
    // The next listing searches the system for resources again.
    void InvalidateResourceList() { resourceListValid = false; }
    void AppendStateDescription(String& text);

private:
    bool resourceListValid = false;
};

}  // namespace sm
