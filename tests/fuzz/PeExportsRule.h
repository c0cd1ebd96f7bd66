// The export reader's rule: sorted, unique names starting with a letter or "_", or TE_BAD_FILE_FORMAT.
#pragma once

#include <string>
#include <string_view>

#include "framework/PeExports.h"
#include "framework/TEException.h"

namespace sm::testing {

// "" when the rule holds, else what broke it.
inline std::string ExportNamesRuleBroken(std::string_view bytes) {
    StringVector names;
    try {
        ReadExportNames({reinterpret_cast<const unsigned char*>(bytes.data()), bytes.size()}, names);
    } catch (const TEException& error) {
        return error.GetErrorCode() == TE_BAD_FILE_FORMAT ? "" : std::string("wrong refusal: ") + error.GetDescription();
    }
    for (std::size_t index = 0; index < names.size(); ++index) {
        char first = names[index].GetText()[0];
        if (!((first >= 'A' && first <= 'Z') || (first >= 'a' && first <= 'z') || first == '_'))
            return "a name does not start with a letter or '_'";
        if (index > 0 && !(names[index - 1].View() < names[index].View())) return "names not sorted and unique";
    }
    return "";
}

}  // namespace sm::testing
