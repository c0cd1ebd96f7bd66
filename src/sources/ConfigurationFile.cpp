#include "sources/ConfigurationFile.h"

#include <vector>

#include "framework/PeExports.h"
#include "framework/TEException.h"
#include "sources/ConfigurationFileHeader.h"
#include "sources/ConfigurationPlatform.h"
#include "sources/DriverPrefix.h"

namespace sm {

namespace {
struct ConfigurationState {
    IniObj configuration;
    std::uint64_t fileTime = 0;
    std::int32_t generation = 0;
    Path vxipnpDirectory;
    Path platformDirectory;
    // The file could not be written into the platform directory while it had this write time; the
    // configuration then holds the regenerated text. Scanning every driver image again at each
    // request would gain nothing until the directory changes.
    bool writeFailed = false;
    std::uint64_t failedDirectoryTime = 0;
};

// Lives until the process ends: sessions and sources may use it during static destruction.
ConfigurationState& State() {
    static ConfigurationState* state = new ConfigurationState;
    return *state;
}

struct Driver {
    std::string modulePath;
    DynamicString prefix;
};

std::vector<Driver> ScanForDrivers() {
    std::vector<Driver> drivers;
    Path platform;
    if (!GetPlatformDirectory(platform)) return drivers;
    std::vector<std::string> files;
    configuration::ListDllFiles(platform.View(), files);
    for (auto file = files.rbegin(); file != files.rend(); ++file) {
        StringVector exports;
        try {
            ReadDLLExports(*file, exports);
        } catch (const TEException&) {
            continue;  // unreadable, malformed or not an image: not a driver
        }
        DynamicString prefix;
        if (DetectVxipnpPrefix(exports, prefix)) drivers.push_back({*file, prefix});
    }
    return drivers;
}
}  // namespace

std::recursive_mutex& ConfigurationLock() {
    static std::recursive_mutex* lock = new std::recursive_mutex;
    return *lock;
}

bool GetVxipnpDirectory(Path& directory) {
    std::lock_guard guard(ConfigurationLock());
    ConfigurationState& state = State();
    if (state.vxipnpDirectory.IsEmpty()) {
        std::string found;
        if (!configuration::ReadRegistryDirectory(found) && !configuration::ReadEnvironmentDirectory(found)) return false;
        state.vxipnpDirectory.Assign(found);
    }
    directory = state.vxipnpDirectory;
    return true;
}

bool GetPlatformDirectory(Path& directory) {
    std::lock_guard guard(ConfigurationLock());
    ConfigurationState& state = State();
    if (state.platformDirectory.IsEmpty()) {
        Path vxipnp;
        if (!GetVxipnpDirectory(vxipnp)) return false;
        state.platformDirectory = vxipnp;
        state.platformDirectory.Append("Win64");
    }
    directory = state.platformDirectory;
    return true;
}

Path GetConfigurationFilePath() {
    Path path;
    if (GetPlatformDirectory(path)) path.Append("QVSessionMgr.ini");
    return path;
}

namespace {
std::string GenerateConfigurationText() {
    std::vector<Driver> drivers = ScanForDrivers();
    IniObj sections;
    for (const Driver& driver : drivers) {
        std::string section = "VPPVInstr->" + std::string(driver.prefix.View());
        sections.Put(section, "ModulePath", EscapeIniText(driver.modulePath), true);
        sections.Put(section, "Prefix", EscapeIniText(driver.prefix.View()), true);
        sections.Put(section, "Resource", "", true);
        sections.Put(section, "IDQuery", "True", false);
        sections.Put(section, "Reset", "True", false);
    }
    std::string text = configurationFileHeader;
    text += drivers.empty() ? std::string("\n;; NO VXIPNP drivers found!\n") : sections.WriteString(true);
    return text;
}

// Regenerates the missing file. When the platform directory exists but the file cannot be written
// there (a read-only directory is the normal case for a standard user), the regenerated text is
// served from memory, and the failure is remembered until the directory's write time changes.
// Gives whether the file was written.
bool RegenerateMissingFile(ConfigurationState& state, const Path& path) {
    Path platform;
    std::uint64_t directoryTime = 0;
    bool directoryExists = GetPlatformDirectory(platform) && configuration::GetLastWriteTime(platform.View(), directoryTime);
    if (directoryExists && state.writeFailed && directoryTime == state.failedDirectoryTime) return false;
    std::string text = GenerateConfigurationText();
    if (configuration::WriteTextFile(path.View(), text)) {
        state.writeFailed = false;
        return true;
    }
    if (directoryExists) {
        IniObj fresh;
        fresh.ReadString(text);
        state.configuration = std::move(fresh);
        state.fileTime = 0;
        ++state.generation;
        state.writeFailed = true;
        state.failedDirectoryTime = directoryTime;
    }
    return false;
}
}  // namespace

void RegenerateConfigurationFile(const Path& path) {
    std::string text = GenerateConfigurationText();
    if (path.IsEmpty() || !configuration::WriteTextFile(path.View(), text)) {
        DynamicString message("Could not write the session manager configuration file '%1'.");
        message.ReplaceArg(1, path.View());
        TE_RAISE(TE_UNABLE_TO_OPEN_FILE, "VxipnpInfo::RegenerateConfigurationFile", message);
    }
}

const IniObj& GetConfiguration(std::int32_t& generation) {
    std::lock_guard guard(ConfigurationLock());
    ConfigurationState& state = State();
    Path path = GetConfigurationFilePath();
    if (!path.IsEmpty()) {
        bool existed = configuration::FileExists(path.View());
        bool regenerated = false;
        if (existed) {
            state.writeFailed = false;
        } else {
            try {
                regenerated = RegenerateMissingFile(state, path);
            } catch (const TEException&) {
                // A document that cannot be made leaves the configuration as it was; the next
                // request tries again.
            }
        }
        std::uint64_t written = 0;
        bool timeKnown = configuration::GetLastWriteTime(path.View(), written);
        bool stale = regenerated || state.generation == 0 || !timeKnown || written > state.fileTime;
        if ((existed || regenerated) && stale) {
            IniObj fresh;
            fresh.ReadFile(path.View());
            state.configuration = std::move(fresh);
            state.fileTime = written;
            ++state.generation;
        }
    }
    generation = state.generation;
    return state.configuration;
}

}  // namespace sm
