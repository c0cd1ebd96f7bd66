// The runtime's own multibyte tables, so positions and compares agree with every other module
// of the process that uses _mbs functions.
#include "CodePage.h"

#include <mbctype.h>
#include <mbstring.h>

namespace sm {

int GetMultiByteCodePage() { return _getmbcp(); }

bool SetMultiByteCodePage(int codePage) { return _setmbcp(codePage) == 0; }

bool IsExtendedLeadByte(unsigned char byte) { return _ismbblead(byte) != 0; }

unsigned char LowerExtendedByte(unsigned char byte) {
    return static_cast<unsigned char>(_mbctolower(byte));
}

}  // namespace sm
