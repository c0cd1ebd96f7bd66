#include "MultiByte.h"

#include "CodePage.h"

namespace sm::multibyte {

std::size_t CharBytes(std::string_view text, std::size_t offset) {
    if (offset >= text.size()) return 0;
    if (IsLeadByte(static_cast<unsigned char>(text[offset])) && offset + 1 < text.size()) return 2;
    return 1;
}

std::size_t CharCount(std::string_view text) {
    std::size_t count = 0;
    for (std::size_t offset = 0; offset < text.size(); offset += CharBytes(text, offset)) ++count;
    return count;
}

std::size_t ByteOffset(std::string_view text, std::size_t charPosition) {
    std::size_t offset = 0;
    for (std::size_t i = 0; i < charPosition && offset < text.size(); ++i) offset += CharBytes(text, offset);
    return offset;
}

std::size_t BytesOfChars(std::string_view text, std::size_t charCount) { return ByteOffset(text, charCount); }

std::size_t WholeCharPrefix(std::string_view text, std::size_t maxBytes) {
    std::size_t offset = 0;
    while (offset < text.size()) {
        std::size_t next = offset + CharBytes(text, offset);
        if (next > maxBytes) break;
        offset = next;
    }
    return offset;
}

namespace {
unsigned CharCode(std::string_view text, std::size_t offset, std::size_t bytes, bool ignoreCase) {
    auto first = static_cast<unsigned char>(text[offset]);
    if (bytes == 2) return (static_cast<unsigned>(first) << 8) | static_cast<unsigned char>(text[offset + 1]);
    return ignoreCase ? LowerSingleByte(first) : first;
}
}  // namespace

int Compare(std::string_view left, std::string_view right, bool ignoreCase) {
    std::size_t l = 0, r = 0;
    while (l < left.size() && r < right.size()) {
        auto leftByte = static_cast<unsigned char>(left[l]), rightByte = static_cast<unsigned char>(right[r]);
        if (leftByte < 0x80 && rightByte < 0x80) {
            // Two seven-bit characters: single bytes in every code page.
            unsigned lc = ignoreCase ? LowerSingleByte(leftByte) : leftByte;
            unsigned rc = ignoreCase ? LowerSingleByte(rightByte) : rightByte;
            if (lc != rc) return lc < rc ? -1 : 1;
            ++l;
            ++r;
            continue;
        }
        std::size_t lb = CharBytes(left, l), rb = CharBytes(right, r);
        unsigned lc = CharCode(left, l, lb, ignoreCase), rc = CharCode(right, r, rb, ignoreCase);
        if (lc != rc) return lc < rc ? -1 : 1;
        l += lb;
        r += rb;
    }
    if (l < left.size()) return 1;
    if (r < right.size()) return -1;
    return 0;
}

bool BeginsWith(std::string_view text, std::string_view prefix, bool ignoreCase) {
    std::size_t bytes = BytesOfChars(text, CharCount(prefix));
    return Compare(text.substr(0, bytes), prefix, ignoreCase) == 0;
}

std::string_view Trimmed(std::string_view text) {
    std::size_t start = 0;
    while (start < text.size() && CharBytes(text, start) == 1 && IsSingleByteSpace(static_cast<unsigned char>(text[start])))
        ++start;
    // Walk forward so a trail byte that happens to equal a blank is never mistaken for one.
    std::size_t end = start, offset = start;
    while (offset < text.size()) {
        std::size_t bytes = CharBytes(text, offset);
        offset += bytes;
        if (bytes != 1 || !IsSingleByteSpace(static_cast<unsigned char>(text[offset - 1]))) end = offset;
    }
    return text.substr(start, end - start);
}

void LowerInPlace(char* text, std::size_t length) {
    std::string_view view(text, length);
    for (std::size_t offset = 0; offset < length;) {
        std::size_t bytes = CharBytes(view, offset);
        if (bytes == 1) text[offset] = static_cast<char>(LowerSingleByte(static_cast<unsigned char>(text[offset])));
        offset += bytes;
    }
}

std::string ToLower(std::string_view text) {
    std::string lowered(text);
    LowerInPlace(lowered.data(), lowered.size());
    return lowered;
}

std::size_t FindBytes(std::string_view text, std::string_view pattern, std::size_t startByte) {
    for (std::size_t offset = startByte; offset <= text.size(); offset += CharBytes(text, offset)) {
        if (text.size() - offset < pattern.size()) break;
        if (text.compare(offset, pattern.size(), pattern) == 0) return offset;
        if (offset == text.size()) break;
    }
    return std::string_view::npos;
}

}  // namespace sm::multibyte
