// /RegServer and /UnregServer: the class keys that let COM start this server. The interface's
// marshaling entries come with the SessionMgr type library, registered by the DLL.
#pragma once

#include <windows.h>

namespace sm {

HRESULT RegisterExternalProcessServer();
// Succeeds when nothing is registered.
HRESULT UnregisterExternalProcessServer();

}  // namespace sm
