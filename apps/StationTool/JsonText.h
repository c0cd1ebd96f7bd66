// The little JSON the station tool prints: strings escaped per RFC 8259, arrays and objects built as
// text. Plain C++, tested natively.
#pragma once

#include <string>
#include <utility>
#include <vector>

namespace station {

// A JSON string literal (with quotes) of UTF-8 or ANSI text; control characters become \uXXXX.
std::string JsonString(const std::string& text);
std::string JsonStringArray(const std::vector<std::string>& items);
// An object of members whose values are already JSON text, in the given order.
std::string JsonObject(const std::vector<std::pair<std::string, std::string>>& members);

}  // namespace station
