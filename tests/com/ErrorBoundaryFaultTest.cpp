// Running out of memory inside an automation method.
#include <gtest/gtest.h>

#include <new>

#include "com/ErrorBoundary.h"

using namespace sm;

// Fault: std::bad_alloc (a failed session creation among others) reached clients as -17500
// "Operation Failed." instead of E_OUTOFMEMORY.
TEST(ErrorBoundaryFaults, OutOfMemoryReachesTheClientAsEOutOfMemory) {
    EXPECT_EQ(ComBoundary(GUID_NULL, [] { throw std::bad_alloc(); }), E_OUTOFMEMORY);
}
