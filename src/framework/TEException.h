// The one exception type of the DLL: a TE code (or a driver's negative status), the message shown
// to the user, and the place it was raised. Raise it through TE_RAISE so the site fills itself in.
#pragma once

#include <cstdint>
#include <ostream>
#include <string_view>

#include "ErrorCodes.h"
#include "String.h"

namespace sm {

class TEException {
public:
    TEException() = default;
    virtual ~TEException() = default;

    void SetLine(std::int32_t value) { line = value; }
    std::int32_t GetLine() const { return line; }
    void SetErrorCode(std::int32_t value) { errorCode = value; }
    std::int32_t GetErrorCode() const { return errorCode; }
    void SetApiErrorCode(std::int32_t value) { apiErrorCode = value; }
    std::int32_t GetApiErrorCode() const { return apiErrorCode; }

    // A null function name leaves the old one; a null source is the empty source.
    void SetFunction(const char* text) { if (text) function.Assign(text); }
    const char* GetFunction() const { return function.GetText(); }
    void SetApiFunction(const char* text) { apiFunction.Assign(text); }
    const char* GetApiFunction() const { return apiFunction.GetText(); }
    void SetDescription(std::string_view text) { description.Assign(text); }
    const char* GetDescription() const { return description.GetText(); }
    void SetCompileDate(const char* text) { compileDate.Assign(text); }
    const char* GetCompileDate() const { return compileDate.GetText(); }
    void SetCompileTime(const char* text) { compileTime.Assign(text); }
    const char* GetCompileTime() const { return compileTime.GetText(); }
    void SetFile(const char* text) { file.Assign(text); }
    const char* GetFile() const { return file.GetText(); }
    void SetSource(const char* text) { source.Assign(text ? text : ""); }
    const char* GetSource() const { return source.GetText(); }

    void PrependToDescription(std::string_view text) { description.Insert(text, 0); }
    void AppendToDescription(std::string_view text) { description.Append(text); }

    // The diagnostic text: message, code, api failure, source, where raised and where caught.
    void WriteDescription(std::string_view whereCaught, std::ostream& stream) const;
    // The same text, sent to the debugger output.
    void WriteDescriptionToDebugOutput(std::string_view whereCaught) const;

private:
    std::int32_t line = 0;
    std::int32_t errorCode = 0;
    std::int32_t apiErrorCode = 0;
    StaticString<256> function;
    StaticString<256> source;
    StaticString<64> apiFunction;
    DynamicString description;
    StaticString<64> compileDate;
    StaticString<64> compileTime;
    StaticString<256> file;
};

// Where a raise happens; filled by TE_RAISE from the site's own file, line and build time.
struct RaiseSite {
    const char* function;
    const char* file;
    std::int32_t line;
    const char* compileDate;
    const char* compileTime;
};

// Optional parts of a raise. An empty message text means "the code's default message";
// messageIsString keeps an empty message as given (a message handed over as a String).
struct RaiseDetails {
    std::string_view message{};
    std::int32_t apiErrorCode = 0;
    const char* apiFunction = nullptr;
    const char* source = nullptr;
    bool writeToDebugOutput = false;
    bool messageIsString = false;
};

[[noreturn]] void RaiseTEError(const RaiseSite& site, std::int32_t code, const RaiseDetails& details = {});
[[noreturn]] void RaiseTEError(const RaiseSite& site, std::int32_t code, std::string_view message);
[[noreturn]] void RaiseTEError(const RaiseSite& site, std::int32_t code, const String& message);
[[noreturn]] void RaiseTEError(const RaiseSite& site, std::int32_t code, const char* message);

// File name without its folders, computed at compile time so raise sites cost nothing.
constexpr const char* BaseFileName(const char* path) {
    const char* base = path;
    for (const char* p = path; *p; ++p)
        if (*p == '/' || *p == '\\') base = p + 1;
    return base;
}

}  // namespace sm

// TE_RAISE(code, "Class::Method"[, message | sm::RaiseDetails{...}])
#define TE_RAISE(code, functionName, ...)                                                              \
    ::sm::RaiseTEError(::sm::RaiseSite{functionName, ::sm::BaseFileName(__FILE__), __LINE__, __DATE__, \
                                       __TIME__},                                                      \
                       code __VA_OPT__(, ) __VA_ARGS__)
