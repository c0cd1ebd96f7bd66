// A count of releases that waiters sleep on: a slim reader/writer lock with a condition variable.
// Neither allocates nor needs a kernel object, and a wake-up stays inside the process (under Wine
// it does not go through the wine server, which a semaphore or event would).
#pragma once

#include <windows.h>

#include <cstdint>

namespace sm {

class ReleaseSignal {
public:
    ReleaseSignal() = default;
    ReleaseSignal(const ReleaseSignal&) = delete;
    ReleaseSignal& operator=(const ReleaseSignal&) = delete;

    std::uint64_t Count() {
        Guard guard(lock);
        return count;
    }

    // Counts one release and wakes every waiter.
    void Signal() {
        {
            Guard guard(lock);
            ++count;
        }
        ::WakeAllConditionVariable(&changed);
    }

    // Returns once a release after the one counted as seen happened, or after about milliseconds.
    void WaitForChange(std::uint64_t seen, DWORD milliseconds) {
        ULONGLONG deadline = ::GetTickCount64() + milliseconds;
        Guard guard(lock);
        while (count == seen) {
            ULONGLONG now = ::GetTickCount64();
            if (now >= deadline) return;
            ::SleepConditionVariableSRW(&changed, &lock, static_cast<DWORD>(deadline - now), 0);
        }
    }

private:
    class Guard {
    public:
        explicit Guard(SRWLOCK& guarded) : held(guarded) { ::AcquireSRWLockExclusive(&held); }
        ~Guard() { ::ReleaseSRWLockExclusive(&held); }
        Guard(const Guard&) = delete;
        Guard& operator=(const Guard&) = delete;

    private:
        SRWLOCK& held;
    };

    SRWLOCK lock = SRWLOCK_INIT;
    CONDITION_VARIABLE changed = CONDITION_VARIABLE_INIT;
    std::uint64_t count = 0;
};

}  // namespace sm
