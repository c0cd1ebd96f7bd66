// libFuzzer target for INI text: read any bytes, write the document, read the text back, and carry
// the text as an escaped value; the rule is in IniRoundTrip.h.
#include "FuzzCheck.h"
#include "IniRoundTrip.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    auto result = sm::testing::CheckRoundTripOfInput({reinterpret_cast<const char*>(data), size});
    if (!result.failure.empty()) sm::fuzz::Fail("IniFuzz", result.failure.c_str());
    return 0;
}
