// libFuzzer target for the export-name reader; the rule is in PeExportsRule.h, which the corpus
// replay of the normal test run shares.
#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "PeExportsRule.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::string broken = sm::testing::ExportNamesRuleBroken({reinterpret_cast<const char*>(data), size});
    if (!broken.empty()) {
        std::fprintf(stderr, "PeExportsFuzz: %s\n", broken.c_str());
        std::abort();
    }
    return 0;
}
