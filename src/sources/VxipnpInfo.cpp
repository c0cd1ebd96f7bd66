// The file-backed part of the VXIplug&play source: keeping the lists in step with the file and
// describing the configuration.
#include "sources/VxipnpInfo.h"

#include "sources/ConfigurationFile.h"
#include "sources/ConfigurationPlatform.h"

namespace sm {

std::int32_t VxipnpInfo::GetConfigurationLists() {
    std::lock_guard guard(ConfigurationLock());
    std::int32_t generation = 0;
    const IniObj& configuration = GetConfiguration(generation);
    if (generation > parsedGeneration) {
        Parse(configuration);
        parsedGeneration = generation;
    }
    return parsedGeneration;
}

void VxipnpInfo::AppendStateDescription(String& text) {
    std::lock_guard guard(ConfigurationLock());
    GetConfigurationLists();
    std::int32_t generation = 0;
    const IniObj& configuration = GetConfiguration(generation);
    Path directory, platform;
    GetVxipnpDirectory(directory);
    GetPlatformDirectory(platform);
    std::string fromRegistry, fromEnvironment;
    configuration::ReadRegistryDirectory(fromRegistry);
    configuration::ReadEnvironmentDirectory(fromEnvironment);

    text.Append("VXIPNP Configuration:\n");
    text.Append("   Session Manager configuration file: ").Append(GetConfigurationFilePath().View());
    text.Append(", Number of sections: ").AppendInteger(static_cast<std::int64_t>(configuration.GetSections().size()));
    text.Append("\n");
    text.Append("VXIPNP directory: ").Append(directory.View()).Append("\n");
    text.Append("VXIPNP directory from registry: ").Append(fromRegistry).Append("\n");
    text.Append("VXIPNP directory from PATH: ").Append(fromEnvironment).Append("\n");
    text.Append("VXIPNP platform directory: ").Append(platform.View()).Append("\n");
    text.Append("\nFile Contents:\n").Append(configuration.WriteString()).Append("\n");

    DynamicString line("   Number of virtual instruments = %1\n");
    line.ReplaceArg(1, static_cast<std::int64_t>(vinstrs.size()), "%d");
    text.Append(line);
    for (std::size_t index = 0; index < vinstrs.size(); ++index) {
        const VxipnpVInstr& instrument = vinstrs[index];
        DynamicString number("      Virtual Instrument # = %1\n");
        number.ReplaceArg(1, static_cast<std::int64_t>(index), "%u");
        text.Append(number);
        DynamicString names("         name list (%1):");
        names.ReplaceArg(1, static_cast<std::int64_t>(instrument.names.size()), "%d");
        text.Append(names);
        AppendNameListText(instrument.names, text);
        text.Append("\n");
        DynamicString module("         modulePath '%1'\n"), prefix("         prefix '%1'\n"),
            resource("         resource '%1'\n");
        module.ReplaceArg(1, instrument.modulePath.View());
        prefix.ReplaceArg(1, instrument.prefix);
        resource.ReplaceArg(1, instrument.resource);
        text.Append(module).Append(prefix).Append(resource).Append("\n");
    }
    text.Append("\n");
}

}  // namespace sm
