// Reading an image file for ReadDLLExports on Windows: a read-only mapping, never a load, so a
// driver's own start-up code never runs while the directory is scanned.
#include <windows.h>

#include <string>

#include "framework/PeExports.h"
#include "framework/TEException.h"

namespace sm {

namespace {
struct MappedView {
    const void* view = nullptr;
    ~MappedView() {
        if (view) ::UnmapViewOfFile(view);
    }
};
struct OwnedHandle {
    HANDLE handle = nullptr;
    ~OwnedHandle() {
        if (handle && handle != INVALID_HANDLE_VALUE) ::CloseHandle(handle);
    }
};

[[noreturn]] void RaiseFileError(DWORD error) {
    TE_RAISE(static_cast<std::int32_t>(SystemErrorToTECode(error)), "ReadDLLExports",
             RaiseDetails{.apiErrorCode = static_cast<std::int32_t>(error), .source = "readdll"});
}
}  // namespace

void ReadDLLExports(std::string_view path, StringVector& names) {
    names.clear();
    OwnedHandle file{::CreateFileA(std::string(path).c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                                   FILE_ATTRIBUTE_NORMAL, nullptr)};
    if (file.handle == INVALID_HANDLE_VALUE) RaiseFileError(::GetLastError());
    LARGE_INTEGER size{};
    if (!::GetFileSizeEx(file.handle, &size)) RaiseFileError(::GetLastError());
    // An empty file cannot be mapped; it is simply not an image.
    if (size.QuadPart == 0) {
        ReadExportNames({}, names);
        return;
    }
    OwnedHandle mapping{::CreateFileMappingA(file.handle, nullptr, PAGE_READONLY, 0, 0, nullptr)};
    if (!mapping.handle) RaiseFileError(::GetLastError());
    MappedView view{::MapViewOfFile(mapping.handle, FILE_MAP_READ, 0, 0, 0)};
    if (!view.view) RaiseFileError(::GetLastError());
    ReadExportNames({static_cast<const unsigned char*>(view.view), static_cast<std::size_t>(size.QuadPart)}, names);
}

}  // namespace sm
