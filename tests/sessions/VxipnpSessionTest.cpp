// VXIplug&play sessions and IVPPBase over simulated drivers copied into a private directory. The test
// pins simdmm (one extra LoadLibrary) so that its counters survive the product freeing it.
#include <gtest/gtest.h>

#include <string>

#include "SimBench.h"
#include "com/ComClient.h"
#include "com/LibraryBinding.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

const std::string bin = [] {
    std::string bin = TempPath("SessionMgrVxipnpSession\\Win64\\Bin");
    UseConfigurationFile("SessionMgrVxipnpSession", "[VXIPNP Logical Names]\nDMM1 = \"VPPVInstr->BenchDMM\"\n"
                                                    "[VPPVInstr->BenchDMM]\nModulePath = " + bin + "\\simdmm_64.dll\n"
                                                    "Prefix = simdmm\nResource = GPIB0::14::INSTR\nIDQuery = True\nReset = False\n");
    ::CreateDirectoryA(bin.c_str(), nullptr);
    ::CopyFileA(SIM_SIMDMM, (bin + "\\simdmm_64.dll").c_str(), FALSE);
    UseSimSetup("vxipnpsession",
                "[VXIPNP Resource GPIB0::14::INSTR]\nSession = 0x1401\n"
                "[VXIPNP Driver simdmm]\nDriverRevision = drv 1.2\nFirmwareRevision = fw 7\nSelfTestResult = -3\n"
                "SelfTestMessage = Input relay stuck\nSelfTestStatus = 0xBFFC0800\nErrorQueryCode = -113\n"
                "ErrorQueryMessage = Undefined header\nErrorQueryStatus = -5\nResetStatus = 0x3FFC0101\n"
                "Message -7 = Seven\n");
    return bin;
}();
const std::string simdmmPath = bin + "\\simdmm_64.dll";

class VxipnpSession : public ::testing::Test {
protected:
    void SetUp() override {
        pinned.Reset(::LoadLibraryA(simdmmPath.c_str()));
        ASSERT_TRUE(pinned);
        GetProcAddressAs<void()>(pinned.Get(), "SimResetCounters")();
        manager = CreateManager();
    }
    long Count(const char* name) { return GetProcAddressAs<long(const char*)>(pinned.Get(), "SimCounter")(name); }
    static void ExpectError(HRESULT result, unsigned long code, const std::string& description) {
        ExpectComError(result, code, description, CLSID_VXIPNPInstrSession);
    }
    UniqueModule pinned;
    ComPtr<IInstrSessionMgr> manager;
};

TEST_F(VxipnpSession, LogicalAndInstrumentNameGiveOneSessionInitializedOnce) {
    auto byLogicalName = GetSession(manager.Get(), L"VXIPNP::DMM1");
    auto byInstrument = GetSession(manager.Get(), L"VXIPNP::BenchDMM");
    EXPECT_EQ(byLogicalName.Get(), byInstrument.Get());  // HasName must look at every name of the instrument
    ASSERT_EQ(byLogicalName->Initialize(nullptr), S_OK);
    ASSERT_EQ(byInstrument->Initialize(Bstr(L"Reset=1").Get()), S_OK);
    EXPECT_EQ(Count("init"), 1);
    EXPECT_EQ(Count("init idquery"), 1);  // ID query and reset come from the file, not from the options
    EXPECT_EQ(Count("init reset"), 0);
}

TEST_F(VxipnpSession, HandleLevelsAndReinitAfterClose) {
    auto session = GetSession(manager.Get(), L"DMM1");
    for (InterfaceLevel level : {DefaultInterface, SpecificDriver, IODriver}) {
        LONG handle = 0;
        EXPECT_EQ(session->GetHandle(level, &handle), S_OK);
        EXPECT_EQ(handle, 0x1401);
    }
    UniqueVariant handleEx;
    ASSERT_EQ(session->GetHandleEx(IODriver, handleEx.Get()), S_OK);
    EXPECT_EQ(std::make_pair(handleEx->vt, handleEx->lVal), std::make_pair(VARTYPE(VT_I4), 0x1401L));
    LONG handle = 5;
    ExpectError(session->GetHandle(ClassDriver, &handle), 0xFFFFBC6C, "Value invalid or out of range.");
    EXPECT_EQ(Count("init"), 1);

    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_EQ(Count("close"), 1);
    ASSERT_EQ(session->GetHandle(DefaultInterface, &handle), S_OK);
    EXPECT_EQ(handle, 0x1401);
    EXPECT_EQ(Count("init"), 2);
}

TEST_F(VxipnpSession, StandardFunctionsAnswerWithTheDriversResults) {
    auto session = GetSession(manager.Get(), L"DMM1");
    ComPtr<IVPPBase> first, second;
    ASSERT_EQ(session->GetVPPBaseInterface(first.Put()), S_OK);
    ASSERT_EQ(session->GetVPPBaseInterface(second.Put()), S_OK);
    EXPECT_NE(first.Get(), second.Get());

    LONG code = 0, status = 0;
    UniqueBstr text;
    EXPECT_EQ(first->Error_Query(&code, text.Put(), &status), S_OK);  // a negative status is a result
    EXPECT_EQ(std::to_string(code) + " " + Text(text.Get()) + " " + std::to_string(status), "-113 Undefined header -5");
    EXPECT_EQ(Count("init"), 1);

    EXPECT_EQ(first->Error_Message(-7, text.Put(), &status), S_OK);
    EXPECT_EQ(Text(text.Get()), "Seven");
    short result = 0;
    EXPECT_EQ(first->Self_Test(&result, text.Put(), &status), S_OK);
    EXPECT_EQ(std::to_string(result) + " " + Text(text.Get()), "-3 Input relay stuck");
    EXPECT_EQ(static_cast<unsigned long>(status), 0xBFFC0800);
}

TEST_F(VxipnpSession, ResetOnAClosedSessionInitializesAndTheObjectKeepsTheSession) {
    auto session = GetSession(manager.Get(), L"DMM1");
    ComPtr<IVPPBase> vpp;
    ASSERT_EQ(session->GetVPPBaseInterface(vpp.Put()), S_OK);
    ASSERT_EQ(session->Initialize(nullptr), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    session.Reset();
    LONG status = -1;
    EXPECT_EQ(vpp->Reset(&status), S_OK);
    EXPECT_EQ(status, 0x3FFC0101);
    EXPECT_EQ(Count("init"), 2);
    EXPECT_EQ(Count("close"), 1);
    vpp.Reset();  // the last reference to the session goes with it
    EXPECT_EQ(Count("close"), 2);
}

}  // namespace
