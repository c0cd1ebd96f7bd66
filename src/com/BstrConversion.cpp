#include "com/BstrConversion.h"

#include <mbctype.h>

#include <iterator>
#include <limits>

#include "com/ComError.h"
#include "com/UniqueHandles.h"
#include "framework/TEException.h"

namespace sm {

namespace {
UINT MultiByteCodePage() {
    int codePage = _getmbcp();
    return codePage == 0 ? CP_ACP : static_cast<UINT>(codePage);
}

BSTR ConvertToBstr(std::string_view text, UINT codePage, const char* function) {
    if (text.size() > static_cast<std::size_t>(std::numeric_limits<int>::max()))
        TE_RAISE(TE_OUT_OF_MEMORY, function);
    int length = static_cast<int>(text.size());
    // Short texts (names, keys) convert once into a buffer: a character never needs more than
    // one wide character per byte.
    wchar_t buffer[256];
    if (length > 0 && length <= static_cast<int>(std::size(buffer))) {
        int converted = ::MultiByteToWideChar(codePage, 0, text.data(), length, buffer, length);
        if (converted == 0) TE_RAISE(TE_UNEXPECTED_SYSTEM_ERROR, function);
        BSTR result = ::SysAllocStringLen(buffer, static_cast<UINT>(converted));
        if (!result) TE_RAISE(TE_OUT_OF_MEMORY, function);
        return result;
    }
    int wideLength = length == 0 ? 0 : ::MultiByteToWideChar(codePage, 0, text.data(), length, nullptr, 0);
    if (length != 0 && wideLength == 0) TE_RAISE(TE_UNEXPECTED_SYSTEM_ERROR, function);
    BSTR result = ::SysAllocStringLen(nullptr, static_cast<UINT>(wideLength));
    if (!result) TE_RAISE(TE_OUT_OF_MEMORY, function);
    if (wideLength != 0 && ::MultiByteToWideChar(codePage, 0, text.data(), length, result, wideLength) == 0) {
        ::SysFreeString(result);
        TE_RAISE(TE_UNEXPECTED_SYSTEM_ERROR, function);
    }
    return result;
}
}  // namespace

BSTR AllocSysString(std::string_view text) { return ConvertToBstr(text, MultiByteCodePage(), "String::AllocSysString"); }

BSTR AnsiToBstr(std::string_view text) {
    // Out of memory here is reported as the COM error it is, not as a TE code.
    try {
        return ConvertToBstr(text, CP_ACP, "String::AllocSysString");
    } catch (const TEException& exception) {
        if (exception.GetErrorCode() == TE_OUT_OF_MEMORY) throw ComError(E_OUTOFMEMORY);
        throw;
    }
}

std::string WideToMultiByte(const wchar_t* text, std::size_t length) {
    if (!text || length == 0) return {};
    if (length > static_cast<std::size_t>(std::numeric_limits<int>::max())) TE_RAISE(TE_OUT_OF_MEMORY, "String::Assign");
    int wideLength = static_cast<int>(length);
    UINT codePage = MultiByteCodePage();
    int bytes = ::WideCharToMultiByte(codePage, 0, text, wideLength, nullptr, 0, nullptr, nullptr);
    if (bytes == 0) TE_RAISE(TE_UNEXPECTED_SYSTEM_ERROR, "String::Assign");
    std::string result(static_cast<std::size_t>(bytes), '\0');
    if (::WideCharToMultiByte(codePage, 0, text, wideLength, result.data(), bytes, nullptr, nullptr) == 0)
        TE_RAISE(TE_UNEXPECTED_SYSTEM_ERROR, "String::Assign");
    // A BSTR may carry embedded NULs; the text type ends at the first one.
    result.resize(std::char_traits<char>::length(result.c_str()));
    return result;
}

void Assign(String& target, BSTR text) { target.Assign(std::string_view(BstrToMultiByte(text))); }

BstrText::BstrText(BSTR text) {
    std::size_t length = text ? ::SysStringLen(text) : 0;
    if (length <= sizeof shortText) {
        std::size_t used = 0;
        for (; used < length; ++used) {
            wchar_t character = text[used];
            // A BSTR may carry embedded NULs; the text ends at the first one.
            if (character == L'\0') break;
            if (character >= 0x80) break;
            shortText[used] = static_cast<char>(character);
        }
        if (used == length || text[used] == L'\0') {
            view = std::string_view(shortText, used);
            return;
        }
    }
    converted = WideToMultiByte(text, length);
    view = converted;
}

DynamicString TrimmedString(BSTR text) {
    DynamicString trimmed(std::string_view(BstrToMultiByte(text)));
    trimmed.Trim();
    return trimmed;
}

SAFEARRAY* CreateSafeArray(const StringVector& strings) {
    if (strings.size() > std::numeric_limits<ULONG>::max()) TE_RAISE(TE_PROGRAM_ERROR, "StringVector::CreateSafeArray");
    UniqueSafeArray array(::SafeArrayCreateVector(VT_BSTR, 0, static_cast<ULONG>(strings.size())));
    if (!array) TE_RAISE(TE_OUT_OF_MEMORY, "StringVector::CreateSafeArray");
    {
        // Each new BSTR goes straight into its element (no copy per element); should one fail, the
        // array frees those already placed. The access ends before the array can be destroyed.
        BSTR* elements = nullptr;
        if (FAILED(::SafeArrayAccessData(array.Get(), reinterpret_cast<void**>(&elements))))
            TE_RAISE(TE_OUT_OF_MEMORY, "StringVector::CreateSafeArray");
        struct Access {
            SAFEARRAY* accessed;
            ~Access() { ::SafeArrayUnaccessData(accessed); }
        } access{array.Get()};
        for (std::size_t index = 0; index < strings.size(); ++index) elements[index] = AllocSysString(strings[index]);
    }
    return array.Release();
}

}  // namespace sm
