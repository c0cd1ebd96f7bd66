// Hand-written paths in INI documents, and a custom configuration directory on a machine whose
// shell folders fail.
#include <gtest/gtest.h>

#include "framework/DirectoryGetter.h"
#include "framework/IniObj.h"
#include "framework/TEException.h"

using namespace sm;

// Fault: path items decoded every escape, so a hand-written "C:\new\tools" read back with a line
// feed and a tab in it. Only "\\" and "\"" are escapes in a path; what the writer escapes reads the same.
TEST(IniPathItems, KeepBackslashesThatStartNoEscape) {
    IniObj document;
    document.Put("Driver", "Written", EscapeIniText("C:\\Program Files\\new\\x.dll"), true);
    document.ReadString(document.WriteString() + "HandWritten = \"C:\\new\\tools\\x.dll\"\r\n");
    Path written, handWritten;
    ASSERT_TRUE(document.Get("Driver", "Written", written));
    ASSERT_TRUE(document.Get("Driver", "HandWritten", handWritten));
    EXPECT_EQ(written.View(), "C:\\Program Files\\new\\x.dll");
    EXPECT_EQ(handWritten.View(), "C:\\new\\tools\\x.dll");
}

namespace {
// A machine whose registry holds an absolute "CfgLocation" and whose shell gives no folders.
class NoShellFolders final : public DirectorySystem {
public:
    std::optional<std::string> LoadedFrameworkModulePath() override { return std::nullopt; }
    std::optional<std::string> ClassesRootDefaultValue(std::string_view) override { return std::nullopt; }
    std::optional<std::string> MachineValue(std::string_view, std::string_view name, bool) override {
        if (name == "CfgLocation") return "D:\\Bench\\Cfg";
        return std::nullopt;
    }
    std::string ShellFolder(int) override { TE_RAISE(TE_PATH_NOT_FOUND, "NoShellFolders::ShellFolder"); }
    bool FileExists(std::string_view) override { return false; }
};
}  // namespace

// Fault: the default directory was computed even when an absolute "CfgLocation" won, so a shell
// folder failure broke a valid custom location.
TEST(ConfigDirectory, AbsoluteCustomLocationNeedsNoShellFolder) {
    NoShellFolders machine;
    DirectoryGetter getter("2021 (64-bit)", machine);
    EXPECT_EQ(getter.GetConfigDirectory("", true).View(), "D:\\Bench\\Cfg");
}
