#include "DirectoryGetter.h"

#include <memory>

#include "ErrorCodes.h"
#include "TEException.h"

namespace sm {
namespace {

constexpr std::string_view engineServerKey = "CLSID\\{E17A3C92-4B08-4F6D-95E1-A2C7083D5B64}\\InprocServer32";
constexpr std::string_view productKey = "Software\\Quillvane\\Verentis\\";
constexpr std::string_view devBuildBeacon = "DEV BUILD BEACON (Do not delete or install).txt";

}  // namespace

Path DirectoryGetter::GetActiveTEDirectoryFromRegistry() {
    std::optional<std::string> engine = system.ClassesRootDefaultValue(engineServerKey);
    if (!engine || engine->empty())
        TE_RAISE(TE_OPERATION_FAILED, "DirectoryGetter::GetActiveTEDirectoryFromRegistry", "Verentis Engine not registered");
    return Path(*engine);
}

Path DirectoryGetter::GetInstallationDirectory() {
    std::lock_guard guard(lock);
    if (!installation.IsEmpty()) return installation;
    Path module;
    if (std::optional<std::string> framework = system.LoadedFrameworkModulePath())
        module = Path(*framework).Parent();
    else
        module = GetActiveTEDirectoryFromRegistry();
    Path found = module.Parent().Parent().Parent();
    found.EnsureTrailingSeparator();
    installation = found;
    return installation;
}

bool DirectoryGetter::IsDevBuild() {
    std::lock_guard guard(lock);
    if (devBuildComputed) return devBuild;
    try {
        Path beacon = GetInstallationDirectory();
        beacon.Append(devBuildBeacon);
        devBuild = system.FileExists(beacon.View());
    } catch (...) {
        // No engine, no beacon: whatever went wrong, this is not a development installation.
        devBuild = false;
    }
    devBuildComputed = true;
    return devBuild;
}

Path DirectoryGetter::GetProgramsDirectory() {
    std::lock_guard guard(lock);
    if (!programs.IsEmpty()) return programs;
    Path found = GetInstallationDirectory();
    found.AppendDirectory("Bin");
    if (IsDevBuild()) found.AppendDirectory("x64").AppendDirectory("Release");
    programs = found;
    return programs;
}

Path DirectoryGetter::ProductFolder(int csidl) {
    Path folder(system.ShellFolder(csidl));
    folder.Append("Quillvane").AppendDirectory("Verentis " + version);
    return folder;
}

Path DirectoryGetter::GetPublicDirectory() {
    std::lock_guard guard(lock);
    if (!publicDirectory.IsEmpty()) return publicDirectory;
    if (IsDevBuild())
        publicDirectory = GetInstallationDirectory().Parent().AppendDirectory("VerentisPublic");
    else
        publicDirectory = ProductFolder(commonDocumentsFolder);
    return publicDirectory;
}

Path DirectoryGetter::GetCommonAppDataDirectory() {
    std::lock_guard guard(lock);
    if (!commonAppData.IsEmpty()) return commonAppData;
    if (IsDevBuild())
        commonAppData = GetInstallationDirectory().Parent().AppendDirectory("CommonAppData");
    else
        commonAppData = ProductFolder(commonAppDataFolder);
    return commonAppData;
}

Path DirectoryGetter::GetLocalAppDataDirectory() {
    std::lock_guard guard(lock);
    if (!localAppData.IsEmpty()) return localAppData;
    if (IsDevBuild())
        localAppData = GetInstallationDirectory().Parent().AppendDirectory("LocalAppData");
    else
        localAppData = ProductFolder(localAppDataFolder);
    return localAppData;
}

Path DirectoryGetter::GetDefaultConfigDirectory() {
    std::lock_guard guard(lock);
    if (!defaultConfig.IsEmpty()) return defaultConfig;
    defaultConfig = GetCommonAppDataDirectory().AppendDirectory("Cfg");
    return defaultConfig;
}

std::optional<Path> DirectoryGetter::CustomLocation(std::string_view valueName, std::string_view subKey, bool view64) {
    std::string key(productKey);
    key += subKey;
    if (IsDevBuild()) key += "dev";
    std::optional<std::string> value = system.MachineValue(key, valueName, view64);
    // Judged on the text as stored: "C:" alone is no absolute path, though a Path would complete it.
    if (!value || value->empty() || !IsAbsolutePathText(*value)) return std::nullopt;
    return Path(*value);
}

Path DirectoryGetter::GetPublicDirectory(std::string_view subKey, bool view64) {
    std::lock_guard guard(lock);
    auto cacheKey = std::make_pair(std::string(subKey), view64);
    if (auto cached = customPublic.find(cacheKey); cached != customPublic.end()) return cached->second;
    // The default is computed only when no custom location wins: its failure must not break one.
    std::optional<Path> custom = CustomLocation("CustomPublicLocation", subKey, view64);
    Path found = custom ? *custom : GetPublicDirectory();
    customPublic.emplace(std::move(cacheKey), found);
    return found;
}

Path DirectoryGetter::GetConfigDirectory(std::string_view subKey, bool view64) {
    std::lock_guard guard(lock);
    auto cacheKey = std::make_pair(std::string(subKey), view64);
    if (auto cached = config.find(cacheKey); cached != config.end()) return cached->second;
    std::optional<Path> custom = CustomLocation("CfgLocation", subKey, view64);
    Path found = custom ? *custom : GetDefaultConfigDirectory();
    config.emplace(std::move(cacheKey), found);
    return found;
}

void DirectoryGetter::ClearCache() {
    std::lock_guard guard(lock);
    for (Path* path : {&installation, &programs, &publicDirectory, &commonAppData, &localAppData, &defaultConfig})
        path->Empty();
    customPublic.clear();
    config.clear();
}

DirectoryGetter& GetDirectoryGetter(std::string_view version) {
    static std::mutex mapLock;
    // Never destroyed: callers may ask for directories while the process shuts down.
    static auto* getters = new std::map<std::string, std::unique_ptr<DirectoryGetter>, std::less<>>;
    std::lock_guard guard(mapLock);
    auto found = getters->find(version);
    if (found == getters->end())
        found = getters->emplace(std::string(version),
                                 std::make_unique<DirectoryGetter>(std::string(version), GetDefaultDirectorySystem()))
                    .first;
    return *found->second;
}

}  // namespace sm
