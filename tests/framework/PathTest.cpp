// Paths: the validity check, component arithmetic, the length limit and file comparison.
#include <gtest/gtest.h>

#include "CatchTE.h"
#include "DoubleByteCodePage.h"
#include "TempFolder.h"

#include <string>
#include <vector>

#include "framework/Path.h"
#include "framework/TEException.h"

using namespace sm;
using namespace sm::testing;

namespace {
// Shift-JIS characters whose trail bytes are the backslash (0x5C) and the bar (0x7C).
const std::string backslashTrail = "\x95\x5C";
const std::string barTrail = "\x95\x7C";
}  // namespace

TEST(ValidPaths, FormsLengthsSeparatorsAndCharacters) {
    const std::string longest = "C:\\" + std::string(256, 'p');  // 259 bytes
    for (const std::string& valid : std::vector<std::string>{longest, "C:", "C:\\", "C:dir", "c:\\dir\\file.txt", "C:\\dir\\",
                                                             "dir\\file.txt", "\\\\server\\share", "\\\\server\\share\\",
                                                             "C:\\tab\there\\x\x01y"})
        EXPECT_TRUE(IsValidPath(valid, false)) << valid;
    for (const std::string& invalid : std::vector<std::string>{"", longest + "q", "1:\\dir", "\\\\server\\", "\\\\\\share",
                                                               "\\\\ser|ver\\share", "\\single\\separator", "C:\\a\\\\b"})
        EXPECT_FALSE(IsValidPath(invalid, false)) << invalid;
    for (char bad : std::string("<>|:/\"\r\n"))
        EXPECT_FALSE(IsValidPath(std::string("C:\\di") + bad + "r\\file", false)) << int(bad);
}

TEST(ValidPaths, WildcardsOnlyInTheLastComponentAndOnlyWhenAllowed) {
    const struct { const char* path; bool wildcards, valid; } cases[] = {
        {"C:\\dir\\*.txt", false, false}, {"C:\\dir\\*.txt", true, true}, {"C:\\dir\\file?.txt", true, true},
        {"\\\\server\\share\\*", true, true}, {"C:\\d*r\\file.txt", true, false}, {"C:\\dir*\\", true, false},
        {"\\\\ser*ver\\share", true, false}};
    for (const auto& c : cases) EXPECT_EQ(IsValidPath(c.path, c.wildcards), c.valid) << c.path;
}

TEST_F(DoubleByteCodePage, TrailBytesAreNeverSeparatorsOrInvalidCharacters) {
    EXPECT_TRUE(IsValidPath("C:\\" + barTrail + "\\file", false));
    EXPECT_TRUE(IsValidPath("C:\\dir" + backslashTrail + "\\file", false));
    EXPECT_FALSE(IsValidPath("C:\\dir" + backslashTrail + "\\\\file", false));
    Path path("C:\\" + backslashTrail);
    EXPECT_EQ(path.Parent().View(), "C:\\");
    path.Append("file");
    EXPECT_EQ(path.View(), "C:\\" + backslashTrail + "\\file");
    EXPECT_EQ(path.Parent().View(), "C:\\" + backslashTrail);
}

TEST(PathText, DriveCompletionAppendAndParent) {
    EXPECT_EQ(Path("C:").View(), "C:\\");
    EXPECT_EQ(Path("C:dir").View(), "C:dir");
    EXPECT_EQ(Path("C:\\dir").Append("file").View(), "C:\\dir\\file");
    EXPECT_EQ(Path("C:\\dir\\").Append("\\file").View(), "C:\\dir\\file");
    EXPECT_EQ(Path("C:").Append("file").View(), "C:\\file");
    EXPECT_EQ(Path().Append("file").View(), "file");
    EXPECT_EQ(Path("C:\\dir").AppendDirectory("Cfg").View(), "C:\\dir\\Cfg\\");
    EXPECT_EQ(Path("C:\\dir\\").EnsureTrailingSeparator().View(), "C:\\dir\\");
    for (auto [path, parent] : {std::pair{"C:\\a\\b", "C:\\a"}, {"C:\\a\\b\\", "C:\\a"}, {"C:\\a", "C:\\"}, {"C:\\", "C:\\"},
                                {"\\\\srv\\share\\a", "\\\\srv\\share"}, {"\\\\srv\\share", "\\\\srv\\share"}, {"dir\\file", "dir"}, {"file", ""}})
        EXPECT_EQ(Path(path).Parent().View(), parent) << path;
    for (auto [path, absolute] : {std::pair{"C:", true}, {"\\\\srv\\share", true}, {"C:dir", false}, {"dir", false}})
        EXPECT_EQ(Path(path).IsAbsolute(), absolute) << path;
}

TEST(PathText, TextThatDoesNotFitIsRefusedNotCut) {
    std::string tooLong = "C:\\" + std::string(258, 'x');
    ExpectTE([&] { Path path(tooLong); }, TE_INVALID_PATHNAME,
             "The path '" + tooLong + "' is longer than the supported maximum of 260 bytes.", "Path::Assign");
    Path base("C:\\" + std::string(250, 'x'));
    EXPECT_EQ(CatchTE([&] { base.Append("0123456789"); }).GetErrorCode(), TE_INVALID_PATHNAME);
    EXPECT_EQ(base.View(), "C:\\" + std::string(250, 'x')) << "a refused append leaves the path alone";
    EXPECT_EQ(Path("C:\\" + std::string(257, 'x')).View().size(), 260u);
}

TEST(FileComparison, CopiesMatchAndAnyDifferenceIsFound) {
    TempFolder folder("PathTest");
    std::string content(10000, '\0');
    for (std::size_t i = 0; i < content.size(); ++i) content[i] = static_cast<char>((i * 31 + 7) % 251);
    std::string original = folder.Write("original.bin", content), lastByte = content, inSecondBlock = content;
    lastByte.back() ^= 1;
    inSecondBlock[4096] ^= static_cast<char>(0x80);
    EXPECT_TRUE(FilesAreIdentical(original, folder.Write("copy.bin", content)));
    EXPECT_TRUE(FilesAreIdentical(folder.Write("empty1.bin", ""), folder.Write("empty2.bin", "")));
    for (const std::string& other : {lastByte, inSecondBlock, content + "x", content.substr(0, 9999)})
        EXPECT_FALSE(FilesAreIdentical(original, folder.Write("other.bin", other))) << other.size();
}

TEST(FileComparison, AMissingFileRaisesItsFileError) {
    TempFolder folder("PathTest");
    std::string present = folder.Write("present.bin", "abc"), missing = folder.path + "/missing.bin";
    ExpectTE([&] { FilesAreIdentical(present, missing); }, TE_FILE_NOT_FOUND, "Could not find file '" + missing + "'.",
             "FilesAreIdentical");
    EXPECT_EQ(CatchTE([&] { FilesAreIdentical(present, missing); }).GetApiErrorCode(), 2);
}
