// Text crossing into and out of automation types.
#include <gtest/gtest.h>

#include "com/BstrConversion.h"
#include "ComTestSupport.h"
#include "framework/CodePage.h"
#include "framework/TEException.h"

using namespace sm;

TEST(BstrConversion, EmptyTextGivesAnEmptyNonNullBstr) {
    UniqueBstr empty(AllocSysString(""));
    ASSERT_NE(empty.Get(), nullptr);
    EXPECT_EQ(::SysStringLen(empty.Get()), 0u);
}

TEST(BstrConversion, RoundTripsText) {
    UniqueBstr text(AllocSysString(DynamicString("CUSTOM::Bench")));
    EXPECT_STREQ(text.Get(), L"CUSTOM::Bench");
    DynamicString back;
    Assign(back, text.Get());
    EXPECT_STREQ(back.GetText(), "CUSTOM::Bench");
    EXPECT_EQ(BstrToMultiByte(nullptr), "");
}

TEST(BstrConversion, UsesTheProcessMultiByteCodePage) {
    int previous = GetMultiByteCodePage();
    ASSERT_TRUE(SetMultiByteCodePage(932));
    // Shift-JIS 0x82 0xA0 is HIRAGANA LETTER A (U+3042).
    UniqueBstr wide(AllocSysString("\x82\xA0"));
    ASSERT_EQ(::SysStringLen(wide.Get()), 1u);
    EXPECT_EQ(wide.Get()[0], L'\x3042');
    EXPECT_EQ(BstrToMultiByte(wide.Get()), "\x82\xA0");
    SetMultiByteCodePage(previous);
}

TEST(SafeArrayOfStrings, KeepsOrderAndBounds) {
    StringVector names{DynamicString("VISA"), DynamicString("CUSTOM"), DynamicString("")};
    UniqueSafeArray array(CreateSafeArray(names));
    ASSERT_TRUE(array);
    EXPECT_EQ(::SafeArrayGetDim(array.Get()), 1u);
    VARTYPE type = VT_EMPTY;
    ::SafeArrayGetVartype(array.Get(), &type);
    EXPECT_EQ(type, VT_BSTR);
    LONG lower = -1, upper = -1;
    ::SafeArrayGetLBound(array.Get(), 1, &lower);
    ::SafeArrayGetUBound(array.Get(), 1, &upper);
    EXPECT_EQ(lower, 0);
    EXPECT_EQ(upper, 2);
    const wchar_t* expected[] = {L"VISA", L"CUSTOM", L""};
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr element;
        ASSERT_EQ(::SafeArrayGetElement(array.Get(), &index, element.Put()), S_OK);
        EXPECT_STREQ(element.Get() ? element.Get() : L"", expected[index]);
    }
}

TEST(SafeArrayOfStrings, EmptyListGivesAnArrayWithNoElements) {
    UniqueSafeArray array(CreateSafeArray({}));
    ASSERT_TRUE(array);
    LONG lower = -1, upper = 0;
    ::SafeArrayGetLBound(array.Get(), 1, &lower);
    ::SafeArrayGetUBound(array.Get(), 1, &upper);
    EXPECT_EQ(lower, 0);
    EXPECT_EQ(upper, -1);
}
