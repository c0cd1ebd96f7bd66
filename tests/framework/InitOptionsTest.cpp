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

// The option rules themselves are the fuzz rule's, replayed over its corpus (FuzzReplay.InitOptions),
// which cannot tell a refusal of a valid option from a correct one: one option is taken here.
TEST(InitOptionsTest, TakesAPairThroughItsCommaWithItsValueTrimmed) {
    EXPECT_EQ(Extract("Simulate=1, IdQuery = 0", "idquery"), "taken|0|Simulate=1, ");
}

// "true" is not a boolean value here (callers test it themselves).
TEST(InitOptionsTest, BooleanRefusalNamesItsFunction) {
    sm::testing::ExpectTE([] { GetBooleanInitOptionValue("TRUE"); }, TE_INVALID_OR_OUT_OF_RANGE,
                          "The value 'TRUE' is not a valid value.", "SessionBase::GetBooleanInitOptionValue");
}
