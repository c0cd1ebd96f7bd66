// The manager's name index against renaming: a session renamed through put_Name must be found
// under its new name and no longer under its old one.
#include <gtest/gtest.h>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);
}  // namespace

// Catches an index that keeps a session filed under the name it had when it was first looked up.
TEST(SessionIndex, RenamedSessionIsFoundByItsNewNameOnly) {
    auto manager = CreateManager();
    ASSERT_TRUE(manager);
    auto renamed = GetSession(manager.Get(), L"CUSTOM::IndexBefore");
    ASSERT_EQ(GetSession(manager.Get(), L"CUSTOM::IndexBefore").Get(), renamed.Get());
    auto newName = Bstr(L"IndexAfter");
    ASSERT_EQ(renamed->put_Name(newName.Get()), S_OK);

    EXPECT_EQ(GetSession(manager.Get(), L"CUSTOM::indexafter").Get(), renamed.Get());
    auto underOldName = GetSession(manager.Get(), L"CUSTOM::IndexBefore");
    ASSERT_TRUE(underOldName);
    EXPECT_NE(underOldName.Get(), renamed.Get());
    EXPECT_EQ(NameOf(underOldName.Get()), "IndexBefore");
}
