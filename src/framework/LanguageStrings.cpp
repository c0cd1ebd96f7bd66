#include "LanguageStrings.h"

#include <map>

#include "ErrorCodes.h"
#include "MultiByte.h"

namespace sm {
namespace {

struct LanguageRow {
    const char* section;
    const char* key;
    const char* text;
};

// Only the rows this DLL reads; the lookups give the caller's default for anything else.
constexpr LanguageRow builtInRows[] = {
    {"ERRORS", "STRING_NOT_IN_TABLE", "String not found in the language resource files"},
    {"ERRORS", "ERROR_32_BIT_POINTER_WITH_64_BIT_PLATFORM", "32-bit pointer used with 64-bit platform."},

    {"TE_ERRORS", "USER_DEFINED_ERR_CODE", "User-defined error code."},
    {"TE_ERRORS", "TE_OUT_OF_MEMORY", "Out of memory."},
    {"TE_ERRORS", "TE_PROGRAM_ERROR", "Program Error."},
    {"TE_ERRORS", "TE_DLL_NOT_LOADABLE", "Could not load DLL or library."},
    {"TE_ERRORS", "TE_FUNC_NOT_IN_LIB", "Function not found in DLL or library."},
    {"TE_ERRORS", "TE_BAD_FILE_FORMAT", "Incorrect file format."},
    {"TE_ERRORS", "TE_IO_ERROR", "General I/O Error."},
    {"TE_ERRORS", "TE_UNABLE_TO_OPEN_FILE", "Unable to open file."},
    {"TE_ERRORS", "TE_BAD_NET_PATH", "Bad network path, or network not responding."},
    {"TE_ERRORS", "TE_DRIVE_NOT_READY", "Drive Not Ready Error."},
    {"TE_ERRORS", "TE_INVALID_PATHNAME", "Pathname is invalid."},
    {"TE_ERRORS", "TE_ACCESS_DENIED", "Access Denied."},
    {"TE_ERRORS", "TE_FILE_ALREADY_EXISTS", "File already exists."},
    {"TE_ERRORS", "TE_DISK_FULL", "Disk Full."},
    {"TE_ERRORS", "TE_FILE_NOT_FOUND", "File or directory not found."},
    {"TE_ERRORS", "TE_SHARING_VIOLATION", "Sharing violation."},
    {"TE_ERRORS", "TE_WRITE_PROTECTED", "Disk is write protected."},
    {"TE_ERRORS", "TE_INVALID_DRIVE", "Drive letter is invalid."},
    {"TE_ERRORS", "TE_PATH_NOT_FOUND", "Path not found."},
    {"TE_ERRORS", "TE_INVALID_OR_OUT_OF_RANGE", "Value invalid or out of range."},
    {"TE_ERRORS", "TE_TOO_MANY_ITEMS", "Too many items."},
    {"TE_ERRORS", "TE_UNRECOGNIZED_VALUE", "Unrecognized value."},
    {"TE_ERRORS", "TE_DUPLICATE_ITEM_OR_VALUE", "Duplicate item or value."},
    {"TE_ERRORS", "TE_UNEXPECTED_TYPE", "Unexpected type."},
    {"TE_ERRORS", "TE_TYPE_MISMATCH_ERROR", "Variable or property types do not match or are not compatible."},
    {"TE_ERRORS", "TE_INVALID_POINTER", "Invalid Pointer."},
    {"TE_ERRORS", "TE_OPERATION_IN_PROGRESS", "Error, operation in progress."},
    {"TE_ERRORS", "TE_OPERATION_TIMED_OUT", "Operation Timed Out."},
    {"TE_ERRORS", "TE_OPERATION_FAILED", "Operation Failed."},
    {"TE_ERRORS", "TE_UNEXPECTED_SYSTEM_ERROR", "Unexpected Operating System Error."},
    {"TE_ERRORS", "TE_OPERATION_CANCELED", "Operation Canceled."},
    {"TE_ERRORS", "TE_DDE_FAIL", "The DDE transaction failed."},
    {"TE_ERRORS", "TE_NO_FILE_ASSOC", "No application is associated with the given filename extension."},

    {"ERR_DESCR", "CANT_FIND_FILE", "Could not find file '%1'."},
    {"ERR_DESCR", "TE_CANT_READ_FILE_ELAB", "Error reading from file '%1'."},
    {"ERR_DESCR", "PATH_TOO_LONG", "The path '%1' is longer than the supported maximum of 260 bytes."},
    {"ERR_DESCR", "INI_INVALID_SECTION_NAME",
     "The section name '%1' cannot be stored in an INI file: it holds a line break or begins or ends with white space."},
    {"ERR_DESCR", "INI_INVALID_ITEM_NAME",
     "The item name '%1' cannot be stored in an INI file: it is empty, holds '=' or a line break, begins with ';' or "
     "'[', or begins or ends with white space."},
    {"ERR_DESCR", "INI_VALUE_HAS_LINE_BREAK",
     "The value of the item '%1' holds a line break, which an INI file cannot store; escape the value first."},
    {"ERR_DESCR", "INI_ITEM_READ_AS_PIECE",
     "The item '%1' in section '%2' cannot be written: its name would be read back as part of a value split over "
     "several lines."},
    {"ERR_DESCR", "INI_ITEM_NOT_WRITABLE",
     "The item '%1' in section '%2' cannot be written so that it reads back unchanged."},

    {"LGW_TOOLERR", "CouldNotOpenFileForReading", "Could Not Open File For Reading"},
    {"LGW_TOOLERR", "ErrorReadingFile", "Error Reading From File"},
    {"LGW_TOOLERR", "CouldNotFindUnusedTempFileName", "Could Not Find Unused Temporary File Name"},
    {"LGW_TOOLERR", "CouldNotCreateTempFile", "Could Not Create Temporary File"},
    {"LGW_TOOLERR", "IncorrectFileFormat", "Incorrect File Format"},
    {"LGW_TOOLERR", "UnexpectedEndOfFile", "Unexpected End Of File"},
    {"LGW_TOOLERR", "InvalidIntNumber", "Invalid Integer Number"},
    {"LGW_TOOLERR", "InvalidUIntNumber", "Invalid Unsigned Integer Number"},
    {"LGW_TOOLERR", "InvalidDoubleNumber", "Invalid Floating Point Number"},
    {"LGW_TOOLERR", "InvalidBooleanValue", "Invalid Boolean Value"},
    {"LGW_TOOLERR", "MissingSection", "Missing Section"},
    {"LGW_TOOLERR", "MissingItem", "Missing Item"},
    {"LGW_TOOLERR", "UnRecognizedValue", "Unrecognized Value"},
    {"LGW_TOOLERR", "LineTooLong", "A line in the file was longer than the supported maximum of %1 bytes."},
    {"LGW_TOOLERR", "OperationInProgress",
     "Could not perform the requested action because of another operation that is currently in progress"},
    {"LGW_TOOLERR", "TooManyItems", "Too many items"},
    {"LGW_TOOLERR", "DuplicateItemOrValue", "Duplicate item or value"},
    {"LGW_TOOLERR", "OutOfMemory", "Out of memory"},
    {"LGW_TOOLERR", "IOError", "I/O Error"},
    {"LGW_TOOLERR", "AccessDenied", "Access Denied"},
    {"LGW_TOOLERR", "InvalidPath", "Invalid Path"},
    {"LGW_TOOLERR", "DiskFull", "Disk Full"},
    {"LGW_TOOLERR", "NoDescriptionAvailable", "No description available. "},
};

struct CaseInsensitiveLess {
    using is_transparent = void;
    bool operator()(std::string_view left, std::string_view right) const {
        return multibyte::Compare(left, right, true) < 0;
    }
};

using Section = std::map<std::string, std::string, CaseInsensitiveLess>;
using Table = std::map<std::string, Section, CaseInsensitiveLess>;

const Table& LanguageStringTable() {
    static const Table table = [] {
        Table built;
        for (const auto& row : builtInRows) built[row.section].emplace(row.key, row.text);
        return built;
    }();
    return table;
}

}  // namespace

std::string GetLanguageString(std::string_view section, std::string_view key, const char* defaultText) {
    const Table& table = LanguageStringTable();
    if (auto found = table.find(section); found != table.end()) {
        if (auto item = found->second.find(key); item != found->second.end()) return item->second;
    }
    if (defaultText) return defaultText;
    if (section != "ERRORS" || key != "STRING_NOT_IN_TABLE")
        return GetLanguageString("ERRORS", "STRING_NOT_IN_TABLE", "String Not Found In Table");
    return "String Not Found In Table";
}

std::string GetTEErrorMessage(std::int32_t code) {
    const char* name = FindTECodeName(code);
    return GetLanguageString("TE_ERRORS", name ? name : "USER_DEFINED_ERR_CODE",
                             "Internal Error, error code string not in table");
}

}  // namespace sm
