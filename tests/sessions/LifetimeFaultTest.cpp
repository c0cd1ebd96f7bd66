// The final release of a session whose close work touches the session's own count.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

int closeRuns = 0;
ULONG lowestCountInsideClose = 0;

// What any smart pointer or script wrapper does with the session it is handed.
void __stdcall TakeAndDropOwnReference(IInstrSession* closing) {
    ++closeRuns;
    void* unknown = nullptr;
    closing->QueryInterface(IID_IUnknown, &unknown);
    ULONG afterQuery = static_cast<IUnknown*>(unknown)->Release();
    closing->AddRef();
    ULONG afterAddRef = closing->Release();
    lowestCountInsideClose = std::min(afterQuery, afterAddRef);
}
}  // namespace

// Fault: the close actions ran after the count reached 0, so this close function made it pass
// 0 -> 1 -> 0 and deleted the session a second time.
TEST(FinalRelease, CloseFunctionMayTakeAndDropAReferenceToItsSession) {
    ComPtr<IInstrSessionMgr> manager = CreateManager();
    ASSERT_TRUE(manager);
    ComPtr<IInstrSession> session = GetSession(manager.Get(), L"CUSTOM::FinalReleaseTouchesCount");
    ASSERT_TRUE(session);
    UniqueVariant function;
    function->vt = VT_UI8;
    function->ullVal = reinterpret_cast<std::uintptr_t>(&TakeAndDropOwnReference);
    ASSERT_EQ(session->put_CloseFunctionEx(*function.Get()), S_OK);

    session.Reset();
    EXPECT_EQ(closeRuns, 1);
    EXPECT_NE(lowestCountInsideClose, 0u);
}
