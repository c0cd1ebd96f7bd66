// The manager's read-only questions through real COM, each asked twice: early-bound through the
// vtable and late-bound through IDispatch::Invoke, as script hosts ask them. Names, live sessions,
// categories, hiding a category, and the state text.
//
// The manager is one object per process and its hidden flags outlive a test, so every test starts
// and ends with every category visible and releases the sessions it made.
#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <vector>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

constexpr unsigned long unrecognizedValue = 0xFFFFBC68;
constexpr DISPID getNamesId = 0x04;
constexpr DISPID stateDescriptionId = 0x05;
constexpr DISPID getSessionsId = 0x07;
constexpr DISPID getCategoriesId = 0x08;
constexpr DISPID hideCategoryId = 0x09;
constexpr DISPID sessionNameId = 0x03;
constexpr LONG logicalAndVirtual = ReturnLogicalNames | ReturnVirtualInstruments;

// A VXIplug&play configuration with one virtual instrument and one logical name for it, so that name
// listings have something to list. The directory is resolved once per process, before the first
// manager exists, so it is set up while the program starts.
const bool configurationSeeded = [] {
    char temp[MAX_PATH] = {};
    ::GetTempPathA(MAX_PATH, temp);
    std::string root = std::string(temp) + "SessionMgrListingTest";
    std::string platform = root + "\\Win64";
    ::CreateDirectoryA(root.c_str(), nullptr);
    ::CreateDirectoryA(platform.c_str(), nullptr);
    std::ofstream file(platform + "\\QVSessionMgr.ini", std::ios::binary | std::ios::trunc);
    file << "[VISA Logical Names]\r\n\r\n"
            "[VXIPNP Logical Names]\r\n"
            "Scope1 = \"VPPVInstr->MyScope\"\r\n\r\n"
            "[VPPVInstr->MyScope]\r\n"
            "ModulePath = \"" << platform << "\\ag34401a_64.dll\"\r\n"
            "Prefix = \"ag34401a\"\r\n"
            "Resource = \"GPIB0::3::INSTR\"\r\n"
            "IDQuery = True\r\n"
            "Reset = True\r\n";
    file.close();
    ::SetEnvironmentVariableA("VXIPNPPATH", root.c_str());
    return static_cast<bool>(file);
}();

using Texts = std::vector<std::string>;
const Texts configuredNames = {"MyScope", "Scope1"};

// Arguments of a late-bound call, in the order of the declaration; freed when done.
class Arguments {
public:
    Arguments() = default;
    Arguments(const Arguments&) = delete;
    Arguments& operator=(const Arguments&) = delete;
    ~Arguments() {
        for (VARIANT& value : values) ::VariantClear(&value);
    }
    Arguments& Text(const wchar_t* text) {
        VARIANT& value = Add();
        value.vt = VT_BSTR;
        value.bstrVal = ::SysAllocString(text);
        return *this;
    }
    Arguments& Long(LONG number) {
        VARIANT& value = Add();
        value.vt = VT_I4;
        value.lVal = number;
        return *this;
    }
    Arguments& Bool(bool flag) {
        VARIANT& value = Add();
        value.vt = VT_BOOL;
        value.boolVal = flag ? VARIANT_TRUE : VARIANT_FALSE;
        return *this;
    }
    // IDispatch takes the arguments last first.
    std::vector<VARIANT> Reversed() const { return {values.rbegin(), values.rend()}; }

private:
    VARIANT& Add() {
        values.emplace_back();
        ::VariantInit(&values.back());
        return values.back();
    }
    std::vector<VARIANT> values;
};

struct LateResult {
    HRESULT result = E_FAIL;
    unsigned long code = 0;  // EXCEPINFO scode when the call raised
    std::string description;
};

LateResult Invoke(IDispatch* target, DISPID member, WORD flags, const Arguments& arguments, VARIANT* result) {
    std::vector<VARIANT> reversed = arguments.Reversed();
    DISPPARAMS parameters{reversed.data(), nullptr, static_cast<UINT>(reversed.size()), 0};
    UniqueExcepInfo exception;
    LateResult outcome;
    outcome.result = target->Invoke(member, IID_NULL, 0, flags, &parameters, result, &exception, nullptr);
    if (outcome.result == DISP_E_EXCEPTION) {
        if (exception.pfnDeferredFillIn) exception.pfnDeferredFillIn(&exception);
        outcome.code = static_cast<unsigned long>(exception.scode);
        outcome.description = Text(exception.bstrDescription);
    }
    return outcome;
}

// A one-dimensional array from 0 of the given element type; nothing else is a valid listing.
void ExpectListShape(SAFEARRAY* array, VARTYPE elementType) {
    ASSERT_NE(array, nullptr) << "an empty listing must still be an array";
    EXPECT_EQ(::SafeArrayGetDim(array), 1u);
    VARTYPE type = VT_EMPTY;
    EXPECT_EQ(::SafeArrayGetVartype(array, &type), S_OK);
    EXPECT_EQ(type, elementType);
    LONG lower = -1;
    EXPECT_EQ(::SafeArrayGetLBound(array, 1, &lower), S_OK);
    EXPECT_EQ(lower, 0);
}

LONG ElementCount(SAFEARRAY* array) {
    LONG upper = -1;
    ::SafeArrayGetUBound(array, 1, &upper);
    return upper + 1;
}

Texts TextElements(SAFEARRAY* array) {
    Texts texts;
    ExpectListShape(array, VT_BSTR);
    if (!array) return texts;
    for (LONG index = 0; index < ElementCount(array); ++index) {
        UniqueBstr element;
        EXPECT_EQ(::SafeArrayGetElement(array, &index, element.Put()), S_OK);
        texts.push_back(Text(element.Get()));
    }
    return texts;
}

// An array that crossed an apartment under Wine no longer reports its element type (its elements
// are intact): such callers skip that check.
std::vector<ComPtr<IInstrSession>> SessionElements(SAFEARRAY* array, bool typeKnown = true) {
    std::vector<ComPtr<IInstrSession>> sessions;
    if (typeKnown) {
        ExpectListShape(array, VT_DISPATCH);
    } else {
        EXPECT_NE(array, nullptr);
        if (array) {
            EXPECT_EQ(::SafeArrayGetDim(array), 1u);
        }
    }
    if (!array) return sessions;
    for (LONG index = 0; index < ElementCount(array); ++index) {
        ComPtr<IDispatch> element;
        EXPECT_EQ(::SafeArrayGetElement(array, &index, element.Put()), S_OK);
        ComPtr<IInstrSession> session;
        if (element) {
            EXPECT_EQ(element->QueryInterface(IID_IInstrSession, session.PutVoid()), S_OK);
        }
        sessions.push_back(session);
    }
    return sessions;
}

std::vector<IUnknown*> Identities(const std::vector<ComPtr<IInstrSession>>& sessions) {
    std::vector<IUnknown*> identities;
    for (const auto& session : sessions) identities.push_back(session ? IdentityOf(session.Get()) : nullptr);
    return identities;
}

Texts Concatenated(std::initializer_list<Texts> parts) {
    Texts all;
    for (const Texts& part : parts) all.insert(all.end(), part.begin(), part.end());
    return all;
}

class Listing : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(configurationSeeded);
        manager = CreateManager();
        ASSERT_TRUE(manager);
        ASSERT_EQ(manager->QueryInterface(IID_IDispatch, dispatch.PutVoid()), S_OK);
    }
    void TearDown() override {
        for (const wchar_t* category : {L"IVI", L"DAQ", L"VISA", L"VXIPNP", L"CUSTOM"}) Hide(category, false);
        EXPECT_EQ(manager->put_InExternalProcess(VARIANT_FALSE), S_OK);
        TakeErrorInfo();
    }

    void Hide(const wchar_t* category, bool hide) {
        auto text = Bstr(category);
        ASSERT_EQ(manager->HideCategory(text.Get(), hide ? VARIANT_TRUE : VARIANT_FALSE), S_OK)
            << TakeErrorInfo().description;
    }
    void HideSources() {
        for (const wchar_t* category : {L"VXIPNP", L"IVI", L"VISA"}) Hide(category, true);
    }

    // ---- early-bound -------------------------------------------------------------------------
    Texts Names(const wchar_t* category, LONG flags = logicalAndVirtual, const wchar_t* filter = L"") {
        auto categoryText = Bstr(category), filterText = Bstr(filter);
        UniqueSafeArray names;
        HRESULT result = manager->GetNames(categoryText.Get(), static_cast<GetNamesOptions>(flags), filterText.Get(),
                                           names.Put());
        EXPECT_EQ(result, S_OK) << TakeErrorInfo().description;
        return TextElements(names.Get());
    }
    Texts Categories(const wchar_t* baseCategory) {
        auto text = Bstr(baseCategory);
        UniqueSafeArray categories;
        EXPECT_EQ(manager->GetCategories(text.Get(), categories.Put()), S_OK) << TakeErrorInfo().description;
        return TextElements(categories.Get());
    }
    std::vector<ComPtr<IInstrSession>> Sessions(const wchar_t* category) {
        auto text = Bstr(category);
        UniqueSafeArray sessions;
        EXPECT_EQ(manager->GetSessions(text.Get(), sessions.Put()), S_OK) << TakeErrorInfo().description;
        return SessionElements(sessions.Get());
    }
    std::string State() {
        UniqueBstr text;
        EXPECT_EQ(manager->get_StateDescription(text.Put()), S_OK) << TakeErrorInfo().description;
        return Text(text.Get());
    }
    // A failing call, its output pre-set to garbage: it must fail with the category error quoting
    // quoted, carry the manager's error info and leave the output null.
    template <class Call>
    void ExpectCategoryError(Call&& call, const std::string& quoted) {
        SAFEARRAY* output = reinterpret_cast<SAFEARRAY*>(0x1);
        HRESULT result = call(&output);
        EXPECT_EQ(static_cast<unsigned long>(result), unrecognizedValue);
        EXPECT_EQ(output, nullptr);
        ReportedError reported = TakeErrorInfo();
        EXPECT_TRUE(reported.present);
        EXPECT_EQ(reported.description, "'" + quoted + "' is not a driver session category");
        EXPECT_TRUE(IsEqualGUID(reported.guid, CLSID_InstrSessionMgr));
    }
    void ExpectNamesError(const wchar_t* category, const std::string& quoted) {
        SCOPED_TRACE("GetNames");
        auto categoryText = Bstr(category), filterText = Bstr(L"");
        ExpectCategoryError(
            [&](SAFEARRAY** output) {
                return manager->GetNames(categoryText.Get(), static_cast<GetNamesOptions>(logicalAndVirtual),
                                         filterText.Get(), output);
            },
            quoted);
        ExpectLateError(getNamesId, DISPATCH_METHOD, Arguments().Text(category).Long(logicalAndVirtual).Text(L""),
                        quoted);
    }
    void ExpectCategoriesError(const wchar_t* baseCategory, const std::string& quoted) {
        SCOPED_TRACE("GetCategories");
        auto text = Bstr(baseCategory);
        ExpectCategoryError([&](SAFEARRAY** output) { return manager->GetCategories(text.Get(), output); }, quoted);
        ExpectLateError(getCategoriesId, DISPATCH_METHOD, Arguments().Text(baseCategory), quoted);
    }

    // ---- late-bound --------------------------------------------------------------------------
    Texts LateTexts(DISPID member, const Arguments& arguments) {
        UniqueVariant result;
        LateResult outcome = Invoke(dispatch.Get(), member, DISPATCH_METHOD, arguments, result.Get());
        EXPECT_EQ(outcome.result, S_OK) << outcome.description;
        EXPECT_EQ(result->vt, VT_ARRAY | VT_BSTR);
        return result->vt == (VT_ARRAY | VT_BSTR) ? TextElements(result->parray) : Texts{};
    }
    Texts LateNames(const wchar_t* category, LONG flags = logicalAndVirtual, const wchar_t* filter = L"") {
        return LateTexts(getNamesId, Arguments().Text(category).Long(flags).Text(filter));
    }
    Texts LateCategories(const wchar_t* baseCategory) {
        return LateTexts(getCategoriesId, Arguments().Text(baseCategory));
    }
    std::vector<ComPtr<IInstrSession>> LateSessions(const wchar_t* category) {
        UniqueVariant result;
        LateResult outcome = Invoke(dispatch.Get(), getSessionsId, DISPATCH_METHOD, Arguments().Text(category),
                                    result.Get());
        EXPECT_EQ(outcome.result, S_OK) << outcome.description;
        EXPECT_EQ(result->vt, VT_ARRAY | VT_DISPATCH);
        return result->vt == (VT_ARRAY | VT_DISPATCH) ? SessionElements(result->parray)
                                                      : std::vector<ComPtr<IInstrSession>>{};
    }
    std::string LateState() {
        UniqueVariant result;
        LateResult outcome = Invoke(dispatch.Get(), stateDescriptionId, DISPATCH_PROPERTYGET, Arguments(), result.Get());
        EXPECT_EQ(outcome.result, S_OK) << outcome.description;
        EXPECT_EQ(result->vt, VT_BSTR);
        return result->vt == VT_BSTR ? Text(result->bstrVal) : std::string();
    }
    void ExpectLateError(DISPID member, WORD flags, const Arguments& arguments, const std::string& quoted) {
        UniqueVariant result;
        LateResult outcome = Invoke(dispatch.Get(), member, flags, arguments, result.Get());
        EXPECT_EQ(outcome.result, DISP_E_EXCEPTION);
        EXPECT_EQ(outcome.code, unrecognizedValue);
        EXPECT_EQ(outcome.description, "'" + quoted + "' is not a driver session category");
        // The method left its array null; the type library's Invoke may still tag the VARIANT with
        // the declared array type (Wine does), so only the array itself is checked.
        if (result->vt & VT_ARRAY) {
            EXPECT_EQ(result->parray, nullptr);
        } else {
            EXPECT_EQ(result->vt, VT_EMPTY);
        }
    }

    // Both ways must give the same list.
    Texts NamesBothWays(const wchar_t* category, LONG flags = logicalAndVirtual, const wchar_t* filter = L"") {
        Texts early = Names(category, flags, filter);
        EXPECT_EQ(LateNames(category, flags, filter), early) << "late-bound differs for category '" << Text(Bstr(category).Get()) << "'";
        return early;
    }
    Texts CategoriesBothWays(const wchar_t* baseCategory) {
        Texts early = Categories(baseCategory);
        EXPECT_EQ(LateCategories(baseCategory), early) << "late-bound differs for '" << Text(Bstr(baseCategory).Get()) << "'";
        return early;
    }
    std::vector<IUnknown*> SessionsBothWays(const wchar_t* category) {
        std::vector<IUnknown*> early = Identities(Sessions(category));
        EXPECT_EQ(Identities(LateSessions(category)), early) << "late-bound differs for '" << Text(Bstr(category).Get()) << "'";
        return early;
    }

    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IDispatch> dispatch;
};

std::vector<IUnknown*> IdentitiesOf(std::initializer_list<IInstrSession*> sessions) {
    std::vector<IUnknown*> identities;
    for (IInstrSession* session : sessions) identities.push_back(IdentityOf(session));
    return identities;
}
}  // namespace

// ---- GetNames -----------------------------------------------------------------------------------

TEST_F(Listing, NamesForEveryFormOfTheCategoryArgument) {
    Texts all = NamesBothWays(L"");
    // The configured names are listed; the whole list is each source's list in the fixed order.
    EXPECT_EQ(NamesBothWays(L"VXIPNP"), configuredNames);
    EXPECT_EQ(all, Concatenated({NamesBothWays(L"IVI"), NamesBothWays(L"RQ"), NamesBothWays(L"VISA"),
                                 NamesBothWays(L"VXIPNP")}));
    for (const wchar_t* anyForm : {L"?", L"  ", L"::", L"FOO::BAR", L"foo:/bar", L"\t?\t"})
        EXPECT_EQ(NamesBothWays(anyForm), all) << Text(Bstr(anyForm).Get());
    // Categories without configured names answer with an empty array, not an error.
    for (const wchar_t* empty : {L"DAQ", L"CUSTOM", L"daq", L"Custom", L" CUSTOM "})
        EXPECT_EQ(NamesBothWays(empty), Texts{}) << Text(Bstr(empty).Get());
    // Tokens in any case, and with a sub-category, name the same source.
    EXPECT_EQ(NamesBothWays(L"vxipnp"), configuredNames);
    EXPECT_EQ(NamesBothWays(L"VxiPnp::anything"), configuredNames);
    EXPECT_EQ(NamesBothWays(L"ivi"), NamesBothWays(L"IVI"));
    EXPECT_EQ(NamesBothWays(L"rq"), NamesBothWays(L"RQ"));
    EXPECT_EQ(NamesBothWays(L"visa"), NamesBothWays(L"VISA"));
}

TEST_F(Listing, NamesOfAnUnknownCategoryAreAnError) {
    ExpectNamesError(L"FOO", "FOO");
    ExpectNamesError(L"  FOO\t", "FOO");
    ExpectNamesError(L"foo", "foo");
    // A sub-category does not make an unknown category known: the split falls back to any category.
    EXPECT_EQ(NamesBothWays(L"FOO::"), NamesBothWays(L""));
}

TEST_F(Listing, CategoryPrefixIsTheUpperCaseToken) {
    const Texts prefixed = {"VXIPNP::MyScope", "VXIPNP::Scope1"};
    EXPECT_EQ(NamesBothWays(L"vxipnp", logicalAndVirtual | IncludeCategoryPrefix), prefixed);
    EXPECT_EQ(NamesBothWays(L"VXIPNP", logicalAndVirtual | IncludeCategoryPrefix), prefixed);
    Texts all = NamesBothWays(L"", logicalAndVirtual | IncludeCategoryPrefix);
    ASSERT_GE(all.size(), 2u);
    EXPECT_EQ(Texts(all.end() - 2, all.end()), prefixed);
}

TEST_F(Listing, OptionsAndFiltersReachTheSource) {
    EXPECT_EQ(NamesBothWays(L"VXIPNP", ReturnVirtualInstruments), Texts{"MyScope"});
    EXPECT_EQ(NamesBothWays(L"VXIPNP", ReturnLogicalNames), Texts{"Scope1"});
    EXPECT_EQ(NamesBothWays(L"VXIPNP", 0), Texts{});
    EXPECT_EQ(NamesBothWays(L"VXIPNP", logicalAndVirtual, L"SpecificPrefix=hp34401a, SpecificPrefix = ag34401a"),
              configuredNames);
    EXPECT_EQ(NamesBothWays(L"VXIPNP", logicalAndVirtual, L"abc"), Texts{});
    EXPECT_EQ(NamesBothWays(L"VXIPNP", logicalAndVirtual, L"SpecificPrefix = hp34401a"), Texts{});
}

TEST_F(Listing, ExternalManagerMarksNamesListedForThePrefixedCategory) {
    // In the shared external process prefixed requests are served here; names asked for with the
    // 64-bit prefix come back with it, so that they lead back to this manager.
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(NamesBothWays(L"*VXIPNP"), (Texts{"*MyScope", "*Scope1"}));
    EXPECT_EQ(NamesBothWays(L" *vxipnp ", logicalAndVirtual | IncludeCategoryPrefix),
              (Texts{"*VXIPNP::MyScope", "*VXIPNP::Scope1"}));
    EXPECT_EQ(NamesBothWays(L"VXIPNP"), configuredNames);
    // The 32-bit switch prefix marks nothing; category lists are never marked.
    EXPECT_EQ(NamesBothWays(L"32*RQ"), NamesBothWays(L"RQ"));
    EXPECT_EQ(CategoriesBothWays(L"*"), (Texts{"IVI", "VISA", "VXIPNP", "CUSTOM"}));
    ExpectNamesError(L"*FOO", "FOO");
    auto session = GetSession(manager.Get(), L"CUSTOM::Shared");
    EXPECT_EQ(SessionsBothWays(L"*CUSTOM"), IdentitiesOf({session.Get()}));
}

// ---- GetSessions --------------------------------------------------------------------------------

TEST_F(Listing, SessionsByCategoryInCreationOrder) {
    EXPECT_EQ(SessionsBothWays(L""), std::vector<IUnknown*>{});
    auto first = GetSession(manager.Get(), L"CUSTOM::First");
    auto route = GetSession(manager.Get(), L"RQ::Route1");
    auto lower = GetSession(manager.Get(), L"custom::Lower");
    auto scope = GetSession(manager.Get(), L"VXIPNP::MyScope");
    auto last = GetSession(manager.Get(), L"CUSTOM::Last");
    ASSERT_TRUE(first && route && lower && scope && last);

    EXPECT_EQ(SessionsBothWays(L""), IdentitiesOf({first.Get(), route.Get(), lower.Get(), scope.Get(), last.Get()}));
    EXPECT_EQ(SessionsBothWays(L"?"), SessionsBothWays(L""));
    EXPECT_EQ(SessionsBothWays(L"CUSTOM"), IdentitiesOf({first.Get(), lower.Get(), last.Get()}));
    EXPECT_EQ(SessionsBothWays(L" custom "), IdentitiesOf({first.Get(), lower.Get(), last.Get()}));
    EXPECT_EQ(SessionsBothWays(L"CUSTOM::"), IdentitiesOf({first.Get(), lower.Get(), last.Get()}));
    EXPECT_EQ(SessionsBothWays(L"rq"), IdentitiesOf({route.Get()}));
    EXPECT_EQ(SessionsBothWays(L"vxipnp"), IdentitiesOf({scope.Get()}));
    // No session of these: empty arrays, and no category check for a session listing.
    for (const wchar_t* none : {L"VISA", L"IVI", L"DAQ", L"FOO"})
        EXPECT_EQ(SessionsBothWays(none), std::vector<IUnknown*>{}) << Text(Bstr(none).Get());
    // These sessions have no sub-categories.
    EXPECT_EQ(SessionsBothWays(L"CUSTOM::Sub"), std::vector<IUnknown*>{});
    EXPECT_EQ(SessionsBothWays(L"FOO::BAR"), std::vector<IUnknown*>{});

    // A released session leaves the list; the others keep their order.
    lower.Reset();
    EXPECT_EQ(SessionsBothWays(L""), IdentitiesOf({first.Get(), route.Get(), scope.Get(), last.Get()}));
    EXPECT_EQ(SessionsBothWays(L"CUSTOM"), IdentitiesOf({first.Get(), last.Get()}));
}

TEST_F(Listing, EachListedSessionHoldsItsOwnReference) {
    auto one = GetSession(manager.Get(), L"CUSTOM::HeldOne");
    auto two = GetSession(manager.Get(), L"CUSTOM::HeldTwo");
    auto category = Bstr(L"CUSTOM");
    UniqueSafeArray early;
    ASSERT_EQ(manager->GetSessions(category.Get(), early.Put()), S_OK);
    UniqueVariant late;
    ASSERT_EQ(Invoke(dispatch.Get(), getSessionsId, DISPATCH_METHOD, Arguments().Text(L"CUSTOM"), late.Get()).result,
              S_OK);
    ASSERT_EQ(late->vt, VT_ARRAY | VT_DISPATCH);
    // The clients let go; only the two arrays keep the sessions alive.
    one.Reset();
    two.Reset();
    EXPECT_EQ(Sessions(L"CUSTOM").size(), 2u);
    for (SAFEARRAY* array : {early.Get(), late->parray}) {
        auto listed = SessionElements(array);
        ASSERT_EQ(listed.size(), 2u);
        EXPECT_EQ(NameOf(listed[0].Get()), "HeldOne");
        EXPECT_EQ(NameOf(listed[1].Get()), "HeldTwo");
        auto id = Bstr(L"Still");
        EXPECT_EQ(listed[0]->AttachLong(id.Get(), 1), S_OK);
        EXPECT_EQ(listed[0]->DetachData(id.Get()), S_OK);
    }
    early.Reset();
    EXPECT_EQ(Sessions(L"CUSTOM").size(), 2u);
    ::VariantClear(late.Get());
    EXPECT_EQ(Sessions(L"CUSTOM").size(), 0u);
}

TEST_F(Listing, LateBoundSessionArrayHoldsDispatchPointers) {
    auto session = GetSession(manager.Get(), L"CUSTOM::Scripted");
    UniqueVariant result;
    ASSERT_EQ(Invoke(dispatch.Get(), getSessionsId, DISPATCH_METHOD, Arguments().Text(L""), result.Get()).result, S_OK);
    // Script hosts receive an array of IDispatch: each element answers late-bound calls itself.
    ASSERT_EQ(result->vt, VT_ARRAY | VT_DISPATCH);
    ExpectListShape(result->parray, VT_DISPATCH);
    ASSERT_EQ(ElementCount(result->parray), 1);
    LONG index = 0;
    ComPtr<IDispatch> element;
    ASSERT_EQ(::SafeArrayGetElement(result->parray, &index, element.Put()), S_OK);
    UniqueVariant name;
    ASSERT_EQ(Invoke(element.Get(), sessionNameId, DISPATCH_PROPERTYGET, Arguments(), name.Get()).result, S_OK);
    ASSERT_EQ(name->vt, VT_BSTR);
    EXPECT_EQ(Text(name->bstrVal), "Scripted");
}

// ---- GetCategories ------------------------------------------------------------------------------

TEST_F(Listing, TopLevelCategoriesAndCategoriesWithoutSubCategories) {
    const Texts topLevel = {"IVI", "VISA", "VXIPNP", "CUSTOM"};
    for (const wchar_t* anyForm : {L"", L"?", L"  ", L"FOO::BAR", L"::"})
        EXPECT_EQ(CategoriesBothWays(anyForm), topLevel) << Text(Bstr(anyForm).Get());
    for (const wchar_t* leaf : {L"DAQ", L"VISA", L"VXIPNP", L"CUSTOM", L"visa", L" Custom ", L"VISA::x"})
        EXPECT_EQ(CategoriesBothWays(leaf), Texts{}) << Text(Bstr(leaf).Get());
    // The IVI source answers for its own sub-categories; lower case reaches it too.
    EXPECT_EQ(CategoriesBothWays(L"ivi"), CategoriesBothWays(L"IVI"));
}

TEST_F(Listing, CategoriesOfUnknownOrSwitchCategoryAreAnError) {
    // The whole trimmed argument is quoted.
    ExpectCategoriesError(L"RQ", "RQ");
    ExpectCategoriesError(L"rq", "rq");
    ExpectCategoriesError(L" RQ::Route1 ", "RQ::Route1");
    ExpectCategoriesError(L"FOO", "FOO");
    ExpectCategoriesError(L"\tFOO  ", "FOO");
}

TEST_F(Listing, HiddenCategoriesLeaveTheCategoryList) {
    Hide(L"VISA", true);
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"IVI", "VXIPNP", "CUSTOM"}));
    ExpectCategoriesError(L"VISA", "VISA");
    Hide(L"ivi", true);
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"VXIPNP", "CUSTOM"}));
    ExpectCategoriesError(L"IVI", "IVI");
    Hide(L"DAQ", true);
    ExpectCategoriesError(L"DAQ", "DAQ");
    Hide(L"VXIPNP", true);
    Hide(L"CUSTOM", true);
    EXPECT_EQ(CategoriesBothWays(L""), Texts{});
    Hide(L"CUSTOM", false);
    EXPECT_EQ(CategoriesBothWays(L""), Texts{"CUSTOM"});
}

// ---- HideCategory -------------------------------------------------------------------------------

TEST_F(Listing, HideCategoryTakesTheFiveHideableTokensInAnyForm) {
    for (const wchar_t* token : {L"IVI", L"DAQ", L"VISA", L"VXIPNP", L"CUSTOM", L"ivi", L" Visa\t", L"*VXIPNP"}) {
        auto text = Bstr(token);
        EXPECT_EQ(manager->HideCategory(text.Get(), VARIANT_TRUE), S_OK) << Text(text.Get());
        EXPECT_EQ(manager->HideCategory(text.Get(), VARIANT_FALSE), S_OK) << Text(text.Get());
    }
    // Late-bound, and any non-zero value hides.
    UniqueVariant none;
    EXPECT_EQ(Invoke(dispatch.Get(), hideCategoryId, DISPATCH_METHOD, Arguments().Text(L"VISA").Bool(true), none.Get())
                  .result,
              S_OK);
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"IVI", "VXIPNP", "CUSTOM"}));
    auto visa = Bstr(L"VISA");
    EXPECT_EQ(manager->HideCategory(visa.Get(), VARIANT_FALSE), S_OK);
    EXPECT_EQ(manager->HideCategory(visa.Get(), static_cast<VARIANT_BOOL>(1)), S_OK);
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"IVI", "VXIPNP", "CUSTOM"}));
}

TEST_F(Listing, HideCategoryRejectsOtherTextsQuotingThemAsPassed) {
    for (const wchar_t* rejected : {L"RQ", L" rq ", L"32*RQ", L"FOO", L"", L"VISA::x", L"?"}) {
        std::string quoted = Text(Bstr(rejected).Get());
        SCOPED_TRACE(quoted);
        auto text = Bstr(rejected);
        EXPECT_EQ(static_cast<unsigned long>(manager->HideCategory(text.Get(), VARIANT_TRUE)), unrecognizedValue);
        ReportedError reported = TakeErrorInfo();
        EXPECT_EQ(reported.description, "'" + quoted + "' is not a driver session category");
        EXPECT_TRUE(IsEqualGUID(reported.guid, CLSID_InstrSessionMgr));
        ExpectLateError(hideCategoryId, DISPATCH_METHOD, Arguments().Text(rejected).Bool(true), quoted);
    }
    // Nothing was hidden on the way.
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"IVI", "VISA", "VXIPNP", "CUSTOM"}));
}

TEST_F(Listing, HidingTakesACategoryOutOfEveryListingButNotItsSessions) {
    auto scope = GetSession(manager.Get(), L"VXIPNP::MyScope");
    ASSERT_TRUE(scope);
    std::string visibleState = State();
    ASSERT_NE(visibleState.find("   Session #0\n"), std::string::npos);

    Hide(L"VXIPNP", true);
    EXPECT_EQ(NamesBothWays(L""), Concatenated({NamesBothWays(L"IVI"), NamesBothWays(L"RQ"), NamesBothWays(L"VISA")}));
    ExpectNamesError(L"VXIPNP", "VXIPNP");
    // With the category gone, "VXIPNP::x" is just a name in the search over all categories.
    EXPECT_EQ(NamesBothWays(L"VXIPNP::x"), NamesBothWays(L""));
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"IVI", "VISA", "CUSTOM"}));
    std::string hiddenState = State();
    EXPECT_LT(hiddenState.size(), visibleState.size());
    EXPECT_EQ(hiddenState.find("VXIPNP Configuration:"), std::string::npos);

    // The live session is untouched: listed, described, found by its bare name, working.
    EXPECT_EQ(SessionsBothWays(L"VXIPNP"), IdentitiesOf({scope.Get()}));
    EXPECT_EQ(SessionsBothWays(L""), IdentitiesOf({scope.Get()}));
    EXPECT_NE(hiddenState.find("   Session #0\n   Name: MyScope, Category: VXIPNP"), std::string::npos) << hiddenState;
    EXPECT_EQ(GetSession(manager.Get(), L"MyScope").Get(), scope.Get());
    auto id = Bstr(L"Kept");
    EXPECT_EQ(scope->AttachLong(id.Get(), 7), S_OK);
    LONG value = 0;
    EXPECT_EQ(scope->GetLong(id.Get(), &value), S_OK);
    EXPECT_EQ(value, 7);

    Hide(L"VXIPNP", false);
    EXPECT_EQ(NamesBothWays(L"VXIPNP"), configuredNames);
}

TEST_F(Listing, ExternalPrefixOnHideCategoryActsOnThisManager) {
    Hide(L"*VISA", true);
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"IVI", "VXIPNP", "CUSTOM"}));
    ExpectNamesError(L"VISA", "VISA");
    Hide(L" *visa ", false);
    EXPECT_EQ(CategoriesBothWays(L""), (Texts{"IVI", "VISA", "VXIPNP", "CUSTOM"}));
}

// ---- StateDescription ---------------------------------------------------------------------------

TEST_F(Listing, StateTextOfAManagerWithoutSessions) {
    HideSources();
    const std::string expected = "In Process State:\n\nNumber of Sessions:0\n";
    EXPECT_EQ(State(), expected);
    EXPECT_EQ(LateState(), expected);
}

TEST_F(Listing, StateTextOfOneCustomSessionWithDataItems) {
    HideSources();
    auto bench = GetSession(manager.Get(), L"CUSTOM::Bench");
    UniqueBstr generated;
    ASSERT_EQ(bench->GenerateUniqueID(generated.Put()), S_OK);
    ASSERT_EQ(bench->AttachLong(generated.Get(), -5), S_OK);
    auto label = Bstr(L"Label"), text = Bstr(L"text");
    ASSERT_EQ(bench->AttachString(label.Get(), text.Get()), S_OK);
    const std::string expected =
        "In Process State:\n"
        "\nNumber of Sessions:1\n"
        "   Session #0\n"
        "   Name: Bench, Category: CUSTOM      Initialized: False, In Process\n"
        "      Data Items: 2\n"
        "         Item #0, Id: UniqueId1, DataType: Long: -5\n"
        "         Item #1, Id: Label, DataType: String: text\n";
    EXPECT_EQ(State(), expected);
    EXPECT_EQ(LateState(), expected);

    // A second session follows with its own number; a released one leaves the text.
    auto other = GetSession(manager.Get(), L"RQ::Route7");
    const std::string twoHead = "In Process State:\n\nNumber of Sessions:2\n";
    const std::string secondEntry = "   Session #1\n   Name: Route7, Category: RQ      Initialized: False, In Process\n";
    std::string two = State();
    ASSERT_GT(two.size(), twoHead.size() + secondEntry.size());
    EXPECT_EQ(two.substr(0, twoHead.size()), twoHead);
    EXPECT_EQ(two.substr(two.size() - secondEntry.size()), secondEntry);
    other.Reset();
    EXPECT_EQ(State(), expected);
}

TEST_F(Listing, StateTextHasTheSourcePartsInOrderAndEachHidingRemovesItsOwn) {
    const std::string header = "In Process State:\n", tail = "\nNumber of Sessions:0\n";
    // The text with only one source visible gives that source's part.
    auto partOf = [&](const wchar_t* visible) {
        HideSources();
        Hide(visible, false);
        std::string text = State();
        EXPECT_EQ(text.substr(0, header.size()), header);
        EXPECT_GE(text.size(), header.size() + tail.size());
        EXPECT_EQ(text.substr(text.size() - tail.size()), tail);
        return text.substr(header.size(), text.size() - header.size() - tail.size());
    };
    std::string vxipnp = partOf(L"VXIPNP"), ivi = partOf(L"IVI"), visa = partOf(L"VISA");
    for (const wchar_t* category : {L"VXIPNP", L"IVI", L"VISA"}) Hide(category, false);
    EXPECT_FALSE(vxipnp.empty());
    EXPECT_EQ(State(), header + vxipnp + ivi + visa + tail);
    EXPECT_EQ(LateState(), header + vxipnp + ivi + visa + tail);
    // DAQ and CUSTOM have no part of their own.
    Hide(L"DAQ", true);
    Hide(L"CUSTOM", true);
    EXPECT_EQ(State(), header + vxipnp + ivi + visa + tail);
}

// ---- outputs ------------------------------------------------------------------------------------

TEST_F(Listing, NullOutputPointersAreRefused) {
    auto empty = Bstr(L"");
    EXPECT_EQ(manager->GetNames(empty.Get(), static_cast<GetNamesOptions>(0), empty.Get(), nullptr), E_POINTER);
    EXPECT_EQ(manager->GetSessions(empty.Get(), nullptr), E_POINTER);
    EXPECT_EQ(manager->GetCategories(empty.Get(), nullptr), E_POINTER);
    EXPECT_EQ(manager->get_StateDescription(nullptr), E_POINTER);
}

// ---- across apartments --------------------------------------------------------------------------

namespace {
// Runs body on a new thread of its own single-threaded apartment, where the manager is reached
// through a proxy (it lives in the multithreaded apartment).
template <class Body>
void InSingleThreadedApartment(Body&& body) {
    struct Job {
        Body* body;
    } job{&body};
    HANDLE thread = ::CreateThread(
        nullptr, 0,
        [](void* parameter) -> DWORD {
            auto* work = static_cast<Job*>(parameter);
            if (FAILED(::CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED))) return 1;
            (*work->body)();
            ::CoUninitialize();
            return 0;
        },
        &job, 0, nullptr);
    ASSERT_NE(thread, nullptr);
    UniqueKernelHandle owned(thread);
    ASSERT_EQ(::WaitForSingleObject(thread, 60000), WAIT_OBJECT_0);
    DWORD code = 99;
    ::GetExitCodeThread(thread, &code);
    EXPECT_EQ(code, 0u);
}
}  // namespace

// Early-bound callers on threads of a single-threaded apartment reach the manager through a proxy
// built from the registered type library, session arrays included.
TEST_F(Listing, ListingsCrossApartmentsThroughTheRegisteredTypeLibrary) {
    auto session = GetSession(manager.Get(), L"CUSTOM::Marshalled");
    InSingleThreadedApartment([&] {
        ComPtr<IInstrSessionMgr> proxy;
        ASSERT_EQ(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                     proxy.PutVoid()),
                  S_OK);
        auto all = Bstr(L""), filter = Bstr(L"");
        UniqueSafeArray names, categories, sessions;
        EXPECT_EQ(proxy->GetNames(all.Get(), static_cast<GetNamesOptions>(logicalAndVirtual), filter.Get(), names.Put()),
                  S_OK);
        EXPECT_EQ(TextElements(names.Get()), Names(L""));
        EXPECT_EQ(proxy->GetCategories(all.Get(), categories.Put()), S_OK);
        EXPECT_EQ(TextElements(categories.Get()), (Texts{"IVI", "VISA", "VXIPNP", "CUSTOM"}));
        ASSERT_EQ(proxy->GetSessions(all.Get(), sessions.Put()), S_OK);
        auto listed = SessionElements(sessions.Get(), false);
        ASSERT_EQ(listed.size(), 1u);
        EXPECT_EQ(NameOf(listed[0].Get()), "Marshalled");

        ComPtr<IDispatch> late;
        ASSERT_EQ(proxy->QueryInterface(IID_IDispatch, late.PutVoid()), S_OK);
        UniqueVariant result;
        ASSERT_EQ(Invoke(late.Get(), getSessionsId, DISPATCH_METHOD, Arguments().Text(L""), result.Get()).result, S_OK);
        ASSERT_EQ(result->vt, VT_ARRAY | VT_DISPATCH);
        auto lateListed = SessionElements(result->parray, false);
        ASSERT_EQ(lateListed.size(), 1u);
        EXPECT_EQ(NameOf(lateListed[0].Get()), "Marshalled");
    });
}
