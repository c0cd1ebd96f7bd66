// A library the product loads at run time by path or bare name (a driver, a configuration library, the
// switch library): loading raises the user-facing library-load error, binding a missing function raises
// TE_FUNC_NOT_IN_LIB naming function and library, and the library is freed again unless the DLL itself
// is being detached from the process (a library freed under the loader lock can take the process down).
#pragma once

#include <windows.h>

#include <string>

#include "com/LibraryBinding.h"

namespace sm {

// TE_DLL_NOT_LOADABLE with the library-load message for `path` and the system error `lastError`.
[[noreturn]] void RaiseLibraryLoadFailure(const char* path, DWORD lastError, const char* raisingFunction);
// TE_FUNC_NOT_IN_LIB: "Could not find function '<function>' in DLL (or external module) '<path>'."
[[noreturn]] void RaiseFunctionNotInLibrary(const char* function, const char* path, const char* raisingFunction);

class DriverLibrary {
public:
    DriverLibrary() = default;
    DriverLibrary(const DriverLibrary&) = delete;
    DriverLibrary& operator=(const DriverLibrary&) = delete;
    ~DriverLibrary() { Unload(); }

    // LoadLibraryA(path); nothing when a library is already loaded. Raises the library-load failure
    // under `raisingFunction` ("CVXIPNPInstrSession::LoadDLL").
    void Load(const char* path, const char* raisingFunction);
    // Forgets the library; FreeLibrary unless the module is detaching.
    void Unload();

    bool IsLoaded() const { return module != nullptr; }
    HMODULE Handle() const { return module; }
    // The path given to Load while loaded; empty otherwise.
    const std::string& Path() const { return path; }

    // The function `name` typed as `Function`; raises TE_FUNC_NOT_IN_LIB when it is missing.
    template <class Function>
    Function* Bind(const char* name, const char* raisingFunction) const {
        Function* function = GetProcAddressAs<Function>(module, name);
        if (!function) RaiseFunctionNotInLibrary(name, path.c_str(), raisingFunction);
        return function;
    }
    // The function `name`, or null when the library does not export it.
    template <class Function>
    Function* BindOptional(const char* name) const {
        return module ? GetProcAddressAs<Function>(module, name) : nullptr;
    }

private:
    HMODULE module = nullptr;
    std::string path;
};

}  // namespace sm
