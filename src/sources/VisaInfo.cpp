#include "sources/VisaInfo.h"

#include "framework/MultiByte.h"

namespace sm {
namespace {

// Closes a VISA session on every way out unless it was handed on.
class ScopedVisaSession {
public:
    explicit ScopedVisaSession(const VisaLink& link) : link(link) {}
    ~ScopedVisaSession() {
        if (session) link.viClose(session);
    }
    ScopedVisaSession(const ScopedVisaSession&) = delete;
    ScopedVisaSession& operator=(const ScopedVisaSession&) = delete;
    visa::ViSession* Put() { return &session; }
    visa::ViSession Get() const { return session; }

private:
    const VisaLink& link;
    visa::ViSession session = 0;
};

}  // namespace

void VisaInfo::ScanResources() {
    if (resourcesValid) return;
    resources.clear();
    ScopedVisaSession resourceManager(link);
    visa::ViStatus status = link.viOpenDefaultRM(resourceManager.Put());
    link.CheckVisaError(resourceManager.Get(), status, "viOpenDefaultRM");
    visa::ViFindList list = 0;
    visa::ViUInt32 count = 0;
    char description[visa::DescriptionSize] = {};
    status = link.viFindRsrc(resourceManager.Get(), "?*INSTR", &list, &count, description);
    // A machine with VISA but no instrument is a machine with no resources, not a failure.
    if (status == visa::ResourceNotFound) count = 0;
    else link.CheckVisaError(resourceManager.Get(), status, "viFindRsrc");
    while (count != 0) {
        description[sizeof description - 1] = '\0';
        resources.emplace_back(description);
        if (--count == 0) break;
        status = link.viFindNext(list, description);
        link.CheckVisaError(resourceManager.Get(), status, "viFindNext");
    }
    // Closing the resource manager also releases the find list.
    resourcesValid = true;
}

void VisaInfo::RefreshEntries() {
    std::int32_t generation = configuration.GetConfigurationLists();
    VisaLogicalNames logicalNames = configuration.VisaLogicalNames();
    if (generation > lastConfigGeneration || !resourcesValid) entriesValid = false;
    lastConfigGeneration = generation;
    if (entriesValid) return;
    entries.clear();
    ScanResources();
    entries = BuildVisaEntries(resources, logicalNames);
    entriesValid = true;
}

void VisaInfo::ListNames(std::string_view, std::uint32_t options, const StringVector& filters, StringVector& names) {
    RefreshEntries();
    names.clear();
    if (!filters.empty() && ExcludedBySpecificPrefix(filters, {})) return;
    AppendVisaNames(entries, options, names);
}

bool VisaInfo::FindEntry(std::string_view name, VisaEntry& found) {
    RefreshEntries();
    for (const VisaEntry& entry : entries) {
        if (!ContainsName(entry.names, name)) continue;
        found = entry;
        return true;
    }
    return false;
}

bool VisaInfo::ParseResource(std::string_view name, VisaEntry& found) {
    ScopedVisaSession resourceManager(link);
    visa::ViStatus status = link.viOpenDefaultRM(resourceManager.Put());
    link.CheckVisaError(resourceManager.Get(), status, "viOpenDefaultRM");
    visa::ViUInt16 interfaceType = 0, interfaceNumber = 0;
    DynamicString resource(name);
    if (link.viParseRsrc(resourceManager.Get(), resource.GetText(), &interfaceType, &interfaceNumber) != visa::Success)
        return false;
    entries.push_back(MakeResourceEntry(name));
    found = entries.back();
    return true;
}

bool VisaInfo::FindLogicalName(std::string_view name, VisaEntry& found) {
    configuration.GetConfigurationLists();
    for (const auto& [logicalName, value] : configuration.VisaLogicalNames())
        if (multibyte::Compare(logicalName.View(), name, true) == 0) return ParseResource(value.View(), found);
    return false;
}

void VisaInfo::AppendStateDescription(String& text) {
    RefreshEntries();
    AppendVisaStateDescription(entries, text);
}

}  // namespace sm
