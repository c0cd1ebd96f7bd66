// A session of the switch-management product, opened by its name through "qvrq.dll" and shared by
// every module of the process. Its handle is pointer-sized, so it is handed out only as VT_UI8.
#pragma once

#include <cstdint>
#include <string_view>

#include "sessions/DriverSession.h"

namespace sm {

class CRQInstrSession : public DriverSession<CRQInstrSession> {
public:

    static const CLSID& ClassId() { return CLSID_RQInstrSession; }
    static constexpr const char* ClassName() { return "CRQInstrSession"; }
    static VARTYPE HandleVariantType() { return VT_UI8; }

    STDMETHODIMP Initialize(BSTR options) override;
    // A 64-bit handle does not fit the obsolete 32-bit call.
    STDMETHODIMP GetHandle(InterfaceLevel level, LONG* handle) override;
    STDMETHODIMP GetVPPBaseInterface(IVPPBase** result) override;

    // The text the product opens; the manager gives it the session's name at creation.
    void SetDeviceName(std::string_view value) { deviceName.Assign(value); }

    // Hooks of DriverSession.
    std::uint64_t GetHandle_Internal(InterfaceLevel level);
    void CloseDriverHandle();
    void ForgetDriverFunctions();

private:
    using OpenFunction = std::int32_t(const char* name, const char* options, std::uintptr_t* handle);
    using CloseFunction = std::int32_t(std::uintptr_t handle);

    void LoadDLL();
    void ImplementInit();

    std::uintptr_t sessionHandle = 0;
    DynamicString deviceName;
    OpenFunction* openSession = nullptr;
    CloseFunction* closeSession = nullptr;
};

}  // namespace sm
