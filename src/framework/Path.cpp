#include "Path.h"

#include <sys/stat.h>

#include <array>
#include <cstdio>
#include <string>
#include <vector>

#include "ErrorCodes.h"
#include "FileError.h"
#include "LanguageStrings.h"
#include "MultiByte.h"
#include "TEException.h"
#include "UniqueFile.h"

namespace sm {
namespace {

bool IsAsciiLetter(char c) { return (c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z'); }

bool StartsWithDrive(std::string_view text) { return text.size() >= 2 && IsAsciiLetter(text[0]) && text[1] == ':'; }

// Byte offsets of every backslash that is a character of its own (a double-byte character may end
// in the byte 0x5C, which is no separator).
template <class Visit>
void ForEachSeparator(std::string_view text, Visit visit) {
    for (std::size_t offset = 0; offset < text.size();) {
        std::size_t bytes = multibyte::CharBytes(text, offset);
        if (bytes == 1 && text[offset] == '\\') visit(offset);
        offset += bytes;
    }
}

std::size_t LastSeparator(std::string_view text) {
    std::size_t last = std::string_view::npos;
    ForEachSeparator(text, [&](std::size_t offset) { last = offset; });
    return last;
}

bool EndsWithSeparator(std::string_view text) {
    std::size_t last = LastSeparator(text);
    return last != std::string_view::npos && last + 1 == text.size();
}

// Length of the part that no Parent goes above: "C:\" (3), "C:" (2), "\" (1), "\\server\share",
// or 0 for a relative path.
std::size_t RootLength(std::string_view text) {
    if (StartsWithDrive(text)) return text.size() >= 3 && text[2] == '\\' ? 3 : 2;
    if (text.empty() || text[0] != '\\') return 0;
    if (text.size() < 2 || text[1] != '\\') return 1;
    std::size_t serverEnd = std::string_view::npos, shareEnd = std::string_view::npos;
    ForEachSeparator(text, [&](std::size_t offset) {
        if (offset < 2) return;
        if (serverEnd == std::string_view::npos) serverEnd = offset;
        else if (shareEnd == std::string_view::npos) shareEnd = offset;
    });
    return shareEnd == std::string_view::npos ? text.size() : shareEnd;
}

[[noreturn]] void RaiseTooLong(const char* function, std::string_view text) {
    DynamicString message(GetLanguageString("ERR_DESCR", "PATH_TOO_LONG"));
    message.ReplaceArg(1, text);
    TE_RAISE(TE_INVALID_PATHNAME, function, message);
}

}  // namespace

Path& Path::Assign(std::string_view value) {
    std::string completed(value);
    if (completed.size() == 2 && StartsWithDrive(completed)) completed += '\\';
    if (completed.size() > capacity) RaiseTooLong("Path::Assign", completed);
    text.Assign(completed);
    return *this;
}

Path& Path::Append(std::string_view component) {
    while (!component.empty() && component.front() == '\\') component.remove_prefix(1);
    std::string joined(View());
    if (!joined.empty() && !EndsWithSeparator(joined) && !component.empty()) joined += '\\';
    joined += component;
    if (joined.size() > capacity) RaiseTooLong("Path::Append", joined);
    text.Assign(joined);
    return *this;
}

Path& Path::AppendDirectory(std::string_view folder) {
    Append(folder);
    return EnsureTrailingSeparator();
}

Path& Path::EnsureTrailingSeparator() {
    std::string_view view = View();
    if (view.empty() || EndsWithSeparator(view)) return *this;
    if (view.back() == ':' && multibyte::WholeCharPrefix(view, view.size() - 1) == view.size() - 1) return *this;
    std::string completed(view);
    completed += '\\';
    if (completed.size() > capacity) RaiseTooLong("Path::EnsureTrailingSeparator", completed);
    text.Assign(completed);
    return *this;
}

Path Path::Parent() const {
    std::string_view view = View();
    std::size_t root = RootLength(view);
    if (view.size() > root && EndsWithSeparator(view)) view.remove_suffix(1);
    if (view.size() <= root) return Path(view);
    std::size_t last = LastSeparator(view);
    if (last == std::string_view::npos) return root ? Path(view.substr(0, root)) : Path();
    if (last < root) return Path(view.substr(0, root));
    return Path(view.substr(0, last));
}

bool IsAbsolutePathText(std::string_view text) {
    return (!text.empty() && text[0] == '\\') || (StartsWithDrive(text) && text.size() >= 3 && text[2] == '\\');
}

bool Path::IsAbsolute() const { return IsAbsolutePathText(View()); }

bool Path::Exists() const {
    std::string name(View());
    if (name.empty()) return false;
    // The Windows runtime's stat refuses a directory name with a trailing backslash, except a root.
    if (name.size() > RootLength(name) && EndsWithSeparator(name)) name.pop_back();
    struct stat status {};
    return ::stat(name.c_str(), &status) == 0;
}

// ---- IsValidPath ---------------------------------------------------------------------------------

namespace {

enum class Wildcards { Forbidden, Allowed };

bool IsValidComponent(std::string_view component, Wildcards wildcards) {
    for (std::size_t offset = 0; offset < component.size();) {
        std::size_t bytes = multibyte::CharBytes(component, offset);
        if (bytes == 1) {
            switch (component[offset]) {
                case '<': case '>': case '|': case ':': case '/': case '\\': case '"': case '\r': case '\n':
                    return false;
                case '*': case '?':
                    if (wildcards == Wildcards::Forbidden) return false;
                    break;
                default: break;
            }
        }
        offset += bytes;
    }
    return true;
}

// Splits text at its separators (character-aware).
std::vector<std::string_view> SplitAtSeparators(std::string_view text) {
    std::vector<std::string_view> parts;
    std::size_t start = 0;
    ForEachSeparator(text, [&](std::size_t offset) {
        parts.push_back(text.substr(start, offset - start));
        start = offset + 1;
    });
    parts.push_back(text.substr(start));
    return parts;
}

}  // namespace

bool IsValidPath(std::string_view path, bool allowWildcards) {
    if (path.size() >= 260 || path.empty()) return false;
    std::string text(path);
    // "C:dir" is checked as "C:\dir", so a drive-relative path never fails for its missing separator.
    if (StartsWithDrive(text) && (text.size() == 2 || text[2] != '\\')) text.insert(2, 1, '\\');

    std::string_view rest(text);
    if (StartsWithDrive(rest)) {
        rest.remove_prefix(3);
    } else if (rest[0] == '\\') {
        if (rest.size() < 2 || rest[1] != '\\') return false;  // one leading separator
        std::vector<std::string_view> parts = SplitAtSeparators(rest.substr(2));
        // Network name and share name, neither empty nor holding invalid characters or wildcards.
        if (parts.size() < 2 || parts[0].empty() || parts[1].empty()) return false;
        if (!IsValidComponent(parts[0], Wildcards::Forbidden) || !IsValidComponent(parts[1], Wildcards::Forbidden))
            return false;
        std::size_t consumed = 2 + parts[0].size() + 1 + parts[1].size();
        rest.remove_prefix(consumed);
        if (rest.empty()) return true;
        rest.remove_prefix(1);  // the separator after the share
    }
    if (rest.empty()) return true;

    std::vector<std::string_view> components = SplitAtSeparators(rest);
    for (std::size_t i = 0; i < components.size(); ++i) {
        bool last = i + 1 == components.size();
        // One trailing separator leaves an empty last component, which names the directory itself.
        if (components[i].empty() && !last) return false;
        Wildcards wildcards = last && allowWildcards ? Wildcards::Allowed : Wildcards::Forbidden;
        if (!IsValidComponent(components[i], wildcards)) return false;
    }
    return true;
}

// ---- FilesAreIdentical ---------------------------------------------------------------------------

namespace {

[[noreturn]] void RaiseFileError(std::string_view path, std::uint32_t systemError) {
    bool missing = systemError == 2 || systemError == 3;
    DynamicString message(GetLanguageString("ERR_DESCR", missing ? "CANT_FIND_FILE" : "TE_CANT_READ_FILE_ELAB"));
    message.ReplaceArg(1, path);
    TE_RAISE(SystemErrorToTECode(systemError), "FilesAreIdentical",
             RaiseDetails{.message = message.View(), .apiErrorCode = static_cast<std::int32_t>(systemError),
                          .messageIsString = true});
}

UniqueFile OpenForReading(std::string_view path) {
    std::string name(path);
    ClearFileSystemError();
    UniqueFile file(std::fopen(name.c_str(), "rb"));
    if (!file) RaiseFileError(path, LastFileSystemError());
    return file;
}

long long FileLength(std::FILE* file, std::string_view path) {
#ifdef _WIN32
    struct _stati64 status {};
    if (::_fstati64(_fileno(file), &status) != 0) RaiseFileError(path, LastFileSystemError());
#else
    struct stat status {};
    if (::fstat(fileno(file), &status) != 0) RaiseFileError(path, LastFileSystemError());
#endif
    return static_cast<long long>(status.st_size);
}

}  // namespace

bool FilesAreIdentical(std::string_view first, std::string_view second) {
    UniqueFile a = OpenForReading(first);
    UniqueFile b = OpenForReading(second);
    if (FileLength(a.get(), first) != FileLength(b.get(), second)) return false;
    constexpr std::size_t blockBytes = 4096;
    std::array<char, blockBytes> left{}, right{};
    for (;;) {
        ClearFileSystemError();
        std::size_t leftCount = std::fread(left.data(), 1, blockBytes, a.get());
        if (std::ferror(a.get())) RaiseFileError(first, LastFileSystemError());
        ClearFileSystemError();
        std::size_t rightCount = std::fread(right.data(), 1, blockBytes, b.get());
        if (std::ferror(b.get())) RaiseFileError(second, LastFileSystemError());
        // The lengths matched when opened; a file that changes while we compare is not identical.
        if (leftCount != rightCount) return false;
        if (leftCount == 0) return true;
        if (std::char_traits<char>::compare(left.data(), right.data(), leftCount) != 0) return false;
    }
}

}  // namespace sm
