// Create/use/release cycles of sessions of every category on the simulated bench, looking for what a
// test executive running for days would accumulate: driver sessions left open, a module that cannot
// unload, handles and heap that grow. Run by scripts/leaks.sh, which installs the stand-ins and
// points the product at the demo bench (sim/simsetup.ini, C:\VXIPNP).
//
//   bench_leaks.exe [cycles per category]     (default 100000)
//
// Prints one LEAK row per category and a verdict; exits 1 on any failed call, an open count other
// than 0, or growth between the first and the last tenth of the cycles.
#include <windows.h>
#include <psapi.h>

#include "ProcessMemory.h"

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/LibraryBinding.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

using bench::HeapBytes;

// A stand-in pinned by the path the product loads it from, so that its counters outlive the
// product's FreeLibrary; opens and closes are the stand-in's own call counts.
struct Counted {
    const char* path;
    std::vector<const char*> opens;
    std::vector<const char*> closes;
    UniqueModule module{};
    long Sum(const std::vector<const char*>& names) const {
        auto read = module ? GetProcAddressAs<long(const char*)>(module.Get(), "SimCounter") : nullptr;
        long total = 0;
        for (const char* name : names) total += read ? read(name) : 0;
        return total;
    }
    long OpenCount() const { return Sum(opens) - Sum(closes); }
};

struct Category {
    const char* label;
    const wchar_t* name;
    bool handle;      // GetHandleEx opens the driver
    bool standardVpp; // IVPPBase reaches the driver's standard functions
    Counted counted;
};


// Open kernel handles of this process. Wine answers GetProcessHandleCount with 0, so the handle
// table is probed value by value (handles are multiples of 4).
DWORD HandleCount() {
    DWORD count = 0, flags = 0;
    for (std::uintptr_t value = 4; value < 0x2000; value += 4)
        if (::GetHandleInformation(reinterpret_cast<HANDLE>(value), &flags)) ++count;
    return count;
}

UniqueBstr Text(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

std::string ErrorText() {
    ComPtr<IErrorInfo> info;
    UniqueBstr description;
    if (::GetErrorInfo(0, info.Put()) == S_OK && info) info->GetDescription(description.Put());
    if (!description) return "(no error info)";
    std::string text;
    for (const wchar_t* at = description.Get(); *at; ++at) text += static_cast<char>(*at < 128 ? *at : '?');
    return text;
}

// One cycle: the session made or found, used as a module uses it, and let go (the last release
// closes its driver session).
HRESULT Cycle(IInstrSessionMgr* manager, const Category& category, long index) {
    ComPtr<IInstrSession> session;
    HRESULT result = manager->GetInstrSession(Text(category.name).Get(), VARIANT_FALSE, session.Put());
    if (FAILED(result)) return result;
    if (FAILED(result = session->AttachLong(Text(L"Count").Get(), index))) return result;
    if (FAILED(result = session->AttachString(Text(L"Text").Get(), Text(L"a value of some length").Get()))) return result;
    if (FAILED(result = session->LockSession(Text(L"LeakKey").Get(), 0, 0))) return result;
    if (FAILED(result = session->LockSession(Text(L"leakkey").Get(), 1, 0))) return result;
    session->UnlockSession();
    if (FAILED(result = session->UnlockSession())) return result;
    if (category.handle) {
        VARIANT handle;
        ::VariantInit(&handle);
        if (FAILED(result = session->GetHandleEx(DefaultInterface, &handle))) return result;
    }
    if (category.standardVpp) {
        ComPtr<IVPPBase> standard;
        if (FAILED(result = session->GetVPPBaseInterface(standard.Put()))) return result;
        UniqueBstr driver, firmware;
        LONG status = 0;
        if (FAILED(result = standard->Revision_Query(driver.Put(), firmware.Put(), &status))) return result;
    }
    return session->DetachData(Text(L"").Get());
}

struct Tenth {
    double handles = 0;
    double heap = 0;
};

}  // namespace

int main(int argc, char** argv) {
    long cycles = argc > 1 ? std::atol(argv[1]) : 100000;
    if (cycles < 10) cycles = 10;
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 2;

    Category categories[] = {
        {"CUSTOM", L"CUSTOM::LeakCycle", false, false, {nullptr, {}, {}}},
        {"VISA", L"VISA::GPIB0::14::INSTR", true, false, {"visa32.dll", {"viOpenDefaultRM", "viOpen"}, {"viClose"}}},
        {"VXIPNP", L"VXIPNP::DMM1", true, true, {"C:\\VXIPNP\\Win64\\Bin\\simdmm_64.dll", {"init"}, {"close"}}},
        {"IVI", L"IVI::MyDmm", true, true, {"IviDmm_64.dll", {"IviDmm_init", "IviDmm_InitWithOptions"}, {"IviDmm_close"}}},
        {"RQ", L"RQ::DmmToDut", true, false, {"qvrq.dll", {"qvRQ_OpenSession"}, {"qvRQ_CloseSession"}}},
    };
    for (Category& category : categories)
        if (category.counted.path) category.counted.module.Reset(::LoadLibraryA(category.counted.path));

    bool sound = true;
    {
        ComPtr<IInstrSessionMgr> manager;
        if (FAILED(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                      manager.PutVoid()))) {
            std::printf("the manager could not be created: is SessionMgr.dll registered?\n");
            return 2;
        }
        std::printf("LEAK|category|cycles|failed calls|open count|handles first tenth|handles last tenth|"
                    "heap bytes first tenth|heap bytes last tenth|verdict\n");
        for (const Category& category : categories) {
            long failures = 0;
            Tenth first, last;
            const long tenth = cycles / 10, samples = 10, every = tenth / samples > 0 ? tenth / samples : 1;
            DWORD started = ::GetTickCount();
            for (long index = 0; index < cycles; ++index) {
                HRESULT result = Cycle(manager.Get(), category, index);
                if (FAILED(result) && failures++ == 0)
                    std::printf("%s: cycle %ld failed: 0x%08lX %s\n", category.label, index,
                                static_cast<unsigned long>(result), ErrorText().c_str());
                // The first tenth is sampled after its first cycle: one-time loads are not growth.
                bool inFirst = index >= 1 && index <= tenth, inLast = index >= cycles - tenth;
                if ((inFirst || inLast) && index % every == 0) {
                    Tenth& into = inFirst ? first : last;
                    into.handles += static_cast<double>(HandleCount()) / samples;
                    into.heap += static_cast<double>(HeapBytes()) / samples;
                }
            }
            long open = category.counted.path ? category.counted.OpenCount() : 0;
            // Flat: the last tenth holds at most one more handle and 64 KB more heap than the first
            // (the sampling itself and the allocator's free lists move by a few kilobytes).
            bool flat = last.handles <= first.handles + 1 && last.heap <= first.heap + 65536;
            bool ok = failures == 0 && open == 0 && flat;
            sound = sound && ok;
            std::printf("LEAK|%s|%ld|%ld|%ld|%.0f|%.0f|%.0f|%.0f|%s (%lu s)\n", category.label, cycles, failures, open,
                        first.handles, last.handles, first.heap, last.heap, ok ? "sound" : "LEAKS OR FAILS",
                        (::GetTickCount() - started) / 1000ul);
            std::fflush(stdout);
        }
    }
    HMODULE product = ::GetModuleHandleA("SessionMgr.dll");
    auto canUnload = product ? GetProcAddressAs<HRESULT()>(product, "DllCanUnloadNow") : nullptr;
    HRESULT unload = canUnload ? canUnload() : E_FAIL;
    std::printf("DllCanUnloadNow after the last release: %s\n", unload == S_OK ? "S_OK" : "not S_OK");
    sound = sound && unload == S_OK;
    for (Category& category : categories) category.counted.module.Reset();
    ::CoUninitialize();
    std::printf("%s\n", sound ? "leak cycles: sound" : "leak cycles: FAILED");
    return sound ? 0 : 1;
}
