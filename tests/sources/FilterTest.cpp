// Name-listing filters: how the caller's comma-separated filter text is cut, and which driver
// prefixes a filter list lets through.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "DoubleByteCodePage.h"
#include "sources/InfoBase.h"

using namespace sm;
using sm::testing::DoubleByteCodePage;

namespace {
using Texts = std::vector<std::string>;

Texts Split(std::string_view filter) {
    Texts texts;
    for (const auto& piece : SplitFilterList(filter)) texts.emplace_back(piece.View());
    return texts;
}

// The shared filter rule is a base-class operation; a source with no names of its own reaches it.
class FilterOnlySource final : public InfoBase {
public:
    void ListNames(std::string_view, std::uint32_t, const StringVector&, StringVector& names) override { names.clear(); }
};

bool Excluded(std::string_view filter, std::string_view specificPrefix) {
    FilterOnlySource source;
    return source.ExcludedBySpecificPrefix(SplitFilterList(filter), specificPrefix);
}
}  // namespace

TEST(SplitFilterList, PiecesBetweenCommas) {
    EXPECT_EQ(Split(""), Texts{});
    EXPECT_EQ(Split("abc"), Texts{"abc"});
    EXPECT_EQ(Split("a,b,c"), (Texts{"a", "b", "c"}));
    // Two commas in a row give an empty filter text; a final comma adds nothing.
    EXPECT_EQ(Split("a,,b"), (Texts{"a", "", "b"}));
    EXPECT_EQ(Split("a,"), Texts{"a"});
    EXPECT_EQ(Split("a,,"), (Texts{"a", ""}));
    EXPECT_EQ(Split(","), Texts{""});
    EXPECT_EQ(Split(",a"), (Texts{"", "a"}));
}

TEST(SplitFilterList, BlanksAroundPiecesAreRemoved) {
    EXPECT_EQ(Split("  SpecificPrefix=hp34401a ,\tSpecificPrefix = ag34401a\r\n"),
              (Texts{"SpecificPrefix=hp34401a", "SpecificPrefix = ag34401a"}));
    EXPECT_EQ(Split("a , , b"), (Texts{"a", "", "b"}));
    // Blanks alone are one (empty) filter, unlike an empty filter text.
    EXPECT_EQ(Split("   "), Texts{""});
    EXPECT_EQ(Split("a,  "), (Texts{"a", ""}));
}

TEST(ExcludedBySpecificPrefix, PrefixFiltersKeepTheirPrefixesOnly) {
    EXPECT_FALSE(Excluded("", "hp34401a")) << "no filters keep everything";
    const char* filter = "SpecificPrefix=hp34401a, SpecificPrefix = ag34401a";
    for (const char* kept : {"hp34401a", "ag34401a", "AG34401A"}) EXPECT_FALSE(Excluded(filter, kept)) << kept;
    for (const char* excluded : {"ke34401a", "hp34401", ""}) EXPECT_TRUE(Excluded(filter, excluded)) << excluded;
}

TEST(ExcludedBySpecificPrefix, FiltersOfAnotherFormExcludeEveryPrefix) {
    EXPECT_TRUE(Excluded("abc", "hp34401a"));
    EXPECT_TRUE(Excluded("abc, def", "abc"));
    // An empty filter text counts as a filter.
    EXPECT_TRUE(Excluded("   ", "hp34401a"));
    // A prefix filter among others still lets its prefix through.
    EXPECT_FALSE(Excluded("abc,,SpecificPrefix=hp34401a", "hp34401a"));
}

TEST(ExcludedBySpecificPrefix, KeywordFormsThatCount) {
    // The keyword is found in any case, anywhere in the filter, with blanks before "=".
    EXPECT_FALSE(Excluded("specificprefix=hp34401a", "hp34401a"));
    EXPECT_FALSE(Excluded("Use SpecificPrefix \t = hp34401a", "hp34401a"));
    EXPECT_FALSE(Excluded("SpecificPrefix=  hp34401a  ", "hp34401a"));
    // Everything after "=" is the value, blanks inside included.
    EXPECT_FALSE(Excluded("SpecificPrefix=hp 34401a", "hp 34401a"));
    EXPECT_TRUE(Excluded("SpecificPrefix=hp 34401a", "hp"));
}

TEST(ExcludedBySpecificPrefix, KeywordFormsThatDoNotCount) {
    // Nothing after the keyword, no "=" after it, or "=" only before it: the filter names no prefix.
    EXPECT_TRUE(Excluded("SpecificPrefix", "hp34401a"));
    EXPECT_TRUE(Excluded("SpecificPrefix hp34401a", "hp34401a"));
    EXPECT_TRUE(Excluded("x=hp34401a SpecificPrefix", "hp34401a"));
    EXPECT_TRUE(Excluded("Prefix=hp34401a", "hp34401a"));
    // An empty value matches only an empty prefix.
    EXPECT_TRUE(Excluded("SpecificPrefix=", "hp34401a"));
}

TEST_F(DoubleByteCodePage, ExcludedBySpecificPrefixCountsCharactersBeforeTheKeyword) {
    // Positions of the keyword are counted in characters; the value starts right after the "=".
    const std::string wide = "\x82\x81\x82\x82";
    EXPECT_FALSE(Excluded(wide + "SpecificPrefix=hp34401a", "hp34401a"));
    EXPECT_FALSE(Excluded(wide + " SpecificPrefix = " + wide, wide));
    EXPECT_TRUE(Excluded(wide + "SpecificPrefix=hp34401a", "p34401a"));
}
