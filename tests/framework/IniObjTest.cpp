// INI documents: lines, the reader's and writer's rules (refusals too), values and files.
#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <vector>

#include "CatchTE.h"
#include "DoubleByteCodePage.h"
#include "TempFolder.h"
#include "framework/IniObj.h"
#include "framework/LineStream.h"

using namespace sm;
using namespace sm::testing;
using Texts = std::vector<std::string>;

namespace {
Texts Lines(std::string_view text) {
    TextLineSource source(text);
    LineStream stream(source);
    Texts lines;
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

std::string Written(std::initializer_list<std::pair<std::string, std::string>> items, bool quoted = false) {
    IniObj ini;
    for (const auto& [name, value] : items) ini.Put("S", name, value, quoted);
    return ini.WriteString(true);
}

// What the writer of a one-item document raises.
TEException WriteRefusal(std::string_view section, std::string_view name, std::string_view value) {
    IniObj ini;
    ini.Put(section, name, value, false);
    return CatchTE([&] { (void)ini.WriteString(false); });
}

using IniDoubleByte = DoubleByteCodePage;
const std::string f640(640, 'f');
}  // namespace

TEST(IniLines, EndAtLfCrOrNulAndPairedEndsCountOnce) {
    EXPECT_EQ(Lines(std::string("a\nb\rc\r\nd\n\re\0f", 14)), (Texts{"a", "b", "c", "d", "e", "f"}));
    for (std::string text : {std::string("a\r\n\r\nb"), std::string("a\n\n\rb"), std::string("a\0\nb", 4),
                             std::string("a\r\r\nb")})
        EXPECT_EQ(Lines(text), (Texts{"a", "", "b"}));
    // The last line needs no end, and an end adds no empty line.
    EXPECT_EQ(Lines(""), Texts{});
    EXPECT_EQ(Lines("only\r\n"), Texts{"only"});
    EXPECT_EQ(Lines("\n"), Texts{""});
}

TEST(IniLines, PairedEndsSplitAcrossBlocksAndLongLines) {
    for (std::string ending : {"\r\n", "\n\r"}) {
        // The second line's CR or LF is the block's last byte.
        std::string filler = std::string(LineStream::blockBytes - 301, 'f') + "\n", second(299, 'x');
        EXPECT_EQ(Lines(filler + second + ending + "next"), (Texts{f640, second, "next"}));
    }
    // Long lines keep their first 640 bytes, over several blocks too, and the next line is intact.
    EXPECT_EQ(Lines("head\n" + std::string(LineStream::blockBytes - 2, 'f') + "\r\nzwwwwwwwwww\n"),
              (Texts{"head", f640, "zwwwwwwwwww"}));
    EXPECT_EQ(Lines(std::string(2 * LineStream::blockBytes + 5, 'f') + "\r\nafter\n"), (Texts{f640, "after"}));
    EXPECT_EQ(Lines(f640), Texts{f640});
}

TEST_F(IniDoubleByte, LineCutNeverSplitsADoubleByteCharacter) {
    EXPECT_EQ(Lines(std::string(639, 'a') + wideA + "tail\n"), Texts{std::string(639, 'a')});
    EXPECT_EQ(Lines(std::string(638, 'a') + wideA + "tail"), Texts{std::string(638, 'a') + wideA});
}

TEST(IniReading, DuplicateSectionsStayTwoAndLookupsFindTheFirstByCaseSensitiveName) {
    for (bool sorted : {false, true}) {
        IniObj ini = Read("[A]\nx = 1\n[B]\nz = 3\n[A]\nx = 2\ny = 2\n", sorted);
        EXPECT_EQ(Describe(ini), "[A]{x=1}[B]{z=3}[A]{x=2}{y=2}");
        EXPECT_EQ(GetText(ini, "A", "x") + GetText(ini, "B", "z"), "13");
        EXPECT_EQ(GetText(ini, "A", "y") + GetText(ini, "a", "x") + GetText(ini, "A", "X"), "<missing><missing><missing>");
    }
}

TEST(IniReading, QuotesCommentsMalformedLinesAndItemsBeforeAnyHeader) {
    const char* text = "early = dropped\n[S]\n   ;; indented comment = 1\n;plain = 2\nno separator here\n   = nameless\n"
                       "\t \nk = v ; not a comment\n  spaced   =   out  \na = b = c\n"
                       "qa = \"  padded value  \"\nqb = \"inner\"quote\"\nqc = \"\"\nqd = \"\nqe = \"open\n"
                       "qf = plain \"mid\" text\n";
    IniObj ini = Read(text);
    EXPECT_EQ(Describe(ini), "[S]{k=v ; not a comment}{spaced=out}{a=b = c}{qa=  padded value  }q{qb=inner\"quote}q"
                             "{qc=}q{qd=\"}{qe=\"open}{qf=plain \"mid\" text}");
    EXPECT_EQ(ini.WriteString(true), "[S]\nk = v ; not a comment\nspaced = out\na = b = c\nqa = \"  padded value  \"\n"
                                     "qb = \"inner\"quote\"\nqc = \"\"\nqd = \"\nqe = \"open\nqf = plain \"mid\" text\n\n");
}

TEST(IniReading, InvalidHeadersStartNoSection) {
    IniObj ini = Read("[  Blanks Inside  ]  \na = 1\n[Junk] after\nb = 2\n[Unclosed\nc = 3\n[a]b]\nd = 4\n[]\ne = 5\n");
    EXPECT_EQ(Describe(ini), "[Blanks Inside]{a=1}{b=2}{c=3}[a]b]{d=4}[]{e=5}");
}

TEST(IniReading, LongLinesNumberedPiecesAndReplacement) {
    IniObj cut = Read("[S]\nk=" + std::string(698, 'v') + "\nnext = 1\n");
    EXPECT_EQ(GetText(cut, "S", "k") + GetText(cut, "S", "next"), std::string(638, 'v') + "1");
    IniObj pieces = Read("[S]\nk Line0001 = abc\nk Line0002 = \"def \"\nk Line3 = ghi\nother = 1\n"
                         "m Line0002 = not a run start\nm Line0003 = x\nn Line0001 = one\nn Line0002 = two\n"
                         "n Line0004 = gap\n[T]\nk Line0002 = alone\n");
    EXPECT_EQ(Describe(pieces), "[S]{k=abcdef ghi}q{other=1}{m Line0002=not a run start}{m Line0003=x}"
                                "{n=onetwo}{n Line0004=gap}[T]{k Line0002=alone}");
    pieces.ReadString("[New]\nb = 2\n");
    EXPECT_EQ(Describe(pieces), "[New]{b=2}");
}

TEST(IniWriting, SectionsItemsAndLineEnds) {
    IniObj ini;
    ini.Put("First", "x", "1", false);
    ini.Put("First", "path", "C:\\\\dir", true);
    ini.Put("Empty value", "e", "", false);
    ini.Put("Empty value", "q", "", true);
    EXPECT_EQ(ini.WriteString(false), "[First]\r\nx = 1\r\npath = \"C:\\\\dir\"\r\n\r\n[Empty value]\r\ne = \r\nq = \"\"\r\n\r\n");
    DynamicString target("old text");
    ini.WriteString(target, true);
    EXPECT_EQ(target.View(), "[First]\nx = 1\npath = \"C:\\\\dir\"\n\n[Empty value]\ne = \nq = \"\"\n\n");
}

TEST(IniWriting, PutReplacesEverySameNamedItemAtTheFirstOnesPlace) {
    for (bool sorted : {false, true}) {
        IniObj ini = Read("[S]\na = 1\nb = 2\na = 3\nc = 4\na = 5\n", sorted);
        ini.Put("S", "a", "new", false);
        ini.Put("S", "d", "appended", true);
        ini.Put("Later", "z", "9", false);
        EXPECT_EQ(Describe(ini), "[S]{a=new}{b=2}{c=4}{d=appended}q[Later]{z=9}");
        EXPECT_EQ(GetText(ini, "S", "c") + GetText(ini, "S", "d") + GetText(ini, "Later", "z"), "4appended9");
    }
}

TEST(IniWriting, LongValuesAreSplitIntoNumberedLinesFrom121Bytes) {
    std::string value;
    for (int i = 0; i < 250; ++i) value += static_cast<char>('a' + i % 26);
    EXPECT_EQ(Written({{"Long", value}}), "[S]\nLong Line0001 = " + value.substr(0, 120) + "\nLong Line0002 = " +
                                              value.substr(120, 120) + "\nLong Line0003 = " + value.substr(240) + "\n\n");
    EXPECT_EQ(Written({{"a", std::string(120, 'x')}, {"b", std::string(121, 'y')}}, true),
              "[S]\na = \"" + std::string(120, 'x') + "\"\nb Line0001 = \"" + std::string(120, 'y') + "\"\nb Line0002 = \"y\"\n\n");
}

TEST_F(IniDoubleByte, PiecesHoldWholeCharacters) {
    std::string value = std::string(119, 'a') + wideA + std::string(10, 'b');
    std::string text = Written({{"k", value}});
    EXPECT_EQ(text, "[S]\nk Line0001 = " + std::string(119, 'a') + "\nk Line0002 = " + wideA + std::string(10, 'b') + "\n\n");
    EXPECT_EQ(Describe(Read(text)), "[S]{k=" + value + "}");
}

TEST(IniWriting, ValuesTheReaderWouldChangeAreWrittenQuoted) {
    // Blanks at the ends of a bare value or of a piece, or enclosing quotes, would be lost on reading.
    std::string blankAtCut = std::string(119, 'a') + " " + std::string(10, 'b');
    EXPECT_EQ(Written({{"blanks", "  both ends "}, {"quotes", "\"looks quoted\""}, {"cut", blankAtCut}}),
              "[S]\nblanks = \"  both ends \"\nquotes = \"\"looks quoted\"\"\ncut Line0001 = \"" + std::string(119, 'a') +
                  " \"\ncut Line0002 = \"" + std::string(10, 'b') + "\"\n\n");
}

TEST(IniWriting, PutRefusesNamesAndValuesTheTextCannotCarry) {
    IniObj ini;
    ExpectTE([&] { ini.Put("S", "k", "first\n[Injected]\nx = 1", false); }, TE_INVALID_OR_OUT_OF_RANGE,
             "The value of the item 'k' holds a line break, which an INI file cannot store; escape the value first.",
             "IniObj::Put");
    ExpectTE([&] { ini.Put("S", "a=b", "1", false); }, TE_INVALID_OR_OUT_OF_RANGE,
             "The item name 'a=b' cannot be stored in an INI file: it is empty, holds '=' or a line break, begins "
             "with ';' or '[', or begins or ends with white space.");
    for (std::string_view bad : {"", " lead", "trail\t", ";comment", "[header]", "two\rlines"})
        EXPECT_EQ(CatchTE([&] { ini.Put("S", bad, "1", false); }).GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE) << bad;
    ExpectTE([&] { ini.Put(" S", "k", "1", false); }, TE_INVALID_OR_OUT_OF_RANGE,
             "The section name ' S' cannot be stored in an INI file: it holds a line break or begins or ends with "
             "white space.");
    EXPECT_EQ(CatchTE([&] { ini.Put("A]\n[B", "k", "1", false); }).GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_EQ(Describe(ini), "") << "nothing of the refused puts arrived";
    // Brackets, '=' and ';' inside a section name are fine: the header ends at the last ']'.
    ini.Put("a]=;b", "k", "1", false);
    EXPECT_EQ(Describe(Read(ini.WriteString(true))), "[a]=;b]{k=1}");
}

TEST(IniWriting, LinesTheReaderWouldCutAreRefused) {
    TEException item = WriteRefusal("S", std::string(520, 'n'), std::string(119, 'v'));
    EXPECT_EQ(item.GetErrorCode(), TE_OPERATION_FAILED);
    EXPECT_EQ(item.GetApiErrorCode(), LineTooLong);
    EXPECT_STREQ(item.GetDescription(), "A line in the file was longer than the supported maximum of 640 bytes.");
    EXPECT_STREQ(item.GetFunction(), "IniObj::WriteString");
    EXPECT_EQ(WriteRefusal(std::string(639, 'h'), "k", "1").GetErrorCode(), TE_OPERATION_FAILED);
    IniObj fits;
    fits.Put(std::string(638, 'h'), "k", "1", false);
    EXPECT_EQ(Describe(Read(fits.WriteString(false))), "[" + std::string(638, 'h') + "]{k=1}");
}

TEST(IniWriting, NamesThatWouldReadBackAsPiecesAreRefused) {
    EXPECT_STREQ(WriteRefusal("S", "k Line0001", "short").GetDescription(),
                 "The item 'k Line0001' in section 'S' cannot be written: its name would be read back as part of a "
                 "value split over several lines.");
    // Written after a two-piece value of k, an item "k Line0003" would continue its run.
    IniObj follows, fine;
    follows.Put("S", "k", std::string(200, 'a'), false);
    follows.Put("S", "k Line0003", "tail", false);
    EXPECT_EQ(CatchTE([&] { (void)follows.WriteString(false); }).GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    // Not a run start and not following one: written and read back as it is.
    fine.Put("S", "k Line0003", "tail", false);
    fine.Put("S", "m Line0001", std::string(130, 'b'), false);
    EXPECT_EQ(Describe(Read(fine.WriteString(false))), "[S]{k Line0003=tail}{m Line0001=" + std::string(130, 'b') + "}");
}

TEST(IniValues, EscapeTableBothWays) {
    EXPECT_EQ(EscapeIniText("a\tb\nc\rd\"e\\f\x01g\x7fh\x1f"), "a\\tb\\nc\\rd\\\"e\\\\f\\x01g\\x7fh\\x1f");
    EXPECT_EQ(UnescapeIniText("\\x4A\\x4a|\\xZZ|\\x4|\\x00|\\q\\'|end\\"), "JJ|xZZ|x4|x00|q'|end");
}

TEST_F(IniDoubleByte, EscapesLeaveDoubleByteCharactersAlone) {
    std::string text = wideWithBackslashTrail + "n" + wideA;
    EXPECT_EQ(EscapeIniText(text), text);
    EXPECT_EQ(UnescapeIniText(text), text);
    EXPECT_EQ(UnescapeIniText("\\" + wideWithBackslashTrail + "\\\\"), wideWithBackslashTrail + "\\");
}

// The decoding Get is checked by the INI fuzz rule over escaped texts.
TEST(IniValues, RawGetDoesNotDecodeAndMissingLeavesTheOutputAlone) {
    IniObj ini = Read("[S]\nmsg = \"say \\\"hi\\\"\\tnow\\x01\"\n");
    DynamicString raw, untouched("keep");
    ASSERT_TRUE(ini.GetRaw("S", "msg", raw));
    EXPECT_EQ(raw.View(), "say \\\"hi\\\"\\tnow\\x01");
    EXPECT_FALSE(ini.Get("S", "nothing", untouched));
    EXPECT_EQ(untouched.View(), "keep");
}

TEST(IniValues, BooleansAndTheInvalidValueFlag) {
    IniObj ini = Read("[S]\nupper = TRUE\nmixed = fAlSe\nyes = yes\nblank = \"  \"\n");
    // Per item: found, value, invalid. An invalid value leaves the output alone; a blank one counts as missing.
    std::string seen;
    for (std::string item : {"upper", "mixed", "yes", "blank", "absent"}) {
        bool value = true, invalid = item != "yes";  // the opposite of what each must leave
        bool found = ini.Get("S", item, value, &invalid);
        seen += item + ":" + std::to_string(found) + std::to_string(value) + std::to_string(invalid) + " ";
    }
    EXPECT_EQ(seen, "upper:110 mixed:100 yes:011 blank:010 absent:010 ");
    bool value = false;
    EXPECT_FALSE(ini.Get("S", "yes", value, nullptr));
}

// Catches a path decoded like free text ("C:\new" read back with a line feed) and a long path cut.
TEST(IniValues, PathsDecodeOnlyBackslashAndQuoteAndAreNeverCut) {
    IniObj ini = Read("[D]\nModulePath = \"C:\\\\Program Files\\\\fl45_64.dll\"\nHand = \"C:\\new\\tools\\x.dll\"\n"
                      "Long = \"C:\\\\" + std::string(300, 'p') + "\"\n");
    Path path, hand;
    ASSERT_TRUE(ini.Get("D", "Hand", hand));
    EXPECT_EQ(hand.View(), "C:\\new\\tools\\x.dll");
    ASSERT_TRUE(ini.Get("D", "ModulePath", path));
    EXPECT_EQ(path.View(), "C:\\Program Files\\fl45_64.dll");
    ExpectTE([&] { ini.Get("D", "Long", path); }, TE_INVALID_PATHNAME, "Invalid Path");
    EXPECT_EQ(CatchTE([&] { ini.Get("D", "Long", path); }).GetApiErrorCode(), InvalidPath);
    EXPECT_EQ(path.View(), "C:\\Program Files\\fl45_64.dll");
}

// Catches a reader that opens for writing (the file is read-only), touches the file, or loses lines at blocks.
TEST(IniFiles, ReadsLikeReadStringAcrossBlocksWithoutChangingTheFile) {
    namespace fs = std::filesystem;
    TempFolder folder("IniObjTest");
    std::string text;
    for (int i = 0; i < 300; ++i) text += "[Section " + std::to_string(i) + "]\r\nitem = " + std::string(i % 50, 'v') + "\r\n\r\n";
    std::string file = folder.Write("big.ini", text);
    auto old = fs::last_write_time(file) - std::chrono::hours(48);
    fs::last_write_time(file, old);
    fs::permissions(file, fs::perms::owner_read);
    IniObj fromFile;
    fromFile.ReadFile(file);
    fs::permissions(file, fs::perms::owner_all);
    EXPECT_EQ(Describe(fromFile), Describe(Read(text)));
    EXPECT_EQ(ReadFileBytes(file), text);
    EXPECT_EQ(fs::last_write_time(file), old);
}

TEST(IniFiles, FailedReadsNameTheFileAndLeaveTheDocumentAsItWas) {
    TempFolder folder("IniObjTest");
    IniObj ini = Read("[Kept]\na = 1\n");
    auto expectRefused = [&](const std::string& file, int code, int apiCode, const std::string& description) {
        TEException raised = CatchTE([&] { ini.ReadFile(file); });
        EXPECT_EQ(raised.GetErrorCode(), code) << file;
        EXPECT_EQ(raised.GetApiErrorCode(), apiCode) << file;
        EXPECT_EQ(raised.GetDescription(), description);
        EXPECT_STREQ(raised.GetFunction(), "IniObj::ReadFile");
        EXPECT_EQ(Describe(ini), "[Kept]{a=1}");
    };
    for (std::string file : {folder.path + "/absent.ini", folder.path + "/no folder/x.ini"})
        expectRefused(file, TE_UNABLE_TO_OPEN_FILE, CouldNotOpenFileForReading, "Could not find file '" + file + "'.");
    expectRefused(folder.path, TE_ACCESS_DENIED, AccessDenied, "Access Denied\nError reading from file '" + folder.path + "'.");
    // The compressed form is refused; a text that merely starts alike is read as text.
    for (std::string marker : {"VerentisBinaryText", "VerentisBinary"}) {
        std::string file = folder.Write("packed.ini", marker + "\x01\x02[S]\nk = 1\n");
        expectRefused(file, TE_BAD_FILE_FORMAT, IncorrectFileFormat,
                      "Incorrect File Format\nError reading from file '" + file + "'.");
    }
    ini.ReadFile(folder.Write("text.ini", "VerentisBinar\n[S]\nk = 1\n"));
    EXPECT_EQ(Describe(ini), "[S]{k=1}");
}

// Generated documents and escaped free text: the INI fuzz rule over its corpus (FuzzReplay.Ini).
