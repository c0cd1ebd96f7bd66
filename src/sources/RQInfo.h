// Switch route groups and routes from the switch library. The library is not consulted yet: the
// source lists no names.
#pragma once

#include "sources/InfoBase.h"

namespace sm {

class RQInfo : public InfoBase {
public:
    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;
};

}  // namespace sm
