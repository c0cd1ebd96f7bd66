// The operating-system questions the configuration file asks: registry, environment, file times
// and the driver directory listing. Kept apart so the file logic itself reads as plain C++.
#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace sm::configuration {

// Value "VXIPNPPATH" of HKLM "SOFTWARE\VXIPNP_Alliance\VXIPNP\CurrentVersion", any type, as text;
// counts only when not empty.
bool ReadRegistryDirectory(std::string& value);
// Environment variable "VXIPNPPATH"; counts only when not empty.
bool ReadEnvironmentDirectory(std::string& value);
bool FileExists(std::string_view path);
// Last-write time in 100 ns units (comparable, monotonic with the file's modification).
bool GetLastWriteTime(std::string_view path, std::uint64_t& time);
// Writes text in text mode ("wt": line ends become CR LF); false when the file cannot be written.
bool WriteTextFile(std::string_view path, std::string_view text);
// Every "*.dll" file of directory and, recursively, of its subdirectories: the files of a folder
// first (by name), then each subfolder (by name).
void ListDllFiles(std::string_view directory, std::vector<std::string>& files);

}  // namespace sm::configuration
