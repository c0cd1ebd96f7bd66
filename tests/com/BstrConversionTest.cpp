// Text crossing into and out of automation types.
#include <gtest/gtest.h>

#include "com/BstrConversion.h"
#include "ComTestSupport.h"
#include "DoubleByteCodePage.h"

using namespace sm;
using namespace sm::testing;

// Catches an empty text handed to clients as a null BSTR (scripts read it as Empty, not "").
TEST(BstrConversion, EmptyIsANonNullBstr) {
    UniqueBstr empty(AllocSysString(""));
    ASSERT_NE(empty.Get(), nullptr);
    EXPECT_EQ(::SysStringLen(empty.Get()), 0u);
}

TEST_F(DoubleByteCodePage, BstrConversionUsesTheProcessCodePage) {
    // Shift-JIS 0x82 0xA0 is HIRAGANA LETTER A (U+3042).
    UniqueBstr wide(AllocSysString("\x82\xA0"));
    ASSERT_EQ(::SysStringLen(wide.Get()), 1u);
    EXPECT_EQ(wide.Get()[0], L'\x3042');
    EXPECT_EQ(BstrToMultiByte(wide.Get()), "\x82\xA0");
}
