// A test fixture that runs its body under the double-byte code page 932 (Shift-JIS) and restores
// the previous code page afterwards: character rules must hold for lead and trail bytes too.
#pragma once

#include <gtest/gtest.h>

#include "framework/CodePage.h"

namespace sm::testing {

class DoubleByteCodePage : public ::testing::Test {
protected:
    void SetUp() override {
        previous = GetMultiByteCodePage();
        ASSERT_TRUE(SetMultiByteCodePage(932));
    }
    void TearDown() override { SetMultiByteCodePage(previous); }

private:
    int previous = 0;
};

}  // namespace sm::testing
