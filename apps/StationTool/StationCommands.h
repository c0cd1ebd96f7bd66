// The station tool's commands, each a few calls on the session manager's automation interfaces. The
// tool is a plain COM client: it reaches the DLL only through CoCreateInstance and the vtables.
#pragma once

#include <windows.h>

#include <ostream>
#include <string>

#include "CommandLine.h"

namespace station {

// A failed call: the HRESULT (a TE code for the session manager's own errors) and the description
// the call left in the thread's error info.
struct ToolFailure {
    HRESULT code;
    std::string message;
};

// Runs one parsed command, printing its result to `out`; throws ToolFailure.
void RunCommand(const CommandLine& line, std::ostream& out);

}  // namespace station
