// Client processes (ExternalClient.exe) sharing sessions through the external-process server,
// coordinated with named events; every test ends by waiting for the server to leave.
#include <windows.h>

#include <fstream>
#include <string>
#include <vector>

#include "com/ComTestSupport.h"

namespace {

using sm::UniqueKernelHandle;

std::string WindowsPath(std::string path) {  // Wine maps the Unix root to drive Z:
    for (char& c : path) c = c == '/' ? '\\' : c;
    return "\"Z:" + path + "\" ";
}

// Opens events for the whole test, so that a signal set while no one else holds one is not lost.
std::vector<UniqueKernelHandle> Events(std::vector<std::string> names) {
    std::vector<UniqueKernelHandle> events;
    for (auto& name : names) events.emplace_back(::CreateEventA(nullptr, TRUE, FALSE, ("Local\\SmExternalTest." + name).c_str()));
    return events;
}

// A program whose output goes to OUTPUT_DIR/<name>.out.
class Process {
public:
    Process(const std::string& name, std::string command) : output(std::string(OUTPUT_DIR) + "/" + name + ".out") {
        SECURITY_ATTRIBUTES inherit = {sizeof inherit, nullptr, TRUE};
        UniqueKernelHandle file(::CreateFileA(output.c_str(), GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE, &inherit,
                                              CREATE_ALWAYS, 0, nullptr));
        STARTUPINFOA startup = {};
        startup.cb = sizeof startup;
        startup.dwFlags = STARTF_USESTDHANDLES;
        startup.hStdOutput = startup.hStdError = file.Get();
        PROCESS_INFORMATION started = {};
        EXPECT_TRUE(::CreateProcessA(nullptr, command.data(), nullptr, nullptr, TRUE, 0, nullptr, nullptr, &startup, &started));
        process.Reset(started.hProcess);
        thread.Reset(started.hThread);
    }
    // The exit code; -1 when the process is still running after two minutes.
    long Finish() {
        DWORD code = static_cast<DWORD>(-1);
        if (::WaitForSingleObject(process.Get(), 120000) == WAIT_OBJECT_0) ::GetExitCodeProcess(process.Get(), &code);
        return static_cast<long>(code);
    }
    // The occurrence-th printed line that begins with prefix.
    std::string Line(const std::string& prefix, int occurrence = 1) const {
        std::ifstream in(output);
        for (std::string line; std::getline(in, line);)
            if (line.rfind(prefix, 0) == 0 && --occurrence == 0) return line.substr(0, line.find_last_not_of('\r') + 1);
        return {};
    }
    // True when the server this client named has gone (or was gone) within 30 s.
    bool ServerEnds() const {
        std::string line = Line("server pid=");
        UniqueKernelHandle server(::OpenProcess(SYNCHRONIZE, FALSE, std::stoul(line.substr(11))));
        return !server || ::WaitForSingleObject(server.Get(), 30000) == WAIT_OBJECT_0;
    }

private:
    std::string output;
    UniqueKernelHandle process, thread;
};

Process Client(const std::string& name, const std::string& steps) { return Process(name, WindowsPath(CLIENT_EXE) + steps); }

// Two processes share an item, the lock and one server.
TEST(SharedSession, ProcessesShareDataLockAndOneServer) {
    auto events = Events({"Held", "Waiting", "Done"});
    // The second asks for the server at the moment the first starts it: still one server.
    Process holder = Client("holder", "get=*CUSTOM::Station attach=Counter:42 lock=unique:10 server signal=Held "
                                      "wait=Waiting unlock sessions=* wait=Done");
    Process waiter = Client("waiter", "server wait=Held get=*CUSTOM::Station read=Counter sessions=* lock=unique:0.5 "
                                      "signal=Waiting lock=unique:60 signal=Done");
    EXPECT_EQ(holder.Finish(), 0);
    EXPECT_EQ(waiter.Finish(), 0);
    EXPECT_EQ(waiter.Line("get"), "get *CUSTOM::Station hr=0x00000000 name=*Station external=-1");
    EXPECT_EQ(waiter.Line("read"), "read hr=0x00000000 value=42");
    EXPECT_EQ(holder.Line("sessions"), "sessions * hr=0x00000000 count=1");
    EXPECT_EQ(waiter.Line("sessions"), "sessions * hr=0x00000000 count=1");
    EXPECT_EQ(waiter.Line("lock", 1), "lock 0.5 hr=0xffffbc06");  // held by the other process
    EXPECT_EQ(waiter.Line("lock", 2), "lock 60 hr=0x00000000");   // after its unlock
    EXPECT_EQ(holder.Line("server").substr(0, 11), waiter.Line("server").substr(0, 11));
    EXPECT_EQ(holder.Line("server").substr(holder.Line("server").find(" clients")), " clients=2");
    EXPECT_TRUE(holder.ServerEnds()) << "the server outlived its last client";
}

TEST(Forwarding, PrefixesBroadcastsAndRefusedClasses) {
    Process client = Client("routing", "get=32*VISA::x get=*CUSTOM::Routed get=32*RQ::Route1 describe=Route1 alerts=1 "
                                       "alerts=0 foreign server");
    EXPECT_EQ(client.Finish(), 0);
    // "32*VISA" is no external prefix: an unknown name of this process, with its error info.
    EXPECT_EQ(client.Line("get 32*V"), "get 32*VISA::x hr=0xffffbc68 desc='32*VISA::x' is not a driver session name");
    EXPECT_EQ(client.Line("get *"), "get *CUSTOM::Routed hr=0x00000000 name=*Routed external=-1");
    // Wine ignores the 32-bit activation flag: "32*RQ" reaches the same server.
    EXPECT_EQ(client.Line("get 32*R"), "get 32*RQ::Route1 hr=0x00000000 name=*Route1 external=-1");
    EXPECT_EQ(client.Line("describe"), "describe hr=0x00000000 local=1 externalAfterLocal=1 names=1");
    EXPECT_EQ(client.Line("alerts", 1), "alerts hr=0x00000000 external=-1");
    EXPECT_EQ(client.Line("alerts", 2), "alerts hr=0x00000000 external=0");
    // The server refuses a class that is not ours, with its text.
    EXPECT_EQ(client.Line("foreign dispatch"), "foreign dispatch hr=0x80020009 scode=0x80040111 desc=The external process "
              "server creates only SessionMgr classes; '{00020424-0000-0000-C000-000000000046}' is not one of them.");
    EXPECT_TRUE(client.ServerEnds());
}

TEST(ServerStart, FailureReportsAndTheNextCallRetries) {
    auto events = Events({"Failed", "Registered"});
    EXPECT_EQ(Process("unregister", WindowsPath(SERVER_EXE) + "/UnregServer").Finish(), 0);
    Process client = Client("retry", "get=*CUSTOM::Retry signal=Failed wait=Registered get=*CUSTOM::Retry server");
    EXPECT_EQ(::WaitForSingleObject(events[0].Get(), 120000), WAIT_OBJECT_0);
    EXPECT_EQ(Process("register", WindowsPath(SERVER_EXE) + "/RegServer").Finish(), 0);
    ::SetEvent(events[1].Get());
    EXPECT_EQ(client.Finish(), 0);
    EXPECT_EQ(client.Line("get"), "get *CUSTOM::Retry hr=0x80004003 desc=An error occurred creating the session manager "
                                  "in the external process.\\nRestart Verentis to recover.\\n");
    EXPECT_EQ(client.Line("get", 2), "get *CUSTOM::Retry hr=0x00000000 name=*Retry external=-1");
    EXPECT_TRUE(client.ServerEnds());
}

// A client dies holding the lock and its references: the other unwinds the lock, the server stops
// counting the dead process and still leaves after the living one.
TEST(VanishedClient, LockCanBeBrokenAndTheServerStillEnds) {
    auto events = Events({"Locked", "Attached", "Dead"});
    Process crashed = Client("crashed", "get=*CUSTOM::Left lock=Crashed:5 signal=Locked wait=Attached crash");
    Process survivor = Client("survivor", "wait=Locked get=*CUSTOM::Left signal=Attached wait=Dead break lock=unique:5 server");
    EXPECT_EQ(crashed.Finish(), 9);
    ::SetEvent(events[2].Get());
    EXPECT_EQ(survivor.Finish(), 0);
    EXPECT_EQ(survivor.Line("break"), "break owner=Crashed levels=1");
    EXPECT_EQ(survivor.Line("lock"), "lock 5 hr=0x00000000");
    EXPECT_EQ(survivor.Line("server").substr(survivor.Line("server").find(" clients")), " clients=1");
    EXPECT_TRUE(survivor.ServerEnds());
}

}  // namespace
