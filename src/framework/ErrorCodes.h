// The TE error codes: negative 32-bit codes shared by every failure the DLL reports.
#pragma once

#include <cstdint>

namespace sm {

enum TECode : std::int32_t {
    TE_NO_ERROR = 0,
    TE_OUT_OF_MEMORY = -17000,
    TE_PROGRAM_ERROR = -17001,
    TE_DLL_NOT_LOADABLE = -17004,
    TE_FUNC_NOT_IN_LIB = -17005,
    TE_BAD_FILE_FORMAT = -17100,
    TE_IO_ERROR = -17200,
    TE_UNABLE_TO_OPEN_FILE = -17201,
    TE_BAD_NET_PATH = -17202,
    TE_DRIVE_NOT_READY = -17203,
    TE_INVALID_PATHNAME = -17204,
    TE_ACCESS_DENIED = -17205,
    TE_FILE_ALREADY_EXISTS = -17206,
    TE_DISK_FULL = -17207,
    TE_FILE_NOT_FOUND = -17208,
    TE_SHARING_VIOLATION = -17209,
    TE_WRITE_PROTECTED = -17210,
    TE_INVALID_DRIVE = -17211,
    TE_PATH_NOT_FOUND = -17212,
    TE_INVALID_OR_OUT_OF_RANGE = -17300,
    TE_TOO_MANY_ITEMS = -17303,
    TE_UNRECOGNIZED_VALUE = -17304,
    TE_DUPLICATE_ITEM_OR_VALUE = -17305,
    TE_UNEXPECTED_TYPE = -17308,
    TE_TYPE_MISMATCH_ERROR = -17321,
    TE_INVALID_POINTER = -17346,
    TE_OPERATION_IN_PROGRESS = -17401,
    TE_OPERATION_TIMED_OUT = -17402,
    TE_OPERATION_FAILED = -17500,
    TE_UNEXPECTED_SYSTEM_ERROR = -17501,
    TE_OPERATION_CANCELED = -17604,
    TE_DDE_FAIL = -18101,
    TE_NO_FILE_ASSOC = -18151,
};

struct TECodeRow {
    std::int32_t code;
    const char* name;
};

// Rows in their fixed order, ended by a row whose name is null. Searched from the first row.
extern const TECodeRow TECodeTable[];

// Name of a code ("TE_OPERATION_FAILED"), or null when the code has no row.
const char* FindTECodeName(std::int32_t code);

// Maps a Win32 error code or an HRESULT (compared as an unsigned 32-bit value) to a TE code.
std::int32_t SystemErrorToTECode(std::uint32_t systemError);

}  // namespace sm
