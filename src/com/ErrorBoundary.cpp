#include "com/ErrorBoundary.h"

#include <new>

#include "com/BstrConversion.h"
#include "com/ComError.h"
#include "com/ComPtr.h"
#include "com/UniqueHandles.h"
#include "framework/LanguageStrings.h"

namespace sm {

HRESULT SetComErrorInfo(REFCLSID classId, std::int32_t code, std::string_view description) {
    ComPtr<ICreateErrorInfo> creator;
    HRESULT created = ::CreateErrorInfo(creator.Put());
    if (FAILED(created)) return created;
    creator->SetGUID(classId);
    if (!description.empty()) {
        // The message is system-ANSI text, as the client's error dialogs expect.
        UniqueBstr text(AnsiToBstr(description));
        creator->SetDescription(text.Get());
    }
    creator->SetHelpContext(0);
    creator->SetHelpFile(nullptr);
    ComPtr<IErrorInfo> info;
    HRESULT queried = creator->QueryInterface(IID_IErrorInfo, info.PutVoid());
    if (FAILED(queried)) return queried;
    ::SetErrorInfo(0, info.Get());
    return static_cast<HRESULT>(code);
}

HRESULT ReportTEException(REFCLSID classId, const TEException& exception) {
    // A driver's warning status raised as an error is not negative and would read as success.
    std::int32_t code = exception.GetErrorCode();
    return SetComErrorInfo(classId, code < 0 ? code : TE_OPERATION_FAILED, exception.GetDescription());
}

HRESULT TranslateCurrentException(REFCLSID classId) noexcept {
    try {
        try {
            throw;
        } catch (const TEException& exception) {
            return ReportTEException(classId, exception);
        } catch (const ComError& error) {
            ::SetErrorInfo(0, error.ErrorInfo());
            return error.Error();
        } catch (const std::bad_alloc&) {
            // Clients handle running out of memory by its standard code; making a message would
            // need memory too.
            ::SetErrorInfo(0, nullptr);
            return E_OUTOFMEMORY;
        } catch (...) {
            return SetComErrorInfo(classId, TE_OPERATION_FAILED, GetTEErrorMessage(TE_OPERATION_FAILED));
        }
    } catch (const std::bad_alloc&) {
        // Reporting itself ran out of memory: the code alone must still get out.
        return E_OUTOFMEMORY;
    } catch (...) {
        return static_cast<HRESULT>(TE_OPERATION_FAILED);
    }
}

void ThrowComError(HRESULT code) {
    ComPtr<IErrorInfo> info;
    if (::GetErrorInfo(0, info.Put()) != S_OK) info.Reset();
    throw ComError(code, std::move(info));
}

void ThrowComErrorOf(HRESULT code, IUnknown* object, REFIID iid) {
    ComPtr<IErrorInfo> info;
    ComPtr<ISupportErrorInfo> support;
    if (object) object->QueryInterface(IID_ISupportErrorInfo, support.PutVoid());
    if (::GetErrorInfo(0, info.Put()) != S_OK || !support || support->InterfaceSupportsErrorInfo(iid) != S_OK)
        info.Reset();
    throw ComError(code, std::move(info));
}

}  // namespace sm
