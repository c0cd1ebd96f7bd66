// Lists of configured names: lookup, selection for a listing and the text of state descriptions.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "DoubleByteCodePage.h"
#include "sources/NameEntry.h"

using namespace sm;
using sm::testing::DoubleByteCodePage;
using Names = std::vector<std::string>;

namespace {
NameEntry Entry(std::string_view name, std::uint32_t flags) {
    NameEntry entry;
    entry.name.Assign(name);
    entry.flags = flags;
    return entry;
}

Names Texts(const StringVector& names) {
    Names texts;
    for (const auto& name : names) texts.emplace_back(name.View());
    return texts;
}

// One entry of every flag combination that a source produces, named after its kind.
const NameEntryList mixed = {Entry("Logical", LogicalName), Entry("Virtual", VirtualInstrumentName),
                             Entry("Both", LogicalName | VirtualInstrumentName),
                             Entry("HiddenLogical", LogicalName | DoNotDisplayName),
                             Entry("HiddenVirtual", VirtualInstrumentName | DoNotDisplayName), Entry("NoKind", 0),
                             Entry("HiddenNoKind", DoNotDisplayName)};
}  // namespace

TEST(ContainsName, MatchesWholeNamesIgnoringCaseHiddenOnesToo) {
    NameEntryList list = {Entry("DMM1", LogicalName), Entry("Scope", VirtualInstrumentName), Entry("Secret", DoNotDisplayName)};
    for (const char* name : {"DMM1", "dmm1", "SCOPE", "secret"}) EXPECT_TRUE(ContainsName(list, name)) << name;
    for (const char* name : {"DMM", "DMM12", ""}) EXPECT_FALSE(ContainsName(list, name)) << name;
}

TEST_F(DoubleByteCodePage, ContainsNameFoldsNoDoubleByteCharacter) {
    // 0x82 0x41 and 0x82 0x61 differ only in a trail byte that looks like "A" and "a"; folding it
    // would make two different characters equal.
    NameEntryList list = {Entry("\x82\x41", LogicalName)};
    EXPECT_TRUE(ContainsName(list, "\x82\x41"));
    EXPECT_FALSE(ContainsName(list, "\x82\x61"));
}

// A name of both kinds appears once, in list order; names of no kind never.
TEST(AppendSelectedNames, SelectionByKindAndVisibility) {
    const struct { bool virtualInstruments, logicalNames, hidden; Names expected; } cases[] = {
        {false, false, true, {}}, {true, false, false, {"Virtual", "Both"}},
        {false, true, true, {"Logical", "Both", "HiddenLogical"}}, {true, true, false, {"Logical", "Virtual", "Both"}}};
    for (const auto& c : cases) {
        StringVector out;
        AppendSelectedNames(mixed, false, "IVI", c.virtualInstruments, c.logicalNames, c.hidden, out);
        EXPECT_EQ(Texts(out), c.expected) << c.virtualInstruments << c.logicalNames << c.hidden;
    }
}

TEST(AppendSelectedNames, PrefixOnlyWhenAskedAndAppendedAfterWhatWasThere) {
    StringVector out;
    out.emplace_back("Earlier");
    AppendSelectedNames(mixed, true, "VXIPNP", true, false, false, out);
    AppendSelectedNames({Entry("DMM1", LogicalName)}, false, "VXIPNP", false, true, false, out);
    EXPECT_EQ(Texts(out), (Names{"Earlier", "VXIPNP::Virtual", "VXIPNP::Both", "DMM1"}));
}

TEST(AppendNameListText, FlagWordsInFixedOrderIntoAnyKindOfString) {
    NameEntryList list = {Entry("", 0), Entry("All", DoNotDisplayName | VirtualInstrumentName | LogicalName)};
    DynamicString text("Names: ");
    AppendNameListText(list, text);
    EXPECT_EQ(text.View(), "Names:  (No Name Flags), All (LogicalName, VirtualInstrumentName, DoNotDisplayName)");
    StaticString<64> fixed;
    AppendNameListText({Entry("DMM1", LogicalName | VirtualInstrumentName)}, fixed);
    EXPECT_EQ(fixed.View(), "DMM1 (LogicalName, VirtualInstrumentName)");
}
