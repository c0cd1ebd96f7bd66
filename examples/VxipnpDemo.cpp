// A C++ client of the registered SessionMgr DLL on a VXIplug&play instrument: the logical name DMM1
// and the virtual instrument BenchDMM give one session, the session opens the driver and shares its
// handle, and IVPPBase calls the driver's five standard functions. ./scripts/demo.sh installs the
// simulated driver (sim/vxipnp) and its configuration before it runs this.
#include <cstdio>
#include <string>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

std::string Narrow(BSTR text) {
    if (!text || !*text) return {};
    int length = static_cast<int>(::SysStringLen(text));
    int bytes = ::WideCharToMultiByte(CP_ACP, 0, text, length, nullptr, 0, nullptr, nullptr);
    std::string narrow(static_cast<std::size_t>(bytes), '\0');
    ::WideCharToMultiByte(CP_ACP, 0, text, length, narrow.data(), bytes, nullptr, nullptr);
    return narrow;
}

struct Failure {
    HRESULT result;
    const char* what;
};

void Check(HRESULT result, const char* what) {
    if (FAILED(result)) throw Failure{result, what};
}

ComPtr<IInstrSession> GetSession(IInstrSessionMgr* manager, const wchar_t* name) {
    ComPtr<IInstrSession> session;
    UniqueBstr text(::SysAllocString(name));
    Check(manager->GetInstrSession(text.Get(), VARIANT_FALSE, session.Put()), "GetInstrSession");
    return session;
}

void ShowStandardFunctions(IVPPBase* vpp) {
    LONG status = 0, code = 0;
    UniqueBstr text, firmware;
    Check(vpp->Error_Query(&code, text.Put(), &status), "Error_Query");
    std::printf("Error_Query:    status %ld, error %ld \"%s\"\n", status, code, Narrow(text.Get()).c_str());
    Check(vpp->Error_Message(-1073807343, text.Put(), &status), "Error_Message");
    std::printf("Error_Message(-1073807343): status %ld, \"%s\"\n", status, Narrow(text.Get()).c_str());
    Check(vpp->Error_Message(-1, text.Put(), &status), "Error_Message");
    std::printf("Error_Message(-1): status 0x%08lX, \"%s\"\n", static_cast<unsigned long>(status), Narrow(text.Get()).c_str());
    Check(vpp->Revision_Query(text.Put(), firmware.Put(), &status), "Revision_Query");
    std::printf("Revision_Query: status %ld, driver \"%s\", firmware \"%s\"\n", status, Narrow(text.Get()).c_str(),
                Narrow(firmware.Get()).c_str());
    short result = 0;
    Check(vpp->Self_Test(&result, text.Put(), &status), "Self_Test");
    std::printf("Self_Test:      status %ld, result %d \"%s\"\n", status, result, Narrow(text.Get()).c_str());
    Check(vpp->Reset(&status), "Reset");
    std::printf("Reset:          status %ld\n", status);
}

}  // namespace

int main() {
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 1;
    int exitCode = 0;
    try {
        ComPtr<IInstrSessionMgr> manager;
        Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                 manager.PutVoid()),
              "CoCreateInstance(InstrSessionMgr)");
        auto byLogicalName = GetSession(manager.Get(), L"VXIPNP::DMM1");
        auto byInstrument = GetSession(manager.Get(), L"VXIPNP::BenchDMM");
        std::printf("\"VXIPNP::DMM1\" and \"VXIPNP::BenchDMM\" give %s\n",
                    byLogicalName.Get() == byInstrument.Get() ? "the same session" : "DIFFERENT sessions");
        VARIANT handle;
        ::VariantInit(&handle);
        Check(byLogicalName->GetHandleEx(DefaultInterface, &handle), "GetHandleEx");
        std::printf("GetHandleEx(DefaultInterface): VT_I4 = %d, handle 0x%lX from simdmm_init\n", handle.vt == VT_I4,
                    static_cast<unsigned long>(handle.lVal));
        ComPtr<IVPPBase> vpp;
        Check(byInstrument->GetVPPBaseInterface(vpp.Put()), "GetVPPBaseInterface");
        ShowStandardFunctions(vpp.Get());
        UniqueBstr state;
        Check(byInstrument->get_StateDescription(state.Put()), "get_StateDescription");
        std::printf("Session state:\n%s", Narrow(state.Get()).c_str());
        std::printf("VxipnpDemo finished\n");
    } catch (const Failure& failure) {
        std::printf("%s failed: HRESULT 0x%08lX\n", failure.what, static_cast<unsigned long>(failure.result));
        exitCode = 1;
    }
    ::CoUninitialize();
    return exitCode;
}
