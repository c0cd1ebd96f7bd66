// The automation object behind IVPPBase: a VXIplug&play driver's standard functions on one open
// session. It keeps its session alive; the session's table of bound functions (VPPBaseCaller) is
// shared by every such object of the session. A driver's status is a result, not an error: only a
// failure to load or initialize the driver becomes an HRESULT.
#pragma once

#include "com/ComPtr.h"
#include "com/Implements.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"
#include "sessions/VPPBaseCaller.h"

namespace sm {

class CVPPBase : public Implements<CVPPBase, IVPPBase> {
public:
    static const CLSID& ClassId() { return CLSID_VPPBase; }

    // A new object serving `session`; `caller` is the same session seen as its function table.
    static ComPtr<IVPPBase> Create(IInstrSession* session, VPPBaseCaller* caller);

    // Created through the class object, an instance serves no session: every function answers
    // E_NOTIMPL with its outputs cleared.
    explicit CVPPBase(IInstrSession* session = nullptr, VPPBaseCaller* caller = nullptr);

    STDMETHODIMP Error_Query(LONG* errorCode, BSTR* errorMessage, LONG* status) override;
    STDMETHODIMP Error_Message(LONG errorCode, BSTR* errorMessage, LONG* status) override;
    STDMETHODIMP Revision_Query(BSTR* driverRevision, BSTR* firmwareRevision, LONG* status) override;
    STDMETHODIMP Self_Test(short* result, BSTR* message, LONG* status) override;
    STDMETHODIMP Reset(LONG* status) override;

private:
    // Clears the outputs, then runs body(vi) under the object lock inside the error boundary.
    template <class Body, class... Outputs>
    HRESULT Call(Body&& body, Outputs*... outputs);
    // The bound function, or TE_OPERATION_FAILED when the session's driver was unloaded meanwhile.
    template <class Function>
    Function* Bound(Function* function, const char* method) const;

    CriticalSection lock;
    ComPtr<IInstrSession> session;
    VPPBaseCaller* caller = nullptr;
};

}  // namespace sm
