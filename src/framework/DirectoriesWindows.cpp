// The machine as DirectoryGetter sees it on Windows: the loader, the registry, the shell folders and
// the file system.
#include <windows.h>
#include <shlobj.h>

#include <memory>
#include <string>
#include <type_traits>
#include <vector>

#include "DirectoryGetter.h"
#include "ErrorCodes.h"
#include "TEException.h"

namespace sm {
namespace {

struct RegistryKeyCloser {
    void operator()(HKEY key) const { ::RegCloseKey(key); }
};
using RegistryKey = std::unique_ptr<std::remove_pointer_t<HKEY>, RegistryKeyCloser>;

RegistryKey OpenKey(HKEY root, std::string_view path, REGSAM access) {
    HKEY key = nullptr;
    std::string name(path);
    if (::RegOpenKeyExA(root, name.c_str(), 0, access, &key) != ERROR_SUCCESS) return nullptr;
    return RegistryKey(key);
}

// A text value (REG_SZ, or REG_EXPAND_SZ with its references expanded); other types count as missing.
std::optional<std::string> ReadText(HKEY key, const char* name) {
    DWORD type = 0, bytes = 0;
    if (::RegQueryValueExA(key, name, nullptr, &type, nullptr, &bytes) != ERROR_SUCCESS) return std::nullopt;
    if (type != REG_SZ && type != REG_EXPAND_SZ) return std::nullopt;
    std::vector<char> buffer(bytes + 1, '\0');
    if (::RegQueryValueExA(key, name, nullptr, &type, reinterpret_cast<BYTE*>(buffer.data()), &bytes) != ERROR_SUCCESS)
        return std::nullopt;
    std::string text(buffer.data());  // the stored value may or may not carry its NUL
    if (type != REG_EXPAND_SZ) return text;
    DWORD needed = ::ExpandEnvironmentStringsA(text.c_str(), nullptr, 0);
    if (needed == 0) return text;
    std::vector<char> expanded(needed + 1, '\0');
    if (::ExpandEnvironmentStringsA(text.c_str(), expanded.data(), needed + 1) == 0) return text;
    return std::string(expanded.data());
}

class WindowsDirectorySystem final : public DirectorySystem {
public:
    std::optional<std::string> LoadedFrameworkModulePath() override {
        HMODULE module = nullptr;
        if (!::GetModuleHandleExA(GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT, "vantrel.dll", &module)) return std::nullopt;
        std::vector<char> name(MAX_PATH);
        for (;;) {
            DWORD length = ::GetModuleFileNameA(module, name.data(), static_cast<DWORD>(name.size()));
            if (length == 0) return std::nullopt;
            if (length < name.size()) return std::string(name.data(), length);
            name.resize(name.size() * 2);
        }
    }

    std::optional<std::string> ClassesRootDefaultValue(std::string_view key) override {
        RegistryKey opened = OpenKey(HKEY_CLASSES_ROOT, key, KEY_QUERY_VALUE);
        if (!opened) return std::nullopt;
        return ReadText(opened.get(), nullptr);
    }

    std::optional<std::string> MachineValue(std::string_view key, std::string_view name, bool view64) override {
        RegistryKey opened = OpenKey(HKEY_LOCAL_MACHINE, key, KEY_QUERY_VALUE | (view64 ? KEY_WOW64_64KEY : KEY_WOW64_32KEY));
        if (!opened) return std::nullopt;
        return ReadText(opened.get(), std::string(name).c_str());
    }

    std::string ShellFolder(int csidl) override {
        char folder[MAX_PATH] = {};
        HRESULT result = ::SHGetFolderPathA(nullptr, csidl, nullptr, SHGFP_TYPE_CURRENT, folder);
        if (FAILED(result)) {
            TE_RAISE(SystemErrorToTECode(static_cast<std::uint32_t>(result)), "DirectoryGetter::GetShellFolder",
                     RaiseDetails{.apiErrorCode = static_cast<std::int32_t>(result), .apiFunction = "SHGetFolderPathA"});
        }
        return folder;
    }

    bool FileExists(std::string_view path) override {
        return ::GetFileAttributesA(std::string(path).c_str()) != INVALID_FILE_ATTRIBUTES;
    }
};

}  // namespace

DirectorySystem& GetDefaultDirectorySystem() {
    static WindowsDirectorySystem system;
    return system;
}

}  // namespace sm
