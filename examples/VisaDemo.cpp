// Two modules of one process share one VISA session: each asks the manager for the DMM by the same
// name, as modules of a test sequence do, gets the one VISA handle, and talks to the instrument
// through it with the VISA library's own calls; a third module opens a session by a VISA logical name. The VISA library is whatever "visa32.dll" the system finds; under the demo it is
// the simulated one, answering from sim/simsetup.ini.
#include <cstdio>
#include <string>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

using ViStatus = long;
using ViSession = unsigned long;
using QueryfFunction = ViStatus(ViSession, const char*, const char*, ...);
using WriteFunction = ViStatus(ViSession, const unsigned char*, unsigned long, unsigned long*);
using ReadFunction = ViStatus(ViSession, unsigned char*, unsigned long, unsigned long*);

std::string Narrow(BSTR text) {
    std::string narrow;
    for (const wchar_t* c = text; c && *c; ++c) narrow += static_cast<char>(*c);
    return narrow;
}

UniqueBstr Wide(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

bool Check(HRESULT result, const char* what) {
    if (SUCCEEDED(result)) return true;
    ComPtr<IErrorInfo> info;
    UniqueBstr description;
    if (::GetErrorInfo(0, info.Put()) == S_OK && info) info->GetDescription(description.Put());
    std::printf("%s failed: 0x%08lX %s\n", what, static_cast<unsigned long>(result), Narrow(description.Get()).c_str());
    return false;
}

// One module of the test sequence: it knows only the session's name.
LONG ModuleHandle(IInstrSessionMgr* manager, const wchar_t* name, const char* module, ComPtr<IInstrSession>& session) {
    auto text = Wide(name);
    if (!Check(manager->GetInstrSession(text.Get(), VARIANT_FALSE, session.Put()), "GetInstrSession")) return 0;
    UniqueVariant handle;
    if (!Check(session->GetHandleEx(DefaultInterface, handle.Get()), "GetHandleEx")) return 0;
    std::printf("%s: GetInstrSession(\"%ls\") -> session %p, GetHandleEx -> VT_I4 %ld\n", module, name,
                static_cast<void*>(session.Get()), handle->lVal);
    return handle->lVal;
}

int Run() {
    ComPtr<IInstrSessionMgr> manager;
    if (!Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                  manager.PutVoid()),
               "CoCreateInstance"))
        return 1;

    auto category = Wide(L"VISA"), filter = Wide(L"");
    UniqueSafeArray names;
    if (!Check(manager->GetNames(category.Get(), static_cast<GetNamesOptions>(ReturnLogicalNames | ReturnVirtualInstruments |
                                                                               IncludeCategoryPrefix),
                                 filter.Get(), names.Put()),
               "GetNames"))
        return 1;
    LONG upper = -1;
    ::SafeArrayGetUBound(names.Get(), 1, &upper);
    std::printf("GetNames(\"VISA\") lists %ld names:", upper + 1);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr name;
        ::SafeArrayGetElement(names.Get(), &index, name.Put());
        std::printf(" %s", Narrow(name.Get()).c_str());
    }
    std::printf("\n");

    ComPtr<IInstrSession> first, second;
    LONG handleA = ModuleHandle(manager.Get(), L"VISA::GPIB0::14::INSTR", "module A", first);
    LONG handleB = ModuleHandle(manager.Get(), L"VISA::GPIB0::14::INSTR", "module B", second);
    if (!handleA || !handleB) return 1;
    std::printf("one session object: %s, one handle: %s\n", first.Get() == second.Get() ? "yes" : "no",
                handleA == handleB ? "yes" : "no");

    // The modules talk to the instrument through the VISA library the manager loaded.
    HMODULE visa = ::GetModuleHandleA("visa32.dll");
    auto queryf = reinterpret_cast<QueryfFunction*>(reinterpret_cast<void*>(::GetProcAddress(visa, "viQueryf")));
    auto write = reinterpret_cast<WriteFunction*>(reinterpret_cast<void*>(::GetProcAddress(visa, "viWrite")));
    auto read = reinterpret_cast<ReadFunction*>(reinterpret_cast<void*>(::GetProcAddress(visa, "viRead")));
    // Only the simulated library counts its calls.
    auto opened = reinterpret_cast<long (*)(const char*)>(reinterpret_cast<void*>(::GetProcAddress(visa, "SimCounter")));
    if (!queryf || !write || !read) {
        std::printf("visa32.dll lacks viQueryf, viWrite or viRead\n");
        return 1;
    }
    char identity[256] = {};
    ViStatus status = queryf(static_cast<ViSession>(handleA), "*IDN?\n", "%t", identity);
    std::printf("module A: viQueryf(handle, \"*IDN?\") -> status %ld, \"%s\"\n", status, identity);
    const char command[] = "MEAS:VOLT:DC?\n";
    unsigned long count = 0;
    write(static_cast<ViSession>(handleB), reinterpret_cast<const unsigned char*>(command), sizeof command - 1, &count);
    unsigned char answer[256] = {};
    status = read(static_cast<ViSession>(handleB), answer, sizeof answer - 1, &count);
    std::printf("module B: viWrite \"MEAS:VOLT:DC?\", viRead -> status %ld, \"%.*s\"\n", status,
                static_cast<int>(count ? count - 1 : 0), reinterpret_cast<char*>(answer));
    if (opened) std::printf("viOpen calls for both modules: %ld\n", opened("viOpen"));

    ComPtr<IInstrSession> serial;
    if (ModuleHandle(manager.Get(), L"Serial1", "module C", serial)) {
        UniqueBstr category;
        serial->get_Category(category.Put());
        std::printf("module C: the logical name Serial1 opened a session of category %s\n", Narrow(category.Get()).c_str());
    }

    UniqueBstr state;
    if (!Check(first->get_StateDescription(state.Put()), "StateDescription")) return 1;
    std::printf("session StateDescription: %s", Narrow(state.Get()).c_str());
    long closedBefore = opened ? opened("viClose") : 0;
    if (!Check(first->Close(), "Close")) return 1;
    VARIANT_BOOL initialized = VARIANT_TRUE;
    first->IsInitialized(&initialized);
    std::printf("after Close: IsInitialized = %s; Close made %ld viClose calls (the handle, then its resource manager)\n",
                initialized ? "True" : "False", opened ? opened("viClose") - closedBefore : -1);
    std::printf("VisaDemo finished\n");
    return 0;
}

}  // namespace

int main() {
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 1;
    int result = Run();
    ::CoUninitialize();
    return result;
}
