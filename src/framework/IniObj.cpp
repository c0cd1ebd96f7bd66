#include "IniObj.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstring>
#include <initializer_list>
#include <new>
#include <numeric>
#include <optional>
#include <utility>

#include "CodePage.h"
#include "ErrorCodes.h"
#include "FileError.h"
#include "LanguageStrings.h"
#include "LineStream.h"
#include "MultiByte.h"
#include "TEException.h"
#include "UniqueFile.h"

namespace sm {

// ---- Engine errors -------------------------------------------------------------------------------

namespace {

struct EngineErrorRow {
    std::int32_t code;
    const char* key;
    std::int32_t teCode;
};

constexpr EngineErrorRow engineErrorRows[] = {
    {CouldNotOpenFileForReading, "CouldNotOpenFileForReading", TE_UNABLE_TO_OPEN_FILE},
    {ErrorReadingFile, "ErrorReadingFile", TE_IO_ERROR},
    {CouldNotFindUnusedTempFileName, "CouldNotFindUnusedTempFileName", TE_OPERATION_FAILED},
    {CouldNotCreateTempFile, "CouldNotCreateTempFile", TE_OPERATION_FAILED},
    {IncorrectFileFormat, "IncorrectFileFormat", TE_BAD_FILE_FORMAT},
    {UnexpectedEndOfFile, "UnexpectedEndOfFile", TE_BAD_FILE_FORMAT},
    {InvalidIntNumber, "InvalidIntNumber", TE_INVALID_OR_OUT_OF_RANGE},
    {InvalidUIntNumber, "InvalidUIntNumber", TE_INVALID_OR_OUT_OF_RANGE},
    {InvalidDoubleNumber, "InvalidDoubleNumber", TE_INVALID_OR_OUT_OF_RANGE},
    {InvalidBooleanValue, "InvalidBooleanValue", TE_INVALID_OR_OUT_OF_RANGE},
    {MissingSection, "MissingSection", TE_BAD_FILE_FORMAT},
    {MissingItem, "MissingItem", TE_BAD_FILE_FORMAT},
    {UnRecognizedValue, "UnRecognizedValue", TE_UNRECOGNIZED_VALUE},
    {LineTooLong, "LineTooLong", TE_OPERATION_FAILED},
    {OperationInProgress, "OperationInProgress", TE_OPERATION_IN_PROGRESS},
    {TooManyItems, "TooManyItems", TE_TOO_MANY_ITEMS},
    {DuplicateItemOrValue, "DuplicateItemOrValue", TE_DUPLICATE_ITEM_OR_VALUE},
    {OutOfMemory, "OutOfMemory", TE_OUT_OF_MEMORY},
    {IOError, "IOError", TE_IO_ERROR},
    {AccessDenied, "AccessDenied", TE_ACCESS_DENIED},
    {InvalidPath, "InvalidPath", TE_INVALID_PATHNAME},
    {DiskFull, "DiskFull", TE_DISK_FULL},
};

const EngineErrorRow* FindEngineError(std::int32_t code) {
    for (const EngineErrorRow& row : engineErrorRows)
        if (row.code == code) return &row;
    return nullptr;
}

// Fills "%1".."%9" in one pass, so an argument that itself holds "%2" is never filled again.
std::string FillMessage(std::string_view pattern, std::initializer_list<std::string_view> arguments) {
    std::string result;
    for (std::size_t i = 0; i < pattern.size(); ++i) {
        if (pattern[i] == '%' && i + 1 < pattern.size() && pattern[i + 1] >= '1' && pattern[i + 1] <= '9') {
            auto index = static_cast<std::size_t>(pattern[i + 1] - '1');
            if (index < arguments.size()) {
                result += *(arguments.begin() + index);
                ++i;
                continue;
            }
        }
        result += pattern[i];
    }
    return result;
}

std::string DescribedMessage(const char* key, std::initializer_list<std::string_view> arguments) {
    return FillMessage(GetLanguageString("ERR_DESCR", key), arguments);
}

}  // namespace

std::int32_t IniErrorToTECode(std::int32_t engineError) {
    const EngineErrorRow* row = FindEngineError(engineError);
    return row ? row->teCode : TE_OPERATION_FAILED;
}

std::string GetIniErrorMessage(std::int32_t engineError) {
    const EngineErrorRow* row = FindEngineError(engineError);
    std::string message = GetLanguageString("LGW_TOOLERR", row ? row->key : "NoDescriptionAvailable");
    if (engineError == LineTooLong) message = FillMessage(message, {std::to_string(IniObj::maxLineBytes)});
    return message;
}

void RaiseIniError(const char* function, std::int32_t engineError, std::string_view elaboration) {
    std::string message = GetIniErrorMessage(engineError);
    if (!elaboration.empty()) {
        message += '\n';
        message += elaboration;
    }
    TE_RAISE(IniErrorToTECode(engineError), function,
             RaiseDetails{.message = message, .apiErrorCode = engineError, .messageIsString = true});
}

// ---- Character rules of one line -----------------------------------------------------------------

namespace {

// The multibyte rules of the text being read or written. With a single-byte code page every byte is
// a character and the scans are plain byte scans; this is decided once per read or write.
class TextRules {
public:
    TextRules() {
        for (unsigned byte = 0x80; byte <= 0xFF && !doubleByte; ++byte)
            doubleByte = IsLeadByte(static_cast<unsigned char>(byte));
    }

    static bool IsWhite(char c) { return IsSingleByteSpace(static_cast<unsigned char>(c)); }

    // White space is never a lead byte, so skipping it from a character boundary is a byte scan.
    static std::string_view TrimStart(std::string_view text) {
        std::size_t start = 0;
        while (start < text.size() && IsWhite(text[start])) ++start;
        return text.substr(start);
    }

    std::string_view TrimEnd(std::string_view text) const {
        if (!doubleByte) {
            std::size_t end = text.size();
            while (end > 0 && IsWhite(text[end - 1])) --end;
            return text.substr(0, end);
        }
        // A blank may be the trail byte of a double-byte character; only blanks of their own go.
        std::size_t end = 0;
        for (std::size_t offset = 0; offset < text.size();) {
            std::size_t bytes = multibyte::CharBytes(text, offset);
            if (bytes != 1 || !IsWhite(text[offset])) end = offset + bytes;
            offset += bytes;
        }
        return text.substr(0, end);
    }

    std::string_view Trim(std::string_view text) const { return TrimEnd(TrimStart(text)); }

    std::size_t FindFirst(std::string_view text, char wanted) const {
        if (!doubleByte) return text.find(wanted);
        for (std::size_t offset = 0; offset < text.size();) {
            std::size_t bytes = multibyte::CharBytes(text, offset);
            if (bytes == 1 && text[offset] == wanted) return offset;
            offset += bytes;
        }
        return std::string_view::npos;
    }

    std::size_t FindLast(std::string_view text, char wanted) const {
        if (!doubleByte) return text.rfind(wanted);
        std::size_t found = std::string_view::npos;
        for (std::size_t offset = 0; offset < text.size();) {
            std::size_t bytes = multibyte::CharBytes(text, offset);
            if (bytes == 1 && text[offset] == wanted) found = offset;
            offset += bytes;
        }
        return found;
    }

    bool IsCharBoundary(std::string_view text, std::size_t position) const {
        if (!doubleByte) return true;
        std::size_t offset = 0;
        while (offset < position) offset += multibyte::CharBytes(text, offset);
        return offset == position;
    }

    // The last character is the single-byte character wanted.
    bool EndsWith(std::string_view text, char wanted) const {
        return !text.empty() && text.back() == wanted && IsCharBoundary(text, text.size() - 1);
    }

    std::size_t WholeCharPrefix(std::string_view text, std::size_t maxBytes) const {
        if (!doubleByte) return std::min(text.size(), maxBytes);
        return multibyte::WholeCharPrefix(text, maxBytes);
    }

private:
    bool doubleByte = false;
};

// ---- One line of INI text ------------------------------------------------------------------------

enum class LineKind { Ignored, Header, Item };

struct ParsedLine {
    LineKind kind = LineKind::Ignored;
    std::string_view name;
    std::string_view value;
    bool quoted = false;
};

// The reader's rules for one line (already cut to its first 640 bytes). The writer runs its own
// output through this too, so the two can never disagree.
ParsedLine ParseLine(std::string_view line, const TextRules& rules) {
    line = TextRules::TrimStart(line);
    if (line.empty() || line[0] == ';') return {};
    if (line[0] == '[') {
        std::string_view body = line.substr(1);
        std::size_t close = rules.FindLast(body, ']');
        if (close == std::string_view::npos) return {};
        for (char c : body.substr(close + 1))
            if (!TextRules::IsWhite(c)) return {};
        return {LineKind::Header, rules.Trim(body.substr(0, close)), {}, false};
    }
    std::size_t equals = rules.FindFirst(line, '=');
    if (equals == std::string_view::npos) return {};
    std::string_view name = rules.TrimEnd(line.substr(0, equals));
    if (name.empty()) return {};
    std::string_view value = rules.Trim(line.substr(equals + 1));
    bool quoted = false;
    if (value.size() >= 2 && value.front() == '"' && rules.EndsWith(value, '"')) {
        value = value.substr(1, value.size() - 2);
        quoted = true;
    }
    return {LineKind::Item, name, value, quoted};
}

// ---- Split values --------------------------------------------------------------------------------

// An item name of the form base, " Line", decimal digits: one piece of a value the writer split.
struct PieceName {
    std::string_view base;
    std::uint32_t number;
};

constexpr std::string_view pieceMarker = " Line";

std::optional<PieceName> ParsePieceName(std::string_view name, const TextRules& rules) {
    std::size_t digitsStart = name.size();
    while (digitsStart > 0 && name[digitsStart - 1] >= '0' && name[digitsStart - 1] <= '9') --digitsStart;
    std::size_t digits = name.size() - digitsStart;
    if (digits == 0 || digits > 9 || digitsStart < pieceMarker.size()) return std::nullopt;
    std::size_t markerStart = digitsStart - pieceMarker.size();
    if (name.substr(markerStart, pieceMarker.size()) != pieceMarker) return std::nullopt;
    if (!rules.IsCharBoundary(name, markerStart)) return std::nullopt;
    // Item names are trimmed everywhere else, so the joined name is too.
    std::string_view base = rules.TrimEnd(name.substr(0, markerStart));
    if (base.empty()) return std::nullopt;
    std::uint32_t number = 0;
    for (char c : name.substr(digitsStart)) number = number * 10 + static_cast<std::uint32_t>(c - '0');
    return PieceName{base, number};
}

// Joins every run "<base> Line1", "<base> Line2", ... (starting at 1, numbers following on) into one
// item named base whose value is the pieces' values in order; quoted when any piece was.
void JoinSplitValues(SectionEntry& section, const TextRules& rules) {
    auto& items = section.items;
    bool anyRun = std::any_of(items.begin(), items.end(), [&](const ItemEntry& item) {
        auto piece = ParsePieceName(item.name, rules);
        return piece && piece->number == 1;
    });
    if (!anyRun) return;
    std::vector<ItemEntry> joined;
    joined.reserve(items.size());
    for (std::size_t i = 0; i < items.size();) {
        auto first = ParsePieceName(items[i].name, rules);
        if (!first || first->number != 1) {
            joined.push_back(std::move(items[i++]));
            continue;
        }
        ItemEntry item{std::string(first->base), std::move(items[i].value), items[i].quoted};
        std::uint32_t expected = 2;
        std::size_t next = i + 1;
        for (; next < items.size(); ++next, ++expected) {
            auto piece = ParsePieceName(items[next].name, rules);
            if (!piece || piece->number != expected || piece->base != first->base) break;
            item.value += items[next].value;
            item.quoted = item.quoted || items[next].quoted;
        }
        joined.push_back(std::move(item));
        i = next;
    }
    items = std::move(joined);
}

// ---- Sorted indexes ------------------------------------------------------------------------------

template <class Entry>
std::vector<std::uint32_t> BuildNameIndex(const std::vector<Entry>& entries) {
    std::vector<std::uint32_t> index(entries.size());
    std::iota(index.begin(), index.end(), 0u);
    std::stable_sort(index.begin(), index.end(),
                     [&](std::uint32_t a, std::uint32_t b) { return entries[a].name < entries[b].name; });
    return index;
}

// First position (in file order) of name, through the index when there is one.
template <class Entry>
std::size_t FindByName(const std::vector<Entry>& entries, const std::vector<std::uint32_t>* index,
                       std::string_view name) {
    if (index) {
        auto found = std::lower_bound(index->begin(), index->end(), name,
                                      [&](std::uint32_t i, std::string_view n) { return entries[i].name < n; });
        return found != index->end() && entries[*found].name == name ? *found : std::string_view::npos;
    }
    for (std::size_t i = 0; i < entries.size(); ++i)
        if (entries[i].name == name) return i;
    return std::string_view::npos;
}

// Adds the last entry to its index; equal names stay in file order.
template <class Entry>
void IndexLastEntry(const std::vector<Entry>& entries, std::vector<std::uint32_t>& index) {
    auto position = static_cast<std::uint32_t>(entries.size() - 1);
    const std::string& name = entries[position].name;
    auto at = std::upper_bound(index.begin(), index.end(), name,
                               [&](const std::string& n, std::uint32_t i) { return n < entries[i].name; });
    index.insert(at, position);
}

// ---- Reading -------------------------------------------------------------------------------------

struct ReadResult {
    std::vector<SectionEntry> sections;
    std::vector<std::uint32_t> sortedSections;
};

ReadResult ReadDocument(LineStream& lines, bool sorted) {
    TextRules rules;
    ReadResult result;
    std::string_view line;
    while (lines.ReadLine(line)) {
        ParsedLine parsed = ParseLine(line, rules);
        if (parsed.kind == LineKind::Header) {
            result.sections.push_back(SectionEntry{std::string(parsed.name), {}, {}});
        } else if (parsed.kind == LineKind::Item && !result.sections.empty()) {
            // Items before the first header belong to no section and are dropped.
            result.sections.back().items.push_back(
                ItemEntry{std::string(parsed.name), std::string(parsed.value), parsed.quoted});
        }
    }
    for (SectionEntry& section : result.sections) {
        JoinSplitValues(section, rules);
        if (sorted) section.sortedItems = BuildNameIndex(section.items);
    }
    if (sorted) result.sortedSections = BuildNameIndex(result.sections);
    return result;
}

// Reads a C runtime stream in blocks, after the bytes already taken to look for the compressed-form
// marker. A failed read ends the text and is kept for ReadFile to report.
class FileLineSource final : public LineSource {
public:
    FileLineSource(std::FILE* file, std::string_view head) : file(file), head(head) {}

    std::size_t ReadBlock(char* buffer, std::size_t size) override {
        if (headOffset < head.size()) {
            std::size_t count = std::min(size, head.size() - headOffset);
            std::memcpy(buffer, head.data() + headOffset, count);
            headOffset += count;
            return count;
        }
        if (failure != 0) return 0;
        ClearFileSystemError();
        std::size_t count = std::fread(buffer, 1, size, file);
        if (count == 0 && std::ferror(file)) failure = LastFileSystemError();
        return count;
    }

    std::uint32_t Failure() const { return failure; }

private:
    std::FILE* file;
    std::string_view head;
    std::size_t headOffset = 0;
    std::uint32_t failure = 0;
};

std::int32_t EngineErrorOfFileFailure(std::uint32_t systemError, std::int32_t otherwise) {
    switch (systemError) {
        case 5:
        case 65: return AccessDenied;
        case 8:
        case 14: return OutOfMemory;
        case 123:
        case 161:
        case 206: return InvalidPath;
        case 39:
        case 112: return DiskFull;
        default: return otherwise;
    }
}

constexpr std::string_view compressedMarker = "VerentisBinary";  // also the start of "VerentisBinaryText"

// ---- Writing -------------------------------------------------------------------------------------

class Writer {
public:
    Writer(std::string& out, bool lfOnly) : out(out), lineEnd(lfOnly ? "\n" : "\r\n") {}

    void Section(const SectionEntry& section) {
        line.clear();
        line += '[';
        line += section.name;
        line += ']';
        ParsedLine parsed = CheckedParse();
        if (parsed.kind != LineKind::Header || parsed.name != section.name) RaiseUnwritable(section.name, section.name);
        Emit();
        previousRun.reset();
        for (const ItemEntry& item : section.items) Item(section, item);
        out += lineEnd;
    }

private:
    void Item(const SectionEntry& section, const ItemEntry& item) {
        std::string_view value = item.value;
        pieces.clear();
        if (value.size() < IniObj::splitValueBytes) {
            pieces.push_back(value);
        } else {
            while (!value.empty()) {
                std::size_t bytes = rules.WholeCharPrefix(value, IniObj::pieceBytes);
                pieces.push_back(value.substr(0, bytes));
                value.remove_prefix(bytes);
            }
        }
        CheckNotTakenForPiece(section, item);
        // A value the reader would change when bare (blanks at its ends, enclosing quotes) is written
        // between quotes; all pieces of one item alike, so the item reads back with one quoted flag.
        bool quoted = item.quoted;
        for (std::size_t i = 0; i < pieces.size() && !quoted; ++i) {
            ComposeItemLine(item.name, i, pieces[i], false);
            ParsedLine parsed = ParseLine(line, rules);
            quoted = parsed.kind != LineKind::Item || parsed.value != pieces[i] || parsed.quoted;
        }
        for (std::size_t i = 0; i < pieces.size(); ++i) {
            ComposeItemLine(item.name, i, pieces[i], quoted);
            ParsedLine parsed = CheckedParse();
            std::string_view expectedName = pieces.size() == 1 ? std::string_view(item.name) : std::string_view(pieceName);
            if (parsed.kind != LineKind::Item || parsed.name != expectedName || parsed.value != pieces[i] ||
                parsed.quoted != quoted)
                RaiseUnwritable(section.name, item.name);
            Emit();
        }
        if (pieces.size() > 1) previousRun = PieceName{item.name, static_cast<std::uint32_t>(pieces.size())};
        else previousRun.reset();
    }

    // An item written on one line must not be taken by the reader as the first piece of a split value,
    // nor as the next piece of the split value written just before it.
    void CheckNotTakenForPiece(const SectionEntry& section, const ItemEntry& item) {
        if (pieces.size() != 1) return;
        auto piece = ParsePieceName(item.name, rules);
        if (!piece) return;
        bool continuesRun = previousRun && piece->base == previousRun->base && piece->number == previousRun->number + 1;
        if (piece->number == 1 || continuesRun) {
            TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "IniObj::WriteString",
                     DescribedMessage("INI_ITEM_READ_AS_PIECE", {item.name, section.name}));
        }
    }

    void ComposeItemLine(const std::string& name, std::size_t index, std::string_view piece, bool quoted) {
        line.assign(name);
        if (pieces.size() > 1) {
            std::array<char, 16> number{};
            std::snprintf(number.data(), number.size(), "%04u", static_cast<unsigned>(index + 1));
            line.append(pieceMarker).append(number.data());
            pieceName.assign(line);
        }
        line.append(" = ");
        if (quoted) line += '"';
        line.append(piece);
        if (quoted) line += '"';
    }

    // The line as the reader will see it; a line the reader would cut cannot be written.
    ParsedLine CheckedParse() {
        if (line.size() > IniObj::maxLineBytes) RaiseIniError("IniObj::WriteString", LineTooLong);
        return ParseLine(line, rules);
    }

    [[noreturn]] void RaiseUnwritable(std::string_view section, std::string_view item) {
        TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "IniObj::WriteString",
                 DescribedMessage("INI_ITEM_NOT_WRITABLE", {item, section}));
    }

    void Emit() { out.append(line).append(lineEnd); }

    std::string& out;
    std::string_view lineEnd;
    TextRules rules;
    std::string line;
    std::string pieceName;
    std::vector<std::string_view> pieces;
    std::optional<PieceName> previousRun;
};

// ---- Checks of Put -------------------------------------------------------------------------------

bool HasLineBreak(std::string_view text) { return text.find_first_of(std::string_view("\r\n\0", 3)) != std::string_view::npos; }

void CheckSectionName(std::string_view name, const TextRules& rules) {
    std::string header;
    header.reserve(name.size() + 2);
    header += '[';
    header += name;
    header += ']';
    ParsedLine parsed = ParseLine(header, rules);
    if (HasLineBreak(name) || parsed.kind != LineKind::Header || parsed.name != name)
        TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "IniObj::Put", DescribedMessage("INI_INVALID_SECTION_NAME", {name}));
}

void CheckItem(std::string_view name, std::string_view value, const TextRules& rules) {
    std::string probe = std::string(name) + " = x";
    ParsedLine parsed = ParseLine(probe, rules);
    if (HasLineBreak(name) || parsed.kind != LineKind::Item || parsed.name != name)
        TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "IniObj::Put", DescribedMessage("INI_INVALID_ITEM_NAME", {name}));
    if (HasLineBreak(value))
        TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "IniObj::Put", DescribedMessage("INI_VALUE_HAS_LINE_BREAK", {name}));
}

}  // namespace

// ---- IniObj --------------------------------------------------------------------------------------

std::unique_ptr<IniObj> IniObj::Create(bool sorted) {
    try {
        return std::make_unique<IniObj>(sorted);
    } catch (const std::bad_alloc&) {
        TE_RAISE(TE_OUT_OF_MEMORY, "IniObj::Create");
    }
}

void IniObj::Empty() {
    sections.clear();
    sortedSections.clear();
}

void IniObj::ReadString(std::string_view text) {
    try {
        TextLineSource source(text);
        LineStream lines(source);
        ReadResult result = ReadDocument(lines, sorted);
        sections = std::move(result.sections);
        sortedSections = std::move(result.sortedSections);
    } catch (const std::bad_alloc&) {
        RaiseIniError("IniObj::ReadString", OutOfMemory);
    }
}

void IniObj::ReadFile(std::string_view path) {
    std::string name(path);
    std::string elaboration;
    try {
        elaboration = FillMessage(GetLanguageString("ERR_DESCR", "TE_CANT_READ_FILE_ELAB"), {path});
        ClearFileSystemError();
        UniqueFile file(std::fopen(name.c_str(), "rb"));
        if (!file) {
            std::uint32_t systemError = LastFileSystemError();
            if (systemError == 2 || systemError == 3) {
                TE_RAISE(IniErrorToTECode(CouldNotOpenFileForReading), "IniObj::ReadFile",
                         RaiseDetails{.message = DescribedMessage("CANT_FIND_FILE", {path}),
                                      .apiErrorCode = CouldNotOpenFileForReading});
            }
            RaiseIniError("IniObj::ReadFile", EngineErrorOfFileFailure(systemError, CouldNotOpenFileForReading),
                          elaboration);
        }

        std::array<char, 20> head{};
        ClearFileSystemError();
        std::size_t headBytes = std::fread(head.data(), 1, head.size(), file.get());
        if (headBytes < head.size() && std::ferror(file.get()))
            RaiseIniError("IniObj::ReadFile", EngineErrorOfFileFailure(LastFileSystemError(), ErrorReadingFile),
                          elaboration);
        std::string_view headText(head.data(), headBytes);
        // The compressed form needs the framework's compressor, which this DLL does not carry.
        if (headText.starts_with(compressedMarker)) RaiseIniError("IniObj::ReadFile", IncorrectFileFormat, elaboration);

        FileLineSource source(file.get(), headText);
        LineStream lines(source);
        ReadResult result = ReadDocument(lines, sorted);
        if (source.Failure() != 0)
            RaiseIniError("IniObj::ReadFile", EngineErrorOfFileFailure(source.Failure(), ErrorReadingFile), elaboration);
        sections = std::move(result.sections);
        sortedSections = std::move(result.sortedSections);
        filePath.Assign(path);
    } catch (const std::bad_alloc&) {
        RaiseIniError("IniObj::ReadFile", OutOfMemory, elaboration);
    }
}

std::string IniObj::WriteString(bool lfOnly) const {
    std::string text;
    try {
        Writer writer(text, lfOnly);
        for (const SectionEntry& section : sections) writer.Section(section);
    } catch (const std::bad_alloc&) {
        RaiseIniError("IniObj::WriteString", OutOfMemory);
    }
    return text;
}

void IniObj::WriteString(DynamicString& target, bool lfOnly) const {
    target.Empty();
    target.Assign(WriteString(lfOnly));
}

std::size_t IniObj::FindSectionIndex(std::string_view name) const {
    return FindByName(sections, sorted ? &sortedSections : nullptr, name);
}

const SectionEntry* IniObj::FindSection(std::string_view name) const {
    std::size_t index = FindSectionIndex(name);
    return index == std::string_view::npos ? nullptr : &sections[index];
}

const ItemEntry* IniObj::FindItem(std::string_view section, std::string_view item) const {
    const SectionEntry* entry = FindSection(section);
    if (!entry) return nullptr;
    std::size_t index = FindByName(entry->items, sorted ? &entry->sortedItems : nullptr, item);
    return index == std::string_view::npos ? nullptr : &entry->items[index];
}

void IniObj::Put(std::string_view section, std::string_view item, std::string_view value, bool quoted) {
    TextRules rules;
    CheckSectionName(section, rules);
    CheckItem(item, value, rules);
    try {
        std::size_t sectionIndex = FindSectionIndex(section);
        if (sectionIndex == std::string_view::npos) {
            sections.push_back(SectionEntry{std::string(section), {}, {}});
            sectionIndex = sections.size() - 1;
            if (sorted) IndexLastEntry(sections, sortedSections);
        }
        SectionEntry& entry = sections[sectionIndex];
        ItemEntry newItem{std::string(item), std::string(value), quoted};

        std::vector<std::size_t> same;
        for (std::size_t i = 0; i < entry.items.size(); ++i)
            if (entry.items[i].name == item) same.push_back(i);
        if (same.empty()) {
            entry.items.push_back(std::move(newItem));
            if (sorted) IndexLastEntry(entry.items, entry.sortedItems);
            return;
        }
        entry.items[same.front()] = std::move(newItem);
        if (same.size() > 1) {
            for (auto at = same.rbegin(); at + 1 != same.rend(); ++at)
                entry.items.erase(entry.items.begin() + static_cast<std::ptrdiff_t>(*at));
            if (sorted) entry.sortedItems = BuildNameIndex(entry.items);
        }
    } catch (const std::bad_alloc&) {
        RaiseIniError("IniObj::Put", OutOfMemory);
    }
}

bool IniObj::GetRaw(std::string_view section, std::string_view item, String& value) const {
    const ItemEntry* entry = FindItem(section, item);
    if (!entry) return false;
    value.Assign(entry->value);
    return true;
}

bool IniObj::Get(std::string_view section, std::string_view item, String& value) const {
    const ItemEntry* entry = FindItem(section, item);
    if (!entry) return false;
    value.Assign(UnescapeIniText(entry->value));
    return true;
}

bool IniObj::Get(std::string_view section, std::string_view item, Path& value) const {
    const ItemEntry* entry = FindItem(section, item);
    if (!entry) return false;
    std::string text = UnescapeIniPath(entry->value);
    // A cut path would name another file.
    if (text.size() > Path::capacity) RaiseIniError("IniObj::Get", InvalidPath);
    value.Assign(text);
    return true;
}

bool IniObj::Get(std::string_view section, std::string_view item, bool& value, bool* invalidValue) const {
    if (invalidValue) *invalidValue = false;
    const ItemEntry* entry = FindItem(section, item);
    if (!entry) return false;
    std::string_view text = TextRules().Trim(entry->value);
    if (text.empty()) return false;
    auto equalsIgnoringCase = [](std::string_view a, std::string_view b) {
        return a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin(), [](char x, char y) {
                   auto lower = [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; };
                   return lower(x) == lower(y);
               });
    };
    if (equalsIgnoringCase(text, "true")) {
        value = true;
        return true;
    }
    if (equalsIgnoringCase(text, "false")) {
        value = false;
        return true;
    }
    if (invalidValue) *invalidValue = true;
    return false;
}

// ---- Escapes -------------------------------------------------------------------------------------

std::string EscapeIniText(std::string_view text) {
    static constexpr char hexDigits[] = "0123456789abcdef";
    std::string escaped;
    escaped.reserve(text.size());
    for (std::size_t offset = 0; offset < text.size();) {
        std::size_t bytes = multibyte::CharBytes(text, offset);
        if (bytes != 1) {
            escaped.append(text.substr(offset, bytes));
            offset += bytes;
            continue;
        }
        auto c = static_cast<unsigned char>(text[offset++]);
        switch (c) {
            case '\t': escaped += "\\t"; break;
            case '\n': escaped += "\\n"; break;
            case '\r': escaped += "\\r"; break;
            case '"': escaped += "\\\""; break;
            case '\\': escaped += "\\\\"; break;
            default:
                if (c < 0x20 || c == 0x7F) {
                    escaped += "\\x";
                    escaped += hexDigits[c >> 4];
                    escaped += hexDigits[c & 0x0F];
                } else {
                    escaped += static_cast<char>(c);
                }
        }
    }
    return escaped;
}

std::string UnescapeIniText(std::string_view text) {
    auto hexValue = [](char c) -> int {
        if (c >= '0' && c <= '9') return c - '0';
        if (c >= 'a' && c <= 'f') return c - 'a' + 10;
        if (c >= 'A' && c <= 'F') return c - 'A' + 10;
        return -1;
    };
    std::string decoded;
    decoded.reserve(text.size());
    for (std::size_t offset = 0; offset < text.size();) {
        std::size_t bytes = multibyte::CharBytes(text, offset);
        if (bytes != 1 || text[offset] != '\\') {
            decoded.append(text.substr(offset, bytes));
            offset += bytes;
            continue;
        }
        ++offset;  // the backslash
        if (offset == text.size()) break;
        std::size_t escapedBytes = multibyte::CharBytes(text, offset);
        if (escapedBytes != 1) continue;  // a double-byte character after a backslash is taken as it is
        char c = text[offset++];
        switch (c) {
            case 't': decoded += '\t'; break;
            case 'n': decoded += '\n'; break;
            case 'r': decoded += '\r'; break;
            case 'x': {
                int high = offset + 1 < text.size() ? hexValue(text[offset]) : -1;
                int low = high >= 0 ? hexValue(text[offset + 1]) : -1;
                if (high >= 0 && low >= 0 && (high | low) != 0) {
                    decoded += static_cast<char>(high * 16 + low);
                    offset += 2;
                } else {
                    decoded += 'x';
                }
                break;
            }
            default: decoded += c;
        }
    }
    return decoded;
}

std::string UnescapeIniPath(std::string_view text) {
    std::string decoded;
    decoded.reserve(text.size());
    for (std::size_t offset = 0; offset < text.size();) {
        std::size_t bytes = multibyte::CharBytes(text, offset);
        bool escape = bytes == 1 && text[offset] == '\\' && offset + 1 < text.size() &&
                      (text[offset + 1] == '\\' || text[offset + 1] == '"');
        if (escape) ++offset;  // the escaping backslash; the character after it is kept below
        bytes = multibyte::CharBytes(text, offset);
        decoded.append(text.substr(offset, bytes));
        offset += bytes;
    }
    return decoded;
}

}  // namespace sm
