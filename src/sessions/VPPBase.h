// The object that offers a VXIplug&play driver's standard functions. Without a bound driver every
// function answers E_NOTIMPL with its outputs cleared.
#pragma once

#include "com/Implements.h"
#include "com/Interfaces.h"

namespace sm {

class CVPPBase : public Implements<CVPPBase, IVPPBase> {
public:
    static const CLSID& ClassId() { return CLSID_VPPBase; }

    STDMETHODIMP Error_Query(LONG* errorCode, BSTR* errorMessage, LONG* status) override;
    STDMETHODIMP Error_Message(LONG errorCode, BSTR* errorMessage, LONG* status) override;
    STDMETHODIMP Revision_Query(BSTR* driverRevision, BSTR* firmwareRevision, LONG* status) override;
    STDMETHODIMP Self_Test(short* result, BSTR* message, LONG* status) override;
    STDMETHODIMP Reset(LONG* status) override;
};

}  // namespace sm
