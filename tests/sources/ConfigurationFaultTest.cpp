// An empty registry value and an unwritable configuration file; the tests run in declaration order.
#include <gtest/gtest.h>
#include <windows.h>

#include <string>

#include "SimBench.h"
#include "sources/ConfigurationFile.h"

using namespace sm;

namespace {
constexpr const char* vxipnpKey = "SOFTWARE\\VXIPNP_Alliance\\VXIPNP\\CurrentVersion";

const std::string root = sm::testing::TempPath("SessionMgrConfigurationFaultTest");
const std::string platform = root + "\\Win64";

// Virtual instruments in the configuration: one per driver found.
std::size_t InstrumentCount(std::int32_t& generation) {
    std::lock_guard guard(ConfigurationLock());
    std::size_t count = 0;
    for (const SectionEntry& section : GetConfiguration(generation).GetSections())
        count += section.name.starts_with("VPPVInstr->") ? 1 : 0;
    return count;
}
}  // namespace

// Fault: an empty registry value counted as found, so the platform directory became the relative
// path "Win64" and the environment variable was never read.
TEST(ConfigurationFaults, EmptyRegistryValueLeavesTheEnvironmentItsTurn) {
    HKEY key = nullptr;
    ASSERT_EQ(::RegCreateKeyExA(HKEY_LOCAL_MACHINE, vxipnpKey, 0, nullptr, 0, KEY_WRITE, nullptr, &key, nullptr),
              ERROR_SUCCESS);
    ::RegSetValueExA(key, "VXIPNPPATH", 0, REG_SZ, reinterpret_cast<const BYTE*>(""), 1);
    ::RegCloseKey(key);
    ::SetEnvironmentVariableA("VXIPNPPATH", root.c_str());
    Path directory;
    bool resolved = GetVxipnpDirectory(directory);
    ::RegDeleteKeyValueA(HKEY_LOCAL_MACHINE, vxipnpKey, "VXIPNPPATH");
    ASSERT_TRUE(resolved);
    EXPECT_EQ(std::string(directory.View()), root);
}

// Fault: a file that could not be written was regenerated, scanning every driver image, at every
// request, and the configuration stayed empty. A folder of the file's name makes it unwritable.
TEST(ConfigurationFaults, UnwritableFileIsServedFromMemoryUntilTheDirectoryChanges) {
    const std::string drivers = platform + "\\drivers", driver = drivers + "\\standard.dll";
    const std::string blocker = platform + "\\QVSessionMgr.ini";
    for (const std::string& folder : {root, platform, drivers, blocker}) ::CreateDirectoryA(folder.c_str(), nullptr);
    ASSERT_TRUE(::CopyFileA(SCAN_STANDARD, driver.c_str(), FALSE));

    std::int32_t first = 0, second = 0, third = 0;
    EXPECT_EQ(InstrumentCount(first), 1u);
    // Gone from a subfolder, so the platform directory's write time stays: no new scan.
    ASSERT_TRUE(::DeleteFileA(driver.c_str()));
    EXPECT_EQ(InstrumentCount(second), 1u);
    EXPECT_EQ(second, first);
    // The directory changes: the file is written now, from a new scan.
    ASSERT_TRUE(::RemoveDirectoryA(blocker.c_str()));
    EXPECT_EQ(InstrumentCount(third), 0u);
    EXPECT_EQ(third, first + 1);
    EXPECT_NE(::GetFileAttributesA(blocker.c_str()), INVALID_FILE_ATTRIBUTES);
    ::DeleteFileA(blocker.c_str());
    ::RemoveDirectoryA(drivers.c_str());
}
