// The external manager kept from an earlier connection, when its server has gone.
#include <gtest/gtest.h>

#include "manager/ExternalConnection.h"

namespace {

using sm::CallKeptOrReconnect;

struct Connection {
    int obtained = 0;
    int forgotten = 0;
    HRESULT Call(bool kept, std::initializer_list<HRESULT> answers) {
        const HRESULT* next = answers.begin();
        return CallKeptOrReconnect(
            kept, [&] { return ++obtained; }, [&] { ++forgotten; }, [&](int) { return *next++; });
    }
};

// Fault caught: a kept manager whose server ended answered every later request with the dead
// channel's error instead of connecting again (and reporting what that reports).
TEST(KeptExternalManager, LostConnectionIsDroppedAndTheCallMadeAgain) {
    Connection connection;
    EXPECT_EQ(connection.Call(true, {HRESULT_FROM_WIN32(RPC_S_SERVER_UNAVAILABLE), E_POINTER}), E_POINTER);
    EXPECT_EQ(connection.obtained, 2);
    EXPECT_EQ(connection.forgotten, 1);
}

// Fault caught: a failure of the external manager itself, or of a fresh connection, ran the call twice.
TEST(KeptExternalManager, OtherFailuresAndFreshConnectionsRunOnce) {
    Connection kept;
    EXPECT_EQ(kept.Call(true, {static_cast<HRESULT>(0xFFFFBC68), S_OK}), static_cast<HRESULT>(0xFFFFBC68));
    Connection fresh;
    EXPECT_EQ(fresh.Call(false, {RPC_E_DISCONNECTED, S_OK}), RPC_E_DISCONNECTED);
    EXPECT_EQ(kept.obtained + fresh.obtained, 2);
    EXPECT_EQ(kept.forgotten + fresh.forgotten, 0);
}

}  // namespace
