// Client processes sharing sessions through the external-process server. Each test starts real
// client processes (ExternalClient.exe, and Wine's cscript for the script client), coordinates
// them with named events and reads what each printed. Every test ends by waiting, with a bound,
// for the server to leave after its last client, so the next test starts a fresh one.
#include <windows.h>

#include <fstream>
#include <initializer_list>
#include <string>
#include <vector>

#include "com/ComTestSupport.h"

namespace {

using sm::UniqueKernelHandle;

constexpr DWORD processBoundMilliseconds = 120000;
constexpr DWORD serverExitBoundMilliseconds = 30000;

std::wstring Wide(const std::string& text) { return std::wstring(text.begin(), text.end()); }

// Wine maps the Unix root to drive Z:.
std::string WindowsPath(std::string path) {
    for (char& c : path)
        if (c == '/') c = '\\';
    return "Z:" + path;
}

UniqueKernelHandle Event(const std::string& name) {
    return UniqueKernelHandle(::CreateEventA(nullptr, TRUE, FALSE, ("Local\\SmExternalTest." + name).c_str()));
}

// Keeps the events of one test open for its whole run: a signal set while no other process has the
// event open would otherwise vanish with the last handle.
class Events {
public:
    Events(std::initializer_list<const char*> names) {
        for (const char* name : names) held.push_back(Event(name));
    }

private:
    std::vector<UniqueKernelHandle> held;
};

class Process {
public:
    Process(const std::string& name, const std::string& commandLine) : output(std::string(OUTPUT_DIR) + "/" + name + ".out") {
        SECURITY_ATTRIBUTES inherit = {sizeof inherit, nullptr, TRUE};
        UniqueKernelHandle file(::CreateFileA(output.c_str(), GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE, &inherit,
                                              CREATE_ALWAYS, FILE_ATTRIBUTE_NORMAL, nullptr));
        STARTUPINFOW startup = {};
        startup.cb = sizeof startup;
        startup.dwFlags = STARTF_USESTDHANDLES;
        startup.hStdOutput = startup.hStdError = file.Get();
        std::wstring command = Wide(commandLine);
        PROCESS_INFORMATION started = {};
        if (::CreateProcessW(nullptr, command.data(), nullptr, nullptr, TRUE, 0, nullptr, nullptr, &startup, &started)) {
            process.Reset(started.hProcess);
            ::CloseHandle(started.hThread);
        }
        EXPECT_TRUE(process) << commandLine;
    }

    // The exit code, or -1 when the process did not end within the bound.
    long Finish() {
        if (!process || ::WaitForSingleObject(process.Get(), processBoundMilliseconds) != WAIT_OBJECT_0) return -1;
        DWORD code = 0;
        ::GetExitCodeProcess(process.Get(), &code);
        return static_cast<long>(code);
    }

    // The first printed line that begins with prefix (empty when there is none).
    std::string Line(const std::string& prefix, int occurrence = 1) const {
        std::ifstream in(output);
        for (std::string line; std::getline(in, line);) {
            if (!line.empty() && line.back() == '\r') line.pop_back();
            if (line.rfind(prefix, 0) == 0 && --occurrence == 0) return line;
        }
        return {};
    }

private:
    std::string output;
    UniqueKernelHandle process;
};

Process Client(const std::string& name, const std::string& steps) {
    return Process(name, "\"" + WindowsPath(CLIENT_EXE) + "\" " + steps);
}

void RunServerSwitch(const std::string& name, const char* flag) {
    Process registration(name, "\"" + WindowsPath(SERVER_EXE) + "\" " + flag);
    ASSERT_EQ(registration.Finish(), 0) << flag;
}

// The server's process ID from a client's "server" line.
DWORD ServerProcessId(const Process& client) {
    std::string line = client.Line("server pid=");
    return line.empty() ? 0 : static_cast<DWORD>(std::stoul(line.substr(11)));
}

// True when the server process has gone (or was gone already) within the bound.
bool ServerEnds(DWORD processId) {
    UniqueKernelHandle server(::OpenProcess(SYNCHRONIZE, FALSE, processId));
    return !server || ::WaitForSingleObject(server.Get(), serverExitBoundMilliseconds) == WAIT_OBJECT_0;
}

bool WaitFor(const std::string& name) {
    return ::WaitForSingleObject(Event(name).Get(), processBoundMilliseconds) == WAIT_OBJECT_0;
}

// Two processes: one attaches a data item and holds the lock, the other reads the item, waits for
// the lock and gets it after the unlock; both see one session, through one server.
TEST(SharedSession, TwoProcessesShareDataLockAndOneServer) {
    Events events{"Share.Held", "Share.Waiting", "Share.Done"};
    // The second client asks for the server at the same time as the first one starts it.
    Process holder = Client("holder", "get=*CUSTOM::Station attach=Counter:42 lock=unique:10 server signal=Share.Held "
                                      "wait=Share.Waiting unlock sessions=* wait=Share.Done");
    Process waiter = Client("waiter", "server wait=Share.Held get=*CUSTOM::Station read=Counter name sessions=* "
                                      "lock=unique:0.5 signal=Share.Waiting lock=unique:60 lockstate signal=Share.Done");
    EXPECT_EQ(holder.Finish(), 0);
    EXPECT_EQ(waiter.Finish(), 0);

    EXPECT_EQ(holder.Line("get "), "get *CUSTOM::Station hr=0x00000000 desc=");
    EXPECT_EQ(waiter.Line("read"), "read hr=0x00000000 value=42");
    EXPECT_EQ(waiter.Line("name"), "name=*Station external=-1");
    EXPECT_EQ(holder.Line("sessions"), "sessions * hr=0x00000000 count=1");
    EXPECT_EQ(waiter.Line("sessions"), "sessions * hr=0x00000000 count=1");
    // Held by the other process: the short attempt times out, the long one gets the lock after the unlock.
    EXPECT_EQ(waiter.Line("lock", 1), "lock 0.5 hr=0xffffbc06");
    EXPECT_EQ(waiter.Line("lock", 2), "lock 60 hr=0x00000000");
    EXPECT_EQ(waiter.Line("lockstate").substr(0, 20), "lockstate owner=Lock");
    // A duplicate server started by the simultaneous activation does not serve anyone.
    EXPECT_EQ(ServerProcessId(holder), ServerProcessId(waiter));
    EXPECT_EQ(holder.Line("server").substr(holder.Line("server").find("clients=")), "clients=2");
    EXPECT_TRUE(ServerEnds(ServerProcessId(holder))) << "the server outlived its last client";
}

// Which prefixes are forwarded, what the broadcasts reach, and what a refused class looks like.
TEST(Forwarding, PrefixesBroadcastsAndRefusedClasses) {
    Process client = Client("routing", "get=32*VISA::x get=*CUSTOM::Routed name get=32*RQ::Route1 name "
                                       "describe=Route1 alerts=1 alerts=0 foreign server");
    EXPECT_EQ(client.Finish(), 0);
    EXPECT_EQ(client.Line("name", 1), "name=*Routed external=-1");
    // Wine has one external process for both: the 32-bit request reaches the same server.
    EXPECT_EQ(client.Line("get 32*RQ"), "get 32*RQ::Route1 hr=0x00000000 desc=");
    EXPECT_EQ(client.Line("name", 2).substr(client.Line("name", 2).find("external=")), "external=-1");
    // Not an external prefix: an ordinary (unknown) name of this process, with its error info.
    EXPECT_EQ(client.Line("get 32*VISA"), "get 32*VISA::x hr=0xffffbc68 desc='32*VISA::x' is not a driver session name");
    EXPECT_EQ(client.Line("describe"), "describe hr=0x00000000 local=1 external=1 externalAfterLocal=1 names=1");
    EXPECT_EQ(client.Line("alerts", 1), "alerts hr=0x00000000 external=-1");
    EXPECT_EQ(client.Line("alerts", 2), "alerts hr=0x00000000 external=0");
    // Early-bound, Wine delivers the HRESULT without the server's error info; late-bound, the
    // description arrives in EXCEPINFO.
    EXPECT_EQ(client.Line("foreign vtable").substr(0, 30), "foreign vtable hr=0x80040111 d");
    EXPECT_EQ(client.Line("foreign dispatch"),
              "foreign dispatch hr=0x80020009 scode=0x80040111 desc=The external process server creates only "
              "SessionMgr classes; '{00020424-0000-0000-C000-000000000046}' is not one of them.");
    EXPECT_TRUE(ServerEnds(ServerProcessId(client)));
}

// A server that cannot be started fails the call with the connection message; the next call
// starts it.
TEST(ServerStart, FailureReportsAndTheNextCallRetries) {
    Events events{"Retry.Failed", "Retry.Registered"};
    RunServerSwitch("unregister", "/UnregServer");
    Process client = Client("retry", "get=*CUSTOM::Retry signal=Retry.Failed wait=Retry.Registered get=*CUSTOM::Retry server");
    bool failed = WaitFor("Retry.Failed");
    RunServerSwitch("register", "/RegServer");
    ::SetEvent(Event("Retry.Registered").Get());
    EXPECT_TRUE(failed);
    EXPECT_EQ(client.Finish(), 0);
    EXPECT_EQ(client.Line("get", 1),
              "get *CUSTOM::Retry hr=0x80004003 desc=An error occurred creating the session manager in the external "
              "process.\\nRestart Verentis to recover.\\n");
    EXPECT_EQ(client.Line("get", 2), "get *CUSTOM::Retry hr=0x00000000 desc=");
    EXPECT_TRUE(ServerEnds(ServerProcessId(client)));
}

// A client that dies holding the lock: the other client sees the dead key, unwinds it and locks;
// the server no longer counts the dead process and leaves after the living one, although the
// dead one's references never come back.
TEST(VanishedClient, LockCanBeBrokenAndTheServerStillEnds) {
    Events events{"Gone.Locked", "Gone.Attached", "Gone.Dead"};
    Process crashed = Client("crashed", "get=*CUSTOM::Abandoned lock=Crashed:5 signal=Gone.Locked wait=Gone.Attached crash");
    Process survivor = Client("survivor", "wait=Gone.Locked get=*CUSTOM::Abandoned signal=Gone.Attached "
                                          "wait=Gone.Dead break lock=unique:5 server");
    EXPECT_EQ(crashed.Finish(), 9);
    ::SetEvent(Event("Gone.Dead").Get());
    EXPECT_EQ(survivor.Finish(), 0);
    EXPECT_EQ(survivor.Line("break"), "break owner=Crashed levels=1");
    EXPECT_EQ(survivor.Line("lock"), "lock 5 hr=0x00000000");
    EXPECT_EQ(survivor.Line("server").substr(survivor.Line("server").find("clients=")), "clients=1");
    EXPECT_TRUE(ServerEnds(ServerProcessId(survivor)));
}

// The script client (Wine's VBScript, late-bound, in a single-threaded apartment) reads what a
// C++ process attached.
TEST(ScriptClient, ReadsTheItemAttachedByAnotherProcess) {
    Events events{"Script.Attached", "Script.Done"};
    Process holder = Client("scriptholder", "get=*CUSTOM::Station attach=Counter:7 signal=Script.Attached "
                                            "wait=Script.Done server");
    ASSERT_TRUE(WaitFor("Script.Attached"));
    Process script("script", "cscript.exe //nologo \"" + WindowsPath(READER_VBS) + "\"");
    EXPECT_EQ(script.Finish(), 0);
    ::SetEvent(Event("Script.Done").Get());
    EXPECT_EQ(holder.Finish(), 0);
    EXPECT_EQ(script.Line("read="), "read=7");
    EXPECT_EQ(script.Line("name="), "name=*Station");
    EXPECT_EQ(script.Line("fails="), "fails=0");
    EXPECT_TRUE(ServerEnds(ServerProcessId(holder)));
}

}  // namespace
