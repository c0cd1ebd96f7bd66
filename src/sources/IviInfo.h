// IVI logical names and virtual instruments from the IVI configuration store. The store is not
// consulted yet: the source knows no names or sub-categories, so every lookup answers "not configured".
#pragma once

#include "sources/InfoBase.h"

namespace sm {

// An IVI logical name or virtual instrument, as handed to a new IVI session.
struct IviEntry {
    DynamicString name;
};

class IviInfo : public InfoBase {
public:
    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;
    void ListCategories(std::string_view subCategory, StringVector& categories) override;
    bool FindEntry(std::string_view name, IviEntry& found);
    void AppendStateDescription(String& text);
};

}  // namespace sm
