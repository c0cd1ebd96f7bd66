// libFuzzer target for INI text: read any bytes, write the document, read the text back; the rule is
// in IniRoundTrip.h, which the corpus replay of the normal test run shares.
#include <cstdint>
#include <cstdio>
#include <cstdlib>

#include "IniRoundTrip.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    auto result = sm::testing::CheckRoundTripOfInput({reinterpret_cast<const char*>(data), size});
    if (!result.failure.empty()) {
        std::fprintf(stderr, "IniFuzz: %s\n", result.failure.c_str());
        std::abort();
    }
    return 0;
}
