// Common shape of the sessions that stand for a driver (IVI, VXIplug&play, switch routes). Opening
// drivers is not available in this build yet: the driver methods answer E_NOTIMPL without touching
// the session, while names, data items, locks and close functions work as for every session.
#pragma once

#include "sessions/InstrSession.h"

namespace sm {

template <class Session>
class DriverSession : public InstrSession<Session> {
public:
    // Nothing beyond the common close work yet: no driver is opened.
    void FinalClose() { InstrSession<Session>::FinalClose(); }

    STDMETHODIMP Initialize(BSTR) override { return E_NOTIMPL; }
    STDMETHODIMP IsInitialized(VARIANT_BOOL* result) override {
        return this->Locked(result, [&] { *result = ToVariantBool(this->initialized); });
    }
    STDMETHODIMP GetHandle(InterfaceLevel, LONG* handle) override {
        if (!handle) return E_POINTER;
        *handle = 0;
        return E_NOTIMPL;
    }
    STDMETHODIMP GetHandleEx(InterfaceLevel, VARIANT* handle) override {
        if (!handle) return E_POINTER;
        ::VariantInit(handle);
        return E_NOTIMPL;
    }
    STDMETHODIMP GetCOMDriver(InterfaceLevel, IUnknown** driver) override {
        if (!driver) return E_POINTER;
        *driver = nullptr;
        return E_NOTIMPL;
    }
    STDMETHODIMP Close() override {
        return this->Locked([&] {
            if (!this->closeEnabled) return;
            this->RunCloseActions(this->Self());
            this->initialized = false;
        });
    }
    STDMETHODIMP GetVPPBaseInterface(IVPPBase** result) override {
        if (!result) return E_POINTER;
        *result = nullptr;
        return E_NOTIMPL;
    }
};

class CIVIInstrSession : public DriverSession<CIVIInstrSession> {
public:
    static const CLSID& ClassId() { return CLSID_IVIInstrSession; }
    static constexpr const char* ClassName() { return "CIVIInstrSession"; }
};

class CVXIPNPInstrSession : public DriverSession<CVXIPNPInstrSession> {
public:
    static const CLSID& ClassId() { return CLSID_VXIPNPInstrSession; }
    static constexpr const char* ClassName() { return "CVXIPNPInstrSession"; }
};

class CRQInstrSession : public DriverSession<CRQInstrSession> {
public:
    static const CLSID& ClassId() { return CLSID_RQInstrSession; }
    static constexpr const char* ClassName() { return "CRQInstrSession"; }
};

}  // namespace sm
