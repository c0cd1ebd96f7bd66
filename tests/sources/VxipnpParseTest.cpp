// What the configuration document means: instruments, their defaults and their logical names.
#include <gtest/gtest.h>

#include "CatchTE.h"

#include <string>
#include <vector>

#include "framework/TEException.h"
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

// "name|modulePath|prefix|resource|idQuery|reset|" then "name/flags " per name of the instrument.
std::string Describe(const VxipnpVInstr& instrument) {
    std::string text = std::string(instrument.name.View()) + "|" + std::string(instrument.modulePath.View()) + "|" +
                       std::string(instrument.prefix.View()) + "|" + std::string(instrument.resource.View()) + "|" +
                       std::to_string(instrument.idQuery) + "|" + std::to_string(instrument.reset) + "|";
    for (const auto& entry : instrument.names) text += std::string(entry.name.View()) + "/" + std::to_string(entry.flags) + " ";
    return text;
}

std::string Instrument(const std::string& name, const std::string& modulePath) {
    return "[VPPVInstr->" + name + "]\nModulePath = \"" + modulePath + "\"\nPrefix = \"P\"\n" +
           "Resource = \"GPIB::1::INSTR\"\nIDQuery = True\nReset = True\n";
}
}  // namespace

// Logical names refer to sections whatever their case, in the order of their section; the session
// manager's own defaults win over the plain ones.
TEST(VirtualInstruments, SectionsBecomeInstrumentsWithTheirLogicalNamesAndDefaults) {
    VxipnpInfo source = Parsed(
        "[VXIPNP Logical Names]\nDMM1 = \"vppvinstr->flukedmm\"\nScope = \"VPPVInstr->Other\"\n"
        "DMM2 = \"VPPVInstr->FlukeDMM\"\n"
        "[VPPVInstr->FlukeDMM]\nModulePath = \"C:\\\\drivers\\\\fl45_64.dll\"\nPrefix = \"FL45\"\n"
        "Resource = \"GPIB::14::INSTR\"\nIDQuery = True\nReset = False\n"
        "[vppvinstr->Other]\nModulePath = \"o.dll\"\nPrefix = \"oth\"\nResource = \"GPIB::15::INSTR\"\n"
        "QVSessionManager_IDQuery = False\nIDQuery = True\nQVSessionManager_Reset = True\nReset = False\n");
    const auto& instruments = source.VirtualInstruments();
    ASSERT_EQ(instruments.size(), 2u);
    EXPECT_EQ(Describe(instruments[0]), "FlukeDMM|C:\\drivers\\fl45_64.dll|FL45|GPIB::14::INSTR|1|0|FlukeDMM/2 DMM1/1 DMM2/1 ");
    EXPECT_EQ(Describe(instruments[1]), "Other|o.dll|oth|GPIB::15::INSTR|0|1|Other/2 Scope/1 ");
}

TEST(VirtualInstruments, IncompleteSectionsAreSkippedSilently) {
    VxipnpInfo source = Parsed(
        "[VPPVInstr->NoPath]\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = True\nReset = True\n"
        "[VPPVInstr->NoResource]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"\"\nIDQuery = True\nReset = True\n"
        "[VPPVInstr->NoReset]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = True\n"
        "[VPPVInstr->Good]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = true\nReset = TRUE\n");
    ASSERT_EQ(source.VirtualInstruments().size(), 1u);
    EXPECT_EQ(std::string(source.VirtualInstruments()[0].name.View()), "Good");
}

TEST(VirtualInstruments, ANonBooleanDefaultIsAReadError) {
    TEException error = sm::testing::CatchTE([] {
        Parsed("[VPPVInstr->Bad]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = maybe\nReset = True\n");
    });
    EXPECT_EQ(error.GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_EQ(error.GetApiErrorCode(), InvalidBooleanValue);
}

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
    EXPECT_EQ(std::string(names[0].second.View()) + " " + std::string(names[1].second.View()), "VPPVInstr->A VPPVInstr->B");
}
