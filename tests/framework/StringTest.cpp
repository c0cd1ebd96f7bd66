// String family: storage kinds, copy-on-write sharing, character positions and message arguments.
#include <gtest/gtest.h>

#include "DoubleByteCodePage.h"

#include <string>

#include "framework/String.h"
#include "framework/TEException.h"

using namespace sm;
using namespace sm::testing;

namespace {
DynamicString Replaced(const char* text, int argument, std::string_view value) {
    DynamicString message(text);
    message.ReplaceArg(argument, value);
    return message;
}
}  // namespace

TEST_F(DoubleByteCodePage, StaticStringNeverSplitsADoubleByteCharacter) {
    // 255 single bytes then a double-byte character straddling byte 256: only 255 bytes fit whole; a
    // longer text is cut at the capacity.
    EXPECT_EQ(StaticString<256>(std::string(255, 'y') + wideA + std::string(43, 'z')).View(), std::string(255, 'y'));
    EXPECT_EQ(StaticString<256>(std::string(254, 'y') + wideA + "tail").View(), std::string(254, 'y') + wideA);
}

TEST_F(DoubleByteCodePage, PositionsCountCharactersNotBytes) {
    DynamicString text(wideA + "b" + wideA + "c"), middle;
    EXPECT_EQ(text.CharCount(), 4u);
    std::size_t found = 99;
    ASSERT_TRUE(text.Find("c", 0, false, &found));
    EXPECT_EQ(found, 3u);
    text.Mid(1, 2, middle);
    EXPECT_EQ(middle.View(), "b" + wideA);
    text.Delete(0, 1);
    text.Insert("X", 2);
    EXPECT_EQ(text.View(), "b" + wideA + "Xc");
}

TEST_F(DoubleByteCodePage, FindAndAssignNeverSplitADoubleByteCharacter) {
    // 0x82 0x61: the trail byte is 'a', which must not be found as a character of its own.
    std::size_t found = 99;
    ASSERT_TRUE(DynamicString(std::string("\x82\x61") + "xa").Find("a", 0, false, &found));
    EXPECT_EQ(found, 2u);
    DynamicString cut;
    EXPECT_EQ(cut.AssignBytes(("ab" + wideA).c_str(), 3).View(), "ab");
    cut.AssignChars(("ab" + wideA).c_str(), 3);
    EXPECT_EQ(cut.View(), "ab" + wideA);
}

TEST(DynamicStringSharing, CopiesShareOneBufferUntilWritten) {
    DynamicString first("shared text"), second(first), third;
    third.Assign(first);
    EXPECT_EQ(first.SharedBuffer(), second.SharedBuffer());
    EXPECT_EQ(third.SharedBuffer(), first.SharedBuffer());
    second.Append(" changed");
    third.GetWritableText()[0] = 'S';
    EXPECT_EQ(std::string(first.View()) + "|" + std::string(second.View()) + "|" + std::string(third.View()),
              "shared text|shared text changed|Shared text");
    EXPECT_NE(second.SharedBuffer(), first.SharedBuffer());
}

TEST(DynamicStringSharing, NewStringsStartOnTheGlobalEmptyBufferAndSelfEditsAreSafe) {
    DynamicString a, b;
    EXPECT_EQ(b.SharedBuffer(), CopyOnWriteMemory::GlobalEmpty());
    a.Append("x");
    EXPECT_STREQ(b.GetText(), "");
    EXPECT_NE(a.SharedBuffer(), CopyOnWriteMemory::GlobalEmpty());
    DynamicString text("abc");
    EXPECT_STREQ(text.Append(text).GetText(), "abcabc");
    text.Mid(1, 2, text);
    EXPECT_STREQ(text.GetText(), "bc");
}

TEST(StringCompare, CaseRulesAndCountedForms) {
    DynamicString text("IdQuery=1");
    EXPECT_EQ(text.Compare("idquery=1", true), 0);
    EXPECT_NE(text.Compare("idquery=1", false), 0);
    EXPECT_LT(DynamicString("abc").Compare("abd", false), 0);
    EXPECT_LT(DynamicString("ab").Compare("abc", false), 0);
    EXPECT_EQ(text.Compare("IDQxxx", true, 3), 0);
    EXPECT_EQ(text.Compare("query", true, 5, 2), 0);
    EXPECT_TRUE(text.BeginsWith("idq", true));
    EXPECT_FALSE(DynamicString("id").BeginsWith("idq", true));
}

TEST(StringFind, CaseInsensitiveFindsUpperInLowerAndStartPositionsCount) {
    DynamicString text("idQuery=1");
    std::size_t found = 99;
    ASSERT_TRUE(text.Find("IDQUERY", 0, true, &found));
    EXPECT_EQ(found, 0u);
    EXPECT_FALSE(text.Find("IDQUERY", 0, false, &found));
    EXPECT_FALSE(text.Find("id", 1, true, &found));
    ASSERT_TRUE(DynamicString("a=b;a=c").Find("a=", 1, false, &found));
    EXPECT_EQ(found, 4u);
}

TEST(StringEdits, DeleteInsertReplace) {
    // Trimming is checked through the filter list; the ends and the "to the end" count are here.
    DynamicString edit("0123456789");
    edit.Delete(3, 2);
    edit.Delete(5, -1);
    edit.Insert("ab", 0);
    edit.Insert("Z", 100);
    EXPECT_STREQ(edit.GetText(), "ab01256Z");
    DynamicString replace("one TWO two");
    EXPECT_TRUE(replace.ReplaceFirst("two", "2", true));
    EXPECT_FALSE(replace.ReplaceFirst("three", "3", true));
    EXPECT_STREQ(replace.GetText(), "one 2 two");
}

TEST(StringReplaceArg, FillsFirstPlaceholderOnlyAndAMissingOneAppendsTheTail) {
    EXPECT_EQ(Replaced("%1 and %1", 1, "x").View(), "x and %1");
    EXPECT_EQ(Replaced("No placeholder here", 2, "x").View(), "No placeholder here COULD NOT FIND %2TO REPLACE WITH x ");
    DynamicString numbered("code %1, path %2");
    numbered.ReplaceArg(1, std::int64_t{-17402}, "%d");
    numbered.ReplaceArg(2, std::string_view("C:\\x"));
    EXPECT_STREQ(numbered.GetText(), "code -17402, path C:\\x");
}

TEST(StringNumbers, FullSixtyFourBitValues) {
    DynamicString text;
    text.AppendInteger(INT64_MIN).Append("|").AppendUnsigned(UINT64_MAX).Append("|");
    text.AppendUnsigned(0x123456789ABCDEF0ull, "%x").Append("|").AppendDouble(0.1).Append("|").AppendDouble(1.0 / 3.0);
    EXPECT_STREQ(text.GetText(), "-9223372036854775808|18446744073709551615|123456789abcdef0|0.1|0.3333333333333");
}
