// The station tool's argument rules and JSON text: what an engineer types is either understood
// exactly or refused with a reason, and what scripts read is valid JSON.
#include <gtest/gtest.h>

#include "CommandLine.h"
#include "JsonText.h"

using namespace station;

namespace {

std::optional<CommandLine> Parse(std::vector<std::string> arguments, std::string* error = nullptr) {
    std::string reason;
    auto line = ParseCommandLine(arguments, reason);
    if (error) *error = reason;
    return line;
}

}  // namespace

TEST(StationCommandLine, OptionsTakeTheirValueEvenWhenItLooksLikeAName) {
    // Fault caught: a value consumed as a positional argument ("open X --options Simulate=1" opening "Simulate=1").
    auto line = Parse({"open", "IVI::MyDmm", "--options", "Simulate=True", "--json"});
    ASSERT_TRUE(line);
    EXPECT_EQ(line->positional, std::vector<std::string>{"IVI::MyDmm"});
    EXPECT_EQ(line->Value("--options"), "Simulate=True");
    EXPECT_TRUE(line->json);
}

TEST(StationCommandLine, RefusesWhatItDoesNotUnderstand) {
    std::string error;
    EXPECT_FALSE(Parse({"frobnicate"}, &error));
    EXPECT_EQ(error, "unknown command 'frobnicate'");
    EXPECT_FALSE(Parse({"list", "--hiden"}, &error));  // a typo must not silently list without hidden names
    EXPECT_EQ(error, "unknown option --hiden for 'list'");
    EXPECT_FALSE(Parse({"open"}, &error));
    EXPECT_EQ(error, "usage: sessionmgr open NAME [--options TEXT]");
    EXPECT_FALSE(Parse({"lock", "*CUSTOM::Station"}, &error));  // a lock without a key could never be released by key
    EXPECT_EQ(error, "lock needs --key KEY");
    EXPECT_FALSE(Parse({"lock", "x", "--key"}, &error));
    EXPECT_EQ(error, "option --key needs a value");
}

TEST(StationJson, EscapesEverythingAStateTextCanHold) {
    // Fault caught: state texts carry line breaks, tabs, quotes and Windows paths.
    EXPECT_EQ(JsonString("a\"b\\c\nd\te\x01"), "\"a\\\"b\\\\c\\nd\\te\\u0001\"");
    EXPECT_EQ(JsonStringArray({}), "[]");
    EXPECT_EQ(JsonObject({{"names", JsonStringArray({"VISA::GPIB0::14::INSTR", "x"})}}),
              "{\"names\":[\"VISA::GPIB0::14::INSTR\",\"x\"]}");
}
