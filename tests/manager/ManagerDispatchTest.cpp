// The manager answers the plain late-bound GetInstrSession itself, as the type library's dispatch would.
#include <gtest/gtest.h>

#include <tuple>

#include "com/ComClient.h"

namespace {

using namespace sm;
using namespace sm::testing;

// The same call through the type library's dispatch, on the manager's vtable.
LateResult TypeLibraryInvoke(IInstrSessionMgr* manager, const Arguments& arguments) {
    LateResult outcome;
    ComPtr<ITypeInfo> info;
    EXPECT_EQ(manager->GetTypeInfo(0, LOCALE_USER_DEFAULT, info.Put()), S_OK);
    std::vector<VARIANT> reversed = arguments.Reversed();
    DISPPARAMS parameters{reversed.data(), nullptr, static_cast<UINT>(reversed.size()), 0};
    UniqueExcepInfo exception;
    outcome.result = info->Invoke(manager, 3, DISPATCH_METHOD, &parameters, outcome.value.Get(), &exception, nullptr);
    if (outcome.result == DISP_E_EXCEPTION) {
        outcome.code = static_cast<unsigned long>(exception.scode);
        outcome.description = Text(exception.bstrDescription);
    }
    return outcome;
}

void ExpectSameAnswer(IInstrSessionMgr* manager, const wchar_t* name) {
    Arguments arguments;
    arguments.Text(name).Bool(false);
    LateResult quick = Invoke(manager, L"GetInstrSession", DISPATCH_METHOD, arguments);
    LateResult typeLibrary = TypeLibraryInvoke(manager, arguments);
    EXPECT_EQ(std::tie(quick.result, quick.code, quick.description, quick.value->vt),
              std::tie(typeLibrary.result, typeLibrary.code, typeLibrary.description, typeLibrary.value->vt))
        << Text(Bstr(name).Get());
    IDispatch* quickSession = quick.value->vt == VT_DISPATCH ? quick.value->pdispVal : nullptr;  // null after a failure
    IDispatch* typeLibrarySession = typeLibrary.value->vt == VT_DISPATCH ? typeLibrary.value->pdispVal : nullptr;
    EXPECT_EQ(quickSession ? IdentityOf(quickSession) : nullptr, typeLibrarySession ? IdentityOf(typeLibrarySession) : nullptr);
}

// Fault caught: the quick path handed back another variant type or session than the type library
// does, or lost the error's code and text on a name that is no session name.
TEST(ManagerDispatch, PlainGetInstrSessionAnswersAsTheTypeLibrary) {
    auto manager = CreateManager();
    auto kept = GetSession(manager.Get(), L"CUSTOM::LateBound");
    ExpectSameAnswer(manager.Get(), L"  custom::latebound ");
    ExpectSameAnswer(manager.Get(), L"Foo::Bar");
}

}  // namespace
