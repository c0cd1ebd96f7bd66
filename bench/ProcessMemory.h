// What this process holds, for the memory figures: private bytes where the platform counts them,
// and the bytes in use on every heap (blocks and their overhead). Under Wine the private bytes
// counter stays 0; the heaps are where a session's memory lives.
#pragma once

#include <windows.h>
#include <psapi.h>

#include <cstddef>
#include <vector>

namespace bench {

inline std::size_t PrivateBytes() {
    PROCESS_MEMORY_COUNTERS_EX counters{};
    counters.cb = sizeof counters;
    ::GetProcessMemoryInfo(::GetCurrentProcess(), reinterpret_cast<PROCESS_MEMORY_COUNTERS*>(&counters), sizeof counters);
    return counters.PrivateUsage;
}

inline std::size_t HeapBytes() {
    std::vector<HANDLE> heaps(::GetProcessHeaps(0, nullptr) + 16);
    heaps.resize(::GetProcessHeaps(static_cast<DWORD>(heaps.size()), heaps.data()));
    std::size_t total = 0;
    for (HANDLE heap : heaps) {
        if (!::HeapLock(heap)) continue;
        PROCESS_HEAP_ENTRY entry{};
        while (::HeapWalk(heap, &entry))
            if (entry.wFlags & PROCESS_HEAP_ENTRY_BUSY) total += entry.cbData + entry.cbOverhead;
        ::HeapUnlock(heap);
    }
    return total;
}

}  // namespace bench
