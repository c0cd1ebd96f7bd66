// Worker threads mix every manager and session call over shared names (docs/reliability.md). A worker
// still running stall-seconds after the stop is a deadlock (exit 3; "demo-deadlock" makes one).
//     SessionStress [seconds=10] [threads=8] [stall-seconds=120] [demo-deadlock]
#include <objbase.h>
#include <windows.h>

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <string>
#include <vector>

#include "com/BstrConversion.h"
#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"
#include "framework/ErrorCodes.h"

using namespace sm;

namespace {

// Every category on the demo bench (ctest sets SM_SIM_SETUP and VXIPNPPATH).
const std::vector<const wchar_t*> names = {L"CUSTOM::Bench", L"custom/Dmm", L"VISA::GPIB0::14::INSTR", L"VXIPNP::DMM1",
                                           L"IVI::MyDmm", L"RQ::DmmToDut"};

enum Operation : int { GetSession, ReleaseSession, Items, LockUnlock, Listings, Rename, Driver, OperationCount };
const char* const operationNames[] = {"GetInstrSession", "Release", "Attach/Detach", "Lock/Unlock", "Listings and state", "put_Name",
                                      "GetHandleEx/Close"};

std::atomic<bool> stopping{false};
std::atomic<std::uint64_t> failures{0};
bool demoDeadlock = false;

// Every call must succeed: a failure is counted and the first 20 are printed with their error text.
bool Check(HRESULT result, const char* what) {
    if (result == S_OK || ++failures > 20) return result == S_OK;
    ComPtr<IErrorInfo> info;
    UniqueBstr text;
    if (::GetErrorInfo(0, info.Put()) == S_OK && info) info->GetDescription(text.Put());
    std::printf("FAILED %s: 0x%08lx %s\n", what, static_cast<unsigned long>(result), BstrToMultiByte(text.Get()).c_str());
    return false;
}

UniqueBstr Bstr(const std::wstring& text) { return UniqueBstr(::SysAllocString(text.c_str())); }

struct Worker {
    UniqueKernelHandle thread;
    std::atomic<int> current{0};
    std::uint64_t index = 0, calls = 0, lockTimeouts = 0;
};

class WorkerRun {
public:
    explicit WorkerRun(Worker& worker) : self(worker), random(0x5E55 + worker.index) {
        Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr, manager.PutVoid()),
              "CoCreateInstance");
    }

    void Run() {
        if (!manager) return;
        if (demoDeadlock && self.index == 0) {
            self.current = LockUnlock;
            if (IInstrSession* session = Open(names[0], false)) session->LockSession(Bstr(L"Worker").Get(), -1, 0);
        }
        for (; !stopping; ++self.calls) Do(self.current = static_cast<int>(Pick(OperationCount)));
        for (Held& lock : locks) Check(lock.session->UnlockSession(), "UnlockSession (end)");
    }

private:
    struct Held {
        ComPtr<IInstrSession> session;
        bool owned = false;  // made by this worker with newSession, so it may rename it
    };

    std::size_t Pick(std::size_t count) { return std::uniform_int_distribution<std::size_t>(0, count - 1)(random); }
    void DropOne(std::vector<Held>& list) { list.erase(list.begin() + static_cast<std::ptrdiff_t>(Pick(list.size()))); }

    IInstrSession* Open(const wchar_t* name, bool fresh) {
        ComPtr<IInstrSession> session;
        if (!Check(manager->GetInstrSession(Bstr(name).Get(), fresh ? VARIANT_TRUE : VARIANT_FALSE, session.Put()), "GetInstrSession"))
            return nullptr;
        if (held.size() >= 6) DropOne(held);
        held.push_back({session, fresh});
        return session.Get();
    }
    IInstrSession* AnySession() { return held.empty() ? Open(names[Pick(names.size())], false) : held[Pick(held.size())].session.Get(); }

    void Do(int operation) {
        switch (operation) {
            case GetSession: Open(names[Pick(names.size())], Pick(2) == 0); return;
            case ReleaseSession: if (!held.empty()) DropOne(held); return;
            case Items: return AttachDetach();
            case LockUnlock: return LockOrUnlock();
            case Listings: return ListAndDescribe();
            case Rename:
                for (Held& entry : held)
                    if (entry.owned) return void(Check(entry.session->put_Name(Bstr(L"Renamed" + std::to_wstring(Pick(4))).Get()), "put_Name"));
                return;
            case Driver: return OpenOrCloseDriver();
        }
    }

    // Opens the driver session (a custom session has none) or closes it while others use it.
    void OpenOrCloseDriver() {
        IInstrSession* session = AnySession();
        if (!session || Pick(3) == 0) return void(session && Check(session->Close(), "Close"));
        UniqueVariant handle;
        HRESULT opened = session->GetHandleEx(DefaultInterface, handle.Get());
        Check(opened == E_NOTIMPL ? S_OK : opened, "GetHandleEx");
    }

    // Item IDs carry the worker's index, so no other worker touches them: every call must succeed.
    void AttachDetach() {
        IInstrSession* session = AnySession();
        std::wstring id = L"W" + std::to_wstring(self.index) + L"-" + std::to_wstring(++itemCounter);
        LONG read = 0;
        if (!session || !Check(session->AttachLong(Bstr(id).Get(), static_cast<LONG>(itemCounter)), "AttachLong")) return;
        if (Check(session->GetLong(Bstr(id).Get(), &read), "GetLong")) Check(read == static_cast<LONG>(itemCounter) ? S_OK : S_FALSE, "GetLong value");
        Check(session->DetachData(Bstr(id).Get()), "DetachData");
    }

    // Shared keys (two spellings of one) contend; a taken lock is kept over later operations, so other
    // workers meet it held and wait or time out.
    void LockOrUnlock() {
        if (!locks.empty() && (locks.size() >= 3 || Pick(2) == 0)) {
            std::size_t index = Pick(locks.size());
            Check(locks[index].session->UnlockSession(), "UnlockSession");
            return void(locks.erase(locks.begin() + static_cast<std::ptrdiff_t>(index)));
        }
        static const double timeouts[] = {0.0, 0.001, 0.01, 0.05};
        static const wchar_t* const sharedKeys[] = {L"KeyA", L"keya", L"KeyB"};
        IInstrSession* session = AnySession();
        UniqueBstr key = Bstr(sharedKeys[Pick(3)]), owner;
        if (!session || (Pick(4) == 0 && !Check(manager->GetUniqueKeyName(key.Put()), "GetUniqueKeyName"))) return;
        HRESULT locked = session->LockSession(key.Get(), timeouts[Pick(4)], 0);
        if (locked == static_cast<HRESULT>(TE_OPERATION_TIMED_OUT)) {
            ++self.lockTimeouts;
            return void(::SetErrorInfo(0, nullptr));
        }
        if (!Check(locked, "LockSession")) return;
        LONG level = 0;
        if (Check(session->GetLockState(owner.Put(), &level), "GetLockState"))
            Check(level >= 1 && ::CompareStringW(LOCALE_INVARIANT, NORM_IGNORECASE, owner.Get(), -1, key.Get(), -1) == CSTR_EQUAL ? S_OK : S_FALSE,
                  "GetLockState while held");
        locks.push_back({ComPtr<IInstrSession>(session)});
    }

    void ListAndDescribe() {
        static const wchar_t* const categories[] = {L"", L"?", L"CUSTOM", L"VISA", L"VXIPNP", L"IVI"};
        UniqueSafeArray list;
        UniqueBstr text;
        Check(manager->GetNames(Bstr(categories[Pick(6)]).Get(), static_cast<GetNamesOptions>(Pick(64)), Bstr(L"").Get(), list.Put()), "GetNames");
        Check(manager->GetSessions(Bstr(categories[Pick(6)]).Get(), list.Put()), "GetSessions");
        Check(manager->GetCategories(Bstr(L"").Get(), list.Put()), "GetCategories");
        Check(manager->get_StateDescription(text.Put()), "manager StateDescription");
        if (IInstrSession* session = AnySession()) Check(session->get_StateDescription(text.Put()), "session StateDescription");
        Check(manager->InvalidateVisaResourceList(), "InvalidateVisaResourceList");
    }

    Worker& self;
    std::mt19937_64 random;
    ComPtr<IInstrSessionMgr> manager;
    std::vector<Held> held;
    std::vector<Held> locks;  // sessions this worker has locked once each, still held
    std::uint64_t itemCounter = 0;
};

DWORD WINAPI WorkerThread(void* worker) {
    if (!Check(::CoInitializeEx(nullptr, COINIT_MULTITHREADED), "CoInitializeEx")) return 1;
    WorkerRun(*static_cast<Worker*>(worker)).Run();
    ::CoUninitialize();
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    const double seconds = argc > 1 ? std::atof(argv[1]) : 10, stallSeconds = argc > 3 ? std::atof(argv[3]) : 120;
    const unsigned threads = argc > 2 ? static_cast<unsigned>(std::atoi(argv[2])) : 8;
    demoDeadlock = argc > 4 && std::string(argv[4]) == "demo-deadlock";
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 2;
    unsigned invariantFailures = 0;
    auto expect = [&](bool held, const char* what, long value) {
        if (!held) std::printf("INVARIANT: %s (%ld)\n", what, value), ++invariantFailures;
    };
    {
        ComPtr<IInstrSessionMgr> manager;
        if (!Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr, manager.PutVoid()),
                   "CoCreateInstance (is the DLL registered?)"))
            return 2;
        auto sessionCount = [&] {
            UniqueSafeArray listed;
            LONG upper = -2;
            if (Check(manager->GetSessions(Bstr(L"").Get(), listed.Put()), "GetSessions (final)")) ::SafeArrayGetUBound(listed.Get(), 1, &upper);
            return upper + 1;
        };
        // The pinned sessions outlive the run, so the invariants can look at their locks.
        std::vector<ComPtr<IInstrSession>> pinned(names.size());
        for (std::size_t index = 0; index < names.size(); ++index)
            Check(manager->GetInstrSession(Bstr(names[index]).Get(), VARIANT_FALSE, pinned[index].Put()), "GetInstrSession (pin)");
        if (demoDeadlock && pinned[0]) pinned[0]->LockSession(Bstr(L"Main").Get(), 0, 0);

        std::vector<Worker> workers(threads);
        std::vector<HANDLE> handles;
        for (Worker& worker : workers) {
            worker.index = handles.size();
            worker.thread.Reset(::CreateThread(nullptr, 0, WorkerThread, &worker, 0, nullptr));
            handles.push_back(worker.thread.Get());
        }
        ::Sleep(static_cast<DWORD>(seconds * 1000));
        stopping = true;
        if (::WaitForMultipleObjects(threads, handles.data(), TRUE, static_cast<DWORD>(stallSeconds * 1000)) == WAIT_TIMEOUT) {
            std::printf("DEADLOCK: workers still running %.0f s after the stop:\n", stallSeconds);
            for (Worker& worker : workers)
                if (::WaitForSingleObject(worker.thread.Get(), 0) == WAIT_TIMEOUT) std::printf("   worker %llu in %s\n", static_cast<unsigned long long>(worker.index), operationNames[worker.current]);
            std::fflush(stdout);
            // Stuck threads hold locks that DLL detach would wait for: leave at once.
            ::TerminateProcess(::GetCurrentProcess(), 3);
        }
        unsigned long long total = 0, timeouts = 0;
        for (Worker& worker : workers) total += worker.calls, timeouts += worker.lockTimeouts;

        for (auto& session : pinned) {
            UniqueBstr owner;
            LONG level = -1;
            if (session && Check(session->GetLockState(owner.Put(), &level), "GetLockState (final)"))
                expect(level == 0 && ::SysStringLen(owner.Get()) == 0, "a pinned session's lock is not free, level", level);
        }
        expect(sessionCount() == static_cast<LONG>(pinned.size()), "sessions live besides the pinned ones", sessionCount());
        pinned.clear();
        expect(sessionCount() == 0, "sessions left after the last release", sessionCount());
        std::printf("stress: %u threads, %.1f s, %llu calls (%.0f calls/s), %llu lock timeouts\n", threads, seconds, total,
                    static_cast<double>(total) / seconds, timeouts);
        std::printf("failed calls: %llu, deadlocks: 0, invariant failures: %u\n", static_cast<unsigned long long>(failures.load()),
                    invariantFailures);
    }
    ::CoUninitialize();
    return failures != 0 || invariantFailures != 0;
}
