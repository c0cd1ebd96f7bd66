// Hostile automation input through the vtables and IDispatch::Invoke of the manager and of a
// session of every category: null BSTRs, null out-pointers, wrong VARIANT types, a 10 MB text,
// embedded NULs, text outside the code page, negative, huge and non-numeric timeouts, enumeration
// values out of range. Each row names what it would catch and asserts the exact HRESULT and error
// text (none where the product sets none); after every row the session table must be empty again.
//
// A session row runs once per entry of sessionNames: a new category adds one line there.
#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <limits>
#include <string>
#include <vector>

#include "com/ComClient.h"
#include "framework/ErrorCodes.h"

using namespace sm;
using namespace sm::testing;

namespace {

const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

// One session of each category that this build creates; the rows below hold for all of them.
const wchar_t* const sessionNames[] = {
    L"CUSTOM::BadInput",
};

constexpr std::size_t tenMegabytes = 10u << 20;
constexpr HRESULT Te(std::int32_t code) { return static_cast<HRESULT>(code); }
const HRESULT unrecognized = Te(TE_UNRECOGNIZED_VALUE), invalidPointer = Te(TE_INVALID_POINTER),
              outOfRange = Te(TE_INVALID_OR_OUT_OF_RANGE), timedOut = Te(TE_OPERATION_TIMED_OUT),
              failed = Te(TE_OPERATION_FAILED), duplicate = Te(TE_DUPLICATE_ITEM_OR_VALUE);

// What a call gave back. A late-bound call that raised is read from its EXCEPINFO: result is then
// the scode, so early and late rows assert the same codes.
struct Outcome {
    HRESULT result = E_FAIL;
    std::string description;
};

Outcome Early(HRESULT result) { return {result, TakeErrorInfo().description}; }

// A BSTR that may hold any UTF-16, embedded NULs included.
UniqueBstr Wide(const std::wstring& text) {
    return UniqueBstr(::SysAllocStringLen(text.data(), static_cast<UINT>(text.size())));
}

Outcome Late(IDispatch* target, DISPID member, WORD flags, const Arguments& arguments, VARIANT* result = nullptr) {
    std::vector<VARIANT> reversed = arguments.Reversed();
    DISPID named = DISPID_PROPERTYPUT;
    bool put = flags == DISPATCH_PROPERTYPUT;
    DISPPARAMS parameters{reversed.data(), put ? &named : nullptr, static_cast<UINT>(reversed.size()), put ? 1u : 0u};
    UniqueExcepInfo exception;
    UINT argumentError = 0;
    Outcome outcome{target->Invoke(member, IID_NULL, 0, flags, &parameters, result, &exception, &argumentError), {}};
    if (outcome.result == DISP_E_EXCEPTION) {
        if (exception.pfnDeferredFillIn) exception.pfnDeferredFillIn(&exception);
        outcome.result = exception.scode;
        outcome.description = Text(exception.bstrDescription);
    }
    TakeErrorInfo();
    return outcome;
}

// What a row works on: the manager and one session, each also as IDispatch. Sessions a row makes
// are kept in made and released after the row's answer was checked.
struct Context {
    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IDispatch> managerDispatch;
    ComPtr<IInstrSession> session;
    ComPtr<IDispatch> sessionDispatch;
    ComPtr<IInstrSession> made;
};

// Compares long texts without printing megabytes on a failure.
void ExpectText(const std::string& actual, const std::string& expected) {
    EXPECT_TRUE(actual == expected) << "got " << actual.size() << " bytes '" << actual.substr(0, 120) << "', expected "
                                    << expected.size() << " bytes '" << expected.substr(0, 120) << "'";
}

std::string SessionName(IInstrSession* session) { return NameOf(session); }

LONG LongItem(Context& c, const std::wstring& id, HRESULT expected = S_OK) {
    LONG value = -1;
    EXPECT_EQ(c.session->GetLong(Wide(id).Get(), &value), expected);
    TakeErrorInfo();
    return value;
}

std::pair<std::string, LONG> LockState(Context& c) {
    UniqueBstr key;
    LONG level = -1;
    EXPECT_EQ(c.session->GetLockState(key.Put(), &level), S_OK);
    return {Text(key.Get()), level};
}

void Lock(Context& c, const std::wstring& key, double timeout = 0) {
    ASSERT_EQ(c.session->LockSession(Wide(key).Get(), timeout, 0), S_OK) << TakeErrorInfo().description;
}

LONG ListedSessions(IInstrSessionMgr* manager) {
    UniqueSafeArray listed;
    EXPECT_EQ(manager->GetSessions(nullptr, listed.Put()), S_OK);
    LONG upper = -1;
    if (listed) ::SafeArrayGetUBound(listed.Get(), 1, &upper);
    return upper + 1;
}

struct Row {
    const char* name;  // the fault the row would catch
    std::function<Outcome(Context&)> call;
    HRESULT expected;
    std::string description;  // exact error text; empty: the call sets no error info
    std::function<void(Context&)> answer = nullptr;  // the defined result, checked after the call
};

std::ostream& operator<<(std::ostream& out, const Row& row) { return out << row.name; }

// Opens the manager (and the named session), runs the row, then lets everything go: the table must
// be empty again, so no row leaves a half-made or leaked session behind.
void RunRow(const Row& row, const wchar_t* sessionName) {
    Context c;
    c.manager = CreateManager();
    ASSERT_TRUE(c.manager);
    ASSERT_EQ(c.manager->QueryInterface(IID_IDispatch, c.managerDispatch.PutVoid()), S_OK);
    if (sessionName) {
        c.session = GetSession(c.manager.Get(), sessionName);
        ASSERT_TRUE(c.session);
        ASSERT_EQ(c.session->QueryInterface(IID_IDispatch, c.sessionDispatch.PutVoid()), S_OK);
    }
    TakeErrorInfo();
    Outcome outcome = row.call(c);
    EXPECT_EQ(outcome.result, row.expected);
    ExpectText(outcome.description, row.description);
    if (row.answer) row.answer(c);
    c.made.Reset();
    c.session.Reset();
    c.sessionDispatch.Reset();
    EXPECT_EQ(ListedSessions(c.manager.Get()), 0) << "a session was left in the table";
}

// A lone high surrogate has no form in any code page, nor has U+0E01 in 1252 or 932.
const std::wstring outsideCodePage = {wchar_t(0x0E01), wchar_t(0xD800)};

// ---- the manager --------------------------------------------------------------------------------

const std::wstring tenMegabyteName(tenMegabytes, L'n');

const Row managerRows[] = {
    {"NullNameSearchedAsEmptyName",
     [](Context& c) { return Early(c.manager->GetInstrSession(nullptr, VARIANT_FALSE, c.made.Put())); }, unrecognized,
     "'' is not a driver session name", [](Context& c) { EXPECT_EQ(c.made.Get(), nullptr); }},
    {"NullSessionOutPointerCreatesNothing",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::X").Get(), VARIANT_FALSE, nullptr)); },
     E_POINTER, ""},
    {"NullNamesOutPointer", [](Context& c) { return Early(c.manager->GetNames(nullptr, ReturnLogicalNames, nullptr, nullptr)); }, E_POINTER, ""},
    {"NullSessionsOutPointer", [](Context& c) { return Early(c.manager->GetSessions(nullptr, nullptr)); }, E_POINTER, ""},
    {"NullCategoriesOutPointer", [](Context& c) { return Early(c.manager->GetCategories(nullptr, nullptr)); }, E_POINTER, ""},
    {"NullStateOutPointer", [](Context& c) { return Early(c.manager->get_StateDescription(nullptr)); }, E_POINTER, ""},
    {"NullProcessFlagOutPointer", [](Context& c) { return Early(c.manager->get_InExternalProcess(nullptr)); }, E_POINTER, ""},
    {"NullAlertsOutPointer", [](Context& c) { return Early(c.manager->get_AudibleLifeTimeAlerts(nullptr)); }, E_POINTER, ""},
    {"NullKeyOutPointer", [](Context& c) { return Early(c.manager->GetUniqueKeyName(nullptr)); }, E_POINTER, ""},
    {"TenMegabyteNameKeptWhole",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::" + tenMegabyteName).Get(), VARIANT_FALSE, c.made.Put())); },
     S_OK, "",
     [](Context& c) {
         ExpectText(SessionName(c.made.Get()), std::string(tenMegabytes, 'n'));
         ComPtr<IInstrSession> again = GetSession(c.manager.Get(), (L"CUSTOM::" + tenMegabyteName).c_str());
         EXPECT_EQ(IdentityOf(again.Get()), IdentityOf(c.made.Get()));
     }},
    {"TenMegabyteCategoryNamedInError",
     [](Context& c) { UniqueSafeArray names; return Early(c.manager->GetNames(Wide(std::wstring(tenMegabytes, L'c')).Get(), ReturnLogicalNames, nullptr, names.Put())); },
     unrecognized, "'" + std::string(tenMegabytes, 'c') + "' is not a driver session category"},
    {"EmbeddedNulEndsTheName",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(std::wstring(L"CUSTOM::Bench\0Tail", 18)).Get(), VARIANT_FALSE, c.made.Put())); },
     S_OK, "",
     [](Context& c) {
         EXPECT_EQ(SessionName(c.made.Get()), "Bench");
         EXPECT_EQ(IdentityOf(GetSession(c.manager.Get(), L"CUSTOM::Bench").Get()), IdentityOf(c.made.Get()));
     }},
    {"TextOutsideCodePageBecomesDefaultCharacter",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::" + outsideCodePage).Get(), VARIANT_FALSE, c.made.Put())); },
     S_OK, "", [](Context& c) { EXPECT_EQ(SessionName(c.made.Get()), "??"); }},
    {"UnconvertibleCategoryReadsAsAnyCategory",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"\u0E01::X").Get(), VARIANT_FALSE, c.made.Put())); },
     unrecognized, "'?::X' is not a driver session name"},
    {"NewSessionFlagOtherThanMinusOneIsTrue",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::Fresh").Get(), 2, c.made.Put())); }, S_OK, "",
     [](Context& c) { EXPECT_EQ(SessionName(c.made.Get()), "Fresh_2"); }},
    {"NamesOptionsOutOfRangeIgnored",
     [](Context& c) { UniqueSafeArray names; return Early(c.manager->GetNames(Wide(L"CUSTOM").Get(), static_cast<GetNamesOptions>(-1), nullptr, names.Put())); },
     S_OK, ""},
    {"NullCategoryListsEverySession", [](Context& c) { UniqueSafeArray all; return Early(c.manager->GetSessions(nullptr, all.Put())); }, S_OK, ""},
    {"NullCategoryCannotBeHidden", [](Context& c) { return Early(c.manager->HideCategory(nullptr, VARIANT_FALSE)); },
     unrecognized, "'' is not a driver session category"},
    {"HideFlagOtherThanMinusOneHides", [](Context& c) { return Early(c.manager->HideCategory(Wide(L"DAQ").Get(), 2)); }, S_OK, "",
     [](Context& c) {
         UniqueSafeArray names;
         EXPECT_EQ(c.manager->GetNames(Wide(L"DAQ").Get(), ReturnLogicalNames, nullptr, names.Put()), unrecognized);
         EXPECT_EQ(TakeErrorInfo().description, "'DAQ' is not a driver session category");
         EXPECT_EQ(c.manager->HideCategory(Wide(L"DAQ").Get(), VARIANT_FALSE), S_OK);
     }},
    // Late-bound: the type library's dispatch coerces or refuses the argument before the method runs.
    {"LateNameAsNumberCoercedToText",
     [](Context& c) { UniqueVariant r; return Late(c.managerDispatch.Get(), 3, DISPATCH_METHOD, Arguments().Long(42).Bool(false), r.Get()); },
     unrecognized, "'42' is not a driver session name"},
    {"LateNameAsObjectRefused",
     [](Context& c) { UniqueVariant r; return Late(c.managerDispatch.Get(), 3, DISPATCH_METHOD, Arguments().Null(VT_UNKNOWN).Bool(false), r.Get()); },
     DISP_E_TYPEMISMATCH, ""},
    {"LateMissingArgumentsRefused",
     [](Context& c) { UniqueVariant r; return Late(c.managerDispatch.Get(), 3, DISPATCH_METHOD, Arguments(), r.Get()); },
     DISP_E_BADPARAMCOUNT, ""},
    {"LateUnknownMemberRefused",
     [](Context& c) { return Late(c.managerDispatch.Get(), 0x7777, DISPATCH_METHOD, Arguments()); }, DISP_E_MEMBERNOTFOUND, ""},
    {"LateOptionsAsTextRefused",
     [](Context& c) { UniqueVariant r; return Late(c.managerDispatch.Get(), 4, DISPATCH_METHOD, Arguments().Text(L"?").Text(L"all").Text(L""), r.Get()); },
     DISP_E_TYPEMISMATCH, ""},
    {"LateNullDispParamsRefused",
     [](Context& c) { UniqueVariant r; return Outcome{c.managerDispatch->Invoke(5, IID_NULL, 0, DISPATCH_PROPERTYGET, nullptr, r.Get(), nullptr, nullptr), TakeErrorInfo().description}; },
     E_INVALIDARG, ""},
};

class ManagerBadInput : public ::testing::TestWithParam<Row> {};

TEST_P(ManagerBadInput, GivesItsDefinedAnswer) { RunRow(GetParam(), nullptr); }

INSTANTIATE_TEST_SUITE_P(Rows, ManagerBadInput, ::testing::ValuesIn(managerRows),
                         [](const auto& info) { return std::string(info.param.name); });

// ---- the sessions -------------------------------------------------------------------------------

enum SessionDispid : DISPID { nameId = 0x03, getComDriverId = 0x05, attachLongId = 0x0C, lockSessionId = 0x15, attachLongPtrId = 0x1B };

VARIANT Typed(VARTYPE type) {
    VARIANT value;
    ::VariantInit(&value);
    value.vt = type;
    if (type == VT_I4) value.lVal = 5;
    if (type == VT_R8) value.dblVal = 5;
    return value;
}

Outcome LockedByOther(Context& c, double timeout) {
    Lock(c, L"Holder");
    return Early(c.session->LockSession(Wide(L"Other").Get(), timeout, 0));
}

void LockUnchanged(Context& c) { EXPECT_EQ(LockState(c), std::make_pair(std::string("Holder"), 1L)); }

const double infinity = std::numeric_limits<double>::infinity();

const Row sessionRows[] = {
    {"NullNameOutPointer", [](Context& c) { return Early(c.session->get_Name(nullptr)); }, E_POINTER, ""},
    {"NullCategoryOutPointer", [](Context& c) { return Early(c.session->get_Category(nullptr)); }, E_POINTER, ""},
    {"NullStateOutPointer", [](Context& c) { return Early(c.session->get_StateDescription(nullptr)); }, E_POINTER, ""},
    {"NullUniqueIdOutPointer", [](Context& c) { return Early(c.session->GenerateUniqueID(nullptr)); }, E_POINTER, ""},
    {"NullObjectOutPointer", [](Context& c) { return Early(c.session->GetObject(Wide(L"A").Get(), nullptr)); }, E_POINTER, ""},
    {"NullLongOutPointer", [](Context& c) { return Early(c.session->GetLong(Wide(L"A").Get(), nullptr)); }, E_POINTER, ""},
    {"NullStringOutPointer", [](Context& c) { return Early(c.session->GetString(Wide(L"A").Get(), nullptr)); }, E_POINTER, ""},
    {"NullLongPtrOutPointer", [](Context& c) { return Early(c.session->GetLongPtr(Wide(L"A").Get(), nullptr)); }, E_POINTER, ""},
    {"NullCloseEnabledOutPointer", [](Context& c) { return Early(c.session->get_CloseEnabled(nullptr)); }, E_POINTER, ""},
    {"NullProcessFlagOutPointer", [](Context& c) { return Early(c.session->get_InExternalProcess(nullptr)); }, E_POINTER, ""},
    {"NullCloseFunctionOutPointer", [](Context& c) { return Early(c.session->get_CloseFunctionEx(nullptr)); }, E_POINTER, ""},
    {"NullInitializedOutPointer", [](Context& c) { return Early(c.session->IsInitialized(nullptr)); }, E_POINTER, ""},
    {"NullHandleOutPointer", [](Context& c) { return Early(c.session->GetHandleEx(DefaultInterface, nullptr)); }, E_POINTER, ""},
    {"NullDriverOutPointer", [](Context& c) { return Early(c.session->GetCOMDriver(DefaultInterface, nullptr)); }, E_POINTER, ""},
    {"NullVppBaseOutPointer", [](Context& c) { return Early(c.session->GetVPPBaseInterface(nullptr)); }, E_POINTER, ""},
    {"NullOwnerKeyOutPointer", [](Context& c) { LONG level; return Early(c.session->GetLockState(nullptr, &level)); }, invalidPointer, "Invalid Pointer."},
    {"NullNestingOutPointer", [](Context& c) { UniqueBstr key; return Early(c.session->GetLockState(key.Put(), nullptr)); }, invalidPointer, "Invalid Pointer."},
    {"NullIdIsTheEmptyId", [](Context& c) { return Early(c.session->AttachLong(nullptr, 7)); }, S_OK, "",
     [](Context& c) { EXPECT_EQ(LongItem(c, L""), 7); }},
    {"NullIdDetachesEveryItem",
     [](Context& c) { c.session->AttachLong(Wide(L"A").Get(), 1); return Early(c.session->DetachData(nullptr)); }, S_OK, "",
     [](Context& c) { LongItem(c, L"A", unrecognized); }},
    {"NullKeyRefused", [](Context& c) { return Early(c.session->LockSession(nullptr, 0, 0)); }, outOfRange, "Value invalid or out of range.",
     [](Context& c) { EXPECT_EQ(LockState(c).second, 0); }},
    {"NullNameIsTheEmptyName", [](Context& c) { return Early(c.session->put_Name(nullptr)); }, S_OK, "",
     [](Context& c) { EXPECT_EQ(SessionName(c.session.Get()), ""); }},
    {"NullStringIsTheEmptyText", [](Context& c) { return Early(c.session->AttachString(Wide(L"S").Get(), nullptr)); }, S_OK, "",
     [](Context& c) { UniqueBstr text; EXPECT_EQ(c.session->GetString(Wide(L"S").Get(), text.Put()), S_OK); EXPECT_EQ(::SysStringLen(text.Get()), 0u); }},
    {"NullObjectWithoutClassCannotBeMade", [](Context& c) { return Early(c.session->AttachObject(Wide(L"O").Get(), nullptr, nullptr, VARIANT_FALSE)); }, S_OK, "",
     [](Context& c) { ComPtr<IUnknown> object; EXPECT_EQ(c.session->GetObject(Wide(L"O").Get(), object.Put()), failed); EXPECT_EQ(TakeErrorInfo().description, "Operation Failed."); }},
    {"LongPtrAsLongRefused", [](Context& c) { return Early(c.session->AttachLongPtr(Wide(L"P").Get(), Typed(VT_I4))); }, invalidPointer, "Invalid Pointer.",
     [](Context& c) { UniqueVariant value; EXPECT_EQ(c.session->GetLongPtr(Wide(L"P").Get(), value.Get()), unrecognized); }},
    {"LongPtrAsEmptyRefused", [](Context& c) { return Early(c.session->AttachLongPtr(Wide(L"P").Get(), Typed(VT_EMPTY))); }, invalidPointer, "Invalid Pointer."},
    {"CloseFunctionAsDoubleRefused", [](Context& c) { return Early(c.session->put_CloseFunctionEx(Typed(VT_R8))); }, invalidPointer, "Invalid Pointer.",
     [](Context& c) { UniqueVariant address; ASSERT_EQ(c.session->get_CloseFunctionEx(address.Get()), S_OK); EXPECT_EQ(address.Get()->ullVal, 0u); }},
    {"TenMegabyteNameKeptWhole", [](Context& c) { return Early(c.session->put_Name(Wide(tenMegabyteName).Get())); }, S_OK, "",
     [](Context& c) { ExpectText(SessionName(c.session.Get()), std::string(tenMegabytes, 'n')); }},
    {"TenMegabyteKeyKeptWhole", [](Context& c) { return Early(c.session->LockSession(Wide(tenMegabyteName).Get(), 0, 0)); }, S_OK, "",
     [](Context& c) { auto [key, level] = LockState(c); ExpectText(key, std::string(tenMegabytes, 'n')); EXPECT_EQ(level, 1); }},
    {"TenMegabyteStringKeptWhole", [](Context& c) { return Early(c.session->AttachString(Wide(L"S").Get(), Wide(tenMegabyteName).Get())); }, S_OK, "",
     [](Context& c) { UniqueBstr text; EXPECT_EQ(c.session->GetString(Wide(L"S").Get(), text.Put()), S_OK); EXPECT_EQ(::SysStringLen(text.Get()), tenMegabytes); }},
    {"EmbeddedNulEndsTheItemId",
     [](Context& c) { c.session->AttachLong(Wide(std::wstring(L"X\0Y", 3)).Get(), 1); return Early(c.session->AttachLong(Wide(L"X").Get(), 2)); },
     duplicate, "Duplicate item or value.", [](Context& c) { EXPECT_EQ(LongItem(c, L"X"), 1); }},
    {"EmbeddedNulEndsTheLockKey",
     [](Context& c) { Lock(c, L"K"); return Early(c.session->LockSession(Wide(std::wstring(L"k\0Z", 3)).Get(), 0, 0)); }, S_OK, "",
     [](Context& c) { EXPECT_EQ(LockState(c), std::make_pair(std::string("K"), 2L)); }},
    {"TextOutsideCodePageBecomesDefaultCharacter",
     [](Context& c) { return Early(c.session->AttachString(Wide(L"S").Get(), Wide(outsideCodePage).Get())); }, S_OK, "",
     [](Context& c) { UniqueBstr text; EXPECT_EQ(c.session->GetString(Wide(L"S").Get(), text.Put()), S_OK); EXPECT_EQ(Text(text.Get()), "??"); }},
    {"NegativeTimeoutOnFreeLock", [](Context& c) { return Early(c.session->LockSession(Wide(L"K").Get(), -1, 0)); }, S_OK, ""},
    {"MinusInfinityOnFreeLock", [](Context& c) { return Early(c.session->LockSession(Wide(L"K").Get(), -infinity, 0)); }, S_OK, ""},
    {"HugeTimeoutOnFreeLock", [](Context& c) { return Early(c.session->LockSession(Wide(L"K").Get(), 1e308, 0)); }, S_OK, ""},
    {"InfinityReentersOwnLock", [](Context& c) { Lock(c, L"K"); return Early(c.session->LockSession(Wide(L"k").Get(), infinity, 0)); }, S_OK, "",
     [](Context& c) { EXPECT_EQ(LockState(c).second, 2); }},
    {"ZeroTimeoutAgainstOtherKey", [](Context& c) { return LockedByOther(c, 0); }, timedOut, "Operation Timed Out.", LockUnchanged},
    {"NegativeZeroAgainstOtherKey", [](Context& c) { return LockedByOther(c, -0.0); }, timedOut, "Operation Timed Out.", LockUnchanged},
    {"NotANumberAgainstOtherKey", [](Context& c) { return LockedByOther(c, std::nan("")); }, timedOut, "Operation Timed Out.", LockUnchanged},
    {"SmallestTimeoutAgainstOtherKey", [](Context& c) { return LockedByOther(c, 5e-324); }, timedOut, "Operation Timed Out.", LockUnchanged},
    {"UnlockOfFreeLockRefused", [](Context& c) { return Early(c.session->UnlockSession()); }, failed, "Operation Failed."},
    {"ProcessFlagOtherThanMinusOneIsTrue", [](Context& c) { return Early(c.session->put_InExternalProcess(2)); }, S_OK, "",
     [](Context& c) { VARIANT_BOOL flag = 0; c.session->get_InExternalProcess(&flag); EXPECT_EQ(flag, VARIANT_TRUE); EXPECT_EQ(SessionName(c.session.Get())[0], '*'); }},
    {"CloseEnabledOtherThanMinusOneIsTrue", [](Context& c) { return Early(c.session->put_CloseEnabled(5)); }, S_OK, "",
     [](Context& c) { VARIANT_BOOL flag = 0; c.session->get_CloseEnabled(&flag); EXPECT_EQ(flag, VARIANT_TRUE); }},
    {"LateTimeoutAsTextRefused",
     [](Context& c) { return Late(c.sessionDispatch.Get(), lockSessionId, DISPATCH_METHOD, Arguments().Text(L"K").Text(L"soon").Long(0)); },
     DISP_E_TYPEMISMATCH, "", [](Context& c) { EXPECT_EQ(LockState(c).second, 0); }},
    {"LateValueAsTextRefused",
     [](Context& c) { return Late(c.sessionDispatch.Get(), attachLongId, DISPATCH_METHOD, Arguments().Text(L"A").Text(L"x")); },
     DISP_E_TYPEMISMATCH, ""},
    {"LateLongPtrAsLongRefused",
     [](Context& c) { return Late(c.sessionDispatch.Get(), attachLongPtrId, DISPATCH_METHOD, Arguments().Text(L"P").Long(5)); },
     invalidPointer, "Invalid Pointer."},
    {"LateNameAsNullRefused",
     [](Context& c) { return Late(c.sessionDispatch.Get(), nameId, DISPATCH_PROPERTYPUT, Arguments().Null(VT_NULL)); },
     DISP_E_TYPEMISMATCH, ""},
    {"LateUnassignedDispidRefused", [](Context& c) { return Late(c.sessionDispatch.Get(), 0x0F, DISPATCH_METHOD, Arguments()); },
     DISP_E_MEMBERNOTFOUND, ""},
};

class SessionBadInput : public ::testing::TestWithParam<std::tuple<const wchar_t*, Row>> {};

TEST_P(SessionBadInput, GivesItsDefinedAnswer) { RunRow(std::get<1>(GetParam()), std::get<0>(GetParam())); }

INSTANTIATE_TEST_SUITE_P(Rows, SessionBadInput, ::testing::Combine(::testing::ValuesIn(sessionNames), ::testing::ValuesIn(sessionRows)),
                         [](const auto& info) {
                             std::string category = Text(Wide(std::get<0>(info.param)).Get());
                             return category.substr(0, category.find(':')) + "_" + std::get<1>(info.param).name;
                         });

// ---- the custom session's own methods ------------------------------------------------------------

const Row customRows[] = {
    {"HandleLevelOutOfRange", [](Context& c) { LONG handle = -1; Outcome o = Early(c.session->GetHandle(static_cast<InterfaceLevel>(99), &handle)); EXPECT_EQ(handle, 0); return o; }, E_NOTIMPL, ""},
    {"HandleExLevelNegative", [](Context& c) { UniqueVariant handle; Outcome o = Early(c.session->GetHandleEx(static_cast<InterfaceLevel>(-1), handle.Get())); EXPECT_EQ(handle.Get()->vt, VT_UI8); return o; }, E_NOTIMPL, ""},
    {"DriverLevelPastTheLastGivesNull", [](Context& c) { ComPtr<IUnknown> d; return Early(c.session->GetCOMDriver(static_cast<InterfaceLevel>(4), d.Put())); }, S_OK, ""},
    {"DriverLevelNegativeGivesNull", [](Context& c) { ComPtr<IUnknown> d; return Early(c.session->GetCOMDriver(static_cast<InterfaceLevel>(-1), d.Put())); }, S_OK, ""},
    {"LateDriverLevelHugeGivesNull",
     [](Context& c) { UniqueVariant r; return Late(c.sessionDispatch.Get(), getComDriverId, DISPATCH_METHOD, Arguments().Long(0x7FFFFFFF), r.Get()); }, S_OK, ""},
    {"NullOptionsInitialize", [](Context& c) { return Early(c.session->Initialize(nullptr)); }, S_OK, ""},
};

class CustomBadInput : public ::testing::TestWithParam<Row> {};

TEST_P(CustomBadInput, GivesItsDefinedAnswer) { RunRow(GetParam(), L"CUSTOM::BadInput"); }

INSTANTIATE_TEST_SUITE_P(Rows, CustomBadInput, ::testing::ValuesIn(customRows),
                         [](const auto& info) { return std::string(info.param.name); });

}  // namespace
