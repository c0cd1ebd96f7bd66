// What the configuration document means: which sections are virtual instruments, which defaults
// they get, which logical names belong to them, and which names a listing returns.
#include <gtest/gtest.h>

#include "CatchTE.h"

#include <string>
#include <vector>

#include "framework/TEException.h"
#include "sources/VxipnpInfo.h"

using namespace sm;

namespace {
VxipnpInfo Parsed(const char* text) {
    IniObj document;
    document.ReadString(std::string_view(text));
    VxipnpInfo source;
    source.Parse(document);
    return source;
}

std::vector<std::string> Names(const NameEntryList& list) {
    std::vector<std::string> names;
    for (const auto& entry : list) names.emplace_back(std::string(entry.name.View()) + "/" + std::to_string(entry.flags));
    return names;
}

constexpr const char* twoInstruments =
    "[VXIPNP Logical Names]\n"
    "DMM1 = \"vppvinstr->flukedmm\"\n"
    "Scope = \"VPPVInstr->Other\"\n"
    "DMM2 = \"VPPVInstr->FlukeDMM\"\n"
    "[VISA Logical Names]\n"
    "Serial1 = \"ASRL1::INSTR\"\n"
    "[VPPVInstr->FlukeDMM]\n"
    "ModulePath = \"C:\\\\drivers\\\\fl45_64.dll\"\n"
    "Prefix = \"FL45\"\n"
    "Resource = \"GPIB::14::INSTR\"\n"
    "IDQuery = True\n"
    "Reset = False\n"
    "[vppvinstr->Other]\n"
    "ModulePath = \"o.dll\"\n"
    "Prefix = \"oth\"\n"
    "Resource = \"GPIB::15::INSTR\"\n"
    "QVSessionManager_IDQuery = False\n"
    "IDQuery = True\n"
    "QVSessionManager_Reset = True\n"
    "Reset = False\n";
}  // namespace

TEST(VirtualInstruments, SectionsBecomeInstrumentsWithTheirLogicalNames) {
    VxipnpInfo source = Parsed(twoInstruments);
    const auto& instruments = source.VirtualInstruments();
    ASSERT_EQ(instruments.size(), 2u);
    EXPECT_EQ(std::string(instruments[0].name.View()), "FlukeDMM");
    EXPECT_EQ(std::string(instruments[0].modulePath.View()), "C:\\drivers\\fl45_64.dll");
    EXPECT_EQ(std::string(instruments[0].prefix.View()), "FL45");
    EXPECT_EQ(std::string(instruments[0].resource.View()), "GPIB::14::INSTR");
    EXPECT_TRUE(instruments[0].idQuery);
    EXPECT_FALSE(instruments[0].reset);
    // Logical names refer to sections whatever their case, in the order of their section.
    EXPECT_EQ(Names(instruments[0].names), (std::vector<std::string>{"FlukeDMM/2", "DMM1/1", "DMM2/1"}));
    EXPECT_EQ(std::string(instruments[1].name.View()), "Other");
    EXPECT_EQ(Names(instruments[1].names), (std::vector<std::string>{"Other/2", "Scope/1"}));

    ASSERT_EQ(source.VisaLogicalNames().size(), 1u);
    EXPECT_EQ(std::string(source.VisaLogicalNames()[0].first.View()), "Serial1");
    EXPECT_EQ(std::string(source.VisaLogicalNames()[0].second.View()), "ASRL1::INSTR");
}

TEST(VirtualInstruments, SessionManagerDefaultsWinOverThePlainOnes) {
    VxipnpInfo source = Parsed(twoInstruments);
    const auto& other = source.VirtualInstruments()[1];
    EXPECT_FALSE(other.idQuery);
    EXPECT_TRUE(other.reset);
}

TEST(VirtualInstruments, IncompleteSectionsAreSkippedSilently) {
    VxipnpInfo source = Parsed(
        "[VPPVInstr->NoPath]\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = True\nReset = True\n"
        "[VPPVInstr->NoResource]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"\"\nIDQuery = True\nReset = True\n"
        "[VPPVInstr->NoReset]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = True\n"
        "[VPPVInstr->BlankQuery]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = \nReset = True\n"
        "[NotAnInstrument]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = True\nReset = True\n"
        "[VPPVInstr->Good]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = true\nReset = TRUE\n");
    ASSERT_EQ(source.VirtualInstruments().size(), 1u);
    EXPECT_EQ(std::string(source.VirtualInstruments()[0].name.View()), "Good");
}

TEST(VirtualInstruments, ANonBooleanDefaultIsAReadError) {
    IniObj document;
    document.ReadString(std::string_view(
        "[VPPVInstr->Bad]\nModulePath = \"m\"\nPrefix = \"a\"\nResource = \"r\"\nIDQuery = maybe\nReset = True\n"));
    VxipnpInfo source;
    TEException error = sm::testing::CatchTE([&] { source.Parse(document); });
    EXPECT_EQ(error.GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_EQ(error.GetApiErrorCode(), InvalidBooleanValue);
}
