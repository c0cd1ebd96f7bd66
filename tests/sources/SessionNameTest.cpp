// The name syntax every caller relies on: where a category ends (separator position and length) and
// how the external-process prefixes are recognised, removed and added.
#include <gtest/gtest.h>

#include "DoubleByteCodePage.h"

#include <string>

#include "framework/CodePage.h"
#include "sources/SessionName.h"

using namespace sm;
using sm::testing::DoubleByteCodePage;
using sm::testing::wideA;

namespace {
// FindCategorySeparator's position and length as "position/length"; a missing separator fails the calling test.
std::string SeparatorOf(const std::string& text) {
    std::size_t position = 99, length = 99;
    EXPECT_TRUE(FindCategorySeparator(text, &position, &length)) << "text " << text;
    return std::to_string(position) + "/" + std::to_string(length);
}

// A Shift-JIS character whose trail byte is a backslash (0x5C).
const std::string trailBackslash = "\x83\x5C";
}  // namespace

TEST(CategorySeparator, EveryFormHasItsLength) {
    const struct { const char *text, *found; } cases[] = {
        {"VISA:GPIB0", "4/1"},    {"VISA::GPIB0", "4/2"},   {"VISA:\\GPIB0", "4/2"},  {"VISA:/GPIB0", "4/2"},
        {"VISA:\\\\GPIB0", "4/3"}, {"VISA://GPIB0", "4/3"},  {"VISA:/\\GPIB0", "4/3"}, {"VISA:\\/GPIB0", "4/3"},
        {"VISA/GPIB0", "4/1"},    {"VISA//GPIB0", "4/2"},   {"VISA/\\GPIB0", "4/2"},  {"VISA\\GPIB0", "4/1"},
        {"VISA\\\\GPIB0", "4/2"}, {"VISA\\/GPIB0", "4/2"},
        // Only the characters after the first one count; longer runs are cut at the longest form.
        {"A:::B", "1/2"}, {"A///B", "1/2"}, {"A:\\\\\\B", "1/3"},
        // A slash or backslash run never absorbs a colon.
        {"A/:B", "1/1"}, {"A\\:B", "1/1"},
        // The first separator character wins over a longer form later in the text.
        {"GPIB0::3/x", "5/2"}, {"A/B::C", "1/1"},
        // At the edges.
        {"::DMM1", "0/2"}, {"CUSTOM:", "6/1"}, {"CUSTOM::", "6/2"}, {"CUSTOM:/\\", "6/3"},
    };
    for (const auto& c : cases) EXPECT_EQ(SeparatorOf(c.text), c.found) << c.text;
    std::size_t position = 7, length = 7;
    for (const char* plain : {"", "DMM1", "a.b-c_d*e|f"}) EXPECT_FALSE(FindCategorySeparator(plain, &position, &length)) << plain;
    EXPECT_TRUE(FindCategorySeparator("IVI/DMM1", nullptr, nullptr)) << "outputs are optional";
}

TEST_F(DoubleByteCodePage, SeparatorPositionCountsCharactersAndATrailByteBackslashIsNoSeparator) {
    EXPECT_EQ(SeparatorOf(wideA + wideA + "::x"), "2/2");
    EXPECT_EQ(SeparatorOf("a" + wideA + "b/" + wideA), "3/1");
    // A byte scan would stop inside the double-byte character at its 0x5C trail byte.
    std::size_t position = 7, length = 7;
    EXPECT_FALSE(FindCategorySeparator(trailBackslash + "DMM", &position, &length));
    EXPECT_EQ(SeparatorOf(trailBackslash + trailBackslash + "::DMM"), "2/2");
    // A double-byte character right after a colon does not lengthen the separator.
    EXPECT_EQ(SeparatorOf("IVI:" + trailBackslash), "3/1");
}

TEST(ExternalPrefix, RecognisedForms) {
    const struct { const char* text; bool external; int processIndex; const char *stripped, *added; } cases[] = {
        {"*VISA::x", true, 0, "VISA::x", "*VISA::x"},
        {"32*RQ", true, 1, "RQ", "32*RQ"},
        {"32*rq", true, 1, "rq", "32*rq"},
        {"32*RQ::Route1", true, 1, "RQ::Route1", "32*RQ::Route1"},
        {"32*rq::Route1", true, 1, "rq::Route1", "32*rq::Route1"},
        // Only the switch category has a 32-bit external process.
        {"32*VISA::x", false, 0, "32*VISA::x", "*32*VISA::x"},
        {"32*RQX", false, 0, "32*RQX", "*32*RQX"},
        {"32*RQ:Route1", false, 0, "32*RQ:Route1", "*32*RQ:Route1"},
        // One "*" is one prefix: a second one belongs to the name.
        {"**x", true, 0, "*x", "**x"},
        {"*", true, 0, "", "*"},
        {"VISA::x", false, 0, "VISA::x", "*VISA::x"},
        {"", false, 0, "", "*"},
        {"x*", false, 0, "x*", "*x*"},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.text);
        EXPECT_EQ(HasExternalPrefix(c.text), c.external);
        EXPECT_EQ(ExternalProcessIndex(c.text), c.processIndex);
        DynamicString stripped(c.text), added(c.text);
        StripExternalPrefix(stripped);
        EXPECT_EQ(stripped.View(), c.stripped);
        AddExternalPrefix(added);
        EXPECT_EQ(added.View(), c.added);
    }
    // The session name property applies the prefix to a 260-byte path-sized buffer too.
    StaticString<260> name("32*RQ::Route1");
    StripExternalPrefix(name);
    AddExternalPrefix(name);
    EXPECT_EQ(name.View(), "*RQ::Route1");
}

TEST_F(DoubleByteCodePage, PrefixesAroundDoubleByteNames) {
    DynamicString text("*" + wideA + "::x"), route("32*RQ::" + wideA);
    StripExternalPrefix(text);
    EXPECT_EQ(text.View(), wideA + "::x");
    AddExternalPrefix(text);
    EXPECT_EQ(text.View(), "*" + wideA + "::x");
    EXPECT_EQ(ExternalProcessIndex(route.View()), 1);
    StripExternalPrefix(route);
    EXPECT_EQ(route.View(), "RQ::" + wideA);
}

TEST(CategoryCompare, AnyAndCaseInsensitiveTokens) {
    for (auto [text, any] : {std::pair{"", true}, {"?", true}, {"??", false}, {" ", false}}) EXPECT_EQ(IsAnyCategory(text), any) << text;
    EXPECT_TRUE(SameCategory("visa", CategoryVISA) && SameCategory("VxiPnp", CategoryVXIPNP));
    EXPECT_FALSE(SameCategory("VISA ", CategoryVISA) || SameCategory("VIS", CategoryVISA));
}
