#include "sessions/CustomInstrSession.h"

namespace sm {

void CCustomInstrSession::FinalClose() {
    SessionCall call(*this);
    InstrSession::FinalClose();
    initialized = false;
}

STDMETHODIMP CCustomInstrSession::Initialize(BSTR) {
    return Locked([&] { initialized = true; });
}

STDMETHODIMP CCustomInstrSession::IsInitialized(VARIANT_BOOL* result) {
    return Locked(result, [&] { *result = ToVariantBool(initialized); });
}

// No handle exists for a custom session; E_NOTIMPL without error info tells the caller so.
STDMETHODIMP CCustomInstrSession::GetHandle(InterfaceLevel, LONG* handle) {
    if (!handle) return E_POINTER;
    *handle = 0;
    return E_NOTIMPL;
}

STDMETHODIMP CCustomInstrSession::GetHandleEx(InterfaceLevel, VARIANT* handle) {
    if (!handle) return E_POINTER;
    ::VariantInit(handle);
    handle->vt = VT_UI8;
    handle->ullVal = 0;
    return E_NOTIMPL;
}

STDMETHODIMP CCustomInstrSession::GetCOMDriver(InterfaceLevel level, IUnknown** driver) {
    return Locked(driver, [&] {
        if (level >= DefaultInterface && level <= IODriver) TE_RAISE(TE_OPERATION_FAILED, "CCustomInstrSession::GetCOMDriver");
    });
}

STDMETHODIMP CCustomInstrSession::Close() {
    return Locked([&] {
        if (!closeEnabled) return;
        RunCloseActions(Self());
        initialized = false;
    });
}

STDMETHODIMP CCustomInstrSession::GetVPPBaseInterface(IVPPBase** result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    return E_NOTIMPL;
}

}  // namespace sm
