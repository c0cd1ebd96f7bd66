// Session of category "CUSTOM": no driver or resource behind it, only the shared name, data items,
// close function and session lock.
#pragma once

#include "sessions/InstrSession.h"

namespace sm {

class CCustomInstrSession : public InstrSession<CCustomInstrSession> {
public:
    static const CLSID& ClassId() { return CLSID_CustomInstrSession; }
    static constexpr const char* ClassName() { return "CCustomInstrSession"; }
    void FinalClose();

    STDMETHODIMP Initialize(BSTR options) override;
    STDMETHODIMP IsInitialized(VARIANT_BOOL* result) override;
    STDMETHODIMP GetHandle(InterfaceLevel level, LONG* handle) override;
    STDMETHODIMP GetHandleEx(InterfaceLevel level, VARIANT* handle) override;
    STDMETHODIMP GetCOMDriver(InterfaceLevel level, IUnknown** driver) override;
    STDMETHODIMP Close() override;
    STDMETHODIMP GetVPPBaseInterface(IVPPBase** result) override;
};

}  // namespace sm
