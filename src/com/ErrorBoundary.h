// The one place where exceptions become HRESULTs. Every automation method body runs inside
// ComBoundary, so every failure reaches the client the same way:
//   TEException  -> its code as the HRESULT, error info with the class's CLSID and the message;
//   ComError     -> its own HRESULT and error info;
//   std::bad_alloc -> E_OUTOFMEMORY without error info;
//   anything else-> -17500 with "Operation Failed.".
#pragma once

#include <oaidl.h>

#include <cstdint>
#include <string_view>
#include <type_traits>

#include "framework/TEException.h"

namespace sm {

HRESULT SetComErrorInfo(REFCLSID classId, std::int32_t code, std::string_view description);
HRESULT ReportTEException(REFCLSID classId, const TEException& exception);
// Call from a catch block only: translates the exception in flight.
HRESULT TranslateCurrentException(REFCLSID classId) noexcept;

template <class Body>
HRESULT ComBoundary(REFCLSID classId, Body&& body) noexcept {
    try {
        if constexpr (std::is_same_v<std::invoke_result_t<Body>, HRESULT>) {
            return body();
        } else {
            body();
            return S_OK;
        }
    } catch (...) {
        return TranslateCurrentException(classId);
    }
}

}  // namespace sm
