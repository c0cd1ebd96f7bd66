#include "ServerLifetime.h"

#include <rpc.h>
#include <rpcdcep.h>

namespace sm {

ServerLifetime& ServerLifetime::Instance() {
    static ServerLifetime instance;
    return instance;
}

void ServerLifetime::NoteCallingProcess() {
    // The local RPC transport knows the caller's process; COM dispatches calls to this
    // multithreaded server on the transport's own thread, where the call handle is current.
    unsigned long processId = 0;
    if (::I_RpcBindingInqLocalClientPID(nullptr, &processId) != RPC_S_OK) return;
    if (processId == 0 || processId == ::GetCurrentProcessId()) return;
    NoteClient(processId);
}

void ServerLifetime::NoteClient(DWORD processId) {
    std::lock_guard guard(lock);
    for (const Client& client : clients)
        if (client.processId == processId) return;
    // The handle pins the process object, so a reused process ID cannot pass for a served client.
    UniqueKernelHandle process(::OpenProcess(SYNCHRONIZE, FALSE, processId));
    if (!process) return;
    clients.push_back({processId, std::move(process)});
    servedAny = true;
}

void ServerLifetime::DropEndedClients() {
    std::erase_if(clients, [](const Client& client) {
        return ::WaitForSingleObject(client.process.Get(), 0) == WAIT_OBJECT_0;
    });
}

std::vector<DWORD> ServerLifetime::RunningClients() {
    std::lock_guard guard(lock);
    DropEndedClients();
    std::vector<DWORD> running;
    for (const Client& client : clients) running.push_back(client.processId);
    return running;
}

bool ServerLifetime::ShouldExit(long lockCount) {
    std::lock_guard guard(lock);
    DropEndedClients();
    if (lockCount > 0) everLocked = true;
    // References held by ended processes can never be used again.
    if (servedAny && clients.empty()) return true;
    if (everLocked && lockCount <= 0) return true;
    return !everLocked && !servedAny && ::GetTickCount64() - startTick > firstClientGraceMilliseconds;
}

}  // namespace sm
