// The simulated switch product as the switch tests arrange it: their own setup file, the engine's
// registration and the library file taken away and put back, and the stand-ins' call counters.
#pragma once

#include <gtest/gtest.h>
#include <windows.h>

#include <string>
#include <vector>

#include "com/BstrConversion.h"
#include "com/LibraryBinding.h"
#include "com/UniqueHandles.h"
#include "sources/RQEngine.h"

namespace sm::testing {

constexpr const char* rqBench =
    "[RQ]\nFailingSessions = BrokenRoute\nOpenStatus = -1\n"
    "[RQ SwitchDev1]\nRouteGroups = MeasureGroup\nRoutes = DmmToDut, ScopeToDut\nIviDevices = Matrix1\n"
    "[RQ SwitchDev2]\nRouteGroups = PowerGroup\nRoutes = PowerToDut\nIviDevices = Mux1\n";

// A setup file of this process's own, under a new name each time so no stand-in takes it for the last.
inline void UseSetup(const std::string& text) {
    static int generation = 0;
    char folder[MAX_PATH] = {};
    ::GetTempPathA(MAX_PATH, folder);
    std::string path = std::string(folder) + "rqbench-" + std::to_string(::GetCurrentProcessId()) + "-" +
                       std::to_string(++generation) + ".ini";
    UniqueKernelHandle file(::CreateFileA(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr));
    DWORD written = 0;
    ASSERT_TRUE(::WriteFile(file.Get(), text.data(), static_cast<DWORD>(text.size()), &written, nullptr));
    ::SetEnvironmentVariableA("SM_SIM_SETUP", path.c_str());
}

// A counter of the stand-in `module` as loaded in this process; -1 when it is not loaded.
inline long SimCount(const char* module, const char* name) {
    HMODULE loaded = ::GetModuleHandleA(module);
    auto* counter = loaded ? GetProcAddressAs<long(const char*)>(loaded, "SimCounter") : nullptr;
    return counter ? counter(name) : -1;
}

// The engine unregistered by its own DllUnregisterServer, and registered again at the end.
class EngineUnregistered {
public:
    EngineUnregistered() {
        wchar_t clsid[64] = {}, path[MAX_PATH] = {};
        ::StringFromGUID2(CLSID_RQEngine, clsid, 64);
        LONG size = sizeof path;
        ::RegQueryValueW(HKEY_CLASSES_ROOT, (std::wstring(L"CLSID\\") + clsid + L"\\InprocServer32").c_str(), path, &size);
        engine = UniqueModule(::LoadLibraryW(path));
        EXPECT_EQ(Call("DllUnregisterServer"), S_OK) << "is the engine installed (sm_install_sim)?";
    }
    ~EngineUnregistered() { EXPECT_EQ(Call("DllRegisterServer"), S_OK); }

private:
    HRESULT Call(const char* name) {
        auto* function = engine ? GetProcAddressAs<HRESULT()>(engine.Get(), name) : nullptr;
        return function ? function() : E_FAIL;
    }
    UniqueModule engine;
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
    LONG upper = -1;
    ::SafeArrayGetUBound(array, 1, &upper);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr element;
        ::SafeArrayGetElement(array, &index, element.Put());
        texts.push_back(BstrToMultiByte(element.Get()));
    }
    return texts;
}

}  // namespace sm::testing
