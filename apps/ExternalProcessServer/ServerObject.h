// The object that clients of the shared external process talk to first: it creates SessionMgr
// objects in this process and tells which client processes it serves.
#pragma once

#include "com/Implements.h"
#include "com/Interfaces.h"
#include "manager/ExternalProcessServer.h"

namespace sm {

class CExternalProcessServer : public Implements<CExternalProcessServer, IExternalProcessServer> {
public:
    static const CLSID& ClassId() { return CLSID_ExternalProcessServer; }

    CExternalProcessServer();

    STDMETHODIMP get_ProcessId(LONG* result) override;
    STDMETHODIMP get_ClientProcessCount(LONG* result) override;
    STDMETHODIMP ClientProcessId(LONG index, LONG* processId) override;
    STDMETHODIMP get_LockCount(LONG* result) override;
    STDMETHODIMP get_ServerPath(BSTR* result) override;
    STDMETHODIMP IsServedClass(BSTR clsidText, VARIANT_BOOL* served) override;
    STDMETHODIMP CreateObjectInServer(BSTR clsidText, BSTR iidText, IUnknown** object) override;
};

// Whether classId names a class of the SessionMgr type library (the only classes this server makes).
bool IsSessionMgrClass(REFCLSID classId);

}  // namespace sm
