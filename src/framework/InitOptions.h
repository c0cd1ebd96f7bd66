// Driver init options ("Simulate=1, IdQuery = 0"): taking one option out of an option string and
// reading an option's boolean value. Plain text rules, tested and fuzzed natively.
#pragma once

#include <string_view>

#include "framework/String.h"

namespace sm {

// Takes the first "name = value" pair (name matched case-insensitively) out of options, through the
// comma after it; value comes back trimmed. False, and options untouched, when the first occurrence
// of the name is not followed by "=".
bool ExtractInitOption(String& options, std::string_view optionName, String& value);

// "vi_true" and "1" are true, "false", "vi_false" and "0" false (case-insensitive); anything else
// raises TE_INVALID_OR_OUT_OF_RANGE "The value '%1' is not a valid value.".
bool GetBooleanInitOptionValue(std::string_view value);

}  // namespace sm
