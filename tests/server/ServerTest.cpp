// The COM frame as clients meet it: class objects, the singleton manager, aggregation, unloading
// and error info crossing the vtable boundary.
#include <gtest/gtest.h>

#include "com/ComClient.h"
#include "com/LibraryBinding.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

HRESULT CallDllCanUnloadNow() {
    HMODULE module = ::GetModuleHandleA("SessionMgr.dll");
    if (!module) return E_FAIL;
    auto canUnload = GetProcAddressAs<HRESULT STDAPICALLTYPE()>(module, "DllCanUnloadNow");
    return canUnload ? canUnload() : E_FAIL;
}

// A minimal outer object: only its identity matters to the aggregated inner object.
class OuterObject final : public IUnknown {
public:
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        if (IsEqualIID(interfaceId, IID_IUnknown)) {
            *result = this;
            AddRef();
            return S_OK;
        }
        return inner ? inner->QueryInterface(interfaceId, result) : E_NOINTERFACE;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++references; }
    STDMETHODIMP_(ULONG) Release() override { return --references; }
    ComPtr<IUnknown> inner;
    ULONG references = 1;
};
}  // namespace

TEST(SingletonManager, EveryCreationGivesTheSameObject) {
    auto first = CreateManager();
    auto second = CreateManager();
    ASSERT_TRUE(first && second);
    EXPECT_EQ(IdentityOf(first.Get()), IdentityOf(second.Get()));
}

TEST(SingletonManager, RefusesAggregation) {
    OuterObject outer;
    ComPtr<IUnknown> inner;
    EXPECT_EQ(::CoCreateInstance(CLSID_InstrSessionMgr, &outer, CLSCTX_INPROC_SERVER, IID_IUnknown, inner.PutVoid()),
              CLASS_E_NOAGGREGATION);
    EXPECT_FALSE(inner);
}

TEST(ClassObjects, SessionClassesAggregate) {
    OuterObject outer;
    ASSERT_EQ(::CoCreateInstance(CLSID_CustomInstrSession, &outer, CLSCTX_INPROC_SERVER, IID_IUnknown,
                                 outer.inner.PutVoid()),
              S_OK);
    // Through the outer object the inner interface answers, and its IUnknown is the outer one.
    ComPtr<IInstrSession> session;
    ASSERT_EQ(outer.QueryInterface(IID_IInstrSession, session.PutVoid()), S_OK);
    ComPtr<IUnknown> identity;
    ASSERT_EQ(session->QueryInterface(IID_IUnknown, identity.PutVoid()), S_OK);
    EXPECT_EQ(identity.Get(), static_cast<IUnknown*>(&outer));
    session.Reset();
    identity.Reset();
    outer.inner.Reset();
}

TEST(ClassObjects, AggregationMustAskForIUnknown) {
    OuterObject outer;
    ComPtr<IInstrSession> session;
    EXPECT_EQ(::CoCreateInstance(CLSID_CustomInstrSession, &outer, CLSCTX_INPROC_SERVER, IID_IInstrSession,
                                 session.PutVoid()),
              CLASS_E_NOAGGREGATION);
}

TEST(ClassObjects, VisaSessionsHaveNoClassObject) {
    ComPtr<IClassFactory> factory;
    EXPECT_EQ(::CoGetClassObject(CLSID_VisaInstrSession, CLSCTX_INPROC_SERVER, nullptr, IID_IClassFactory,
                                 factory.PutVoid()),
              REGDB_E_CLASSNOTREG);
    HMODULE module = ::GetModuleHandleA("SessionMgr.dll");
    ASSERT_NE(module, nullptr);
    auto getClassObject = GetProcAddressAs<HRESULT STDAPICALLTYPE(REFCLSID, REFIID, void**)>(module, "DllGetClassObject");
    ASSERT_NE(getClassObject, nullptr);
    EXPECT_EQ(getClassObject(CLSID_VisaInstrSession, IID_IClassFactory, factory.PutVoid()), CLASS_E_CLASSNOTAVAILABLE);
    EXPECT_EQ(getClassObject(CLSID_CustomInstrSession, IID_IClassFactory, factory.PutVoid()), S_OK);
}

TEST(ClassObjects, DirectlyCreatedSessionsWorkWithoutAManager) {
    ComPtr<IInstrSession> session;
    ASSERT_EQ(::CoCreateInstance(CLSID_CustomInstrSession, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSession,
                                 session.PutVoid()),
              S_OK);
    EXPECT_EQ(session->AttachLong(Bstr(L"A").Get(), 5), S_OK);
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

TEST(ErrorInfo, ReachesEarlyAndLateBoundClients) {
    auto manager = CreateManager();
    ComPtr<IInstrSession> session;
    ExpectComError(manager->GetInstrSession(Bstr(L"DAQ::Dev1").Get(), VARIANT_FALSE, session.Put()), unrecognizedValue,
                   "'DAQ::Dev1' is not a driver session name", CLSID_InstrSessionMgr);
    EXPECT_FALSE(session);
    ComPtr<ISupportErrorInfo> supports;
    ASSERT_EQ(manager->QueryInterface(IID_ISupportErrorInfo, supports.PutVoid()), S_OK);
    EXPECT_EQ(supports->InterfaceSupportsErrorInfo(IID_IInstrSessionMgr), S_OK);
    EXPECT_EQ(supports->InterfaceSupportsErrorInfo(IID_IDispatch), S_FALSE);

    LateResult late = Invoke(manager.As<IDispatch>().Get(), L"GetInstrSession", DISPATCH_METHOD,
                             Arguments().Text(L"Nowhere").Bool(false));
    EXPECT_EQ(late.result, DISP_E_EXCEPTION);
    EXPECT_EQ(late.code, unrecognizedValue);
    EXPECT_EQ(late.description, "'Nowhere' is not a driver session name");
}

TEST(ModuleResources, CarryTheTypeLibrary) {
    auto manager = CreateManager();  // loads the DLL
    HMODULE module = ::GetModuleHandleA("SessionMgr.dll");
    ASSERT_NE(module, nullptr);
    EXPECT_NE(::FindResourceA(module, MAKEINTRESOURCEA(1), "TYPELIB"), nullptr);
}
