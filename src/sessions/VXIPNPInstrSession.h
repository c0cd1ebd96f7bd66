// Session of category "VXIPNP": one VXIplug&play virtual instrument of the configuration file. The
// session loads the instrument's driver DLL, opens it once with <prefix>_init on the configured
// resource, hands the driver's handle to every module of the process and closes it with
// <prefix>_close. The driver's standard functions are offered through IVPPBase.
#pragma once

#include "sessions/DriverSession.h"
#include "sources/VxipnpInfo.h"

namespace sm {

class CVXIPNPInstrSession : public DriverSession<CVXIPNPInstrSession> {
public:
    static const CLSID& ClassId() { return CLSID_VXIPNPInstrSession; }
    static constexpr const char* ClassName() { return "CVXIPNPInstrSession"; }

    using DriverInit = ViStatus(ViConstRsrc resource, ViBoolean idQuery, ViBoolean reset, ViSession* vi);
    using DriverClose = ViStatus(ViSession vi);


    // Set by the manager when it creates the session for a found virtual instrument.
    void SetVirtualInstrument(const VxipnpVInstr& instrument) { vinstr = instrument; }

    // The options are not used: ID query and reset come from the configuration file.
    STDMETHODIMP Initialize(BSTR options) override;

    // A logical name finds the session of its virtual instrument, and the instrument name too.
    bool HasName(std::string_view candidate) const override;
    void AppendNames(StringVector& names) const override;
    void PrepareVPPBase() override;
    ViSession GetVPPSession() override;

    // DriverSession hooks.
    std::uint64_t GetHandle_Internal(InterfaceLevel level);
    void CloseDriverHandle();
    void ForgetDriverFunctions();
    void AppendStateHeader(String& text) const;

private:
    void LoadDLL();
    void ImplementInit();

    VxipnpVInstr vinstr;
    ViSession vi = 0;
    DriverInit* initFunction = nullptr;
    // Not "closeFunction": that name is the callers' close function of every session.
    DriverClose* driverCloseFunction = nullptr;
};

}  // namespace sm
