// Hostile automation input through the vtables, with the exact HRESULT and error text of each answer;
// after every test the session table must be empty again. Each test runs once per entry of sessionNames.
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <string>
#include <tuple>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {

const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

// One session of each category that this build creates.
const wchar_t* const sessionNames[] = {
    L"CUSTOM::BadInput",
};

constexpr std::size_t tenMegabytes = 10u << 20;

// A BSTR that may hold any UTF-16, embedded NULs included.
UniqueBstr Wide(const std::wstring& text) { return UniqueBstr(::SysAllocStringLen(text.data(), static_cast<UINT>(text.size()))); }

// The answer of a call: its HRESULT and error text (empty: no error info); long texts are not printed.
void ExpectAnswer(HRESULT result, HRESULT expected, const std::string& text = "") {
    EXPECT_EQ(result, expected);
    std::string actual = TakeErrorInfo().description;
    EXPECT_TRUE(actual == text) << actual.size() << " bytes '" << actual.substr(0, 120) << "', not " << text.size();
}

void ExpectLate(const LateResult& late, unsigned long code, const std::string& text) {
    EXPECT_EQ(std::make_tuple(late.result, late.code, late.description), std::make_tuple(DISP_E_EXCEPTION, code, text));
}

// Whatever a test made is let go at its end: a half-made or leaked session stays in the table.
class BadInput : public ::testing::TestWithParam<const wchar_t*> {
protected:
    void SetUp() override {
        ASSERT_TRUE(manager = CreateManager());
        ASSERT_TRUE(session = GetSession(manager.Get(), GetParam()));
        TakeErrorInfo();
    }
    void TearDown() override {
        made.Reset();
        session.Reset();
        UniqueSafeArray listed;
        EXPECT_EQ(manager->GetSessions(nullptr, listed.Put()), S_OK);
        EXPECT_EQ(ReadSafeArray<ComPtr<IDispatch>>(listed.Get(), VT_DISPATCH).size(), 0u) << "a session was left in the table";
    }
    std::pair<std::string, LONG> LockState() {
        UniqueBstr key;
        LONG level = -1;
        EXPECT_EQ(session->GetLockState(key.Put(), &level), S_OK);
        return {Text(key.Get()), level};
    }

    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IInstrSession> session, made;
};

// The session's shared members clear their out-pointers through one helper: get_Name stands for them.
TEST_P(BadInput, NullOutPointersAreRefusedAndCreateNothing) {
    ExpectAnswer(manager->GetInstrSession(Wide(L"CUSTOM::X").Get(), VARIANT_FALSE, nullptr), E_POINTER);
    ExpectAnswer(manager->get_InExternalProcess(nullptr), E_POINTER);
    ExpectAnswer(manager->get_AudibleLifeTimeAlerts(nullptr), E_POINTER);
    ExpectAnswer(manager->GetUniqueKeyName(nullptr), E_POINTER);
    ExpectAnswer(session->get_Name(nullptr), E_POINTER);
    ExpectAnswer(session->GetHandleEx(DefaultInterface, nullptr), E_POINTER);
    ExpectAnswer(session->GetVPPBaseInterface(nullptr), E_POINTER);
    UniqueBstr key;
    ExpectAnswer(session->GetLockState(key.Put(), nullptr), HRESULT(invalidPointer), "Invalid Pointer.");
}

TEST_P(BadInput, NullTextIsTheEmptyText) {
    ExpectAnswer(manager->GetInstrSession(nullptr, VARIANT_FALSE, made.Put()), HRESULT(unrecognizedValue), "'' is not a driver session name");
    EXPECT_FALSE(made);
    ExpectAnswer(session->LockSession(nullptr, 0, 0), HRESULT(outOfRange), "Value invalid or out of range.");
    EXPECT_EQ(LockState().second, 0);
}

TEST_P(BadInput, TenMegabyteTextsAreKeptWhole) {
    const std::wstring name = L"CUSTOM::" + std::wstring(tenMegabytes, L'n');
    ExpectAnswer(manager->GetInstrSession(Wide(name).Get(), VARIANT_FALSE, made.Put()), S_OK);
    EXPECT_TRUE(NameOf(made.Get()) == std::string(tenMegabytes, 'n'));
    EXPECT_EQ(IdentityOf(GetSession(manager.Get(), name.c_str()).Get()), IdentityOf(made.Get()));
    UniqueSafeArray names;
    ExpectAnswer(manager->GetNames(Wide(std::wstring(tenMegabytes, L'c')).Get(), ReturnLogicalNames, nullptr, names.Put()),
                 HRESULT(unrecognizedValue), "'" + std::string(tenMegabytes, 'c') + "' is not a driver session category");
}

TEST_P(BadInput, TextEndsAtItsFirstNulAndOutsideTheCodePageIsOneQuestionMarkPerCharacter) {
    ExpectAnswer(manager->GetInstrSession(Wide(std::wstring(L"CUSTOM::Bench\0Tail", 18)).Get(), VARIANT_FALSE, made.Put()), S_OK);
    EXPECT_EQ(NameOf(made.Get()), "Bench");
    EXPECT_EQ(IdentityOf(GetSession(manager.Get(), L"CUSTOM::Bench").Get()), IdentityOf(made.Get()));
    // A lone high surrogate has no form in any code page, nor has U+0E01 in 1252 or 932.
    ExpectAnswer(manager->GetInstrSession(Wide(L"CUSTOM::" + std::wstring{wchar_t(0x0E01), wchar_t(0xD800)}).Get(), VARIANT_FALSE, made.Put()), S_OK);
    EXPECT_EQ(NameOf(made.Get()), "??");
}

// Minus infinity and a huge timeout are taken at once; NaN against another key is one attempt.
TEST_P(BadInput, ExtremeTimeouts) {
    ExpectAnswer(session->LockSession(Wide(L"K").Get(), -std::numeric_limits<double>::infinity(), 0), S_OK);
    ExpectAnswer(session->UnlockSession(), S_OK);
    ExpectAnswer(session->LockSession(Wide(L"K").Get(), 1e308, 0), S_OK);
    ExpectAnswer(session->LockSession(Wide(L"Other").Get(), std::nan(""), 0), HRESULT(timedOut), "Operation Timed Out.");
    EXPECT_EQ(LockState(), std::make_pair(std::string("K"), 1L));
}

TEST_P(BadInput, FlagsOtherThanMinusOneAreTrue) {
    ExpectAnswer(manager->GetInstrSession(Wide(L"CUSTOM::Fresh").Get(), 2, made.Put()), S_OK);
    EXPECT_EQ(NameOf(made.Get()), "Fresh_2");
    ExpectAnswer(session->put_InExternalProcess(2), S_OK);
    ExpectAnswer(session->put_CloseEnabled(5), S_OK);
    VARIANT_BOOL closeEnabled = 0;
    EXPECT_EQ(session->get_CloseEnabled(&closeEnabled), S_OK);
    EXPECT_EQ(closeEnabled, VARIANT_TRUE);
    EXPECT_EQ(NameOf(session.Get())[0], '*');
}

TEST_P(BadInput, EnumerationsOutOfRange) {
    UniqueSafeArray names;
    ExpectAnswer(manager->GetNames(Wide(L"CUSTOM").Get(), static_cast<GetNamesOptions>(-1), nullptr, names.Put()), S_OK);
    ComPtr<IUnknown> driver;  // a level beyond the range gives no driver
    ExpectAnswer(session->GetCOMDriver(static_cast<InterfaceLevel>(4), driver.Put()), S_OK);
    EXPECT_FALSE(driver);
}

// Late-bound, a number for a name is turned into its text before the method runs.
TEST_P(BadInput, WrongVariantTypes) {
    VARIANT number;
    ::VariantInit(&number);
    number.vt = VT_I4;
    number.lVal = 5;
    ExpectAnswer(session->AttachLongPtr(Wide(L"P").Get(), number), HRESULT(invalidPointer), "Invalid Pointer.");
    UniqueVariant value;
    ExpectAnswer(session->GetLongPtr(Wide(L"P").Get(), value.Get()), HRESULT(unrecognizedValue), "Unrecognized value.");
    ExpectLate(Invoke(session.As<IDispatch>().Get(), L"AttachLongPtr", DISPATCH_METHOD, Arguments().Text(L"P").Long(5)), invalidPointer,
               "Invalid Pointer.");
    ExpectLate(Invoke(manager.As<IDispatch>().Get(), L"GetInstrSession", DISPATCH_METHOD, Arguments().Long(42).Bool(false)),
               unrecognizedValue, "'42' is not a driver session name");
}

INSTANTIATE_TEST_SUITE_P(Categories, BadInput, ::testing::ValuesIn(sessionNames), [](const auto& info) {
    std::string name = Text(Wide(info.param).Get());
    return name.substr(0, name.find(':'));
});

}  // namespace
