// Character rules of the code page seam; the same expectations hold natively and under Wine.
#include <gtest/gtest.h>

#include "DoubleByteCodePage.h"
#include "framework/CodePage.h"
#include "framework/MultiByte.h"

using namespace sm;
using sm::testing::DoubleByteCodePage;

TEST(CodePageSeam, SwitchesBetweenSingleAndDoubleByte) {
    sm::testing::CodePageScope scope(932);
    EXPECT_TRUE(IsLeadByte(0x82));
    EXPECT_TRUE(IsLeadByte(0xE0));
    EXPECT_FALSE(IsLeadByte('a'));
    EXPECT_FALSE(IsLeadByte(0xA0));  // half-width katakana are single bytes
    ASSERT_TRUE(SetMultiByteCodePage(1252));
    EXPECT_FALSE(IsLeadByte(0x82));
    EXPECT_EQ(LowerSingleByte('Q'), 'q');
    EXPECT_EQ(LowerSingleByte(0xC9), 0xE9);  // E acute
}

TEST_F(DoubleByteCodePage, CaseInsensitiveCompareTakesDoubleByteCharactersAsWholeCodes) {
    // "\x82\x60" and "\x82\x81" differ in the trail byte only; lower-casing must not touch trails.
    EXPECT_NE(multibyte::Compare("\x82\x60", "\x82\x81", true), 0);
    EXPECT_EQ(multibyte::Compare("AB\x82\x60", "ab\x82\x60", true), 0);
    EXPECT_EQ(multibyte::ToLower("A\x82\x41Z"), "a\x82\x41z");
}
