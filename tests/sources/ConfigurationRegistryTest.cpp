// The VXIplug&play directory from the registry wins over the environment and receives the file.
#include <gtest/gtest.h>
#include <windows.h>

#include <string>

#include "SimBench.h"
#include "TempFolder.h"
#include "sources/ConfigurationFile.h"
#include "sources/VxipnpInfo.h"

using namespace sm;

namespace {
constexpr const char* vxipnpKey = "SOFTWARE\\VXIPNP_Alliance\\VXIPNP\\CurrentVersion";

const std::string registryFolder = sm::testing::TempPath("SessionMgrRegistryVxipnp"),
                  environmentFolder = sm::testing::TempPath("SessionMgrEnvironmentVxipnp");

class RegistryDirectory : public ::testing::Test {
protected:
    static void SetUpTestSuite() {
        for (const std::string& folder : {registryFolder, environmentFolder, registryFolder + "\\Win64"})
            ::CreateDirectoryA(folder.c_str(), nullptr);
        ::DeleteFileA((registryFolder + "\\Win64\\QVSessionMgr.ini").c_str());
        HKEY key = nullptr;
        ASSERT_EQ(::RegCreateKeyExA(HKEY_LOCAL_MACHINE, vxipnpKey, 0, nullptr, 0, KEY_WRITE, nullptr, &key, nullptr),
                  ERROR_SUCCESS);
        ::RegSetValueExA(key, "VXIPNPPATH", 0, REG_SZ, reinterpret_cast<const BYTE*>(registryFolder.c_str()),
                         static_cast<DWORD>(registryFolder.size() + 1));
        ::RegCloseKey(key);
        ::SetEnvironmentVariableA("VXIPNPPATH", environmentFolder.c_str());
    }
    static void TearDownTestSuite() { ::RegDeleteKeyValueA(HKEY_LOCAL_MACHINE, vxipnpKey, "VXIPNPPATH"); }
};
}  // namespace

TEST_F(RegistryDirectory, WinsOverTheEnvironmentAndReceivesTheFile) {
    Path directory;
    ASSERT_TRUE(GetVxipnpDirectory(directory));
    EXPECT_EQ(std::string(directory.View()), registryFolder);
    VxipnpInfo source;
    EXPECT_EQ(source.GetConfigurationLists(), 1);
    EXPECT_NE(sm::testing::ReadFileBytes(registryFolder + "\\Win64\\QVSessionMgr.ini").find(";; NO VXIPNP drivers found!\r\n"),
              std::string::npos);
    DynamicString state;
    source.AppendStateDescription(state);
    EXPECT_NE(std::string(state.View()).find("VXIPNP directory from registry: " + registryFolder +
                                             "\nVXIPNP directory from PATH: " + environmentFolder + "\n"),
              std::string::npos)
        << state.GetText();
}

TEST_F(RegistryDirectory, TheResolvedDirectoryIsKeptForTheProcess) {
    ::RegDeleteKeyValueA(HKEY_LOCAL_MACHINE, vxipnpKey, "VXIPNPPATH");
    Path directory;
    ASSERT_TRUE(GetVxipnpDirectory(directory));
    EXPECT_EQ(std::string(directory.View()), registryFolder);
}
