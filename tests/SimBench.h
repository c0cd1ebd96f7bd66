// Drives the stand-ins of sim/ from a test: a setup file and a configuration directory of the test's
// own, and the call counters of the stand-in instance the product loaded into this process.
#pragma once

#include <windows.h>

#include <fstream>
#include <string>

#include "com/LibraryBinding.h"

namespace sm::testing {

inline std::string TempPath(const std::string& name) {
    char temp[MAX_PATH];
    ::GetTempPathA(MAX_PATH, temp);
    return std::string(temp) + name;
}

// Writes the setup file `name` and points SM_SIM_SETUP at it; a new name makes every stand-in re-read.
inline void UseSimSetup(const std::string& name, const std::string& content) {
    std::ofstream(TempPath(name), std::ios::trunc) << content;
    ::SetEnvironmentVariableA("SM_SIM_SETUP", TempPath(name).c_str());
}

// Points VXIPNPPATH at the folder `name`, its QVSessionMgr.ini holding `content`; gives the file's path.
inline std::string UseConfigurationFile(const std::string& name, const std::string& content) {
    ::CreateDirectoryA(TempPath(name).c_str(), nullptr);
    ::CreateDirectoryA(TempPath(name + "\\Win64").c_str(), nullptr);
    ::SetEnvironmentVariableA("VXIPNPPATH", TempPath(name).c_str());
    std::ofstream(TempPath(name + "\\Win64\\QVSessionMgr.ini"), std::ios::trunc) << content;
    return TempPath(name + "\\Win64\\QVSessionMgr.ini");
}

// A counter of a stand-in loaded by name ("visa32.dll"); -1 when it is not loaded.
inline long SimCount(const char* library, const char* counter) {
    HMODULE module = ::GetModuleHandleA(library);
    auto read = module ? GetProcAddressAs<long(const char*)>(module, "SimCounter") : nullptr;
    return read ? read(counter) : -1;
}

}  // namespace sm::testing
