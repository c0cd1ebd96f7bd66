// Helpers shared by the Wine-run COM tests.
#pragma once

#include <gtest/gtest.h>
#include <objbase.h>

#include <string>

#include "com/BstrConversion.h"
#include "com/ComPtr.h"
#include "com/UniqueHandles.h"

namespace sm::testing {

// Keeps the test thread in the multithreaded apartment, where the product's objects live.
class MultithreadedApartment : public ::testing::Environment {
public:
    void SetUp() override { ASSERT_TRUE(SUCCEEDED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))); }
    void TearDown() override { ::CoUninitialize(); }
};

struct ReportedError {
    bool present = false;
    GUID guid{};
    std::string description;
};

// Reads and clears the thread's error info.
inline ReportedError TakeErrorInfo() {
    ReportedError reported;
    ComPtr<IErrorInfo> info;
    if (::GetErrorInfo(0, info.Put()) != S_OK || !info) return reported;
    reported.present = true;
    info->GetGUID(&reported.guid);
    UniqueBstr description;
    info->GetDescription(description.Put());
    reported.description = BstrToMultiByte(description.Get());
    return reported;
}

}  // namespace sm::testing
