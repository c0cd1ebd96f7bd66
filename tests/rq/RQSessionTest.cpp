// Switch sessions through the registered DLL: opening and closing through "qvrq.dll", the handle,
// and what the session refuses.
#include "RQBench.h"
#include "com/ComClient.h"
#include "framework/ErrorCodes.h"

namespace sm::testing {
namespace {

HRESULT Code(std::int32_t code) { return static_cast<HRESULT>(code); }

struct SwitchSession : ::testing::Test {
    void SetUp() override { UseSetup(rqBench); }
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
    EXPECT_EQ(SimCount("qvRQ_OpenSession"), 1);
    EXPECT_EQ(SimCount("qvRQ_OpenSession with options"), 0);
}

TEST_F(SwitchSession, RefusesClassDriverLongHandlesComDriversOtherProcessesAndFailedOpens) {
    UniqueVariant handle;
    LONG shortHandle = 1;
    ComPtr<IUnknown> driver;
    EXPECT_EQ(session->GetHandleEx(ClassDriver, handle.Get()), Code(TE_INVALID_OR_OUT_OF_RANGE));
    EXPECT_EQ(session->GetHandle(DefaultInterface, &shortHandle), Code(TE_INVALID_POINTER));
    EXPECT_EQ(TakeErrorInfo().description, "32-bit pointer used with 64-bit platform.");
    EXPECT_EQ(session->GetCOMDriver(DefaultInterface, driver.Put()), Code(TE_OPERATION_FAILED));
    ASSERT_EQ(session->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(session->GetHandleEx(DefaultInterface, handle.Get()), Code(TE_OPERATION_FAILED));
    EXPECT_EQ(TakeErrorInfo().description,
              "RQ instrument handles cannot be used outside of the operating system process that they are created in.");
    auto broken = GetSession(CreateManager().Get(), L"RQ::BrokenRoute", true);
    EXPECT_EQ(broken->Initialize(Bstr(L"").Get()), Code(-1));
    EXPECT_EQ(TakeErrorInfo().description, "BrokenRoute_init returned an error: -1 (0xffffffff).");
}

// Catches a session left open by Close or by the last release, or the library left loaded.
TEST_F(SwitchSession, CloseAndLastReleaseCloseTheProductSession) {
    ASSERT_EQ(session->Initialize(Bstr(L"").Get()), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    ASSERT_EQ(session->Initialize(Bstr(L"").Get()), S_OK);
    HMODULE pinned = ::LoadLibraryA("qvrq.dll");
    session.Reset();
    EXPECT_EQ(SimCount("qvRQ_CloseSession"), 2);
    EXPECT_EQ(SimCount("ObjectsCreated"), SimCount("ObjectsDestroyed"));
    ::FreeLibrary(pinned);
    EXPECT_EQ(::GetModuleHandleA("qvrq.dll"), nullptr) << "the session kept the library loaded";
}

// Catches a failed load that is remembered instead of tried again.
TEST(NoSwitchLibrary, InitializeFailsToLoadAndTriesAgainLater) {
    UseSetup(rqBench);
    LibraryHidden libraryAbsent;
    auto session = GetSession(CreateManager().Get(), L"RQ::DmmToDut", true);
    EXPECT_EQ(session->Initialize(Bstr(L"").Get()), Code(TE_DLL_NOT_LOADABLE));
    EXPECT_EQ(TakeErrorInfo().description.rfind("Could not load DLL or external library 'qvrq.dll'.\nWin32 Error Code = '126'", 0), 0u);
    libraryAbsent.Restore();
    EXPECT_EQ(session->Initialize(Bstr(L"").Get()), S_OK);
    session.Reset();
    libraryAbsent.Hide();
}

}  // namespace
}  // namespace sm::testing
