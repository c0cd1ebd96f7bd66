#include <windows.h>

#include <algorithm>
#include <cctype>
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

bool HasDllExtension(std::string_view name) {
    constexpr std::string_view extension = ".dll";
    if (name.size() < extension.size()) return false;
    std::string_view tail = name.substr(name.size() - extension.size());
    for (std::size_t index = 0; index < extension.size(); ++index)
        if (static_cast<char>(std::tolower(static_cast<unsigned char>(tail[index]))) != extension[index]) return false;
    return true;
}

// One pass over a folder: its image files ("*.dll") and its subfolders, each sorted so every
// machine lists alike.
void Entries(std::string_view directory, std::vector<std::string>& images, std::vector<std::string>& folders) {
    WIN32_FIND_DATAA data{};
    FindHandle find{::FindFirstFileA(Join(directory, "*").c_str(), &data)};
    if (find.handle == INVALID_HANDLE_VALUE) return;
    do {
        std::string_view name = data.cFileName;
        if (data.dwFileAttributes & FILE_ATTRIBUTE_DIRECTORY) {
            if (name != "." && name != "..") folders.emplace_back(name);
        } else if (HasDllExtension(name)) {
            images.emplace_back(name);
        }
    } while (::FindNextFileA(find.handle, &data));
    std::sort(images.begin(), images.end());
    std::sort(folders.begin(), folders.end());
}
}  // namespace

void ListDllFiles(std::string_view directory, std::vector<std::string>& files) {
    std::vector<std::string> images, folders;
    Entries(directory, images, folders);
    for (const auto& name : images) files.push_back(Join(directory, name));
    for (const auto& folder : folders) ListDllFiles(Join(directory, folder), files);
}

}  // namespace sm::configuration
