// Conversions between the DLL's multibyte text and automation types (BSTR, SAFEARRAY of BSTR).
#pragma once

#include <oaidl.h>

#include <string>
#include <string_view>

#include "framework/String.h"

namespace sm {

// New BSTR owned by the caller, converted in the process's multibyte code page. "" gives an empty,
// non-null BSTR. Raises TE_UNEXPECTED_SYSTEM_ERROR or TE_OUT_OF_MEMORY from "String::AllocSysString".
BSTR AllocSysString(std::string_view text);
inline BSTR AllocSysString(const String& text) { return AllocSysString(text.View()); }

// Multibyte text of a wide text; null or empty gives "". Raises TE_UNEXPECTED_SYSTEM_ERROR from
// "String::Assign" when the text cannot be converted.
std::string WideToMultiByte(const wchar_t* text, std::size_t length);
inline std::string BstrToMultiByte(BSTR text) { return WideToMultiByte(text, text ? ::SysStringLen(text) : 0); }
void Assign(String& target, BSTR text);
// The text of a BSTR argument without leading and trailing white space, as names are compared.
DynamicString TrimmedString(BSTR text);

// The multibyte text of a BSTR argument for the duration of one call, the same text
// BstrToMultiByte gives. Short seven-bit texts (almost every name) are copied into the object
// itself: every ANSI code page encodes them byte for byte, and a lookup then needs neither the
// system's conversion nor the heap.
class BstrText {
public:
    explicit BstrText(BSTR text);
    BstrText(const BstrText&) = delete;
    BstrText& operator=(const BstrText&) = delete;
    std::string_view View() const { return view; }

private:
    char shortText[128];
    std::string converted;
    std::string_view view;
};

// BSTR converted from system-ANSI text (error descriptions).
BSTR AnsiToBstr(std::string_view text);

// One-dimensional SAFEARRAY of VT_BSTR, lower bound 0, in list order. Raises TE_OUT_OF_MEMORY
// from "StringVector::CreateSafeArray" when the array cannot be made.
SAFEARRAY* CreateSafeArray(const StringVector& strings);

}  // namespace sm
