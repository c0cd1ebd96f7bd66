// The configuration file under Wine. VXIPNPPATH is read once per process: the tests run in order.
#include <gtest/gtest.h>
#include <windows.h>

#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>

#include "SimBench.h"
#include "TempFolder.h"

#include "sources/ConfigurationFile.h"
#include "sources/VxipnpInfo.h"

using namespace sm;
using namespace sm::testing;

namespace {
const std::string root = [] {
    ::SetEnvironmentVariableA("VXIPNPPATH", TempPath("SessionMgrConfigurationTest").c_str());
    return TempPath("SessionMgrConfigurationTest");
}();
const std::string platform = root + "\\Win64";
const std::string file = platform + "\\QVSessionMgr.ini";

void WriteBytes(const std::string& path, const std::string& text) { std::ofstream(path, std::ios::binary) << text; }

std::string WithCrLf(const std::string& text) {
    std::string converted;
    for (char c : text) converted += c == '\n' ? std::string("\r\n") : std::string(1, c);
    return converted;
}

void SetWriteTime(const std::string& path, int offsetSeconds) {
    namespace fs = std::filesystem;
    fs::last_write_time(path, fs::file_time_type::clock::now() + std::chrono::seconds(offsetSeconds));
}

std::int32_t CurrentGeneration() {
    std::lock_guard guard(ConfigurationLock());
    std::int32_t generation = -1;
    GetConfiguration(generation);
    return generation;
}
}  // namespace

TEST(ConfigurationFile, MissingPlatformDirectoryLeavesTheConfigurationEmptyAndIsRetried) {
    std::error_code ignored;
    std::filesystem::remove_all(root, ignored);
    ASSERT_TRUE(::CreateDirectoryA(root.c_str(), nullptr));
    EXPECT_EQ(CurrentGeneration(), 0);
    EXPECT_EQ(::GetFileAttributesA(file.c_str()), INVALID_FILE_ATTRIBUTES);
    Path directory;
    ASSERT_TRUE(GetPlatformDirectory(directory));
    EXPECT_EQ(std::string(directory.View()), platform);

    ASSERT_TRUE(::CreateDirectoryA(platform.c_str(), nullptr));
    EXPECT_EQ(CurrentGeneration(), 1);
    // The header users read is compared with the shipped text, kept as data beside this test.
    EXPECT_EQ(ReadFileBytes(file), WithCrLf(ReadFileBytes(SESSIONMGR_CONFIGURATION_HEADER) + "\n;; NO VXIPNP drivers found!\n"));
}

TEST(ConfigurationFile, RegenerationWritesOneSectionPerDetectedDriver) {
    std::int32_t before = CurrentGeneration();
    ::DeleteFileA(file.c_str());
    for (std::string sub : {"\\sub1", "\\sub2"}) ::CreateDirectoryA((platform + sub).c_str(), nullptr);
    for (auto [image, name] : {std::pair{SCAN_STANDARD, "abc.dll"}, {SCAN_IVIDRIVER, "ivi.dll"}, {SCAN_OTHERCASE, "odd.dll"},
                               {SCAN_RESETOTHERCASE, "rst.dll"}, {SCAN_DUPLICATE, "sub1\\dup1.dll"},
                               {SCAN_DUPLICATE, "sub2\\dup2.dll"}})
        ASSERT_TRUE(::CopyFileA(image, (platform + "\\" + name).c_str(), FALSE)) << name;
    WriteBytes(platform + "\\junk.dll", "not an image");

    VxipnpInfo source;
    EXPECT_EQ(source.GetConfigurationLists(), before + 1);

    std::string header = WithCrLf(ReadFileBytes(SESSIONMGR_CONFIGURATION_HEADER));
    ASSERT_EQ(ReadFileBytes(file).substr(0, header.size()), header);
    IniObj reread;
    reread.ReadFile(file);
    std::vector<std::string> sections;
    for (const auto& section : reread.GetSections()) sections.push_back(section.name);
    // Drivers in the reverse of the listing order (files by name, then subfolders); a prefix seen
    // twice keeps its first place and the items of the one put later.
    EXPECT_EQ(sections, (std::vector<std::string>{"VISA Logical Names", "VXIPNP Logical Names", "VPPVInstr->dup",
                                                  "VPPVInstr->odd", "VPPVInstr->abc"}));
    auto item = [&](const char* section, const char* name) {
        const ItemEntry* found = reread.FindItem(section, name);
        DynamicString value;
        reread.Get(section, name, value);  // decoded
        return found ? std::string(value.View()) + (found->quoted ? " (quoted)" : "") : "<missing>";
    };
    EXPECT_EQ(item("VPPVInstr->dup", "ModulePath"), platform + "\\sub1\\dup1.dll (quoted)");
    EXPECT_EQ(item("VPPVInstr->abc", "Resource"), " (quoted)");
    EXPECT_EQ(item("VPPVInstr->abc", "IDQuery"), "True");
}

TEST(ConfigurationFile, NewerWriteTimeIsReadAgainAndOlderIsNot) {
    std::string text = ReadFileBytes(file);
    std::size_t resource = text.find("Resource = \"\"", text.find("[VPPVInstr->abc]"));
    ASSERT_NE(resource, std::string::npos);
    text.replace(resource, 13, "Resource = \"GPIB0::14::INSTR\"");
    // The header's comments show the same section line; the real one starts a line of its own.
    std::size_t logicalNames = text.find("\r\n[VXIPNP Logical Names]\r\n");
    ASSERT_NE(logicalNames, std::string::npos);
    text.insert(logicalNames + 26, "DMM1 = \"vppvinstr->ABC\"\r\n");
    std::int32_t before = CurrentGeneration();
    WriteBytes(file, text);
    SetWriteTime(file, -3600);
    EXPECT_EQ(CurrentGeneration(), before);
    SetWriteTime(file, 3600);
    EXPECT_EQ(CurrentGeneration(), before + 1);
    // What was read again shows in the source's text.
    VxipnpInfo source;
    DynamicString state;
    source.AppendStateDescription(state);
    EXPECT_NE(std::string(state.View()).find("   Number of virtual instruments = 1\n      Virtual Instrument # = 0\n"
                                            "         name list (2):abc (VirtualInstrumentName), DMM1 (LogicalName)\n"
                                            "         modulePath '" + platform + "\\abc.dll'\n         prefix 'abc'\n"
                                            "         resource 'GPIB0::14::INSTR'\n\n\n"), std::string::npos) << state.GetText();
}
