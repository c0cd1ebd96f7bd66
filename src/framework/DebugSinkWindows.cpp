#include <windows.h>

#include <string>

namespace sm {
void SendToDebugger(const std::string& text) { OutputDebugStringA(text.c_str()); }
}  // namespace sm
