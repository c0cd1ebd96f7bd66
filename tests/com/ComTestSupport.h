// Helpers shared by the Wine-run COM tests.
#pragma once

#include <gtest/gtest.h>
#include <objbase.h>

#include <string>
#include <vector>

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

// A failure as a client sees it: the HRESULT, then the error info's description and class.
inline void ExpectComError(HRESULT result, unsigned long code, const std::string& description, REFGUID source) {
    EXPECT_EQ(static_cast<unsigned long>(result), code);
    ReportedError reported = TakeErrorInfo();
    EXPECT_TRUE(reported.present);
    EXPECT_EQ(reported.description, description);
    EXPECT_TRUE(IsEqualGUID(reported.guid, source));
}

// TE codes as HRESULTs.
constexpr unsigned long outOfRange = 0xFFFFBC6C;         // -17300
constexpr unsigned long unrecognizedValue = 0xFFFFBC68;  // -17304
constexpr unsigned long duplicateItem = 0xFFFFBC67;      // -17305
constexpr unsigned long typeMismatch = 0xFFFFBC57;       // -17321
constexpr unsigned long invalidPointer = 0xFFFFBC3E;     // -17346
constexpr unsigned long timedOut = 0xFFFFBC06;           // -17402
constexpr unsigned long operationFailed = 0xFFFFBBA4;    // -17500
inline HRESULT Code(std::int32_t code) { return static_cast<HRESULT>(code); }  // a TE code as the caller sees it

// The elements of a one-dimensional array from 0 of this element type, the only valid listing. Under
// Wine an array that crossed an apartment loses its element type (not its elements): pass VT_EMPTY.
template <class Element>
std::vector<Element> ReadSafeArray(SAFEARRAY* array, VARTYPE elementType) {
    std::vector<Element> elements;
    EXPECT_NE(array, nullptr) << "an empty listing must still be an array";
    if (!array) return elements;
    EXPECT_EQ(::SafeArrayGetDim(array), 1u);
    VARTYPE type = elementType;
    if (elementType != VT_EMPTY) { EXPECT_TRUE(::SafeArrayGetVartype(array, &type) == S_OK && type == elementType) << type; }
    LONG lower = -1, upper = -2;
    ::SafeArrayGetLBound(array, 1, &lower);
    ::SafeArrayGetUBound(array, 1, &upper);
    EXPECT_EQ(lower, 0);
    for (LONG index = lower; index <= upper; ++index) {
        Element element{};
        EXPECT_EQ(::SafeArrayGetElement(array, &index, element.Put()), S_OK);
        elements.push_back(std::move(element));
    }
    return elements;
}

inline std::vector<std::string> ReadTexts(SAFEARRAY* array) {
    std::vector<std::string> texts;
    for (const UniqueBstr& text : ReadSafeArray<UniqueBstr>(array, VT_BSTR)) texts.push_back(BstrToMultiByte(text.Get()));
    return texts;
}

}  // namespace sm::testing
