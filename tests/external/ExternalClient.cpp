// A client process of the shared external process, driven by its command line: each argument is
// one step (get=*CUSTOM::Station, attach=Id:5, lock=unique:10, wait=Event, ...). Every step prints
// one line of results; the test that started the process reads them from its output file.
#include <windows.h>
#include <ole2.h>

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

constexpr DWORD eventWaitMilliseconds = 90000;

UniqueBstr Bstr(const std::string& text) { return UniqueBstr(AnsiToBstr(text)); }

std::string Description() {
    ComPtr<IErrorInfo> info;
    if (::GetErrorInfo(0, info.Put()) != S_OK || !info) return "<none>";
    UniqueBstr text;
    info->GetDescription(text.Put());
    std::string result = BstrToMultiByte(text.Get());
    for (std::size_t at = 0; (at = result.find('\n', at)) != std::string::npos;) result.replace(at, 1, "\\n");
    return result;
}

void Print(const char* format, auto... values) {
    std::printf(format, values...);
    std::printf("\n");
    std::fflush(stdout);
}

UniqueKernelHandle Event(const std::string& name) {
    return UniqueKernelHandle(::CreateEventA(nullptr, TRUE, FALSE, ("Local\\SmExternalTest." + name).c_str()));
}

ComPtr<IExternalProcessServer> Server() {
    ComPtr<IExternalProcessServer> server;
    ::CoCreateInstance(CLSID_ExternalProcessServer, nullptr, CLSCTX_LOCAL_SERVER, IID_IExternalProcessServer,
                       server.PutVoid());
    return server;
}

ComPtr<IInstrSessionMgr> ExternalManager(IExternalProcessServer* server) {
    ComPtr<IUnknown> created;
    auto clsid = Bstr("{7D4A10B1-2C88-4E21-B3F6-91E5A07D2C3B}");
    auto iid = Bstr("{7D4A10B0-2C88-4E21-B3F6-91E5A07D2C3B}");
    if (server) server->CreateObjectInServer(clsid.Get(), iid.Get(), created.Put());
    return created ? created.As<IInstrSessionMgr>() : ComPtr<IInstrSessionMgr>();
}

struct Client {
    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IInstrSession> session;
    // Open until the process ends, so a signal set before the other side opens it is not lost.
    std::map<std::string, UniqueKernelHandle> events;

    HANDLE EventHandle(const std::string& name) {
        auto& handle = events[name];
        if (!handle) handle = Event(name);
        return handle.Get();
    }

    int Run(const std::string& step) {
        std::size_t equals = step.find('=');
        std::string verb = step.substr(0, equals);
        std::string argument = equals == std::string::npos ? "" : step.substr(equals + 1);
        std::string first = argument.substr(0, argument.find(':'));
        std::string second = argument.find(':') == std::string::npos ? "" : argument.substr(argument.find(':') + 1);

        if (verb == "get") {
            auto name = Bstr(argument);
            HRESULT result = manager->GetInstrSession(name.Get(), VARIANT_FALSE, session.Put());
            Print("get %s hr=0x%08lx desc=%s", argument.c_str(), result, FAILED(result) ? Description().c_str() : "");
        } else if (verb == "name") {
            UniqueBstr name;
            VARIANT_BOOL external = VARIANT_FALSE;
            session->get_Name(name.Put());
            session->get_InExternalProcess(&external);
            Print("name=%s external=%d", BstrToMultiByte(name.Get()).c_str(), external);
        } else if (verb == "attach") {
            auto id = Bstr(first);
            Print("attach hr=0x%08lx", session->AttachLong(id.Get(), std::atol(second.c_str())));
        } else if (verb == "read") {
            auto id = Bstr(argument);
            LONG value = 0;
            HRESULT result = session->GetLong(id.Get(), &value);
            Print("read hr=0x%08lx value=%ld", result, value);
        } else if (verb == "lock") {
            UniqueBstr key;
            if (first == "unique")
                manager->GetUniqueKeyName(key.Put());
            else
                key = Bstr(first);
            HRESULT result = session->LockSession(key.Get(), std::atof(second.c_str()), 0);
            Print("lock %s hr=0x%08lx", second.c_str(), result);
        } else if (verb == "unlock") {
            Print("unlock hr=0x%08lx", session->UnlockSession());
        } else if (verb == "lockstate") {
            UniqueBstr owner;
            LONG level = 0;
            session->GetLockState(owner.Put(), &level);
            Print("lockstate owner=%s level=%ld", BstrToMultiByte(owner.Get()).c_str(), level);
        } else if (verb == "break") {
            // A lock left by a process that has gone: the owner key is known, any client may unwind it.
            UniqueBstr owner;
            LONG level = 0;
            session->GetLockState(owner.Put(), &level);
            for (LONG unwound = 0; unwound < level; ++unwound) session->UnlockSession();
            Print("break owner=%s levels=%ld", BstrToMultiByte(owner.Get()).c_str(), level);
        } else if (verb == "sessions") {
            auto category = Bstr(argument);
            UniqueSafeArray list;
            HRESULT result = manager->GetSessions(category.Get(), list.Put());
            LONG upper = -1;
            if (list) ::SafeArrayGetUBound(list.Get(), 1, &upper);
            Print("sessions %s hr=0x%08lx count=%ld", argument.c_str(), result, upper + 1);
        } else if (verb == "describe") {
            UniqueBstr text;
            HRESULT result = manager->get_StateDescription(text.Put());
            std::string description = BstrToMultiByte(text.Get());
            std::size_t local = description.find("In Process State:\n");
            std::size_t external = description.find("Out of Process State:\n");
            Print("describe hr=0x%08lx local=%d external=%d externalAfterLocal=%d names=%d", result,
                  local != std::string::npos, external != std::string::npos,
                  local != std::string::npos && external != std::string::npos && external > local,
                  description.find(argument) != std::string::npos);
        } else if (verb == "alerts") {
            manager->put_AudibleLifeTimeAlerts(argument == "1" ? VARIANT_TRUE : VARIANT_FALSE);
            auto external = ExternalManager(Server().Get());
            VARIANT_BOOL value = VARIANT_FALSE;
            HRESULT result = external ? external->get_AudibleLifeTimeAlerts(&value) : E_POINTER;
            Print("alerts hr=0x%08lx external=%d", result, value);
        } else if (verb == "server") {
            auto server = Server();
            LONG processId = 0, clients = 0;
            if (server) {
                server->get_ProcessId(&processId);
                server->get_ClientProcessCount(&clients);
            }
            Print("server pid=%ld clients=%ld", processId, clients);
        } else if (verb == "foreign") {
            ForeignClass();
        } else if (verb == "release") {
            session.Reset();
            Print("released");
        } else if (verb == "signal") {
            ::SetEvent(EventHandle(argument));
        } else if (verb == "wait") {
            if (::WaitForSingleObject(EventHandle(argument), eventWaitMilliseconds) != WAIT_OBJECT_0) {
                Print("wait %s timed out", argument.c_str());
                return 3;
            }
        } else if (verb == "crash") {
            // Gone without releasing anything and without CoUninitialize, as a crashed client is.
            ::TerminateProcess(::GetCurrentProcess(), 9);
        } else {
            Print("unknown step %s", step.c_str());
            return 2;
        }
        return 0;
    }

    // A class that is not one of ours, asked for early-bound and late-bound.
    static void ForeignClass() {
        auto server = Server();
        auto foreign = Bstr("{00020424-0000-0000-C000-000000000046}");
        auto unknown = Bstr("{00000000-0000-0000-C000-000000000046}");
        ComPtr<IUnknown> object;
        ::SetErrorInfo(0, nullptr);
        HRESULT early = server->CreateObjectInServer(foreign.Get(), unknown.Get(), object.Put());
        Print("foreign vtable hr=0x%08lx desc=%s", early, Description().c_str());

        DISPID member = 0;
        wchar_t name[] = L"CreateObjectInServer";
        LPOLESTR names[] = {name};
        server->GetIDsOfNames(IID_NULL, names, 1, LOCALE_USER_DEFAULT, &member);
        VARIANT arguments[2];
        arguments[0].vt = VT_BSTR;  // reverse order: the IID text, then the CLSID text
        arguments[0].bstrVal = unknown.Get();
        arguments[1].vt = VT_BSTR;
        arguments[1].bstrVal = foreign.Get();
        DISPPARAMS parameters = {arguments, nullptr, 2, 0};
        UniqueVariant result;
        EXCEPINFO exception = {};
        HRESULT late = server->Invoke(member, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_METHOD, &parameters,
                                      result.Get(), &exception, nullptr);
        std::string description = BstrToMultiByte(exception.bstrDescription);
        ::SysFreeString(exception.bstrDescription);
        ::SysFreeString(exception.bstrSource);
        ::SysFreeString(exception.bstrHelpFile);
        Print("foreign dispatch hr=0x%08lx scode=0x%08lx desc=%s", late, exception.scode, description.c_str());
    }
};

}  // namespace

int main(int argc, char** argv) {
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 4;
    int exitCode = 0;
    {
        Client client;
        if (FAILED(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                      client.manager.PutVoid())))
            exitCode = 5;
        for (int index = 1; index < argc && exitCode == 0; ++index) exitCode = client.Run(argv[index]);
    }
    ::CoUninitialize();
    return exitCode;
}
