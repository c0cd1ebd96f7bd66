// Character-level helpers over NUL-free byte ranges in the current multibyte code page.
// A lead byte and its trail byte form one character; a lead byte with no trail is one character.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace sm::multibyte {

// Bytes taken by the character that starts at text[offset].
std::size_t CharBytes(std::string_view text, std::size_t offset);

// Number of characters in text.
std::size_t CharCount(std::string_view text);

// Byte offset of character position charPosition, or text.size() when it lies at or past the end.
std::size_t ByteOffset(std::string_view text, std::size_t charPosition);

// Byte length of the first charCount characters (all of text when it has fewer).
std::size_t BytesOfChars(std::string_view text, std::size_t charCount);

// Longest prefix of whole characters that fits in maxBytes.
std::size_t WholeCharPrefix(std::string_view text, std::size_t maxBytes);

// Like _mbscmp/_mbsicmp: negative, zero or positive, comparing characters as code values.
int Compare(std::string_view left, std::string_view right, bool ignoreCase);

// True when text begins with prefix, compared character by character.
bool BeginsWith(std::string_view text, std::string_view prefix, bool ignoreCase);

// The text without leading and trailing single-byte blanks (IsSingleByteSpace); a trail byte that
// equals a blank is never taken for one.
std::string_view Trimmed(std::string_view text);

// ToLower on a writable buffer of length bytes.
void LowerInPlace(char* text, std::size_t length);

// Lower-cases every single-byte character, leaving double-byte characters alone (as _mbslwr does).
std::string ToLower(std::string_view text);

// Byte offset of the first occurrence of pattern that starts on a character boundary at or after
// startByte, or npos.
std::size_t FindBytes(std::string_view text, std::string_view pattern, std::size_t startByte);

}  // namespace sm::multibyte
