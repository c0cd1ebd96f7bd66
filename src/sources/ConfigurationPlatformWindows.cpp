#include <windows.h>

#include <algorithm>
#include <cstdio>

#include "com/UniqueHandles.h"
#include "sources/ConfigurationPlatform.h"

namespace sm::configuration {

bool ReadRegistryDirectory(std::string& value) {
    UniqueRegistryKey key;
    if (::RegOpenKeyExA(HKEY_LOCAL_MACHINE, "SOFTWARE\\VXIPNP_Alliance\\VXIPNP\\CurrentVersion", 0, KEY_READ,
                        key.Put()) != ERROR_SUCCESS)
        return false;
    DWORD type = 0, size = 0;
    if (::RegQueryValueExA(key.Get(), "VXIPNPPATH", nullptr, &type, nullptr, &size) != ERROR_SUCCESS) return false;
    std::string data(size, '\0');
    if (::RegQueryValueExA(key.Get(), "VXIPNPPATH", nullptr, &type, reinterpret_cast<BYTE*>(data.data()), &size) !=
        ERROR_SUCCESS)
        return false;
    data.resize(std::min<std::size_t>(size, std::char_traits<char>::length(data.c_str())));
    // An empty value names no directory (it would make the platform directory a relative "Win64"):
    // the environment gets its turn.
    if (data.empty()) return false;
    value = data;
    return true;
}

bool ReadEnvironmentDirectory(std::string& value) {
    char buffer[32768];
    DWORD length = ::GetEnvironmentVariableA("VXIPNPPATH", buffer, sizeof buffer);
    if (length == 0 || length >= sizeof buffer) return false;
    value.assign(buffer, length);
    return true;
}

bool FileExists(std::string_view path) {
    DWORD attributes = ::GetFileAttributesA(std::string(path).c_str());
    return attributes != INVALID_FILE_ATTRIBUTES && !(attributes & FILE_ATTRIBUTE_DIRECTORY);
}

bool GetLastWriteTime(std::string_view path, std::uint64_t& time) {
    WIN32_FILE_ATTRIBUTE_DATA data{};
    if (!::GetFileAttributesExA(std::string(path).c_str(), GetFileExInfoStandard, &data)) return false;
    time = (static_cast<std::uint64_t>(data.ftLastWriteTime.dwHighDateTime) << 32) | data.ftLastWriteTime.dwLowDateTime;
    return true;
}

bool WriteTextFile(std::string_view path, std::string_view text) {
    std::FILE* file = std::fopen(std::string(path).c_str(), "wt");
    if (!file) return false;
    bool written = std::fwrite(text.data(), 1, text.size(), file) == text.size();
    return std::fclose(file) == 0 && written;
}

namespace {
struct FindHandle {
    HANDLE handle;
    ~FindHandle() {
        if (handle != INVALID_HANDLE_VALUE) ::FindClose(handle);
    }
};

std::string Join(std::string_view directory, std::string_view name) {
    std::string path(directory);
    if (!path.empty() && path.back() != '\\' && path.back() != '/') path += '\\';
    return path.append(name);
}

// Names of the entries of a folder matching pattern, sorted so every machine lists alike.
std::vector<std::string> Entries(std::string_view directory, const char* pattern, bool directories) {
    std::vector<std::string> names;
    WIN32_FIND_DATAA data{};
    FindHandle find{::FindFirstFileA(Join(directory, pattern).c_str(), &data)};
    if (find.handle == INVALID_HANDLE_VALUE) return names;
    do {
        bool isDirectory = (data.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) != 0;
        std::string_view name = data.cFileName;
        if (isDirectory != directories || name == "." || name == "..") continue;
        names.emplace_back(name);
    } while (::FindNextFileA(find.handle, &data));
    std::sort(names.begin(), names.end());
    return names;
}
}  // namespace

void ListDllFiles(std::string_view directory, std::vector<std::string>& files) {
    for (const auto& name : Entries(directory, "*.dll", false)) files.push_back(Join(directory, name));
    for (const auto& folder : Entries(directory, "*", true)) ListDllFiles(Join(directory, folder), files);
}

}  // namespace sm::configuration
