// Every seed of the fuzz corpora, replayed by the normal test run against the fuzz targets' rules.
#include <gtest/gtest.h>

#include <filesystem>

#include "IniRoundTrip.h"
#include "PeExportsRule.h"
#include "DoubleByteCodePage.h"
#include "TempFolder.h"

namespace fs = std::filesystem;
using namespace sm::testing;

namespace {
template <class Rule>
void ReplayEach(const char* folder, Rule rule) {
    int seeds = 0;
    for (const auto& entry : fs::directory_iterator(fs::path(SM_CORPUS_DIR) / folder)) {
        ++seeds;
        EXPECT_EQ(rule(ReadFileBytes(entry.path().string())), "") << entry.path();
    }
    EXPECT_GT(seeds, 0) << "no seeds in " << folder;
}
}  // namespace

TEST(FuzzCorpus, IniSeedsKeepTheRoundTripRule) {
    CodePageScope restore(sm::GetMultiByteCodePage());
    ReplayEach("ini", [](const std::string& input) { return CheckRoundTripOfInput(input).failure; });
}

TEST(FuzzCorpus, PeSeedsKeepTheExportNameRule) { ReplayEach("pe", ExportNamesRuleBroken); }
