// The process code page for a scope, restored however it ends (a failed ASSERT too), and a fixture
// that runs its body under the double-byte code page 932 (Shift-JIS).
#pragma once

#include <gtest/gtest.h>

#include <string>

#include "framework/CodePage.h"

namespace sm::testing {

class CodePageScope {
public:
    explicit CodePageScope(int codePage) : previous(GetMultiByteCodePage()) {
        EXPECT_TRUE(SetMultiByteCodePage(codePage));
    }
    ~CodePageScope() { SetMultiByteCodePage(previous); }
    CodePageScope(const CodePageScope&) = delete;
    CodePageScope& operator=(const CodePageScope&) = delete;

private:
    int previous;
};

class DoubleByteCodePage : public ::testing::Test {
    CodePageScope scope{932};
};

// Shift-JIS characters: a full-width "a" (lead 0x82, trail 0x81) and one whose trail byte is the
// backslash byte 0x5C.
inline const std::string wideA = "\x82\x81";
inline const std::string wideWithBackslashTrail = "\x95\x5C";

}  // namespace sm::testing
