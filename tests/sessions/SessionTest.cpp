// A custom session through its vtable: data items, the lock, the close function and the state text.
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <future>
#include <thread>
#include <vector>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

const char* const mismatch = "Variable or property types do not match or are not compatible.";
const wchar_t* const sessionClass = L"{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}";

// Every test gets a session of its own ("SessionTest_2"): the manager is shared by the whole program.
class CustomSession : public ::testing::Test {
protected:
    void SetUp() override {
        manager = CreateManager();
        session = GetSession(manager.Get(), L"CUSTOM::SessionTest", true);
        ASSERT_TRUE(session);
    }
    void ExpectError(HRESULT result, unsigned long code, const char* description) {
        ExpectComError(result, code, description, CLSID_CustomInstrSession);
    }
    std::pair<std::string, LONG> LockState() {
        UniqueBstr owner;
        LONG level = -1;
        EXPECT_EQ(session->GetLockState(owner.Put(), &level), S_OK);
        return {Text(owner.Get()), level};
    }
    HRESULT Attach(const wchar_t* id, IUnknown* object, const wchar_t* classId, bool releaseOnClose) {
        return session->AttachObject(Bstr(id).Get(), object, Bstr(classId).Get(), releaseOnClose ? VARIANT_TRUE : VARIANT_FALSE);
    }
    ComPtr<IInstrSessionMgr> manager;
    ComPtr<IInstrSession> session;
};

// A COM object whose references the test can count.
class CountedObject final : public IUnknown {
public:
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        *result = IsEqualIID(interfaceId, IID_IUnknown) ? this : nullptr;
        return *result ? (AddRef(), S_OK) : E_NOINTERFACE;
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

int ownReferenceCloseRuns = 0;
ULONG lowestCountInsideClose = 0;

// What any smart pointer or script wrapper does with the session it is handed.
void __stdcall TakeAndDropOwnReference(IInstrSession* closing) {
    ++ownReferenceCloseRuns;
    ComPtr<IUnknown> unknown;
    closing->QueryInterface(IID_IUnknown, unknown.PutVoid());
    ULONG afterQuery = unknown.Detach()->Release();
    closing->AddRef();
    lowestCountInsideClose = std::min(afterQuery, closing->Release());
}

void __stdcall RecordClose(IInstrSession* closing) {
    UniqueBstr name;
    closing->get_Name(name.Put());  // calling back into the closing session must not deadlock
    closeCalls.push_back({closing, Text(name.Get())});
}

UniqueVariant Pointer(VARTYPE type, std::uint64_t value) {
    UniqueVariant variant;
    variant->vt = type;
    variant->ullVal = value;
    return variant;
}
UniqueVariant CloseFunction(void(__stdcall* function)(IInstrSession*) = &RecordClose) {
    return Pointer(VT_UI8, reinterpret_cast<std::uintptr_t>(function));
}
}  // namespace

TEST_F(CustomSession, DataItemsOfEveryKindRoundTripAndIdsAreCaseSensitive) {
    ASSERT_EQ(session->AttachLong(Bstr(L"Count").Get(), -7), S_OK);
    ASSERT_EQ(session->AttachLong(Bstr(L"count").Get(), 8), S_OK);
    ASSERT_EQ(session->AttachString(Bstr(L"Text").Get(), Bstr(L"value 1").Get()), S_OK);
    ASSERT_EQ(session->AttachLongPtr(Bstr(L"Pointer").Get(), *Pointer(VT_I8, 0x1234567890ABCDEFull).Get()), S_OK);
    // Unsigned pointers are accepted too and come back as the same 64 bits.
    ASSERT_EQ(session->AttachLongPtr(Bstr(L"Unsigned").Get(), *Pointer(VT_UI8, ~0ull).Get()), S_OK);
    EXPECT_EQ(std::make_pair(LongOf(session.Get(), L"Count"), LongOf(session.Get(), L"count")), std::make_pair(-7L, 8L));
    UniqueBstr text;
    EXPECT_EQ(session->GetString(Bstr(L"Text").Get(), text.Put()), S_OK);
    EXPECT_EQ(Text(text.Get()), "value 1");
    UniqueVariant pointer, unsignedPointer;
    EXPECT_EQ(session->GetLongPtr(Bstr(L"Pointer").Get(), pointer.Get()), S_OK);
    EXPECT_EQ(session->GetLongPtr(Bstr(L"Unsigned").Get(), unsignedPointer.Get()), S_OK);
    EXPECT_EQ(std::make_pair(pointer->vt, pointer->llVal), std::make_pair(VARTYPE(VT_I8), 0x1234567890ABCDEFll));
    EXPECT_EQ(unsignedPointer->llVal, -1);
    // Generated IDs count per session: a session made now starts at 1 again.
    auto fresh = GetSession(manager.Get(), L"CUSTOM::SessionTest", true);
    std::string generated;
    for (IInstrSession* from : {session.Get(), session.Get(), fresh.Get()}) {
        EXPECT_EQ(from->GenerateUniqueID(text.Put()), S_OK);
        generated += Text(text.Get()) + " ";
    }
    EXPECT_EQ(generated, "UniqueId1 UniqueId2 UniqueId1 ");
}

TEST_F(CustomSession, DuplicateIdsAreRejectedAndKeepTheFirstValue) {
    auto id = Bstr(L"A");
    ASSERT_EQ(session->AttachLong(id.Get(), 1), S_OK);
    ExpectError(session->AttachLong(id.Get(), 2), duplicateItem, "Duplicate item or value.");
    ExpectError(session->AttachString(id.Get(), Bstr(L"x").Get()), duplicateItem, "Duplicate item or value.");
    // The duplicate test comes before the pointer conversion.
    ExpectError(session->AttachLongPtr(id.Get(), *Pointer(VT_I4, 0).Get()), duplicateItem, "Duplicate item or value.");
    EXPECT_EQ(LongOf(session.Get(), L"A"), 1);
}

TEST_F(CustomSession, WrongKindOrMissingIdFailAndClearOutputs) {
    auto id = Bstr(L"Text"), missing = Bstr(L"Missing");
    ASSERT_EQ(session->AttachString(id.Get(), Bstr(L"t").Get()), S_OK);
    LONG number = 99;
    ExpectError(session->GetLong(id.Get(), &number), typeMismatch, mismatch);
    EXPECT_EQ(number, 0);
    UniqueBstr stale(::SysAllocString(L"stale"));
    BSTR readText = stale.Get();
    ExpectError(session->GetString(missing.Get(), &readText), unrecognizedValue, "Unrecognized value.");
    EXPECT_EQ(readText, nullptr);
    IUnknown* object = reinterpret_cast<IUnknown*>(0x1);
    ExpectError(session->GetObject(id.Get(), &object), typeMismatch, mismatch);
    EXPECT_EQ(object, nullptr);
}

// Detaching everything (an empty ID) is checked with the hostile-input rows.
TEST_F(CustomSession, ObjectItemsAreHeldHandedOutAndOnlyTheMatchingItemIsDetached) {
    CountedObject object;
    ASSERT_EQ(Attach(L"Obj", &object, L"", false), S_OK);
    session->AttachLong(Bstr(L"B").Get(), 2);
    EXPECT_EQ(object.references.load(), 2u);
    ComPtr<IUnknown> read;
    ASSERT_EQ(session->GetObject(Bstr(L"Obj").Get(), read.Put()), S_OK);
    EXPECT_EQ(read.Get(), static_cast<IUnknown*>(&object));
    read.Reset();
    EXPECT_EQ(session->DetachData(Bstr(L"None").Get()), S_OK);
    EXPECT_EQ(session->DetachData(Bstr(L"Obj").Get()), S_OK);
    EXPECT_EQ(object.references.load(), 1u);
    ExpectError(session->GetObject(Bstr(L"Obj").Get(), read.Put()), unrecognizedValue, "Unrecognized value.");
    EXPECT_EQ(LongOf(session.Get(), L"B"), 2);
}

// An item without object nor class ID is checked with the hostile-input rows.
TEST_F(CustomSession, ObjectsAreCreatedFromTheClassIdOnFirstUse) {
    ASSERT_EQ(Attach(L"Made", nullptr, sessionClass, false), S_OK);
    ComPtr<IUnknown> first, second, none;
    ASSERT_EQ(session->GetObject(Bstr(L"Made").Get(), first.Put()), S_OK);
    ASSERT_EQ(session->GetObject(Bstr(L"Made").Get(), second.Put()), S_OK);
    EXPECT_EQ(first.Get(), second.Get());
    Attach(L"Bad", nullptr, L"not a class id", false);
    ExpectError(session->GetObject(Bstr(L"Bad").Get(), none.Put()), outOfRange, "Value invalid or out of range.");
}

TEST_F(CustomSession, CloseDropsReleaseOnCloseObjectsAndRecreatesThemFromTheirClassId) {
    CountedObject kept, dropped;
    Attach(L"Kept", &kept, L"", false);
    Attach(L"Dropped", &dropped, L"", true);
    Attach(L"Made", nullptr, sessionClass, true);
    ComPtr<IUnknown> before, after, none;
    ASSERT_EQ(session->GetObject(Bstr(L"Made").Get(), before.Put()), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_EQ(kept.references.load(), 2u);
    EXPECT_EQ(dropped.references.load(), 1u);
    // The item stays; without a class ID there is nothing to re-create it from.
    ExpectError(session->GetObject(Bstr(L"Dropped").Get(), none.Put()), operationFailed, "Operation Failed.");
    ASSERT_EQ(session->GetObject(Bstr(L"Made").Get(), after.Put()), S_OK);
    EXPECT_NE(after.Get(), before.Get());  // still alive through `before`, so a new one was made
    session.Reset();
    EXPECT_EQ(kept.references.load(), 1u);
}

TEST_F(CustomSession, CloseFunctionRunsOnceWithTheSession) {
    closeCalls.clear();
    ASSERT_EQ(session->put_CloseFunctionEx(*CloseFunction().Get()), S_OK);
    session->Initialize(nullptr);
    ASSERT_EQ(session->Close(), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    ASSERT_EQ(closeCalls.size(), 1u);
    EXPECT_EQ(closeCalls[0].session, session.Get());
    EXPECT_EQ(closeCalls[0].nameSeenInside, "SessionTest_2");
    // A zero address is never called.
    ASSERT_EQ(session->put_CloseFunctionEx(*Pointer(VT_UI8, 0).Get()), S_OK);
    session.Reset();
    EXPECT_EQ(closeCalls.size(), 1u);
}

// Fault: the close actions ran after the count reached 0, so this close function made it pass
// 0 -> 1 -> 0 and deleted the session a second time.
TEST_F(CustomSession, CloseFunctionMayTakeAndDropAReferenceToItsSession) {
    ASSERT_EQ(session->put_CloseFunctionEx(*CloseFunction(&TakeAndDropOwnReference).Get()), S_OK);
    session.Reset();
    EXPECT_EQ(ownReferenceCloseRuns, 1);
    EXPECT_NE(lowestCountInsideClose, 0u);
}

TEST_F(CustomSession, DisabledCloseDoesNothingButDestructionStillCloses) {
    closeCalls.clear();
    CountedObject dropped;
    Attach(L"D", &dropped, L"", true);
    session->put_CloseFunctionEx(*CloseFunction().Get());
    session->Initialize(nullptr);
    ASSERT_EQ(session->put_CloseEnabled(VARIANT_FALSE), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_TRUE(IsInitializedOf(session.Get()));
    EXPECT_TRUE(closeCalls.empty());
    EXPECT_EQ(dropped.references.load(), 2u);
    session.Reset();
    EXPECT_EQ(closeCalls.size(), 1u);
    EXPECT_EQ(dropped.references.load(), 1u);
}

// The handle calls of a custom session (E_NOTIMPL, no error info) are checked with the hostile-input rows.
TEST_F(CustomSession, ObsoleteAndUnavailableMembers) {
    LONG value = 5;
    ExpectError(session->get_CloseFunction(&value), invalidPointer, "32-bit pointer used with 64-bit platform.");
    EXPECT_EQ(value, 0);
    ComPtr<IUnknown> driver;
    ExpectError(session->GetCOMDriver(DefaultInterface, driver.Put()), operationFailed, "Operation Failed.");
    ComPtr<IVPPBase> vpp;
    EXPECT_EQ(AnswerOf(session->GetVPPBaseInterface(vpp.Put())), Answer(E_NOTIMPL, ""));
    EXPECT_FALSE(vpp);
}

TEST_F(CustomSession, InitializeCloseAndTheStateText) {
    const std::string header = "   Name: SessionTest_2, Category: CUSTOM      Initialized: ";
    EXPECT_EQ(StateOf(session.Get()), header + "False, In Process\n");
    ASSERT_EQ(session->Initialize(Bstr(L"Simulate=1").Get()), S_OK);
    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_FALSE(IsInitializedOf(session.Get()));
    ASSERT_EQ(session->Initialize(nullptr), S_OK);
    session->AttachLong(Bstr(L"Count").Get(), 42);
    session->AttachString(Bstr(L"Label").Get(), Bstr(L"bench 4").Get());
    session->AttachLongPtr(Bstr(L"Ptr").Get(), *Pointer(VT_I8, static_cast<std::uint64_t>(-2)).Get());
    Attach(L"Obj", nullptr, sessionClass, true);
    EXPECT_EQ(StateOf(session.Get()), header + "True, In Process\n      Data Items: 4\n"
                                               "         Item #0, Id: Count, DataType: Long: 42\n"
                                               "         Item #1, Id: Label, DataType: String: bench 4\n"
                                               "         Item #2, Id: Ptr, DataType: LongPtr: -2\n"
                                               "         Item #3, Id: Obj, DataType: Object: 0, ReleaseOnClose: true, CLSID: "
                                               "{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}\n");
    ASSERT_EQ(session->put_InExternalProcess(VARIANT_TRUE), S_OK);
    session->DetachData(Bstr(L"").Get());
    EXPECT_EQ(StateOf(session.Get()), header + "True, Out of Process\n");
}

TEST_F(CustomSession, LockNestsForTheSameKeyInAnyCase) {
    ASSERT_EQ(session->LockSession(Bstr(L"A").Get(), 0, 0), S_OK);
    ASSERT_EQ(session->LockSession(Bstr(L"a").Get(), 5, 0), S_OK);
    EXPECT_EQ(LockState(), std::make_pair(std::string("A"), LONG{2}));
    EXPECT_EQ(session->UnlockSession(), S_OK);
    ExpectError(session->LockSession(Bstr(L"B").Get(), 0, 0), timedOut, "Operation Timed Out.");
    EXPECT_EQ(session->UnlockSession(), S_OK);
    EXPECT_EQ(LockState(), std::make_pair(std::string(""), LONG{0}));
}

TEST_F(CustomSession, OtherKeysTimeOutAndLeaveTheLockAsItWas) {
    ASSERT_EQ(session->LockSession(Bstr(L"A").Get(), 0, 0), S_OK);
    ExpectError(session->LockSession(Bstr(L"B").Get(), 0.3, 0), timedOut, "Operation Timed Out.");
    EXPECT_EQ(LockState(), std::make_pair(std::string("A"), LONG{1}));
    // The lock is advisory: everything else keeps working while another key holds it.
    EXPECT_EQ(session->AttachLong(Bstr(L"WhileLocked").Get(), 1), S_OK);
    session->UnlockSession();
}

TEST_F(CustomSession, NegativeTimeoutWaitsUntilAnotherThreadUnlocks) {
    ASSERT_EQ(session->LockSession(Bstr(L"Holder").Get(), 0, 0), S_OK);
    std::atomic<bool> calling{false}, unlocked{false}, acquiredAfterUnlock{false};
    HRESULT waitResult = E_FAIL;
    std::promise<void> finished;
    std::future<void> done = finished.get_future();
    std::thread waiter([&, shared = session.Get()] {
        ::CoInitializeEx(nullptr, COINIT_MULTITHREADED);
        calling = true;
        waitResult = shared->LockSession(Bstr(L"Waiter").Get(), -1, 0);
        acquiredAfterUnlock = unlocked.load();
        ::CoUninitialize();
        finished.set_value();
    });
    while (!calling) std::this_thread::yield();
    // The waiter is in (or entering) LockSession: it may not return while the holder keeps the lock.
    EXPECT_EQ(done.wait_for(std::chrono::milliseconds(300)), std::future_status::timeout);
    EXPECT_EQ(LockState(), std::make_pair(std::string("Holder"), LONG{1}));
    // Any caller may unlock: the lock belongs to a key, not to a thread.
    unlocked = true;
    EXPECT_EQ(session->UnlockSession(), S_OK);
    waiter.join();
    EXPECT_EQ(waitResult, S_OK);
    EXPECT_TRUE(acquiredAfterUnlock.load());
    EXPECT_EQ(LockState(), std::make_pair(std::string("Waiter"), LONG{1}));
    session->UnlockSession();
}
