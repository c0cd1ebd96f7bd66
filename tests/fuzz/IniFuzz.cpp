// libFuzzer target for INI text; the rule is in IniRoundTrip.h.
#include "FuzzCheck.h"
#include "IniRoundTrip.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    std::string failure = sm::testing::CheckRoundTripOfInput({reinterpret_cast<const char*>(data), size});
    if (!failure.empty()) sm::fuzz::Fail("IniFuzz", failure.c_str());
    return 0;
}
