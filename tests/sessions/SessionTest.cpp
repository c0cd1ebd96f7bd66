// A custom session through its vtable: data items, the session lock, the close function and the
// state text, with the exact HRESULTs and messages clients see.
#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

constexpr unsigned long duplicateItem = 0xFFFFBC67;     // -17305
constexpr unsigned long unrecognizedValue = 0xFFFFBC68;  // -17304
constexpr unsigned long typeMismatch = 0xFFFFBC57;       // -17321
constexpr unsigned long invalidPointer = 0xFFFFBC3E;     // -17346
constexpr unsigned long timedOut = 0xFFFFBC06;           // -17402
constexpr unsigned long operationFailed = 0xFFFFBBA4;    // -17500
constexpr unsigned long outOfRange = 0xFFFFBC6C;         // -17300

unsigned long Code(HRESULT result) { return static_cast<unsigned long>(result); }

// Every test gets a session of its own: the manager is shared by the whole test program.
class CustomSession : public ::testing::Test {
protected:
    void SetUp() override {
        manager = CreateManager();
        ASSERT_TRUE(manager);
        session = GetSession(manager.Get(), L"CUSTOM::SessionTest", true);
        ASSERT_TRUE(session);
    }
    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IInstrSession> session;
};

// Expects a failure with this code and this error description.
void ExpectError(HRESULT result, unsigned long code, const char* description) {
    EXPECT_EQ(Code(result), code);
    auto reported = TakeErrorInfo();
    EXPECT_TRUE(reported.present);
    EXPECT_EQ(reported.description, description);
    EXPECT_TRUE(IsEqualGUID(reported.guid, CLSID_CustomInstrSession));
}

// A COM object whose references the test can count.
class CountedObject final : public IUnknown {
public:
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        *result = nullptr;
        if (!IsEqualIID(interfaceId, IID_IUnknown)) return E_NOINTERFACE;
        *result = this;
        AddRef();
        return S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++references; }
    STDMETHODIMP_(ULONG) Release() override { return --references; }
    std::atomic<ULONG> references{1};
};

struct CloseCall {
    IInstrSession* session;
    std::string nameSeenInside;
};
std::vector<CloseCall> closeCalls;

void __stdcall RecordClose(IInstrSession* closing) {
    UniqueBstr name;
    closing->get_Name(name.Put());  // calling back into the closing session must not deadlock
    closeCalls.push_back({closing, Text(name.Get())});
}

UniqueVariant UnsignedPointer(std::uint64_t value) {
    UniqueVariant variant;
    variant->vt = VT_UI8;
    variant->ullVal = value;
    return variant;
}
}  // namespace

TEST_F(CustomSession, GeneratedIdsCountPerSession) {
    UniqueBstr first, second, other;
    ASSERT_EQ(session->GenerateUniqueID(first.Put()), S_OK);
    ASSERT_EQ(session->GenerateUniqueID(second.Put()), S_OK);
    EXPECT_EQ(Text(first.Get()), "UniqueId1");
    EXPECT_EQ(Text(second.Get()), "UniqueId2");
    auto another = GetSession(manager.Get(), L"CUSTOM::SessionTest", true);
    ASSERT_EQ(another->GenerateUniqueID(other.Put()), S_OK);
    EXPECT_EQ(Text(other.Get()), "UniqueId1");
}

TEST_F(CustomSession, DataItemsOfEveryKindRoundTrip) {
    auto longId = Bstr(L"Count"), textId = Bstr(L"Text"), pointerId = Bstr(L"Pointer"), text = Bstr(L"value 1");
    ASSERT_EQ(session->AttachLong(longId.Get(), -7), S_OK);
    ASSERT_EQ(session->AttachString(textId.Get(), text.Get()), S_OK);
    UniqueVariant pointer;
    pointer->vt = VT_I8;
    pointer->llVal = 0x1234567890ABCDEFll;
    ASSERT_EQ(session->AttachLongPtr(pointerId.Get(), *pointer.Get()), S_OK);

    LONG number = 0;
    EXPECT_EQ(session->GetLong(longId.Get(), &number), S_OK);
    EXPECT_EQ(number, -7);
    UniqueBstr readText;
    EXPECT_EQ(session->GetString(textId.Get(), readText.Put()), S_OK);
    EXPECT_EQ(Text(readText.Get()), "value 1");
    UniqueVariant readPointer;
    EXPECT_EQ(session->GetLongPtr(pointerId.Get(), readPointer.Get()), S_OK);
    EXPECT_EQ(readPointer->vt, VT_I8);
    EXPECT_EQ(readPointer->llVal, 0x1234567890ABCDEFll);

    // Unsigned pointers are accepted too and come back as the same 64 bits.
    auto unsignedId = Bstr(L"Unsigned");
    ASSERT_EQ(session->AttachLongPtr(unsignedId.Get(), *UnsignedPointer(0xFFFFFFFFFFFFFFFFull).Get()), S_OK);
    UniqueVariant readUnsigned;
    EXPECT_EQ(session->GetLongPtr(unsignedId.Get(), readUnsigned.Get()), S_OK);
    EXPECT_EQ(readUnsigned->llVal, -1);
}

TEST_F(CustomSession, DuplicateIdsAreRejectedAndKeepTheFirstValue) {
    auto id = Bstr(L"A");
    ASSERT_EQ(session->AttachLong(id.Get(), 1), S_OK);
    ExpectError(session->AttachLong(id.Get(), 2), duplicateItem, "Duplicate item or value.");
    auto text = Bstr(L"x");
    ExpectError(session->AttachString(id.Get(), text.Get()), duplicateItem, "Duplicate item or value.");
    // The duplicate test comes before the pointer conversion.
    UniqueVariant wrongType;
    wrongType->vt = VT_I4;
    ExpectError(session->AttachLongPtr(id.Get(), *wrongType.Get()), duplicateItem, "Duplicate item or value.");
    LONG value = 0;
    EXPECT_EQ(session->GetLong(id.Get(), &value), S_OK);
    EXPECT_EQ(value, 1);
}

TEST_F(CustomSession, IdsAreCaseSensitive) {
    auto upper = Bstr(L"Key"), lower = Bstr(L"key");
    ASSERT_EQ(session->AttachLong(upper.Get(), 1), S_OK);
    ASSERT_EQ(session->AttachLong(lower.Get(), 2), S_OK);
    LONG value = 0;
    session->GetLong(lower.Get(), &value);
    EXPECT_EQ(value, 2);
}

TEST_F(CustomSession, WrongKindOrMissingIdFailAndClearOutputs) {
    auto id = Bstr(L"Text"), missing = Bstr(L"Missing"), text = Bstr(L"t");
    ASSERT_EQ(session->AttachString(id.Get(), text.Get()), S_OK);
    LONG number = 99;
    ExpectError(session->GetLong(id.Get(), &number), typeMismatch,
                "Variable or property types do not match or are not compatible.");
    EXPECT_EQ(number, 0);
    BSTR readText = ::SysAllocString(L"stale");
    BSTR stale = readText;
    ExpectError(session->GetString(missing.Get(), &readText), unrecognizedValue, "Unrecognized value.");
    EXPECT_EQ(readText, nullptr);
    ::SysFreeString(stale);
    IUnknown* object = reinterpret_cast<IUnknown*>(0x1);
    ExpectError(session->GetObject(id.Get(), &object), typeMismatch,
                "Variable or property types do not match or are not compatible.");
    EXPECT_EQ(object, nullptr);
    UniqueVariant pointer;
    ExpectError(session->GetLongPtr(missing.Get(), pointer.Get()), unrecognizedValue, "Unrecognized value.");
    EXPECT_EQ(pointer->vt, VT_EMPTY);
}

TEST_F(CustomSession, PointerItemsNeedSixtyFourBitVariants) {
    auto id = Bstr(L"P");
    UniqueVariant thirtyTwoBits;
    thirtyTwoBits->vt = VT_I4;
    thirtyTwoBits->lVal = 5;
    ExpectError(session->AttachLongPtr(id.Get(), *thirtyTwoBits.Get()), invalidPointer, "Invalid Pointer.");
    UniqueVariant nothing;
    ExpectError(session->GetLongPtr(id.Get(), nothing.Get()), unrecognizedValue, "Unrecognized value.");
}

TEST_F(CustomSession, DetachRemovesMatchesOrEverything) {
    auto a = Bstr(L"A"), b = Bstr(L"B"), none = Bstr(L"None"), all = Bstr(L"");
    session->AttachLong(a.Get(), 1);
    session->AttachLong(b.Get(), 2);
    EXPECT_EQ(session->DetachData(none.Get()), S_OK);
    EXPECT_EQ(session->DetachData(a.Get()), S_OK);
    LONG value = 0;
    EXPECT_EQ(Code(session->GetLong(a.Get(), &value)), unrecognizedValue);
    EXPECT_EQ(session->GetLong(b.Get(), &value), S_OK);
    EXPECT_EQ(session->DetachData(all.Get()), S_OK);
    EXPECT_EQ(Code(session->GetLong(b.Get(), &value)), unrecognizedValue);
    TakeErrorInfo();
}

TEST_F(CustomSession, ObjectItemsAreHeldAndHandedOut) {
    CountedObject object;
    auto id = Bstr(L"Obj"), noClass = Bstr(L"");
    ASSERT_EQ(session->AttachObject(id.Get(), &object, noClass.Get(), VARIANT_FALSE), S_OK);
    EXPECT_EQ(object.references.load(), 2u);
    ComPtr<IUnknown> read;
    ASSERT_EQ(session->GetObject(id.Get(), read.Put()), S_OK);
    EXPECT_EQ(read.Get(), static_cast<IUnknown*>(&object));
    read.Reset();
    EXPECT_EQ(session->DetachData(id.Get()), S_OK);
    EXPECT_EQ(object.references.load(), 1u);
}

TEST_F(CustomSession, ObjectsAreCreatedFromTheClassIdOnFirstUse) {
    auto id = Bstr(L"Made"), clsid = Bstr(L"{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}");
    ASSERT_EQ(session->AttachObject(id.Get(), nullptr, clsid.Get(), VARIANT_FALSE), S_OK);
    ComPtr<IUnknown> first, second;
    ASSERT_EQ(session->GetObject(id.Get(), first.Put()), S_OK);
    ASSERT_EQ(session->GetObject(id.Get(), second.Put()), S_OK);
    EXPECT_TRUE(first);
    EXPECT_EQ(first.Get(), second.Get());
    ComPtr<IInstrSession> created = first.As<IInstrSession>();
    EXPECT_TRUE(created);

    auto empty = Bstr(L"Empty"), noClass = Bstr(L""), bad = Bstr(L"Bad"), notAClass = Bstr(L"not a class id");
    session->AttachObject(empty.Get(), nullptr, noClass.Get(), VARIANT_FALSE);
    ComPtr<IUnknown> none;
    ExpectError(session->GetObject(empty.Get(), none.Put()), operationFailed, "Operation Failed.");
    session->AttachObject(bad.Get(), nullptr, notAClass.Get(), VARIANT_FALSE);
    ExpectError(session->GetObject(bad.Get(), none.Put()), outOfRange, "Value invalid or out of range.");
}

TEST_F(CustomSession, CloseDropsReleaseOnCloseObjectsButKeepsTheirItems) {
    CountedObject kept, dropped;
    auto keptId = Bstr(L"Kept"), droppedId = Bstr(L"Dropped"), noClass = Bstr(L"");
    session->AttachObject(keptId.Get(), &kept, noClass.Get(), VARIANT_FALSE);
    session->AttachObject(droppedId.Get(), &dropped, noClass.Get(), VARIANT_TRUE);
    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_EQ(kept.references.load(), 2u);
    EXPECT_EQ(dropped.references.load(), 1u);
    // The item stays; without a class ID there is nothing to re-create it from.
    ComPtr<IUnknown> none;
    ExpectError(session->GetObject(droppedId.Get(), none.Put()), operationFailed, "Operation Failed.");
    session->DetachData(keptId.Get());
    EXPECT_EQ(kept.references.load(), 1u);
}

TEST_F(CustomSession, ReleaseOnCloseObjectIsRecreatedFromItsClassId) {
    auto id = Bstr(L"Made"), clsid = Bstr(L"{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}");
    session->AttachObject(id.Get(), nullptr, clsid.Get(), VARIANT_TRUE);
    ComPtr<IUnknown> before, after;
    ASSERT_EQ(session->GetObject(id.Get(), before.Put()), S_OK);
    IUnknown* firstObject = before.Get();
    ASSERT_EQ(session->Close(), S_OK);
    ASSERT_EQ(session->GetObject(id.Get(), after.Put()), S_OK);
    EXPECT_NE(after.Get(), firstObject);  // still alive through `before`, so a new one was made
}

TEST_F(CustomSession, CloseFunctionRunsOnceWithTheSession) {
    closeCalls.clear();
    auto address = UnsignedPointer(reinterpret_cast<std::uintptr_t>(&RecordClose));
    ASSERT_EQ(session->put_CloseFunctionEx(*address.Get()), S_OK);
    UniqueVariant stored;
    ASSERT_EQ(session->get_CloseFunctionEx(stored.Get()), S_OK);
    EXPECT_EQ(stored->vt, VT_UI8);
    EXPECT_EQ(stored->ullVal, reinterpret_cast<std::uintptr_t>(&RecordClose));

    session->Initialize(nullptr);
    ASSERT_EQ(session->Close(), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    ASSERT_EQ(closeCalls.size(), 1u);
    EXPECT_EQ(closeCalls[0].session, session.Get());
    EXPECT_EQ(closeCalls[0].nameSeenInside, "SessionTest_2");
    UniqueVariant cleared;
    session->get_CloseFunctionEx(cleared.Get());
    EXPECT_EQ(cleared->ullVal, 0u);
}

TEST_F(CustomSession, DisabledCloseDoesNothingButDestructionStillCloses) {
    closeCalls.clear();
    CountedObject dropped;
    auto id = Bstr(L"D"), noClass = Bstr(L"");
    session->AttachObject(id.Get(), &dropped, noClass.Get(), VARIANT_TRUE);
    session->put_CloseFunctionEx(*UnsignedPointer(reinterpret_cast<std::uintptr_t>(&RecordClose)).Get());
    session->Initialize(nullptr);
    ASSERT_EQ(session->put_CloseEnabled(VARIANT_FALSE), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    VARIANT_BOOL initialized = VARIANT_FALSE;
    session->IsInitialized(&initialized);
    EXPECT_EQ(initialized, VARIANT_TRUE);
    EXPECT_TRUE(closeCalls.empty());
    EXPECT_EQ(dropped.references.load(), 2u);

    IInstrSession* raw = session.Get();
    session.Reset();
    ASSERT_EQ(closeCalls.size(), 1u);
    EXPECT_EQ(closeCalls[0].session, raw);
    EXPECT_EQ(dropped.references.load(), 1u);
}

TEST_F(CustomSession, ZeroCloseFunctionIsNeverCalled) {
    closeCalls.clear();
    ASSERT_EQ(session->put_CloseFunctionEx(*UnsignedPointer(0).Get()), S_OK);
    EXPECT_EQ(session->Close(), S_OK);
    session.Reset();
    EXPECT_TRUE(closeCalls.empty());
}

TEST_F(CustomSession, ObsoleteCloseFunctionPropertyAlwaysFails) {
    LONG value = 5;
    ExpectError(session->get_CloseFunction(&value), invalidPointer, "32-bit pointer used with 64-bit platform.");
    EXPECT_EQ(value, 0);
    ExpectError(session->put_CloseFunction(1), invalidPointer, "32-bit pointer used with 64-bit platform.");
    UniqueVariant thirtyTwoBits;
    thirtyTwoBits->vt = VT_I4;
    ExpectError(session->put_CloseFunctionEx(*thirtyTwoBits.Get()), invalidPointer, "Invalid Pointer.");
}

TEST_F(CustomSession, InitializeAndCloseToggleTheState) {
    VARIANT_BOOL initialized = VARIANT_TRUE;
    ASSERT_EQ(session->IsInitialized(&initialized), S_OK);
    EXPECT_EQ(initialized, VARIANT_FALSE);
    auto options = Bstr(L"Simulate=1");
    ASSERT_EQ(session->Initialize(options.Get()), S_OK);
    session->IsInitialized(&initialized);
    EXPECT_EQ(initialized, VARIANT_TRUE);
    ASSERT_EQ(session->Close(), S_OK);
    session->IsInitialized(&initialized);
    EXPECT_EQ(initialized, VARIANT_FALSE);
    ASSERT_EQ(session->Initialize(nullptr), S_OK);
    session->IsInitialized(&initialized);
    EXPECT_EQ(initialized, VARIANT_TRUE);
}

TEST_F(CustomSession, DriverAccessIsNotAvailable) {
    ComPtr<IUnknown> driver;
    ExpectError(session->GetCOMDriver(DefaultInterface, driver.Put()), operationFailed, "Operation Failed.");
    EXPECT_EQ(session->GetCOMDriver(static_cast<InterfaceLevel>(7), driver.Put()), S_OK);
    EXPECT_FALSE(driver);

    ::SetErrorInfo(0, nullptr);
    LONG handle = 9;
    EXPECT_EQ(session->GetHandle(DefaultInterface, &handle), E_NOTIMPL);
    EXPECT_EQ(handle, 0);
    UniqueVariant handleEx;
    EXPECT_EQ(session->GetHandleEx(IODriver, handleEx.Get()), E_NOTIMPL);
    EXPECT_EQ(handleEx->vt, VT_UI8);
    EXPECT_EQ(handleEx->ullVal, 0u);
    ComPtr<IVPPBase> vpp;
    EXPECT_EQ(session->GetVPPBaseInterface(vpp.Put()), E_NOTIMPL);
    EXPECT_FALSE(vpp);
    EXPECT_FALSE(TakeErrorInfo().present);
}

TEST_F(CustomSession, StateTextHeaderAndItems) {
    auto count = Bstr(L"Count"), label = Bstr(L"Label"), text = Bstr(L"bench 4"), pointer = Bstr(L"Ptr"),
         object = Bstr(L"Obj"), clsid = Bstr(L"{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}");
    UniqueBstr empty;
    ASSERT_EQ(session->get_StateDescription(empty.Put()), S_OK);
    EXPECT_EQ(Text(empty.Get()), "   Name: SessionTest_2, Category: CUSTOM      Initialized: False, In Process\n");

    session->Initialize(nullptr);
    session->AttachLong(count.Get(), 42);
    session->AttachString(label.Get(), text.Get());
    UniqueVariant negative;
    negative->vt = VT_I8;
    negative->llVal = -2;
    session->AttachLongPtr(pointer.Get(), *negative.Get());
    session->AttachObject(object.Get(), nullptr, clsid.Get(), VARIANT_TRUE);
    UniqueBstr full;
    ASSERT_EQ(session->get_StateDescription(full.Put()), S_OK);
    EXPECT_EQ(Text(full.Get()),
              "   Name: SessionTest_2, Category: CUSTOM      Initialized: True, In Process\n"
              "      Data Items: 4\n"
              "         Item #0, Id: Count, DataType: Long: 42\n"
              "         Item #1, Id: Label, DataType: String: bench 4\n"
              "         Item #2, Id: Ptr, DataType: LongPtr: -2\n"
              "         Item #3, Id: Obj, DataType: Object: 0, ReleaseOnClose: true, CLSID: "
              "{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}\n");
}

TEST_F(CustomSession, ExternalFlagMarksNameAndStateButNotCategory) {
    ASSERT_EQ(session->put_InExternalProcess(VARIANT_TRUE), S_OK);
    EXPECT_EQ(NameOf(session.Get()), "*SessionTest_2");
    EXPECT_EQ(CategoryOf(session.Get()), "CUSTOM");
    UniqueBstr state;
    session->get_StateDescription(state.Put());
    EXPECT_EQ(Text(state.Get()), "   Name: SessionTest_2, Category: CUSTOM      Initialized: False, Out of Process\n");
    VARIANT_BOOL external = VARIANT_FALSE;
    session->get_InExternalProcess(&external);
    EXPECT_EQ(external, VARIANT_TRUE);
}

// ---- the session lock ---------------------------------------------------------------------------

TEST_F(CustomSession, LockNestsForTheSameKeyInAnyCase) {
    auto upper = Bstr(L"A"), lower = Bstr(L"a");
    ASSERT_EQ(session->LockSession(upper.Get(), 0, 0), S_OK);
    ASSERT_EQ(session->LockSession(lower.Get(), 5, 0), S_OK);
    UniqueBstr owner;
    LONG level = 0;
    ASSERT_EQ(session->GetLockState(owner.Put(), &level), S_OK);
    EXPECT_EQ(Text(owner.Get()), "A");
    EXPECT_EQ(level, 2);
    EXPECT_EQ(session->UnlockSession(), S_OK);
    EXPECT_EQ(session->UnlockSession(), S_OK);
    UniqueBstr none;
    session->GetLockState(none.Put(), &level);
    EXPECT_EQ(Text(none.Get()), "");
    EXPECT_EQ(level, 0);
    ExpectError(session->UnlockSession(), operationFailed, "Operation Failed.");
}

TEST_F(CustomSession, OtherKeyWithZeroTimeoutFailsAtOnce) {
    auto holder = Bstr(L"A"), other = Bstr(L"B"), empty = Bstr(L"");
    ASSERT_EQ(session->LockSession(holder.Get(), 0, 0), S_OK);
    ExpectError(session->LockSession(other.Get(), 0, 0), timedOut, "Operation Timed Out.");
    ExpectError(session->LockSession(empty.Get(), 1, 0), outOfRange, "Value invalid or out of range.");
    // A timed-out attempt leaves the lock as it was.
    UniqueBstr owner;
    LONG level = 0;
    session->GetLockState(owner.Put(), &level);
    EXPECT_EQ(Text(owner.Get()), "A");
    EXPECT_EQ(level, 1);
    // The lock is advisory: everything else keeps working while another key holds it.
    auto id = Bstr(L"WhileLocked");
    EXPECT_EQ(session->AttachLong(id.Get(), 1), S_OK);
    session->UnlockSession();
}

TEST_F(CustomSession, NegativeTimeoutWaitsUntilAnotherThreadUnlocks) {
    auto holder = Bstr(L"Holder"), waiter = Bstr(L"Waiter");
    ASSERT_EQ(session->LockSession(holder.Get(), 0, 0), S_OK);
    std::atomic<bool> acquired{false};
    HRESULT waitResult = E_FAIL;
    IInstrSession* shared = session.Get();
    std::thread waiting([&] {
        ::CoInitializeEx(nullptr, COINIT_MULTITHREADED);
        waitResult = shared->LockSession(waiter.Get(), -1, 0);
        acquired = true;
        ::CoUninitialize();
    });
    ::Sleep(300);
    EXPECT_FALSE(acquired.load());
    // Any caller may unlock: the lock belongs to a key, not to a thread.
    ASSERT_EQ(session->UnlockSession(), S_OK);
    waiting.join();
    EXPECT_EQ(waitResult, S_OK);
    UniqueBstr owner;
    LONG level = 0;
    session->GetLockState(owner.Put(), &level);
    EXPECT_EQ(Text(owner.Get()), "Waiter");
    EXPECT_EQ(level, 1);
    session->UnlockSession();
}

TEST_F(CustomSession, TimedWaitGivesUpWhenTheLockStaysTaken) {
    auto holder = Bstr(L"Holder"), waiter = Bstr(L"Waiter");
    ASSERT_EQ(session->LockSession(holder.Get(), 0, 0), S_OK);
    ExpectError(session->LockSession(waiter.Get(), 0.3, 0), timedOut, "Operation Timed Out.");
    session->UnlockSession();
}

TEST_F(CustomSession, GetLockStateRejectsMissingOutputs) {
    LONG level = 3;
    EXPECT_EQ(Code(session->GetLockState(nullptr, &level)), invalidPointer);
    EXPECT_EQ(level, 0);
    TakeErrorInfo();
}
