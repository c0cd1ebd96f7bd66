#include "ErrorCodes.h"

namespace sm {

#define SM_TE_ROW(name) {name, #name}
const TECodeRow TECodeTable[] = {
    SM_TE_ROW(TE_OUT_OF_MEMORY),
    SM_TE_ROW(TE_PROGRAM_ERROR),
    SM_TE_ROW(TE_DLL_NOT_LOADABLE),
    SM_TE_ROW(TE_FUNC_NOT_IN_LIB),
    SM_TE_ROW(TE_BAD_FILE_FORMAT),
    SM_TE_ROW(TE_IO_ERROR),
    SM_TE_ROW(TE_UNABLE_TO_OPEN_FILE),
    SM_TE_ROW(TE_BAD_NET_PATH),
    SM_TE_ROW(TE_DRIVE_NOT_READY),
    SM_TE_ROW(TE_INVALID_PATHNAME),
    SM_TE_ROW(TE_ACCESS_DENIED),
    SM_TE_ROW(TE_FILE_ALREADY_EXISTS),
    SM_TE_ROW(TE_DISK_FULL),
    SM_TE_ROW(TE_FILE_NOT_FOUND),
    SM_TE_ROW(TE_SHARING_VIOLATION),
    SM_TE_ROW(TE_WRITE_PROTECTED),
    SM_TE_ROW(TE_INVALID_DRIVE),
    SM_TE_ROW(TE_PATH_NOT_FOUND),
    SM_TE_ROW(TE_INVALID_OR_OUT_OF_RANGE),
    SM_TE_ROW(TE_TOO_MANY_ITEMS),
    SM_TE_ROW(TE_UNRECOGNIZED_VALUE),
    SM_TE_ROW(TE_DUPLICATE_ITEM_OR_VALUE),
    SM_TE_ROW(TE_UNEXPECTED_TYPE),
    SM_TE_ROW(TE_TYPE_MISMATCH_ERROR),
    SM_TE_ROW(TE_INVALID_POINTER),
    SM_TE_ROW(TE_OPERATION_IN_PROGRESS),
    SM_TE_ROW(TE_OPERATION_TIMED_OUT),
    SM_TE_ROW(TE_OPERATION_FAILED),
    SM_TE_ROW(TE_UNEXPECTED_SYSTEM_ERROR),
    SM_TE_ROW(TE_OPERATION_CANCELED),
    SM_TE_ROW(TE_DDE_FAIL),
    SM_TE_ROW(TE_NO_FILE_ASSOC),
    {0, nullptr},
};
#undef SM_TE_ROW

const char* FindTECodeName(std::int32_t code) {
    for (const TECodeRow* row = TECodeTable; row->name; ++row)
        if (row->code == code) return row->name;
    return nullptr;
}

std::int32_t SystemErrorToTECode(std::uint32_t systemError) {
    switch (systemError) {
        case 2: return TE_FILE_NOT_FOUND;
        case 3: return TE_PATH_NOT_FOUND;
        case 5:
        case 65: return TE_ACCESS_DENIED;
        case 8:
        case 14: return TE_OUT_OF_MEMORY;
        case 15: return TE_INVALID_DRIVE;
        case 19: return TE_WRITE_PROTECTED;
        case 21: return TE_DRIVE_NOT_READY;
        case 32: return TE_SHARING_VIOLATION;
        case 39:
        case 112: return TE_DISK_FULL;
        case 53:
        case 58:
        case 240: return TE_BAD_NET_PATH;
        case 80:
        case 183: return TE_FILE_ALREADY_EXISTS;
        case 110: return TE_UNABLE_TO_OPEN_FILE;
        case 123:
        case 161: return TE_INVALID_PATHNAME;
        case 1155: return TE_NO_FILE_ASSOC;
        case 1156: return TE_DDE_FAIL;
        case 1157: return TE_DLL_NOT_LOADABLE;
        case 1223: return TE_OPERATION_CANCELED;
        case 0x80004003u: return TE_INVALID_POINTER;
        case 0x80020005u: return TE_TYPE_MISMATCH_ERROR;
        case 0x80070005u: return TE_ACCESS_DENIED;
        case 0x8007000Eu: return TE_OUT_OF_MEMORY;
        default: return TE_IO_ERROR;
    }
}

}  // namespace sm
