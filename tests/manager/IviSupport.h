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

// A setup file of this program's own, named through SM_SIM_SETUP before any stand-in reads it.
inline const std::string& SetupPath() {
    static const std::string path = [] {
        char temp[MAX_PATH] = {};
        ::GetTempPathA(MAX_PATH, temp);
        char module[MAX_PATH] = {};
        ::GetModuleFileNameA(nullptr, module, MAX_PATH);
        std::string name(module);
        name = name.substr(name.find_last_of("\\/") + 1);
        std::string file = std::string(temp) + name + ".simsetup.ini";
        ::SetEnvironmentVariableA("SM_SIM_SETUP", file.c_str());
        return file;
    }();
    return path;
}

inline void WriteSetup(const std::string& text) { std::ofstream(SetupPath(), std::ios::trunc) << text; }

// The count kept by the loaded stand-in `module`; -1 when it is not loaded.
inline long SimCount(const char* module, const std::string& counter) {
    HMODULE loaded = ::GetModuleHandleA(module);
    auto* read = loaded ? reinterpret_cast<long (*)(const char*)>(
                              reinterpret_cast<void*>(::GetProcAddress(loaded, "SimCounter")))
                        : nullptr;
    return read ? read(counter.c_str()) : -1;
}

inline Texts NamesOf(SAFEARRAY* array) {
    Texts plain;
    LONG upper = -1;
    if (array) ::SafeArrayGetUBound(array, 1, &upper);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr element;
        ::SafeArrayGetElement(array, &index, element.Put());
        plain.push_back(Text(element.Get()));
    }
    return plain;
}

inline Texts ListNames(IInstrSessionMgr* manager, const wchar_t* category, long flags, const wchar_t* filter = L"") {
    auto categoryText = Bstr(category), filterText = Bstr(filter);
    UniqueSafeArray names;
    HRESULT result =
        manager->GetNames(categoryText.Get(), static_cast<GetNamesOptions>(flags), filterText.Get(), names.Put());
    EXPECT_EQ(result, S_OK) << TakeErrorInfo().description;
    return NamesOf(names.Get());
}

inline Texts ListCategories(IInstrSessionMgr* manager, const wchar_t* category) {
    auto text = Bstr(category);
    UniqueSafeArray categories;
    EXPECT_EQ(manager->GetCategories(text.Get(), categories.Put()), S_OK) << TakeErrorInfo().description;
    return NamesOf(categories.Get());
}

}  // namespace sm::testing
