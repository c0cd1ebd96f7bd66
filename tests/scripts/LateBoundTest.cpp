// Late-bound calls as a script host makes them, for what Wine's script engines cannot read: array
// results and [out] parameters. One test per kind of member.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
// Like a script host: the calls cross into the multithreaded apartment over a proxy.
class SingleThreadedApartment : public ::testing::Environment {
public:
    void SetUp() override { ASSERT_TRUE(SUCCEEDED(::CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED))); }
    void TearDown() override { ::CoUninitialize(); }
};
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new SingleThreadedApartment);

class LateBound : public ::testing::Test {
protected:
    void SetUp() override {
        CLSID classId{};
        ASSERT_EQ(::CLSIDFromProgID(L"SessionMgr.InstrSessionMgr", &classId), S_OK);
        ASSERT_EQ(::CoCreateInstance(classId, nullptr, CLSCTX_INPROC_SERVER, IID_IDispatch, manager.PutVoid()), S_OK);
    }
    ComPtr<IDispatch> Session(const wchar_t* name) {
        LateResult got = Invoke(manager.Get(), L"GetInstrSession", DISPATCH_METHOD, Arguments().Text(name).Bool(false));
        EXPECT_EQ(got.result, S_OK) << got.description;
        return got.value->vt == VT_DISPATCH ? ComPtr<IDispatch>(got.value->pdispVal) : ComPtr<IDispatch>();
    }
    ComPtr<IDispatch> manager;
};
}  // namespace

TEST_F(LateBound, SessionArraysHoldDispatchPointersWithTheirOwnReferences) {
    auto session = Session(L"CUSTOM::Scripted");
    ASSERT_TRUE(session);
    LateResult listed = Invoke(manager.Get(), L"GetSessions", DISPATCH_METHOD, Arguments().Text(L"CUSTOM"));
    ASSERT_EQ(listed.result, S_OK);
    ASSERT_EQ(listed.value->vt, VT_ARRAY | VT_DISPATCH);
    session.Reset();
    auto elements = ReadSafeArray<ComPtr<IDispatch>>(listed.value->parray, VT_EMPTY);
    ASSERT_EQ(elements.size(), 1u);
    // The array alone keeps the session; each element answers late-bound calls itself.
    LateResult name = Invoke(elements[0].Get(), L"Name", DISPATCH_PROPERTYGET);
    ASSERT_EQ(name.result, S_OK);
    EXPECT_EQ(Text(name.value->bstrVal), "Scripted");
}

TEST_F(LateBound, OutParametersCarryTheKeyAndTheLockState) {
    UniqueBstr key;
    ASSERT_EQ(Invoke(manager.Get(), L"GetUniqueKeyName", DISPATCH_METHOD, Arguments().TextOut(key.Put())).result, S_OK);
    EXPECT_EQ(Text(key.Get()).rfind("Lock", 0), 0u) << Text(key.Get());
    auto session = Session(L"CUSTOM::LateBoundLock");
    ASSERT_TRUE(session);
    for (const wchar_t* owner : {L"Station", L"STATION"})
        ASSERT_EQ(Invoke(session.Get(), L"LockSession", DISPATCH_METHOD, Arguments().Text(owner).Double(0).Long(0)).result,
                  S_OK);
    UniqueBstr owner;
    LONG level = -1;
    ASSERT_EQ(Invoke(session.Get(), L"GetLockState", DISPATCH_METHOD, Arguments().TextOut(owner.Put()).LongOut(&level)).result, S_OK);
    EXPECT_EQ(Text(owner.Get()) + " " + std::to_string(level), "Station 2");
}
