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

// A failing HRESULT of a method of `object`'s interface `iid`: the thread's error info travels with
// it only when the object says that it sets error info for that interface, so a stale one never does.
[[noreturn]] void ThrowComErrorOf(HRESULT code, IUnknown* object, REFIID iid);
inline void CheckMember(HRESULT code, IUnknown* object, REFIID iid) {
    if (FAILED(code)) ThrowComErrorOf(code, object, iid);
}

}  // namespace sm
