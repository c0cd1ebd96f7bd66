// The DLL's entry point and COM class-object exports.
#include "server/Module.h"

#include <ole2.h>

#include "com/ModuleLock.h"
#include "com/UniqueHandles.h"
#include "server/ObjectMap.h"

namespace sm {
namespace {
HMODULE moduleInstance = nullptr;
CriticalSection* moduleLock = nullptr;
}  // namespace

HMODULE GetModuleInstance() { return moduleInstance; }

}  // namespace sm

using namespace sm;

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
    switch (reason) {
        case DLL_PROCESS_ATTACH:
            SetModuleDetaching(false);
            moduleInstance = instance;
            moduleLock = new CriticalSection;
            ::DisableThreadLibraryCalls(instance);
            break;
        case DLL_PROCESS_DETACH:
            // From here on nothing may free a library or call a driver: the process is going away.
            SetModuleDetaching(true);
            for (ObjectMapEntry& entry : GetObjectMap()) {
                if (IClassFactory* factory = entry.cachedFactory.exchange(nullptr)) factory->Release();
            }
            delete moduleLock;
            moduleLock = nullptr;
            break;
        default:
            break;
    }
    return TRUE;
}

extern "C" HRESULT STDAPICALLTYPE DllGetClassObject(REFCLSID classId, REFIID interfaceId, void** result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    for (ObjectMapEntry& entry : GetObjectMap()) {
        if (!IsEqualCLSID(*entry.classId, classId)) continue;
        IClassFactory* factory = entry.cachedFactory.load();
        if (!factory) {
            CriticalSectionGuard guard(*moduleLock);
            factory = entry.cachedFactory.load();
            if (!factory) {
                factory = entry.createFactory();
                if (!factory) return E_OUTOFMEMORY;
                entry.cachedFactory.store(factory);
            }
        }
        return factory->QueryInterface(interfaceId, result);
    }
    return CLASS_E_CLASSNOTAVAILABLE;
}

extern "C" HRESULT STDAPICALLTYPE DllCanUnloadNow() { return GetModuleLockCount() == 0 ? S_OK : S_FALSE; }
