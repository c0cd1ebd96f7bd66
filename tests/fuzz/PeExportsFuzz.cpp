// libFuzzer target for the export-name reader; the rule is in PeExportsRule.h.
#include "FuzzCheck.h"
#include "PeExportsRule.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::string broken = sm::testing::ExportNamesRuleBroken({reinterpret_cast<const char*>(data), size});
    if (!broken.empty()) sm::fuzz::Fail("PeExportsFuzz", broken.c_str());
    return 0;
}
