// Binding one function of a loaded driver or library; a missing function raises TE_FUNC_NOT_IN_LIB
// "Could not find function '<name>' in DLL (or external module) '<path>'." from "LoadFunctionPtr",
// whichever session or source asked.
#pragma once

#include "com/DriverLibrary.h"

namespace sm {

template <class Function>
void LoadFunctionPtr(Function*& function, const DriverLibrary& library, const char* name) {
    function = library.Bind<Function>(name, "LoadFunctionPtr");
}

}  // namespace sm
