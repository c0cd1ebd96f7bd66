// Drives the stand-ins of sim/: a setup file and configuration directory of the test's own, the call
// counters of the loaded stand-in, and the switch product taken away and put back.
#pragma once

#include <gtest/gtest.h>
#include <windows.h>

#include <fstream>
#include <string>

#include "com/LibraryBinding.h"
#include "com/UniqueHandles.h"

namespace sm::testing {

inline std::string TempPath(const std::string& name) {
    char temp[MAX_PATH];
    ::GetTempPathA(MAX_PATH, temp);
    return std::string(temp) + name;
}

// Writes a setup file and points SM_SIM_SETUP at it. Each call takes a new file name: a rewrite of
// the same size within one file-time tick would look unchanged to a stand-in that read the last one.
inline void UseSimSetup(const std::string& name, const std::string& content) {
    static int generation = 0;
    std::string path = TempPath(name + "-" + std::to_string(::GetCurrentProcessId()) + "-" +
                                std::to_string(++generation) + ".ini");
    std::ofstream(path, std::ios::trunc) << content;
    ::SetEnvironmentVariableA("SM_SIM_SETUP", path.c_str());
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
inline long SimCount(const char* library, const std::string& counter) {
    HMODULE module = ::GetModuleHandleA(library);
    auto read = module ? GetProcAddressAs<long(const char*)>(module, "SimCounter") : nullptr;
    return read ? read(counter.c_str()) : -1;
}

inline std::string SystemFile(const char* name) {
    char folder[MAX_PATH] = {};
    ::GetSystemDirectoryA(folder, MAX_PATH);
    return std::string(folder) + "\\" + name;
}

// A library the installation put in the system directory, moved away until the end of the scope.
class LibraryHidden {
public:
    explicit LibraryHidden(const char* name)
        : path(SystemFile(name)), hidden(::MoveFileA(path.c_str(), (path + ".hidden").c_str())) {}
    ~LibraryHidden() {
        if (hidden) ::MoveFileA((path + ".hidden").c_str(), path.c_str());
    }
    const std::string path;
    const bool hidden;
};

// The switch engine unregistered by its own DllUnregisterServer, and registered again at the end.
class EngineUnregistered {
public:
    EngineUnregistered() { EXPECT_EQ(Call("DllUnregisterServer"), S_OK) << "is the engine installed (sm_install_sim)?"; }
    ~EngineUnregistered() { EXPECT_EQ(Call("DllRegisterServer"), S_OK); }

private:
    HRESULT Call(const char* name) {
        auto* function = engine ? GetProcAddressAs<HRESULT()>(engine.Get(), name) : nullptr;
        return function ? function() : E_FAIL;
    }
    UniqueModule engine{::LoadLibraryA("rqengine.dll")};
};

}  // namespace sm::testing
