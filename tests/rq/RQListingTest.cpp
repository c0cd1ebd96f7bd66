// Switch names from the engine, from the library when the engine is not installed, and from neither.
// Each suite is one installation state; ctest runs each in a process of its own.
#include <memory>

#include "RQBench.h"
#include "com/ComClient.h"
#include "com/ComError.h"
#include "sources/RQEngine.h"
#include "sources/RQInfo.h"

namespace sm::testing {
namespace {

const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);
using Names = std::vector<std::string>;

Names List(std::uint32_t options, std::vector<const char*> filterTexts = {}) {
    StringVector filters, names;
    for (const char* filter : filterTexts) filters.emplace_back(filter);
    RQInfo().ListNames("?", options, filters, names);
    Names texts;
    for (const DynamicString& name : names) texts.emplace_back(name.View());
    return texts;
}

Names ManagerNames(LONG options) {
    UniqueSafeArray names;
    EXPECT_EQ(CreateManager()->GetNames(Bstr(L"RQ").Get(), static_cast<GetNamesOptions>(options), Bstr(L"").Get(),
                                        names.Put()), S_OK);
    return names ? TextsOf(names.Get()) : Names{"<error>"};
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
    UseSetup(rqBench);
    ExpectCommonListings();
    EXPECT_EQ(List(ReturnRouteGroups | ReturnRoutes, {"switchdev1"}), (Names{"MeasureGroup", "DmmToDut", "ScopeToDut"}));
    EXPECT_EQ(SimCount("EngineObjectsCreated", "rqengine.dll"), SimCount("EngineObjectsDestroyed", "rqengine.dll"));
    EXPECT_EQ(ManagerNames(ReturnVirtualInstruments | IncludeCategoryPrefix), (Names{"RQ::SwitchDev1", "RQ::SwitchDev2"}));
}

// Catches a failing member that is ignored, or reported without the engine's error info.
TEST(EngineListing, FailingMemberRaisesItsHresultWithTheInterfacesErrorInfo) {
    UseSetup("[RQ]\nEngineFailure = Routes.Count\nEngineFailureResult = 0x80040201\n" + std::string(rqBench + 5));
    HRESULT code = S_OK;
    GUID guid{};
    try {
        List(ReturnRoutes, {"SwitchDev1"});
    } catch (const ComError& error) {
        code = error.Error();
        if (error.ErrorInfo()) error.ErrorInfo()->GetGUID(&guid);
    }
    EXPECT_EQ(code, static_cast<HRESULT>(0x80040201));
    EXPECT_EQ(guid, IID_RQRoutes);
}

struct LibraryListing : ::testing::Test {
    static void SetUpTestSuite() { engineAbsent = std::make_unique<EngineUnregistered>(); }
    static void TearDownTestSuite() { engineAbsent.reset(); }
    void SetUp() override { UseSetup(rqBench); }
    static inline std::unique_ptr<EngineUnregistered> engineAbsent;
};

// Catches a second kind listed, an object never destroyed, or a call through an absent optional function.
TEST_F(LibraryListing, ListsDevicesAndTheFirstAskedKindThatTheLibraryOffers) {
    HMODULE pinned = ::LoadLibraryA("qvrq.dll");
    ExpectCommonListings();
    EXPECT_EQ(List(ReturnRouteGroups | ReturnRoutes, {"SwitchDev1"}), Names{"MeasureGroup"});
    EXPECT_EQ(SimCount("ObjectsCreated"), SimCount("ObjectsDestroyed"));
    ::FreeLibrary(pinned);
    ASSERT_EQ(::GetModuleHandleA("qvrq.dll"), nullptr) << "the source kept the library after it went";
    ::SetDllDirectoryA(QVRQ_LEAN_DIR);
    EXPECT_EQ(List(ReturnRouteGroups | ReturnRoutes, {"SwitchDev1"}), (Names{"DmmToDut", "ScopeToDut"}));
    EXPECT_EQ(List(ReturnLogicalNames, {"SwitchDev1"}), Names{});
    ::SetDllDirectoryA(nullptr);
}

struct NoSwitchProduct : ::testing::Test {
    struct Absent {
        EngineUnregistered engine;
        LibraryHidden library;
    };
    static void SetUpTestSuite() {
        UseSetup(rqBench);
        absent = std::make_unique<Absent>();
    }
    static void TearDownTestSuite() { absent.reset(); }
    static inline std::unique_ptr<Absent> absent;
};

TEST_F(NoSwitchProduct, ListsNoSwitchNamesAndRaisesNothing) {
    EXPECT_EQ(List(ReturnVirtualInstruments | ReturnLogicalNames | ReturnRouteGroups | ReturnRoutes, {"SwitchDev1"}),
              Names{});
    EXPECT_EQ(ManagerNames(ReturnVirtualInstruments), Names{});
}

}  // namespace
}  // namespace sm::testing
