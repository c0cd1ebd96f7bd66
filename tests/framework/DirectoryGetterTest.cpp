// The product directories on a machine described by a table: layouts, registry overrides, caches.
#include <gtest/gtest.h>

#include "CatchTE.h"

#include <map>
#include <set>
#include <string>
#include <tuple>

#include "framework/DirectoryGetter.h"
#include "framework/TEException.h"

using namespace sm;
using namespace sm::testing;

namespace {

template <class Map, class Key>
std::optional<std::string> Lookup(const Map& map, const Key& key) {
    return map.contains(key) ? std::optional<std::string>(map.at(key)) : std::nullopt;
}

class TableSystem final : public DirectorySystem {
public:
    std::optional<std::string> LoadedFrameworkModulePath() override { return framework; }
    std::optional<std::string> ClassesRootDefaultValue(std::string_view key) override { return Lookup(classesRoot, std::string(key)); }
    std::optional<std::string> MachineValue(std::string_view key, std::string_view name, bool view64) override {
        return Lookup(machine, std::tuple{std::string(key), std::string(name), view64});
    }
    std::string ShellFolder(int csidl) override {
        ++shellRequests;
        if (auto folder = Lookup(shellFolders, csidl); folder && !failShellFolders) return *folder;
        TE_RAISE(TE_PATH_NOT_FOUND, "TableSystem::ShellFolder");
    }
    bool FileExists(std::string_view path) override { return files.count(std::string(path)) != 0; }

    void RegisterEngine(const std::string& path) {
        classesRoot["CLSID\\{E17A3C92-4B08-4F6D-95E1-A2C7083D5B64}\\InprocServer32"] = path;
    }
    void Override(const std::string& key, const std::string& value, bool view64 = true) {
        machine[{"Software\\Quillvane\\Verentis\\" + key, "CfgLocation", view64}] = value;
    }

    const std::map<int, std::string> shellFolders = {
        {46, "C:\\Users\\Public\\Documents"}, {35, "C:\\ProgramData"}, {28, "C:\\Users\\me\\AppData\\Local"}};
    std::optional<std::string> framework;
    std::map<std::string, std::string> classesRoot;
    std::map<std::tuple<std::string, std::string, bool>, std::string> machine;
    std::set<std::string> files;
    int shellRequests = 0;
    bool failShellFolders = false;
};

}  // namespace

TEST(InstalledLayout, ShellFoldersPlusProductFolders) {
    TableSystem system;
    DirectoryGetter getter("2021 (64-bit)", system);
    EXPECT_FALSE(getter.IsDevBuild());
    EXPECT_EQ(getter.GetPublicDirectory().View(), "C:\\Users\\Public\\Documents\\Quillvane\\Verentis 2021 (64-bit)\\");
    EXPECT_EQ(getter.GetCommonAppDataDirectory().View(), "C:\\ProgramData\\Quillvane\\Verentis 2021 (64-bit)\\");
    EXPECT_EQ(getter.GetLocalAppDataDirectory().View(), "C:\\Users\\me\\AppData\\Local\\Quillvane\\Verentis 2021 (64-bit)\\");
    EXPECT_EQ(getter.GetDefaultConfigDirectory().View(), "C:\\ProgramData\\Quillvane\\Verentis 2021 (64-bit)\\Cfg\\");
}

TEST(InstalledLayout, InstallationIsThreeComponentsAboveTheLoadedFrameworkOrElseTheEngineModule) {
    TableSystem none;
    ExpectTE([&] { DirectoryGetter("2021", none).GetInstallationDirectory(); }, TE_OPERATION_FAILED,
             "Verentis Engine not registered", "DirectoryGetter::GetActiveTEDirectoryFromRegistry");
    const struct { const char *engine, *framework, *installation; } cases[] = {
        {"D:\\Prod\\Verentis\\Bin\\x64\\Engine.dll", nullptr, "D:\\Prod\\Verentis\\"},
        {"C:\\Engine\\Engine.dll", nullptr, "C:\\"},
        {"D:\\Prod\\Verentis\\Bin\\x64\\Engine.dll", "E:\\Tree\\Verentis\\Bin\\x64\\Release\\vantrel.dll", "E:\\Tree\\Verentis\\"}};
    for (const auto& c : cases) {
        TableSystem system;
        system.RegisterEngine(c.engine);
        if (c.framework) system.framework = c.framework;
        DirectoryGetter getter("2021", system);
        EXPECT_EQ(getter.GetInstallationDirectory().View(), c.installation) << c.engine;
    }
    TableSystem system;
    system.RegisterEngine(cases[0].engine);
    EXPECT_EQ(DirectoryGetter("2021", system).GetProgramsDirectory().View(), "D:\\Prod\\Verentis\\Bin\\");
}

TEST(DevelopmentLayout, TheBeaconMovesEveryDirectoryNextToTheInstallationAndOverridesToTheDevKey) {
    TableSystem system;
    system.RegisterEngine("D:\\Tree\\Verentis\\Bin\\x64\\Engine.dll");
    system.files.insert("D:\\Tree\\Verentis\\DEV BUILD BEACON (Do not delete or install).txt");
    system.Override("2021", "X:\\released");
    system.Override("2021dev", "X:\\development");
    DirectoryGetter getter("2021 (64-bit)", system);
    EXPECT_TRUE(getter.IsDevBuild());
    EXPECT_EQ(getter.GetProgramsDirectory().View(), "D:\\Tree\\Verentis\\Bin\\x64\\Release\\");
    EXPECT_EQ(getter.GetPublicDirectory().View(), "D:\\Tree\\VerentisPublic\\");
    EXPECT_EQ(getter.GetCommonAppDataDirectory().View(), "D:\\Tree\\CommonAppData\\");
    EXPECT_EQ(getter.GetLocalAppDataDirectory().View(), "D:\\Tree\\LocalAppData\\");
    EXPECT_EQ(getter.GetDefaultConfigDirectory().View(), "D:\\Tree\\CommonAppData\\Cfg\\");
    EXPECT_EQ(system.shellRequests, 0);
    EXPECT_EQ(getter.GetConfigDirectory("2021", true).View(), "X:\\development");
}

TEST(RegistryOverrides, AbsoluteValuesReplaceTheDirectoryInTheirView) {
    TableSystem system;
    system.Override("A", "\\\\srv\\share\\cfg", false);
    system.machine[{"Software\\Quillvane\\Verentis\\A", "CustomPublicLocation", true}] = "P:\\public";
    DirectoryGetter getter("2021", system);
    EXPECT_EQ(getter.GetConfigDirectory("A", false).View(), "\\\\srv\\share\\cfg");
    EXPECT_EQ(getter.GetConfigDirectory("A", true).View(), getter.GetDefaultConfigDirectory().View());
    EXPECT_EQ(getter.GetPublicDirectory("A", true).View(), "P:\\public");
}

TEST(RegistryOverrides, EmptyAndRelativeValuesAreIgnored) {
    TableSystem system;
    for (std::string value : {"", "relative\\cfg", "C:", "C:cfg", "/unix/style"}) {
        system.Override("B", value);
        EXPECT_EQ(DirectoryGetter("2021", system).GetConfigDirectory("B", true).View(),
                  "C:\\ProgramData\\Quillvane\\Verentis 2021\\Cfg\\") << value;
    }
}

TEST(Caching, AnswersStayUntilTheCacheIsCleared) {
    TableSystem system;
    DirectoryGetter getter("2021", system);
    Path before = getter.GetConfigDirectory("C", true);
    int shellRequests = system.shellRequests;
    system.Override("C", "Q:\\later");
    EXPECT_EQ(getter.GetConfigDirectory("C", true).View(), before.View());
    EXPECT_EQ(getter.GetCommonAppDataDirectory().View(), "C:\\ProgramData\\Quillvane\\Verentis 2021\\");
    EXPECT_EQ(system.shellRequests, shellRequests);
    // Another key or view is its own question, not the cached answer of the first.
    system.Override("D", "Q:\\other");
    EXPECT_EQ(getter.GetConfigDirectory("D", true).View(), "Q:\\other");
    getter.ClearCache();
    EXPECT_EQ(getter.GetConfigDirectory("C", true).View(), "Q:\\later");
}

// Catches a failing shell folder swallowed, and the default computed (and failing) even when an
// absolute "CfgLocation" wins.
TEST(Failures, AShellFolderThatCannotBeFoundFailsOnlyTheRequestsThatNeedIt) {
    TableSystem system;
    system.failShellFolders = true;
    system.Override("", "D:\\Bench\\Cfg");
    DirectoryGetter getter("2021 (64-bit)", system);
    EXPECT_EQ(CatchTE([&] { getter.GetConfigDirectory("E", true); }).GetErrorCode(), TE_PATH_NOT_FOUND);
    EXPECT_EQ(getter.GetConfigDirectory("", true).View(), "D:\\Bench\\Cfg");
}
