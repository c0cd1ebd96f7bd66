// sessionmgr.exe: a console window onto the session manager of this station, for the engineers who
// install and maintain it. See docs/user-guide.md.
#include <windows.h>
#include <objbase.h>

#include <iostream>

#include "CommandLine.h"
#include "JsonText.h"
#include "StationCommands.h"

namespace {

// The tool's objects live in the multithreaded apartment with the DLL's free-threaded objects, so
// calls go straight through the vtables and error info arrives.
class Apartment {
public:
    Apartment() : result(::CoInitializeEx(nullptr, COINIT_MULTITHREADED)) {}
    ~Apartment() {
        if (SUCCEEDED(result)) ::CoUninitialize();
    }
    HRESULT result;
};

int Fail(const station::CommandLine& line, HRESULT code, const std::string& message) {
    std::string text = message.empty() ? "(the call returned no error description)" : message;
    while (!text.empty() && (text.back() == '\n' || text.back() == '\r')) text.pop_back();
    if (line.json)
        std::cerr << station::JsonObject({{"error", std::to_string(static_cast<long>(code))},
                                          {"message", station::JsonString(text)}})
                  << "\n";
    else
        std::cerr << "sessionmgr: error " << static_cast<long>(code) << ": " << text << "\n";
    return 1;
}

}  // namespace

int main(int argc, char** argv) {
    std::vector<std::string> arguments(argv + 1, argv + argc);
    std::string error;
    auto line = station::ParseCommandLine(arguments, error);
    if (!line) {
        std::cerr << "sessionmgr: " << error << "\nRun 'sessionmgr --help' for the commands.\n";
        return 2;
    }
    if (line->help) {
        const station::CommandSyntax* syntax = station::FindCommand(line->command);
        std::cout << (syntax ? station::CommandHelp(*syntax) : station::GeneralHelp());
        return 0;
    }
    Apartment apartment;
    if (FAILED(apartment.result)) return Fail(*line, apartment.result, "CoInitializeEx failed");
    try {
        station::RunCommand(*line, std::cout);
    } catch (const station::ToolFailure& failure) {
        return Fail(*line, failure.code, failure.message);
    } catch (...) {
        return Fail(*line, E_FAIL, "unexpected failure");
    }
    return 0;
}
