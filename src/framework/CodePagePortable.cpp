// Native stand-in for the runtime's multibyte tables: 1252 (single-byte) and 932 (Shift-JIS lead bytes).
#include "CodePage.h"

#include <atomic>

namespace sm {
namespace {
std::atomic<int> currentCodePage{1252};
}

int GetMultiByteCodePage() { return currentCodePage.load(); }

bool SetMultiByteCodePage(int codePage) {
    if (codePage != 1252 && codePage != 932) return false;
    currentCodePage.store(codePage);
    return true;
}

bool IsExtendedLeadByte(unsigned char byte) {
    if (currentCodePage.load() != 932) return false;
    return (byte >= 0x81 && byte <= 0x9F) || (byte >= 0xE0 && byte <= 0xFC);
}

unsigned char LowerExtendedByte(unsigned char byte) {
    if (currentCodePage.load() == 1252) {
        if (byte >= 0xC0 && byte <= 0xDE && byte != 0xD7) return static_cast<unsigned char>(byte + 0x20);
        switch (byte) {
            case 0x8A: return 0x9A;
            case 0x8C: return 0x9C;
            case 0x8E: return 0x9E;
            case 0x9F: return 0xFF;
            default: break;
        }
    }
    return byte;
}

}  // namespace sm
