// A session of the switch-management product, opened by its name through "qvrq.dll" and shared by
// every module of the process. Its handle is pointer-sized, so it is handed out only as VT_UI8.
#pragma once

#include <cstdint>
#include <string_view>

#include "com/DriverLibrary.h"
#include "sessions/DriverSession.h"

namespace sm {

class CRQInstrSession : public DriverSession<CRQInstrSession> {
public:
    ~CRQInstrSession() override;

    static const CLSID& ClassId() { return CLSID_RQInstrSession; }
    static constexpr const char* ClassName() { return "CRQInstrSession"; }

    STDMETHODIMP Initialize(BSTR options) override;
    STDMETHODIMP GetHandle(InterfaceLevel level, LONG* handle) override;
    STDMETHODIMP GetHandleEx(InterfaceLevel level, VARIANT* handle) override;
    STDMETHODIMP GetCOMDriver(InterfaceLevel level, IUnknown** driver) override;
    STDMETHODIMP Close() override;

    // The text the product opens; the manager gives it the session's name at creation.
    void SetDeviceName(std::string_view value) { deviceName.Assign(value); }

    // Destruction-time close: close actions forced on, the product session closed, the library freed.
    // Safe to run more than once.
    void FinalClose();

private:
    using OpenFunction = std::int32_t(const char* name, const char* options, std::uintptr_t* handle);
    using CloseFunction = std::int32_t(std::uintptr_t handle);

    void LoadDLL();
    void ImplementInit();
    std::uintptr_t GetHandle_Internal(InterfaceLevel level);
    void CloseDriver();
    void UnloadDriver();
    void ForgetLibrary();

    std::uintptr_t sessionHandle = 0;
    DynamicString deviceName;
    DriverLibrary driverModule;
    OpenFunction* openSession = nullptr;
    CloseFunction* closeSession = nullptr;
};

}  // namespace sm
