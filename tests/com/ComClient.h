// Client-side helpers for tests that drive the registered DLL through real COM.
#pragma once

#include "ComTestSupport.h"

#include <string>
#include <utility>
#include <vector>
#include "com/Interfaces.h"

namespace sm::testing {

inline ComPtr<IInstrSessionMgr> CreateManager() {
    ComPtr<IInstrSessionMgr> manager;
    EXPECT_EQ(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr, manager.PutVoid()),
              S_OK) << "is the DLL registered in this prefix?";
    return manager;
}

inline UniqueBstr Bstr(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

inline std::string Text(BSTR text) { return BstrToMultiByte(text); }

// Asks the manager for a session; fails the test on an error.
inline ComPtr<IInstrSession> GetSession(IInstrSessionMgr* manager, const wchar_t* name, bool newSession = false) {
    ComPtr<IInstrSession> session;
    EXPECT_EQ(manager->GetInstrSession(Bstr(name).Get(), newSession ? VARIANT_TRUE : VARIANT_FALSE, session.Put()), S_OK)
        << TakeErrorInfo().description;
    return session;
}

// A text property of a session; fails the test on an error.
inline std::string TextOf(IInstrSession* session, HRESULT (STDMETHODCALLTYPE IInstrSession::*get)(BSTR*)) {
    UniqueBstr text;
    EXPECT_EQ((session->*get)(text.Put()), S_OK);
    return Text(text.Get());
}
inline std::string NameOf(IInstrSession* session) { return TextOf(session, &IInstrSession::get_Name); }
inline std::string CategoryOf(IInstrSession* session) { return TextOf(session, &IInstrSession::get_Category); }

// A call as a client sees it: the HRESULT and the error text it left (empty without error info).
using Answer = std::pair<unsigned long, std::string>;
inline Answer AnswerOf(HRESULT result) { return {static_cast<unsigned long>(result), TakeErrorInfo().description}; }

template <class Object>
std::string StateOf(Object* object) {
    UniqueBstr text;
    EXPECT_EQ(object->get_StateDescription(text.Put()), S_OK) << TakeErrorInfo().description;
    return Text(text.Get());
}

inline LONG LongOf(IInstrSession* session, const wchar_t* id) {
    LONG value = 0;
    EXPECT_EQ(session->GetLong(Bstr(id).Get(), &value), S_OK) << TakeErrorInfo().description;
    return value;
}

inline bool IsInitializedOf(IInstrSession* session) {
    VARIANT_BOOL initialized = VARIANT_FALSE;
    EXPECT_EQ(session->IsInitialized(&initialized), S_OK);
    return initialized == VARIANT_TRUE;
}

// GetNames and GetCategories as texts; fail the test on an error.
inline std::vector<std::string> ListNames(IInstrSessionMgr* manager, const wchar_t* category, LONG options,
                                          const wchar_t* filter = L"") {
    UniqueSafeArray names;
    EXPECT_EQ(manager->GetNames(Bstr(category).Get(), static_cast<GetNamesOptions>(options), Bstr(filter).Get(),
                                names.Put()),
              S_OK)
        << TakeErrorInfo().description;
    return ReadTexts(names.Get());
}

inline std::vector<std::string> ListCategories(IInstrSessionMgr* manager, const wchar_t* baseCategory) {
    UniqueSafeArray categories;
    EXPECT_EQ(manager->GetCategories(Bstr(baseCategory).Get(), categories.Put()), S_OK) << TakeErrorInfo().description;
    return ReadTexts(categories.Get());
}

// Identity of a COM object: its IUnknown pointer.
template <class Interface>
IUnknown* IdentityOf(Interface* object) {
    ComPtr<IUnknown> unknown;
    object->QueryInterface(IID_IUnknown, unknown.PutVoid());
    return unknown.Get();  // the object stays alive through the caller's own reference
}

// Arguments of a late-bound call in declaration order, freed when done; a reference argument points
// at the caller's variable.
class Arguments {
public:
    Arguments() = default;
    Arguments(const Arguments&) = delete;
    Arguments& operator=(const Arguments&) = delete;
    ~Arguments() {
        for (VARIANT& value : values) ::VariantClear(&value);
    }
    Arguments& Text(const wchar_t* text) { return Add(VT_BSTR).bstrVal = ::SysAllocString(text), *this; }
    Arguments& Long(LONG number) { return Add(VT_I4).lVal = number, *this; }
    Arguments& Double(double number) { return Add(VT_R8).dblVal = number, *this; }
    Arguments& Bool(bool flag) { return Add(VT_BOOL).boolVal = flag ? VARIANT_TRUE : VARIANT_FALSE, *this; }
    Arguments& TextOut(BSTR* text) { return Add(VT_BYREF | VT_BSTR).pbstrVal = text, *this; }
    Arguments& LongOut(LONG* number) { return Add(VT_BYREF | VT_I4).plVal = number, *this; }
    // IDispatch takes the arguments last first.
    std::vector<VARIANT> Reversed() const { return {values.rbegin(), values.rend()}; }

private:
    VARIANT& Add(VARTYPE type) {
        values.emplace_back();
        ::VariantInit(&values.back());
        values.back().vt = type;
        return values.back();
    }
    std::vector<VARIANT> values;
};

struct LateResult {
    HRESULT result = E_FAIL;
    unsigned long code = 0;  // EXCEPINFO scode when the call raised
    std::string description;
    UniqueVariant value;
};

// A call by member name, the way a script host makes it.
inline LateResult Invoke(IDispatch* target, const wchar_t* name, WORD flags, const Arguments& arguments = {}) {
    LateResult outcome;
    DISPID member = DISPID_UNKNOWN;
    auto* names = const_cast<LPOLESTR>(name);
    outcome.result = target->GetIDsOfNames(IID_NULL, &names, 1, LOCALE_USER_DEFAULT, &member);
    if (FAILED(outcome.result)) return outcome;
    std::vector<VARIANT> reversed = arguments.Reversed();
    DISPPARAMS parameters{reversed.data(), nullptr, static_cast<UINT>(reversed.size()), 0};
    UniqueExcepInfo exception;
    outcome.result = target->Invoke(member, IID_NULL, LOCALE_USER_DEFAULT, flags, &parameters, outcome.value.Get(),
                                    &exception, nullptr);
    if (outcome.result == DISP_E_EXCEPTION) {
        if (exception.pfnDeferredFillIn) exception.pfnDeferredFillIn(&exception);
        outcome.code = static_cast<unsigned long>(exception.scode);
        outcome.description = Text(exception.bstrDescription);
    }
    return outcome;
}

}  // namespace sm::testing
