// Switch names from the engine and from the library alone, and sessions through "qvrq.dll". Each
// suite is one installation state; ctest runs each in a process of its own.
#include <memory>

#include "SimBench.h"
#include "com/ComClient.h"
#include "com/ComError.h"
#include "framework/ErrorCodes.h"
#include "sources/RQEngine.h"
#include "sources/RQInfo.h"

namespace sm::testing {
namespace {

const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);
using Names = std::vector<std::string>;

constexpr const char* rqBench =
    "[RQ SwitchDev1]\nRouteGroups = MeasureGroup\nRoutes = DmmToDut, ScopeToDut\nIviDevices = Matrix1\n"
    "[RQ SwitchDev2]\nRouteGroups = PowerGroup\nRoutes = PowerToDut\nIviDevices = Mux1\n";

void UseBench(const std::string& text = rqBench) { UseSimSetup("rqbench", text); }
long Count(const char* counter) { return SimCount("qvrq.dll", counter); }

Names List(std::uint32_t options, std::vector<const char*> filterTexts = {}) {
    StringVector filters, names;
    for (const char* filter : filterTexts) filters.emplace_back(filter);
    RQInfo().ListNames("?", options, filters, names);
    Names texts;
    for (const DynamicString& name : names) texts.emplace_back(name.View());
    return texts;
}

// The answers both sources give alike for the same bench.
void ExpectCommonListings() {
    EXPECT_EQ(List(ReturnVirtualInstruments), (Names{"SwitchDev1", "SwitchDev2"}));
    EXPECT_EQ(List(ReturnRouteGroups), Names{}) << "an empty filter names no device";
    EXPECT_EQ(List(ReturnRoutes, {"NoSuchDevice", "SwitchDev2"}), Names{"PowerToDut"});
    EXPECT_EQ(List(ReturnLogicalNames, {"SwitchDev1"}), Names{"Matrix1"});
    EXPECT_EQ(List(ReturnRouteGroups, {"SwitchDev1"}), Names{"MeasureGroup"}) << "routes leaked into the groups";
}

// Catches a kind left out, the wrong order, or an engine object never released.
TEST(EngineListing, ListsDevicesAndEveryAskedKindOfTheFilteredDevices) {
    UseBench();
    ExpectCommonListings();
    EXPECT_EQ(List(ReturnRouteGroups | ReturnRoutes, {"switchdev1"}), (Names{"MeasureGroup", "DmmToDut", "ScopeToDut"}));
    EXPECT_EQ(SimCount("rqengine.dll", "EngineObjectsCreated"), SimCount("rqengine.dll", "EngineObjectsDestroyed"));
    EXPECT_EQ(ListNames(CreateManager().Get(), L"RQ", ReturnVirtualInstruments | IncludeCategoryPrefix),
              (Names{"RQ::SwitchDev1", "RQ::SwitchDev2"}));
}

// Catches a failing member that is ignored, or reported without the engine's error info.
TEST(EngineListing, FailingMemberRaisesItsHresultWithTheInterfacesErrorInfo) {
    UseBench(std::string("[RQ]\nEngineFailure = Routes.Count\nEngineFailureResult = 0x80040201\n") + rqBench);
    GUID guid{};
    try {
        List(ReturnRoutes, {"SwitchDev1"});
        ADD_FAILURE() << "nothing was raised";
    } catch (const ComError& error) {
        EXPECT_EQ(error.Error(), static_cast<HRESULT>(0x80040201));
        if (error.ErrorInfo()) error.ErrorInfo()->GetGUID(&guid);
    }
    EXPECT_EQ(guid, IID_RQRoutes);
}

struct LibraryListing : ::testing::Test {
    static void SetUpTestSuite() { engineAbsent = std::make_unique<EngineUnregistered>(); }
    static void TearDownTestSuite() { engineAbsent.reset(); }
    void SetUp() override { UseBench(); }
    static inline std::unique_ptr<EngineUnregistered> engineAbsent;
};

// Catches a second kind listed, an object never destroyed, or a call through an absent optional function.
TEST_F(LibraryListing, ListsDevicesAndTheFirstAskedKindThatTheLibraryOffers) {
    HMODULE pinned = ::LoadLibraryA("qvrq.dll");
    ExpectCommonListings();
    EXPECT_EQ(List(ReturnRouteGroups | ReturnRoutes, {"SwitchDev1"}), Names{"MeasureGroup"});
    EXPECT_EQ(Count("ObjectsCreated"), Count("ObjectsDestroyed"));
    ::FreeLibrary(pinned);
    ASSERT_EQ(::GetModuleHandleA("qvrq.dll"), nullptr) << "the source kept the library after it went";
    ::SetDllDirectoryA(QVRQ_LEAN_DIR);
    EXPECT_EQ(List(ReturnRouteGroups | ReturnRoutes, {"SwitchDev1"}), (Names{"DmmToDut", "ScopeToDut"}));
    EXPECT_EQ(List(ReturnLogicalNames, {"SwitchDev1"}), Names{});
    ::SetDllDirectoryA(nullptr);
}

struct SwitchSession : ::testing::Test {
    void SetUp() override { UseBench(); }
    ComPtr<IInstrSession> session = GetSession(CreateManager().Get(), L"RQ::DmmToDut", true);
};

// Catches a session opened more than once, a handle of another type, or the options passed on.
TEST_F(SwitchSession, HandleLevelsOpenOnceAndGiveTheSameUi8Handle) {
    ASSERT_EQ(session->Initialize(Bstr(L"Simulate=1").Get()), S_OK);
    UniqueVariant first, other;
    ASSERT_EQ(session->GetHandleEx(DefaultInterface, first.Get()), S_OK);
    EXPECT_EQ(first->vt, VT_UI8);
    EXPECT_NE(first->ullVal, 0u);
    for (InterfaceLevel level : {SpecificDriver, IODriver}) {
        ASSERT_EQ(session->GetHandleEx(level, other.Get()), S_OK);
        EXPECT_EQ(other->ullVal, first->ullVal);
    }
    ASSERT_EQ(session->GetHandleEx(static_cast<InterfaceLevel>(7), other.Get()), S_OK);
    EXPECT_EQ(other->ullVal, 0u);
    EXPECT_EQ(Count("qvRQ_OpenSession"), 1);
    EXPECT_EQ(Count("qvRQ_OpenSession with options"), 0);
}

TEST_F(SwitchSession, RefusesClassDriverLongHandlesComDriversAndOtherProcesses) {
    UniqueVariant handle;
    LONG shortHandle = 1;
    ComPtr<IUnknown> driver;
    EXPECT_EQ(session->GetHandleEx(ClassDriver, handle.Get()), Code(TE_INVALID_OR_OUT_OF_RANGE));
    EXPECT_EQ(AnswerOf(session->GetHandle(DefaultInterface, &shortHandle)),
              Answer(Code(TE_INVALID_POINTER), "32-bit pointer used with 64-bit platform."));
    EXPECT_EQ(session->GetCOMDriver(DefaultInterface, driver.Put()), Code(TE_OPERATION_FAILED));
    ASSERT_EQ(session->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(AnswerOf(session->GetHandleEx(DefaultInterface, handle.Get())),
              Answer(Code(TE_OPERATION_FAILED), "RQ instrument handles cannot be used outside of the operating system "
                                                "process that they are created in."));
}

// Catches a session left open by Close or by the last release, or the library left loaded.
TEST_F(SwitchSession, CloseAndLastReleaseCloseTheProductSession) {
    ASSERT_EQ(session->Initialize(Bstr(L"").Get()), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    ASSERT_EQ(session->Initialize(Bstr(L"").Get()), S_OK);
    HMODULE pinned = ::LoadLibraryA("qvrq.dll");
    session.Reset();
    EXPECT_EQ(Count("qvRQ_CloseSession"), 2);
    EXPECT_EQ(Count("ObjectsCreated"), Count("ObjectsDestroyed"));
    ::FreeLibrary(pinned);
    EXPECT_EQ(::GetModuleHandleA("qvrq.dll"), nullptr) << "the session kept the library loaded";
}

}  // namespace
}  // namespace sm::testing
