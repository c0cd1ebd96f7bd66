#include "TEException.h"

#include <sstream>

#include "DebugOutput.h"
#include "LanguageStrings.h"

namespace sm {

void TEException::WriteDescription(std::string_view whereCaught, std::ostream& stream) const {
    stream << description.GetText() << "\n";
    stream << "Error Code: " << errorCode << "\n";
    if (!apiFunction.IsEmpty())
        stream << "API Function: " << apiFunction.GetText() << ", API Error Code: " << apiErrorCode << "\n";
    if (!source.IsEmpty()) stream << "Source:'" << source.GetText() << "'\n";
    stream << "Where raised:  \n";
    stream << "  function:  " << function.GetText() << "\n";
    stream << "  file:  " << file.GetText() << "\n";
    stream << "  line:  " << line << "\n";
    stream << "  compilation time:  " << compileTime.GetText() << "  " << compileDate.GetText() << "\n";
    stream << "\n";
    stream << "Where caught:  " << whereCaught << "\n";
}

void TEException::WriteDescriptionToDebugOutput(std::string_view whereCaught) const {
    std::ostringstream text;
    WriteDescription(whereCaught, text);
    WriteDebugOutput(text.str());
}

void RaiseTEError(const RaiseSite& site, std::int32_t code, const RaiseDetails& details) {
    TEException exception;
    exception.SetLine(site.line);
    exception.SetErrorCode(code);
    exception.SetApiErrorCode(details.apiErrorCode);
    exception.SetFunction(site.function ? site.function : "");
    if (!details.message.empty() || details.messageIsString)
        exception.SetDescription(details.message);
    else if (code != 0)
        exception.SetDescription(GetTEErrorMessage(code));
    exception.SetCompileDate(site.compileDate);
    exception.SetCompileTime(site.compileTime);
    exception.SetFile(site.file);
    exception.SetSource(details.source);
    if (details.apiFunction) exception.SetApiFunction(details.apiFunction);
    if (details.writeToDebugOutput) exception.WriteDescriptionToDebugOutput("Debugging When Exception Constructed");
    throw exception;
}

void RaiseTEError(const RaiseSite& site, std::int32_t code, std::string_view message) {
    RaiseTEError(site, code, RaiseDetails{.message = message});
}

void RaiseTEError(const RaiseSite& site, std::int32_t code, const String& message) {
    RaiseTEError(site, code, RaiseDetails{.message = message.View(), .messageIsString = true});
}

void RaiseTEError(const RaiseSite& site, std::int32_t code, const char* message) {
    RaiseTEError(site, code, RaiseDetails{.message = message ? std::string_view(message) : std::string_view()});
}

}  // namespace sm
