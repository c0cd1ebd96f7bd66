// Two processes, one session: run "ExternalDemoClient first" and "ExternalDemoClient second" at
// the same time. Both ask their own in-process manager for "*CUSTOM::Station"; the "*" sends the
// request to the shared external process, so both get the same session object living there.
// The first attaches a text and holds the lock; the second reads the text, waits for the lock and
// gets it once the first unlocks.
#include <windows.h>
#include <ole2.h>

#include <cstdio>
#include <cstring>
#include <string>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

UniqueBstr Bstr(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

std::string Narrow(BSTR text) {
    std::string result;
    for (UINT index = 0; text && index < ::SysStringLen(text); ++index) result += static_cast<char>(text[index]);
    return result;
}

void Say(const char* role, const char* format, auto... values) {
    std::printf("[%s, process %lu] ", role, ::GetCurrentProcessId());
    std::printf(format, values...);
    std::printf("\n");
    std::fflush(stdout);
}

// Manual-reset events shared by the two demo processes.
UniqueKernelHandle Event(const char* name) {
    return UniqueKernelHandle(::CreateEventA(nullptr, TRUE, FALSE, (std::string("Local\\SessionMgrDemo.") + name).c_str()));
}

bool Wait(const char* name) { return ::WaitForSingleObject(Event(name).Get(), 60000) == WAIT_OBJECT_0; }

int Run(bool first) {
    const char* role = first ? "first" : "second";
    ComPtr<IInstrSessionMgr> manager;
    if (FAILED(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                  manager.PutVoid())))
        return 1;
    auto name = Bstr(L"*CUSTOM::Station");
    auto id = Bstr(L"Operator");
    UniqueBstr key;
    manager->GetUniqueKeyName(key.Put());
    ComPtr<IInstrSession> session;
    if (!first && !Wait("Attached")) return 1;
    HRESULT got = manager->GetInstrSession(name.Get(), VARIANT_FALSE, session.Put());
    if (FAILED(got)) {
        Say(role, "GetInstrSession(\"*CUSTOM::Station\") failed: 0x%08lX", static_cast<unsigned long>(got));
        return 1;
    }
    UniqueBstr sessionName;
    session->get_Name(sessionName.Put());
    Say(role, "got session \"%s\" from the shared external process", Narrow(sessionName.Get()).c_str());

    if (first) {
        std::string text = "attached by process " + std::to_string(::GetCurrentProcessId());
        UniqueBstr value(::SysAllocStringLen(nullptr, static_cast<UINT>(text.size())));
        for (std::size_t index = 0; index < text.size(); ++index) value.Get()[index] = static_cast<wchar_t>(text[index]);
        session->AttachString(id.Get(), value.Get());
        session->LockSession(key.Get(), 10, 0);
        Say(role, "attached \"%s\" and locked the session with key %s", text.c_str(), Narrow(key.Get()).c_str());
        ::SetEvent(Event("Attached").Get());
        Wait("Waiting");
        Say(role, "unlocking");
        session->UnlockSession();
        Wait("Done");
    } else {
        UniqueBstr value;
        session->GetString(id.Get(), value.Put());
        Say(role, "read \"%s\"", Narrow(value.Get()).c_str());
        UniqueSafeArray sessions;
        auto all = Bstr(L"*");
        manager->GetSessions(all.Get(), sessions.Put());
        LONG upper = -1;
        if (sessions) ::SafeArrayGetUBound(sessions.Get(), 1, &upper);
        Say(role, "the external manager has %ld session(s)", upper + 1);
        HRESULT busy = session->LockSession(key.Get(), 1, 0);
        Say(role, "LockSession for 1 s: 0x%08lX (held by the other process)", static_cast<unsigned long>(busy));
        ::SetEvent(Event("Waiting").Get());
        HRESULT locked = session->LockSession(key.Get(), 30, 0);
        UniqueBstr owner;
        LONG level = 0;
        session->GetLockState(owner.Put(), &level);
        Say(role, "LockSession for 30 s: 0x%08lX, owner %s, level %ld", static_cast<unsigned long>(locked),
            Narrow(owner.Get()).c_str(), level);
        session->UnlockSession();
        ::SetEvent(Event("Done").Get());
    }
    Say(role, "finished");
    return 0;
}

}  // namespace

int main(int argc, char** argv) {
    bool first = argc > 1 && std::strcmp(argv[1], "first") == 0;
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 1;
    int result = Run(first);
    ::CoUninitialize();
    return result;
}
