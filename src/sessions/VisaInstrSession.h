// Session of category "VISA": one VISA I/O resource whose session handle is opened once, on first
// use, and shared by every module of the process. No driver stands behind it; the handle is the
// resource's own VISA session, opened under a default resource manager of the session's own.
#pragma once

#include "sessions/InstrSession.h"
#include "sources/VisaEntry.h"
#include "sources/VisaLink.h"

namespace sm {

class CVisaInstrSession : public InstrSession<CVisaInstrSession> {
public:
    static const CLSID& ClassId() { return CLSID_VisaInstrSession; }
    static constexpr const char* ClassName() { return "CVisaInstrSession"; }

    // The name group the manager found for the session's name.
    void SetEntry(const VisaEntry& found) { entry = found; }
    // The close work of the last release: runs even when closing was disabled. Safe to run twice.
    void FinalClose();

    STDMETHODIMP Initialize(BSTR options) override;
    STDMETHODIMP IsInitialized(VARIANT_BOOL* result) override;
    STDMETHODIMP GetHandle(InterfaceLevel level, LONG* handle) override;
    STDMETHODIMP GetHandleEx(InterfaceLevel level, VARIANT* handle) override;
    STDMETHODIMP GetCOMDriver(InterfaceLevel level, IUnknown** driver) override;
    STDMETHODIMP Close() override;
    STDMETHODIMP GetVPPBaseInterface(IVPPBase** result) override;

private:
    void Open();
    visa::ViSession GetHandle_Internal(InterfaceLevel level);
    void CloseResource();

    visa::ViSession vi = 0;
    visa::ViSession rm = 0;
    VisaLink link;
    VisaEntry entry;
};

}  // namespace sm
