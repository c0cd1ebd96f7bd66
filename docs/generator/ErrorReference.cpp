// Prints the error reference of docs/error-reference.md from the framework's own code table and
// default messages, so the published list is the one the DLL reports from.
#include <cstdio>

#include "framework/ErrorCodes.h"
#include "framework/LanguageStrings.h"

int main() {
    std::printf(
        "# Error reference\n\n"
        "Generated from the DLL's own error table by `docs/generator/ErrorReference.cpp`; the test command\n"
        "fails when this file and the table differ. A session manager error reaches a client as the code\n"
        "itself used as the HRESULT, with the message as the error-info description (a specific message\n"
        "may replace the default one below). Driver and VISA errors carry the driver's own status.\n\n"
        "| Code | HRESULT | Name | Default message |\n|---|---|---|---|\n");
    for (const sm::TECodeRow* row = sm::TECodeTable; row->name; ++row)
        std::printf("| %d | 0x%08X | %s | %s |\n", static_cast<int>(row->code), static_cast<unsigned>(row->code),
                    row->name, sm::GetTEErrorMessage(row->code).c_str());
    return 0;
}
