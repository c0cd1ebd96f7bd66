// A failing HRESULT with its error info, thrown inside the DLL and passed through unchanged at the
// error boundary.
#pragma once

#include <oaidl.h>

#include "com/ComPtr.h"

namespace sm {

class ComError {
public:
    explicit ComError(HRESULT code, ComPtr<IErrorInfo> info = {}) : hresult(code), errorInfo(std::move(info)) {}
    HRESULT Error() const { return hresult; }
    IErrorInfo* ErrorInfo() const { return errorInfo.Get(); }

private:
    HRESULT hresult;
    ComPtr<IErrorInfo> errorInfo;
};

// Failing HRESULTs become exceptions at once, so the code around them reads as plain C++. The
// thread's current error info, when there is any, travels with the exception.
void ThrowComError(HRESULT code);
inline void CheckHResult(HRESULT code) {
    if (FAILED(code)) ThrowComError(code);
}

}  // namespace sm
