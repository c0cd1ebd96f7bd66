#include "sessions/VXIPNPInstrSession.h"

#include <string>

#include "com/LoadFunctionPtr.h"

namespace sm {


STDMETHODIMP CVXIPNPInstrSession::Initialize(BSTR) {
    return Locked([&] { ImplementInit(); });
}

bool CVXIPNPInstrSession::HasName(std::string_view candidate) const {
    return SessionBase::HasName(candidate) || ContainsName(vinstr.names, candidate);
}

void CVXIPNPInstrSession::AppendNames(StringVector& names) const {
    SessionBase::AppendNames(names);
    for (const auto& entry : vinstr.names) names.push_back(entry.name);
}

void CVXIPNPInstrSession::LoadDLL() {
    LoadLibraryOnce(vinstr.modulePath.GetText(), "CVXIPNPInstrSession::LoadDLL", [&] {
        const std::string prefix(vinstr.prefix.View());
        LoadFunctionPtr(initFunction, library, (prefix + "_init").c_str());
        LoadFunctionPtr(driverCloseFunction, library, (prefix + "_close").c_str());
    });
}

void CVXIPNPInstrSession::ImplementInit() {
    LoadDLL();
    if (initialized) return;
    ViSession opened = 0;
    ViStatus status = initFunction(vinstr.resource.GetText(), ToViBoolean(vinstr.idQuery), ToViBoolean(vinstr.reset), &opened);
    if (status < 0)
        TE_RAISE(status, "CVXIPNPInstrSession::ImplementInit",
                 DriverStatusMessage("%1_init returned an error: %2 (0x%3).", vinstr.prefix.View(), status));
    vi = opened;
    initialized = true;
}

std::uint64_t CVXIPNPInstrSession::GetHandle_Internal(InterfaceLevel level) {
    RefuseOutsideProcess("VXI-PNP");
    switch (level) {
    case DefaultInterface:
    case SpecificDriver:
    case IODriver:
        ImplementInit();
        return vi;
    case ClassDriver:
        TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "CVXIPNPInstrSession::GetHandle_Internal");
    default:
        return 0;
    }
}

void CVXIPNPInstrSession::PrepareVPPBase() {
    LoadDLL();
    Bind(library, vinstr.prefix.View());
}

// IVPPBase objects call this without the session's own lock held; initializing on demand changes
// the session, so it takes that lock here.
ViSession CVXIPNPInstrSession::GetVPPSession() {
    CriticalSectionGuard guard(objectLock);
    ImplementInit();
    return vi;
}

void CVXIPNPInstrSession::CloseDriverHandle() {
    ViSession open = vi;
    vi = 0;
    if (driverCloseFunction) driverCloseFunction(open);
}

void CVXIPNPInstrSession::ForgetDriverFunctions() {
    initFunction = nullptr;
    driverCloseFunction = nullptr;
}

void CVXIPNPInstrSession::AppendStateHeader(String& text) const {
    DynamicString value;
    text.Append("   Name: ");
    GetName(value);
    text.Append(value);
    text.Append(", Category: ");
    GetCategory(value);
    text.Append(value);
    text.Append("\nName List: ");
    AppendNameListText(vinstr.names, text);
    text.Append("\n      Initialized: ").Append(initialized ? "True" : "False");
    text.Append(", Loaded: ").Append(library.IsLoaded() ? "True" : "False");
    text.Append(inExternalProcess ? ", Out of Process" : ", In Process");
    text.Append(", Module Path: ").Append(vinstr.modulePath.View()).Append("\n");
}

}  // namespace sm
