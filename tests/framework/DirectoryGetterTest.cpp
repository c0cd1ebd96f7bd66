// The product directories against a machine described by a table: installed and development
// layouts, registry overrides and their views, and the caches.
#include <gtest/gtest.h>

#include "CatchTE.h"

#include <map>
#include <set>
#include <string>
#include <tuple>

#include "framework/DirectoryGetter.h"
#include "framework/TEException.h"

using namespace sm;
using sm::testing::ExpectTE;

namespace {

class TableSystem final : public DirectorySystem {
public:
    std::optional<std::string> LoadedFrameworkModulePath() override { return framework; }
    std::optional<std::string> ClassesRootDefaultValue(std::string_view key) override {
        auto found = classesRoot.find(std::string(key));
        if (found == classesRoot.end()) return std::nullopt;
        return found->second;
    }
    std::optional<std::string> MachineValue(std::string_view key, std::string_view name, bool view64) override {
        auto found = machine.find({std::string(key), std::string(name), view64});
        if (found == machine.end()) return std::nullopt;
        return found->second;
    }
    std::string ShellFolder(int csidl) override {
        ++shellRequests;
        if (failShellFolders) TE_RAISE(TE_PATH_NOT_FOUND, "TableSystem::ShellFolder");
        if (csidl == 46) return "C:\\Users\\Public\\Documents";
        if (csidl == 35) return "C:\\ProgramData";
        if (csidl == 28) return "C:\\Users\\me\\AppData\\Local";
        TE_RAISE(TE_PATH_NOT_FOUND, "TableSystem::ShellFolder");
    }
    bool FileExists(std::string_view path) override { return files.count(std::string(path)) != 0; }

    void RegisterEngine(const std::string& path) { classesRoot[engineKey] = path; }

    std::optional<std::string> framework;
    std::map<std::string, std::string> classesRoot;
    std::map<std::tuple<std::string, std::string, bool>, std::string> machine;
    std::set<std::string> files;
    int shellRequests = 0;
    bool failShellFolders = false;

    static constexpr const char* engineKey = "CLSID\\{E17A3C92-4B08-4F6D-95E1-A2C7083D5B64}\\InprocServer32";
};

const std::string beacon = "DEV BUILD BEACON (Do not delete or install).txt";

}  // namespace

TEST(InstalledLayout, ShellFoldersPlusProductFolders) {
    TableSystem system;
    DirectoryGetter getter("2021 (64-bit)", system);
    EXPECT_FALSE(getter.IsDevBuild());
    EXPECT_EQ(getter.GetPublicDirectory().View(), "C:\\Users\\Public\\Documents\\Quillvane\\Verentis 2021 (64-bit)\\");
    EXPECT_EQ(getter.GetCommonAppDataDirectory().View(), "C:\\ProgramData\\Quillvane\\Verentis 2021 (64-bit)\\");
    EXPECT_EQ(getter.GetLocalAppDataDirectory().View(), "C:\\Users\\me\\AppData\\Local\\Quillvane\\Verentis 2021 (64-bit)\\");
    EXPECT_EQ(getter.GetDefaultConfigDirectory().View(), "C:\\ProgramData\\Quillvane\\Verentis 2021 (64-bit)\\Cfg\\");
    EXPECT_EQ(getter.GetConfigDirectory("2021", true).View(), getter.GetDefaultConfigDirectory().View());
    EXPECT_EQ(getter.GetPublicDirectory("2021", true).View(), getter.GetPublicDirectory().View());
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
        EXPECT_FALSE(getter.IsDevBuild());
    }
    TableSystem system;
    system.RegisterEngine(cases[0].engine);
    EXPECT_EQ(DirectoryGetter("2021", system).GetProgramsDirectory().View(), "D:\\Prod\\Verentis\\Bin\\");
}

TEST(DevelopmentLayout, TheBeaconMovesEveryDirectoryNextToTheInstallation) {
    TableSystem system;
    system.RegisterEngine("D:\\Tree\\Verentis\\Bin\\x64\\Engine.dll");
    system.files.insert("D:\\Tree\\Verentis\\" + beacon);
    DirectoryGetter getter("2021 (64-bit)", system);
    EXPECT_TRUE(getter.IsDevBuild());
    EXPECT_EQ(getter.GetProgramsDirectory().View(), "D:\\Tree\\Verentis\\Bin\\x64\\Release\\");
    EXPECT_EQ(getter.GetPublicDirectory().View(), "D:\\Tree\\VerentisPublic\\");
    EXPECT_EQ(getter.GetCommonAppDataDirectory().View(), "D:\\Tree\\CommonAppData\\");
    EXPECT_EQ(getter.GetLocalAppDataDirectory().View(), "D:\\Tree\\LocalAppData\\");
    EXPECT_EQ(getter.GetDefaultConfigDirectory().View(), "D:\\Tree\\CommonAppData\\Cfg\\");
    EXPECT_EQ(system.shellRequests, 0);
}

TEST(DevelopmentLayout, OverridesAreReadFromTheDevKey) {
    TableSystem system;
    system.RegisterEngine("D:\\Tree\\Verentis\\Bin\\x64\\Engine.dll");
    system.files.insert("D:\\Tree\\Verentis\\" + beacon);
    system.machine[{"Software\\Quillvane\\Verentis\\2021", "CfgLocation", true}] = "X:\\released";
    system.machine[{"Software\\Quillvane\\Verentis\\2021dev", "CfgLocation", true}] = "X:\\development";
    DirectoryGetter getter("2021", system);
    EXPECT_EQ(getter.GetConfigDirectory("2021", true).View(), "X:\\development");
}

TEST(RegistryOverrides, AbsoluteValuesReplaceTheDirectoryInTheirView) {
    TableSystem system;
    system.machine[{"Software\\Quillvane\\Verentis\\A", "CfgLocation", false}] = "\\\\srv\\share\\cfg";
    system.machine[{"Software\\Quillvane\\Verentis\\A", "CustomPublicLocation", true}] = "P:\\public";
    DirectoryGetter getter("2021", system);
    EXPECT_EQ(getter.GetConfigDirectory("A", false).View(), "\\\\srv\\share\\cfg");
    EXPECT_EQ(getter.GetConfigDirectory("A", true).View(), getter.GetDefaultConfigDirectory().View());
    EXPECT_EQ(getter.GetPublicDirectory("A", true).View(), "P:\\public");
    EXPECT_EQ(getter.GetPublicDirectory("A", false).View(), getter.GetPublicDirectory().View());
}

TEST(RegistryOverrides, EmptyAndRelativeValuesAreIgnored) {
    TableSystem system;
    for (std::string value : {"", "relative\\cfg", "C:", "C:cfg", "/unix/style"}) {
        system.machine[{"Software\\Quillvane\\Verentis\\B", "CfgLocation", true}] = value;
        DirectoryGetter getter("2021", system);
        EXPECT_EQ(getter.GetConfigDirectory("B", true).View(), "C:\\ProgramData\\Quillvane\\Verentis 2021\\Cfg\\")
            << value;
    }
}

TEST(Caching, AnswersStayUntilTheCacheIsCleared) {
    TableSystem system;
    DirectoryGetter getter("2021", system);
    Path before = getter.GetConfigDirectory("C", true);
    int shellRequests = system.shellRequests;
    system.machine[{"Software\\Quillvane\\Verentis\\C", "CfgLocation", true}] = "Q:\\later";
    EXPECT_EQ(getter.GetConfigDirectory("C", true).View(), before.View());
    EXPECT_EQ(getter.GetCommonAppDataDirectory().View(), "C:\\ProgramData\\Quillvane\\Verentis 2021\\");
    EXPECT_EQ(system.shellRequests, shellRequests);
    // Another key or view is its own question, not the cached answer of the first.
    system.machine[{"Software\\Quillvane\\Verentis\\D", "CfgLocation", true}] = "Q:\\other";
    EXPECT_EQ(getter.GetConfigDirectory("D", true).View(), "Q:\\other");
    getter.ClearCache();
    EXPECT_EQ(getter.GetConfigDirectory("C", true).View(), "Q:\\later");
}

TEST(Caching, OneGetterPerExactVersionText) {
    DirectoryGetter& first = GetDirectoryGetter("Version A");
    EXPECT_EQ(&first, &GetDirectoryGetter("Version A"));
    EXPECT_NE(&first, &GetDirectoryGetter("version a"));
    EXPECT_EQ(first.GetVersion(), "Version A");
}

TEST(Failures, AShellFolderThatCannotBeFoundFailsTheRequest) {
    TableSystem system;
    system.failShellFolders = true;
    DirectoryGetter getter("2021", system);
    EXPECT_EQ(sm::testing::CatchTE([&] { getter.GetConfigDirectory("E", true); }).GetErrorCode(), TE_PATH_NOT_FOUND);
}
