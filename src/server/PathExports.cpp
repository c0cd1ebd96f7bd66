// Plain exports for the host product's other programs: its directories and two path checks, without
// the automation interfaces. Texts come in as narrow text in the process code page; directories go
// out as BSTRs the caller frees. No exception may cross a plain C export, so each one ends in a
// catch-all: a failing directory request gives a null BSTR, a failing check gives false, and the
// failure's description goes to the debugger output.
#include <windows.h>
#include <oleauto.h>

#include <string_view>

#include "com/BstrConversion.h"
#include "framework/DebugOutput.h"
#include "framework/DirectoryGetter.h"
#include "framework/Path.h"
#include "framework/TEException.h"

namespace {

// The version the product itself runs as; IsDevBuild asks its directories.
constexpr std::string_view productVersion = "2021 (64-bit)";

std::string_view TextOf(const char* text) { return text ? std::string_view(text) : std::string_view(); }

void ReportFailure(const char* exportName) noexcept {
    try {
        throw;
    } catch (const sm::TEException& failure) {
        failure.WriteDescriptionToDebugOutput(exportName);
    } catch (...) {
        sm::WriteDebugOutput(std::string(exportName) + ": unexpected failure\n");
    }
}

template <class Compute>
void ExportDirectory(const char* exportName, BSTR* directory, Compute compute) noexcept {
    if (!directory) return;
    *directory = nullptr;
    try {
        sm::Path found = compute();
        *directory = sm::AllocSysString(found.View());
    } catch (...) {
        ReportFailure(exportName);
    }
}

}  // namespace

extern "C" {

void GetConfigDirectory(const char* version, const char* subKey, int use64BitView, BSTR* directory) {
    ExportDirectory("GetConfigDirectory", directory, [&] {
        return sm::GetDirectoryGetter(TextOf(version)).GetConfigDirectory(TextOf(subKey), use64BitView != 0);
    });
}

void GetDefaultConfigDirectory(const char* version, BSTR* directory) {
    ExportDirectory("GetDefaultConfigDirectory", directory,
                    [&] { return sm::GetDirectoryGetter(TextOf(version)).GetDefaultConfigDirectory(); });
}

void GetVerentisPublicDirectory(const char* version, const char* subKey, int use64BitView, BSTR* directory) {
    ExportDirectory("GetVerentisPublicDirectory", directory, [&] {
        return sm::GetDirectoryGetter(TextOf(version)).GetPublicDirectory(TextOf(subKey), use64BitView != 0);
    });
}

void GetVerentisCommonAppDataDirectory(const char* version, BSTR* directory) {
    ExportDirectory("GetVerentisCommonAppDataDirectory", directory,
                    [&] { return sm::GetDirectoryGetter(TextOf(version)).GetCommonAppDataDirectory(); });
}

void GetVerentisLocalAppDataDirectory(const char* version, BSTR* directory) {
    ExportDirectory("GetVerentisLocalAppDataDirectory", directory,
                    [&] { return sm::GetDirectoryGetter(TextOf(version)).GetLocalAppDataDirectory(); });
}

bool IsDevBuild() {
    try {
        return sm::GetDirectoryGetter(productVersion).IsDevBuild();
    } catch (...) {
        ReportFailure("IsDevBuild");
        return false;
    }
}

bool IsValidPath(const char* path, int allowWildcards) {
    try {
        return path && sm::IsValidPath(path, allowWildcards != 0);
    } catch (...) {
        ReportFailure("IsValidPath");
        return false;
    }
}

bool FilesAreIdentical(const char* first, const char* second) {
    try {
        return first && second && sm::FilesAreIdentical(first, second);
    } catch (...) {
        ReportFailure("FilesAreIdentical");
        return false;
    }
}

}  // extern "C"
