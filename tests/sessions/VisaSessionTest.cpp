// VISA sessions through the registered DLL against the simulated visa32.dll: one shared handle per
// session, close order, the errors of viOpen, and the manager's VISA listing.
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
    UseSimSetup("visasession", "[VISA GPIB0::14::INSTR]\n[VISA ASRL9::INSTR]\nOpenStatus = 0xBFFF0011\n"
                                             "[VISA ASRL8::INSTR]\nOpenStatus = 0x3FFF007D\n");
    return true;
}();

long Count(const char* counter) { return SimCount("visa32.dll", counter); }

struct VisaSession : ::testing::Test {
    ComPtr<IInstrSessionMgr> manager = CreateManager();
};
}  // namespace

// Catches a second viOpen for a second module, a handle of the wrong type, driver levels that open,
// and VISA names missing from the manager's listing and state description.
TEST_F(VisaSession, ModulesShareOneHandleOpenedOnce) {
    auto names = ListNames(manager.Get(), L"VISA", ReturnLogicalNames | IncludeCategoryPrefix);
    EXPECT_EQ(names, std::vector<std::string>{"VISA::DMM"});
    EXPECT_NE(StateOf(manager.Get()).find("VISA Configuration:\n   Number of resources = 3\n"), std::string::npos);
    auto first = GetSession(manager.Get(), L"visa::DMM"), second = GetSession(manager.Get(), L"VISA::dmm");
    ASSERT_EQ(first.Get(), second.Get());
    long opened = Count("viOpen");
    LONG handle = -1;
    EXPECT_EQ(first->GetHandle(ClassDriver, &handle), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_EQ(first->GetHandle(static_cast<InterfaceLevel>(7), &handle), S_OK);
    EXPECT_EQ(handle, 0);
    UniqueVariant shared;
    ASSERT_EQ(second->GetHandleEx(IODriver, shared.Get()), S_OK);
    EXPECT_EQ(first->GetHandle(DefaultInterface, &handle), S_OK);
    EXPECT_EQ(std::make_pair(shared->vt, shared->lVal), std::make_pair(VARTYPE(VT_I4), handle));
    EXPECT_EQ(Count("viOpen") - opened, 1);
}

// Catches the resource manager closed before the instrument, a close that leaves a handle open, and
// a destruction that skips a close disabled by a module.
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

// Catches a viOpen failure without the library's text, a warning that reads as success or leaks the
// handle it opened, and a handle handed out of the process it belongs to.
TEST_F(VisaSession, HandlesThatCannotBeUsedAreRefusedWithTheReason) {
    auto missing = GetSession(manager.Get(), L"VISA::ASRL9::INSTR"), silent = GetSession(manager.Get(), L"VISA::ASRL8::INSTR");
    EXPECT_EQ(AnswerOf(missing->Initialize(nullptr)),
              Answer(0xBFFF0011, "viOpen returned -1073807343. Description: 'The simulated bench has no such resource.'."));
    long closed = Count("viClose");
    UniqueVariant handle;
    EXPECT_EQ(AnswerOf(silent->GetHandleEx(DefaultInterface, handle.Get())),
              Answer(operationFailed, "viOpen returned 1073676413. Description: 'The session opened, but the simulated "
                                      "device does not answer.'."));
    EXPECT_EQ(Count("viClose") - closed, 1);
    ASSERT_EQ(missing->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(AnswerOf(missing->GetHandleEx(IODriver, handle.Get())),
              Answer(operationFailed, "VISA instrument handles cannot be used outside of the operating system process "
                                      "that they are created in."));
}
