// The process-wide table of language strings: section -> key -> text, both names compared
// case-insensitively. Built once at first use, read-only afterwards.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace sm {

// The text of (section, key); otherwise defaultText when given (non-null); otherwise the
// "not in table" text.
std::string GetLanguageString(std::string_view section, std::string_view key, const char* defaultText = nullptr);

// Default message of a TE code; codes without a row get "User-defined error code.".
std::string GetTEErrorMessage(std::int32_t code);

}  // namespace sm
