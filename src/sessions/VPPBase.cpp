#include "sessions/VPPBase.h"

#include <array>

#include "com/BstrConversion.h"
#include "framework/TEException.h"

namespace sm {

namespace {
using TextBuffer = std::array<char, VPPBaseCaller::bufferSize>;

// A driver that fills the whole buffer leaves no terminator; the text ends at the buffer's end.
UniqueBstr BufferText(TextBuffer& buffer) {
    buffer.back() = '\0';
    return UniqueBstr(AllocSysString(std::string_view(buffer.data())));
}
}  // namespace

ComPtr<IVPPBase> CVPPBase::Create(IInstrSession* session, VPPBaseCaller* caller) {
    ComPtr<IVPPBase> object;
    HRESULT created = CreateInstance(nullptr, IID_IVPPBase, object.PutVoid(), session, caller);
    if (FAILED(created)) TE_RAISE(TE_OUT_OF_MEMORY, "CVPPBase::Create");
    return object;
}

CVPPBase::CVPPBase(IInstrSession* served, VPPBaseCaller* table) : session(served), caller(table) {}

template <class Body, class... Outputs>
HRESULT CVPPBase::Call(Body&& body, Outputs*... outputs) {
    if ((!outputs || ...)) return E_POINTER;
    ((*outputs = {}), ...);
    if (!caller) return E_NOTIMPL;
    return Boundary([&] {
        CriticalSectionGuard guard(lock);
        body(caller->GetVPPSession());
    });
}

template <class Function>
Function* CVPPBase::Bound(Function* function, const char* method) const {
    if (!function) TE_RAISE(TE_OPERATION_FAILED, method);
    return function;
}

STDMETHODIMP CVPPBase::Error_Query(LONG* errorCode, BSTR* errorMessage, LONG* status) {
    return Call(
        [&](ViSession vi) {
            TextBuffer buffer{};
            ViInt32 code = 0;
            ViStatus result = Bound(caller->errorQuery, "CVPPBase::Error_Query")(vi, &code, buffer.data());
            *errorMessage = BufferText(buffer).Release();
            *errorCode = code;
            *status = result;
        },
        errorCode, errorMessage, status);
}

STDMETHODIMP CVPPBase::Error_Message(LONG errorCode, BSTR* errorMessage, LONG* status) {
    return Call(
        [&](ViSession vi) {
            TextBuffer buffer{};
            ViStatus result = Bound(caller->errorMessage, "CVPPBase::Error_Message")(vi, errorCode, buffer.data());
            *errorMessage = BufferText(buffer).Release();
            *status = result;
        },
        errorMessage, status);
}

STDMETHODIMP CVPPBase::Revision_Query(BSTR* driverRevision, BSTR* firmwareRevision, LONG* status) {
    return Call(
        [&](ViSession vi) {
            TextBuffer driver{}, firmware{};
            ViStatus result = Bound(caller->revisionQuery, "CVPPBase::Revision_Query")(vi, driver.data(), firmware.data());
            UniqueBstr driverText = BufferText(driver), firmwareText = BufferText(firmware);
            *driverRevision = driverText.Release();
            *firmwareRevision = firmwareText.Release();
            *status = result;
        },
        driverRevision, firmwareRevision, status);
}

STDMETHODIMP CVPPBase::Self_Test(short* result, BSTR* message, LONG* status) {
    return Call(
        [&](ViSession vi) {
            TextBuffer buffer{};
            ViInt16 testResult = 0;
            ViStatus outcome = Bound(caller->selfTest, "CVPPBase::Self_Test")(vi, &testResult, buffer.data());
            *message = BufferText(buffer).Release();
            *result = testResult;
            *status = outcome;
        },
        result, message, status);
}

STDMETHODIMP CVPPBase::Reset(LONG* status) {
    return Call([&](ViSession vi) { *status = Bound(caller->resetFunction, "CVPPBase::Reset")(vi); }, status);
}

}  // namespace sm
