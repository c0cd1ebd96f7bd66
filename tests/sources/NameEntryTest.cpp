// The helpers every configuration source uses on its lists of configured names: lookup, selection
// for a name listing and the text form written into state descriptions.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "DoubleByteCodePage.h"
#include "sources/NameEntry.h"

using namespace sm;
using sm::testing::DoubleByteCodePage;

namespace {
NameEntry Entry(std::string_view name, std::uint32_t flags) {
    NameEntry entry;
    entry.name.Assign(name);
    entry.flags = flags;
    return entry;
}

std::vector<std::string> Texts(const StringVector& names) {
    std::vector<std::string> texts;
    for (const auto& name : names) texts.emplace_back(name.View());
    return texts;
}

using Names = std::vector<std::string>;

// One entry of every flag combination that a source produces, named after its kind.
NameEntryList MixedList() {
    return {
        Entry("Logical", LogicalName),
        Entry("Virtual", VirtualInstrumentName),
        Entry("Both", LogicalName | VirtualInstrumentName),
        Entry("HiddenLogical", LogicalName | DoNotDisplayName),
        Entry("HiddenVirtual", VirtualInstrumentName | DoNotDisplayName),
        Entry("NoKind", 0),
        Entry("HiddenNoKind", DoNotDisplayName),
    };
}

Names Selected(bool wantVirtualInstruments, bool wantLogicalNames, bool wantHidden) {
    StringVector out;
    AppendSelectedNames(MixedList(), false, "IVI", wantVirtualInstruments, wantLogicalNames, wantHidden, out);
    return Texts(out);
}
}  // namespace

TEST(ContainsName, MatchesWholeNamesIgnoringCase) {
    NameEntryList list = {Entry("DMM1", LogicalName), Entry("Scope", VirtualInstrumentName)};
    for (const char* name : {"DMM1", "dmm1", "SCOPE"}) EXPECT_TRUE(ContainsName(list, name)) << name;
    for (const char* name : {"DMM", "DMM12", ""}) EXPECT_FALSE(ContainsName(list, name)) << name;
    EXPECT_FALSE(ContainsName({}, "DMM1"));
    EXPECT_FALSE(ContainsName({}, ""));
    // Hidden names are still configured names.
    EXPECT_TRUE(ContainsName({Entry("Secret", DoNotDisplayName)}, "secret"));
}

TEST_F(DoubleByteCodePage, ContainsNameFoldsNoDoubleByteCharacter) {
    // 0x82 0x41 and 0x82 0x61 differ only in a trail byte that looks like "A" and "a"; folding it
    // would make two different characters equal.
    NameEntryList list = {Entry("\x82\x41", LogicalName)};
    EXPECT_TRUE(ContainsName(list, "\x82\x41"));
    EXPECT_FALSE(ContainsName(list, "\x82\x61"));
}

TEST(AppendSelectedNames, SelectionByKindAndVisibility) {
    EXPECT_EQ(Selected(false, false, false), Names{});
    EXPECT_EQ(Selected(false, false, true), Names{});
    EXPECT_EQ(Selected(true, false, false), (Names{"Virtual", "Both"}));
    EXPECT_EQ(Selected(true, false, true), (Names{"Virtual", "Both", "HiddenVirtual"}));
    EXPECT_EQ(Selected(false, true, false), (Names{"Logical", "Both"}));
    EXPECT_EQ(Selected(false, true, true), (Names{"Logical", "Both", "HiddenLogical"}));
    // A name of both kinds appears once, in list order.
    EXPECT_EQ(Selected(true, true, false), (Names{"Logical", "Virtual", "Both"}));
    EXPECT_EQ(Selected(true, true, true), (Names{"Logical", "Virtual", "Both", "HiddenLogical", "HiddenVirtual"}));
}

TEST(AppendSelectedNames, PrefixAndAppending) {
    StringVector out;
    out.emplace_back("Earlier");
    AppendSelectedNames(MixedList(), true, "VXIPNP", true, false, false, out);
    EXPECT_EQ(Texts(out), (Names{"Earlier", "VXIPNP::Virtual", "VXIPNP::Both"}));
    // Without addPrefix the prefix text is ignored.
    AppendSelectedNames({Entry("DMM1", LogicalName)}, false, "VXIPNP", false, true, false, out);
    EXPECT_EQ(out.back().View(), "DMM1");
    EXPECT_EQ(out.size(), 4u);
    AppendSelectedNames({}, true, "IVI", true, true, true, out);
    EXPECT_EQ(out.size(), 4u);
}

TEST(AppendNameListText, FlagWordsInFixedOrder) {
    NameEntryList list = {
        Entry("DMM1", LogicalName),
        Entry("Scope", VirtualInstrumentName | DoNotDisplayName),
        Entry("X", 0),
        Entry("All", DoNotDisplayName | VirtualInstrumentName | LogicalName),
        Entry("Secret", DoNotDisplayName),
    };
    DynamicString text("Names: ");
    AppendNameListText(list, text);
    EXPECT_EQ(text.View(),
              "Names: DMM1 (LogicalName), Scope (VirtualInstrumentName, DoNotDisplayName), X (No Name Flags), "
              "All (LogicalName, VirtualInstrumentName, DoNotDisplayName), Secret (DoNotDisplayName)");
}

TEST(AppendNameListText, EmptyListAndSingleEntry) {
    DynamicString single;
    AppendNameListText({Entry("", 0)}, single);
    EXPECT_EQ(single.View(), " (No Name Flags)");
    // Fixed-capacity targets take the text too.
    StaticString<64> fixed;
    AppendNameListText({Entry("DMM1", LogicalName | VirtualInstrumentName)}, fixed);
    EXPECT_EQ(fixed.View(), "DMM1 (LogicalName, VirtualInstrumentName)");
}
