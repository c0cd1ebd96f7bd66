#include "com/ModuleLock.h"

#include <atomic>

namespace sm {
namespace {
std::atomic<long> lockCount{0};
}

void LockModule() { lockCount.fetch_add(1); }
void UnlockModule() { lockCount.fetch_sub(1); }
long GetModuleLockCount() { return lockCount.load(); }

}  // namespace sm

namespace sm {
namespace {
std::atomic<bool> moduleDetaching{false};
}

bool IsModuleDetaching() { return moduleDetaching.load(); }
void SetModuleDetaching(bool detaching) { moduleDetaching.store(detaching); }

}  // namespace sm
