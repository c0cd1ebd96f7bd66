// The operating-system error of a failed C runtime file call, as a Win32 error code, so file
// failures map to TE codes the same way in both builds. On Windows the runtime keeps the system's
// own code (_doserrno); elsewhere errno is translated to the nearest Win32 code.
#pragma once

#include <cstdint>

namespace sm {

// Call right before the file call whose failure is to be reported.
void ClearFileSystemError();
// The Win32 error code of the call that just failed (never 0).
std::uint32_t LastFileSystemError();

}  // namespace sm
