// Taking options out of a driver's option string and reading their boolean values.
#include <gtest/gtest.h>

#include "CatchTE.h"
#include "framework/InitOptions.h"

using namespace sm;

namespace {
// Whether the option was taken, its value and what is left of the options, as "taken|value|left".
std::string Extract(const char* options, const char* name) {
    DynamicString text(options), value("untouched");
    bool taken = ExtractInitOption(text, name, value);
    return (taken ? "taken|" : "not taken|") + std::string(value.View()) + "|" + std::string(text.View());
}
}  // namespace

// A pair in the middle or at the end comes out through its comma, value trimmed, the rest kept as it
// was; only the first occurrence counts, so a name without "=" there is not searched for again.
TEST(InitOptionsTest, TakesOnePairThroughItsCommaAtItsFirstOccurrenceOnly) {
    EXPECT_EQ(Extract("Simulate=1, IdQuery = 0", "idquery"), "taken|0|Simulate=1, ");
    EXPECT_EQ(Extract("Simulate=1, IdQuery = 0", "Simulate"), "taken|1| IdQuery = 0");
    EXPECT_EQ(Extract("Cache, Cache=1", "Cache"), "not taken|untouched|Cache, Cache=1");
    EXPECT_EQ(Extract("Reset", "Reset"), "not taken|untouched|Reset");
}

// "true" is not a boolean value here (callers test it themselves); VI_FALSE is.
TEST(InitOptionsTest, BooleanWordsAndTheRefusal) {
    EXPECT_TRUE(GetBooleanInitOptionValue("VI_TRUE"));
    EXPECT_FALSE(GetBooleanInitOptionValue("VI_FALSE"));
    sm::testing::ExpectTE([] { GetBooleanInitOptionValue("TRUE"); }, TE_INVALID_OR_OUT_OF_RANGE,
                          "The value 'TRUE' is not a valid value.", "SessionBase::GetBooleanInitOptionValue");
}
