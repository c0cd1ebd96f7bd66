// Client-side helpers for tests that drive the registered DLL through real COM.
#pragma once

#include "ComTestSupport.h"
#include "com/Interfaces.h"

namespace sm::testing {

inline ComPtr<IInstrSessionMgr> CreateManager() {
    ComPtr<IInstrSessionMgr> manager;
    HRESULT created = ::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                         manager.PutVoid());
    EXPECT_EQ(created, S_OK) << "is the DLL registered in this prefix?";
    return manager;
}

inline UniqueBstr Bstr(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

inline std::string Text(BSTR text) { return BstrToMultiByte(text); }

// Asks the manager for a session; fails the test on an error.
inline ComPtr<IInstrSession> GetSession(IInstrSessionMgr* manager, const wchar_t* name, bool newSession = false) {
    ComPtr<IInstrSession> session;
    auto bstr = Bstr(name);
    HRESULT result = manager->GetInstrSession(bstr.Get(), newSession ? VARIANT_TRUE : VARIANT_FALSE, session.Put());
    EXPECT_EQ(result, S_OK) << TakeErrorInfo().description;
    return session;
}

inline std::string NameOf(IInstrSession* session) {
    UniqueBstr name;
    EXPECT_EQ(session->get_Name(name.Put()), S_OK);
    return Text(name.Get());
}

inline std::string CategoryOf(IInstrSession* session) {
    UniqueBstr category;
    EXPECT_EQ(session->get_Category(category.Put()), S_OK);
    return Text(category.Get());
}

// Identity of a COM object: its IUnknown pointer.
template <class Interface>
IUnknown* IdentityOf(Interface* object) {
    ComPtr<IUnknown> unknown;
    object->QueryInterface(IID_IUnknown, unknown.PutVoid());
    return unknown.Get();  // the object stays alive through the caller's own reference
}

}  // namespace sm::testing
