// TE codes, default messages, the language table and the raise site's record.
#include <gtest/gtest.h>

#include "CatchTE.h"

#include <sstream>
#include <string>

#include "framework/LanguageStrings.h"
#include "framework/TEException.h"

using namespace sm;
using namespace sm::testing;

// Each row's own message is pinned by the published error reference (ErrorReferenceCurrent).
TEST(DefaultMessages, UnknownCodesAreUserDefined) {
    for (int code : {-1, -17999}) EXPECT_EQ(GetTEErrorMessage(code), "User-defined error code.") << code;
}

TEST(LanguageTable, LookupsIgnoreCaseAndMissingKeysGiveTheDefaultOrTheNotFoundText) {
    EXPECT_EQ(GetLanguageString("te_errors", "te_operation_failed"), "Operation Failed.");
    EXPECT_EQ(GetLanguageString("TE_ERRORS", "NO_SUCH_KEY", "my default"), "my default");
    EXPECT_EQ(GetLanguageString("TE_ERRORS", "NO_SUCH_KEY"), "String not found in the language resource files");
    EXPECT_EQ(GetLanguageString("NO_SECTION", "TE_OPERATION_FAILED"), "String not found in the language resource files");
}

TEST(Raising, FillsTheRecordFromTheSite) {
    TEException caught = CatchTE([] { TE_RAISE(TE_OPERATION_TIMED_OUT, "SessionBase::base_LockSession"); });
    EXPECT_EQ(caught.GetErrorCode(), -17402);
    EXPECT_STREQ(caught.GetDescription(), "Operation Timed Out.");
    EXPECT_STREQ(caught.GetFunction(), "SessionBase::base_LockSession");
}

TEST(Raising, MessagesAndTheirFallbacks) {
    EXPECT_STREQ(CatchTE([] { TE_RAISE(TE_UNRECOGNIZED_VALUE, "A::B", ""); }).GetDescription(), "Unrecognized value.");
    EXPECT_STREQ(CatchTE([] { TE_RAISE(TE_UNRECOGNIZED_VALUE, "A::B", "'X' is bad"); }).GetDescription(), "'X' is bad");
    // A message held in a String is taken as it is, even when empty.
    EXPECT_STREQ(CatchTE([] { TE_RAISE(TE_UNRECOGNIZED_VALUE, "A::B", DynamicString()); }).GetDescription(), "");
    EXPECT_STREQ(CatchTE([] { TE_RAISE(0, "A::B"); }).GetDescription(), "");
}

TEST(Raising, LongNamesAreCutToTheirFields) {
    static const std::string longName(300, 'f');
    TEException caught = CatchTE([] { TE_RAISE(TE_PROGRAM_ERROR, longName.c_str()); });
    EXPECT_EQ(std::string(caught.GetFunction()), std::string(256, 'f'));
    caught.SetApiFunction(std::string(100, 'a').c_str());
    EXPECT_EQ(std::string(caught.GetApiFunction()).size(), 64u);
    caught.SetFunction(nullptr);
    EXPECT_EQ(std::string(caught.GetFunction()).size(), 256u);
    caught.SetSource(nullptr);
    EXPECT_STREQ(caught.GetSource(), "");
}

TEST(Diagnostics, WriteDescriptionLines) {
    TEException caught = CatchTE([] {
        TE_RAISE(TE_DLL_NOT_LOADABLE, "CVXIPNPInstrSession::Initialize",
                 RaiseDetails{.message = "Could not load.", .apiErrorCode = 126, .apiFunction = "LoadLibraryA",
                              .source = "driver"});
    });
    std::ostringstream text;
    caught.WriteDescription("CVXIPNPInstrSession::Initialize catch", text);
    std::string expected = "Could not load.\nError Code: -17004\nAPI Function: LoadLibraryA, API Error Code: 126\n"
                           "Source:'driver'\nWhere raised:  \n  function:  CVXIPNPInstrSession::Initialize\n"
                           "  file:  ErrorTest.cpp\n  line:  " +
                           std::to_string(caught.GetLine()) + "\n  compilation time:  " + caught.GetCompileTime() +
                           "  " + caught.GetCompileDate() + "\n\nWhere caught:  CVXIPNPInstrSession::Initialize catch\n";
    EXPECT_EQ(text.str(), expected);

    std::ostringstream plain;
    CatchTE([] { TE_RAISE(TE_PROGRAM_ERROR, "A::B"); }).WriteDescription("here", plain);
    EXPECT_EQ(plain.str().find("API Function"), std::string::npos);
    EXPECT_EQ(plain.str().find("Source:"), std::string::npos);
}

TEST(SystemErrors, MapToFileCodes) {
    const std::pair<unsigned long, int> table[] = {
        {0, TE_IO_ERROR}, {1, TE_IO_ERROR}, {1157, TE_DLL_NOT_LOADABLE}, {2, TE_FILE_NOT_FOUND},
        {65, TE_ACCESS_DENIED}, {183, TE_FILE_ALREADY_EXISTS}, {240, TE_BAD_NET_PATH},
        {0x80004003u, TE_INVALID_POINTER}, {0x80020005u, TE_TYPE_MISMATCH_ERROR}, {0x8007000Eu, TE_OUT_OF_MEMORY},
        {0x80070002u, TE_IO_ERROR}};
    for (auto [system, code] : table) EXPECT_EQ(SystemErrorToTECode(system), code) << system;
}
