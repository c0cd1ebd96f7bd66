// Drives the stand-ins of sim/ from a test: a setup file of the test's own, and the call counters of
// the stand-in instance the product loaded into this process.
#pragma once

#include <windows.h>

#include <fstream>
#include <string>

#include "com/LibraryBinding.h"

namespace sm::testing {

// Writes the setup file `name` in the temporary folder and points SM_SIM_SETUP at it. A new name per
// bench makes every stand-in read it afresh.
inline void UseSimSetup(const std::string& name, const std::string& content) {
    char temp[MAX_PATH];
    ::GetTempPathA(MAX_PATH, temp);
    std::string path = std::string(temp) + name;
    std::ofstream(path, std::ios::trunc) << content;
    ::SetEnvironmentVariableA("SM_SIM_SETUP", path.c_str());
}

// A counter of a stand-in loaded by name ("visa32.dll"); -1 when it is not loaded.
inline long SimCount(const char* library, const char* counter) {
    HMODULE module = ::GetModuleHandleA(library);
    auto read = module ? GetProcAddressAs<long(const char*)>(module, "SimCounter") : nullptr;
    return read ? read(counter) : -1;
}

}  // namespace sm::testing
