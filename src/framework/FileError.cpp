#include "FileError.h"

#include <cerrno>
#include <cstdlib>

namespace sm {

void ClearFileSystemError() {
    errno = 0;
#ifdef _WIN32
    _doserrno = 0;
#endif
}

std::uint32_t LastFileSystemError() {
#ifdef _WIN32
    if (_doserrno != 0) return static_cast<std::uint32_t>(_doserrno);
#endif
    switch (errno) {
        case ENOENT: return 2;        // ERROR_FILE_NOT_FOUND
        case ENOTDIR: return 3;       // ERROR_PATH_NOT_FOUND
        case EACCES:
        case EPERM:
        case EISDIR: return 5;        // ERROR_ACCESS_DENIED (Windows refuses to open a directory so)
        case EMFILE: return 4;        // ERROR_TOO_MANY_OPEN_FILES
        case ENOMEM: return 8;        // ERROR_NOT_ENOUGH_MEMORY
        case EROFS: return 19;        // ERROR_WRITE_PROTECT
        case EBUSY: return 32;        // ERROR_SHARING_VIOLATION
        case ENOSPC: return 112;      // ERROR_DISK_FULL
        case EEXIST: return 183;      // ERROR_ALREADY_EXISTS
        case EINVAL:
        case ENAMETOOLONG: return 123;  // ERROR_INVALID_NAME
        default: return 30;           // ERROR_READ_FAULT
    }
}

}  // namespace sm
