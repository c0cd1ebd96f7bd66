// The manager's listings; its hidden flags outlive a test, so each test ends with every category visible.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <thread>
#include <vector>

#include "SimBench.h"
#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

constexpr LONG logicalAndVirtual = ReturnLogicalNames | ReturnVirtualInstruments;
using Texts = std::vector<std::string>;

// Two virtual instruments, one with a logical name; set up at start, before the directory is resolved.
const std::string configurationFile = UseConfigurationFile("SessionMgrListingTest",
    "[VXIPNP Logical Names]\nDMM1 = \"VPPVInstr->Fluke\"\n"
    "[VPPVInstr->Fluke]\nModulePath = \"fl45_64.dll\"\nPrefix = \"fl45\"\nResource = \"GPIB::14::INSTR\"\nIDQuery = True\nReset = True\n"
    "[VPPVInstr->Scope]\nModulePath = \"sc_64.dll\"\nPrefix = \"sc\"\nResource = \"GPIB::15::INSTR\"\nIDQuery = True\nReset = True\n");
const Texts configured = {"Fluke", "DMM1", "Scope"};

std::vector<IUnknown*> IdentitiesOf(std::initializer_list<IInstrSession*> sessions) {
    std::vector<IUnknown*> identities;
    for (IInstrSession* session : sessions) identities.push_back(IdentityOf(session));
    return identities;
}

class Listing : public ::testing::Test {
protected:
    void SetUp() override {
        manager = CreateManager();
        ASSERT_TRUE(manager);
    }
    void TearDown() override {
        for (const wchar_t* category : {L"IVI", L"DAQ", L"VISA", L"VXIPNP", L"CUSTOM"}) Hide(category, false);
        EXPECT_EQ(manager->put_InExternalProcess(VARIANT_FALSE), S_OK);
        TakeErrorInfo();
    }
    void Hide(const wchar_t* category, bool hide) {
        ASSERT_EQ(manager->HideCategory(Bstr(category).Get(), hide ? VARIANT_TRUE : VARIANT_FALSE), S_OK)
            << TakeErrorInfo().description;
    }
    Texts Names(const wchar_t* category, LONG flags = logicalAndVirtual, const wchar_t* filter = L"") {
        return ListNames(manager.Get(), category, flags, filter);
    }
    Texts Categories(const wchar_t* baseCategory) { return ListCategories(manager.Get(), baseCategory); }
    std::vector<IUnknown*> Sessions(const wchar_t* category) {
        UniqueSafeArray sessions;
        EXPECT_EQ(manager->GetSessions(Bstr(category).Get(), sessions.Put()), S_OK) << TakeErrorInfo().description;
        std::vector<IUnknown*> identities;
        for (const auto& session : ReadSafeArray<ComPtr<IDispatch>>(sessions.Get(), VT_DISPATCH))
            identities.push_back(IdentityOf(session.Get()));
        return identities;
    }
    // A failing listing quotes the trimmed category and leaves its output null.
    void ExpectCategoryError(bool names, const wchar_t* category, const std::string& quoted) {
        SAFEARRAY* output = reinterpret_cast<SAFEARRAY*>(0x1);
        ExpectComError(names ? manager->GetNames(Bstr(category).Get(), GetNamesOptions(3), Bstr(L"").Get(), &output)
                             : manager->GetCategories(Bstr(category).Get(), &output),
                       unrecognizedValue, "'" + quoted + "' is not a driver session category", CLSID_InstrSessionMgr);
        EXPECT_EQ(output, nullptr);
    }
    ComPtr<IInstrSessionMgr> manager;
};
}  // namespace

TEST_F(Listing, NamesForEveryFormOfTheCategoryArgument) {
    // The whole list is each source's list in a fixed order, the VXIplug&play names last.
    Texts all = Names(L"");
    ASSERT_GE(all.size(), configured.size());
    EXPECT_EQ(Texts(all.end() - 3, all.end()), configured);
    for (const wchar_t* anyForm : {L"?", L"  ", L"::", L"FOO::BAR", L"\t?\t", L"FOO::"})
        EXPECT_EQ(Names(anyForm), all) << Text(Bstr(anyForm).Get());
    for (const wchar_t* form : {L"VXIPNP", L"vxipnp", L"VxiPnp::any"})
        EXPECT_EQ(Names(form), configured) << Text(Bstr(form).Get());
    // Categories without configured names answer with an empty array, not an error.
    for (const wchar_t* empty : {L"DAQ", L"CUSTOM", L"daq", L" Custom "})
        EXPECT_EQ(Names(empty), Texts{}) << Text(Bstr(empty).Get());
    ExpectCategoryError(true, L"  FOO\t", "FOO");
}

TEST_F(Listing, ExternalManagerMarksNamesListedForThePrefixedCategory) {
    // Names asked for with the 64-bit prefix come back with it, so that they lead back to this manager.
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(Names(L"*VXIPNP", ReturnLogicalNames), Texts{"*DMM1"});
    EXPECT_EQ(Names(L" *vxipnp ", ReturnLogicalNames | IncludeCategoryPrefix), Texts{"*VXIPNP::DMM1"});
    EXPECT_EQ(Names(L"VXIPNP", ReturnLogicalNames), Texts{"DMM1"});
    auto session = GetSession(manager.Get(), L"CUSTOM::Shared");
    EXPECT_EQ(Sessions(L"*CUSTOM"), IdentitiesOf({session.Get()}));
}

TEST_F(Listing, SessionsByCategoryInCreationOrder) {
    auto first = GetSession(manager.Get(), L"CUSTOM::First");
    auto route = GetSession(manager.Get(), L"RQ::Route1");
    auto lower = GetSession(manager.Get(), L"custom::Lower");
    auto scope = GetSession(manager.Get(), L"VXIPNP::Scope");
    auto last = GetSession(manager.Get(), L"CUSTOM::Last");
    EXPECT_EQ(Sessions(L"?"), IdentitiesOf({first.Get(), route.Get(), lower.Get(), scope.Get(), last.Get()}));
    for (const wchar_t* custom : {L"CUSTOM", L" custom ", L"CUSTOM::"})
        EXPECT_EQ(Sessions(custom), IdentitiesOf({first.Get(), lower.Get(), last.Get()}));
    EXPECT_EQ(Sessions(L"rq"), IdentitiesOf({route.Get()}));
    // No session of these: empty arrays, and no category check for a session listing.
    for (const wchar_t* none : {L"VISA", L"DAQ", L"FOO", L"CUSTOM::Sub", L"FOO::BAR"})
        EXPECT_EQ(Sessions(none), std::vector<IUnknown*>{}) << Text(Bstr(none).Get());
    // A released session leaves the list; the others keep their order.
    lower.Reset();
    EXPECT_EQ(Sessions(L"CUSTOM"), IdentitiesOf({first.Get(), last.Get()}));
}

TEST_F(Listing, EachListedSessionHoldsItsOwnReference) {
    auto one = GetSession(manager.Get(), L"CUSTOM::HeldOne");
    auto two = GetSession(manager.Get(), L"CUSTOM::HeldTwo");
    UniqueSafeArray listed;
    ASSERT_EQ(manager->GetSessions(Bstr(L"CUSTOM").Get(), listed.Put()), S_OK);
    // The clients let go; only the array keeps the sessions alive, and they still work.
    one.Reset();
    two.Reset();
    auto elements = ReadSafeArray<ComPtr<IDispatch>>(listed.Get(), VT_DISPATCH);
    ASSERT_EQ(elements.size(), 2u);
    auto held = elements[0].As<IInstrSession>();
    EXPECT_EQ(NameOf(held.Get()), "HeldOne");
    held.Reset();
    elements.clear();
    EXPECT_EQ(Sessions(L"CUSTOM").size(), 2u);
    listed.Reset();
    EXPECT_EQ(Sessions(L"CUSTOM").size(), 0u);
}

TEST_F(Listing, CategoriesTopLevelLeavesAndErrors) {
    for (const wchar_t* anyForm : {L"", L"?", L"  ", L"FOO::BAR", L"::"})
        EXPECT_EQ(Categories(anyForm), (Texts{"IVI", "VISA", "VXIPNP", "CUSTOM"})) << Text(Bstr(anyForm).Get());
    for (const wchar_t* leaf : {L"DAQ", L"VISA", L"VXIPNP", L"CUSTOM", L"visa", L" Custom ", L"VISA::x"})
        EXPECT_EQ(Categories(leaf), Texts{}) << Text(Bstr(leaf).Get());
    // The whole trimmed argument is quoted; the switch category has no list.
    ExpectCategoryError(false, L" RQ::Route1 ", "RQ::Route1");
    ExpectCategoryError(false, L"\tFOO  ", "FOO");
}

TEST_F(Listing, HideCategoryTakesTheFiveHideableTokensInAnyForm) {
    for (const wchar_t* token : {L"IVI", L"DAQ", L"VISA", L"VXIPNP", L"CUSTOM", L"ivi", L" Visa\t", L"*VXIPNP"})
        Hide(token, true), Hide(token, false);
    Hide(L"VISA", true);
    EXPECT_EQ(Categories(L""), (Texts{"IVI", "VXIPNP", "CUSTOM"}));
    ExpectCategoryError(false, L"VISA", "VISA");
    for (const wchar_t* token : {L"DAQ", L"*ivi", L"VXIPNP", L"CUSTOM"}) Hide(token, true);
    ExpectCategoryError(false, L"DAQ", "DAQ");
    EXPECT_EQ(Categories(L""), Texts{});
    Hide(L" *custom ", false);
    EXPECT_EQ(Categories(L""), Texts{"CUSTOM"});
}

TEST_F(Listing, HideCategoryRejectsOtherTextsQuotingThemAsPassed) {
    for (const wchar_t* rejected : {L"RQ", L" rq ", L"32*RQ", L"FOO", L"", L"VISA::x", L"?"}) {
        ExpectComError(manager->HideCategory(Bstr(rejected).Get(), VARIANT_TRUE), unrecognizedValue,
                       "'" + Text(Bstr(rejected).Get()) + "' is not a driver session category", CLSID_InstrSessionMgr);
    }
    EXPECT_EQ(Categories(L""), (Texts{"IVI", "VISA", "VXIPNP", "CUSTOM"}));
}

TEST_F(Listing, HidingTakesACategoryOutOfEveryListingButNotItsSessions) {
    auto scope = GetSession(manager.Get(), L"VXIPNP::Scope");
    ASSERT_TRUE(scope);
    Hide(L"VXIPNP", true);
    Texts all = Names(L"");
    EXPECT_EQ(std::find(all.begin(), all.end(), "DMM1"), all.end());
    ExpectCategoryError(true, L"VXIPNP", "VXIPNP");
    // With the category gone, "VXIPNP::x" is just a name in the search over all categories.
    EXPECT_EQ(Names(L"VXIPNP::x"), all);
    EXPECT_EQ(Categories(L""), (Texts{"IVI", "VISA", "CUSTOM"}));
    // The live session is untouched (found by its bare name and working: see the manager's tests).
    EXPECT_EQ(Sessions(L"VXIPNP"), IdentitiesOf({scope.Get()}));
}

TEST_F(Listing, StateTextOfTheConfigurationAndTheSessions) {
    EXPECT_EQ(StateOf(manager.Get()).rfind("In Process State:\nVXIPNP Configuration:\n", 0), 0u);
    for (const wchar_t* category : {L"VXIPNP", L"IVI", L"VISA"}) Hide(category, true);
    EXPECT_EQ(StateOf(manager.Get()), "In Process State:\n\nNumber of Sessions:0\n");

    // Each session's own text follows its number, in creation order; a released one leaves the text.
    auto bench = GetSession(manager.Get(), L"CUSTOM::Bench"), route = GetSession(manager.Get(), L"RQ::Route7");
    const std::string head = "In Process State:\n\nNumber of Sessions:",
                      benchText = "   Session #0\n   Name: Bench, Category: CUSTOM      Initialized: False, In Process\n";
    EXPECT_EQ(StateOf(manager.Get()), head + "2\n" + benchText +
                           "   Session #1\n   Name: Route7, Category: RQ      Initialized: False, In Process\n");
    route.Reset();
    EXPECT_EQ(StateOf(manager.Get()), head + "1\n" + benchText);
}

// Single-threaded callers reach the manager through a proxy from the registered type library.
TEST_F(Listing, ListingsCrossApartmentsThroughTheRegisteredTypeLibrary) {
    auto session = GetSession(manager.Get(), L"CUSTOM::Marshalled");
    Texts names = Names(L"");
    std::thread([&] {
        ASSERT_EQ(::CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED), S_OK);
        {
            auto proxy = CreateManager();
            ASSERT_TRUE(proxy);
            UniqueSafeArray sessions;
            EXPECT_EQ(ListNames(proxy.Get(), L"", logicalAndVirtual), names);
            EXPECT_EQ(ListCategories(proxy.Get(), L""), (Texts{"IVI", "VISA", "VXIPNP", "CUSTOM"}));
            ASSERT_EQ(proxy->GetSessions(Bstr(L"").Get(), sessions.Put()), S_OK);
            auto listed = ReadSafeArray<ComPtr<IDispatch>>(sessions.Get(), VT_EMPTY);
            ASSERT_EQ(listed.size(), 1u);
            EXPECT_EQ(NameOf(listed[0].As<IInstrSession>().Get()), "Marshalled");
        }
        ::CoUninitialize();
    }).join();
}
