#include "com/DriverLibrary.h"

#include "com/ModuleLock.h"
#include "framework/String.h"
#include "framework/TEException.h"

namespace sm {
namespace {

constexpr const char* libraryLoadMessage =
    "Could not load DLL or external library '%1'.\nWin32 Error Code = '%2'\nError Description = %3\n"
    "This DLL might be attempting to load another DLL. When DLL1 loads DLL2, Windows searches for the "
    "subsidiary DLL2 according to the Windows DLL search algorithm. To ensure that Windows locates DLL2, "
    "you can place DLL2 in one of the following locations:\n1) The directory that contains DLL1.\n"
    "2) The directory of the application executable.\n3) The system search path. The system search path "
    "includes the system directory (ie. C:\\WinNT\\System32\\ or C:\\Windows\\System\\), the Windows "
    "directory (ie. C:\\WinNT\\ or C:\\Windows\\), and the directories that are listed in the PATH "
    "environment variable.\n";

// The system's own text for an error code, inserted unchanged (it usually ends in a line break).
std::string SystemErrorText(DWORD error) {
    char* buffer = nullptr;
    DWORD length = ::FormatMessageA(
        FORMAT_MESSAGE_ALLOCATE_BUFFER | FORMAT_MESSAGE_FROM_SYSTEM | FORMAT_MESSAGE_IGNORE_INSERTS, nullptr, error,
        0, reinterpret_cast<char*>(&buffer), 0, nullptr);
    std::string text(buffer ? buffer : "", length);
    if (buffer) ::LocalFree(buffer);
    return text;
}

}  // namespace

void RaiseLibraryLoadFailure(const char* path, DWORD lastError, const char* raisingFunction) {
    DynamicString message(libraryLoadMessage);
    message.ReplaceArg(1, path);
    message.ReplaceArg(2, static_cast<std::int64_t>(static_cast<std::int32_t>(lastError)), "%d");
    message.ReplaceArg(3, SystemErrorText(lastError));
    TE_RAISE(TE_DLL_NOT_LOADABLE, raisingFunction,
             RaiseDetails{.message = message.View(), .apiErrorCode = static_cast<std::int32_t>(lastError)});
}

void RaiseFunctionNotInLibrary(const char* function, const char* path, const char* raisingFunction) {
    DynamicString message("Could not find function '%1' in DLL (or external module) '%2'.");
    message.ReplaceArg(1, function);
    message.ReplaceArg(2, path);
    TE_RAISE(TE_FUNC_NOT_IN_LIB, raisingFunction, message);
}

void DriverLibrary::Load(const char* libraryPath, const char* raisingFunction) {
    if (module) return;
    HMODULE loaded = ::LoadLibraryA(libraryPath);
    DWORD error = ::GetLastError();
    if (!loaded) RaiseLibraryLoadFailure(libraryPath, error, raisingFunction);
    module = loaded;
    path = libraryPath;
}

void DriverLibrary::Unload() {
    HMODULE loaded = module;
    module = nullptr;
    path.clear();
    if (loaded && !IsModuleDetaching()) ::FreeLibrary(loaded);
}

}  // namespace sm
