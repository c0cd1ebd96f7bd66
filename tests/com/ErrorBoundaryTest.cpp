// The error boundary: what a client sees as HRESULT and error info for each kind of failure.
#include <gtest/gtest.h>

#include <new>
#include <stdexcept>

#include "com/ComError.h"
#include "com/ErrorBoundary.h"
#include "ComTestSupport.h"

using namespace sm;

namespace {
const ::testing::Environment* const apartment =
    ::testing::AddGlobalTestEnvironment(new sm::testing::MultithreadedApartment);

// An arbitrary class identity standing for "the class that caught it".
const CLSID testClass = {0x7D4A10B1, 0x2C88, 0x4E21, {0xB3, 0xF6, 0x91, 0xE5, 0xA0, 0x7D, 0x2C, 0x3B}};
}  // namespace

TEST(ErrorBoundary, TECodeBecomesTheHResultWithMessageAndClass) {
    ::SetErrorInfo(0, nullptr);
    HRESULT result = ComBoundary(testClass, [] { TE_RAISE(TE_OPERATION_TIMED_OUT, "SessionBase::base_LockSession"); });
    sm::testing::ExpectComError(result, sm::testing::timedOut, "Operation Timed Out.", testClass);
}

TEST(ErrorBoundary, ComErrorPassesWithItsOwnInfo) {
    HRESULT result = ComBoundary(testClass, [] {
        SetComErrorInfo(GUID_NULL, -1, "from inside");
        ThrowComError(E_NOINTERFACE);
    });
    sm::testing::ExpectComError(result, E_NOINTERFACE, "from inside", GUID_NULL);
}

TEST(ErrorBoundary, AnythingElseIsOperationFailed) {
    HRESULT result = ComBoundary(testClass, [] { throw std::runtime_error("not ours"); });
    sm::testing::ExpectComError(result, sm::testing::operationFailed, "Operation Failed.", testClass);
}

// Fault: std::bad_alloc (a failed session creation among others) reached clients as -17500
// "Operation Failed." instead of E_OUTOFMEMORY.
TEST(ErrorBoundary, OutOfMemoryReachesTheClientAsEOutOfMemory) {
    EXPECT_EQ(ComBoundary(testClass, [] { throw std::bad_alloc(); }), E_OUTOFMEMORY);
}
