#include "sessions/RQInstrSession.h"

#include "framework/LanguageStrings.h"

namespace sm {

STDMETHODIMP CRQInstrSession::Initialize(BSTR) {
    return Locked([&] { ImplementInit(); });
}

STDMETHODIMP CRQInstrSession::GetHandle(InterfaceLevel, LONG* handle) {
    return Locked(handle, [&] {
        TE_RAISE(TE_INVALID_POINTER, QualifiedName("GetHandle").c_str(),
                 GetLanguageString("ERRORS", "ERROR_32_BIT_POINTER_WITH_64_BIT_PLATFORM"));
    });
}

// A switch session has no standard driver functions; the answer carries no error info.
STDMETHODIMP CRQInstrSession::GetVPPBaseInterface(IVPPBase** result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    return E_NOTIMPL;
}

void CRQInstrSession::LoadDLL() {
    LoadLibraryOnce("qvrq.dll", "CRQInstrSession::LoadDLL", [&] {
        openSession = library.Bind<OpenFunction>("qvRQ_OpenSession", "LoadFunctionPtr");
        closeSession = library.Bind<CloseFunction>("qvRQ_CloseSession", "LoadFunctionPtr");
    });
}

void CRQInstrSession::ImplementInit() {
    LoadDLL();
    if (initialized) return;
    std::uintptr_t opened = 0;
    std::int32_t status = openSession(deviceName.GetText(), "", &opened);
    if (status < 0)
        TE_RAISE(status, "CRQInstrSession::ImplementInit",
                 DriverStatusMessage("%1_init returned an error: %2 (0x%3).", deviceName.View(), status));
    sessionHandle = opened;
    initialized = true;
}

std::uint64_t CRQInstrSession::GetHandle_Internal(InterfaceLevel level) {
    RefuseOutsideProcess("RQ");
    switch (level) {
        case DefaultInterface:
        case SpecificDriver:
        case IODriver:
            ImplementInit();
            return sessionHandle;
        case ClassDriver:
            TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "CRQInstrSession::GetHandle_Internal");
        default:
            return 0;
    }
}

void CRQInstrSession::CloseDriverHandle() {
    if (closeSession) closeSession(sessionHandle);
    sessionHandle = 0;
}

void CRQInstrSession::ForgetDriverFunctions() {
    openSession = nullptr;
    closeSession = nullptr;
}

}  // namespace sm
