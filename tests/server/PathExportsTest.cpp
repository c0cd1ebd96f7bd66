// The plain exports as the product's other programs use them: the DLL loaded with LoadLibraryA and
// each function found by name. The registry values and files they read are set up here with the
// real registry and file APIs, in the test prefix, and removed again.
#include <gtest/gtest.h>

#include <windows.h>
#include <shlobj.h>

#include <atomic>
#include <string>

#include "com/BstrConversion.h"
#include "com/LibraryBinding.h"
#include "com/UniqueHandles.h"
#include "TempFolder.h"

using namespace sm;
using sm::testing::TempFolder;

namespace {

using VersionDirectory = void(const char*, BSTR*);
using KeyedDirectory = void(const char*, const char*, int, BSTR*);

std::string ExeFolder() {
    char name[MAX_PATH] = {};
    DWORD length = ::GetModuleFileNameA(nullptr, name, MAX_PATH);
    std::string path(name, length);
    return path.substr(0, path.find_last_of('\\') + 1);
}

// The DLL copied beside this test (exports\SessionMgr.dll), loaded once for the whole program.
class ExportedFunctions {
public:
    ExportedFunctions() : module(::LoadLibraryA((ExeFolder() + "exports\\SessionMgr.dll").c_str())) {}
    HMODULE Module() const { return module.Get(); }
    template <class Function>
    Function* Get(const char* name) const {
        Function* function = GetProcAddressAs<Function>(module.Get(), name);
        EXPECT_NE(function, nullptr) << name << " is not exported by name";
        return function;
    }

private:
    UniqueModule module;
};

const ExportedFunctions& Exports() {
    static ExportedFunctions exports;
    return exports;
}

std::string Directory(const char* exportName, const char* version) {
    auto function = Exports().Get<VersionDirectory>(exportName);
    if (!function) return "<not exported>";
    UniqueBstr result;
    function(version, result.Put());
    return result ? BstrToMultiByte(result.Get()) : "<null>";
}

std::string KeyedDirectoryOf(const char* exportName, const char* version, const char* subKey, int view64) {
    auto function = Exports().Get<KeyedDirectory>(exportName);
    if (!function) return "<not exported>";
    UniqueBstr result;
    function(version, subKey, view64, result.Put());
    return result ? BstrToMultiByte(result.Get()) : "<null>";
}

std::string ShellFolder(int csidl) {
    char folder[MAX_PATH] = {};
    EXPECT_EQ(::SHGetFolderPathA(nullptr, csidl, nullptr, SHGFP_TYPE_CURRENT, folder), S_OK);
    return folder;
}

// Each test asks for its own version text, so no cached answer of another test can leak in.
std::string UniqueVersion(const char* prefix) {
    static std::atomic<int> counter{0};
    return std::string(prefix) + " " + std::to_string(::GetCurrentProcessId()) + "." + std::to_string(++counter);
}

constexpr const char* productKey = "Software\\Quillvane\\Verentis\\";
constexpr const char* engineKey = "CLSID\\{E17A3C92-4B08-4F6D-95E1-A2C7083D5B64}";

// A value under the product's key in one registry view, deleted with its key at the end.
class ProductValue {
public:
    ProductValue(const std::string& subKey, const char* name, DWORD type, const std::string& text, bool view64)
        : key(std::string(productKey) + subKey), view(view64 ? KEY_WOW64_64KEY : KEY_WOW64_32KEY) {
        UniqueRegistryKey opened;
        EXPECT_EQ(::RegCreateKeyExA(HKEY_LOCAL_MACHINE, key.c_str(), 0, nullptr, 0, KEY_SET_VALUE | view, nullptr,
                                    opened.Put(), nullptr),
                  ERROR_SUCCESS);
        EXPECT_EQ(::RegSetValueExA(opened.Get(), name, 0, type, reinterpret_cast<const BYTE*>(text.c_str()),
                                   static_cast<DWORD>(text.size() + 1)),
                  ERROR_SUCCESS);
    }
    ~ProductValue() { ::RegDeleteKeyExA(HKEY_LOCAL_MACHINE, key.c_str(), view, 0); }
    ProductValue(const ProductValue&) = delete;
    ProductValue& operator=(const ProductValue&) = delete;

private:
    std::string key;
    REGSAM view;
};

class EngineRegistration {
public:
    explicit EngineRegistration(const std::string& modulePath) {
        UniqueRegistryKey opened;
        std::string server = std::string(engineKey) + "\\InprocServer32";
        EXPECT_EQ(::RegCreateKeyExA(HKEY_CLASSES_ROOT, server.c_str(), 0, nullptr, 0, KEY_SET_VALUE, nullptr,
                                    opened.Put(), nullptr),
                  ERROR_SUCCESS);
        EXPECT_EQ(::RegSetValueExA(opened.Get(), nullptr, 0, REG_SZ, reinterpret_cast<const BYTE*>(modulePath.c_str()),
                                   static_cast<DWORD>(modulePath.size() + 1)),
                  ERROR_SUCCESS);
    }
    ~EngineRegistration() { Remove(); }
    EngineRegistration(const EngineRegistration&) = delete;
    EngineRegistration& operator=(const EngineRegistration&) = delete;
    static void Remove() { ::RegDeleteTreeA(HKEY_CLASSES_ROOT, engineKey); }
};

const std::string beacon = "DEV BUILD BEACON (Do not delete or install).txt";

// Installed-layout tests need a machine without the engine registered (a crashed earlier run may
// have left one behind).
class InstalledLayout : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_NE(Exports().Module(), nullptr) << "exports\\SessionMgr.dll did not load";
        EngineRegistration::Remove();
    }
};

}  // namespace

// Which values count is the directory rules' own decision (DirectoryGetterTest); here the real
// registry's two views, an expandable value and a missing key.
TEST_F(InstalledLayout, ConfigDirectoryFollowsCfgLocationInItsViewOrIsTheDefault) {
    std::string version = UniqueVersion("Installed");
    std::string expectedDefault = ShellFolder(CSIDL_COMMON_APPDATA) + "\\Quillvane\\Verentis " + version + "\\Cfg\\";
    EXPECT_EQ(Directory("GetDefaultConfigDirectory", version.c_str()), expectedDefault);
    EXPECT_EQ(KeyedDirectoryOf("GetConfigDirectory", version.c_str(), "NoSuchKey", 1), expectedDefault);
    ProductValue in64("PathExportsTest64", "CfgLocation", REG_SZ, "C:\\Custom Cfg\\", true);
    ProductValue in32("PathExportsTest32", "CfgLocation", REG_SZ, "\\\\server\\share\\cfg", false);
    ProductValue expandable("PathExportsTestExpand", "CfgLocation", REG_EXPAND_SZ, "%SystemDrive%\\Expanded", true);
    EXPECT_EQ(KeyedDirectoryOf("GetConfigDirectory", version.c_str(), "PathExportsTest64", 1), "C:\\Custom Cfg\\");
    EXPECT_EQ(KeyedDirectoryOf("GetConfigDirectory", version.c_str(), "PathExportsTest64", 0), expectedDefault);
    EXPECT_EQ(KeyedDirectoryOf("GetConfigDirectory", version.c_str(), "PathExportsTest32", 0), "\\\\server\\share\\cfg");
    EXPECT_EQ(KeyedDirectoryOf("GetConfigDirectory", version.c_str(), "PathExportsTest32", 1), expectedDefault);
    EXPECT_EQ(KeyedDirectoryOf("GetConfigDirectory", version.c_str(), "PathExportsTestExpand", 1), "C:\\Expanded");
}

TEST_F(InstalledLayout, PublicAndApplicationDataDirectories) {
    std::string version = UniqueVersion("Installed");
    std::string product = "\\Quillvane\\Verentis " + version + "\\";
    EXPECT_EQ(Directory("GetVerentisCommonAppDataDirectory", version.c_str()), ShellFolder(CSIDL_COMMON_APPDATA) + product);
    EXPECT_EQ(Directory("GetVerentisLocalAppDataDirectory", version.c_str()), ShellFolder(CSIDL_LOCAL_APPDATA) + product);
    EXPECT_EQ(KeyedDirectoryOf("GetVerentisPublicDirectory", version.c_str(), "NoSuchKey", 1),
              ShellFolder(CSIDL_COMMON_DOCUMENTS) + product);
    ProductValue custom("PathExportsTestPublic", "CustomPublicLocation", REG_SZ, "D:\\Shared Public", true);
    EXPECT_EQ(KeyedDirectoryOf("GetVerentisPublicDirectory", version.c_str(), "PathExportsTestPublic", 1),
              "D:\\Shared Public");
}

TEST(DevelopmentLayout, TheBeaconBesideTheRegisteredEngineMakesADevelopmentBuild) {
    ASSERT_NE(Exports().Module(), nullptr);
    TempFolder scratch("PathExportsTest");
    std::string tree = scratch.path + "\\Tree\\";
    scratch.Write("Tree\\Verentis\\" + beacon, "");
    EngineRegistration engine(scratch.Folder("Tree\\Verentis\\Bin\\x64") + "\\Engine.dll");
    // IsDevBuild answers for the product's own version; no other test asks for it.
    EXPECT_TRUE(Exports().Get<bool()>("IsDevBuild")());
    // Where each directory of a development tree lies is the directory rules' decision (DirectoryGetterTest).
    EXPECT_EQ(Directory("GetVerentisCommonAppDataDirectory", UniqueVersion("Development").c_str()), tree + "CommonAppData\\");
}

TEST(DevelopmentLayout, ALoadedFrameworkModuleLocatesTheInstallation) {
    ASSERT_NE(Exports().Module(), nullptr);
    EngineRegistration::Remove();
    TempFolder scratch("PathExportsTest");
    std::string release = scratch.Folder("Work\\Verentis\\Bin\\x64\\Release") + "\\vantrel.dll";
    scratch.Write("Work\\Verentis\\" + beacon, "");
    ASSERT_TRUE(::CopyFileA((ExeFolder() + "exports\\vantrel.dll").c_str(), release.c_str(), FALSE));
    UniqueModule framework(::LoadLibraryA(release.c_str()));
    ASSERT_TRUE(framework);
    EXPECT_EQ(Directory("GetVerentisCommonAppDataDirectory", UniqueVersion("Framework").c_str()),
              scratch.path + "\\Work\\CommonAppData\\");
}

// The path rules themselves are the framework's; here only their way through the exports.
TEST(PathChecks, ReachTheFrameworkAndNeverRaiseAcrossTheExport) {
    auto isValidPath = Exports().Get<bool(const char*, int)>("IsValidPath");
    auto filesAreIdentical = Exports().Get<bool(const char*, const char*)>("FilesAreIdentical");
    ASSERT_TRUE(isValidPath && filesAreIdentical);
    EXPECT_TRUE(isValidPath("\\\\server\\share\\file.txt", 0));
    EXPECT_FALSE(isValidPath("C:\\dir\\*.txt", 0));
    EXPECT_TRUE(isValidPath("C:\\dir\\*.txt", 1));
    EXPECT_FALSE(isValidPath(nullptr, 0));
    TempFolder scratch("PathExportsTest");
    std::string original = scratch.Write("original.bin", std::string(9000, 'c'));
    EXPECT_TRUE(filesAreIdentical(original.c_str(), scratch.Write("copy.bin", std::string(9000, 'c')).c_str()));
    EXPECT_FALSE(filesAreIdentical(original.c_str(), scratch.Write("last.bin", std::string(8999, 'c') + "Z").c_str()));
    // A missing file cannot be compared: false, and no exception crosses the export.
    EXPECT_FALSE(filesAreIdentical(original.c_str(), (scratch.path + "\\missing.bin").c_str()));
    EXPECT_FALSE(filesAreIdentical(nullptr, "x"));
    Exports().Get<KeyedDirectory>("GetConfigDirectory")("x", "y", 1, nullptr);  // nowhere to put it: no crash
}
