#include <string>

namespace sm {
// Off Windows there is no debugger channel; the capture in DebugOutput.cpp is what tests read.
void SendToDebugger(const std::string&) {}
}  // namespace sm
