// Configuration documents with an over-long module path and with a logical name given twice.
#include <gtest/gtest.h>

#include <string>

#include "sources/VxipnpInfo.h"

using namespace sm;

namespace {
VxipnpInfo Parsed(const std::string& text) {
    IniObj document;
    document.ReadString(text);
    VxipnpInfo source;
    source.Parse(document);
    return source;
}

std::string Instrument(const std::string& name, const std::string& modulePath) {
    return "[VPPVInstr->" + name + "]\nModulePath = \"" + modulePath + "\"\nPrefix = \"P\"\n" +
           "Resource = \"GPIB::1::INSTR\"\nIDQuery = True\nReset = True\n";
}
}  // namespace

// Fault: one module path too long for a path made Parse raise, so GetNames and StateDescription
// failed for every instrument.
TEST(VxipnpParseFaults, OverLongModulePathLeavesOutOnlyItsInstrument) {
    VxipnpInfo source = Parsed(Instrument("Long", "C:\\" + std::string(300, 'x') + ".dll") +
                               Instrument("Short", "C:\\drivers\\p.dll"));
    ASSERT_EQ(source.VirtualInstruments().size(), 1u);
    EXPECT_EQ(source.VirtualInstruments()[0].name.View(), "Short");
}

// Fault: each logical name was looked up again by name, so a name given twice got the first
// one's value twice.
TEST(VxipnpParseFaults, DuplicateLogicalNamesKeepTheirOwnValuesInFileOrder) {
    VxipnpInfo source = Parsed("[VXIPNP Logical Names]\nDMM = \"VPPVInstr->A\"\nDMM = \"VPPVInstr->B\"\n");
    const LogicalNameList& names = source.VxipnpLogicalNames();
    ASSERT_EQ(names.size(), 2u);
    EXPECT_EQ(names[0].second.View(), "VPPVInstr->A");
    EXPECT_EQ(names[1].second.View(), "VPPVInstr->B");
}
