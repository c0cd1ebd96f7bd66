// Session lookup, late binding, memory per session and name listing through the registered DLL,
// each against its reference in the same run (see docs/benchmarks.md):
//
//   P1  GetInstrSession hit with 1,000 live sessions of mixed categories / with 1 live session
//   P3  late-bound GetInstrSession hit / late-bound IsInitialized, both through IDispatch::Invoke
//   M1  private bytes per live custom session, 10,000 sessions with two data items each
//   P7  GetNames("") over 7,550 names: 2,500 each of VISA, VXIplug&play and IVI and 50 switch
//       devices (the stand-ins installed by scripts/bench.sh read them from one simulated setup
//       file; the switch stand-in costs about 10 ms per device, so more would make a run take
//       minutes) / building the same SAFEARRAY from a vector
//
//   P7.a-c  the floor under P7: the outside libraries' own calls that one GetNames("") makes,
//       made directly (bench/ListingFloor.h), against GetNames("") and against the reference
//
// Prints ROW lines (bench/BenchReport.h) and a few notes.
#include <windows.h>
#include <psapi.h>

#include "ProcessMemory.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <string>
#include <vector>

#include "BenchReport.h"
#include "ListingFloor.h"
#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

using bench::HeapBytes;
using bench::PrivateBytes;

constexpr int otherSessions = 999;        // with the target: 1,000 live sessions
constexpr int configuredInstruments = 1250;  // VXIplug&play, with as many logical names: 2,500 names
constexpr int visaResources = 2500;
constexpr int iviInstruments = 1250;          // with as many logical names: 2,500 names
constexpr int switchDevices = 50;             // the listing names the devices (with a group and 48 routes each)
constexpr int memorySessions = 10000;

[[noreturn]] void Fail(const char* what, HRESULT result) {
    std::printf("%s failed: HRESULT 0x%08lX\n", what, static_cast<unsigned long>(result));
    std::exit(1);
}

void Check(HRESULT result, const char* what) {
    if (FAILED(result)) Fail(what, result);
}

UniqueBstr Bstr(const std::wstring& text) { return UniqueBstr(::SysAllocString(text.c_str())); }

double Now() {
    static LARGE_INTEGER frequency = [] {
        LARGE_INTEGER value;
        ::QueryPerformanceFrequency(&value);
        return value;
    }();
    LARGE_INTEGER counter;
    ::QueryPerformanceCounter(&counter);
    return static_cast<double>(counter.QuadPart) / static_cast<double>(frequency.QuadPart);
}

// Time per call of the fastest batch: on a loaded machine the fastest batch is the one least
// disturbed by other processes.
double BestBatch(const std::function<void()>& call, int callsPerBatch) {
    double start = Now();
    for (int index = 0; index < callsPerBatch; ++index) call();
    return (Now() - start) / callsPerBatch;
}

struct Pair {
    double figure = 1e30;
    double reference = 1e30;
};

// Figure and reference batches alternate so that both see the same load.
Pair Interleaved(const std::function<void()>& figure, const std::function<void()>& reference, int callsPerBatch,
                 int batches) {
    Pair best;
    for (int batch = 0; batch < batches; ++batch) {
        best.figure = std::min(best.figure, BestBatch(figure, callsPerBatch));
        best.reference = std::min(best.reference, BestBatch(reference, callsPerBatch));
    }
    return best;
}

std::string Micro(double seconds) {
    char text[64];
    std::snprintf(text, sizeof text, "%.2f us", seconds * 1e6);
    return text;
}

struct Memory {
    std::size_t privateBytes = PrivateBytes();
    std::size_t heapBytes = HeapBytes();
};

// Per item: private bytes where the platform counts them, else heap bytes; says which.
double PerItem(const Memory& before, const Memory& after, std::size_t items, const char*& kind) {
    if (after.privateBytes > before.privateBytes) {
        kind = "private bytes";
        return static_cast<double>(after.privateBytes - before.privateBytes) / static_cast<double>(items);
    }
    kind = "heap bytes (private bytes read 0 here)";
    return static_cast<double>(after.heapBytes - before.heapBytes) / static_cast<double>(items);
}

// A VXIplug&play directory whose configuration file names configuredInstruments virtual
// instruments and one logical name for each.
void WriteConfiguration() {
    char temp[MAX_PATH];
    ::GetTempPathA(MAX_PATH, temp);
    std::string root = std::string(temp) + "SessionMgrLookupBench";
    ::CreateDirectoryA(root.c_str(), nullptr);
    ::CreateDirectoryA((root + "\\Win64").c_str(), nullptr);
    std::ofstream file(root + "\\Win64\\QVSessionMgr.ini", std::ios::binary);
    file << "[VXIPNP Logical Names]\r\n";
    for (int index = 0; index < configuredInstruments; ++index)
        file << "Logical" << index << " = \"VPPVInstr->VInstr" << index << "\"\r\n";
    file << "\r\n";
    for (int index = 0; index < configuredInstruments; ++index)
        file << "[VPPVInstr->VInstr" << index << "]\r\nModulePath = \"C:\\\\VXIPNP\\\\Win64\\\\Bin\\\\simdmm_64.dll\"\r\n"
             << "Prefix = \"simdmm\"\r\nResource = \"GPIB0::" << (index % 31) << "::INSTR\"\r\nIDQuery = True\r\nReset = True\r\n\r\n";
    file.close();
    ::SetEnvironmentVariableA("VXIPNPPATH", root.c_str());

    // The other three kinds: one simulated setup file for the VISA, IVI and switch stand-ins.
    std::ofstream setup(root + "\\simsetup.ini", std::ios::binary);
    for (int index = 0; index < visaResources; ++index)
        setup << "[VISA TCPIP0::10.0." << index / 256 << "." << index % 256 << "::inst0::INSTR]\r\n";
    for (int device = 0; device < switchDevices; ++device) {
        setup << "[RQ SwitchDev" << device << "]\r\nRouteGroups = Group" << device << "\r\nRoutes = ";
        for (int route = 0; route < 48; ++route) setup << (route ? ", " : "") << "Route" << device << "_" << route;
        setup << "\r\n";
    }
    setup << "[IVI]\r\nChangeCount = 1\r\n";
    for (int index = 0; index < iviInstruments; ++index)
        setup << "[IVI Instrument Dmm" << index << "]\r\nDriverSession = SimDmm\r\n";
    setup << "[IVI DriverSession SimDmm]\r\nPrefix = simdmm\r\n"
          << "Module = C:\\Program Files\\IVI Foundation\\IVI\\Bin\\simdmm_64.dll\r\nClasses = IviDmm\r\n"
          << "[IVI LogicalNames]\r\n";
    for (int index = 0; index < iviInstruments; ++index) setup << "IviLogical" << index << " = Dmm" << index << "\r\n";
    setup.close();
    ::SetEnvironmentVariableA("SM_SIM_SETUP", (root + "\\simsetup.ini").c_str());
}

ComPtr<IInstrSession> Get(IInstrSessionMgr* manager, const std::wstring& name) {
    ComPtr<IInstrSession> session;
    auto text = Bstr(name);
    HRESULT result = manager->GetInstrSession(text.Get(), VARIANT_FALSE, session.Put());
    if (FAILED(result)) {
        std::printf("GetInstrSession(\"%ls\"):\n", name.c_str());
        Fail("GetInstrSession", result);
    }
    return session;
}

DISPID DispatchId(IDispatch* object, const wchar_t* name) {
    DISPID id = 0;
    auto* names = const_cast<LPOLESTR>(name);
    Check(object->GetIDsOfNames(IID_NULL, &names, 1, LOCALE_USER_DEFAULT, &id), "GetIDsOfNames");
    return id;
}

void LookupAndLateBinding(IInstrSessionMgr* manager) {
    const std::wstring targetName = L"CUSTOM::LookupTarget";
    auto target = Get(manager, targetName);
    auto targetText = Bstr(targetName);
    auto hit = [&] {
        IInstrSession* found = nullptr;
        Check(manager->GetInstrSession(targetText.Get(), VARIANT_FALSE, &found), "GetInstrSession hit");
        found->Release();
    };

    // P1: the target is the only session, then the last of 1,000 of mixed categories; three rounds.
    Pair p1;
    for (int round = 0; round < 3; ++round) {
        for (int batch = 0; batch < 5; ++batch) p1.reference = std::min(p1.reference, BestBatch(hit, 2000));
        std::vector<ComPtr<IInstrSession>> others;
        for (int index = 0; index < otherSessions; ++index) {
            static const wchar_t* const categories[] = {L"CUSTOM::Other", L"RQ::Other", L"VXIPNP::VInstr"};
            others.push_back(Get(manager, categories[index % 3] + std::to_wstring(index)));
        }
        target.Reset();
        target = Get(manager, targetName);  // now the last of the table
        for (int batch = 0; batch < 5; ++batch) p1.figure = std::min(p1.figure, BestBatch(hit, 2000));
        others.clear();
    }
    bench::Row("P1", "GetInstrSession hit, 1,000 live sessions (CUSTOM, RQ, VXIPNP)", Micro(p1.figure).c_str(),
               "the same with 1 live session", Micro(p1.reference).c_str(), p1.figure / p1.reference, "<= 1.2");

    // P3: both calls through IDispatch::Invoke with their dispatch ids looked up once, as a
    // compiled late-bound client calls them.
    ComPtr<IDispatch> managerDispatch, sessionDispatch;
    Check(manager->QueryInterface(IID_IDispatch, managerDispatch.PutVoid()), "QueryInterface(IDispatch) manager");
    Check(target->QueryInterface(IID_IDispatch, sessionDispatch.PutVoid()), "QueryInterface(IDispatch) session");
    DISPID getId = DispatchId(managerDispatch.Get(), L"GetInstrSession");
    DISPID isInitializedId = DispatchId(sessionDispatch.Get(), L"IsInitialized");
    auto lateGet = [&] {
        VARIANT arguments[2];
        arguments[1].vt = VT_BSTR;  // arguments go in reverse order
        arguments[1].bstrVal = targetText.Get();
        arguments[0].vt = VT_BOOL;
        arguments[0].boolVal = VARIANT_FALSE;
        DISPPARAMS parameters{arguments, nullptr, 2, 0};
        VARIANT result;
        ::VariantInit(&result);
        Check(managerDispatch->Invoke(getId, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_METHOD, &parameters, &result,
                                      nullptr, nullptr),
              "Invoke GetInstrSession");
        ::VariantClear(&result);
    };
    auto lateIsInitialized = [&] {
        DISPPARAMS parameters{nullptr, nullptr, 0, 0};
        VARIANT result;
        ::VariantInit(&result);
        Check(sessionDispatch->Invoke(isInitializedId, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_METHOD, &parameters,
                                      &result, nullptr, nullptr),
              "Invoke IsInitialized");
        ::VariantClear(&result);
    };
    Pair p3 = Interleaved(lateGet, lateIsInitialized, 2000, 15);
    bench::Row("P3", "late-bound GetInstrSession hit (Invoke)", Micro(p3.figure).c_str(),
               "late-bound IsInitialized (Invoke)", Micro(p3.reference).c_str(), p3.figure / p3.reference, "<= 2.0");
    Pair early = Interleaved(hit, [&] {
        VARIANT_BOOL value;
        Check(target->IsInitialized(&value), "IsInitialized");
    }, 2000, 5);
    std::printf("NOTE|early-bound: GetInstrSession hit %s, IsInitialized %s\n", Micro(early.figure).c_str(),
                Micro(early.reference).c_str());
}

void MemoryPerSession(IInstrSessionMgr* manager) {
    auto itemOne = Bstr(L"Channel");
    auto itemTwo = Bstr(L"Description");
    auto text = Bstr(L"bench item text");
    std::vector<ComPtr<IInstrSession>> sessions;
    sessions.reserve(memorySessions);
    Memory before;
    for (int index = 0; index < memorySessions; ++index) {
        auto session = Get(manager, L"CUSTOM::Memory" + std::to_wstring(index));
        Check(session->AttachLong(itemOne.Get(), index), "AttachLong");
        Check(session->AttachString(itemTwo.Get(), text.Get()), "AttachString");
        sessions.push_back(std::move(session));
    }
    Memory after;
    const char* kind = "";
    double perSession = PerItem(before, after, memorySessions, kind);
    char figure[128], value[64];
    std::snprintf(figure, sizeof figure, "%s per live custom session (10,000 x 2 data items)", kind);
    std::snprintf(value, sizeof value, "%.0f B", perSession);
    bench::Row("M1", figure, value, "the goal", "2048 B", perSession / 2048.0, "<= 1.0");
}

std::string Milli(double seconds) {
    char text[32];
    std::snprintf(text, sizeof text, "%.2f ms", seconds * 1e3);
    return text;
}

double BestOf(const std::function<void()>& call, int rounds) {
    double best = 1e30;
    for (int round = 0; round < rounds; ++round) best = std::min(best, BestBatch(call, 1));
    return best;
}

// What one GetNames("") costs in the outside libraries: the calls it makes are counted in the
// stand-ins around one listing, then made directly as often as it made them, in batches that
// alternate with GetNames("") itself. Every group is also timed once per occurrence, so a group the
// listing skipped (a cached resource list, an unchanged IVI store) still shows what it costs when
// it is made. The VXIplug&play names come from the configuration file, without an outside library.
void ListingFloor(IInstrSessionMgr* manager, const std::function<void()>& listing, double reference) {
    bench::SimCounters visaCounts("visa32.dll"), iviCounts("iviconfig.dll"), engineCounts("rqengine.dll"),
        switchLibraryCounts("qvrq.dll");
    for (const auto* counters : {&visaCounts, &iviCounts, &engineCounts, &switchLibraryCounts}) counters->Reset();
    listing();
    long visaScans = visaCounts.Get("viFindRsrc"), visaParses = visaCounts.Get("viParseRsrc");
    long iviOpens = iviCounts.Get("IviIni_OpenIniFile"), iviChanges = iviCounts.Get("IviIni_ConfigurationChanged"),
         iviReloads = iviCounts.Get("IviIni_ReloadConfiguration"), iviReads = iviCounts.Get("IviIni_GetNumberOfVIs");
    long engineListings = engineCounts.Get("EngineCreated");
    long switchLibraryListings = switchLibraryCounts.Get("CssSSDeviceData_Create__");
    std::printf("NOTE|P7 calls of one GetNames(\"\") (stand-ins' counters): VISA scans %ld (viFindNext %ld, "
                "viParseRsrc %ld); IVI store opens %ld, change queries %ld, reloads %ld, reads %ld; switch engine "
                "listings %ld, switch library listings %ld\n",
                visaScans, visaCounts.Get("viFindNext"), visaParses, iviOpens, iviChanges, iviReloads, iviReads,
                engineListings, switchLibraryListings);
    for (const auto& [counters, name] : {std::pair{&visaCounts, "visa32.dll"}, std::pair{&iviCounts, "iviconfig.dll"},
                                         std::pair{&engineCounts, "rqengine.dll"}})
        if (!counters->Loaded()) std::printf("NOTE|P7 %s was not loaded: its counts read 0\n", name);
    // A listing after the resource list was declared stale scans the VISA resources again.
    double rescanned = 1e30;
    for (int round = 0; round < 3; ++round) {
        Check(manager->InvalidateVisaResourceList(), "InvalidateVisaResourceList");
        visaCounts.Reset();
        rescanned = std::min(rescanned, BestBatch(listing, 1));
    }
    std::printf("NOTE|P7 GetNames(\"\") after InvalidateVisaResourceList: %s, with %ld VISA scan(s) and %ld viFindNext\n",
                Milli(rescanned).c_str(), visaCounts.Get("viFindRsrc"), visaCounts.Get("viFindNext"));

    bench::VisaScan visa;
    bench::IviStore ivi;
    if (!visa.Usable() || !ivi.Usable() || bench::SwitchEngineListing() < 0) {
        bench::NotMeasured("P7.a", "floor: the libraries' own calls of one GetNames(\"\")", "GetNames(\"\")",
                           "a library or the switch engine is not installed in this prefix", "-");
        return;
    }
    std::uint32_t resources = visa();
    std::int32_t instruments = ivi.Read();
    long devices = bench::SwitchEngineListing();
    std::printf("NOTE|P7 each group once, best of 5: VISA scan of %u resources %s; IVI change query %s, reload %s, "
                "read of %d instruments %s; switch engine listing of %ld devices %s\n",
                resources, Milli(BestOf([&] { visa(); }, 5)).c_str(), Milli(BestOf([&] { ivi.Changed(); }, 5)).c_str(),
                Milli(BestOf([&] { ivi.Reload(); }, 5)).c_str(), instruments,
                Milli(BestOf([&] { ivi.Read(); }, 5)).c_str(), devices,
                Milli(BestOf([] { bench::SwitchEngineListing(); }, 5)).c_str());
    if (iviOpens || visaParses || switchLibraryListings)
        std::printf("NOTE|P7 floor leaves out %ld IVI store open(s), %ld viParseRsrc call(s) and %ld switch library "
                    "listing(s) the listing made\n", iviOpens, visaParses, switchLibraryListings);

    auto libraries = [&] {
        for (long index = 0; index < visaScans; ++index) visa();
        for (long index = 0; index < iviChanges; ++index) ivi.Changed();
        for (long index = 0; index < iviReloads; ++index) ivi.Reload();
        for (long index = 0; index < iviReads; ++index) ivi.Read();
        for (long index = 0; index < engineListings; ++index) bench::SwitchEngineListing();
    };
    Pair floor = Interleaved(listing, libraries, 3, 15);
    double own = floor.figure - floor.reference;
    bench::Row("P7.a", "floor: the libraries' own calls of one GetNames(\"\")", Milli(floor.reference).c_str(),
               "GetNames(\"\") itself", Milli(floor.figure).c_str(), floor.reference / floor.figure, "-");
    bench::Row("P7.b", "floor: the same calls", Milli(floor.reference).c_str(),
               "the same SAFEARRAY of BSTRs built from a vector", Milli(reference).c_str(), floor.reference / reference,
               "-");
    bench::Row("P7.c", "GetNames(\"\") minus the floor: the manager's own work", Milli(own).c_str(),
               "the same SAFEARRAY of BSTRs built from a vector", Milli(reference).c_str(), own / reference, "-");
}

void ListNames(IInstrSessionMgr* manager) {
    auto all = Bstr(L"");
    auto noFilter = Bstr(L"");
    auto flags = static_cast<GetNamesOptions>(ReturnLogicalNames | ReturnVirtualInstruments | IncludeCategoryPrefix |
                                              ReturnRouteGroups | ReturnRoutes);
    Memory before;
    SAFEARRAY* first = nullptr;
    Check(manager->GetNames(all.Get(), flags, noFilter.Get(), &first), "GetNames");
    Memory after;
    LONG lower = 0, upper = -1;
    ::SafeArrayGetLBound(first, 1, &lower);
    ::SafeArrayGetUBound(first, 1, &upper);
    std::vector<std::wstring> names;
    BSTR* elements = nullptr;
    Check(::SafeArrayAccessData(first, reinterpret_cast<void**>(&elements)), "SafeArrayAccessData");
    for (LONG index = 0; index <= upper - lower; ++index) names.emplace_back(elements[index], ::SysStringLen(elements[index]));
    ::SafeArrayUnaccessData(first);
    ::SafeArrayDestroy(first);

    auto listing = [&] {
        SAFEARRAY* result = nullptr;
        Check(manager->GetNames(all.Get(), flags, noFilter.Get(), &result), "GetNames");
        ::SafeArrayDestroy(result);
    };
    auto building = [&] {
        SAFEARRAY* result = ::SafeArrayCreateVector(VT_BSTR, 0, static_cast<ULONG>(names.size()));
        BSTR* data = nullptr;
        ::SafeArrayAccessData(result, reinterpret_cast<void**>(&data));
        for (std::size_t index = 0; index < names.size(); ++index)
            data[index] = ::SysAllocStringLen(names[index].data(), static_cast<UINT>(names[index].size()));
        ::SafeArrayUnaccessData(result);
        ::SafeArrayDestroy(result);
    };
    Pair p7 = Interleaved(listing, building, 3, 7);
    char figure[96];
    std::snprintf(figure, sizeof figure, "GetNames(\"\") over %zu names (VISA, VXIplug&play, IVI, switch)", names.size());
    for (const wchar_t* kind : {L"VISA::", L"VXIPNP::", L"IVI::", L"RQ::"}) {
        std::size_t count = std::count_if(names.begin(), names.end(), [&](const std::wstring& name) { return name.rfind(kind, 0) == 0; });
        std::printf("NOTE|P7 names listed as %ls: %zu\n", kind, count);
    }
    char figureValue[32], referenceValue[32];
    std::snprintf(figureValue, sizeof figureValue, "%.2f ms", p7.figure * 1e3);
    std::snprintf(referenceValue, sizeof referenceValue, "%.2f ms", p7.reference * 1e3);
    bench::Row("P7", figure, figureValue, "the same SAFEARRAY of BSTRs built from a vector", referenceValue,
               p7.figure / p7.reference, "<= 1.5");
    // Where the listing's time goes: each category's own listing, best of three.
    for (const wchar_t* category : {L"VISA", L"VXIPNP", L"IVI", L"RQ"}) {
        auto text = Bstr(category);
        double best = 1e30;
        for (int round = 0; round < 3; ++round) {
            double start = Now();
            SAFEARRAY* result = nullptr;
            Check(manager->GetNames(text.Get(), flags, noFilter.Get(), &result), "GetNames(category)");
            best = std::min(best, Now() - start);
            ::SafeArrayDestroy(result);
        }
        std::printf("NOTE|P7 GetNames(\"%ls\") alone: %.2f ms\n", category, best * 1e3);
    }
    const char* kind = "";
    double perName = names.empty() ? 0.0 : PerItem(before, after, names.size(), kind);
    std::printf("NOTE|P7 memory: %s per listed name while one result is held: %.0f B\n", kind, perName);
    ListingFloor(manager, listing, p7.reference);
}

}  // namespace

int main() {
    WriteConfiguration();
    Check(::CoInitializeEx(nullptr, COINIT_MULTITHREADED), "CoInitializeEx");
    {
        ComPtr<IInstrSessionMgr> manager;
        Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                 manager.PutVoid()),
              "CoCreateInstance(InstrSessionMgr): is SessionMgr.dll registered in this prefix?");
        LookupAndLateBinding(manager.Get());
        MemoryPerSession(manager.Get());
        ListNames(manager.Get());
    }
    ::CoUninitialize();
    return 0;
}
