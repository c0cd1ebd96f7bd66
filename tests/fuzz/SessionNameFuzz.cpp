// Name syntax (docs/fuzzing.md). Input: mode byte (bit 0: code page 932), then the name.
#include <cstddef>
#include <cstdint>
#include <string>

#include "FuzzCheck.h"
#include "framework/MultiByte.h"
#include "sources/SessionName.h"

using namespace sm;
using fuzz::Fail;

namespace {

constexpr const char* target = "SessionNameFuzz";

bool IsSlash(char c) { return c == '/' || c == '\\'; }

// The separator starts at the first single-byte ':', '/' or '\\'; its length follows the characters
// right after it ("::" and ":/" are 2, ":\\/" is 3, a lone "/" is 1, ...).
void CheckSeparator(std::string_view text) {
    std::size_t firstByte = std::string_view::npos, firstChar = 0;
    for (std::size_t offset = 0, index = 0; offset < text.size(); offset += multibyte::CharBytes(text, offset), ++index) {
        char c = text[offset];
        if (multibyte::CharBytes(text, offset) == 1 && (c == ':' || IsSlash(c))) {
            firstByte = offset;
            firstChar = index;
            break;
        }
    }
    std::size_t position = 0, length = 0;
    bool found = FindCategorySeparator(text, &position, &length);
    if (found != FindCategorySeparator(text, nullptr, nullptr)) Fail(target, "null outputs change the answer", text);
    if (found != (firstByte != std::string_view::npos)) Fail(target, "separator presence", text);
    if (!found) return;
    if (position != firstChar) Fail(target, "separator position", text);
    if (multibyte::ByteOffset(text, position) != firstByte) Fail(target, "separator byte offset", text);
    if (length < 1 || length > 3 || firstByte + length > text.size()) Fail(target, "separator runs outside", text);
    auto next = [&](std::size_t ahead) { return firstByte + ahead < text.size() ? text[firstByte + ahead] : '\0'; };
    std::size_t expected = 1;
    if (text[firstByte] == ':') {
        if (next(1) == ':' || IsSlash(next(1))) expected = 2;
        if (IsSlash(next(1)) && IsSlash(next(2))) expected = 3;
    } else if (IsSlash(next(1))) {
        expected = 2;
    }
    if (length != expected) Fail(target, "separator length", text);
}

void CheckExternalPrefix(std::string_view text) {
    bool has = HasExternalPrefix(text);
    int index = ExternalProcessIndex(text);
    bool route32 = multibyte::Compare(text, "32*RQ", true) == 0 || multibyte::BeginsWith(text, "32*RQ::", true);
    bool star = !text.empty() && text[0] == '*';
    if (index != (route32 ? 1 : 0)) Fail(target, "process index", text);
    if (has != (route32 || star)) Fail(target, "prefix recognition", text);

    DynamicString stripped(text);
    StripExternalPrefix(stripped);
    std::string_view expected = route32 ? text.substr(3) : star ? text.substr(1) : text;
    if (stripped.View() != expected) Fail(target, "strip removed more or less than the prefix", text);

    // A prefix is added once; stripping it again gives the text back.
    DynamicString added(text);
    AddExternalPrefix(added);
    if (added.View() != (has ? std::string(text) : "*" + std::string(text))) Fail(target, "added prefix", text);
    StripExternalPrefix(added);
    if (!has && added.View() != text) Fail(target, "add then strip is not the text", text);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    fuzz::SelectCodePage(data[0]);
    // Names are NUL-terminated text: a name ends at its first NUL, as the text type reads it.
    DynamicString name(std::string_view(reinterpret_cast<const char*>(data + 1), size - 1));
    CheckSeparator(name.View());
    CheckExternalPrefix(name.View());
    return 0;
}
