// INI documents: the line splitter, the reader's rules, the writer's rules (and its refusal to write
// what would not read back), values, files, and write-read round trips over generated documents.
#include <gtest/gtest.h>

#include "CatchTE.h"
#include "DoubleByteCodePage.h"

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "framework/CodePage.h"
#include "framework/IniObj.h"
#include "framework/LineStream.h"
#include "framework/TEException.h"

using namespace sm;
namespace fs = std::filesystem;

namespace {

using sm::testing::CatchTE;

std::vector<std::string> Lines(std::string_view text) {
    TextLineSource source(text);
    LineStream stream(source);
    std::vector<std::string> lines;
    std::string_view line;
    while (stream.ReadLine(line)) lines.emplace_back(line);
    return lines;
}

IniObj Read(std::string_view text, bool sorted = false) {
    IniObj ini(sorted);
    ini.ReadString(text);
    return ini;
}

std::string GetText(const IniObj& ini, std::string_view section, std::string_view item) {
    DynamicString value("<missing>");
    ini.Get(section, item, value);
    return std::string(value.View());
}

// A compact picture of a document: "[name]", then "{name=value}" per item, followed by q when quoted.
std::string Describe(const IniObj& ini) {
    std::string picture;
    for (const SectionEntry& section : ini.GetSections()) {
        picture += "[" + section.name + "]";
        for (const ItemEntry& item : section.items) picture += "{" + item.name + "=" + item.value + (item.quoted ? "}q" : "}");
    }
    return picture;
}

using IniDoubleByte = sm::testing::DoubleByteCodePage;

// Shift-JIS characters: full-width "a" (lead 0x82, trail 0x81) and one whose trail byte is 0x5C,
// the backslash byte.
const std::string wideA = "\x82\x81";
const std::string wideWithBackslashTrail = "\x95\x5C";

}  // namespace

// ---- Lines ---------------------------------------------------------------------------------------

TEST(IniLines, EndAtLfCrOrNulAndPairedEndsCountOnce) {
    EXPECT_EQ(Lines(std::string("a\nb\rc\r\nd\n\re\0f", 14)),
              (std::vector<std::string>{"a", "b", "c", "d", "e", "f"}));
    EXPECT_EQ(Lines("a\r\n\r\nb"), (std::vector<std::string>{"a", "", "b"}));
    EXPECT_EQ(Lines("a\n\n\rb"), (std::vector<std::string>{"a", "", "b"}));
    EXPECT_EQ(Lines(std::string("a\0\nb", 4)), (std::vector<std::string>{"a", "", "b"}));
    EXPECT_EQ(Lines("a\r\r\nb"), (std::vector<std::string>{"a", "", "b"}));
}

TEST(IniLines, LastLineNeedsNoEndAndAnEndAddsNoEmptyLine) {
    EXPECT_EQ(Lines(""), std::vector<std::string>{});
    EXPECT_EQ(Lines("only"), std::vector<std::string>{"only"});
    EXPECT_EQ(Lines("only\r\n"), std::vector<std::string>{"only"});
    EXPECT_EQ(Lines("\n"), std::vector<std::string>{""});
}

TEST(IniLines, PairedEndSplitAcrossBlocksIsStillOneEnd) {
    for (std::string ending : {"\r\n", "\n\r"}) {
        // The filler line ends at byte 1500, so the second line's CR or LF is the block's last byte.
        std::string filler = std::string(1500, 'f') + "\n";
        std::string second(LineStream::blockBytes - 1 - filler.size(), 'x');
        std::string text = filler + second + ending + "next";
        EXPECT_EQ(Lines(text), (std::vector<std::string>{std::string(640, 'f'), second, "next"}));
    }
    // A line that runs over several blocks comes back whole (when short enough) or cut.
    std::string text = "head\n" + std::string(LineStream::blockBytes - 2, 'y') + "\r\nz" + std::string(10, 'w') + "\n";
    std::vector<std::string> lines = Lines(text);
    ASSERT_EQ(lines.size(), 3u);
    EXPECT_EQ(lines[1], std::string(640, 'y'));
    EXPECT_EQ(lines[2], "z" + std::string(10, 'w'));
}

TEST(IniLines, LongLinesKeepTheirFirst640BytesAndTheNextLineIsIntact) {
    std::string line700(700, 'v');
    EXPECT_EQ(Lines(line700 + "\nafter"), (std::vector<std::string>{std::string(640, 'v'), "after"}));
    std::string line5000 = std::string(5000, 'q');
    EXPECT_EQ(Lines(line5000 + "\r\nafter\n"), (std::vector<std::string>{std::string(640, 'q'), "after"}));
    EXPECT_EQ(Lines(std::string(640, 'e')), std::vector<std::string>{std::string(640, 'e')});
}

TEST_F(IniDoubleByte, LineCutNeverSplitsADoubleByteCharacter) {
    std::string line = std::string(639, 'a') + wideA + "tail";
    EXPECT_EQ(Lines(line + "\n"), std::vector<std::string>{std::string(639, 'a')});
    std::string fits = std::string(638, 'a') + wideA + "tail";
    EXPECT_EQ(Lines(fits), std::vector<std::string>{std::string(638, 'a') + wideA});
}

// ---- Reading -------------------------------------------------------------------------------------

TEST(IniReading, DuplicateSectionsStayTwoAndLookupsFindTheFirst) {
    IniObj ini = Read("[A]\nx = 1\n[A]\nx = 2\n");
    ASSERT_EQ(ini.GetSections().size(), 2u);
    EXPECT_EQ(Describe(ini), "[A]{x=1}[A]{x=2}");
    EXPECT_EQ(GetText(ini, "A", "x"), "1");
    // Only the first section of the name is searched.
    IniObj split = Read("[A]\nx = 1\n[A]\ny = 2\n");
    EXPECT_EQ(GetText(split, "A", "y"), "<missing>");

    IniObj sorted = Read("[A]\nx = 1\n[B]\nz = 3\n[A]\nx = 2\n", true);
    EXPECT_EQ(Describe(sorted), "[A]{x=1}[B]{z=3}[A]{x=2}");
    std::string found = GetText(sorted, "A", "x");
    EXPECT_TRUE(found == "1" || found == "2") << found;
    EXPECT_EQ(GetText(sorted, "B", "z"), "3");
}

TEST(IniReading, QuotedValuesLoseTheirQuotesAndKeepTheirBlanks) {
    IniObj ini = Read("[S]\n"
                      "a = \"  padded value  \"\n"
                      "b = \"inner\"quote\"\n"
                      "c = \"\"\n"
                      "d = \"\n"
                      "e = \"open\n"
                      "f = plain \"mid\" text\n");
    EXPECT_EQ(Describe(ini), "[S]{a=  padded value  }q{b=inner\"quote}q{c=}q{d=\"}{e=\"open}"
                             "{f=plain \"mid\" text}");
    EXPECT_EQ(ini.WriteString(true), "[S]\n"
                                     "a = \"  padded value  \"\n"
                                     "b = \"inner\"quote\"\n"
                                     "c = \"\"\n"
                                     "d = \"\n"
                                     "e = \"open\n"
                                     "f = plain \"mid\" text\n"
                                     "\n");
}

TEST(IniReading, CommentsMalformedLinesAndItemsBeforeAnyHeaderAreIgnored) {
    IniObj ini = Read("early = dropped\n"
                      "[S]\n"
                      "   ;; indented comment = 1\n"
                      ";plain = 2\n"
                      "no separator here\n"
                      "   = nameless\n"
                      "\t \n"
                      "k = v ; not a comment\n"
                      "  spaced   =   out  \n"
                      "a = b = c\n");
    EXPECT_EQ(Describe(ini), "[S]{k=v ; not a comment}{spaced=out}{a=b = c}");
}

TEST(IniReading, HeaderRules) {
    IniObj ini = Read("[  Blanks Inside  ]  \n"
                      "a = 1\n"
                      "[Junk] after\n"
                      "b = 2\n"
                      "[Unclosed\n"
                      "c = 3\n"
                      "[a]b]\n"
                      "d = 4\n"
                      "[]\n"
                      "e = 5\n");
    // Invalid headers start nothing: their items stay in the section before them.
    EXPECT_EQ(Describe(ini), "[Blanks Inside]{a=1}{b=2}{c=3}[a]b]{d=4}[]{e=5}");
}

TEST(IniReading, A700ByteLineKeepsItsFirst640Bytes) {
    std::string line = "k=" + std::string(698, 'v');
    IniObj ini = Read("[S]\n" + line + "\nnext = 1\n");
    EXPECT_EQ(GetText(ini, "S", "k"), std::string(638, 'v'));
    EXPECT_EQ(GetText(ini, "S", "next"), "1");
}

TEST(IniReading, NamesAreCaseSensitive) {
    for (bool sorted : {false, true}) {
        IniObj document = Read("[Section]\nItem = 1\n", sorted);
        EXPECT_EQ(GetText(document, "section", "Item"), "<missing>");
        EXPECT_EQ(GetText(document, "Section", "item"), "<missing>");
        EXPECT_EQ(GetText(document, "Section", "Item"), "1");
    }
}

TEST(IniReading, NumberedPiecesAreJoinedIntoOneItem) {
    IniObj ini = Read("[S]\n"
                      "k Line0001 = abc\n"
                      "k Line0002 = \"def \"\n"
                      "k Line3 = ghi\n"
                      "other = 1\n"
                      "m Line0002 = not a run start\n"
                      "m Line0003 = x\n"
                      "n Line0001 = one\n"
                      "n Line0002 = two\n"
                      "n Line0004 = gap\n"
                      "[T]\n"
                      "k Line0002 = alone\n");
    EXPECT_EQ(Describe(ini), "[S]{k=abcdef ghi}q{other=1}{m Line0002=not a run start}{m Line0003=x}"
                             "{n=onetwo}{n Line0004=gap}[T]{k Line0002=alone}");
}

TEST(IniReading, EveryLineEndGivesTheSameDocument) {
    std::string lf = "[A]\nx = 1\n\n[B]\ny = \"2\"\n";
    std::string expected = Describe(Read(lf));
    for (std::string_view ending : {std::string_view("\r\n"), std::string_view("\r"), std::string_view("\n\r"),
                                     std::string_view("\0", 1)}) {
        std::string text;
        for (char c : lf) text += c == '\n' ? std::string(ending) : std::string(1, c);
        EXPECT_EQ(Describe(Read(text)), expected);
    }
}

TEST(IniReading, ReadingReplacesTheDocument) {
    IniObj ini = Read("[Old]\na = 1\n");
    ini.ReadString("[New]\nb = 2\n");
    EXPECT_EQ(Describe(ini), "[New]{b=2}");
}

// ---- Writing -------------------------------------------------------------------------------------

TEST(IniWriting, SectionsItemsAndLineEnds) {
    IniObj ini;
    ini.Put("First", "x", "1", false);
    ini.Put("First", "path", "C:\\\\dir", true);
    ini.Put("Empty value", "e", "", false);
    ini.Put("Empty value", "q", "", true);
    EXPECT_EQ(ini.WriteString(false), "[First]\r\nx = 1\r\npath = \"C:\\\\dir\"\r\n\r\n"
                                      "[Empty value]\r\ne = \r\nq = \"\"\r\n\r\n");
    DynamicString target("old text");
    ini.WriteString(target, true);
    EXPECT_EQ(target.View(), "[First]\nx = 1\npath = \"C:\\\\dir\"\n\n[Empty value]\ne = \nq = \"\"\n\n");
    EXPECT_EQ(IniObj().WriteString(false), "");
}

TEST(IniWriting, PutReplacesEverySameNamedItemAtTheFirstOnesPlace) {
    for (bool sorted : {false, true}) {
        IniObj ini = Read("[S]\na = 1\nb = 2\na = 3\nc = 4\na = 5\n", sorted);
        ini.Put("S", "a", "new", false);
        EXPECT_EQ(Describe(ini), "[S]{a=new}{b=2}{c=4}");
        ini.Put("S", "d", "appended", true);
        ini.Put("Later", "z", "9", false);
        EXPECT_EQ(Describe(ini), "[S]{a=new}{b=2}{c=4}{d=appended}q[Later]{z=9}");
        EXPECT_EQ(GetText(ini, "S", "c"), "4");
        EXPECT_EQ(GetText(ini, "S", "d"), "appended");
        EXPECT_EQ(GetText(ini, "Later", "z"), "9");
    }
}

TEST(IniWriting, SortedDocumentsFindEveryNameAndWriteInInsertionOrder) {
    IniObj ini(true);
    std::vector<std::string> names;
    for (int i = 0; i < 200; ++i) names.push_back("n" + std::to_string((i * 7919) % 1000));
    for (const std::string& name : names) ini.Put("S" + name.substr(0, 2), name, "v" + name, false);
    for (const std::string& name : names) EXPECT_EQ(GetText(ini, "S" + name.substr(0, 2), name), "v" + name);
    const std::vector<SectionEntry>& sections = ini.GetSections();
    ASSERT_FALSE(sections.empty());
    EXPECT_EQ(sections[0].name, "S" + names[0].substr(0, 2));
    EXPECT_EQ(sections[0].items[0].name, names[0]);
}

TEST(IniWriting, A250ByteValueIsWrittenAsThreeNumberedLinesAndReadsBackAsOne) {
    std::string value;
    for (int i = 0; i < 250; ++i) value += static_cast<char>('a' + i % 26);
    IniObj ini;
    ini.Put("S", "Long", value, false);
    std::string text = ini.WriteString(true);
    EXPECT_EQ(text, "[S]\nLong Line0001 = " + value.substr(0, 120) + "\nLong Line0002 = " + value.substr(120, 120) +
                        "\nLong Line0003 = " + value.substr(240) + "\n\n");
    IniObj back = Read(text);
    EXPECT_EQ(Describe(back), "[S]{Long=" + value + "}");
}

TEST(IniWriting, SplittingStartsAt121Bytes) {
    IniObj ini;
    ini.Put("S", "a", std::string(120, 'x'), false);
    ini.Put("S", "b", std::string(121, 'y'), true);
    EXPECT_EQ(ini.WriteString(true), "[S]\na = " + std::string(120, 'x') + "\nb Line0001 = \"" + std::string(120, 'y') +
                                         "\"\nb Line0002 = \"y\"\n\n");
}

TEST_F(IniDoubleByte, PiecesHoldWholeCharacters) {
    std::string value = std::string(119, 'a') + wideA + std::string(10, 'b');
    IniObj ini;
    ini.Put("S", "k", value, false);
    std::string text = ini.WriteString(true);
    EXPECT_EQ(text, "[S]\nk Line0001 = " + std::string(119, 'a') + "\nk Line0002 = " + wideA + std::string(10, 'b') +
                        "\n\n");
    EXPECT_EQ(Describe(Read(text)), "[S]{k=" + value + "}");
}

TEST(IniWriting, ValuesTheReaderWouldChangeAreWrittenQuoted) {
    // Blanks at the ends of a bare value, or enclosing quotes, would be lost on reading.
    IniObj ini;
    ini.Put("S", "blanks", "  both ends ", false);
    ini.Put("S", "quotes", "\"looks quoted\"", false);
    std::string piecesWithBlankAtCut = std::string(119, 'a') + " " + std::string(10, 'b');
    ini.Put("S", "cut", piecesWithBlankAtCut, false);
    std::string text = ini.WriteString(true);
    EXPECT_EQ(text, "[S]\nblanks = \"  both ends \"\nquotes = \"\"looks quoted\"\"\n"
                    "cut Line0001 = \"" + std::string(119, 'a') + " \"\ncut Line0002 = \"" + std::string(10, 'b') +
                        "\"\n\n");
    IniObj back = Read(text);
    EXPECT_EQ(GetText(back, "S", "blanks"), "  both ends ");
    EXPECT_EQ(GetText(back, "S", "cut"), piecesWithBlankAtCut);
    DynamicString raw;
    ASSERT_TRUE(back.GetRaw("S", "quotes", raw));
    EXPECT_EQ(raw.View(), "\"looks quoted\"");
}

TEST(IniWriting, PutRefusesNamesAndValuesTheTextCannotCarry) {
    IniObj ini;
    TEException lineBreak = CatchTE([&] { ini.Put("S", "k", "first\n[Injected]\nx = 1", false); });
    EXPECT_EQ(lineBreak.GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_STREQ(lineBreak.GetFunction(), "IniObj::Put");
    EXPECT_STREQ(lineBreak.GetDescription(),
                 "The value of the item 'k' holds a line break, which an INI file cannot store; escape the value first.");

    TEException equals = CatchTE([&] { ini.Put("S", "a=b", "1", false); });
    EXPECT_EQ(equals.GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_STREQ(equals.GetDescription(),
                 "The item name 'a=b' cannot be stored in an INI file: it is empty, holds '=' or a line break, begins "
                 "with ';' or '[', or begins or ends with white space.");
    for (std::string_view bad : {"", " lead", "trail\t", ";comment", "[header]", "two\rlines"})
        EXPECT_EQ(CatchTE([&] { ini.Put("S", bad, "1", false); }).GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE) << bad;

    TEException section = CatchTE([&] { ini.Put(" S", "k", "1", false); });
    EXPECT_STREQ(section.GetDescription(), "The section name ' S' cannot be stored in an INI file: it holds a line "
                                           "break or begins or ends with white space.");
    EXPECT_EQ(CatchTE([&] { ini.Put("A]\n[B", "k", "1", false); }).GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    // Nothing of the refused puts arrived.
    EXPECT_EQ(Describe(ini), "");
    // Brackets, '=' and ';' inside a section name are fine: the header ends at the last ']'.
    ini.Put("a]=;b", "k", "1", false);
    EXPECT_EQ(Describe(Read(ini.WriteString(true))), "[a]=;b]{k=1}");
}

TEST(IniWriting, LinesLongerThanTheReaderKeepsAreRefused) {
    IniObj ini;
    ini.Put("S", std::string(520, 'n'), std::string(119, 'v'), false);
    TEException tooLong = CatchTE([&] { (void)ini.WriteString(false); });
    EXPECT_EQ(tooLong.GetErrorCode(), TE_OPERATION_FAILED);
    EXPECT_EQ(tooLong.GetApiErrorCode(), LineTooLong);
    EXPECT_STREQ(tooLong.GetDescription(), "A line in the file was longer than the supported maximum of 640 bytes.");
    EXPECT_STREQ(tooLong.GetFunction(), "IniObj::WriteString");

    IniObj header;
    header.Put(std::string(639, 'h'), "k", "1", false);
    EXPECT_EQ(CatchTE([&] { (void)header.WriteString(false); }).GetErrorCode(), TE_OPERATION_FAILED);
    IniObj fits;
    fits.Put(std::string(638, 'h'), "k", "1", false);
    EXPECT_EQ(Describe(Read(fits.WriteString(false))), "[" + std::string(638, 'h') + "]{k=1}");
}

TEST(IniWriting, NamesThatWouldReadBackAsPiecesAreRefused) {
    IniObj single;
    single.Put("S", "k Line0001", "short", false);
    TEException piece = CatchTE([&] { (void)single.WriteString(false); });
    EXPECT_EQ(piece.GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_STREQ(piece.GetDescription(), "The item 'k Line0001' in section 'S' cannot be written: its name would be "
                                         "read back as part of a value split over several lines.");

    // Written after a two-piece value of k, an item "k Line0003" would continue its run.
    IniObj follows;
    follows.Put("S", "k", std::string(200, 'a'), false);
    follows.Put("S", "k Line0003", "tail", false);
    EXPECT_EQ(CatchTE([&] { (void)follows.WriteString(false); }).GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);

    // Not a run start and not following one: written and read back as it is.
    IniObj fine;
    fine.Put("S", "k Line0003", "tail", false);
    fine.Put("S", "m Line0001", std::string(130, 'b'), false);
    EXPECT_EQ(Describe(Read(fine.WriteString(false))), "[S]{k Line0003=tail}{m Line0001=" + std::string(130, 'b') + "}");
}

// ---- Values --------------------------------------------------------------------------------------

TEST(IniValues, EscapeTableBothWays) {
    std::string raw = "a\tb\nc\rd\"e\\f\x01g\x7fh\x1f";
    std::string escaped = "a\\tb\\nc\\rd\\\"e\\\\f\\x01g\\x7fh\\x1f";
    EXPECT_EQ(EscapeIniText(raw), escaped);
    EXPECT_EQ(UnescapeIniText(escaped), raw);
    EXPECT_EQ(UnescapeIniText("\\x4A\\x4a"), "JJ");
    EXPECT_EQ(UnescapeIniText("\\xZZ|\\x4|\\x00"), "xZZ|x4|x00");
    EXPECT_EQ(UnescapeIniText("\\q\\'"), "q'");
    EXPECT_EQ(UnescapeIniText("end\\"), "end");
}

TEST_F(IniDoubleByte, EscapesLeaveDoubleByteCharactersAlone) {
    std::string text = wideWithBackslashTrail + "n" + wideA;
    EXPECT_EQ(EscapeIniText(text), text);
    EXPECT_EQ(UnescapeIniText(text), text);
    EXPECT_EQ(UnescapeIniText("\\" + wideWithBackslashTrail + "\\\\"), wideWithBackslashTrail + "\\");
}

TEST(IniValues, TextGetDecodesAndRawGetDoesNot) {
    IniObj ini = Read("[S]\nmsg = \"say \\\"hi\\\"\\tnow\\x01\"\n");
    EXPECT_EQ(GetText(ini, "S", "msg"), "say \"hi\"\tnow\x01");
    DynamicString raw;
    ASSERT_TRUE(ini.GetRaw("S", "msg", raw));
    EXPECT_EQ(raw.View(), "say \\\"hi\\\"\\tnow\\x01");
    // Missing sections and items leave the output alone.
    DynamicString untouched("keep");
    EXPECT_FALSE(ini.Get("S", "nothing", untouched));
    EXPECT_FALSE(ini.Get("Nothing", "msg", untouched));
    EXPECT_EQ(untouched.View(), "keep");
}

TEST(IniValues, BooleansAndTheInvalidValueFlag) {
    IniObj ini = Read("[S]\nupper = TRUE\nmixed = fAlSe\nyes = yes\nblank = \"  \"\nnum = 1\n");
    bool value = false, invalid = true;
    EXPECT_TRUE(ini.Get("S", "upper", value, &invalid));
    EXPECT_TRUE(value);
    EXPECT_FALSE(invalid);
    EXPECT_TRUE(ini.Get("S", "mixed", value, &invalid));
    EXPECT_FALSE(value);

    value = true;
    EXPECT_FALSE(ini.Get("S", "yes", value, &invalid));
    EXPECT_TRUE(invalid);
    EXPECT_TRUE(value) << "an invalid value leaves the output alone";
    EXPECT_FALSE(ini.Get("S", "num", value, &invalid));
    EXPECT_TRUE(invalid);

    EXPECT_FALSE(ini.Get("S", "blank", value, &invalid));
    EXPECT_FALSE(invalid) << "a blank value counts as missing";
    EXPECT_FALSE(ini.Get("S", "absent", value, &invalid));
    EXPECT_FALSE(invalid);
    EXPECT_FALSE(ini.Get("S", "yes", value, nullptr));
}

TEST(IniValues, PathsAreDecodedAndNeverCut) {
    IniObj ini = Read("[D]\nModulePath = \"C:\\\\Program Files\\\\IVI Foundation\\\\fl45_64.dll\"\n"
                      "Long = \"C:\\\\" + std::string(300, 'p') + "\"\n");
    Path path;
    ASSERT_TRUE(ini.Get("D", "ModulePath", path));
    EXPECT_EQ(path.View(), "C:\\Program Files\\IVI Foundation\\fl45_64.dll");
    TEException tooLong = CatchTE([&] { ini.Get("D", "Long", path); });
    EXPECT_EQ(tooLong.GetErrorCode(), TE_INVALID_PATHNAME);
    EXPECT_EQ(tooLong.GetApiErrorCode(), InvalidPath);
    EXPECT_STREQ(tooLong.GetDescription(), "Invalid Path");
    EXPECT_EQ(path.View(), "C:\\Program Files\\IVI Foundation\\fl45_64.dll");
}

TEST(IniValues, EngineErrorsMapToTECodesAndMessages) {
    EXPECT_EQ(IniErrorToTECode(InvalidBooleanValue), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_EQ(GetIniErrorMessage(InvalidBooleanValue), "Invalid Boolean Value");
    EXPECT_EQ(IniErrorToTECode(UnRecognizedValue), TE_UNRECOGNIZED_VALUE);
    EXPECT_EQ(IniErrorToTECode(OperationInProgress), TE_OPERATION_IN_PROGRESS);
    EXPECT_EQ(IniErrorToTECode(DiskFull), TE_DISK_FULL);
    EXPECT_EQ(IniErrorToTECode(-4999), TE_OPERATION_FAILED);
    EXPECT_EQ(GetIniErrorMessage(-4999), "No description available. ");
    TEException raised = CatchTE([] { RaiseIniError("VxipnpInfo::Parse", InvalidBooleanValue); });
    EXPECT_EQ(raised.GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_EQ(raised.GetApiErrorCode(), -5024);
    EXPECT_STREQ(raised.GetDescription(), "Invalid Boolean Value");
    EXPECT_STREQ(raised.GetFunction(), "VxipnpInfo::Parse");
}

// ---- Files ---------------------------------------------------------------------------------------

namespace {
class IniFiles : public ::testing::Test {
protected:
    void SetUp() override {
        folder = fs::temp_directory_path() /
                 ("IniObjTest-" + std::to_string(std::chrono::steady_clock::now().time_since_epoch().count()));
        fs::create_directories(folder);
    }
    void TearDown() override {
        std::error_code ignored;
        fs::permissions(folder / "readonly.ini", fs::perms::owner_all, ignored);
        fs::remove_all(folder, ignored);
    }
    std::string Write(const std::string& name, const std::string& bytes) {
        fs::path file = folder / name;
        std::ofstream(file, std::ios::binary) << bytes;
        return file.string();
    }
    static std::string Contents(const std::string& file) {
        std::ifstream in(file, std::ios::binary);
        return std::string(std::istreambuf_iterator<char>(in), {});
    }
    fs::path folder;
};
}  // namespace

TEST_F(IniFiles, ReadsLikeReadStringAcrossBlocksAndRemembersThePath) {
    std::string text;
    for (int i = 0; i < 300; ++i)
        text += "[Section " + std::to_string(i) + "]\r\nitem = " + std::string(i % 50, 'v') + "\r\n\r\n";
    std::string file = Write("big.ini", text);
    IniObj fromFile;
    fromFile.ReadFile(file);
    EXPECT_EQ(Describe(fromFile), Describe(Read(text)));
    EXPECT_EQ(fromFile.GetSections().size(), 300u);
    EXPECT_EQ(fromFile.GetFilePath().View(), file);
}

TEST_F(IniFiles, ReadingNeverChangesTheFile) {
    std::string bytes = "[S]\r\nk = 1\r\n";
    std::string file = Write("readonly.ini", bytes);
    auto old = fs::last_write_time(file) - std::chrono::hours(48);
    fs::last_write_time(file, old);
    fs::permissions(file, fs::perms::owner_read | fs::perms::group_read | fs::perms::others_read);
    IniObj ini;
    ini.ReadFile(file);
    EXPECT_EQ(GetText(ini, "S", "k"), "1");
    EXPECT_EQ(Contents(file), bytes);
    EXPECT_EQ(fs::last_write_time(file), old);
}

TEST_F(IniFiles, AMissingFileNamesItself) {
    std::string file = (folder / "absent.ini").string();
    IniObj ini = Read("[Kept]\na = 1\n");
    TEException missing = CatchTE([&] { ini.ReadFile(file); });
    EXPECT_EQ(missing.GetErrorCode(), TE_UNABLE_TO_OPEN_FILE);
    EXPECT_EQ(missing.GetApiErrorCode(), CouldNotOpenFileForReading);
    EXPECT_EQ(std::string(missing.GetDescription()), "Could not find file '" + file + "'.");
    EXPECT_STREQ(missing.GetFunction(), "IniObj::ReadFile");
    EXPECT_EQ(Describe(ini), "[Kept]{a=1}") << "a failed read leaves the document as it was";
    std::string inMissingFolder = (folder / "no folder" / "x.ini").string();
    EXPECT_EQ(CatchTE([&] { ini.ReadFile(inMissingFolder); }).GetDescription(),
              "Could not find file '" + inMissingFolder + "'.");
}

TEST_F(IniFiles, AFolderIsNotReadable) {
    std::string name = folder.string();
    TEException denied = CatchTE([&] { IniObj().ReadFile(name); });
    EXPECT_EQ(denied.GetErrorCode(), TE_ACCESS_DENIED);
    EXPECT_EQ(denied.GetApiErrorCode(), AccessDenied);
    EXPECT_EQ(std::string(denied.GetDescription()), "Access Denied\nError reading from file '" + name + "'.");
}

TEST_F(IniFiles, TheCompressedFormIsRefused) {
    for (std::string marker : {"VerentisBinaryText", "VerentisBinary"}) {
        std::string file = Write("packed.ini", marker + "\x01\x02[S]\nk = 1\n");
        IniObj ini = Read("[Kept]\na = 1\n");
        TEException refused = CatchTE([&] { ini.ReadFile(file); });
        EXPECT_EQ(refused.GetErrorCode(), TE_BAD_FILE_FORMAT);
        EXPECT_EQ(refused.GetApiErrorCode(), IncorrectFileFormat);
        EXPECT_EQ(std::string(refused.GetDescription()), "Incorrect File Format\nError reading from file '" + file + "'.");
        EXPECT_EQ(Describe(ini), "[Kept]{a=1}");
    }
    // Only the marker counts: a text that merely starts alike is read as text.
    std::string file = Write("text.ini", "VerentisBinar\n[S]\nk = 1\n");
    IniObj ini;
    ini.ReadFile(file);
    EXPECT_EQ(Describe(ini), "[S]{k=1}");
}

// ---- Round trips ---------------------------------------------------------------------------------

namespace {

// A small, fully specified generator, so the documents are the same in every build.
class Generator {
public:
    explicit Generator(std::uint64_t seed) : state(seed) {}
    std::uint64_t Next() {
        std::uint64_t z = (state += 0x9E3779B97F4A7C15ull);
        z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9ull;
        z = (z ^ (z >> 27)) * 0x94D049BB133111EBull;
        return z ^ (z >> 31);
    }
    std::size_t Below(std::size_t bound) { return static_cast<std::size_t>(Next() % bound); }
    bool Chance(int percent) { return Below(100) < static_cast<std::size_t>(percent); }
    std::string Text(std::string_view alphabet, std::size_t maxLength) {
        std::string text;
        for (std::size_t n = Below(maxLength + 1); n > 0; --n) text += alphabet[Below(alphabet.size())];
        return text;
    }

private:
    std::uint64_t state;
};

constexpr std::string_view nameAlphabet = "abcXYZ019 _-.]=;[\"\\";
constexpr std::string_view valueAlphabet = "ab Z9 \t\"\\=;[]#\x01\x7f";

// Writes the document, reads it back and checks that nothing changed but, possibly, the quoted flag
// of values that had to be quoted; writing the result again gives the very same text.
void ExpectRoundTrip(const IniObj& original, bool lfOnly) {
    std::string text = original.WriteString(lfOnly);
    IniObj back = Read(text, original.IsSorted());
    const auto& before = original.GetSections();
    const auto& after = back.GetSections();
    ASSERT_EQ(after.size(), before.size()) << text;
    for (std::size_t s = 0; s < before.size(); ++s) {
        ASSERT_EQ(after[s].name, before[s].name);
        ASSERT_EQ(after[s].items.size(), before[s].items.size()) << text;
        for (std::size_t i = 0; i < before[s].items.size(); ++i) {
            EXPECT_EQ(after[s].items[i].name, before[s].items[i].name) << text;
            EXPECT_EQ(after[s].items[i].value, before[s].items[i].value) << text;
            if (before[s].items[i].quoted) {
                EXPECT_TRUE(after[s].items[i].quoted) << text;
            }
        }
    }
    EXPECT_EQ(back.WriteString(lfOnly), text);
}

std::string ItemName(Generator& random) {
    std::string name;
    while (name.empty()) {
        name = random.Text(nameAlphabet, 12);
        name.erase(std::remove(name.begin(), name.end(), '='), name.end());
        while (!name.empty() && (name.front() == ' ' || name.front() == ';' || name.front() == '[')) name.erase(0, 1);
    }
    return name + "k";  // never ends in digits, so never taken for a numbered piece
}

}  // namespace

TEST(IniRoundTrip, GeneratedDocumentsReadBackUnchanged) {
    Generator random(20240601);
    for (int document = 0; document < 300; ++document) {
        IniObj ini(random.Chance(50));
        for (std::size_t s = random.Below(6); s > 0; --s) {
            std::string section = random.Text(nameAlphabet, 16);
            while (!section.empty() && section.front() == ' ') section.erase(0, 1);
            while (!section.empty() && section.back() == ' ') section.pop_back();
            for (std::size_t i = random.Below(8); i > 0; --i) {
                std::size_t length = random.Chance(30) ? 121 + random.Below(400) : random.Below(40);
                std::string value = random.Text(valueAlphabet, length);
                ini.Put(section, ItemName(random), value, random.Chance(30));
            }
        }
        ExpectRoundTrip(ini, random.Chance(50));
        if (HasFailure()) {
            ADD_FAILURE() << "document " << document;
            return;
        }
    }
}

TEST(IniRoundTrip, EscapedFreeTextSurvivesWriteAndRead) {
    Generator random(77);
    std::string alphabet;
    for (int c = 1; c < 128; ++c) alphabet += static_cast<char>(c);
    for (int n = 0; n < 300; ++n) {
        std::string text = random.Text(alphabet, 300);
        IniObj ini;
        ini.Put("S", "free", EscapeIniText(text), random.Chance(50));
        IniObj back = Read(ini.WriteString(false));
        ASSERT_EQ(GetText(back, "S", "free"), text);
    }
}

namespace {
// Lines of every kind the reader meets, in random order; some long, some malformed.
std::string GeneratedText(Generator& random, std::string_view extraBytes) {
    std::string alphabet = std::string("ab =[];\"\\ \tLine0123") + std::string(extraBytes);
    static const char* endings[] = {"\n", "\r\n", "\r", "\n\r"};
    std::string text;
    for (std::size_t n = random.Below(40); n > 0; --n) {
        switch (random.Below(6)) {
            case 0: text += "[" + random.Text(alphabet, 20) + "]"; break;
            case 1: text += "k" + std::to_string(random.Below(3)) + " Line000" + std::to_string(1 + random.Below(3)) +
                            " = " + random.Text(alphabet, 150); break;
            default: text += random.Text(alphabet, 30) + "=" + random.Text(alphabet, random.Chance(10) ? 300 : 30);
        }
        text += endings[random.Below(4)];
    }
    return text;
}

void ExpectReadWriteReadIsStable(std::uint64_t seed, std::string_view extraBytes) {
    Generator random(seed);
    int written = 0;
    for (int document = 0; document < 300; ++document) {
        std::string text = GeneratedText(random, extraBytes);
        IniObj first = Read(text);
        std::string once;
        try {
            once = first.WriteString(true);
        } catch (const TEException& refused) {
            // Only documents the writer cannot carry faithfully may be refused.
            EXPECT_TRUE(refused.GetErrorCode() == TE_OPERATION_FAILED ||
                        refused.GetErrorCode() == TE_INVALID_OR_OUT_OF_RANGE)
                << refused.GetDescription();
            continue;
        }
        ++written;
        IniObj second = Read(once);
        IniObj third = Read(second.WriteString(true));
        ASSERT_EQ(Describe(third), Describe(second)) << text;
        ASSERT_EQ(second.GetSections().size(), first.GetSections().size()) << text;
        for (std::size_t s = 0; s < first.GetSections().size(); ++s) {
            const auto& a = first.GetSections()[s];
            const auto& b = second.GetSections()[s];
            ASSERT_EQ(a.name, b.name);
            ASSERT_EQ(a.items.size(), b.items.size()) << text;
            for (std::size_t i = 0; i < a.items.size(); ++i) {
                ASSERT_EQ(a.items[i].name, b.items[i].name) << text;
                ASSERT_EQ(a.items[i].value, b.items[i].value) << text;
            }
        }
    }
    EXPECT_GT(written, 200) << "the generator should mostly make writable documents";
}
}  // namespace

TEST(IniRoundTrip, ReadTextsWriteAndReadBackTheSame) { ExpectReadWriteReadIsStable(4242, ""); }

TEST_F(IniDoubleByte, ReadTextsWithDoubleByteCharactersWriteAndReadBackTheSame) {
    ExpectReadWriteReadIsStable(9001, "\x82\x81\x95\x5C\x81");
}
