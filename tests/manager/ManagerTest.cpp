// Name resolution, the session table and its reference rules, through the manager's vtable.
#include <gtest/gtest.h>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

constexpr unsigned long unrecognizedValue = 0xFFFFBC68;

class Manager : public ::testing::Test {
protected:
    void SetUp() override {
        manager = CreateManager();
        ASSERT_TRUE(manager);
    }
    // The name error for this text, as GetInstrSession reports it.
    void ExpectNameError(const wchar_t* name, const char* description) {
        ComPtr<IInstrSession> session;
        auto text = Bstr(name);
        IInstrSession* stale = reinterpret_cast<IInstrSession*>(0x1);
        HRESULT result = manager->GetInstrSession(text.Get(), VARIANT_FALSE, &stale);
        EXPECT_EQ(static_cast<unsigned long>(result), unrecognizedValue);
        EXPECT_EQ(stale, nullptr);
        auto reported = TakeErrorInfo();
        EXPECT_EQ(reported.description, description);
        EXPECT_TRUE(IsEqualGUID(reported.guid, CLSID_InstrSessionMgr));
    }
    void Hide(const wchar_t* category, bool hide) {
        auto text = Bstr(category);
        ASSERT_EQ(manager->HideCategory(text.Get(), hide ? VARIANT_TRUE : VARIANT_FALSE), S_OK);
    }
    ComPtr<IInstrSessionMgr> manager;
};
}  // namespace

TEST_F(Manager, OneObjectPerNameInAnyCaseAndSeparatorForm) {
    auto first = GetSession(manager.Get(), L"CUSTOM::Bench");
    ASSERT_TRUE(first);
    for (const wchar_t* form : {L"custom::bench", L"CUSTOM:Bench", L"CUSTOM/Bench", L"Custom\\BENCH", L"CUSTOM//Bench",
                                L"CUSTOM:\\\\Bench", L"  CUSTOM::Bench \t"}) {
        auto again = GetSession(manager.Get(), form);
        EXPECT_EQ(again.Get(), first.Get()) << "form " << Text(Bstr(form).Get());
    }
    EXPECT_EQ(NameOf(first.Get()), "Bench");
    EXPECT_EQ(CategoryOf(first.Get()), "CUSTOM");
}

TEST_F(Manager, CategoryKeepsTheCallersSpellingForQualifiedNames) {
    auto session = GetSession(manager.Get(), L"custom::Lower");
    EXPECT_EQ(CategoryOf(session.Get()), "custom");
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::lower").Get(), session.Get());
}

TEST_F(Manager, EmptyCustomNameIsAName) {
    auto session = GetSession(manager.Get(), L"CUSTOM::");
    ASSERT_TRUE(session);
    EXPECT_EQ(NameOf(session.Get()), "");
}

TEST_F(Manager, ForcedNewSessionsGetNumberedNames) {
    auto plain = GetSession(manager.Get(), L"CUSTOM::DMM1");
    auto second = GetSession(manager.Get(), L"CUSTOM::DMM1", true);
    auto third = GetSession(manager.Get(), L"CUSTOM::DMM1", true);
    EXPECT_EQ(NameOf(plain.Get()), "DMM1");
    EXPECT_EQ(NameOf(second.Get()), "DMM1_2");
    EXPECT_EQ(NameOf(third.Get()), "DMM1_3");
    EXPECT_NE(second.Get(), third.Get());
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::dmm1_2").Get(), second.Get());
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::DMM1").Get(), plain.Get());
}

TEST_F(Manager, ForcedSessionIsNumberedEvenWhenAlone) {
    auto only = GetSession(manager.Get(), L"CUSTOM::Alone", true);
    EXPECT_EQ(NameOf(only.Get()), "Alone_2");
}

TEST_F(Manager, NamesThatResolveNowhere) {
    ExpectNameError(L"DAQ::Dev1", "'DAQ::Dev1' is not a driver session name");
    ExpectNameError(L"CUSTOM", "'CUSTOM' is not a driver session name");
    ExpectNameError(L"Dev::X", "'Dev::X' is not a driver session name");
    ExpectNameError(L"  DMM1  ", "'DMM1' is not a driver session name");
    ExpectNameError(L"VISA::ASRL1::INSTR", "'VISA::ASRL1::INSTR' is not a driver session name");
}

TEST_F(Manager, HiddenCategoryNoLongerSplitsNames) {
    Hide(L"CUSTOM", true);
    ExpectNameError(L"CUSTOM::Hidden", "'CUSTOM::Hidden' is not a driver session name");
    Hide(L"custom", false);
    EXPECT_TRUE(GetSession(manager.Get(), L"CUSTOM::Hidden"));
}

TEST_F(Manager, ExistingSessionsSurviveHidingTheirCategory) {
    auto session = GetSession(manager.Get(), L"CUSTOM::Survivor");
    Hide(L"CUSTOM", true);
    // Found under its bare name through the search over all categories... of live sessions only.
    auto found = GetSession(manager.Get(), L"Survivor");
    EXPECT_EQ(found.Get(), session.Get());
    auto id = Bstr(L"x");
    EXPECT_EQ(session->AttachLong(id.Get(), 1), S_OK);
    Hide(L"CUSTOM", false);
}

TEST_F(Manager, SwitchRoutesAlwaysGetASession) {
    auto route = GetSession(manager.Get(), L"RQ::Route1");
    ASSERT_TRUE(route);
    EXPECT_EQ(CategoryOf(route.Get()), "RQ");
    EXPECT_EQ(NameOf(route.Get()), "Route1");
    EXPECT_EQ(GetSession(manager.Get(), L"rq/route1").Get(), route.Get());
}

TEST_F(Manager, FinalReleaseRemovesTheSessionFromTheTable) {
    auto session = GetSession(manager.Get(), L"CUSTOM::Transient");
    auto id = Bstr(L"Marker");
    ASSERT_EQ(session->AttachLong(id.Get(), 1), S_OK);
    auto again = GetSession(manager.Get(), L"CUSTOM::Transient");
    again.Reset();
    // One client still holds it: the same object with its data.
    auto held = GetSession(manager.Get(), L"CUSTOM::Transient");
    LONG value = 0;
    EXPECT_EQ(held->GetLong(id.Get(), &value), S_OK);
    held.Reset();
    session.Reset();
    auto fresh = GetSession(manager.Get(), L"CUSTOM::Transient");
    EXPECT_EQ(static_cast<unsigned long>(fresh->GetLong(id.Get(), &value)), unrecognizedValue);
    TakeErrorInfo();
}

TEST_F(Manager, OutputIsClearedWhenCreationFails) {
    IInstrSession* stale = reinterpret_cast<IInstrSession*>(0x1);
    auto text = Bstr(L"DAQ::x");
    manager->GetInstrSession(text.Get(), VARIANT_TRUE, &stale);
    EXPECT_EQ(stale, nullptr);
    TakeErrorInfo();
}

TEST_F(Manager, AnExternalManagerServesPrefixedNamesItself) {
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_TRUE), S_OK);
    auto session = GetSession(manager.Get(), L"*CUSTOM::Remote");
    ASSERT_TRUE(session);
    EXPECT_EQ(NameOf(session.Get()), "*Remote");
    VARIANT_BOOL external = VARIANT_FALSE;
    session->get_InExternalProcess(&external);
    EXPECT_EQ(external, VARIANT_TRUE);
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_FALSE), S_OK);
    // Its name leads back to it; the prefix is stripped before the lookup.
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(GetSession(manager.Get(), L"*CUSTOM::Remote").Get(), session.Get());
    manager->put_InExternalProcess(VARIANT_FALSE);
}

TEST_F(Manager, UniqueKeysDifferAndStartWithLock) {
    UniqueBstr first, second;
    ASSERT_EQ(manager->GetUniqueKeyName(first.Put()), S_OK);
    ASSERT_EQ(manager->GetUniqueKeyName(second.Put()), S_OK);
    EXPECT_EQ(Text(first.Get()).rfind("Lock", 0), 0u);
    EXPECT_NE(Text(first.Get()), Text(second.Get()));
    std::string pid = std::to_string(::GetCurrentProcessId());
    std::string key = Text(second.Get());
    EXPECT_EQ(key.substr(key.size() - pid.size()), pid);
}

TEST_F(Manager, InstallInstrSessionIsNotImplemented) {
    auto name = Bstr(L"CUSTOM::x");
    EXPECT_EQ(manager->InstallInstrSession(name.Get(), nullptr), E_NOTIMPL);
}

TEST_F(Manager, ConcurrentRequestsForOneNameShareOneSession) {
    constexpr int threads = 8;
    IInstrSession* seen[threads] = {};
    HANDLE workers[threads];
    struct Work {
        IInstrSessionMgr* manager;
        IInstrSession** slot;
    } work[threads];
    for (int index = 0; index < threads; ++index) {
        work[index] = {manager.Get(), &seen[index]};
        workers[index] = ::CreateThread(
            nullptr, 0,
            [](void* parameter) -> DWORD {
                auto* job = static_cast<Work*>(parameter);
                ::CoInitializeEx(nullptr, COINIT_MULTITHREADED);
                auto name = ::SysAllocString(L"CUSTOM::Contended");
                job->manager->GetInstrSession(name, VARIANT_FALSE, job->slot);
                ::SysFreeString(name);
                ::CoUninitialize();
                return 0;
            },
            &work[index], 0, nullptr);
    }
    ::WaitForMultipleObjects(threads, workers, TRUE, INFINITE);
    for (HANDLE worker : workers) ::CloseHandle(worker);
    for (int index = 0; index < threads; ++index) {
        ASSERT_NE(seen[index], nullptr);
        EXPECT_EQ(seen[index], seen[0]);
    }
    for (IInstrSession* session : seen) session->Release();
}
