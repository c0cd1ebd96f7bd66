#pragma once

namespace sm {

// The text that begins every regenerated "QVSessionMgr.ini".
extern const char* const configurationFileHeader;

}  // namespace sm
