// When the external-process server may end. COM's own rule (no server object and no LockServer
// left) is not enough here: a client process that ends without releasing its references - a
// crash, or an exit without CoUninitialize - never gives them back, so the server also watches
// the processes it has served and ends once all of them have ended.
#pragma once

#include <windows.h>

#include <cstdint>
#include <mutex>
#include <vector>

#include "com/UniqueHandles.h"

namespace sm {

class ServerLifetime {
public:
    // How long a server that was started but never reached waits for its first client.
    static constexpr std::uint64_t firstClientGraceMilliseconds = 30000;

    static ServerLifetime& Instance();

    // Records the process on whose behalf the current incoming call runs. Calls that do not come
    // from another process (or whose caller cannot be told) record nothing.
    void NoteCallingProcess();
    void NoteClient(DWORD processId);

    // The served processes that are still running, in the order they were first served.
    std::vector<DWORD> RunningClients();

    // lockCount: live server objects plus LockServer locks.
    bool ShouldExit(long lockCount);

private:
    struct Client {
        DWORD processId;
        UniqueKernelHandle process;
    };
    void DropEndedClients();

    std::mutex lock;
    std::vector<Client> clients;
    bool servedAny = false;
    bool everLocked = false;
    std::uint64_t startTick = ::GetTickCount64();
};

}  // namespace sm
