// The manager's own configuration file, "QVSessionMgr.ini" in the VXIplug&play platform directory:
// process-wide state shared by every manager, under one process-wide recursive lock.
#pragma once

#include <cstdint>
#include <mutex>
#include <string>

#include "framework/IniObj.h"
#include "framework/Path.h"

namespace sm {

// The configuration lock. Taken after a manager's lock whenever both are held.
std::recursive_mutex& ConfigurationLock();

// The resolved VXIplug&play directory (registry value, else environment); false while unresolved.
bool GetVxipnpDirectory(Path& directory);
// The VXIplug&play directory with "Win64" appended; false while unresolved.
bool GetPlatformDirectory(Path& directory);
// The file path, empty while the platform directory is unresolved.
Path GetConfigurationFilePath();

// The file's contents, regenerated first when the file is missing and read again when its
// last-write time moved forward. When the platform directory exists but the file cannot be written
// into it, the regenerated contents are served from memory until the directory's write time
// changes or the file appears. Call with ConfigurationLock held. generation grows at every read.
const IniObj& GetConfiguration(std::int32_t& generation);

// Writes a new configuration file at path from the drivers found in the platform directory.
// Raises a TEException naming the file when it cannot be written.
void RegenerateConfigurationFile(const Path& path);

}  // namespace sm
