#include "sessions/RQInstrSession.h"

#include <cstdio>

#include "framework/LanguageStrings.h"

namespace sm {
namespace {

constexpr const char* libraryName = "qvrq.dll";

}  // namespace

CRQInstrSession::~CRQInstrSession() { FinalClose(); }

void CRQInstrSession::FinalClose() {
    CriticalSectionGuard guard(objectLock);
    closeEnabled = true;
    UnloadDriver();
}

STDMETHODIMP CRQInstrSession::Initialize(BSTR) {
    return Locked([&] { ImplementInit(); });
}

STDMETHODIMP CRQInstrSession::GetHandle(InterfaceLevel, LONG* handle) {
    return Locked(handle, [&] {
        TE_RAISE(TE_INVALID_POINTER, QualifiedName("GetHandle").c_str(),
                 GetLanguageString("ERRORS", "ERROR_32_BIT_POINTER_WITH_64_BIT_PLATFORM"));
    });
}

STDMETHODIMP CRQInstrSession::GetHandleEx(InterfaceLevel level, VARIANT* handle) {
    return Locked(handle, [&] {
        std::uintptr_t value = GetHandle_Internal(level);
        handle->vt = VT_UI8;
        handle->ullVal = value;
    });
}

STDMETHODIMP CRQInstrSession::GetCOMDriver(InterfaceLevel, IUnknown** driver) {
    return Locked(driver, [&] { TE_RAISE(TE_OPERATION_FAILED, QualifiedName("GetCOMDriver").c_str()); });
}

STDMETHODIMP CRQInstrSession::Close() {
    return Locked([&] { CloseDriver(); });
}

void CRQInstrSession::LoadDLL() {
    if (driverModule.IsLoaded()) return;
    try {
        driverModule.Load(libraryName, "CRQInstrSession::LoadDLL");
        driverLibraryPath.Assign(libraryName);
        openSession = driverModule.Bind<OpenFunction>("qvRQ_OpenSession", "LoadFunctionPtr");
        closeSession = driverModule.Bind<CloseFunction>("qvRQ_CloseSession", "LoadFunctionPtr");
    } catch (...) {
        // Nothing was opened yet: only the library goes. The close actions stay for the real close.
        ForgetLibrary();
        throw;
    }
}

void CRQInstrSession::ImplementInit() {
    LoadDLL();
    if (initialized) return;
    std::uintptr_t opened = 0;
    std::int32_t status = openSession(deviceName.GetText(), "", &opened);
    if (status < 0) {
        char hex[16];
        std::snprintf(hex, sizeof hex, "%x", static_cast<unsigned>(static_cast<std::uint32_t>(status)));
        DynamicString message("%1_init returned an error: %2 (0x%3).");
        message.ReplaceArg(1, deviceName.View());
        message.ReplaceArg(2, static_cast<std::int64_t>(status), "%d");
        message.ReplaceArg(3, std::string_view(hex));
        TE_RAISE(status, "CRQInstrSession::ImplementInit", message);
    }
    sessionHandle = opened;
    initialized = true;
}

std::uintptr_t CRQInstrSession::GetHandle_Internal(InterfaceLevel level) {
    if (inExternalProcess)
        TE_RAISE(TE_OPERATION_FAILED, "CRQInstrSession::GetHandle_Internal",
                 "RQ instrument handles cannot be used outside of the operating system process that they are "
                 "created in.");
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

void CRQInstrSession::CloseDriver() {
    if (!closeEnabled) return;
    RunCloseActions(Self());
    if (initialized && driverModule.IsLoaded() && closeSession) {
        closeSession(sessionHandle);
        initialized = false;
        sessionHandle = 0;
    }
}

void CRQInstrSession::UnloadDriver() {
    try {
        CloseDriver();
    } catch (...) {
        // Unloading goes on: the library must not stay bound to a session that is going away.
    }
    ForgetLibrary();
}

void CRQInstrSession::ForgetLibrary() {
    openSession = nullptr;
    closeSession = nullptr;
    if (driverModule.IsLoaded()) {
        driverModule.Unload();
        driverLibraryPath.Assign("");
    }
}

}  // namespace sm
