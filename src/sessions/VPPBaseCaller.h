// Holder of a driver's bound VXIplug&play standard functions: error query, error message, reset,
// self test and revision query. Every session derives from it; only sessions with such a driver bind
// them, the others keep the table empty. The IVPPBase object (VPPBase.h) calls through this table.
#pragma once

#include <windows.h>

#include <string>
#include <string_view>

#include "com/DriverLibrary.h"
#include "sessions/ViTypes.h"

namespace sm {

class VPPBaseCaller {
public:
    // Every text buffer the standard functions fill is this large.
    static constexpr std::size_t bufferSize = 256;

    using ErrorQueryFunction = ViStatus(ViSession, ViInt32* errorCode, char* message);
    using ErrorMessageFunction = ViStatus(ViSession, ViStatus code, char* message);
    using ResetFunction = ViStatus(ViSession);
    using SelfTestFunction = ViStatus(ViSession, ViInt16* result, char* message);
    using RevisionQueryFunction = ViStatus(ViSession, char* driverRevision, char* firmwareRevision);

    virtual ~VPPBaseCaller() = default;

    // Makes the driver available and binds the five functions; nothing for a session without them.
    virtual void PrepareVPPBase() {}
    // The driver session the five functions are called with; may load and initialize the driver.
    virtual ViSession GetVPPSession() { return 0; }

    // Binds all five from `library` (nothing when bound already). A missing one raises
    // TE_FUNC_NOT_IN_LIB naming the first that is missing and leaves the table unbound.
    void Bind(const DriverLibrary& library, std::string_view prefix);
    // Forgets the table, for a driver that is unloaded (its addresses die with it).
    void Unbind();
    bool IsVPPBound() const { return boundModule != nullptr; }

    ErrorQueryFunction* errorQuery = nullptr;
    ErrorMessageFunction* errorMessage = nullptr;
    ResetFunction* resetFunction = nullptr;
    SelfTestFunction* selfTest = nullptr;
    RevisionQueryFunction* revisionQuery = nullptr;

private:
    std::string errorQueryName, errorMessageName, resetName, selfTestName, revisionQueryName;
    HMODULE boundModule = nullptr;
};

}  // namespace sm
