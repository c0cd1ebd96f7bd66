// The two members whose results come back through [out] parameters that are not the return value,
// GetUniqueKeyName and GetLockState, called late-bound from a single-threaded apartment the way a
// script host calls them. Wine's VBScript passes such arguments as references to VARIANT, which the
// type-library dispatch refuses (error 13), and JScript passes none at all, so the script tests in
// this folder cannot read these results; here the references have the declared types.
#include <gtest/gtest.h>

#include <cstdio>
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

ComPtr<IDispatch> CreateLateBound(const wchar_t* progId) {
    CLSID classId{};
    EXPECT_EQ(::CLSIDFromProgID(progId, &classId), S_OK);
    ComPtr<IDispatch> object;
    EXPECT_EQ(::CoCreateInstance(classId, nullptr, CLSCTX_INPROC_SERVER, IID_IDispatch, object.PutVoid()), S_OK);
    return object;
}

// Calls a method by name; arguments in the caller's order (Invoke wants them reversed).
HRESULT CallByName(IDispatch* object, const wchar_t* name, std::vector<VARIANT> arguments, VARIANT* result = nullptr) {
    DISPID member = 0;
    auto* names = const_cast<LPOLESTR>(name);
    HRESULT found = object->GetIDsOfNames(IID_NULL, &names, 1, LOCALE_USER_DEFAULT, &member);
    if (FAILED(found)) return found;
    std::vector<VARIANT> reversed(arguments.rbegin(), arguments.rend());
    DISPPARAMS parameters{reversed.data(), nullptr, static_cast<UINT>(reversed.size()), 0};
    UniqueExcepInfo exception;
    HRESULT invoked = object->Invoke(member, IID_NULL, LOCALE_USER_DEFAULT, DISPATCH_METHOD, &parameters, result,
                                     &exception, nullptr);
    return invoked;
}

VARIANT ByRef(BSTR* text) {
    VARIANT reference;
    ::VariantInit(&reference);
    reference.vt = VT_BYREF | VT_BSTR;
    reference.pbstrVal = text;
    return reference;
}

VARIANT ByRef(LONG* number) {
    VARIANT reference;
    ::VariantInit(&reference);
    reference.vt = VT_BYREF | VT_I4;
    reference.plVal = number;
    return reference;
}

// The VARIANT holds a borrowed BSTR: the caller keeps ownership.
VARIANT Borrowed(BSTR text) {
    VARIANT value;
    ::VariantInit(&value);
    value.vt = VT_BSTR;
    value.bstrVal = text;
    return value;
}

VARIANT Number(double value) {
    VARIANT number;
    ::VariantInit(&number);
    number.vt = VT_R8;
    number.dblVal = value;
    return number;
}

VARIANT Long(LONG value) {
    VARIANT number;
    ::VariantInit(&number);
    number.vt = VT_I4;
    number.lVal = value;
    return number;
}

ComPtr<IDispatch> GetSessionLateBound(IDispatch* manager, const wchar_t* name) {
    auto bstr = Bstr(name);
    VARIANT noNewSession;
    ::VariantInit(&noNewSession);
    noNewSession.vt = VT_BOOL;
    noNewSession.boolVal = VARIANT_FALSE;
    UniqueVariant result;
    EXPECT_EQ(CallByName(manager, L"GetInstrSession", {Borrowed(bstr.Get()), noNewSession}, result.Get()), S_OK);
    ComPtr<IDispatch> session;
    if (result.Get()->vt == VT_DISPATCH) session = ComPtr<IDispatch>(result.Get()->pdispVal);
    return session;
}

}  // namespace

TEST(LateBoundOutParams, UniqueKeyNamesCountTicksAndProcess) {
    auto manager = CreateLateBound(L"SessionMgr.InstrSessionMgr");
    ASSERT_TRUE(manager);
    std::string keys[2];
    for (int call = 0; call < 2; ++call) {
        UniqueBstr key;
        DWORD before = ::GetTickCount();
        ASSERT_EQ(CallByName(manager.Get(), L"GetUniqueKeyName", {ByRef(key.Put())}), S_OK);
        DWORD after = ::GetTickCount();
        keys[call] = Text(key.Get());
        // "Lock", the manager's counter, the tick count and the process ID, ten digits each.
        bool matches = false;
        for (DWORD tick = before; tick <= after && !matches; ++tick) {
            char expected[40];
            std::snprintf(expected, sizeof expected, "Lock%010d%010lu%010lu", call + 1, tick, ::GetCurrentProcessId());
            matches = keys[call] == expected;
        }
        EXPECT_TRUE(matches) << keys[call];
    }
    EXPECT_NE(keys[0], keys[1]);
}

TEST(LateBoundOutParams, LockStateReportsOwnerAndNesting) {
    auto manager = CreateLateBound(L"SessionMgr.InstrSessionMgr");
    ASSERT_TRUE(manager);
    auto session = GetSessionLateBound(manager.Get(), L"CUSTOM::LateBoundLock");
    ASSERT_TRUE(session);
    auto owner = Bstr(L"Station");
    auto sameOwner = Bstr(L"STATION");
    ASSERT_EQ(CallByName(session.Get(), L"LockSession", {Borrowed(owner.Get()), Number(0), Long(0)}), S_OK);
    ASSERT_EQ(CallByName(session.Get(), L"LockSession", {Borrowed(sameOwner.Get()), Number(0), Long(0)}), S_OK);

    UniqueBstr key;
    LONG level = -1;
    ASSERT_EQ(CallByName(session.Get(), L"GetLockState", {ByRef(key.Put()), ByRef(&level)}), S_OK);
    EXPECT_EQ(Text(key.Get()), "Station");
    EXPECT_EQ(level, 2);

    ASSERT_EQ(CallByName(session.Get(), L"UnlockSession", {}), S_OK);
    ASSERT_EQ(CallByName(session.Get(), L"UnlockSession", {}), S_OK);
    UniqueBstr freeKey;
    level = -1;
    ASSERT_EQ(CallByName(session.Get(), L"GetLockState", {ByRef(freeKey.Put()), ByRef(&level)}), S_OK);
    EXPECT_EQ(Text(freeKey.Get()), "");
    EXPECT_EQ(level, 0);
}
