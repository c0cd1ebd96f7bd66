// The plain exports as the product's other programs use them: loaded with LoadLibraryA, found by name.
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

using KeyedDirectory = void(const char*, const char*, int, BSTR*);

std::string ExeFolder() {
    char name[MAX_PATH] = {};
    std::string path(name, ::GetModuleFileNameA(nullptr, name, MAX_PATH));
    return path.substr(0, path.find_last_of('\\') + 1);
}

// The DLL copied beside this test (exports\SessionMgr.dll), loaded once for the whole program.
HMODULE Exports() {
    static UniqueModule module(::LoadLibraryA((ExeFolder() + "exports\\SessionMgr.dll").c_str()));
    EXPECT_NE(module.Get(), nullptr) << "exports\\SessionMgr.dll did not load";
    return module.Get();
}

template <class Function>
Function* Export(const char* name) {
    Function* function = GetProcAddressAs<Function>(Exports(), name);
    EXPECT_NE(function, nullptr) << name << " is not exported by name";
    return function;
}

// A directory export's answer: the keyed form (subKey, registry view) when a subKey is given.
std::string Directory(const char* exportName, const std::string& version, const char* subKey = nullptr, int view64 = 1) {
    UniqueBstr result;
    if (auto plain = subKey ? nullptr : Export<void(const char*, BSTR*)>(exportName)) plain(version.c_str(), result.Put());
    if (auto keyed = subKey ? Export<KeyedDirectory>(exportName) : nullptr) keyed(version.c_str(), subKey, view64, result.Put());
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

// A value under the product's key in one registry view, deleted with its key at the end.
struct ProductValue {
    ProductValue(const std::string& subKey, const char* name, DWORD type, const std::string& text, bool view64)
        : key("Software\\Quillvane\\Verentis\\" + subKey), view(view64 ? KEY_WOW64_64KEY : KEY_WOW64_32KEY) {
        UniqueRegistryKey opened;
        EXPECT_EQ(::RegCreateKeyExA(HKEY_LOCAL_MACHINE, key.c_str(), 0, nullptr, 0, KEY_SET_VALUE | view, nullptr, opened.Put(), nullptr),
                  ERROR_SUCCESS);
        EXPECT_EQ(::RegSetValueExA(opened.Get(), name, 0, type, reinterpret_cast<const BYTE*>(text.c_str()),
                                   static_cast<DWORD>(text.size() + 1)),
                  ERROR_SUCCESS);
    }
    ~ProductValue() { ::RegDeleteKeyExA(HKEY_LOCAL_MACHINE, key.c_str(), view, 0); }
    std::string key;
    REGSAM view;
};

// The engine's class registered at a module path, for as long as the object lives.
constexpr const char* engineKey = "CLSID\\{E17A3C92-4B08-4F6D-95E1-A2C7083D5B64}";
struct EngineRegistration {
    explicit EngineRegistration(const std::string& modulePath) {
        EXPECT_EQ(::RegSetKeyValueA(HKEY_CLASSES_ROOT, (std::string(engineKey) + "\\InprocServer32").c_str(), nullptr, REG_SZ,
                                    modulePath.c_str(), static_cast<DWORD>(modulePath.size() + 1)),
                  ERROR_SUCCESS);
    }
    ~EngineRegistration() { Remove(); }
    static void Remove() { ::RegDeleteTreeA(HKEY_CLASSES_ROOT, engineKey); }
};

const std::string beacon = "DEV BUILD BEACON (Do not delete or install).txt";

}  // namespace

// The rules are DirectoryGetterTest's; here the registry's two views, an expandable value, a missing
// key and the shell folders. A crashed earlier run may have left the engine registered.
TEST(InstalledLayout, DirectoriesFromTheRegistryInItsViewOrTheShellFolders) {
    EngineRegistration::Remove();
    std::string version = UniqueVersion("Installed");
    std::string product = "\\Quillvane\\Verentis " + version + "\\", expectedDefault = ShellFolder(CSIDL_COMMON_APPDATA) + product + "Cfg\\";
    EXPECT_EQ(Directory("GetDefaultConfigDirectory", version), expectedDefault);
    EXPECT_EQ(Directory("GetConfigDirectory", version, "NoSuchKey", 1), expectedDefault);
    ProductValue in64("PathExportsTest64", "CfgLocation", REG_SZ, "C:\\Custom Cfg\\", true);
    ProductValue in32("PathExportsTest32", "CfgLocation", REG_SZ, "\\\\server\\share\\cfg", false);
    ProductValue expandable("PathExportsTestExpand", "CfgLocation", REG_EXPAND_SZ, "%SystemDrive%\\Expanded", true);
    EXPECT_EQ(Directory("GetConfigDirectory", version, "PathExportsTest64", 1), "C:\\Custom Cfg\\");
    EXPECT_EQ(Directory("GetConfigDirectory", version, "PathExportsTest64", 0), expectedDefault);
    EXPECT_EQ(Directory("GetConfigDirectory", version, "PathExportsTest32", 0), "\\\\server\\share\\cfg");
    EXPECT_EQ(Directory("GetConfigDirectory", version, "PathExportsTest32", 1), expectedDefault);
    EXPECT_EQ(Directory("GetConfigDirectory", version, "PathExportsTestExpand", 1), "C:\\Expanded");
    EXPECT_EQ(Directory("GetVerentisCommonAppDataDirectory", version), ShellFolder(CSIDL_COMMON_APPDATA) + product);
    EXPECT_EQ(Directory("GetVerentisLocalAppDataDirectory", version), ShellFolder(CSIDL_LOCAL_APPDATA) + product);
    EXPECT_EQ(Directory("GetVerentisPublicDirectory", version, "NoSuchKey"), ShellFolder(CSIDL_COMMON_DOCUMENTS) + product);
}

TEST(DevelopmentLayout, TheBeaconBesideTheRegisteredEngineMakesADevelopmentBuild) {
    TempFolder scratch("PathExportsTest");
    scratch.Write("Tree\\Verentis\\" + beacon, "");
    EngineRegistration engine(scratch.Folder("Tree\\Verentis\\Bin\\x64") + "\\Engine.dll");
    // IsDevBuild answers for the product's own version; no other test asks for it.
    EXPECT_TRUE(Export<bool()>("IsDevBuild")());
    // Where each directory of a development tree lies is the directory rules' decision (DirectoryGetterTest).
    EXPECT_EQ(Directory("GetVerentisCommonAppDataDirectory", UniqueVersion("Development")), scratch.path + "\\Tree\\CommonAppData\\");
}

TEST(DevelopmentLayout, ALoadedFrameworkModuleLocatesTheInstallation) {
    EngineRegistration::Remove();
    TempFolder scratch("PathExportsTest");
    std::string release = scratch.Folder("Work\\Verentis\\Bin\\x64\\Release") + "\\vantrel.dll";
    scratch.Write("Work\\Verentis\\" + beacon, "");
    ASSERT_TRUE(::CopyFileA((ExeFolder() + "exports\\vantrel.dll").c_str(), release.c_str(), FALSE));
    UniqueModule framework(::LoadLibraryA(release.c_str()));
    ASSERT_TRUE(framework);
    EXPECT_EQ(Directory("GetVerentisCommonAppDataDirectory", UniqueVersion("Framework")), scratch.path + "\\Work\\CommonAppData\\");
}

// The rules are PathTest's; here that no failure crosses an export (false, or no crash).
TEST(PathChecks, ReachTheFrameworkAndNeverRaiseAcrossTheExport) {
    auto isValidPath = Export<bool(const char*, int)>("IsValidPath");
    auto filesAreIdentical = Export<bool(const char*, const char*)>("FilesAreIdentical");
    ASSERT_TRUE(isValidPath && filesAreIdentical);
    EXPECT_TRUE(isValidPath("C:\\dir\\*.txt", 1));
    EXPECT_FALSE(isValidPath(nullptr, 0));
    TempFolder scratch("PathExportsTest");
    std::string original = scratch.Write("original.bin", "same");
    EXPECT_TRUE(filesAreIdentical(original.c_str(), scratch.Write("copy.bin", "same").c_str()));
    EXPECT_FALSE(filesAreIdentical(original.c_str(), (scratch.path + "\\missing.bin").c_str()));
    Export<KeyedDirectory>("GetConfigDirectory")("x", "y", 1, nullptr);
}
