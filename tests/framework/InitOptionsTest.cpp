// Taking options out of a driver's option string and reading their boolean values.
#include <gtest/gtest.h>

#include "CatchTE.h"
#include "framework/InitOptions.h"

using namespace sm;

// The rules are the fuzz rule's (FuzzReplay.InitOptions), which cannot tell a wrong refusal: one here.
TEST(InitOptionsTest, TakesAPairThroughItsCommaWithItsValueTrimmed) {
    DynamicString options("Simulate=1, IdQuery = 0"), value;
    ASSERT_TRUE(ExtractInitOption(options, "idquery", value));
    EXPECT_EQ(std::string(value.View()) + "|" + std::string(options.View()), "0|Simulate=1, ");
}

// "true" is not a boolean value here (callers test it themselves).
TEST(InitOptionsTest, BooleanRefusalNamesItsFunction) {
    sm::testing::ExpectTE([] { GetBooleanInitOptionValue("TRUE"); }, TE_INVALID_OR_OUT_OF_RANGE,
                          "The value 'TRUE' is not a valid value.", "SessionBase::GetBooleanInitOptionValue");
}
