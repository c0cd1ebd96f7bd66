// Typed binding of functions exported by a library: the caller names the function's type once and
// no cast appears at the binding site.
#pragma once

#include <windows.h>

#include <string>

namespace sm {

// A library's full path in the system directory, where a library that must not be taken from the
// search path is loaded from.
inline std::string SystemDirectoryPath(const char* libraryName) {
    char system[MAX_PATH] = {};
    UINT length = ::GetSystemDirectoryA(system, MAX_PATH);
    return std::string(system, length < MAX_PATH ? length : 0) + "\\" + libraryName;
}

// Null when the library does not export the name.
template <class Function>
Function* GetProcAddressAs(HMODULE library, const char* name) {
    return reinterpret_cast<Function*>(reinterpret_cast<void*>(::GetProcAddress(library, name)));
}

}  // namespace sm
