// The station tool's command line: which command, its positional arguments and its options. Plain C++
// so the parsing rules are tested natively; the tool's COM work lives in StationCommands.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

namespace station {

struct CommandSyntax {
    const char* name;
    const char* usage;        // "open NAME [--options TEXT]"
    const char* summary;      // one line for the general help
    int minPositional;
    int maxPositional;
    std::vector<const char*> valueOptions;  // options that take a value: "--key"
    std::vector<const char*> flagOptions;   // options without a value: "--hidden"
};

struct CommandLine {
    std::string command;
    std::vector<std::string> positional;
    std::map<std::string, std::string> values;  // "--key" -> "K"
    std::vector<std::string> flags;             // "--hidden"
    bool json = false;
    bool help = false;

    bool HasFlag(const std::string& flag) const;
    std::string Value(const std::string& option, const std::string& fallback = "") const;
};

// Every command the tool knows, in the order the general help lists them.
const std::vector<CommandSyntax>& Commands();
const CommandSyntax* FindCommand(const std::string& name);

// Parses the arguments after the program name. "--json" and "--help" are accepted everywhere; an
// empty argument list or "help" asks for the general help. On a usage error returns nothing and
// sets `error` to a one-line reason.
std::optional<CommandLine> ParseCommandLine(const std::vector<std::string>& arguments, std::string& error);

std::string GeneralHelp();
std::string CommandHelp(const CommandSyntax& syntax);

}  // namespace station
