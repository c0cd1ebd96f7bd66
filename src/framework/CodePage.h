// The process's multibyte code page: the one seam between the text code and the platform.
// Windows builds ask the C runtime (_getmbcp); the native build emulates the two code pages the tests
// need, the single-byte 1252 and the double-byte 932, so character rules are testable off Windows.
#pragma once

namespace sm {

// Code page that positions, compares and cuts are computed in.
int GetMultiByteCodePage();

// Switches the process's multibyte code page (tests use 932 to exercise double-byte text).
// Returns false when the code page cannot be used.
bool SetMultiByteCodePage(int codePage);

// True when byte starts a two-byte character in the current code page.
bool IsLeadByte(unsigned char byte);

// Lower-case form of a single-byte character in the current code page.
unsigned char LowerSingleByte(unsigned char byte);

// Blank per the runtime's multibyte space test (space, tab, line ends, vertical tab, form feed).
inline bool IsSingleByteSpace(unsigned char byte) {
    return byte == ' ' || (byte >= '\t' && byte <= '\r');
}

}  // namespace sm
