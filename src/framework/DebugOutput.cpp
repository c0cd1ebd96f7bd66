// Shared part of the debug output: level, capture and the lock. The sink is per platform.
#include "DebugOutput.h"

#include <atomic>
#include <mutex>

namespace sm {

void SendToDebugger(const std::string& text);  // per-platform sink

namespace {
std::mutex& OutputLock() {
    static std::mutex lock;
    return lock;
}
std::atomic<int> level{0};
bool capturing = false;
std::string captured;
}  // namespace

void WriteDebugOutput(std::string_view text) {
    std::lock_guard guard(OutputLock());
    std::string block(text);
    if (capturing) captured += block;
    SendToDebugger(block);
}

int GetDebugOutputLevel() { return level.load(); }
void SetDebugOutputLevel(int value) { level.store(value); }

void StartDebugOutputCapture() {
    std::lock_guard guard(OutputLock());
    capturing = true;
    captured.clear();
}

std::string StopDebugOutputCapture() {
    std::lock_guard guard(OutputLock());
    capturing = false;
    return std::move(captured);
}

}  // namespace sm
