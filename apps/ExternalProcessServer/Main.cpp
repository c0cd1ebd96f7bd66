// The shared external-process server: a local COM server that hosts the SessionMgr DLL for
// several client processes. Started by COM with -Embedding; /RegServer and /UnregServer
// register and unregister it.
#include <windows.h>
#include <ole2.h>

#include <cstdio>
#include <cwchar>

#include "ServerLifetime.h"
#include "ServerObject.h"
#include "ServerRegistration.h"
#include "com/ModuleLock.h"
#include "com/UniqueHandles.h"
#include "server/ClassFactory.h"

namespace sm {
namespace {

// One server per machine session. Two clients that activate at once may make COM start two
// servers; the second one waits here a moment for the first to end and otherwise leaves. It must
// not leave before the first has registered its class object and the second's client has asked
// again (COM asks about once a second): a started server that has gone fails that activation.
constexpr const wchar_t* instanceMutexName = L"Local\\SessionMgr.ExternalProcessServer";
constexpr const wchar_t* readyEventName = L"Local\\SessionMgr.ExternalProcessServer.Ready";
constexpr DWORD duplicateWaitMilliseconds = 3000;
constexpr DWORD duplicateReadyWaitMilliseconds = 60000;
constexpr DWORD duplicateLingerMilliseconds = 2500;
constexpr DWORD lifetimePollMilliseconds = 200;

bool HasSwitch(const wchar_t* commandLine, const wchar_t* name) {
    for (const wchar_t* at = commandLine; (at = std::wcspbrk(at, L"/-")) != nullptr; ++at) {
        std::size_t length = std::wcslen(name);
        if (::_wcsnicmp(at + 1, name, length) == 0 && (at[1 + length] == 0 || at[1 + length] == L' ')) return true;
    }
    return false;
}

int Serve() {
    UniqueKernelHandle instance(::CreateMutexW(nullptr, FALSE, instanceMutexName));
    if (!instance) return 2;
    UniqueKernelHandle ready(::CreateEventW(nullptr, TRUE, FALSE, readyEventName));
    if (!ready) return 2;
    DWORD waited = ::WaitForSingleObject(instance.Get(), duplicateWaitMilliseconds);
    if (waited != WAIT_OBJECT_0 && waited != WAIT_ABANDONED) {
        ::WaitForSingleObject(ready.Get(), duplicateReadyWaitMilliseconds);
        ::Sleep(duplicateLingerMilliseconds);
        return 0;
    }

    int exitCode = 0;
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) {
        exitCode = 3;
    } else {
        {
            ComPtr<IClassFactory> factory = ComPtr<IClassFactory>::Attach(new ClassFactory<CExternalProcessServer>());
            DWORD cookie = 0;
            if (FAILED(::CoRegisterClassObject(CLSID_ExternalProcessServer, factory.Get(), CLSCTX_LOCAL_SERVER,
                                               REGCLS_MULTIPLEUSE, &cookie))) {
                exitCode = 4;
            } else {
                ::SetEvent(ready.Get());
                while (!ServerLifetime::Instance().ShouldExit(GetModuleLockCount())) ::Sleep(lifetimePollMilliseconds);
                ::ResetEvent(ready.Get());
                ::CoRevokeClassObject(cookie);
            }
        }
        // Disconnects what ended clients left behind, which releases their objects here.
        ::CoUninitialize();
    }
    ::ReleaseMutex(instance.Get());
    return exitCode;
}

int Register(bool add) {
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 3;
    HRESULT result = add ? RegisterExternalProcessServer() : UnregisterExternalProcessServer();
    ::CoUninitialize();
    if (FAILED(result)) {
        std::fprintf(stderr, "%s failed: 0x%08lx\n", add ? "/RegServer" : "/UnregServer",
                     static_cast<unsigned long>(result));
        return 1;
    }
    return 0;
}

}  // namespace
}  // namespace sm

int main() {
    const wchar_t* commandLine = ::GetCommandLineW();
    if (sm::HasSwitch(commandLine, L"RegServer")) return sm::Register(true);
    if (sm::HasSwitch(commandLine, L"UnregServer")) return sm::Register(false);
    return sm::Serve();
}
