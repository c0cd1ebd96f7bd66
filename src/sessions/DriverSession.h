// What the sessions that stand for a driver library (VXIplug&play, IVI, switch routes) share: the
// loaded library, handles by interface level, the refusal to hand a handle to another process, and
// the close and unload flow. A session class derives as
//
//     class CVXIPNPInstrSession : public DriverSession<CVXIPNPInstrSession> { ... };
//
// and supplies, besides ClassId and ClassName:
//     std::uint64_t GetHandle_Internal(InterfaceLevel level);  // under objectLock
//     void CloseDriverHandle();        // calls the driver's close with its handle and forgets the handle
//     void ForgetDriverFunctions();    // clears the function slots bound from the library
//     void AppendStateHeader(String&); // the session's own state header
// and may hide HandleVariantType (VT_I4 by default), GetCOMDriver and GetVPPBaseInterface.
#pragma once

#include <cstdint>
#include <string_view>

#include "com/DriverLibrary.h"
#include "sessions/InstrSession.h"
#include "sessions/VPPBase.h"
#include "sessions/ViTypes.h"

namespace sm {

// "<prefix>_init returned an error: -1 (0xffffffff)." from a pattern with %1 prefix, %2 the status
// in signed decimal and %3 its 32-bit pattern in hexadecimal.
DynamicString DriverStatusMessage(const char* pattern, std::string_view prefix, ViStatus status);

template <class Session>
class DriverSession : public InstrSession<Session> {
public:
    STDMETHODIMP IsInitialized(VARIANT_BOOL* result) override {
        return this->Locked(result, [&] { *result = ToVariantBool(this->initialized); });
    }
    STDMETHODIMP GetHandle(InterfaceLevel level, LONG* handle) override {
        return this->Locked(handle, [&] { *handle = static_cast<LONG>(Derived().GetHandle_Internal(level)); });
    }
    STDMETHODIMP GetHandleEx(InterfaceLevel level, VARIANT* handle) override {
        return this->Locked(handle, [&] {
            std::uint64_t value = Derived().GetHandle_Internal(level);
            handle->vt = Session::HandleVariantType();
            if (handle->vt == VT_UI8)
                handle->ullVal = value;
            else
                handle->lVal = static_cast<LONG>(value);
        });
    }
    // A driver session has no COM driver object.
    STDMETHODIMP GetCOMDriver(InterfaceLevel, IUnknown** driver) override {
        return this->Locked(driver, [&] { TE_RAISE(TE_OPERATION_FAILED, this->QualifiedName("GetCOMDriver").c_str()); });
    }
    STDMETHODIMP Close() override {
        return this->Locked([&] { CloseDriver(); });
    }
    // Every call gives a new object; all of them call the one table the session bound.
    STDMETHODIMP GetVPPBaseInterface(IVPPBase** result) override {
        if (!result) return E_POINTER;
        *result = nullptr;
        return this->Locked([&] {
            Derived().PrepareVPPBase();
            *result = CVPPBase::Create(this->Self(), this).Detach();
        });
    }

    // The work of the final release: close actions forced on, driver closed, library freed. Safe to
    // run twice; nothing here may raise.
    void FinalClose() {
        typename SessionBase::SessionCall call(*this);
        this->closeEnabled = true;
        UnloadDriver();
    }

    static VARTYPE HandleVariantType() { return VT_I4; }

protected:
    Session& Derived() { return *static_cast<Session*>(this); }

    // Loads `path` unless a library is loaded, then runs `bind`; when binding raises, the library is
    // released again and the error passes on.
    template <class Bind>
    void LoadLibraryOnce(const char* path, const char* raisingFunction, Bind&& bind) {
        if (library.IsLoaded()) return;
        library.Load(path, raisingFunction);
        this->driverLibraryPath.Assign(path);
        try {
            bind();
        } catch (...) {
            ReleaseLibrary();
            throw;
        }
    }

    // Handles belong to the process that opened the driver; `handleKind` is "VXI-PNP", "IVI" or "RQ".
    void RefuseOutsideProcess(const char* handleKind) {
        if (!this->inExternalProcess) return;
        DynamicString message(handleKind);
        message.Append(" instrument handles cannot be used outside of the operating system process that they are "
                       "created in.");
        TE_RAISE(TE_OPERATION_FAILED, this->QualifiedName("GetHandle_Internal").c_str(), message);
    }

    // Close: the close actions, then the driver's close; the library stays loaded. Never raises on
    // behalf of the driver.
    void CloseDriver() {
        if (!this->closeEnabled) return;
        this->RunCloseActions(this->Self());
        if (!this->initialized || !library.IsLoaded()) return;
        try {
            Derived().CloseDriverHandle();
        } catch (...) {
        }
        this->initialized = false;
    }

    // Close with every error swallowed, then the library and everything bound from it let go.
    void UnloadDriver() {
        try {
            CloseDriver();
        } catch (...) {
        }
        ReleaseLibrary();
    }

    // Forgets the bound functions and frees the library (not while the DLL detaches). Close actions
    // are not run: a load that failed has opened nothing, and the caller's close function and
    // release-on-close items stay for the real close.
    void ReleaseLibrary() {
        Derived().ForgetDriverFunctions();
        this->Unbind();
        library.Unload();
        this->driverLibraryPath.Empty();
    }

    DriverLibrary library;
};

}  // namespace sm
