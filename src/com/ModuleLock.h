// The module lock count: live objects and LockServer calls keep the DLL loaded.
#pragma once

namespace sm {

void LockModule();
void UnlockModule();
long GetModuleLockCount();

}  // namespace sm

namespace sm {

// True from the moment the DLL is detached from the process: nothing may free a library or call
// into a driver any more.
bool IsModuleDetaching();
void SetModuleDetaching(bool detaching);

}  // namespace sm
