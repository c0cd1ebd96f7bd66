// Late binding of the manager. Test steps ask for their session by name thousands of times a run,
// scripts do so late-bound, and the type library's dispatch (oleaut32's ITypeInfo::Invoke, which
// under Wine allocates its argument buffers on every call) cost several times the lookup itself.
// The plain form of a GetInstrSession call, two arguments by value (a string, then a boolean) and no
// named ones, is unpacked here with the answers the type library's dispatch gives: the session as
// VT_DISPATCH, or DISP_E_EXCEPTION with the error info in EXCEPINFO and a null VT_DISPATCH. Every other call and form goes
// to the type library.
#include "manager/InstrSessionMgr.h"

namespace sm {

namespace {
constexpr DISPID getInstrSessionId = 3;

bool IsPlainGetInstrSession(DISPID member, WORD flags, const DISPPARAMS* parameters) {
    return member == getInstrSessionId && (flags & DISPATCH_METHOD) &&
           (flags & ~(DISPATCH_METHOD | DISPATCH_PROPERTYGET)) == 0 && parameters && parameters->cArgs == 2 &&
           parameters->cNamedArgs == 0 && parameters->rgvarg && parameters->rgvarg[1].vt == VT_BSTR &&
           parameters->rgvarg[0].vt == VT_BOOL;
}
}  // namespace

STDMETHODIMP CInstrSessionMgr::Invoke(DISPID member, REFIID iid, LCID locale, WORD flags, DISPPARAMS* parameters,
                                      VARIANT* result, EXCEPINFO* exception, UINT* argumentError) {
    if (!IsPlainGetInstrSession(member, flags, parameters))
        return Implements::Invoke(member, iid, locale, flags, parameters, result, exception, argumentError);
    // Arguments arrive last first.
    IInstrSession* session = nullptr;
    HRESULT called = GetInstrSession(parameters->rgvarg[1].bstrVal, parameters->rgvarg[0].boolVal, &session);
    // The result is a VT_DISPATCH also after a failure (then null), as the type library leaves it.
    if (result) {
        result->vt = VT_DISPATCH;
        result->pdispVal = session;
    } else if (session) {
        session->Release();
    }
    if (FAILED(called)) {
        if (exception) {
            exception->scode = called;
            ComPtr<IErrorInfo> info;
            if (::GetErrorInfo(0, info.Put()) == S_OK && info) {
                info->GetDescription(&exception->bstrDescription);
                info->GetHelpFile(&exception->bstrHelpFile);
                info->GetSource(&exception->bstrSource);
                info->GetHelpContext(&exception->dwHelpContext);
            }
        }
        return DISP_E_EXCEPTION;
    }
    return S_OK;
}

}  // namespace sm
