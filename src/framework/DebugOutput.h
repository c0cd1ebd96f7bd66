// The process-wide debug output: Windows builds hand each block to OutputDebugStringA; the native
// build keeps the text for tests. Writers are serialised by one process-wide lock.
#pragma once

#include <string>
#include <string_view>

namespace sm {

void WriteDebugOutput(std::string_view text);

// Level above 0 turns on framework diagnostics (such as missing-argument warnings). Default 0.
int GetDebugOutputLevel();
void SetDebugOutputLevel(int level);

// Tests observe what was written: every block goes to the capture too while capturing is on.
void StartDebugOutputCapture();
std::string StopDebugOutputCapture();

}  // namespace sm
