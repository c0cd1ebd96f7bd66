// Init options (docs/fuzzing.md). Input: mode byte, name, NUL, options.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzCheck.h"
#include "framework/CodePage.h"
#include "framework/InitOptions.h"
#include "framework/MultiByte.h"
#include "framework/TEException.h"

using namespace sm;
using fuzz::Fail;

namespace {

constexpr const char* target = "InitOptionsFuzz";

// Blanks are trimmed by character: the byte after a lead byte belongs to that character, blank or not.
std::string_view Trimmed(std::string_view text) {
    std::vector<std::size_t> starts;
    for (std::size_t offset = 0; offset < text.size(); offset += multibyte::CharBytes(text, offset)) starts.push_back(offset);
    auto blank = [&](std::size_t index) {
        std::size_t start = starts[index];
        return multibyte::CharBytes(text, start) == 1 && IsSingleByteSpace(static_cast<unsigned char>(text[start]));
    };
    std::size_t first = 0, last = starts.size();
    while (first < last && blank(first)) ++first;
    while (last > first && blank(last - 1)) --last;
    if (first == last) return {};
    std::size_t end = last == starts.size() ? text.size() : starts[last];
    return text.substr(starts[first], end - starts[first]);
}

void CheckBoolean(std::string_view value) {
    auto is = [&](std::string_view word) { return multibyte::Compare(value, word, true) == 0; };
    bool isTrue = is("vi_true") || is("1");
    bool isFalse = is("false") || is("vi_false") || is("0");
    try {
        bool answer = GetBooleanInitOptionValue(value);
        if (!(isTrue || isFalse) || answer != isTrue) Fail(target, "boolean answer", value);
    } catch (const TEException& refused) {
        if (isTrue || isFalse) Fail(target, "boolean refused", value);
        std::string message = "The value '" + std::string(value) + "' is not a valid value.";
        if (refused.GetErrorCode() != TE_INVALID_OR_OUT_OF_RANGE || message != refused.GetDescription())
            Fail(target, "boolean refusal text", refused.GetDescription());
    }
}

// One extraction, checked against the run it must have removed.
bool CheckOneExtraction(String& options, std::string_view name) {
    const std::string before(options.View());
    DynamicString value("untouched");
    if (!ExtractInitOption(options, name, value)) {
        if (options.View() != before || value.View() != "untouched") Fail(target, "refusal changed something", before);
        return false;
    }
    std::size_t nameChar = 0;
    if (!DynamicString(std::string_view(before)).Find(name, 0, true, &nameChar)) Fail(target, "taken without the name", before);
    std::size_t start = multibyte::ByteOffset(before, nameChar);
    std::string_view after = options.View();
    if (after.size() >= before.size()) Fail(target, "nothing removed", before);
    std::size_t removedBytes = before.size() - after.size();
    if (after != before.substr(0, start) + before.substr(start + removedBytes)) Fail(target, "removed the wrong run", before);

    std::string_view run = std::string_view(before).substr(start, removedBytes);
    if (multibyte::Compare(run.substr(0, name.size()), name, true) != 0) Fail(target, "run does not start with the name", before);
    std::string_view rest = run.substr(name.size());
    while (!rest.empty() && IsSingleByteSpace(static_cast<unsigned char>(rest.front()))) rest.remove_prefix(1);
    if (rest.empty() || rest.front() != '=') Fail(target, "no '=' after the name", before);
    rest.remove_prefix(1);
    // The run ends with the first comma (a character of its own) after "=", or with the text.
    std::size_t comma = multibyte::FindBytes(rest, ",", 0);
    bool toEnd = start + removedBytes == before.size();
    if (comma != std::string_view::npos && comma + 1 != rest.size()) Fail(target, "value runs past a comma", before);
    if (comma == std::string_view::npos && !toEnd) Fail(target, "run stops before the end without a comma", before);
    if (comma != std::string_view::npos) rest.remove_suffix(1);
    if (value.View() != Trimmed(rest)) Fail(target, "value is not the trimmed text after '='", before);
    CheckBoolean(value.View());
    return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    fuzz::SelectCodePage(data[0]);
    std::string_view input(reinterpret_cast<const char*>(data + 1), size - 1);
    std::size_t split = input.find('\0');
    if (split == std::string_view::npos) return 0;
    std::string_view name = input.substr(0, split);
    DynamicString options(input.substr(split + 1));
    CheckBoolean(options.View());
    // Every extraction removes at least the name and "=", so this ends.
    while (CheckOneExtraction(options, name)) {
    }
    return 0;
}
