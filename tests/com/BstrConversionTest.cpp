// Text crossing into and out of automation types.
#include <gtest/gtest.h>

#include "com/BstrConversion.h"
#include "ComTestSupport.h"
#include "DoubleByteCodePage.h"

using namespace sm;
using namespace sm::testing;

TEST_F(DoubleByteCodePage, BstrConversionUsesTheProcessCodePage) {
    // Shift-JIS 0x82 0xA0 is HIRAGANA LETTER A (U+3042).
    UniqueBstr wide(AllocSysString("\x82\xA0"));
    ASSERT_EQ(::SysStringLen(wide.Get()), 1u);
    EXPECT_EQ(wide.Get()[0], L'\x3042');
    EXPECT_EQ(BstrToMultiByte(wide.Get()), "\x82\xA0");
}
