// libFuzzer target for the export-name reader: any bytes either give sorted, unique names that
// start with a letter or "_", or are refused with TE_BAD_FILE_FORMAT; nothing is read outside them.
#include <cstddef>
#include <cstdint>
#include <cstdlib>

#include "framework/PeExports.h"
#include "framework/TEException.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    sm::StringVector names;
    try {
        sm::ReadExportNames({data, size}, names);
    } catch (const sm::TEException& error) {
        if (error.GetErrorCode() != sm::TE_BAD_FILE_FORMAT) std::abort();
        return 0;
    }
    for (std::size_t index = 0; index < names.size(); ++index) {
        char first = names[index].GetText()[0];
        bool letter = (first >= 'A' && first <= 'Z') || (first >= 'a' && first <= 'z') || first == '_';
        if (!letter) std::abort();
        if (index > 0 && !(names[index - 1].View() < names[index].View())) std::abort();
    }
    return 0;
}
