// Module state shared by the entry points.
#pragma once

#include <windows.h>

namespace sm {

HMODULE GetModuleInstance();

}  // namespace sm
