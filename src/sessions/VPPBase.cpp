#include "sessions/VPPBase.h"

namespace sm {

namespace {
template <class... Outputs>
HRESULT NotBound(Outputs*... outputs) {
    ((outputs ? (void)(*outputs = {}) : (void)0), ...);
    return E_NOTIMPL;
}
}  // namespace

STDMETHODIMP CVPPBase::Error_Query(LONG* errorCode, BSTR* errorMessage, LONG* status) {
    return NotBound(errorCode, errorMessage, status);
}
STDMETHODIMP CVPPBase::Error_Message(LONG, BSTR* errorMessage, LONG* status) { return NotBound(errorMessage, status); }
STDMETHODIMP CVPPBase::Revision_Query(BSTR* driverRevision, BSTR* firmwareRevision, LONG* status) {
    return NotBound(driverRevision, firmwareRevision, status);
}
STDMETHODIMP CVPPBase::Self_Test(short* result, BSTR* message, LONG* status) { return NotBound(result, message, status); }
STDMETHODIMP CVPPBase::Reset(LONG* status) { return NotBound(status); }

}  // namespace sm
