// The host product's well-known directories (installation, programs, public, application data,
// configuration) for one product version text, computed on first request and cached. The rules are
// plain text rules over what the machine answers; the machine itself is behind DirectorySystem, so
// the rules are tested natively against a table and the Windows build asks the real loader,
// registry and shell.
#pragma once

#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "Path.h"

namespace sm {

class DirectorySystem {
public:
    virtual ~DirectorySystem() = default;
    // Full path of the framework module "vantrel.dll" when it is loaded in the process.
    virtual std::optional<std::string> LoadedFrameworkModulePath() = 0;
    // Default value of the key under HKEY_CLASSES_ROOT; nothing when the key or value is missing.
    virtual std::optional<std::string> ClassesRootDefaultValue(std::string_view key) = 0;
    // Text value under HKEY_LOCAL_MACHINE in the 64-bit or 32-bit registry view, with environment
    // references expanded in an expandable value; nothing when the key or value is missing.
    virtual std::optional<std::string> MachineValue(std::string_view key, std::string_view name, bool view64) = 0;
    // The shell folder of a CSIDL; raises when the shell cannot give it.
    virtual std::string ShellFolder(int csidl) = 0;
    virtual bool FileExists(std::string_view path) = 0;
};

// The machine of this process (the Windows loader, registry and shell in the product).
DirectorySystem& GetDefaultDirectorySystem();

class DirectoryGetter {
public:
    static constexpr int commonDocumentsFolder = 46;  // CSIDL_COMMON_DOCUMENTS
    static constexpr int commonAppDataFolder = 35;    // CSIDL_COMMON_APPDATA
    static constexpr int localAppDataFolder = 28;     // CSIDL_LOCAL_APPDATA

    DirectoryGetter(std::string version, DirectorySystem& system) : version(std::move(version)), system(system) {}
    virtual ~DirectoryGetter() = default;
    DirectoryGetter(const DirectoryGetter&) = delete;
    DirectoryGetter& operator=(const DirectoryGetter&) = delete;

    // Three components above the framework module's folder, or above the registered engine module;
    // raises TE_OPERATION_FAILED "Verentis Engine not registered" when neither is there.
    Path GetInstallationDirectory();
    Path GetProgramsDirectory();
    // The installation holds the development-build beacon file. Computed once; a failure while
    // computing it counts as no development build.
    bool IsDevBuild();
    Path GetPublicDirectory();
    // The public directory, replaced by the registry value "CustomPublicLocation" when that is an
    // absolute path.
    Path GetPublicDirectory(std::string_view subKey, bool view64);
    Path GetCommonAppDataDirectory();
    Path GetLocalAppDataDirectory();
    Path GetDefaultConfigDirectory();
    // The registry value "CfgLocation" when it is an absolute path, otherwise the default.
    Path GetConfigDirectory(std::string_view subKey, bool view64);

    // Empties every cached directory, so the next request computes it again.
    virtual void ClearCache();

    const std::string& GetVersion() const { return version; }

private:
    Path GetActiveTEDirectoryFromRegistry();
    Path ProductFolder(int csidl);
    std::optional<Path> CustomLocation(std::string_view valueName, std::string_view subKey, bool view64);

    const std::string version;
    DirectorySystem& system;
    std::recursive_mutex lock;
    Path installation, programs, publicDirectory, commonAppData, localAppData, defaultConfig;
    // Answers that depend on the registry key and view asked for are cached per key and view.
    std::map<std::pair<std::string, bool>, Path> customPublic, config;
    bool devBuildComputed = false;
    bool devBuild = false;
};

// The process-wide getter of a version text (compared exactly), created on first use and kept until
// the process ends.
DirectoryGetter& GetDirectoryGetter(std::string_view version);

}  // namespace sm
