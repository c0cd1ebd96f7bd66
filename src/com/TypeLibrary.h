// The type library this module carries as resource TYPELIB 1, and the type info of each of its
// interfaces, loaded once and shared by every IDispatch implementation.
#pragma once

#include <oaidl.h>

namespace sm {

// Type info of the interface with this IID from the module's own type library. Raises ComError
// with the loader's HRESULT when the library or the interface cannot be found.
ITypeInfo* GetModuleTypeInfo(REFIID interfaceId);

// Full path of the module (DLL or EXE) that holds this code.
const wchar_t* GetOwnModulePath();

}  // namespace sm
