#include "framework/InitOptions.h"

#include "framework/CodePage.h"
#include "framework/MultiByte.h"
#include "framework/TEException.h"

namespace sm {

bool ExtractInitOption(String& options, std::string_view optionName, String& value) {
    std::size_t nameStart = 0;
    if (!options.Find(optionName, 0, true, &nameStart)) return false;
    std::string_view text = options.View();
    std::size_t offset = multibyte::ByteOffset(text, nameStart) + optionName.size();
    if (offset >= text.size()) return false;
    while (offset < text.size() && multibyte::CharBytes(text, offset) == 1 &&
           IsSingleByteSpace(static_cast<unsigned char>(text[offset])))
        ++offset;
    if (offset >= text.size() || text[offset] != '=') return false;
    std::size_t valueStart = offset + 1;
    std::size_t comma = multibyte::FindBytes(text, ",", valueStart);
    std::size_t valueEnd = comma == std::string_view::npos ? text.size() : comma;
    DynamicString found(text.substr(valueStart, valueEnd - valueStart));
    found.Trim();
    std::size_t removeEnd = comma == std::string_view::npos ? text.size() : comma + 1;
    std::size_t removeStart = multibyte::ByteOffset(text, nameStart);
    std::size_t removeChars = multibyte::CharCount(text.substr(removeStart, removeEnd - removeStart));
    value.Assign(found);
    options.Delete(nameStart, static_cast<std::int64_t>(removeChars));
    return true;
}

bool GetBooleanInitOptionValue(std::string_view value) {
    auto is = [&](std::string_view word) { return multibyte::Compare(value, word, true) == 0; };
    if (is("vi_true") || is("1")) return true;
    if (is("false") || is("vi_false") || is("0")) return false;
    DynamicString message("The value '%1' is not a valid value.");
    message.ReplaceArg(1, value);
    TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "SessionBase::GetBooleanInitOptionValue", message);
}

}  // namespace sm
