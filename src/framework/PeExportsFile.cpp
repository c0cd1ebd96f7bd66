// Reading an image file's bytes for ReadDLLExports, portable form: the whole file is read into
// memory, which the native tests and the fuzzer use.
#include <fstream>
#include <iterator>
#include <vector>

#include "framework/PeExports.h"
#include "framework/TEException.h"

namespace sm {

void ReadDLLExports(std::string_view path, StringVector& names) {
    std::ifstream file(std::string(path), std::ios::binary);
    if (!file) TE_RAISE(TE_FILE_NOT_FOUND, "ReadDLLExports", RaiseDetails{.source = "readdll"});
    std::vector<unsigned char> bytes((std::istreambuf_iterator<char>(file)), std::istreambuf_iterator<char>());
    ReadExportNames(bytes, names);
}

}  // namespace sm
