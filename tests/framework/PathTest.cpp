// Paths: the validity check, component arithmetic, the length limit and file comparison.
#include <gtest/gtest.h>

#include "CatchTE.h"
#include "DoubleByteCodePage.h"

#include <chrono>
#include <filesystem>
#include <fstream>
#include <string>

#include "framework/CodePage.h"
#include "framework/Path.h"
#include "framework/TEException.h"

using namespace sm;
namespace fs = std::filesystem;

namespace {
using sm::testing::CatchTE;

using PathDoubleByte = sm::testing::DoubleByteCodePage;

// Shift-JIS characters whose trail bytes are the backslash (0x5C) and the bar (0x7C).
const std::string backslashTrail = "\x95\x5C";
const std::string barTrail = "\x95\x7C";
}  // namespace

TEST(ValidPaths, LengthAndEmptiness) {
    EXPECT_FALSE(IsValidPath("", false));
    EXPECT_FALSE(IsValidPath("C:\\" + std::string(297, 'p'), false));
    std::string longest = "C:\\" + std::string(256, 'p');
    ASSERT_EQ(longest.size(), 259u);
    EXPECT_TRUE(IsValidPath(longest, false));
    EXPECT_FALSE(IsValidPath(longest + "q", false));
}

TEST(ValidPaths, DrivesAndDriveRelativeForms) {
    EXPECT_TRUE(IsValidPath("C:", false));
    EXPECT_TRUE(IsValidPath("C:\\", false));
    EXPECT_TRUE(IsValidPath("C:dir", false));
    EXPECT_TRUE(IsValidPath("c:\\dir\\file.txt", false));
    EXPECT_TRUE(IsValidPath("C:\\dir\\", false));
    EXPECT_TRUE(IsValidPath("dir\\file.txt", false));
    EXPECT_FALSE(IsValidPath("1:\\dir", false));
    EXPECT_FALSE(IsValidPath("C:\\dir:stream", false));
}

TEST(ValidPaths, NetworkPaths) {
    EXPECT_TRUE(IsValidPath("\\\\server\\share", false));
    EXPECT_TRUE(IsValidPath("\\\\server\\share\\", false));
    EXPECT_TRUE(IsValidPath("\\\\server\\share\\dir\\file.txt", false));
    EXPECT_FALSE(IsValidPath("\\\\server", false));
    EXPECT_FALSE(IsValidPath("\\\\server\\", false));
    EXPECT_FALSE(IsValidPath("\\\\", false));
    EXPECT_FALSE(IsValidPath("\\\\\\share", false));
    EXPECT_FALSE(IsValidPath("\\\\ser|ver\\share", false));
    EXPECT_FALSE(IsValidPath("\\\\server\\sh<are", false));
    EXPECT_FALSE(IsValidPath("\\\\ser*ver\\share", true));
    EXPECT_FALSE(IsValidPath("\\single\\separator", false));
}

TEST(ValidPaths, SeparatorsAndCharacters) {
    EXPECT_FALSE(IsValidPath("C:\\a\\\\b", false));
    EXPECT_FALSE(IsValidPath("a\\\\", false));
    for (char bad : std::string("<>|:/\"\r\n"))
        EXPECT_FALSE(IsValidPath(std::string("C:\\di") + bad + "r\\file", false)) << int(bad);
    EXPECT_TRUE(IsValidPath("C:\\tab\there\\x\x01y", false));
}

TEST(ValidPaths, WildcardsOnlyInTheLastComponentAndOnlyWhenAllowed) {
    EXPECT_FALSE(IsValidPath("C:\\dir\\*.txt", false));
    EXPECT_TRUE(IsValidPath("C:\\dir\\*.txt", true));
    EXPECT_TRUE(IsValidPath("C:\\dir\\file?.txt", true));
    EXPECT_FALSE(IsValidPath("C:\\d*r\\file.txt", true));
    EXPECT_FALSE(IsValidPath("C:\\d*r\\file.txt", false));
    EXPECT_FALSE(IsValidPath("C:\\dir*\\", true));
    EXPECT_TRUE(IsValidPath("\\\\server\\share\\*", true));
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

    EXPECT_EQ(Path("C:\\a\\b").Parent().View(), "C:\\a");
    EXPECT_EQ(Path("C:\\a\\b\\").Parent().View(), "C:\\a");
    EXPECT_EQ(Path("C:\\a").Parent().View(), "C:\\");
    EXPECT_EQ(Path("C:\\").Parent().View(), "C:\\");
    EXPECT_EQ(Path("\\\\srv\\share\\a\\b").Parent().View(), "\\\\srv\\share\\a");
    EXPECT_EQ(Path("\\\\srv\\share\\a").Parent().View(), "\\\\srv\\share");
    EXPECT_EQ(Path("\\\\srv\\share").Parent().View(), "\\\\srv\\share");
    EXPECT_EQ(Path("dir\\file").Parent().View(), "dir");
    EXPECT_EQ(Path("file").Parent().View(), "");

    EXPECT_TRUE(Path("C:").IsAbsolute());
    EXPECT_TRUE(Path("\\\\srv\\share").IsAbsolute());
    EXPECT_FALSE(Path("C:dir").IsAbsolute());
    EXPECT_FALSE(Path("dir").IsAbsolute());
}

TEST(PathText, TextThatDoesNotFitIsRefusedNotCut) {
    std::string tooLong = "C:\\" + std::string(258, 'x');
    TEException refused = CatchTE([&] { Path path(tooLong); });
    EXPECT_EQ(refused.GetErrorCode(), TE_INVALID_PATHNAME);
    EXPECT_STREQ(refused.GetFunction(), "Path::Assign");
    EXPECT_EQ(std::string(refused.GetDescription()),
              "The path '" + tooLong + "' is longer than the supported maximum of 260 bytes.");
    Path base("C:\\" + std::string(250, 'x'));
    EXPECT_EQ(CatchTE([&] { base.Append("0123456789"); }).GetErrorCode(), TE_INVALID_PATHNAME);
    EXPECT_EQ(base.View(), "C:\\" + std::string(250, 'x')) << "a refused append leaves the path alone";
    EXPECT_EQ(Path("C:\\" + std::string(257, 'x')).View().size(), 260u);
}

namespace {
class FileComparison : public ::testing::Test {
protected:
    void SetUp() override {
        folder = fs::temp_directory_path() /
                 ("PathTest-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()));
        fs::create_directories(folder);
    }
    void TearDown() override {
        std::error_code ignored;
        fs::remove_all(folder, ignored);
    }
    std::string Write(const std::string& name, const std::string& bytes) {
        fs::path file = folder / name;
        std::ofstream(file, std::ios::binary) << bytes;
        return file.string();
    }
    fs::path folder;
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
    std::string missing = (folder / "missing.bin").string();
    TEException raised = CatchTE([&] { FilesAreIdentical(present, missing); });
    EXPECT_EQ(raised.GetErrorCode(), TE_FILE_NOT_FOUND);
    EXPECT_EQ(raised.GetApiErrorCode(), 2);
    EXPECT_EQ(std::string(raised.GetDescription()), "Could not find file '" + missing + "'.");
    EXPECT_STREQ(raised.GetFunction(), "FilesAreIdentical");
}
