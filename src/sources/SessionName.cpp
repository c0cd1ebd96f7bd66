#include "sources/SessionName.h"

#include "framework/MultiByte.h"

namespace sm {

bool IsAnyCategory(std::string_view category) { return category.empty() || category == AnyCategory; }

bool SameCategory(std::string_view left, std::string_view right) {
    // Texts that compare equal have equal byte lengths: each character is lowered to one of its
    // own length.
    return left.size() == right.size() && multibyte::Compare(left, right, true) == 0;
}

namespace {
bool IsThirtyTwoBitRoute(std::string_view text) {
    if (text.empty() || text[0] != '3') return false;
    return multibyte::Compare(text, "32*RQ", true) == 0 || multibyte::BeginsWith(text, "32*RQ::", true);
}
}  // namespace

bool FindCategorySeparator(std::string_view text, std::size_t* position, std::size_t* length) {
    std::size_t charIndex = 0;
    for (std::size_t offset = 0; offset < text.size(); offset += multibyte::CharBytes(text, offset), ++charIndex) {
        if (multibyte::CharBytes(text, offset) != 1) continue;
        char first = text[offset];
        if (first != ':' && first != '/' && first != '\\') continue;
        std::string_view rest = text.substr(offset);
        auto at = [&](std::string_view sequence) { return rest.substr(0, sequence.size()) == sequence; };
        std::size_t found = 1;
        if (first == '/') {
            if (at("//") || at("/\\")) found = 2;
        } else if (first == '\\') {
            if (at("\\\\") || at("\\/")) found = 2;
        } else if (at(":\\\\") || at("://") || at(":/\\") || at(":\\/")) {
            found = 3;
        } else if (at("::") || at(":\\") || at(":/")) {
            found = 2;
        }
        if (position) *position = charIndex;
        if (length) *length = found;
        return true;
    }
    return false;
}

bool HasExternalPrefix(std::string_view text) {
    return (!text.empty() && text[0] == '*') || IsThirtyTwoBitRoute(text);
}

int ExternalProcessIndex(std::string_view text) { return IsThirtyTwoBitRoute(text) ? 1 : 0; }

void StripExternalPrefix(String& text) {
    if (IsThirtyTwoBitRoute(text.View()))
        text.Delete(0, 3);
    else if (!text.IsEmpty() && text.GetText()[0] == '*')
        text.Delete(0, 1);
}

std::string_view WithoutExternalPrefix(std::string_view text) {
    if (IsThirtyTwoBitRoute(text)) return text.substr(3);
    if (!text.empty() && text[0] == '*') return text.substr(1);
    return text;
}

void AddExternalPrefix(String& text) {
    if (!HasExternalPrefix(text.View())) text.Insert("*", 0);
}

}  // namespace sm
