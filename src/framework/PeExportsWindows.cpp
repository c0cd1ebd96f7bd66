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
    // Reads at the file position, moving it only when a page is not the next one.
    std::uint64_t position = 0;
    ReadExportNames([&](std::uint64_t offset, std::span<unsigned char> into) -> std::size_t {
        if (offset != position) {
            LARGE_INTEGER to{};
            to.QuadPart = static_cast<LONGLONG>(offset);
            if (!::SetFilePointerEx(file.handle, to, nullptr, FILE_BEGIN)) RaiseFileError(::GetLastError());
            position = offset;
        }
        std::size_t total = 0;
        while (total < into.size()) {
            DWORD wanted = static_cast<DWORD>(into.size() - total), read = 0;
            if (!::ReadFile(file.handle, into.data() + total, wanted, &read, nullptr)) RaiseFileError(::GetLastError());
            total += read;
            if (read < wanted) break;  // a short read of a file: its end
        }
        position += total;
        return total;
    }, names);
}

}  // namespace sm
