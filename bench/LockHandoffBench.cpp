// Lock hand-off latency through the real COM objects: how long after UnlockSession a waiter on
// another thread comes back from LockSession, beside the same figure for a waiter that polls with
// single attempts (LockSession with timeout 0) and Sleep(200) between them, the 200 ms poll that
// bounds the session lock's wait. Prints p50 and p99 of both and their ratios.
//
//   wine bench_lock_handoff.exe [hand-offs]      (default 300; the DLL must be registered)
#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

using Clock = std::chrono::steady_clock;

[[noreturn]] void Fail(const char* what, HRESULT result) {
    std::printf("%s failed: HRESULT 0x%08lX\n", what, static_cast<unsigned long>(result));
    std::exit(1);
}

void Check(HRESULT result, const char* what) {
    if (FAILED(result)) Fail(what, result);
}

class Apartment {
public:
    Apartment() { Check(::CoInitializeEx(nullptr, COINIT_MULTITHREADED), "CoInitializeEx"); }
    ~Apartment() { ::CoUninitialize(); }
    Apartment(const Apartment&) = delete;
    Apartment& operator=(const Apartment&) = delete;
};

UniqueBstr Bstr(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

constexpr HRESULT TimedOut = static_cast<HRESULT>(-17402);

enum class Waiting { InLockSession, Polling200ms };

// One waiter thread takes the lock `count` times from the holder (this thread). Each round: the
// holder locks, lets the waiter start waiting, holds for a random 10-210 ms (one poll period wide,
// so the unlock falls at any phase of the poll), stamps the time and unlocks; the waiter stamps the time it got the lock,
// unlocks and reports. The latency is the difference of the two stamps.
std::vector<double> MeasureHandOffs(IInstrSessionMgr* manager, Waiting waiting, int count) {
    ComPtr<IInstrSession> session;
    auto name = Bstr(L"CUSTOM::LockHandoffBench");
    Check(manager->GetInstrSession(name.Get(), VARIANT_FALSE, session.Put()), "GetInstrSession");
    auto holderKey = Bstr(L"Holder");
    auto waiterKey = Bstr(L"Waiter");

    std::atomic<int> round{-1};          // the round the waiter is asked to wait for
    std::atomic<int> waitingRound{-1};   // the round the waiter has started waiting for
    std::atomic<int> doneRound{-1};      // the round the waiter has finished
    std::atomic<Clock::rep> unlockedAt{0};
    std::vector<double> latencies(static_cast<std::size_t>(count));

    std::thread waiter([&] {
        Apartment apartment;
        for (int current = 0; current < count; ++current) {
            while (round.load() != current) std::this_thread::yield();
            waitingRound.store(current);
            if (waiting == Waiting::InLockSession) {
                Check(session->LockSession(waiterKey.Get(), 30.0, 0), "LockSession (waiter)");
            } else {
                for (;;) {
                    HRESULT attempt = session->LockSession(waiterKey.Get(), 0.0, 0);
                    if (attempt == S_OK) break;
                    if (attempt != TimedOut) Fail("LockSession attempt (waiter)", attempt);
                    ::Sleep(200);
                }
            }
            auto gotAt = Clock::now().time_since_epoch().count();
            latencies[static_cast<std::size_t>(current)] =
                std::chrono::duration<double, std::milli>(Clock::duration(gotAt - unlockedAt.load())).count();
            Check(session->UnlockSession(), "UnlockSession (waiter)");
            doneRound.store(current);
        }
    });

    std::mt19937 random(12345);
    std::uniform_int_distribution<int> holdMilliseconds(10, 210);
    for (int current = 0; current < count; ++current) {
        Check(session->LockSession(holderKey.Get(), 30.0, 0), "LockSession (holder)");
        round.store(current);
        while (waitingRound.load() != current) std::this_thread::yield();
        ::Sleep(static_cast<DWORD>(holdMilliseconds(random)));
        unlockedAt.store(Clock::now().time_since_epoch().count());
        Check(session->UnlockSession(), "UnlockSession (holder)");
        while (doneRound.load() != current) std::this_thread::yield();
    }
    waiter.join();
    return latencies;
}

double Percentile(std::vector<double> values, double fraction) {
    std::sort(values.begin(), values.end());
    auto index = static_cast<std::size_t>(fraction * static_cast<double>(values.size() - 1) + 0.5);
    return values[index];
}

}  // namespace

int main(int argumentCount, char** arguments) {
    int count = argumentCount > 1 ? std::atoi(arguments[1]) : 300;
    if (count < 10) count = 10;
    Apartment apartment;
    ComPtr<IInstrSessionMgr> manager;
    Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                             manager.PutVoid()),
          "CoCreateInstance(InstrSessionMgr): is SessionMgr.dll registered in this prefix?");

    std::printf("lock hand-off to a waiter on another thread, %d hand-offs each, holder holds 10-210 ms\n", count);
    std::fflush(stdout);
    auto real = MeasureHandOffs(manager.Get(), Waiting::InLockSession, count);
    double realP50 = Percentile(real, 0.50), realP99 = Percentile(real, 0.99);
    std::printf("LockSession waiter (timeout 30 s):           p50 %8.3f ms   p99 %8.3f ms\n", realP50, realP99);
    std::fflush(stdout);
    auto polled = MeasureHandOffs(manager.Get(), Waiting::Polling200ms, count);
    double pollP50 = Percentile(polled, 0.50), pollP99 = Percentile(polled, 0.99);
    std::printf("200 ms poll (timeout 0 attempts + Sleep 200): p50 %8.3f ms   p99 %8.3f ms\n", pollP50, pollP99);
    std::printf("ratio poll / LockSession:                      p50 %8.1fx     p99 %8.1fx\n", pollP50 / realP50,
                pollP99 / realP99);
    return 0;
}
