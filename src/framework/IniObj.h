// One INI document in memory: sections in file order, each with its items (name, value, quoted) in
// file order. Names compare byte for byte. The reader is lenient (malformed lines are skipped, long
// lines cut) because the files are edited by hand; the writer is strict, because what it writes must
// read back as the same document: a document it cannot write faithfully raises instead.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "Path.h"
#include "String.h"

namespace sm {

// Status codes of the file engine behind IniObj. They travel as the api error code of the
// TEException raised for them; IniErrorToTECode gives the TE code.
enum IniEngineError : std::int32_t {
    CouldNotOpenFileForReading = -5001,
    ErrorReadingFile = -5002,
    CouldNotFindUnusedTempFileName = -5003,
    CouldNotCreateTempFile = -5004,
    IncorrectFileFormat = -5005,
    UnexpectedEndOfFile = -5006,
    InvalidIntNumber = -5021,
    InvalidUIntNumber = -5022,
    InvalidDoubleNumber = -5023,
    InvalidBooleanValue = -5024,
    MissingSection = -5025,
    MissingItem = -5026,
    UnRecognizedValue = -5027,
    LineTooLong = -5028,
    OperationInProgress = -5050,
    TooManyItems = -5051,
    DuplicateItemOrValue = -5052,
    OutOfMemory = -5261,
    IOError = -5262,
    AccessDenied = -5263,
    InvalidPath = -5264,
    DiskFull = -5265,
};

std::int32_t IniErrorToTECode(std::int32_t engineError);
// The engine error's message from the "LGW_TOOLERR" language strings ("No description available. "
// for an unknown code); the line-length message has its limit filled in.
std::string GetIniErrorMessage(std::int32_t engineError);
// Raises the engine error's TE code from function, with its message (followed by a line end and
// elaboration when one is given) and the engine error as api error code.
[[noreturn]] void RaiseIniError(const char* function, std::int32_t engineError, std::string_view elaboration = {});

struct ItemEntry {
    std::string name;
    std::string value;
    // The value was, or is to be, written between double quotes.
    bool quoted = false;
};

struct SectionEntry {
    std::string name;
    std::vector<ItemEntry> items;
    // Sorted documents only: item positions ordered by name, equal names in file order.
    std::vector<std::uint32_t> sortedItems;
};

class IniObj {
public:
    static constexpr std::size_t maxLineBytes = 640;
    // Values of this many bytes or more are written as numbered "<name> Line0001" pieces.
    static constexpr std::size_t splitValueBytes = 121;
    static constexpr std::size_t pieceBytes = 120;

    // sorted keeps a name index of the sections and of each section's items, so lookups search by
    // halving; the lists and the written text keep insertion order either way.
    explicit IniObj(bool sorted = false) : sorted(sorted) {}
    // Heap-allocated document; running out of memory raises TE_OUT_OF_MEMORY from "IniObj::Create".
    static std::unique_ptr<IniObj> Create(bool sorted);

    // Replaces the document with the file's contents. The file is only opened for reading. On
    // failure the document is left as it was.
    void ReadFile(std::string_view path);
    // Replaces the document with the text's contents. On failure the document is left as it was.
    void ReadString(std::string_view text);
    void ReadString(const String& text) { ReadString(text.View()); }
    // The whole document as text, line ends "\r\n" or (lfOnly) "\n". Raises when a line would be
    // longer than a reader keeps or an item name would be read back as part of a split value.
    void WriteString(DynamicString& target, bool lfOnly = false) const;
    std::string WriteString(bool lfOnly = false) const;

    // Sets the item, replacing every item of that name in the section at the place of the first
    // (appended when there was none); creates the section at the end when missing. Values are stored
    // as given: callers that store free text escape it first (EscapeIniText). Names and values that
    // the text form cannot carry (line breaks; names that reading would trim or split) raise
    // TE_INVALID_OR_OUT_OF_RANGE.
    void Put(std::string_view section, std::string_view item, std::string_view value, bool quoted);

    // Text value with escapes decoded. A missing section or item gives false and leaves value as it was.
    bool Get(std::string_view section, std::string_view item, String& value) const;
    // Value exactly as stored.
    bool GetRaw(std::string_view section, std::string_view item, String& value) const;
    // Value as a path (UnescapeIniPath); a value too long for a path raises the InvalidPath engine error.
    bool Get(std::string_view section, std::string_view item, Path& value) const;
    // "True" or "False" in any case. Empty or blank counts as missing. Any other value gives false
    // like a missing item and sets *invalidValue (the InvalidBooleanValue engine error, not raised).
    bool Get(std::string_view section, std::string_view item, bool& value, bool* invalidValue) const;

    // First section of that name in file order (null when none).
    const SectionEntry* FindSection(std::string_view name) const;
    const ItemEntry* FindItem(std::string_view section, std::string_view item) const;
    const std::vector<SectionEntry>& GetSections() const { return sections; }
    bool IsSorted() const { return sorted; }
    // Path of the file last read, for messages.
    const String& GetFilePath() const { return filePath; }
    void Empty();

private:
    std::size_t FindSectionIndex(std::string_view name) const;

    bool sorted;
    std::vector<SectionEntry> sections;
    // Sorted documents only: section positions ordered by name, equal names in file order.
    std::vector<std::uint32_t> sortedSections;
    DynamicString filePath;
};

// The escape table of text values: TAB "\t", LF "\n", CR "\r", double quote \", backslash "\\",
// other control characters "\x" and two lower-case hexadecimal digits. Double-byte characters are
// never touched, so a trail byte 0x5C is not taken for a backslash.
std::string EscapeIniText(std::string_view text);
// Reverses the table. "\x" without two hexadecimal digits (or with "00", since text cannot hold NUL)
// stays an "x"; a backslash before any other character gives that character; one at the very end
// is dropped.
std::string UnescapeIniText(std::string_view text);
// Path values are written by hand with single backslashes ("C:\new\tools") as well as by the writer
// with escaped ones: only "\\" and "\"" are escapes, every other backslash stays as it stands.
std::string UnescapeIniPath(std::string_view text);

}  // namespace sm
