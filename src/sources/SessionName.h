// The name syntax shared by the whole system: category tokens, the category separator and the
// external-process prefixes. Plain text rules, no COM: they are tested natively too.
#pragma once

#include <cstddef>
#include <string_view>

#include "framework/String.h"

namespace sm {

inline constexpr std::string_view CategoryIVI = "IVI";
inline constexpr std::string_view CategoryRQ = "RQ";
inline constexpr std::string_view CategoryDAQ = "DAQ";
inline constexpr std::string_view CategoryVISA = "VISA";
inline constexpr std::string_view CategoryVXIPNP = "VXIPNP";
inline constexpr std::string_view CategoryCUSTOM = "CUSTOM";
// Stands for any category; an empty category text means the same wherever categories are compared.
inline constexpr std::string_view AnyCategory = "?";

bool IsAnyCategory(std::string_view category);
bool SameCategory(std::string_view left, std::string_view right);

// Finds the first colon, slash or backslash (by character) and the length of the separator that
// starts there ("::", ":\\\\", "//", ...). Positions and lengths count characters.
bool FindCategorySeparator(std::string_view text, std::size_t* position, std::size_t* length);

// "*..." designates the shared external 64-bit process; "32*RQ" or "32*RQ::..." the 32-bit one.
bool HasExternalPrefix(std::string_view text);
int ExternalProcessIndex(std::string_view text);
void StripExternalPrefix(String& text);
std::string_view WithoutExternalPrefix(std::string_view text);
void AddExternalPrefix(String& text);

}  // namespace sm
