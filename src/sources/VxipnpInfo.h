// VXIplug&play virtual instruments and logical names from the manager's configuration file.
// The file is not read yet: the source knows no names, so every lookup answers "not configured".
#pragma once

#include "sources/InfoBase.h"

namespace sm {

// A virtual instrument of the configuration file, as handed to a new VXIplug&play session.
struct VxipnpVInstr {
    DynamicString name;
};

class VxipnpInfo : public InfoBase {
public:
    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;
    bool FindVInstr(std::string_view name, VxipnpVInstr& found);
    void AppendStateDescription(String& text);
};

}  // namespace sm
