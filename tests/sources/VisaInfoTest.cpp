// The VISA source over the simulated visa32.dll: scan cache, logical names, parsed names, failed scans.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "CatchTE.h"
#include "SimBench.h"
#include "sources/VisaInfo.h"

using namespace sm;
using namespace sm::testing;

namespace {
const std::string configuration = UseConfigurationFile("SessionMgrVisaInfo", "");

// Writes the logical names and moves the file's write time on, as a later edit would.
void WriteLogicalNames(const std::string& items, int secondsLater) {
    std::ofstream(configuration, std::ios::trunc) << "[VISA Logical Names]\n" << items;
    std::filesystem::last_write_time(configuration, std::filesystem::file_time_type::clock::now() +
                                                        std::chrono::seconds(secondsLater));
}

const char* const bench = "[VISA]\nAccept = TCPIP?*\n[VISA GPIB0::14::INSTR]\n[VISA ASRL1::INSTR]\n";

std::vector<std::string> Names(VisaInfo& info, std::uint32_t options, StringVector filters = {}) {
    StringVector names{DynamicString("stale")};
    info.ListNames("?", options, filters, names);
    std::vector<std::string> plain;
    for (const auto& name : names) plain.emplace_back(name.View());
    return plain;
}

struct VisaSource : ::testing::Test {
    VxipnpInfo vxipnp;
    VisaInfo info{vxipnp};
};
}  // namespace

// Catches a scan on every listing, a lost invalidation, logical names that never follow an edit, and
// a VISA listing that ignores the "SpecificPrefix" filters.
TEST_F(VisaSource, ScanIsCachedUntilInvalidatedAndEntriesFollowTheConfigurationFile) {
    UseSimSetup("SessionMgrVisaInfoCache.ini", bench);
    WriteLogicalNames("DMM = gpib0::14::instr\n", 1);
    EXPECT_EQ(Names(info, 3), (std::vector<std::string>{"GPIB0::14::INSTR", "DMM", "ASRL1::INSTR"}));
    long scans = SimCount("visa32.dll", "viFindRsrc");
    WriteLogicalNames("Serial = ASRL1::INSTR\n", 2);
    EXPECT_EQ(Names(info, 1), (std::vector<std::string>{"Serial"}));
    EXPECT_EQ(SimCount("visa32.dll", "viFindRsrc"), scans);
    info.InvalidateResourceList();
    EXPECT_EQ(Names(info, 3, {DynamicString("SpecificPrefix = x")}), (std::vector<std::string>{}));
    EXPECT_EQ(SimCount("visa32.dll", "viFindRsrc"), scans + 1);
}

// Catches a TCPIP name refused because no scan found it, and a parsed entry FindEntry forgets.
TEST_F(VisaSource, NamesVisaParsesAreAcceptedAndFoundUntilTheNextRebuild) {
    UseSimSetup("SessionMgrVisaInfoParse.ini", bench);
    WriteLogicalNames("Remote = TCPIP0::10.0.0.9::INSTR\n", 3);
    VisaEntry entry;
    EXPECT_FALSE(info.FindEntry("TCPIP0::10.0.0.9::INSTR", entry));
    EXPECT_TRUE(info.ParseResource("TCPIP0::10.0.0.9::INSTR", entry));
    EXPECT_TRUE(info.FindEntry("tcpip0::10.0.0.9::instr", entry));
    EXPECT_TRUE(info.FindLogicalName("remote", entry));
    EXPECT_EQ(std::string(entry.viName.View()), "TCPIP0::10.0.0.9::INSTR");
}

// Catches a machine with VISA but no instrument failing every listing, other scan failures
// swallowed, and the resource manager of a failed scan left open.
TEST_F(VisaSource, NoResourceFoundIsAnEmptyListAndOtherScanStatusesRaise) {
    UseSimSetup("SessionMgrVisaInfoEmpty.ini", "[VISA]\n");
    EXPECT_EQ(Names(info, 3), (std::vector<std::string>{}));
    UseSimSetup("SessionMgrVisaInfoBroken.ini", "[VISA]\nFindRsrcStatus = 0xBFFF003A\n");
    info.InvalidateResourceList();
    TEException raised = CatchTE([&] { Names(info, 3); });
    EXPECT_EQ(raised.GetErrorCode(), static_cast<std::int32_t>(0xBFFF003A));
    EXPECT_STREQ(raised.GetDescription(), "viFindRsrc returned -1073807302. Description: 'The simulated setup is not valid.'.");
    EXPECT_EQ(SimCount("visa32.dll", "viClose"), SimCount("visa32.dll", "viOpenDefaultRM"));
}
