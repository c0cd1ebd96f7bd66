// Name-listing filters: how the filter text is cut, and which driver prefixes a filter list lets through.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "DoubleByteCodePage.h"
#include "sources/InfoBase.h"

using namespace sm;
using sm::testing::DoubleByteCodePage;
using Texts = std::vector<std::string>;

namespace {
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
    return FilterOnlySource().ExcludedBySpecificPrefix(SplitFilterList(filter), specificPrefix);
}
}  // namespace

// Two commas in a row give an empty filter text, a final comma adds nothing, blanks around pieces go,
// and blanks alone are one (empty) filter, unlike an empty filter text.
TEST(SplitFilterList, PiecesBetweenCommasWithoutTheirBlanks) {
    const std::pair<const char*, Texts> cases[] = {
        {"", {}}, {"a,", {"a"}}, {",a", {"", "a"}}, {"a , , b", {"a", "", "b"}}, {"   ", {""}}, {"a,  ", {"a", ""}},
        {"  SpecificPrefix=hp34401a ,\tSpecificPrefix = ag34401a\r\n", {"SpecificPrefix=hp34401a", "SpecificPrefix = ag34401a"}}};
    for (const auto& [filter, pieces] : cases) EXPECT_EQ(Split(filter), pieces) << filter;
}

TEST(ExcludedBySpecificPrefix, OnlyPrefixFiltersLetTheirPrefixesThrough) {
    const struct { const char *filter, *prefix; bool excluded; } cases[] = {
        {"", "hp34401a", false},  // no filters keep everything
        {"SpecificPrefix=hp34401a, SpecificPrefix = ag34401a", "AG34401A", false},
        {"SpecificPrefix=hp34401a, SpecificPrefix = ag34401a", "ke34401a", true},
        {"SpecificPrefix=hp34401a, SpecificPrefix = ag34401a", "hp34401", true},
        // Filters of another form, an empty filter text included, exclude every prefix...
        {"abc", "hp34401a", true}, {"   ", "hp34401a", true},
        // ...but a prefix filter among them still lets its prefix through.
        {"abc,,SpecificPrefix=hp34401a", "hp34401a", false},
        // The keyword is found in any case, anywhere, with blanks before "="; all after "=" is the value.
        {"specificprefix=hp34401a", "hp34401a", false}, {"Use SpecificPrefix \t = hp34401a", "hp34401a", false},
        {"SpecificPrefix=  hp34401a  ", "hp34401a", false}, {"SpecificPrefix=hp 34401a", "hp 34401a", false},
        // Nothing after the keyword, no "=" after it, "=" only before it, or an empty value: no prefix named.
        {"SpecificPrefix", "hp34401a", true}, {"SpecificPrefix hp34401a", "hp34401a", true},
        {"x=hp34401a SpecificPrefix", "hp34401a", true}, {"Prefix=hp34401a", "hp34401a", true},
        {"SpecificPrefix=", "hp34401a", true}};
    for (const auto& c : cases) EXPECT_EQ(Excluded(c.filter, c.prefix), c.excluded) << c.filter << " / " << c.prefix;
}

TEST_F(DoubleByteCodePage, ExcludedBySpecificPrefixCountsCharactersBeforeTheKeyword) {
    // Positions of the keyword are counted in characters; the value starts right after the "=".
    const std::string wide = "\x82\x81\x82\x82";
    EXPECT_FALSE(Excluded(wide + "SpecificPrefix=hp34401a", "hp34401a"));
    EXPECT_FALSE(Excluded(wide + " SpecificPrefix = " + wide, wide));
    EXPECT_TRUE(Excluded(wide + "SpecificPrefix=hp34401a", "p34401a"));
}
