// Typed binding of functions exported by a library: the caller names the function's type once and
// no cast appears at the binding site.
#pragma once

#include <windows.h>

namespace sm {

// Null when the library does not export the name.
template <class Function>
Function* GetProcAddressAs(HMODULE library, const char* name) {
    return reinterpret_cast<Function*>(reinterpret_cast<void*>(::GetProcAddress(library, name)));
}

}  // namespace sm
