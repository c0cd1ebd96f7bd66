// Reaching the managers of the shared external processes.
#include "com/BstrConversion.h"
#include "com/ComError.h"
#include "framework/TEException.h"
#include "manager/ExternalProcessServer.h"
#include "manager/InstrSessionMgr.h"
#include "sessions/LifeTimeAlerts.h"

namespace sm {

namespace {
constexpr const char* getExternalMgr = "CInstrSessionMgr::GetExternalMgr";
constexpr DWORD activate64BitServer = 0x80000;
constexpr DWORD activate32BitServer = 0x40000;
// Not one of the table's named codes; the connection failures carry it as their TE code.
constexpr std::int32_t TE_OS_EXCEPTION = -17502;

std::string DescriptionOf(const ComError& error) {
    if (!error.ErrorInfo()) return {};
    UniqueBstr description;
    error.ErrorInfo()->GetDescription(description.Put());
    return BstrToMultiByte(description.Get());
}

// A COM failure of one stage becomes a TE error with the stage's explanation after its description.
template <class Stage>
void RunStage(Stage&& stage, const char* explanation) {
    try {
        stage();
    } catch (const ComError& error) {
        std::string message = DescriptionOf(error) + explanation;
        TE_RAISE(error.Error(), getExternalMgr, RaiseDetails{.message = message, .messageIsString = true});
    } catch (const TEException&) {
        throw;
    } catch (...) {
        TE_RAISE(TE_OS_EXCEPTION, getExternalMgr, "An error occurred connecting to the external process.\n");
    }
}
}  // namespace

ComPtr<IInstrSessionMgr> CInstrSessionMgr::GetExternalMgr(int index) {
    CriticalSectionGuard guard(lock);
    if (inExternalProcess) TE_RAISE(TE_PROGRAM_ERROR, getExternalMgr);
    // The external flag and the alert setting were given to this manager when it was obtained;
    // later alert settings reach it through put_AudibleLifeTimeAlerts.
    if (externalManager[index]) return externalManager[index];

    ComPtr<IExternalProcessServer> server;
    RunStage(
        [&] {
            if (externalServer[index]) {
                HRESULT queried = externalServer[index]->QueryInterface(IID_IExternalProcessServer, server.PutVoid());
                if (FAILED(queried) && queried != E_NOINTERFACE) ThrowComError(queried);
                return;
            }
            DWORD context = CLSCTX_LOCAL_SERVER | (index == 0 ? activate64BitServer : activate32BitServer);
            ComPtr<IUnknown> started;
            if (FAILED(::CoCreateInstance(CLSID_ExternalProcessServer, nullptr, context, IID_IUnknown, started.PutVoid())))
                return;
            if (FAILED(::OleRun(started.Get()))) return;
            if (FAILED(started->QueryInterface(IID_IExternalProcessServer, server.PutVoid()))) return;
            externalServer[index] = ComPtr<IUnknown>(server.Get());
        },
        "An error occurred connecting to the external process.\n");

    ComPtr<IUnknown> created;
    RunStage(
        [&] {
            if (!server) throw ComError(E_POINTER);
            UniqueBstr clsidText(::SysAllocString(L"{7D4A10B1-2C88-4E21-B3F6-91E5A07D2C3B}"));
            UniqueBstr iidText(::SysAllocString(L"{7D4A10B0-2C88-4E21-B3F6-91E5A07D2C3B}"));
            CheckHResult(server->CreateObjectInServer(clsidText.Get(), iidText.Get(), created.Put()));
        },
        "An error occurred creating the session manager in the external process.\nRestart Verentis to recover.\n");

    if (!created) throw ComError(E_POINTER);
    ComPtr<IInstrSessionMgr> external;
    HRESULT queried = created->QueryInterface(IID_IInstrSessionMgr, external.PutVoid());
    if (queried != S_OK) throw ComError(FAILED(queried) ? queried : E_NOINTERFACE);
    external->put_InExternalProcess(VARIANT_TRUE);
    external->put_AudibleLifeTimeAlerts(AudibleLifeTimeAlertsEnabled() ? VARIANT_TRUE : VARIANT_FALSE);
    externalManager[index] = external;
    return external;
}

}  // namespace sm
