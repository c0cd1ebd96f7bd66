// Session of category "IVI": one IVI virtual instrument seen through one IVI class, sharing one open
// IVI-C driver session among all modules of the process. The class driver "<class>_64.dll" is
// preferred; without it the instrument's specific driver is used. Handles are handed out per
// interface level (class, specific, I/O).
#pragma once

#include <cstdint>

#include "com/DriverLibrary.h"
#include "sessions/DriverSession.h"
#include "sources/IviEntry.h"

namespace sm {

class CIVIInstrSession : public DriverSession<CIVIInstrSession> {
public:
    static const CLSID& ClassId() { return CLSID_IVIInstrSession; }
    static constexpr const char* ClassName() { return "CIVIInstrSession"; }

    // The manager hands over a copy of the configuration entry right after creation.
    void SetEntry(const IviEntry& configured) { entry = configured; }

    STDMETHODIMP Initialize(BSTR options) override;
    STDMETHODIMP GetCOMDriver(InterfaceLevel level, IUnknown** driver) override;

    void GetName(String& result) const override;
    void GetCategory(String& result) const override;
    bool HasName(std::string_view candidate) const override;
    bool AcceptsSubcategory(std::string_view subCategory) const override;
    void PrepareVPPBase() override;
    ViSession GetVPPSession() override;

    // DriverSession hooks.
    std::uint64_t GetHandle_Internal(InterfaceLevel level) { return GetHandle_Internal(level, true); }
    void CloseDriverHandle();
    void ForgetDriverFunctions() { functions = Functions{}; }
    void AppendStateHeader(String& text) const;

private:
    struct Functions {
        ViStatus (*init)(const char*, ViBoolean, ViBoolean, ViSession*) = nullptr;
        ViStatus (*initWithOptions)(const char*, ViBoolean, ViBoolean, const char*, ViSession*) = nullptr;
        ViStatus (*errorMessage)(ViSession, ViStatus, char*) = nullptr;
        ViStatus (*getAttributeViSession)(ViSession, const char*, std::uint32_t, ViSession*) = nullptr;
        ViStatus (*close)(ViSession) = nullptr;
        ViStatus (*getErrorInfo)(ViSession, ViStatus*, ViStatus*, char*) = nullptr;
        ViStatus (*getError)(ViSession, ViStatus*, std::int32_t, char*) = nullptr;
        ViStatus (*getSpecificDriverCHandle)(ViSession, ViSession*) = nullptr;
    };

    std::string MakeClassDriverPath() const;
    const DynamicString& ActivePrefix() const { return usingClassDriver ? entry.iviClass : entry.prefix; }
    void LoadDriver();
    void BindDriverFunctions();
    void ImplementInit(std::string_view options);
    void ChooseResourceName(String& resource) const;
    void ReadInitOptions(String& options, bool& idQuery, bool& reset) const;
    [[noreturn]] void RaiseDriverError(ViStatus status, const char* pattern, const char* function);
    void AppendDriverErrorDetails(String& message, ViStatus status);
    ViSession GetHandle_Internal(InterfaceLevel level, bool checkProcess);
    void StripClassQualifier(String& name) const;

    ViSession viSession = 0;
    bool usingClassDriver = false;
    IviEntry entry;
    Functions functions;
};

}  // namespace sm
