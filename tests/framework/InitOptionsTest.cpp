// Taking options out of a driver's option string and reading their boolean values.
#include <gtest/gtest.h>

#include "CatchTE.h"
#include "framework/InitOptions.h"

using namespace sm;
using sm::testing::CatchTE;

namespace {

struct Extraction {
    bool taken;
    std::string value;
    std::string left;
};

Extraction Extract(const char* options, const char* name) {
    DynamicString text(options), value("untouched");
    bool taken = ExtractInitOption(text, name, value);
    return {taken, std::string(value.View()), std::string(text.View())};
}

// A pair in the middle or at the end comes out through its comma, value trimmed, the rest kept as it was.
TEST(InitOptionsTest, TakesOnePairThroughItsComma) {
    Extraction last = Extract("Simulate=1, IdQuery = 0", "idquery");
    EXPECT_TRUE(last.taken);
    EXPECT_EQ(last.value, "0");
    EXPECT_EQ(last.left, "Simulate=1, ");
    Extraction first = Extract("Simulate=1, IdQuery = 0", "Simulate");
    EXPECT_EQ(first.value, "1");
    EXPECT_EQ(first.left, " IdQuery = 0");
}

// Only the first occurrence counts: a name without "=" there is not searched for again.
TEST(InitOptionsTest, FirstOccurrenceWithoutEqualsTakesNothing) {
    Extraction refused = Extract("Cache, Cache=1", "Cache");
    EXPECT_FALSE(refused.taken);
    EXPECT_EQ(refused.value, "untouched");
    EXPECT_EQ(refused.left, "Cache, Cache=1");
    EXPECT_FALSE(Extract("Reset", "Reset").taken);
}

// "true" is not a boolean value here (callers test it themselves); VI_FALSE is.
TEST(InitOptionsTest, BooleanWordsAndTheRefusal) {
    EXPECT_TRUE(GetBooleanInitOptionValue("VI_TRUE"));
    EXPECT_FALSE(GetBooleanInitOptionValue("VI_FALSE"));
    TEException refused = CatchTE([] { GetBooleanInitOptionValue("TRUE"); });
    EXPECT_EQ(refused.GetErrorCode(), TE_INVALID_OR_OUT_OF_RANGE);
    EXPECT_STREQ(refused.GetDescription(), "The value 'TRUE' is not a valid value.");
    EXPECT_STREQ(refused.GetFunction(), "SessionBase::GetBooleanInitOptionValue");
}

}  // namespace
