// Text crossing into and out of automation types.
#include <gtest/gtest.h>

#include "com/BstrConversion.h"
#include "ComTestSupport.h"
#include "DoubleByteCodePage.h"

using namespace sm;
using namespace sm::testing;

TEST(BstrConversion, RoundTripsTextAndEmptyIsANonNullBstr) {
    UniqueBstr empty(AllocSysString(""));
    ASSERT_NE(empty.Get(), nullptr);
    EXPECT_EQ(::SysStringLen(empty.Get()), 0u);
    UniqueBstr text(AllocSysString(DynamicString("CUSTOM::Bench")));
    EXPECT_STREQ(text.Get(), L"CUSTOM::Bench");
    DynamicString back;
    Assign(back, text.Get());
    EXPECT_STREQ(back.GetText(), "CUSTOM::Bench");
    EXPECT_EQ(BstrToMultiByte(nullptr), "");
}

TEST_F(DoubleByteCodePage, BstrConversionUsesTheProcessCodePage) {
    // Shift-JIS 0x82 0xA0 is HIRAGANA LETTER A (U+3042).
    UniqueBstr wide(AllocSysString("\x82\xA0"));
    ASSERT_EQ(::SysStringLen(wide.Get()), 1u);
    EXPECT_EQ(wide.Get()[0], L'\x3042');
    EXPECT_EQ(BstrToMultiByte(wide.Get()), "\x82\xA0");
}

TEST(SafeArrayOfStrings, KeepsOrderBoundsAndEmptyLists) {
    UniqueSafeArray array(CreateSafeArray({DynamicString("VISA"), DynamicString("CUSTOM"), DynamicString("")}));
    EXPECT_EQ(ReadTexts(array.Get()), (std::vector<std::string>{"VISA", "CUSTOM", ""}));
    UniqueSafeArray empty(CreateSafeArray({}));
    EXPECT_EQ(ReadTexts(empty.Get()), std::vector<std::string>{});
}
