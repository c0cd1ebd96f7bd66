// A C++ client of the registered SessionMgr DLL, early-bound through the interfaces of its type
// library. It shows what two modules of one process share through the manager: one session object
// for one name, data items attached by one and read by the other, and the session lock handed from
// one thread to another (a waiter inside LockSession takes the lock as soon as the holder unlocks).
#include <chrono>
#include <cstdio>
#include <future>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

std::mutex printLock;

// Both threads print; whole lines only.
template <class... Arguments>
void Print(const char* format, Arguments... arguments) {
    std::lock_guard guard(printLock);
    std::printf(format, arguments...);
    std::fflush(stdout);
}

std::string Narrow(BSTR text) {
    if (!text || !*text) return {};
    int length = ::SysStringLen(text);
    int bytes = ::WideCharToMultiByte(CP_ACP, 0, text, length, nullptr, 0, nullptr, nullptr);
    std::string narrow(static_cast<std::size_t>(bytes), '\0');
    ::WideCharToMultiByte(CP_ACP, 0, text, length, narrow.data(), bytes, nullptr, nullptr);
    return narrow;
}

UniqueBstr Wide(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

UniqueBstr Wide(const std::string& text) {
    int length = ::MultiByteToWideChar(CP_ACP, 0, text.data(), static_cast<int>(text.size()), nullptr, 0);
    UniqueBstr wide(::SysAllocStringLen(nullptr, static_cast<UINT>(length)));
    ::MultiByteToWideChar(CP_ACP, 0, text.data(), static_cast<int>(text.size()), wide.Get(), length);
    return wide;
}

// The description that the failing method left in the thread's error info.
std::string ErrorDescription() {
    ComPtr<IErrorInfo> info;
    if (::GetErrorInfo(0, info.Put()) != S_OK || !info) return "(no error info)";
    UniqueBstr description;
    info->GetDescription(description.Put());
    return Narrow(description.Get());
}

struct Failure {
    HRESULT result;
    std::string what;
    std::string description;
};

void Check(HRESULT result, const char* what) {
    if (FAILED(result)) throw Failure{result, what, ErrorDescription()};
}

// Every thread that uses the objects joins the multithreaded apartment, where the DLL's free-threaded
// objects live: calls then go straight through the vtables, without proxies.
class Apartment {
public:
    Apartment() { Check(::CoInitializeEx(nullptr, COINIT_MULTITHREADED), "CoInitializeEx"); }
    ~Apartment() { ::CoUninitialize(); }
    Apartment(const Apartment&) = delete;
    Apartment& operator=(const Apartment&) = delete;
};

ComPtr<IInstrSessionMgr> CreateManager() {
    ComPtr<IInstrSessionMgr> manager;
    Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                             manager.PutVoid()),
          "CoCreateInstance(InstrSessionMgr): is SessionMgr.dll registered in this Wine prefix?");
    return manager;
}

ComPtr<IInstrSession> GetSession(IInstrSessionMgr* manager, const wchar_t* name) {
    ComPtr<IInstrSession> session;
    auto bstr = Wide(name);
    Check(manager->GetInstrSession(bstr.Get(), VARIANT_FALSE, session.Put()), "GetInstrSession");
    return session;
}

std::string NewKey(IInstrSessionMgr* manager) {
    UniqueBstr key;
    Check(manager->GetUniqueKeyName(key.Put()), "GetUniqueKeyName");
    return Narrow(key.Get());
}

void PrintLockState(const char* who, IInstrSession* session) {
    UniqueBstr owner;
    LONG level = 0;
    Check(session->GetLockState(owner.Put(), &level), "GetLockState");
    Print("%s GetLockState: owner key \"%s\", nesting level %ld\n", who, Narrow(owner.Get()).c_str(), level);
}

double MillisecondsSince(std::chrono::steady_clock::time_point start) {
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start).count();
}

// Gives back the session, so that it and its items outlive this step.
ComPtr<IInstrSession> ShowSharedSession(IInstrSessionMgr* manager) {
    Print("== One session per name ==\n");
    auto first = GetSession(manager, L"CUSTOM::Bench");
    auto second = GetSession(manager, L"custom/bench");
    ComPtr<IUnknown> firstIdentity = first.As<IUnknown>();
    ComPtr<IUnknown> secondIdentity = second.As<IUnknown>();
    UniqueBstr name, category;
    Check(second->get_Name(name.Put()), "get_Name");
    Check(second->get_Category(category.Put()), "get_Category");
    Print("\"CUSTOM::Bench\" and \"custom/bench\" give %s (name \"%s\", category \"%s\")\n",
          firstIdentity.Get() == secondIdentity.Get() ? "the same object" : "DIFFERENT objects",
          Narrow(name.Get()).c_str(), Narrow(category.Get()).c_str());

    Print("\n== Data items ==\n");
    UniqueBstr id;
    Check(first->GenerateUniqueID(id.Put()), "GenerateUniqueID");
    auto serial = Wide(L"DUT-4711");
    Check(first->AttachString(id.Get(), serial.Get()), "AttachString");
    auto temperature = Wide(L"Temperature");
    Check(first->AttachLong(temperature.Get(), 23), "AttachLong");
    Print("module 1 attached \"%s\" = \"DUT-4711\" and \"Temperature\" = 23\n", Narrow(id.Get()).c_str());
    UniqueBstr readBack;
    LONG degrees = 0;
    Check(second->GetString(id.Get(), readBack.Put()), "GetString");
    Check(second->GetLong(temperature.Get(), &degrees), "GetLong");
    Print("module 2 reads    \"%s\" = \"%s\" and \"Temperature\" = %ld\n", Narrow(id.Get()).c_str(),
          Narrow(readBack.Get()).c_str(), degrees);
    HRESULT duplicate = second->AttachLong(temperature.Get(), 99);
    Print("module 2 attaching \"Temperature\" again: HRESULT 0x%08lX \"%s\"\n", static_cast<unsigned long>(duplicate),
          ErrorDescription().c_str());
    return first;
}

void ShowLockHandOff(IInstrSessionMgr* manager) {
    Print("\n== Lock hand-off between two threads ==\n");
    auto holderSession = GetSession(manager, L"CUSTOM::Bench");
    std::string holderKey = NewKey(manager);
    Check(holderSession->LockSession(Wide(holderKey).Get(), 5.0, 0), "LockSession");
    Print("[main]   locked CUSTOM::Bench with key %s\n", holderKey.c_str());

    std::chrono::steady_clock::time_point unlockedAt;
    std::mutex unlockedAtLock;
    std::promise<void> waiting;
    auto waiterStarted = waiting.get_future();
    std::thread worker([&] {
        try {
            Apartment apartment;
            auto session = GetSession(manager, L"CUSTOM::Bench");
            std::string key = NewKey(manager);
            auto keyBstr = Wide(key);
            Print("[worker] waiting in LockSession with key %s, timeout 10 s\n", key.c_str());
            auto start = std::chrono::steady_clock::now();
            waiting.set_value();
            Check(session->LockSession(keyBstr.Get(), 10.0, 0), "LockSession");
            double waited = MillisecondsSince(start);
            double afterUnlock = 0;
            {
                std::lock_guard guard(unlockedAtLock);
                afterUnlock = MillisecondsSince(unlockedAt);
            }
            Print("[worker] got the lock after waiting %.0f ms, %.1f ms after main unlocked\n", waited, afterUnlock);
            PrintLockState("[worker]", session.Get());
            Check(session->UnlockSession(), "UnlockSession");
            Print("[worker] unlocked\n");
        } catch (const Failure& failure) {
            Print("[worker] %s failed: HRESULT 0x%08lX \"%s\"\n", failure.what.c_str(),
                  static_cast<unsigned long>(failure.result), failure.description.c_str());
        }
    });

    waiterStarted.wait();
    std::this_thread::sleep_for(std::chrono::milliseconds(500));
    PrintLockState("[main]  ", holderSession.Get());
    auto intruder = Wide(L"Intruder");
    HRESULT refused = holderSession->LockSession(intruder.Get(), 0.0, 0);
    Print("[main]   a third key with timeout 0 is refused: HRESULT 0x%08lX \"%s\"\n",
          static_cast<unsigned long>(refused), ErrorDescription().c_str());
    Print("[main]   unlocking\n");
    {
        std::lock_guard guard(unlockedAtLock);
        unlockedAt = std::chrono::steady_clock::now();
        Check(holderSession->UnlockSession(), "UnlockSession");
    }
    worker.join();
    PrintLockState("[main]  ", holderSession.Get());
}

std::vector<std::string> Strings(SAFEARRAY* array) {
    std::vector<std::string> strings;
    LONG upper = -1;
    ::SafeArrayGetUBound(array, 1, &upper);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr element;
        ::SafeArrayGetElement(array, &index, element.Put());
        strings.push_back(Narrow(element.Get()));
    }
    return strings;
}

// What the host's instrument dialogs ask: which names can be opened, which categories exist, which
// sessions are alive. The names come from the simulated configuration file that demo.sh set up.
void ShowListings(IInstrSessionMgr* manager) {
    Print("\n== Listings ==\n");
    auto any = Wide(L""), noFilter = Wide(L"");
    UniqueSafeArray names;
    auto flags = static_cast<GetNamesOptions>(ReturnLogicalNames | ReturnVirtualInstruments | IncludeCategoryPrefix);
    Check(manager->GetNames(any.Get(), flags, noFilter.Get(), names.Put()), "GetNames");
    Print("GetNames(\"\", logical names and virtual instruments, with category prefix):\n");
    for (const auto& name : Strings(names.Get())) Print("   %s\n", name.c_str());

    UniqueSafeArray categories;
    Check(manager->GetCategories(any.Get(), categories.Put()), "GetCategories");
    Print("GetCategories(\"\"):");
    for (const auto& category : Strings(categories.Get())) Print(" %s", category.c_str());
    Print("\n");

    // A logical name of the configuration file opens its virtual instrument's session.
    ComPtr<IInstrSession> dmm;
    auto logicalName = Wide(L"DMM1");
    Check(manager->GetInstrSession(logicalName.Get(), VARIANT_FALSE, dmm.Put()), "GetInstrSession(DMM1)");
    UniqueBstr category;
    Check(dmm->get_Category(category.Put()), "get_Category");
    Print("GetInstrSession(\"DMM1\") gives a session of category %s\n", Narrow(category.Get()).c_str());

    UniqueSafeArray sessions;
    Check(manager->GetSessions(any.Get(), sessions.Put()), "GetSessions");
    LONG upper = -1;
    ::SafeArrayGetUBound(sessions.Get(), 1, &upper);
    Print("GetSessions(\"\"): %ld live sessions:", upper + 1);
    for (LONG index = 0; index <= upper; ++index) {
        ComPtr<IDispatch> element;
        ::SafeArrayGetElement(sessions.Get(), &index, element.PutVoid());
        ComPtr<IInstrSession> session = element.As<IInstrSession>();
        UniqueBstr name, sessionCategory;
        session->get_Name(name.Put());
        session->get_Category(sessionCategory.Put());
        Print(" %s::%s", Narrow(sessionCategory.Get()).c_str(), Narrow(name.Get()).c_str());
    }
    Print("\n");
}

void ShowManagerState(IInstrSessionMgr* manager) {
    Print("\n== Manager state ==\n");
    UniqueBstr state;
    Check(manager->get_StateDescription(state.Put()), "get_StateDescription");
    Print("%s", Narrow(state.Get()).c_str());
}

}  // namespace

int main() {
    try {
        Apartment apartment;
        auto manager = CreateManager();
        auto bench = ShowSharedSession(manager.Get());
        ShowLockHandOff(manager.Get());
        ShowListings(manager.Get());
        ShowManagerState(manager.Get());
        Print("\nDemoClient finished\n");
        return 0;
    } catch (const Failure& failure) {
        Print("%s failed: HRESULT 0x%08lX \"%s\"\n", failure.what.c_str(), static_cast<unsigned long>(failure.result),
              failure.description.c_str());
        return 1;
    }
}
