// A client of the external process: each argument is one step (get=*CUSTOM::Station, lock=unique:10,
// wait=Event, ...) that prints one line for the test to read.
#include <windows.h>

#include <cstdio>
#include <cstdlib>
#include <map>
#include <string>

#include "com/BstrConversion.h"
#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"
#include "manager/ExternalProcessServer.h"

using namespace sm;

namespace {

UniqueBstr Bstr(const std::string& text) { return UniqueBstr(AnsiToBstr(text)); }
std::string Text(BSTR text) { return BstrToMultiByte(text); }

// The thread's error text on one line, or "<none>".
std::string Description() {
    ComPtr<IErrorInfo> info;
    UniqueBstr text;
    if (::GetErrorInfo(0, info.Put()) != S_OK || FAILED(info->GetDescription(text.Put()))) return "<none>";
    std::string result = Text(text.Get());
    for (std::size_t at; (at = result.find('\n')) != std::string::npos;) result.replace(at, 1, "\\n");
    return result;
}

ComPtr<IExternalProcessServer> Server() {
    ComPtr<IExternalProcessServer> server;
    ::CoCreateInstance(CLSID_ExternalProcessServer, nullptr, CLSCTX_LOCAL_SERVER, IID_IExternalProcessServer, server.PutVoid());
    return server;
}

struct Client {
    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IInstrSession> session;
    // Open until the process ends, so a signal set before the other side opens it is not lost.
    std::map<std::string, UniqueKernelHandle> events;

    HANDLE Event(const std::string& name) {
        auto& event = events[name];
        if (!event) event.Reset(::CreateEventA(nullptr, TRUE, FALSE, ("Local\\SmExternalTest." + name).c_str()));
        return event.Get();
    }

    bool Run(const std::string& verb, const std::string& argument) {
        std::string first = argument.substr(0, argument.find(':'));
        std::string second = argument.substr(first.size() + (first.size() < argument.size() ? 1 : 0));
        auto text = Bstr(first);
        bool needsSession = verb == "attach" || verb == "read" || verb == "lock" || verb == "unlock" || verb == "break";
        if (needsSession && !session) return !std::printf("%s: no session\n", verb.c_str());
        HRESULT result = S_OK;
        LONG number = 0, count = -1;
        VARIANT_BOOL flag = VARIANT_FALSE;
        UniqueBstr out;
        if (verb == "get") {
            if (FAILED(result = manager->GetInstrSession(Bstr(argument).Get(), VARIANT_FALSE, session.Put())))
                return std::printf("get %s hr=0x%08lx desc=%s\n", argument.c_str(), result, Description().c_str());
            session->get_Name(out.Put());
            session->get_InExternalProcess(&flag);
            std::printf("get %s hr=0x%08lx name=%s external=%d\n", argument.c_str(), result, Text(out.Get()).c_str(), flag);
        } else if (verb == "attach") {
            std::printf("attach hr=0x%08lx\n", session->AttachLong(text.Get(), std::atol(second.c_str())));
        } else if (verb == "read") {
            result = session->GetLong(text.Get(), &number);
            std::printf("read hr=0x%08lx value=%ld\n", result, number);
        } else if (verb == "lock") {
            if (first == "unique") manager->GetUniqueKeyName(text.Put());
            std::printf("lock %s hr=0x%08lx\n", second.c_str(), session->LockSession(text.Get(), std::atof(second.c_str()), 0));
        } else if (verb == "unlock") {
            std::printf("unlock hr=0x%08lx\n", session->UnlockSession());
        } else if (verb == "break") {
            // A lock left by a process that has gone: any client may unwind it, level by level.
            session->GetLockState(out.Put(), &number);
            for (LONG unwound = 0; unwound < number; ++unwound) session->UnlockSession();
            std::printf("break owner=%s levels=%ld\n", Text(out.Get()).c_str(), number);
        } else if (UniqueSafeArray list; verb == "sessions") {
            result = manager->GetSessions(text.Get(), list.Put());
            if (list) ::SafeArrayGetUBound(list.Get(), 1, &count);
            std::printf("sessions %s hr=0x%08lx count=%ld\n", argument.c_str(), result, count + 1);
        } else if (verb == "describe") {
            result = manager->get_StateDescription(out.Put());
            std::string all = Text(out.Get());
            std::size_t local = all.find("In Process State:\n"), external = all.find("Out of Process State:\n");
            std::printf("describe hr=0x%08lx local=%d externalAfterLocal=%d names=%d\n", result, local != std::string::npos,
                        external != std::string::npos && external > local, all.find(argument, external) != std::string::npos);
        } else if (verb == "alerts") {
            // The external manager's own view, reached as the manager reaches it.
            manager->put_AudibleLifeTimeAlerts(argument == "1" ? VARIANT_TRUE : VARIANT_FALSE);
            ComPtr<IUnknown> created;
            Server()->CreateObjectInServer(Bstr("{7D4A10B1-2C88-4E21-B3F6-91E5A07D2C3B}").Get(),
                                           Bstr("{7D4A10B0-2C88-4E21-B3F6-91E5A07D2C3B}").Get(), created.Put());
            result = created.As<IInstrSessionMgr>()->get_AudibleLifeTimeAlerts(&flag);
            std::printf("alerts hr=0x%08lx external=%d\n", result, flag);
        } else if (verb == "server") {
            auto server = Server();
            server->get_ProcessId(&number);
            server->get_ClientProcessCount(&count);
            std::printf("server pid=%ld clients=%ld\n", number, count);
        } else if (verb == "foreign") {
            // A class that is not ours, late-bound (DISPID 7): Wine carries the server's error text only in EXCEPINFO.
            auto foreign = Bstr("{00020424-0000-0000-C000-000000000046}"), iid = Bstr("{00000000-0000-0000-C000-000000000046}");
            VARIANT arguments[2] = {};  // last argument first
            arguments[0].vt = arguments[1].vt = VT_BSTR;
            arguments[0].bstrVal = iid.Get();
            arguments[1].bstrVal = foreign.Get();
            DISPPARAMS parameters = {arguments, nullptr, 2, 0};
            UniqueVariant result;
            UniqueExcepInfo exception;
            HRESULT late = Server()->Invoke(7, IID_NULL, 0, DISPATCH_METHOD, &parameters, result.Get(), &exception, nullptr);
            std::printf("foreign dispatch hr=0x%08lx scode=0x%08lx desc=%s\n", late, exception.scode, Text(exception.bstrDescription).c_str());
        } else if (verb == "signal") {
            ::SetEvent(Event(argument));
        } else if (verb == "wait") {
            if (::WaitForSingleObject(Event(argument), 90000) != WAIT_OBJECT_0) return !std::printf("wait %s timed out\n", argument.c_str());
        } else if (verb == "crash") {
            // Gone without releasing anything and without CoUninitialize, as a crashed client is.
            ::TerminateProcess(::GetCurrentProcess(), 9);
        } else {
            return !std::printf("unknown step %s\n", verb.c_str());
        }
        return true;
    }
};

}  // namespace

int main(int argc, char** argv) {
    std::setvbuf(stdout, nullptr, _IONBF, 0);
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 4;
    bool succeeded = true;
    {
        Client client;
        succeeded = SUCCEEDED(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER,
                                                 IID_IInstrSessionMgr, client.manager.PutVoid()));
        for (int index = 1; index < argc && succeeded; ++index) {
            std::string step = argv[index];
            std::size_t equals = step.find('=');
            succeeded = client.Run(step.substr(0, equals), equals == std::string::npos ? "" : step.substr(equals + 1));
        }
    }
    ::CoUninitialize();
    return succeeded ? 0 : 3;
}
