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

// The code page's own answers for bytes of 0x80 and above; callers use the two functions below.
bool IsExtendedLeadByte(unsigned char byte);
unsigned char LowerExtendedByte(unsigned char byte);

// Every code page the runtime accepts is a superset of ASCII whose lead bytes lie above 0x80, so the
// seven-bit range is answered here: names and keys are almost all ASCII, and under Wine each call of
// the runtime's multibyte functions looks up the thread's locale, which made every character cost a
// table lookup through thread-local storage.

// True when byte starts a two-byte character in the current code page.
inline bool IsLeadByte(unsigned char byte) { return byte >= 0x80 && IsExtendedLeadByte(byte); }

// Lower-case form of a single-byte character in the current code page.
inline unsigned char LowerSingleByte(unsigned char byte) {
    if (byte < 0x80) return (byte >= 'A' && byte <= 'Z') ? static_cast<unsigned char>(byte + ('a' - 'A')) : byte;
    return LowerExtendedByte(byte);
}

// Blank per the runtime's multibyte space test (space, tab, line ends, vertical tab, form feed).
inline bool IsSingleByteSpace(unsigned char byte) {
    return byte == ' ' || (byte >= '\t' && byte <= '\r');
}

}  // namespace sm
