// Lock order between the manager and its sessions, and the form of unique lock keys.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <thread>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

UniqueKernelHandle NewEvent() { return UniqueKernelHandle(::CreateEventW(nullptr, TRUE, FALSE, nullptr)); }

// Joins both threads; a deadlock ends the whole program as a failure instead of hanging it.
void JoinOrFail(std::thread& first, std::thread& second) {
    UniqueKernelHandle joined = NewEvent();
    std::thread watchdog([&] {
        if (::WaitForSingleObject(joined.Get(), 30000) == WAIT_OBJECT_0) return;
        std::fprintf(stderr, "deadlock: the threads did not finish within 30 s\n");
        std::fflush(stderr);
        std::_Exit(3);
    });
    first.join();
    second.join();
    ::SetEvent(joined.Get());
    watchdog.join();
}

UniqueVariant CloseFunction(void(__stdcall* function)(IInstrSession*)) {
    UniqueVariant value;
    value->vt = VT_UI8;
    value->ullVal = reinterpret_cast<std::uintptr_t>(function);
    return value;
}

// ---- a close function that renames its session while holding its lock ----------------------------
HANDLE renamedInside = nullptr;
HANDLE lookupDone = nullptr;

void __stdcall RenameForAMoment(IInstrSession* closing) {
    closing->put_Name(Bstr(L"HalfwayName").Get());
    ::SetEvent(renamedInside);
    ::WaitForSingleObject(lookupDone, 1000);  // without the session's lock the lookup ends meanwhile
    closing->put_Name(Bstr(L"LockedRename").Get());
}

// ---- an object whose release, from Close, drops the last reference of another session -----------
HANDLE releaseEntered = nullptr;
HANDLE listingDone = nullptr;

class SessionHolder final : public IUnknown {
public:
    explicit SessionHolder(ComPtr<IInstrSession> held) : held(std::move(held)) {}
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        *result = IsEqualIID(interfaceId, IID_IUnknown) ? this : nullptr;
        if (!*result) return E_NOINTERFACE;
        AddRef();
        return S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++references; }
    STDMETHODIMP_(ULONG) Release() override {
        ULONG left = --references;
        if (left == 0) {
            ::SetEvent(releaseEntered);
            ::WaitForSingleObject(listingDone, 1000);  // under the session's lock the listing cannot end
            held.Reset();                               // final release: takes the manager's lock
            delete this;
        }
        return left;
    }

private:
    std::atomic<ULONG> references{1};
    ComPtr<IInstrSession> held;
};
}  // namespace

// Fault: the name search read a session's name without the session's lock (another thread's
// put_Name frees the buffer under it), so it could see a name set halfway through a locked call.
TEST(ManagerLockOrder, NameSearchWaitsForTheSessionsLock) {
    ComPtr<IInstrSessionMgr> manager = CreateManager();
    ComPtr<IInstrSession> session = GetSession(manager.Get(), L"CUSTOM::LockedRename");
    ASSERT_TRUE(session);
    UniqueKernelHandle inside = NewEvent(), done = NewEvent();
    renamedInside = inside.Get();
    lookupDone = done.Get();
    ASSERT_EQ(session->put_CloseFunctionEx(*CloseFunction(&RenameForAMoment).Get()), S_OK);

    HRESULT closed = E_FAIL, looked = E_FAIL;
    ComPtr<IInstrSession> found;
    std::thread closer([&] { closed = session->Close(); });
    std::thread searcher([&] {
        ::WaitForSingleObject(renamedInside, INFINITE);
        looked = manager->GetInstrSession(Bstr(L"CUSTOM::HalfwayName").Get(), VARIANT_FALSE, found.Put());
        ::SetEvent(lookupDone);
    });
    JoinOrFail(closer, searcher);
    EXPECT_EQ(closed, S_OK);
    ASSERT_EQ(looked, S_OK);
    EXPECT_NE(IdentityOf(found.Get()), IdentityOf(session.Get()));
    EXPECT_EQ(NameOf(session.Get()), "LockedRename");
}

// Fault: Close released its release-on-close objects under the session's lock; one that dropped
// the last reference of another session took the manager's lock there, while the state text
// holds the manager's lock and waits for this session's: the two threads deadlocked.
TEST(ManagerLockOrder, CloseReleasesObjectsAfterLeavingTheSessionsLock) {
    ComPtr<IInstrSessionMgr> manager = CreateManager();
    ComPtr<IInstrSession> closing = GetSession(manager.Get(), L"CUSTOM::ClosesWithHolder");
    ASSERT_TRUE(closing);
    UniqueKernelHandle entered = NewEvent(), listed = NewEvent();
    releaseEntered = entered.Get();
    listingDone = listed.Get();
    {
        auto* holder = new SessionHolder(GetSession(manager.Get(), L"CUSTOM::ReleasedByHolder"));
        ASSERT_EQ(closing->AttachObject(Bstr(L"holder").Get(), holder, Bstr(L"").Get(), VARIANT_TRUE), S_OK);
        holder->Release();  // the session holds the only reference now
    }

    HRESULT closed = E_FAIL, described = E_FAIL;
    UniqueBstr state;
    std::thread closer([&] { closed = closing->Close(); });
    std::thread lister([&] {
        ::WaitForSingleObject(releaseEntered, INFINITE);
        described = manager->get_StateDescription(state.Put());
        ::SetEvent(listingDone);
    });
    JoinOrFail(closer, lister);
    EXPECT_EQ(closed, S_OK);
    EXPECT_EQ(described, S_OK);
    EXPECT_NE(Text(state.Get()).find("Name: ClosesWithHolder"), std::string::npos);
}

// Fault: counter, tick count and process ID ran together at varying widths, so keys of two
// processes could be equal. Each is now a fixed-width field; the process ID comes last.
TEST(UniqueKeyName, CarriesTheProcessIdInAFixedWidthField) {
    ComPtr<IInstrSessionMgr> manager = CreateManager();
    UniqueBstr key;
    ASSERT_EQ(manager->GetUniqueKeyName(key.Put()), S_OK);
    std::string text = Text(key.Get());
    char processId[16];
    std::snprintf(processId, sizeof processId, "%010lu", ::GetCurrentProcessId());
    ASSERT_EQ(text.size(), 34u) << text;
    EXPECT_EQ(text.substr(0, 4), "Lock");
    EXPECT_EQ(text.find_first_not_of("0123456789", 4), std::string::npos) << text;
    EXPECT_EQ(text.substr(24), processId);
}
