#include "ServerObject.h"

#include <string>

#include "ServerLifetime.h"
#include "com/BstrConversion.h"
#include "com/ModuleLock.h"
#include "com/TypeLibrary.h"
#include "com/UniqueHandles.h"

namespace sm {

namespace {
std::string Quoted(BSTR text) { return "'" + BstrToMultiByte(text) + "'"; }

[[noreturn]] void Refuse(HRESULT code, const std::string& message) {
    throw ComError(code, [&] {
        SetComErrorInfo(CLSID_ExternalProcessServer, code, message);
        ComPtr<IErrorInfo> info;
        ::GetErrorInfo(0, info.Put());
        return info;
    }());
}

CLSID ParseClassId(BSTR text) {
    CLSID classId = {};
    if (!text || FAILED(::CLSIDFromString(text, &classId)))
        Refuse(CO_E_CLASSSTRING, Quoted(text) + " is not a class ID in registry format.");
    return classId;
}
}  // namespace

bool IsSessionMgrClass(REFCLSID classId) {
    // The server's copy of the type library lists exactly the classes of the DLL it hosts.
    try {
        TYPEATTR* attributes = nullptr;
        ITypeInfo* info = GetModuleTypeInfo(classId);
        if (FAILED(info->GetTypeAttr(&attributes))) return false;
        bool isClass = attributes->typekind == TKIND_COCLASS;
        info->ReleaseTypeAttr(attributes);
        return isClass;
    } catch (const ComError&) {
        return false;
    }
}

CExternalProcessServer::CExternalProcessServer() { ServerLifetime::Instance().NoteCallingProcess(); }

STDMETHODIMP CExternalProcessServer::get_ProcessId(LONG* result) {
    if (!result) return E_POINTER;
    *result = 0;
    return Boundary([&] {
        ServerLifetime::Instance().NoteCallingProcess();
        *result = static_cast<LONG>(::GetCurrentProcessId());
    });
}

STDMETHODIMP CExternalProcessServer::get_ClientProcessCount(LONG* result) {
    if (!result) return E_POINTER;
    *result = 0;
    return Boundary([&] {
        ServerLifetime::Instance().NoteCallingProcess();
        *result = static_cast<LONG>(ServerLifetime::Instance().RunningClients().size());
    });
}

STDMETHODIMP CExternalProcessServer::ClientProcessId(LONG index, LONG* processId) {
    if (!processId) return E_POINTER;
    *processId = 0;
    return Boundary([&] {
        ServerLifetime::Instance().NoteCallingProcess();
        auto running = ServerLifetime::Instance().RunningClients();
        if (index < 0 || static_cast<std::size_t>(index) >= running.size())
            Refuse(E_INVALIDARG, "The client process index " + std::to_string(index) + " is out of range.");
        *processId = static_cast<LONG>(running[static_cast<std::size_t>(index)]);
    });
}

STDMETHODIMP CExternalProcessServer::get_LockCount(LONG* result) {
    if (!result) return E_POINTER;
    *result = 0;
    return Boundary([&] { *result = GetModuleLockCount(); });
}

STDMETHODIMP CExternalProcessServer::get_ServerPath(BSTR* result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    return Boundary([&] {
        *result = ::SysAllocString(GetOwnModulePath());
        if (!*result) throw ComError(E_OUTOFMEMORY);
    });
}

STDMETHODIMP CExternalProcessServer::IsServedClass(BSTR clsidText, VARIANT_BOOL* served) {
    if (!served) return E_POINTER;
    *served = VARIANT_FALSE;
    return Boundary([&] { *served = IsSessionMgrClass(ParseClassId(clsidText)) ? VARIANT_TRUE : VARIANT_FALSE; });
}

STDMETHODIMP CExternalProcessServer::CreateObjectInServer(BSTR clsidText, BSTR iidText, IUnknown** object) {
    if (!object) return E_POINTER;
    *object = nullptr;
    return Boundary([&] {
        ServerLifetime::Instance().NoteCallingProcess();
        CLSID classId = ParseClassId(clsidText);
        IID interfaceId = {};
        if (!iidText || FAILED(::IIDFromString(iidText, &interfaceId)))
            Refuse(E_INVALIDARG, Quoted(iidText) + " is not an interface ID in registry format.");
        // A general object factory in a shared process would let any client run any class here.
        if (!IsSessionMgrClass(classId))
            Refuse(CLASS_E_CLASSNOTAVAILABLE,
                   "The external process server creates only SessionMgr classes; " + Quoted(clsidText) +
                       " is not one of them.");
        ComPtr<IUnknown> created;
        CheckHResult(::CoCreateInstance(classId, nullptr, CLSCTX_INPROC_SERVER, interfaceId, created.PutVoid()));
        *object = created.Detach();
    });
}

}  // namespace sm
