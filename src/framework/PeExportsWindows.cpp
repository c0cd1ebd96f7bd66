// Reading an image file for ReadDLLExports on Windows: plain reads of the pages that hold the
// headers, the export directory and the names, never a load (a driver's own start-up code never
// runs while the directory is scanned) and never the rest of the file.
#include <windows.h>

#include <string>

#include "framework/PeExports.h"
#include "framework/TEException.h"

namespace sm {

namespace {
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
    ReadExportNames(static_cast<std::uint64_t>(size.QuadPart), [&](std::uint64_t offset, std::span<unsigned char> into) {
        OVERLAPPED at{};
        at.Offset = static_cast<DWORD>(offset);
        at.OffsetHigh = static_cast<DWORD>(offset >> 32);
        DWORD read = 0;
        if (!::ReadFile(file.handle, into.data(), static_cast<DWORD>(into.size()), &read, &at)) RaiseFileError(::GetLastError());
        // The file shrank while it was read: what is missing is outside the image.
        if (read != into.size()) TE_RAISE(TE_BAD_FILE_FORMAT, "ReadDLLExports", RaiseDetails{.source = "readdll"});
    }, names);
}

}  // namespace sm
