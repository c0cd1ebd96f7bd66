// The base of the configuration sources the manager asks for names and categories.
#pragma once

#include <cstdint>
#include <string_view>

#include "framework/String.h"

namespace sm {

class InfoBase {
public:
    virtual ~InfoBase() = default;

    // Replaces names with the source's names for a listing; subCategory is "?" when none was named.
    virtual void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                           StringVector& names) = 0;

    // True when filters are given and none of the "SpecificPrefix = x" filters names this prefix.
    virtual bool ExcludedBySpecificPrefix(const StringVector& filters, std::string_view specificPrefix) const;

    // Replaces categories with the source's sub-categories; most sources have none.
    virtual void ListCategories(std::string_view subCategory, StringVector& categories);
};

// Cuts a comma-separated filter text into trimmed pieces ("" gives none; a final comma adds nothing).
StringVector SplitFilterList(std::string_view filter);

}  // namespace sm
