// Stress through the registered DLL: worker threads mix every manager and session method (get and
// release, new sessions, attach and detach, lock and unlock with random keys and short timeouts,
// listings, state texts, VISA invalidation, renaming) for a given time. A watchdog reports a
// deadlock when a worker makes no progress, printing each stuck thread's stack, and ends the
// process. At the end every lock must be free, every session but the pinned ones gone, and the table
// empty once those are released.
//
//     SessionStress [seconds=10] [threads=8] [stall-seconds=120] [demo-deadlock]
//
// Exit 0: no failed call, no deadlock, every invariant held; 3 after a deadlock report.
// "demo-deadlock" shows the watchdog at work: the main thread keeps the first name's session lock
// and worker 0 waits for it without a timeout.
#include <objbase.h>
#include <windows.h>

#include <atomic>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mutex>
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

// The names each category offers to the stress; a category that this build can open adds a line.
struct CategoryNames {
    const wchar_t* category;
    std::vector<const wchar_t*> names;
};
const CategoryNames categories[] = {
    {L"CUSTOM", {L"CUSTOM::Bench", L"CUSTOM::Scope", L"custom/Dmm", L"CUSTOM::Psu"}},
};

std::vector<const wchar_t*> AllNames() {
    std::vector<const wchar_t*> names;
    for (const auto& category : categories) names.insert(names.end(), category.names.begin(), category.names.end());
    return names;
}

enum Operation : int { Get, GetNew, Release, AttachDetach, LockUnlock, Listing, State, Invalidate, Rename, UniqueKey, OperationCount };
const char* const operationNames[] = {"GetInstrSession", "GetInstrSession(new)", "Release", "Attach/Detach",
                                      "Lock/Unlock", "Listings", "StateDescription", "InvalidateVisaResourceList",
                                      "put_Name", "GetUniqueKeyName"};

struct Worker {
    HANDLE thread = nullptr;
    unsigned index = 0;
    std::atomic<std::uint64_t> progress{0};
    std::atomic<int> current{-1};
    std::uint64_t calls[OperationCount] = {};
    std::uint64_t lockTimeouts = 0;
};

std::atomic<bool> stopping{false};
bool demoDeadlock = false;
std::atomic<std::uint64_t> failures{0};
std::mutex reportMutex;

void Fail(const char* what, HRESULT result, const std::string& detail = {}) {
    if (++failures > 20) return;
    std::string description;
    ComPtr<IErrorInfo> info;
    if (::GetErrorInfo(0, info.Put()) == S_OK && info) {
        UniqueBstr text;
        info->GetDescription(text.Put());
        description = BstrToMultiByte(text.Get());
    }
    std::lock_guard guard(reportMutex);
    std::printf("FAILED %s: 0x%08lx %s %s\n", what, static_cast<unsigned long>(result), description.c_str(), detail.c_str());
}

bool Check(HRESULT result, const char* what) {
    if (result == S_OK) return true;
    Fail(what, result);
    return false;
}

UniqueBstr Bstr(const std::wstring& text) { return UniqueBstr(::SysAllocStringLen(text.data(), static_cast<UINT>(text.size()))); }

ComPtr<IInstrSessionMgr> CreateManager() {
    ComPtr<IInstrSessionMgr> manager;
    HRESULT created = ::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr, manager.PutVoid());
    if (created != S_OK) Fail("CoCreateInstance (is the DLL registered?)", created);
    return manager;
}

struct Held {
    ComPtr<IInstrSession> session;
    bool owned = false;  // created by this worker with newSession, so it may rename it
};

class WorkerRun {
public:
    explicit WorkerRun(Worker& worker) : self(worker), random(0x5E55 + worker.index), names(AllNames()) {}

    void Run() {
        manager = CreateManager();
        if (!manager) return;
        if (demoDeadlock && self.index == 0) {
            ComPtr<IInstrSession> session;
            self.current.store(LockUnlock);
            if (Check(manager->GetInstrSession(Bstr(names[0]).Get(), VARIANT_FALSE, session.Put()), "GetInstrSession"))
                session->LockSession(Bstr(L"Worker").Get(), -1, 0);
        }
        while (!stopping.load()) {
            auto operation = static_cast<Operation>(Pick(OperationCount));
            self.current.store(operation);
            Do(operation);
            ++self.calls[operation];
            self.progress.fetch_add(1);
        }
        UnlockAll();
        self.current.store(-1);
        held.clear();
        manager.Reset();
    }

private:
    std::size_t Pick(std::size_t count) { return std::uniform_int_distribution<std::size_t>(0, count - 1)(random); }
    const wchar_t* AnyName() { return names[Pick(names.size())]; }

    IInstrSession* AnySession() {
        if (held.empty()) Do(Get);
        return held.empty() ? nullptr : held[Pick(held.size())].session.Get();
    }

    void Do(Operation operation) {
        switch (operation) {
            case Get:
            case GetNew: {
                ComPtr<IInstrSession> session;
                bool fresh = operation == GetNew;
                if (!Check(manager->GetInstrSession(Bstr(AnyName()).Get(), fresh ? VARIANT_TRUE : VARIANT_FALSE, session.Put()), operationNames[operation]))
                    return;
                if (held.size() >= 6) held.erase(held.begin() + static_cast<std::ptrdiff_t>(Pick(held.size())));
                held.push_back({session, fresh});
                return;
            }
            case Release:
                if (!held.empty()) held.erase(held.begin() + static_cast<std::ptrdiff_t>(Pick(held.size())));
                return;
            case AttachDetach: return AttachDetachItems();
            case LockUnlock: return LockAndUnlock();
            case Listing: return Listings();
            case State: {
                UniqueBstr text;
                Check(manager->get_StateDescription(text.Put()), "manager StateDescription");
                if (IInstrSession* session = AnySession()) Check(session->get_StateDescription(text.Put()), "session StateDescription");
                return;
            }
            case Invalidate: Check(manager->InvalidateVisaResourceList(), "InvalidateVisaResourceList"); return;
            case Rename:
                for (Held& entry : held)
                    if (entry.owned) {
                        Check(entry.session->put_Name(Bstr(std::wstring(L"Renamed") + std::to_wstring(Pick(4))).Get()), "put_Name");
                        return;
                    }
                return;
            case UniqueKey: {
                UniqueBstr key;
                Check(manager->GetUniqueKeyName(key.Put()), "GetUniqueKeyName");
                return;
            }
            case OperationCount: return;
        }
    }

    // Item IDs carry the worker's index, so no other worker touches them: every call must succeed.
    void AttachDetachItems() {
        IInstrSession* session = AnySession();
        if (!session) return;
        std::wstring id = L"W" + std::to_wstring(self.index) + L"-" + std::to_wstring(++itemCounter);
        LONG value = static_cast<LONG>(itemCounter), read = 0;
        if (!Check(session->AttachLong(Bstr(id).Get(), value), "AttachLong")) return;
        if (Check(session->GetLong(Bstr(id).Get(), &read), "GetLong") && read != value) Fail("GetLong value", S_OK);
        Check(session->AttachString(Bstr(id + L"s").Get(), Bstr(id).Get()), "AttachString");
        Check(session->DetachData(Bstr(id).Get()), "DetachData");
        Check(session->DetachData(Bstr(id + L"s").Get()), "DetachData");
    }

    // Shared keys (two spellings of one) contend; a unique key from the manager never matches another.
    // A taken lock is kept over later operations and let go by a later call, so other workers meet
    // it held and wait or time out.
    void LockAndUnlock() {
        if (!locks.empty() && (locks.size() >= 3 || Pick(2) == 0)) {
            std::size_t index = Pick(locks.size());
            Check(locks[index].session->UnlockSession(), "UnlockSession");
            locks.erase(locks.begin() + static_cast<std::ptrdiff_t>(index));
            return;
        }
        IInstrSession* session = AnySession();
        if (!session) return;
        static const double timeouts[] = {0.0, 0.001, 0.01, 0.05};
        std::wstring key;
        switch (Pick(4)) {
            case 0: key = L"KeyA"; break;
            case 1: key = L"keya"; break;
            case 2: key = L"KeyB"; break;
            default: {
                UniqueBstr unique;
                if (!Check(manager->GetUniqueKeyName(unique.Put()), "GetUniqueKeyName")) return;
                key.assign(unique.Get(), ::SysStringLen(unique.Get()));
            }
        }
        HRESULT locked = session->LockSession(Bstr(key).Get(), timeouts[Pick(4)], 0);
        if (locked == static_cast<HRESULT>(TE_OPERATION_TIMED_OUT)) {
            ++self.lockTimeouts;
            ::SetErrorInfo(0, nullptr);
            return;
        }
        if (!Check(locked, "LockSession")) return;
        UniqueBstr owner;
        LONG level = 0;
        if (Check(session->GetLockState(owner.Put(), &level), "GetLockState") &&
            (level < 1 || ::CompareStringW(LOCALE_INVARIANT, NORM_IGNORECASE, owner.Get(), -1, key.c_str(), -1) != CSTR_EQUAL))
            Fail("GetLockState while held", S_OK, "level " + std::to_string(level));
        locks.push_back({ComPtr<IInstrSession>(session), false});
    }

    void UnlockAll() {
        for (Held& lock : locks) Check(lock.session->UnlockSession(), "UnlockSession (end)");
        locks.clear();
    }

    void Listings() {
        static const wchar_t* const arguments[] = {L"", L"?", L"CUSTOM"};
        UniqueSafeArray names, sessions, categoryList;
        Check(manager->GetNames(Bstr(arguments[Pick(3)]).Get(), static_cast<GetNamesOptions>(Pick(64)), Bstr(L"").Get(), names.Put()), "GetNames");
        Check(manager->GetSessions(Bstr(arguments[Pick(3)]).Get(), sessions.Put()), "GetSessions");
        Check(manager->GetCategories(Bstr(L"").Get(), categoryList.Put()), "GetCategories");
    }

    Worker& self;
    std::mt19937_64 random;
    std::vector<const wchar_t*> names;
    ComPtr<IInstrSessionMgr> manager;
    std::vector<Held> held;
    std::vector<Held> locks;  // sessions this worker has locked once each, still held
    std::uint64_t itemCounter = 0;
};

DWORD WINAPI WorkerThread(void* parameter) {
    auto* worker = static_cast<Worker*>(parameter);
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) {
        Fail("CoInitializeEx", E_FAIL);
        return 1;
    }
    {
        WorkerRun run(*worker);
        run.Run();
    }
    ::CoUninitialize();
    return 0;
}

// The frames of a suspended thread, as module+offset, walked with the x64 unwind tables.
void PrintStack(HANDLE thread) {
    CONTEXT context{};
    context.ContextFlags = CONTEXT_FULL;
    if (::SuspendThread(thread) == static_cast<DWORD>(-1) || !::GetThreadContext(thread, &context)) {
        std::printf("      (no context)\n");
        return;
    }
    for (int frame = 0; frame < 40 && context.Rip; ++frame) {
        HMODULE module = nullptr;
        char path[MAX_PATH] = "?";
        if (::GetModuleHandleExA(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT,
                                 reinterpret_cast<LPCSTR>(context.Rip), &module))
            ::GetModuleFileNameA(module, path, MAX_PATH);
        const char* base = std::strrchr(path, '\\');
        std::printf("      #%d %s+0x%llx\n", frame, base ? base + 1 : path,
                    static_cast<unsigned long long>(context.Rip - reinterpret_cast<DWORD64>(module)));
        DWORD64 imageBase = 0;
        PRUNTIME_FUNCTION function = ::RtlLookupFunctionEntry(context.Rip, &imageBase, nullptr);
        if (!function) {
            context.Rip = *reinterpret_cast<DWORD64*>(context.Rsp);
            context.Rsp += 8;
            continue;
        }
        void* handlerData = nullptr;
        DWORD64 establisher = 0;
        ::RtlVirtualUnwind(UNW_FLAG_NHANDLER, imageBase, context.Rip, function, &context, &handlerData, &establisher, nullptr);
    }
}

// Waits until the deadline (or, with a zero deadline, until every worker ended), checking that each
// running worker moves. A worker that has not moved for stallSeconds is taken for a deadlock.
bool Watch(std::vector<Worker>& workers, double seconds, double stallSeconds) {
    std::vector<std::uint64_t> seen(workers.size(), ~0ull);
    std::vector<ULONGLONG> movedAt(workers.size(), ::GetTickCount64());
    ULONGLONG end = ::GetTickCount64() + static_cast<ULONGLONG>(seconds * 1000);
    for (;;) {
        bool anyRunning = false;
        for (std::size_t index = 0; index < workers.size(); ++index) {
            if (::WaitForSingleObject(workers[index].thread, 0) == WAIT_OBJECT_0) continue;
            anyRunning = true;
            std::uint64_t progress = workers[index].progress.load();
            if (progress != seen[index]) {
                seen[index] = progress;
                movedAt[index] = ::GetTickCount64();
            } else if (::GetTickCount64() - movedAt[index] > static_cast<ULONGLONG>(stallSeconds * 1000)) {
                std::printf("DEADLOCK: worker %zu made no progress for %.0f s; stacks:\n", index, stallSeconds);
                for (Worker& worker : workers) {
                    int current = worker.current.load();
                    std::printf("   worker %u in %s\n", worker.index, current < 0 ? "(done)" : operationNames[current]);
                    if (::WaitForSingleObject(worker.thread, 0) != WAIT_OBJECT_0) PrintStack(worker.thread);
                }
                std::fflush(stdout);
                return false;
            }
        }
        if (seconds > 0 && ::GetTickCount64() >= end) return true;
        if (seconds <= 0 && !anyRunning) return true;
        ::Sleep(200);
    }
}

LONG SessionCount(IInstrSessionMgr* manager) {
    UniqueSafeArray listed;
    if (!Check(manager->GetSessions(Bstr(L"").Get(), listed.Put()), "GetSessions (final)")) return -1;
    LONG upper = -1;
    ::SafeArrayGetUBound(listed.Get(), 1, &upper);
    return upper + 1;
}

}  // namespace

int main(int argc, char** argv) {
    double seconds = argc > 1 ? std::atof(argv[1]) : 10;
    unsigned threads = argc > 2 ? static_cast<unsigned>(std::atoi(argv[2])) : 8;
    double stallSeconds = argc > 3 ? std::atof(argv[3]) : 120;
    demoDeadlock = argc > 4 && std::strcmp(argv[4], "demo-deadlock") == 0;
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 2;
    int exitCode = 0;
    {
        ComPtr<IInstrSessionMgr> manager = CreateManager();
        if (!manager) return 2;
        // The pinned sessions outlive the run, so the invariants can look at their locks.
        std::vector<ComPtr<IInstrSession>> pinned;
        for (const wchar_t* name : AllNames()) {
            ComPtr<IInstrSession> session;
            if (Check(manager->GetInstrSession(Bstr(name).Get(), VARIANT_FALSE, session.Put()), "GetInstrSession (pin)"))
                pinned.push_back(session);
        }
        if (demoDeadlock && !pinned.empty()) pinned[0]->LockSession(Bstr(L"Main").Get(), 0, 0);

        std::vector<Worker> workers(threads);
        ULONGLONG started = ::GetTickCount64();
        for (unsigned index = 0; index < threads; ++index) {
            workers[index].index = index;
            workers[index].thread = ::CreateThread(nullptr, 0, WorkerThread, &workers[index], 0, nullptr);
        }
        bool live = Watch(workers, seconds, stallSeconds);
        stopping.store(true);
        live = live && Watch(workers, 0, stallSeconds);
        if (!live) {
            // Stuck threads hold locks that DLL detach would wait for: leave at once.
            ::TerminateProcess(::GetCurrentProcess(), 3);
        }
        double elapsed = static_cast<double>(::GetTickCount64() - started) / 1000.0;
        std::uint64_t totals[OperationCount] = {}, total = 0, timeouts = 0;
        for (Worker& worker : workers) {
            ::CloseHandle(worker.thread);
            for (int operation = 0; operation < OperationCount; ++operation) totals[operation] += worker.calls[operation];
            timeouts += worker.lockTimeouts;
        }
        for (std::uint64_t count : totals) total += count;

        unsigned invariantFailures = 0;
        for (auto& session : pinned) {
            UniqueBstr owner;
            LONG level = -1;
            if (!Check(session->GetLockState(owner.Put(), &level), "GetLockState (final)") || level != 0 || ::SysStringLen(owner.Get()) != 0) {
                std::printf("INVARIANT: a pinned session's lock is not free (level %ld)\n", level);
                ++invariantFailures;
            }
        }
        LONG left = SessionCount(manager.Get());
        if (left != static_cast<LONG>(pinned.size())) {
            std::printf("INVARIANT: %ld sessions live, expected only the %zu pinned\n", left, pinned.size());
            ++invariantFailures;
        }
        pinned.clear();
        left = SessionCount(manager.Get());
        if (left != 0) {
            std::printf("INVARIANT: %ld sessions left after the last release\n", left);
            ++invariantFailures;
        }

        std::printf("stress: %u threads, %.1f s, %llu calls (%.0f calls/s), %llu lock timeouts\n", threads, elapsed,
                    static_cast<unsigned long long>(total), static_cast<double>(total) / elapsed,
                    static_cast<unsigned long long>(timeouts));
        for (int operation = 0; operation < OperationCount; ++operation)
            std::printf("   %-28s %llu\n", operationNames[operation], static_cast<unsigned long long>(totals[operation]));
        std::printf("failed calls: %llu, deadlocks: 0, invariant failures: %u\n",
                    static_cast<unsigned long long>(failures.load()), invariantFailures);
        if (failures.load() != 0 || invariantFailures != 0) exitCode = 1;
    }
    ::CoUninitialize();
    return exitCode;
}
