// Name resolution, the session table and its reference rules, through the manager's vtable.
#include <gtest/gtest.h>

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
    auto third = GetSession(manager.Get(), L"CUSTOM::DMM1", true);
    EXPECT_EQ(NameOf(second.Get()), "DMM1_2");
    EXPECT_EQ(NameOf(third.Get()), "DMM1_3");
    EXPECT_NE(second.Get(), third.Get());
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::dmm1_2").Get(), second.Get());
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::DMM1").Get(), plain.Get());
    EXPECT_EQ(NameOf(GetSession(manager.Get(), L"CUSTOM::Alone", true).Get()), "Alone_2");
}

TEST_F(Manager, NamesThatResolveNowhere) {
    ExpectNameError(L"DAQ::Dev1", "'DAQ::Dev1' is not a driver session name");
    ExpectNameError(L"CUSTOM", "'CUSTOM' is not a driver session name");
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
    GetSession(manager.Get(), L"CUSTOM::Transient").Reset();
    // One client still holds it: the same object with its data.
    LONG value = 0;
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::Transient")->GetLong(id.Get(), &value), S_OK);
    session.Reset();
    ExpectComError(GetSession(manager.Get(), L"CUSTOM::Transient")->GetLong(id.Get(), &value), unrecognizedValue,
                   "Unrecognized value.", CLSID_CustomInstrSession);
}

TEST_F(Manager, AnExternalManagerServesPrefixedNamesItself) {
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_TRUE), S_OK);
    auto session = GetSession(manager.Get(), L"*CUSTOM::Remote");
    ASSERT_TRUE(session);
    EXPECT_EQ(NameOf(session.Get()), "*Remote");
    VARIANT_BOOL external = VARIANT_FALSE;
    session->get_InExternalProcess(&external);
    EXPECT_EQ(external, VARIANT_TRUE);
    // The prefix is stripped before the lookup.
    EXPECT_EQ(GetSession(manager.Get(), L"*CUSTOM::Remote").Get(), session.Get());
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_FALSE), S_OK);
    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::Remote").Get(), session.Get());
}

// The key's form is UniqueKeyName.CarriesTheProcessIdInAFixedWidthField's.
TEST_F(Manager, UniqueKeysDiffer) {
    UniqueBstr first, second;
    ASSERT_EQ(manager->GetUniqueKeyName(first.Put()), S_OK);
    ASSERT_EQ(manager->GetUniqueKeyName(second.Put()), S_OK);
    EXPECT_NE(Text(first.Get()), Text(second.Get()));
    EXPECT_EQ(manager->InstallInstrSession(Bstr(L"CUSTOM::x").Get(), nullptr), E_NOTIMPL);
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
