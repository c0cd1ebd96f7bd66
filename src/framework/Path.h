// File-system paths of the framework: text of at most 260 bytes in the process's code page, with
// backslash separators. The rules here are pure text rules, so they are tested natively; only
// Exists and FilesAreIdentical touch the file system, through the C runtime.
#pragma once

#include <cstddef>
#include <string_view>

#include "String.h"

namespace sm {

class Path {
public:
    static constexpr std::size_t capacity = 260;

    Path() = default;
    explicit Path(std::string_view text) { Assign(text); }

    // A path that is only a drive letter and a colon is completed with a backslash ("C:" is "C:\").
    // Text that does not fit raises TE_INVALID_PATHNAME: a silently shortened path would name
    // another file.
    Path& Assign(std::string_view text);
    // Appends a component with exactly one backslash between it and the path.
    Path& Append(std::string_view component);
    // Appends a folder name and a trailing backslash: directories built from a parent and a folder
    // name end with a backslash.
    Path& AppendDirectory(std::string_view folder);
    // Adds a trailing backslash unless the path is empty or already ends with ':' or '\'.
    Path& EnsureTrailingSeparator();

    // The directory that holds the last component, without a trailing backslash except at a root
    // ("C:\", "\", "\\server\share" stays itself). A path without separators has an empty parent.
    Path Parent() const;
    // Begins with a backslash, or with a drive letter, ':' and a backslash.
    bool IsAbsolute() const;
    // A file or directory of this name exists.
    bool Exists() const;

    const char* GetText() const { return text.GetText(); }
    std::string_view View() const { return text.View(); }
    bool IsEmpty() const { return text.IsEmpty(); }
    void Empty() { text.Empty(); }
    const String& GetString() const { return text; }
    bool operator==(const Path& other) const { return View() == other.View(); }

private:
    StaticString<capacity> text;
};

// Begins with a backslash, or with a drive letter, ':' and a backslash.
bool IsAbsolutePathText(std::string_view text);

// The framework's path check: length below 260 bytes, a drive ("C:", "C:dir" counts as "C:\dir"),
// a UNC root ("\\server\share") or a relative start, no empty component between two separators, and
// no < > | : / \ " CR LF in a component; the wildcards * and ? only in the last component and only
// when allowWildcards is set.
bool IsValidPath(std::string_view path, bool allowWildcards);

// Both files have the same length and the same bytes, compared in blocks of 4096 bytes. A file that
// cannot be opened or read raises the TE code of its system error, with that error as api error code.
bool FilesAreIdentical(std::string_view first, std::string_view second);

}  // namespace sm
