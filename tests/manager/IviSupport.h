// Shared by the IVI test programs: the simulated setup file the stand-ins read, their call
// counters, and name lists through the manager.
#pragma once

#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <vector>

#include "com/ComClient.h"

namespace sm::testing {

using Texts = std::vector<std::string>;

// This program's own setup file, named through SM_SIM_SETUP before any stand-in reads it.
inline void WriteSetup(const std::string& text) {
    static const std::string path = [] {
        char temp[MAX_PATH] = {};
        ::GetTempPathA(MAX_PATH, temp);
        std::string file = std::string(temp) + "simsetup-" + std::to_string(::GetCurrentProcessId()) + ".ini";
        ::SetEnvironmentVariableA("SM_SIM_SETUP", file.c_str());
        return file;
    }();
    std::ofstream(path, std::ios::trunc) << text;
}

// The count kept by the loaded stand-in `module`; -1 when it is not loaded.
inline long SimCount(const char* module, const std::string& counter) {
    HMODULE loaded = ::GetModuleHandleA(module);
    FARPROC read = loaded ? ::GetProcAddress(loaded, "SimCounter") : nullptr;
    return read ? reinterpret_cast<long (*)(const char*)>(reinterpret_cast<void*>(read))(counter.c_str()) : -1;
}

// GetNames (flags given) or GetCategories (no flags) as plain texts.
inline Texts List(IInstrSessionMgr* manager, const wchar_t* category, long flags = -1, const wchar_t* filter = L"") {
    auto categoryText = Bstr(category), filterText = Bstr(filter);
    UniqueSafeArray array;
    HRESULT result = flags < 0 ? manager->GetCategories(categoryText.Get(), array.Put())
                               : manager->GetNames(categoryText.Get(), static_cast<GetNamesOptions>(flags),
                                                   filterText.Get(), array.Put());
    EXPECT_EQ(result, S_OK) << TakeErrorInfo().description;
    Texts plain;
    LONG upper = -1;
    if (array) ::SafeArrayGetUBound(array.Get(), 1, &upper);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr element;
        ::SafeArrayGetElement(array.Get(), &index, element.Put());
        plain.push_back(Text(element.Get()));
    }
    return plain;
}

}  // namespace sm::testing
