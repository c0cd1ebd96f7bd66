// Hostile automation input through the vtables of the manager and of a session of every category:
// null out-pointers and BSTRs, a 10 MB text, embedded NULs, text outside the code page, extreme
// timeouts, flags and enumerations out of range, wrong VARIANT types. One row per decision; what a
// lower layer's tests decide (conversion, lock and item rules, the listings' null checks) is not
// repeated. Each row names what it would catch and asserts the exact HRESULT and error text (none
// where the product sets none); after every row the session table must be empty again.
//
// A session row runs once per entry of sessionNames: a new category adds one line there.
#include <gtest/gtest.h>

#include <cmath>
#include <functional>
#include <limits>
#include <string>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {

const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

// One session of each category that this build creates; the rows below hold for all of them.
const wchar_t* const sessionNames[] = {
    L"CUSTOM::BadInput",
};

constexpr std::size_t tenMegabytes = 10u << 20;
const std::wstring tenMegabyteName(tenMegabytes, L'n');
// A lone high surrogate has no form in any code page, nor has U+0E01 in 1252 or 932.
const std::wstring outsideCodePage = {wchar_t(0x0E01), wchar_t(0xD800)};

// What a call gave back; a late-bound call that raised gives its EXCEPINFO's scode and text.
struct Outcome {
    HRESULT result;
    std::string description;
};

Outcome Early(HRESULT result) { return {result, TakeErrorInfo().description}; }
Outcome Late(const LateResult& late) { return {late.code ? HRESULT(late.code) : late.result, late.description}; }

// A BSTR that may hold any UTF-16, embedded NULs included.
UniqueBstr Wide(const std::wstring& text) { return UniqueBstr(::SysAllocStringLen(text.data(), static_cast<UINT>(text.size()))); }

// What a row works on: the manager and one session; a session the row makes is kept in made.
struct Context {
    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IInstrSession> session, made;
};

// Compares long texts without printing megabytes on a failure.
void ExpectText(const std::string& actual, const std::string& expected) {
    EXPECT_TRUE(actual == expected) << "got " << actual.size() << " bytes '" << actual.substr(0, 120) << "', expected "
                                    << expected.size() << " bytes '" << expected.substr(0, 120) << "'";
}

std::pair<std::string, LONG> LockState(Context& c) {
    UniqueBstr key;
    LONG level = -1;
    EXPECT_EQ(c.session->GetLockState(key.Put(), &level), S_OK);
    return {Text(key.Get()), level};
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
    if (sessionName) {
        ASSERT_TRUE(c.session = GetSession(c.manager.Get(), sessionName));
    }
    TakeErrorInfo();
    Outcome outcome = row.call(c);
    EXPECT_EQ(outcome.result, row.expected);
    ExpectText(outcome.description, row.description);
    if (row.answer) row.answer(c);
    c.made.Reset();
    c.session.Reset();
    UniqueSafeArray listed;
    EXPECT_EQ(c.manager->GetSessions(nullptr, listed.Put()), S_OK);
    EXPECT_EQ(ReadSafeArray<ComPtr<IDispatch>>(listed.Get(), VT_DISPATCH).size(), 0u) << "a session was left in the table";
}

// ---- the manager --------------------------------------------------------------------------------

const Row managerRows[] = {
    {"NullNameSearchedAsEmptyName",
     [](Context& c) { return Early(c.manager->GetInstrSession(nullptr, VARIANT_FALSE, c.made.Put())); }, HRESULT(unrecognizedValue),
     "'' is not a driver session name", [](Context& c) { EXPECT_EQ(c.made.Get(), nullptr); }},
    {"NullSessionOutPointerCreatesNothing",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::X").Get(), VARIANT_FALSE, nullptr)); }, E_POINTER, ""},
    {"NullProcessFlagOutPointer", [](Context& c) { return Early(c.manager->get_InExternalProcess(nullptr)); }, E_POINTER, ""},
    {"NullAlertsOutPointer", [](Context& c) { return Early(c.manager->get_AudibleLifeTimeAlerts(nullptr)); }, E_POINTER, ""},
    {"NullKeyOutPointer", [](Context& c) { return Early(c.manager->GetUniqueKeyName(nullptr)); }, E_POINTER, ""},
    {"TenMegabyteNameKeptWhole",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::" + tenMegabyteName).Get(), VARIANT_FALSE, c.made.Put())); },
     S_OK, "",
     [](Context& c) {
         ExpectText(NameOf(c.made.Get()), std::string(tenMegabytes, 'n'));
         EXPECT_EQ(IdentityOf(GetSession(c.manager.Get(), (L"CUSTOM::" + tenMegabyteName).c_str()).Get()), IdentityOf(c.made.Get()));
     }},
    {"TenMegabyteCategoryNamedInError",
     [](Context& c) { UniqueSafeArray names; return Early(c.manager->GetNames(Wide(std::wstring(tenMegabytes, L'c')).Get(), ReturnLogicalNames, nullptr, names.Put())); },
     HRESULT(unrecognizedValue), "'" + std::string(tenMegabytes, 'c') + "' is not a driver session category"},
    {"EmbeddedNulEndsTheName",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(std::wstring(L"CUSTOM::Bench\0Tail", 18)).Get(), VARIANT_FALSE, c.made.Put())); },
     S_OK, "",
     [](Context& c) {
         EXPECT_EQ(NameOf(c.made.Get()), "Bench");
         EXPECT_EQ(IdentityOf(GetSession(c.manager.Get(), L"CUSTOM::Bench").Get()), IdentityOf(c.made.Get()));
     }},
    {"TextOutsideCodePageBecomesDefaultCharacter",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::" + outsideCodePage).Get(), VARIANT_FALSE, c.made.Put())); },
     S_OK, "", [](Context& c) { EXPECT_EQ(NameOf(c.made.Get()), "??"); }},
    {"NewSessionFlagOtherThanMinusOneIsTrue",
     [](Context& c) { return Early(c.manager->GetInstrSession(Wide(L"CUSTOM::Fresh").Get(), 2, c.made.Put())); }, S_OK, "",
     [](Context& c) { EXPECT_EQ(NameOf(c.made.Get()), "Fresh_2"); }},
    {"NamesOptionsOutOfRangeIgnored",
     [](Context& c) { UniqueSafeArray names; return Early(c.manager->GetNames(Wide(L"CUSTOM").Get(), static_cast<GetNamesOptions>(-1), nullptr, names.Put())); },
     S_OK, ""},
    {"HideFlagOtherThanMinusOneHides", [](Context& c) { return Early(c.manager->HideCategory(Wide(L"DAQ").Get(), 2)); }, S_OK, "",
     [](Context& c) {
         UniqueSafeArray names;
         ExpectComError(c.manager->GetNames(Wide(L"DAQ").Get(), ReturnLogicalNames, nullptr, names.Put()), unrecognizedValue,
                        "'DAQ' is not a driver session category", CLSID_InstrSessionMgr);
         EXPECT_EQ(c.manager->HideCategory(Wide(L"DAQ").Get(), VARIANT_FALSE), S_OK);
     }},
    // The custom session's own method: both edges of the driver level range.
    {"CustomDriverLevelPastTheLastGivesNull",
     [](Context& c) { ComPtr<IUnknown> d; return Early(GetSession(c.manager.Get(), L"CUSTOM::BadInput")->GetCOMDriver(static_cast<InterfaceLevel>(4), d.Put())); }, S_OK, ""},
    {"CustomDriverLevelNegativeGivesNull",
     [](Context& c) { ComPtr<IUnknown> d; return Early(GetSession(c.manager.Get(), L"CUSTOM::BadInput")->GetCOMDriver(static_cast<InterfaceLevel>(-1), d.Put())); }, S_OK, ""},
    // Late-bound, the type library's dispatch turns a number into the name text before the method runs.
    {"LateNameAsNumberCoercedToText",
     [](Context& c) { return Late(Invoke(c.manager.As<IDispatch>().Get(), L"GetInstrSession", DISPATCH_METHOD, Arguments().Long(42).Bool(false))); },
     HRESULT(unrecognizedValue), "'42' is not a driver session name"},
};

class ManagerBadInput : public ::testing::TestWithParam<Row> {};

TEST_P(ManagerBadInput, GivesItsDefinedAnswer) { RunRow(GetParam(), nullptr); }

INSTANTIATE_TEST_SUITE_P(Rows, ManagerBadInput, ::testing::ValuesIn(managerRows),
                         [](const auto& info) { return std::string(info.param.name); });

// ---- the sessions -------------------------------------------------------------------------------

VARIANT Long5() {
    VARIANT value;
    ::VariantInit(&value);
    value.vt = VT_I4;
    value.lVal = 5;
    return value;
}

const double infinity = std::numeric_limits<double>::infinity();

const Row sessionRows[] = {
    // Every shared member clears its output through one helper: one of them stands for all.
    {"NullNameOutPointer", [](Context& c) { return Early(c.session->get_Name(nullptr)); }, E_POINTER, ""},
    {"NullHandleOutPointer", [](Context& c) { return Early(c.session->GetHandleEx(DefaultInterface, nullptr)); }, E_POINTER, ""},
    {"NullVppBaseOutPointer", [](Context& c) { return Early(c.session->GetVPPBaseInterface(nullptr)); }, E_POINTER, ""},
    {"NullNestingOutPointer", [](Context& c) { UniqueBstr key; return Early(c.session->GetLockState(key.Put(), nullptr)); }, HRESULT(invalidPointer), "Invalid Pointer."},
    {"NullKeyRefused", [](Context& c) { return Early(c.session->LockSession(nullptr, 0, 0)); }, HRESULT(outOfRange), "Value invalid or out of range.",
     [](Context& c) { EXPECT_EQ(LockState(c).second, 0); }},
    {"LongPtrAsLongRefused", [](Context& c) { return Early(c.session->AttachLongPtr(Wide(L"P").Get(), Long5())); }, HRESULT(invalidPointer), "Invalid Pointer.",
     [](Context& c) { UniqueVariant value; EXPECT_EQ(static_cast<unsigned long>(c.session->GetLongPtr(Wide(L"P").Get(), value.Get())), unrecognizedValue); }},
    {"MinusInfinityOnFreeLock", [](Context& c) { return Early(c.session->LockSession(Wide(L"K").Get(), -infinity, 0)); }, S_OK, ""},
    {"HugeTimeoutOnFreeLock", [](Context& c) { return Early(c.session->LockSession(Wide(L"K").Get(), 1e308, 0)); }, S_OK, ""},
    {"NotANumberAgainstOtherKey",
     [](Context& c) {
         EXPECT_EQ(c.session->LockSession(Wide(L"Holder").Get(), 0, 0), S_OK);
         return Early(c.session->LockSession(Wide(L"Other").Get(), std::nan(""), 0));
     },
     HRESULT(timedOut), "Operation Timed Out.", [](Context& c) { EXPECT_EQ(LockState(c), std::make_pair(std::string("Holder"), 1L)); }},
    {"ProcessFlagOtherThanMinusOneIsTrue", [](Context& c) { return Early(c.session->put_InExternalProcess(2)); }, S_OK, "",
     [](Context& c) { VARIANT_BOOL flag = 0; c.session->get_InExternalProcess(&flag); EXPECT_EQ(flag, VARIANT_TRUE); EXPECT_EQ(NameOf(c.session.Get())[0], '*'); }},
    {"CloseEnabledOtherThanMinusOneIsTrue", [](Context& c) { return Early(c.session->put_CloseEnabled(5)); }, S_OK, "",
     [](Context& c) { VARIANT_BOOL flag = 0; c.session->get_CloseEnabled(&flag); EXPECT_EQ(flag, VARIANT_TRUE); }},
    // Late-bound, a VARIANT argument arrives as the caller typed it and meets the same refusal.
    {"LateLongPtrAsLongRefused",
     [](Context& c) { return Late(Invoke(c.session.As<IDispatch>().Get(), L"AttachLongPtr", DISPATCH_METHOD, Arguments().Text(L"P").Long(5))); },
     HRESULT(invalidPointer), "Invalid Pointer."},
};

class SessionBadInput : public ::testing::TestWithParam<std::tuple<const wchar_t*, Row>> {};

TEST_P(SessionBadInput, GivesItsDefinedAnswer) { RunRow(std::get<1>(GetParam()), std::get<0>(GetParam())); }

INSTANTIATE_TEST_SUITE_P(Rows, SessionBadInput, ::testing::Combine(::testing::ValuesIn(sessionNames), ::testing::ValuesIn(sessionRows)),
                         [](const auto& info) {
                             std::string category = Text(Wide(std::get<0>(info.param)).Get());
                             return category.substr(0, category.find(':')) + "_" + std::get<1>(info.param).name;
                         });

}  // namespace
