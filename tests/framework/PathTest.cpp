// Paths: the validity check, component arithmetic, the length limit and file comparison.
#include <gtest/gtest.h>

#include "CatchTE.h"
#include "DoubleByteCodePage.h"
#include "TempFolder.h"

#include <string>

#include "framework/Path.h"
#include "framework/TEException.h"

using namespace sm;
using namespace sm::testing;

namespace {
using PathDoubleByte = DoubleByteCodePage;

// Shift-JIS characters whose trail bytes are the backslash (0x5C) and the bar (0x7C).
const std::string backslashTrail = "\x95\x5C";
const std::string barTrail = "\x95\x7C";
}  // namespace

TEST(ValidPaths, FormsLengthsSeparatorsAndCharacters) {
    std::string longest = "C:\\" + std::string(256, 'p');  // 259 bytes
    for (std::string valid : {longest, std::string("C:"), std::string("C:\\"), std::string("C:dir"),
                              std::string("c:\\dir\\file.txt"), std::string("C:\\dir\\"), std::string("dir\\file.txt"),
                              std::string("\\\\server\\share"), std::string("\\\\server\\share\\"),
                              std::string("\\\\server\\share\\dir\\file.txt"), std::string("C:\\tab\there\\x\x01y")})
        EXPECT_TRUE(IsValidPath(valid, false)) << valid;
    for (std::string invalid : {std::string(), longest + "q", std::string("1:\\dir"), std::string("C:\\dir:stream"),
                                std::string("\\\\server"), std::string("\\\\server\\"), std::string("\\\\"),
                                std::string("\\\\\\share"), std::string("\\\\ser|ver\\share"),
                                std::string("\\\\server\\sh<are"), std::string("\\single\\separator"),
                                std::string("C:\\a\\\\b"), std::string("a\\\\")})
        EXPECT_FALSE(IsValidPath(invalid, false)) << invalid;
    for (char bad : std::string("<>|:/\"\r\n"))
        EXPECT_FALSE(IsValidPath(std::string("C:\\di") + bad + "r\\file", false)) << int(bad);
}

TEST(ValidPaths, WildcardsOnlyInTheLastComponentAndOnlyWhenAllowed) {
    EXPECT_FALSE(IsValidPath("C:\\dir\\*.txt", false));
    EXPECT_TRUE(IsValidPath("C:\\dir\\*.txt", true));
    EXPECT_TRUE(IsValidPath("C:\\dir\\file?.txt", true));
    EXPECT_TRUE(IsValidPath("\\\\server\\share\\*", true));
    for (const char* invalid : {"C:\\d*r\\file.txt", "C:\\dir*\\", "\\\\ser*ver\\share"})
        EXPECT_FALSE(IsValidPath(invalid, true)) << invalid;
    EXPECT_FALSE(IsValidPath("C:\\d*r\\file.txt", false));
}

TEST_F(PathDoubleByte, TrailBytesAreNeverSeparatorsOrInvalidCharacters) {
    EXPECT_TRUE(IsValidPath("C:\\" + barTrail + "\\file", false));
    EXPECT_TRUE(IsValidPath("C:\\dir" + backslashTrail + "\\file", false));
    EXPECT_FALSE(IsValidPath("C:\\dir" + backslashTrail + "\\\\file", false));
    Path path("C:\\" + backslashTrail);
    path.Append("file");
    EXPECT_EQ(path.View(), "C:\\" + backslashTrail + "\\file");
    EXPECT_EQ(path.Parent().View(), "C:\\" + backslashTrail);
    EXPECT_EQ(Path("C:\\" + backslashTrail).Parent().View(), "C:\\");
}

TEST(ValidPaths, ASingleByteCodePageSeesTheSameBytesAsABar) {
    EXPECT_FALSE(IsValidPath("C:\\" + barTrail + "\\file", false));
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
                                {"\\\\srv\\share\\a\\b", "\\\\srv\\share\\a"}, {"\\\\srv\\share\\a", "\\\\srv\\share"},
                                {"\\\\srv\\share", "\\\\srv\\share"}, {"dir\\file", "dir"}, {"file", ""}})
        EXPECT_EQ(Path(path).Parent().View(), parent) << path;

    EXPECT_TRUE(Path("C:").IsAbsolute());
    EXPECT_TRUE(Path("\\\\srv\\share").IsAbsolute());
    EXPECT_FALSE(Path("C:dir").IsAbsolute());
    EXPECT_FALSE(Path("dir").IsAbsolute());
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

namespace {
class FileComparison : public ::testing::Test {
protected:
    std::string Write(const std::string& name, const std::string& bytes) { return folder.Write(name, bytes); }
    TempFolder folder{"PathTest"};
};

std::string Pattern(std::size_t size) {
    std::string bytes(size, '\0');
    for (std::size_t i = 0; i < size; ++i) bytes[i] = static_cast<char>((i * 31 + 7) % 251);
    return bytes;
}
}  // namespace

TEST_F(FileComparison, CopiesMatchAndAnyDifferenceIsFound) {
    std::string content = Pattern(10000);
    std::string original = Write("original.bin", content);
    EXPECT_TRUE(FilesAreIdentical(original, Write("copy.bin", content)));
    EXPECT_TRUE(FilesAreIdentical(original, original));
    std::string lastByte = content;
    lastByte.back() = static_cast<char>(lastByte.back() ^ 1);
    EXPECT_FALSE(FilesAreIdentical(original, Write("last.bin", lastByte)));
    std::string inSecondBlock = content;
    inSecondBlock[4096] = static_cast<char>(inSecondBlock[4096] ^ 0x80);
    EXPECT_FALSE(FilesAreIdentical(original, Write("second.bin", inSecondBlock)));
    EXPECT_FALSE(FilesAreIdentical(original, Write("longer.bin", content + "x")));
    EXPECT_FALSE(FilesAreIdentical(original, Write("shorter.bin", content.substr(0, 9999))));
    EXPECT_TRUE(FilesAreIdentical(Write("empty1.bin", ""), Write("empty2.bin", "")));
}

TEST_F(FileComparison, AMissingFileRaisesItsFileError) {
    std::string present = Write("present.bin", "abc");
    std::string missing = folder.path + "/missing.bin";
    ExpectTE([&] { FilesAreIdentical(present, missing); }, TE_FILE_NOT_FOUND, "Could not find file '" + missing + "'.",
             "FilesAreIdentical");
    EXPECT_EQ(CatchTE([&] { FilesAreIdentical(present, missing); }).GetApiErrorCode(), 2);
}
