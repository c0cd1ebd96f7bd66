// Name syntax: the category separator and the external-process prefixes.
#include <gtest/gtest.h>

#include <string>

#include "sources/SessionName.h"

using namespace sm;

namespace {
// FindCategorySeparator's position and length as "position/length"; a missing separator fails the calling test.
std::string SeparatorOf(const std::string& text) {
    std::size_t position = 99, length = 99;
    EXPECT_TRUE(FindCategorySeparator(text, &position, &length)) << "text " << text;
    return std::to_string(position) + "/" + std::to_string(length);
}
}  // namespace

// The full rules are the name fuzz rule's (FuzzReplay.SessionName); one name of each form here.
TEST(CategorySeparator, EveryFormHasItsLength) {
    const struct { const char *text, *found; } cases[] = {
        {"VISA:GPIB0", "4/1"}, {"VISA::GPIB0", "4/2"}, {"VISA://GPIB0", "4/3"}, {"VISA/GPIB0", "4/1"},
        {"VISA\\\\GPIB0", "4/2"}, {"A:::B", "1/2"}, {"A/:B", "1/1"}, {"GPIB0::3/x", "5/2"}, {"::DMM1", "0/2"}};
    for (const auto& c : cases) EXPECT_EQ(SeparatorOf(c.text), c.found) << c.text;
}

TEST(ExternalPrefix, RecognisedForms) {
    const struct { const char* text; bool external; int processIndex; const char *stripped, *added; } cases[] = {
        {"*VISA::x", true, 0, "VISA::x", "*VISA::x"}, {"32*rq::Route1", true, 1, "rq::Route1", "32*rq::Route1"},
        // Only the switch category has a 32-bit external process.
        {"32*VISA::x", false, 0, "32*VISA::x", "*32*VISA::x"}, {"**x", true, 0, "*x", "**x"}};
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

TEST(CategoryCompare, AnyAndCaseInsensitiveTokens) {
    for (auto [text, any] : {std::pair{"", true}, {"?", true}, {"??", false}, {" ", false}}) EXPECT_EQ(IsAnyCategory(text), any) << text;
    EXPECT_TRUE(SameCategory("visa", CategoryVISA) && SameCategory("VxiPnp", CategoryVXIPNP));
    EXPECT_FALSE(SameCategory("VISA ", CategoryVISA) || SameCategory("VIS", CategoryVISA));
}
