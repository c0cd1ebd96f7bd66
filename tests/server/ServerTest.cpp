// The COM frame as clients meet it: class objects, the singleton, aggregation, unloading, error info.
#include <gtest/gtest.h>

#include "com/ComClient.h"
#include "com/LibraryBinding.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

HRESULT CallDllCanUnloadNow() {
    auto canUnload = GetProcAddressAs<HRESULT STDAPICALLTYPE()>(::GetModuleHandleA("SessionMgr.dll"), "DllCanUnloadNow");
    return canUnload ? canUnload() : E_FAIL;
}

// A minimal outer object: only its identity matters to the aggregated inner object.
class OuterObject final : public IUnknown {
public:
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        if (!IsEqualIID(interfaceId, IID_IUnknown)) return inner ? inner->QueryInterface(interfaceId, result) : E_NOINTERFACE;
        *result = this;
        return AddRef(), S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++references; }
    STDMETHODIMP_(ULONG) Release() override { return --references; }
    ComPtr<IUnknown> inner;
    ULONG references = 1;
};
}  // namespace

TEST(SingletonManager, EveryCreationGivesTheSameObjectAndAggregationIsRefused) {
    auto first = CreateManager(), second = CreateManager();
    ASSERT_TRUE(first && second);
    EXPECT_EQ(IdentityOf(first.Get()), IdentityOf(second.Get()));
    OuterObject outer;
    EXPECT_EQ(::CoCreateInstance(CLSID_InstrSessionMgr, &outer, CLSCTX_INPROC_SERVER, IID_IUnknown, outer.inner.PutVoid()),
              CLASS_E_NOAGGREGATION);
    EXPECT_FALSE(outer.inner);
}

TEST(ClassObjects, SessionClassesAggregateOnlyAskedForIUnknownAndWorkWithoutAManager) {
    OuterObject outer;
    ComPtr<IInstrSession> session;
    EXPECT_EQ(::CoCreateInstance(CLSID_CustomInstrSession, &outer, CLSCTX_INPROC_SERVER, IID_IInstrSession, session.PutVoid()),
              CLASS_E_NOAGGREGATION);
    ASSERT_EQ(::CoCreateInstance(CLSID_CustomInstrSession, &outer, CLSCTX_INPROC_SERVER, IID_IUnknown, outer.inner.PutVoid()), S_OK);
    // The inner interface answers through the outer object, whose IUnknown is its identity.
    ASSERT_EQ(outer.QueryInterface(IID_IInstrSession, session.PutVoid()), S_OK);
    EXPECT_EQ(session->AttachLong(Bstr(L"A").Get(), 5), S_OK);
    ComPtr<IUnknown> identity;
    ASSERT_EQ(session->QueryInterface(IID_IUnknown, identity.PutVoid()), S_OK);
    EXPECT_EQ(identity.Get(), static_cast<IUnknown*>(&outer));
    session.Reset();
    identity.Reset();
    outer.inner.Reset();
}

TEST(Unloading, OnlyTheFactoryHoldingTheManagerLetsTheDllGo) {
    {
        auto manager = CreateManager();
        ASSERT_TRUE(manager);
        EXPECT_EQ(CallDllCanUnloadNow(), S_FALSE);
        auto session = GetSession(manager.Get(), L"CUSTOM::UnloadProbe");
        manager.Reset();
        // A live session holds the manager and itself counts.
        EXPECT_EQ(CallDllCanUnloadNow(), S_FALSE);
    }
    EXPECT_EQ(CallDllCanUnloadNow(), S_OK);
}

// What a client asks before it reads error info.
TEST(ErrorInfo, OnlyTheManagersOwnInterfaceSupportsIt) {
    ComPtr<ISupportErrorInfo> supports;
    ASSERT_EQ(CreateManager()->QueryInterface(IID_ISupportErrorInfo, supports.PutVoid()), S_OK);
    EXPECT_EQ(supports->InterfaceSupportsErrorInfo(IID_IInstrSessionMgr), S_OK);
    EXPECT_EQ(supports->InterfaceSupportsErrorInfo(IID_IDispatch), S_FALSE);
}
