// A manager in the external process, kept from an earlier connection, can outlive the channel to
// it (the server process ended). Such a call never ran in a live server: the caller must see what
// connecting again reports, not the dead proxy's own failure.
#pragma once

#include <objbase.h>
#include <winerror.h>

namespace sm {

constexpr HRESULT Win32Failure(unsigned long code) { return static_cast<HRESULT>(0x80070000UL | (code & 0xFFFFUL)); }

// The failures of a call on a proxy whose server or object is gone.
inline bool IsLostConnection(HRESULT result) {
    switch (result) {
        case RPC_E_DISCONNECTED:
        case RPC_E_SERVER_DIED:
        case RPC_E_SERVER_DIED_DNE:
        case CO_E_OBJNOTCONNECTED:
        case Win32Failure(RPC_S_SERVER_UNAVAILABLE):
        case Win32Failure(RPC_S_CALL_FAILED):
        case Win32Failure(RPC_S_CALL_FAILED_DNE):
            return true;
        default:
            return false;
    }
}

// Runs call (object -> HRESULT) on obtain(). When that object was kept from before (kept) and its
// connection is lost, forget() drops it and the call runs once more on a newly obtained object, so
// that the connection's own errors reach the caller.
template <class Obtain, class Forget, class Call>
HRESULT CallKeptOrReconnect(bool kept, Obtain&& obtain, Forget&& forget, Call&& call) {
    HRESULT result = call(obtain());
    if (!kept || !IsLostConnection(result)) return result;
    forget();
    return call(obtain());
}

}  // namespace sm
