// The simulated switch product as the switch tests arrange it: their own setup file, the engine's
// registration and the library file taken away and put back, and the stand-ins' call counters.
#pragma once

#include <gtest/gtest.h>
#include <windows.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "com/BstrConversion.h"
#include "com/LibraryBinding.h"
#include "com/UniqueHandles.h"

namespace sm::testing {

constexpr const char* rqBench =
    "[RQ]\nFailingSessions = BrokenRoute\nOpenStatus = -1\n"
    "[RQ SwitchDev1]\nRouteGroups = MeasureGroup\nRoutes = DmmToDut, ScopeToDut\nIviDevices = Matrix1\n"
    "[RQ SwitchDev2]\nRouteGroups = PowerGroup\nRoutes = PowerToDut\nIviDevices = Mux1\n";

// A setup file of this process's own, under a new name each time so no stand-in takes it for the last.
inline void UseSetup(const std::string& text) {
    static int generation = 0;
    std::string path = std::filesystem::temp_directory_path().string() + "\\rqbench-" +
                       std::to_string(::GetCurrentProcessId()) + "-" + std::to_string(++generation) + ".ini";
    std::ofstream(path) << text;
    ::SetEnvironmentVariableA("SM_SIM_SETUP", path.c_str());
}

// A counter of the stand-in `module` as loaded in this process; -1 when it is not loaded.
inline long SimCount(const char* name, const char* module = "qvrq.dll") {
    HMODULE loaded = ::GetModuleHandleA(module);
    auto* counter = loaded ? GetProcAddressAs<long(const char*)>(loaded, "SimCounter") : nullptr;
    return counter ? counter(name) : -1;
}

// The engine unregistered by its own DllUnregisterServer, and registered again at the end.
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

// "qvrq.dll" moved out of the system directory, and back.
class LibraryHidden {
public:
    LibraryHidden() { Hide(); }
    ~LibraryHidden() { Restore(); }
    void Hide() { EXPECT_TRUE(::MoveFileA(File("").c_str(), File(".hidden").c_str())); }
    void Restore() { EXPECT_TRUE(::MoveFileA(File(".hidden").c_str(), File("").c_str())); }

private:
    static std::string File(const char* suffix) {
        char folder[MAX_PATH] = {};
        ::GetSystemDirectoryA(folder, MAX_PATH);
        return std::string(folder) + "\\qvrq.dll" + suffix;
    }
};

inline std::vector<std::string> TextsOf(SAFEARRAY* array) {
    std::vector<std::string> texts;
    for (ULONG index = 0; index < array->rgsabound[0].cElements; ++index)
        texts.push_back(BstrToMultiByte(static_cast<BSTR*>(array->pvData)[index]));
    return texts;
}

}  // namespace sm::testing
