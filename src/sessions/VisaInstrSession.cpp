#include "sessions/VisaInstrSession.h"

namespace sm {

void CVisaInstrSession::FinalClose() {
    SessionCall call(*this);
    closeEnabled = true;
    CloseResource();
}

void CVisaInstrSession::Open() {
    if (rm == 0) {
        visa::ViSession resourceManager = 0;
        visa::ViStatus status = link.viOpenDefaultRM(&resourceManager);
        link.CheckVisaError(resourceManager, status, "viOpenDefaultRM");
        rm = resourceManager;
    }
    DynamicString resource(entry.viName);
    StripExternalPrefix(resource);
    visa::ViSession opened = 0;
    visa::ViStatus status = link.viOpen(rm, resource.GetText(), 0, 0, &opened);
    // A warning still opened the resource: the session stays closed, so the handle must not outlive
    // the error.
    if (status != visa::Success && opened != 0) link.viClose(opened);
    link.CheckVisaError(rm, status, "viOpen");
    vi = opened;
    initialized = true;
}

visa::ViSession CVisaInstrSession::GetHandle_Internal(InterfaceLevel level) {
    if (inExternalProcess)
        TE_RAISE(TE_OPERATION_FAILED, "CVisaInstrSession::GetHandle_Internal",
                 "VISA instrument handles cannot be used outside of the operating system process that they are "
                 "created in.");
    switch (level) {
    case DefaultInterface:
    case IODriver:
        if (!initialized) Open();
        return vi;
    case ClassDriver:
    case SpecificDriver:
        TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "CVisaInstrSession::GetHandle_Internal");
    default:
        return 0;
    }
}

void CVisaInstrSession::CloseResource() {
    if (!closeEnabled) return;
    RunCloseActions(Self());
    if (initialized) {
        link.viClose(vi);
        initialized = false;
        vi = 0;
    }
    if (rm != 0) {
        link.viClose(rm);
        rm = 0;
    }
}

// The options text has no meaning for a VISA resource.
STDMETHODIMP CVisaInstrSession::Initialize(BSTR) {
    return Locked([&] {
        if (!initialized) Open();
    });
}

STDMETHODIMP CVisaInstrSession::IsInitialized(VARIANT_BOOL* result) {
    return Locked(result, [&] { *result = ToVariantBool(initialized); });
}

STDMETHODIMP CVisaInstrSession::GetHandle(InterfaceLevel level, LONG* handle) {
    return Locked(handle, [&] { *handle = static_cast<LONG>(GetHandle_Internal(level)); });
}

STDMETHODIMP CVisaInstrSession::GetHandleEx(InterfaceLevel level, VARIANT* handle) {
    return Locked(handle, [&] {
        LONG value = static_cast<LONG>(GetHandle_Internal(level));
        handle->vt = VT_I4;
        handle->lVal = value;
    });
}

// A VISA session has no COM driver at any level.
STDMETHODIMP CVisaInstrSession::GetCOMDriver(InterfaceLevel level, IUnknown** driver) {
    return Locked(driver, [&] {
        if (level >= DefaultInterface && level <= IODriver) TE_RAISE(TE_OPERATION_FAILED, "CVisaInstrSession::GetCOMDriver");
    });
}

STDMETHODIMP CVisaInstrSession::Close() {
    return Locked([&] { CloseResource(); });
}

STDMETHODIMP CVisaInstrSession::GetVPPBaseInterface(IVPPBase** result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    return E_NOTIMPL;
}

}  // namespace sm
