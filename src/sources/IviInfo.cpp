#include "sources/IviInfo.h"

#include <windows.h>

#include <array>
#include <type_traits>

#include "com/LibraryBinding.h"
#include "com/ModuleLock.h"
#include "framework/MultiByte.h"
#include "framework/TEException.h"
#include "sources/ConfigurationFile.h"
#include "sources/SessionName.h"

namespace sm {

namespace {
// The opened store and its change count belong to the process, not to one source object.
void* iviIniHandle = nullptr;
std::int32_t configGeneration = 0;
std::int32_t fileGenerationSeen = 0;

// The GetNamesOptions bits of the automation interface.
constexpr std::uint32_t ReturnLogicalNamesFlag = 1, ReturnVirtualInstrumentsFlag = 2, ReturnHiddenNamesFlag = 4,
                        IncludeCategoryPrefixFlag = 8;

constexpr const char* bindingFunction = "LoadFunctionPtr";
constexpr std::int32_t textSize = 1024;

// A text the library writes into a buffer of textSize bytes; the last byte stays NUL whatever it wrote.
class TextBuffer {
public:
    char* Data() { return bytes.data(); }
    std::string_view View() {
        bytes.back() = '\0';
        return bytes.data();
    }

private:
    std::array<char, textSize> bytes{};
};

bool IsAny(std::string_view subCategory) { return subCategory.empty() || subCategory == AnyCategory; }

// The boolean of the first of the two keys that the section holds; true when it holds neither. A key
// whose value is no boolean counts as false.
bool ReadDefault(const IniObj& configuration, std::string_view section, std::string_view preferred,
                 std::string_view fallback) {
    for (std::string_view key : {preferred, fallback}) {
        bool value = false, invalid = false;
        if (configuration.Get(section, key, value, &invalid)) return value;
        if (invalid) return false;
    }
    return true;
}
}  // namespace

IviInfo::~IviInfo() {
    if (!IsModuleDetaching()) {
        if (iviIniHandle && functions.closeIniFile) functions.closeIniFile(iviIniHandle, 0);
        iviIniHandle = nullptr;
    }
    UnloadLibrary();
}

void IviInfo::LoadFunctionPointers() {
    if (library.IsLoaded()) return;
    library.Load(SystemDirectoryPath("iviconfig.dll").c_str(), "IviInfo::LoadFunctionPointers");
    try {
        Functions bound;
        auto bind = [&](auto*& slot, const char* name) {
            slot = library.Bind<std::remove_pointer_t<std::remove_reference_t<decltype(slot)>>>(name, bindingFunction);
        };
        bind(bound.closeIniFile, "IviIni_CloseIniFile");
        bind(bound.openIniFile, "IviIni_OpenIniFile");
        bind(bound.configurationChanged, "IviIni_ConfigurationChanged");
        bind(bound.reloadConfiguration, "IviIni_ReloadConfiguration");
        bind(bound.getNumberOfVIs, "IviIni_GetNumberOfVIs");
        bind(bound.getNthVI, "IviIni_GetNthVI");
        bind(bound.getVIDriver, "IviIni_GetVIDriver");
        bind(bound.getDriverPrefix, "IviIni_GetDriverPrefix");
        bind(bound.getDriverModule, "IviIni_GetDriverModule");
        bind(bound.getDriverClass, "IviIni_GetDriverClass");
        // Older libraries know one class per driver only.
        using ClassCount = std::remove_pointer_t<decltype(bound.getDriverClassCount)>;
        using ClassByIndex = std::remove_pointer_t<decltype(bound.getDriverClassByIndex)>;
        bound.getDriverClassCount = library.BindOptional<ClassCount>("IviIni_GetDriverClassCount");
        if (bound.getDriverClassCount)
            bound.getDriverClassByIndex = library.BindOptional<ClassByIndex>("IviIni_GetDriverClassByIndex");
        bind(bound.getNumberOfLogicalNames, "IviIni_GetNumberOfLogicalNames");
        bind(bound.getNthLogicalName, "IviIni_GetNthLogicalName");
        bind(bound.getLogicalNameVI, "IviIni_GetLogicalNameVI");
        functions = bound;
    } catch (...) {
        UnloadLibrary();
        throw;
    }
}

void IviInfo::UnloadLibrary() {
    functions = Functions{};
    library.Unload();
}

IviInfo::Handle IviInfo::GetIviIniHandle(std::int32_t* generation) {
    LoadFunctionPointers();
    bool changed = false;
    if (!iviIniHandle) {
        functions.openIniFile("", &iviIniHandle);
        if (!iviIniHandle) {
            DWORD error = ::GetLastError();
            TE_RAISE(TE_UNEXPECTED_SYSTEM_ERROR, "IviInfo::GetIviIniHandle",
                     RaiseDetails{.message = "The Quillvane Dovekit may not be installed. The installer for the Dovekit "
                                             "is located on the Quillvane Driver CD-ROM.\n",
                                  .apiErrorCode = static_cast<std::int32_t>(error)});
        }
        changed = true;
    } else {
        unsigned char storeChanged = 0;
        functions.configurationChanged(iviIniHandle, &storeChanged);
        changed = storeChanged != 0;
        if (changed) functions.reloadConfiguration(iviIniHandle);
    }
    if (changed) ++configGeneration;
    std::int32_t fileGeneration = 0;
    GetConfiguration(fileGeneration);
    if (!changed && fileGeneration > fileGenerationSeen) ++configGeneration;
    fileGenerationSeen = fileGeneration;
    if (generation) *generation = configGeneration;
    return iviIniHandle;
}

const IviEntryList& IviInfo::GetEntries(std::int32_t* generation) {
    std::lock_guard guard(ConfigurationLock());
    std::int32_t current = 0;
    Handle handle = GetIviIniHandle(&current);
    if (entriesGeneration < current) {
        entries.clear();
        IviEntryList fresh;
        ReadEntries(handle, fresh);
        entries = std::move(fresh);
        entriesGeneration = current;
    }
    if (generation) *generation = entriesGeneration;
    return entries;
}

void IviInfo::ReadEntries(Handle handle, IviEntryList& target) {
    target.clear();
    std::vector<std::pair<DynamicString, DynamicString>> logicalNames;
    std::int32_t logicalCount = 0;
    functions.getNumberOfLogicalNames(handle, &logicalCount);
    for (std::int32_t index = 1; index <= logicalCount; ++index) {
        const char* logicalName = nullptr;
        functions.getNthLogicalName(handle, index, &logicalName);
        DynamicString name(logicalName ? logicalName : "");
        TextBuffer instrument;
        functions.getLogicalNameVI(handle, name.GetText(), instrument.Data(), textSize);
        DynamicString target(VInstrPrefix);
        target.Append(instrument.View());
        logicalNames.emplace_back(name, target);
    }

    LoadFunctionPointers();
    std::int32_t instrumentCount = 0;
    functions.getNumberOfVIs(handle, &instrumentCount);
    for (std::int32_t index = 1; index <= instrumentCount; ++index) {
        const char* instrumentName = nullptr;
        functions.getNthVI(handle, index, &instrumentName);
        IviEntry entry;
        entry.viName.Assign(instrumentName ? instrumentName : "");
        TextBuffer driver, prefix, module;
        functions.getVIDriver(handle, entry.viName.GetText(), driver.Data(), textSize);
        DynamicString driverName(driver.View());
        functions.getDriverPrefix(handle, driverName.GetText(), prefix.Data(), textSize);
        functions.getDriverModule(handle, driverName.GetText(), module.Data(), textSize);
        entry.prefix.Assign(prefix.View());
        entry.modulePath = MakeModulePath(module.View());

        DynamicString hidden(VInstrPrefix);
        hidden.Append(entry.viName);
        entry.names.push_back({entry.viName, VirtualInstrumentName});
        entry.names.push_back({hidden, VirtualInstrumentName | DoNotDisplayName});
        for (const auto& [logicalName, instrument] : logicalNames)
            if (instrument.Compare(hidden.View(), true) == 0) entry.names.push_back({logicalName, LogicalName});

        if (!functions.getDriverClassCount || !functions.getDriverClassByIndex) {
            TextBuffer driverClass;
            functions.getDriverClass(handle, driverName.GetText(), driverClass.Data(), textSize);
            entry.iviClass.Assign(driverClass.View());
            target.push_back(entry);
            continue;
        }
        std::int32_t classCount = 0;
        functions.getDriverClassCount(handle, driverName.GetText(), &classCount);
        StringVector seen;
        for (std::int32_t classIndex = 1; classIndex <= classCount; ++classIndex) {
            TextBuffer driverClass;
            functions.getDriverClassByIndex(handle, driverName.GetText(), classIndex, driverClass.Data(), textSize);
            std::string_view className = driverClass.View();
            bool repeated = false;
            for (const auto& known : seen) repeated = repeated || known.View() == className;
            if (repeated) continue;
            seen.emplace_back(className);
            entry.iviClass.Assign(className);
            target.push_back(entry);
        }
    }
    ApplyFileSettings(target);
}

void IviInfo::ApplyFileSettings(IviEntryList& target) {
    std::lock_guard guard(ConfigurationLock());
    std::int32_t generation = 0;
    const IniObj& configuration = GetConfiguration(generation);
    for (const SectionEntry& section : configuration.GetSections()) {
        std::string_view name = section.name;
        if (!multibyte::BeginsWith(name, VInstrPrefix, true)) continue;
        std::size_t index = 0;
        if (!sm::FindEntry(target, name.substr(VInstrPrefix.size()), index) && !sm::FindEntry(target, name, index))
            continue;
        target[index].idQuery = ReadDefault(configuration, name, "QVSessionManager_IDQuery", "IDQuery");
        target[index].reset = ReadDefault(configuration, name, "QVSessionManager_Reset", "Reset");
    }
}

bool IviInfo::FindEntry(std::string_view name, IviEntry& found) {
    std::lock_guard guard(ConfigurationLock());
    const IviEntryList& current = GetEntries();
    std::size_t index = 0;
    if (!sm::FindEntry(current, name, index)) return false;
    found = current[index];
    return true;
}

void IviInfo::ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                        StringVector& names) {
    std::lock_guard guard(ConfigurationLock());
    const IviEntryList& current = GetEntries();
    names.clear();
    for (const IviEntry& entry : current) {
        if (ExcludedBySpecificPrefix(filters, entry.prefix.View())) continue;
        if (!IsAny(subCategory) && entry.iviClass.Compare(subCategory, true) != 0) continue;
        AppendSelectedNames(entry.names, (options & IncludeCategoryPrefixFlag) != 0, entry.iviClass.View(),
                            (options & ReturnVirtualInstrumentsFlag) != 0, (options & ReturnLogicalNamesFlag) != 0,
                            (options & ReturnHiddenNamesFlag) != 0, names);
    }
}

const StringVector& IviInfo::GetClasses() {
    std::lock_guard guard(ConfigurationLock());
    std::int32_t generation = 0;
    const IviEntryList& current = GetEntries(&generation);
    if (classesGeneration < generation) {
        classes.clear();
        for (const IviEntry& entry : current) {
            if (entry.iviClass.IsEmpty()) continue;
            bool known = false;
            for (const auto& name : classes) known = known || name.Compare(entry.iviClass.View(), true) == 0;
            if (!known) classes.push_back(entry.iviClass);
        }
        classesGeneration = generation;
    }
    return classes;
}

void IviInfo::ListCategories(std::string_view subCategory, StringVector& categories) {
    const StringVector& known = GetClasses();
    categories.clear();
    if (IsAny(subCategory)) categories = known;
}

void IviInfo::AppendStateDescription(String& text) {
    std::lock_guard guard(ConfigurationLock());
    const IviEntryList& current = GetEntries();
    Path platform;
    GetPlatformDirectory(platform);
    text.Append("IVIInfo Configuration:\n");
    text.Append("VXIPNP platform directory: ").Append(platform.View()).Append("\n");
    DynamicString count("   Number of virtual instruments = %1\n");
    count.ReplaceArg(1, static_cast<std::int64_t>(current.size()), "%d");
    text.Append(count);
    for (std::size_t index = 0; index < current.size(); ++index) {
        const IviEntry& entry = current[index];
        DynamicString number("      Virtual Instrument # = %1\n"), viName("         viName '%1'\n"),
            module("         modulePath '%1'\n"), prefix("         prefix '%1'\n"), iviClass("         iviClass '%1'\n"),
            names("         name list (%1):");
        number.ReplaceArg(1, static_cast<std::int64_t>(index), "%u");
        viName.ReplaceArg(1, entry.viName);
        module.ReplaceArg(1, entry.modulePath.View());
        prefix.ReplaceArg(1, entry.prefix);
        iviClass.ReplaceArg(1, entry.iviClass);
        names.ReplaceArg(1, static_cast<std::int64_t>(entry.names.size()), "%d");
        text.Append(number).Append(viName).Append(module).Append(prefix).Append(iviClass).Append(names);
        AppendNameListText(entry.names, text);
        text.Append("\n\n");
    }
    text.Append("\n");
}

}  // namespace sm
