#include "CommandLine.h"

#include <algorithm>

namespace station {
namespace {

bool Contains(const std::vector<const char*>& list, const std::string& item) {
    return std::any_of(list.begin(), list.end(), [&](const char* entry) { return item == entry; });
}

}  // namespace

bool CommandLine::HasFlag(const std::string& flag) const {
    return std::find(flags.begin(), flags.end(), flag) != flags.end();
}

std::string CommandLine::Value(const std::string& option, const std::string& fallback) const {
    auto found = values.find(option);
    return found == values.end() ? fallback : found->second;
}

const std::vector<CommandSyntax>& Commands() {
    static const std::vector<CommandSyntax> commands = {
        {"list", "list [CATEGORY] [--hidden] [--filter SpecificPrefix=x]",
         "names that can be opened, with their category prefixes", 0, 1, {"--filter"}, {"--hidden"}},
        {"categories", "categories [CATEGORY]", "the visible categories (and sub-categories)", 0, 1, {}, {}},
        {"sessions", "sessions [CATEGORY]", "the live sessions of this process (\"*\" for the shared process)", 0, 1,
         {}, {}},
        {"state", "state", "the manager's state description", 0, 0, {}, {}},
        {"open", "open NAME [--options TEXT]", "open a session; print category, handles by level and state", 1, 1,
         {"--options"}, {}},
        {"selftest", "selftest NAME", "run the driver's self test", 1, 1, {}, {}},
        {"revision", "revision NAME", "query the driver and firmware revisions", 1, 1, {}, {}},
        {"errorquery", "errorquery NAME", "query the instrument's error queue", 1, 1, {}, {}},
        {"lock", "lock NAME --key KEY [--timeout SECONDS]",
         "take the session lock (use \"*\" names to reach the shared external process)", 1, 1,
         {"--key", "--timeout"}, {}},
        {"unlock", "unlock NAME [--all]", "release one level of the session lock, or every level with --all", 1, 1,
         {}, {"--all"}},
    };
    return commands;
}

const CommandSyntax* FindCommand(const std::string& name) {
    for (const CommandSyntax& syntax : Commands())
        if (name == syntax.name) return &syntax;
    return nullptr;
}

std::optional<CommandLine> ParseCommandLine(const std::vector<std::string>& arguments, std::string& error) {
    CommandLine line;
    if (arguments.empty() || arguments[0] == "help" || arguments[0] == "--help" || arguments[0] == "-h") {
        line.help = true;
        if (arguments.size() > 1) line.command = arguments[1];
        return line;
    }
    line.command = arguments[0];
    const CommandSyntax* syntax = FindCommand(line.command);
    if (!syntax) {
        error = "unknown command '" + line.command + "'";
        return std::nullopt;
    }
    for (std::size_t i = 1; i < arguments.size(); ++i) {
        const std::string& argument = arguments[i];
        if (argument == "--json") {
            line.json = true;
        } else if (argument == "--help" || argument == "-h") {
            line.help = true;
        } else if (Contains(syntax->valueOptions, argument)) {
            if (i + 1 >= arguments.size()) {
                error = "option " + argument + " needs a value";
                return std::nullopt;
            }
            line.values[argument] = arguments[++i];
        } else if (Contains(syntax->flagOptions, argument)) {
            line.flags.push_back(argument);
        } else if (argument.size() > 2 && argument.compare(0, 2, "--") == 0) {
            error = "unknown option " + argument + " for '" + line.command + "'";
            return std::nullopt;
        } else {
            line.positional.push_back(argument);
        }
    }
    if (line.help) return line;
    int count = static_cast<int>(line.positional.size());
    if (count < syntax->minPositional || count > syntax->maxPositional) {
        error = "usage: sessionmgr " + std::string(syntax->usage);
        return std::nullopt;
    }
    if (line.command == "lock" && line.Value("--key").empty()) {
        error = "lock needs --key KEY";
        return std::nullopt;
    }
    return line;
}

std::string GeneralHelp() {
    std::string text = "sessionmgr: what the session manager of this station sees.\n\nCommands:\n";
    for (const CommandSyntax& syntax : Commands())
        text += "  " + std::string(syntax.usage) + "\n      " + syntax.summary + "\n";
    text +=
        "\nEvery command takes --json (machine-readable output) and --help.\n"
        "Exit status: 0 on success, 1 when the session manager reports an error (its code and message go to\n"
        "stderr), 2 for a usage error.\n";
    return text;
}

std::string CommandHelp(const CommandSyntax& syntax) {
    return "usage: sessionmgr " + std::string(syntax.usage) + " [--json]\n  " + syntax.summary + "\n";
}

}  // namespace station
