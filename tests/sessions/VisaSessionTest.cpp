// VISA sessions through the registered DLL against the simulated visa32.dll.
#include <gtest/gtest.h>

#include "SimBench.h"
#include "com/ComClient.h"
#include "framework/ErrorCodes.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

const bool benchReady = [] {
    UseConfigurationFile("SessionMgrVisaSession", "[VISA Logical Names]\nDMM = GPIB0::14::INSTR\n");
    UseSimSetup("visasession", "[VISA GPIB0::14::INSTR]\n");
    return true;
}();

long Count(const char* counter) { return SimCount("visa32.dll", counter); }

struct VisaSession : ::testing::Test {
    ComPtr<IInstrSessionMgr> manager = CreateManager();
};
}  // namespace

// Catches a second viOpen for a second module, a handle of the wrong type, a class-driver level that opens.
TEST_F(VisaSession, ModulesShareOneHandleOpenedOnce) {
    auto first = GetSession(manager.Get(), L"visa::DMM"), second = GetSession(manager.Get(), L"VISA::dmm");
    ASSERT_EQ(first.Get(), second.Get());
    long opened = Count("viOpen");
    LONG handle = -1;
    EXPECT_EQ(first->GetHandle(ClassDriver, &handle), TE_INVALID_OR_OUT_OF_RANGE);
    UniqueVariant shared;
    ASSERT_EQ(second->GetHandleEx(IODriver, shared.Get()), S_OK);
    EXPECT_EQ(first->GetHandle(DefaultInterface, &handle), S_OK);
    EXPECT_EQ(std::make_pair(shared->vt, shared->lVal), std::make_pair(VARTYPE(VT_I4), handle));
    EXPECT_EQ(Count("viOpen") - opened, 1);
}

// Catches the resource manager closed first, a handle left open, a destruction that skips a disabled close.
TEST_F(VisaSession, CloseClosesTheInstrumentThenItsResourceManager) {
    auto session = GetSession(manager.Get(), L"VISA::GPIB0::14::INSTR");
    ASSERT_EQ(session->Initialize(nullptr), S_OK);
    long closed = Count("viClose");
    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_EQ(Count("viClose") - closed, 2);
    ASSERT_EQ(session->Initialize(nullptr), S_OK);
    ASSERT_EQ(session->put_CloseEnabled(VARIANT_FALSE), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_EQ(Count("viClose") - closed, 2);
    session.Reset();
    EXPECT_EQ(Count("viClose") - closed, 4);
    EXPECT_EQ(Count("viClose RM before INSTR"), 0);
}

// Catches a handle handed out of its process.
TEST_F(VisaSession, HandlesAreRefusedOutsideTheirProcess) {
    auto session = GetSession(manager.Get(), L"VISA::GPIB0::14::INSTR");
    UniqueVariant handle;
    ASSERT_EQ(session->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(AnswerOf(session->GetHandleEx(IODriver, handle.Get())),
              Answer(operationFailed, "VISA instrument handles cannot be used outside of the operating system process "
                                      "that they are created in."));
}
