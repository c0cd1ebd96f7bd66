// Name resolution, the session table, lock order between manager and sessions, and unique lock keys.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <thread>
#include <vector>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

class Manager : public ::testing::Test {
protected:
    void SetUp() override {
        manager = CreateManager();
        ASSERT_TRUE(manager);
    }
    // The name error for this text; the output is cleared.
    void ExpectNameError(const wchar_t* name, const std::string& description, bool newSession = false) {
        IInstrSession* stale = reinterpret_cast<IInstrSession*>(0x1);
        ExpectComError(manager->GetInstrSession(Bstr(name).Get(), newSession ? VARIANT_TRUE : VARIANT_FALSE, &stale),
                       unrecognizedValue, description, CLSID_InstrSessionMgr);
        EXPECT_EQ(stale, nullptr);
    }
    void Hide(const wchar_t* category, bool hide) {
        ASSERT_EQ(manager->HideCategory(Bstr(category).Get(), hide ? VARIANT_TRUE : VARIANT_FALSE), S_OK);
    }
    ComPtr<IInstrSessionMgr> manager;
};
}  // namespace

TEST_F(Manager, OneObjectPerNameInAnyCaseAndSeparatorForm) {
    auto first = GetSession(manager.Get(), L"CUSTOM::Bench");
    ASSERT_TRUE(first);
    for (const wchar_t* form : {L"custom::bench", L"CUSTOM/Bench", L"Custom\\BENCH", L"CUSTOM:\\\\Bench", L"  CUSTOM::Bench \t"})
        EXPECT_EQ(GetSession(manager.Get(), form).Get(), first.Get()) << "form " << Text(Bstr(form).Get());
    EXPECT_EQ(NameOf(first.Get()), "Bench");
    EXPECT_EQ(CategoryOf(first.Get()), "CUSTOM");
    // The category keeps the caller's spelling; an empty name is a name.
    EXPECT_EQ(CategoryOf(GetSession(manager.Get(), L"custom::Lower").Get()), "custom");
    EXPECT_EQ(NameOf(GetSession(manager.Get(), L"CUSTOM::").Get()), "");
}

TEST_F(Manager, ForcedNewSessionsGetNumberedNames) {
    auto plain = GetSession(manager.Get(), L"CUSTOM::DMM1");
    auto second = GetSession(manager.Get(), L"CUSTOM::DMM1", true);
    EXPECT_EQ(NameOf(GetSession(manager.Get(), L"CUSTOM::DMM1", true).Get()), "DMM1_3");
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::dmm1_2").Get(), second.Get());
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::DMM1").Get(), plain.Get());
}

TEST_F(Manager, NamesThatResolveNowhere) {
    ExpectNameError(L"DAQ::Dev1", "'DAQ::Dev1' is not a driver session name");
    ExpectNameError(L"Dev::X", "'Dev::X' is not a driver session name");
    ExpectNameError(L"  DMM1  ", "'DMM1' is not a driver session name");
    ExpectNameError(L"VISA::ASRL1::INSTR", "'VISA::ASRL1::INSTR' is not a driver session name");
    ExpectNameError(L"DAQ::x", "'DAQ::x' is not a driver session name", true);
}

TEST_F(Manager, HiddenCategoryNoLongerSplitsNamesButItsSessionsSurvive) {
    auto survivor = GetSession(manager.Get(), L"CUSTOM::Survivor");
    Hide(L"CUSTOM", true);
    ExpectNameError(L"CUSTOM::Hidden", "'CUSTOM::Hidden' is not a driver session name");
    // Found under its bare name through the search over all categories... of live sessions only.
    EXPECT_EQ(GetSession(manager.Get(), L"Survivor").Get(), survivor.Get());
    EXPECT_EQ(survivor->AttachLong(Bstr(L"x").Get(), 1), S_OK);
    Hide(L"custom", false);
    EXPECT_TRUE(GetSession(manager.Get(), L"CUSTOM::Hidden"));
}

TEST_F(Manager, FinalReleaseRemovesTheSessionFromTheTable) {
    auto session = GetSession(manager.Get(), L"CUSTOM::Transient");
    ASSERT_EQ(session->AttachLong(Bstr(L"Marker").Get(), 1), S_OK);
    GetSession(manager.Get(), L"CUSTOM::Transient").Reset();
    // One client still holds it: the same object with its data.
    EXPECT_EQ(LongOf(GetSession(manager.Get(), L"CUSTOM::Transient").Get(), L"Marker"), 1);
    session.Reset();
    LONG value = 0;
    ExpectComError(GetSession(manager.Get(), L"CUSTOM::Transient")->GetLong(Bstr(L"Marker").Get(), &value), unrecognizedValue,
                   "Unrecognized value.", CLSID_CustomInstrSession);
}

// Catches an index that keeps a session filed under the name it had when it was first looked up.
TEST_F(Manager, RenamedSessionIsFoundByItsNewNameOnly) {
    auto renamed = GetSession(manager.Get(), L"CUSTOM::IndexBefore");
    ASSERT_EQ(GetSession(manager.Get(), L"CUSTOM::IndexBefore").Get(), renamed.Get());
    ASSERT_EQ(renamed->put_Name(Bstr(L"IndexAfter").Get()), S_OK);
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::indexafter").Get(), renamed.Get());
    auto underOldName = GetSession(manager.Get(), L"CUSTOM::IndexBefore");
    EXPECT_NE(underOldName.Get(), renamed.Get());
    EXPECT_EQ(NameOf(underOldName.Get()), "IndexBefore");
}

TEST_F(Manager, ConcurrentRequestsForOneNameShareOneSession) {
    std::vector<ComPtr<IInstrSession>> seen(8);
    std::vector<std::thread> workers;
    for (auto& slot : seen) {
        workers.emplace_back([&] {
            ::CoInitializeEx(nullptr, COINIT_MULTITHREADED);
            manager->GetInstrSession(Bstr(L"CUSTOM::Contended").Get(), VARIANT_FALSE, slot.Put());
            ::CoUninitialize();
        });
    }
    for (auto& worker : workers) worker.join();
    for (const auto& session : seen) {
        ASSERT_TRUE(session);
        EXPECT_EQ(session.Get(), seen[0].Get());
    }
}

namespace {
// The close action, inside the session's lock, waits up to 1 s for the other call: a call that does
// not wait for the session's lock ends meanwhile.
const UniqueKernelHandle insideClose(::CreateEventW(nullptr, TRUE, FALSE, nullptr));
const UniqueKernelHandle otherCallDone(::CreateEventW(nullptr, TRUE, FALSE, nullptr));

// Closes the session beside the other call; a deadlock ends the program as a failure.
template <class OtherCall>
HRESULT CloseBesides(IInstrSession* closing, OtherCall otherCall) {
    ::ResetEvent(insideClose.Get());
    ::ResetEvent(otherCallDone.Get());
    HRESULT closed = E_FAIL;
    std::thread closer([&] { closed = closing->Close(); });
    std::thread other([&] {
        ::WaitForSingleObject(insideClose.Get(), INFINITE);
        otherCall();
        ::SetEvent(otherCallDone.Get());
    });
    const UniqueKernelHandle joined(::CreateEventW(nullptr, TRUE, FALSE, nullptr));
    std::thread watchdog([&] {
        if (::WaitForSingleObject(joined.Get(), 30000) == WAIT_OBJECT_0) return;
        std::fprintf(stderr, "deadlock: the threads did not finish within 30 s\n");
        std::fflush(stderr);
        std::_Exit(3);
    });
    closer.join();
    other.join();
    ::SetEvent(joined.Get());
    watchdog.join();
    return closed;
}

void __stdcall RenameForAMoment(IInstrSession* closing) {
    closing->put_Name(Bstr(L"HalfwayName").Get());
    ::SetEvent(insideClose.Get());
    ::WaitForSingleObject(otherCallDone.Get(), 1000);
    closing->put_Name(Bstr(L"LockedRename").Get());
}

// An object whose release, from Close, drops the last reference of another session.
class SessionHolder final : public IUnknown {
public:
    explicit SessionHolder(ComPtr<IInstrSession> held) : held(std::move(held)) {}
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        *result = IsEqualIID(interfaceId, IID_IUnknown) ? this : nullptr;
        return *result ? (AddRef(), S_OK) : E_NOINTERFACE;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++references; }
    STDMETHODIMP_(ULONG) Release() override {
        ULONG left = --references;
        if (left == 0) {
            ::SetEvent(insideClose.Get());
            ::WaitForSingleObject(otherCallDone.Get(), 1000);
            held.Reset();  // final release: takes the manager's lock
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
    UniqueVariant closeFunction;
    closeFunction->vt = VT_UI8;
    closeFunction->ullVal = reinterpret_cast<std::uintptr_t>(&RenameForAMoment);
    ASSERT_EQ(session->put_CloseFunctionEx(*closeFunction.Get()), S_OK);
    HRESULT looked = E_FAIL;
    ComPtr<IInstrSession> found;
    EXPECT_EQ(CloseBesides(session.Get(), [&] {
        looked = manager->GetInstrSession(Bstr(L"CUSTOM::HalfwayName").Get(), VARIANT_FALSE, found.Put());
    }), S_OK);
    ASSERT_EQ(looked, S_OK);
    EXPECT_NE(IdentityOf(found.Get()), IdentityOf(session.Get()));
    EXPECT_EQ(NameOf(session.Get()), "LockedRename");
}

// Fault: Close released its objects under the session's lock; one that dropped another session took
// the manager's lock there, while the state text held the manager's and waited for the session's.
TEST(ManagerLockOrder, CloseReleasesObjectsAfterLeavingTheSessionsLock) {
    ComPtr<IInstrSessionMgr> manager = CreateManager();
    ComPtr<IInstrSession> closing = GetSession(manager.Get(), L"CUSTOM::ClosesWithHolder");
    ASSERT_TRUE(closing);
    {
        auto* holder = new SessionHolder(GetSession(manager.Get(), L"CUSTOM::ReleasedByHolder"));
        ASSERT_EQ(closing->AttachObject(Bstr(L"holder").Get(), holder, Bstr(L"").Get(), VARIANT_TRUE), S_OK);
        holder->Release();  // the session holds the only reference now
    }
    HRESULT described = E_FAIL;
    UniqueBstr state;
    EXPECT_EQ(CloseBesides(closing.Get(), [&] { described = manager->get_StateDescription(state.Put()); }), S_OK);
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
    EXPECT_EQ(text.substr(0, 4) + text.substr(24), "Lock" + std::string(processId));
    EXPECT_EQ(text.find_first_not_of("0123456789", 4), std::string::npos) << text;
    ASSERT_EQ(manager->GetUniqueKeyName(key.Put()), S_OK);
    EXPECT_NE(Text(key.Get()), text);
    EXPECT_EQ(manager->InstallInstrSession(Bstr(L"CUSTOM::x").Get(), nullptr), E_NOTIMPL);
}
