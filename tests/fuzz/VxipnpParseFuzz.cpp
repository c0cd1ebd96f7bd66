// Configuration-file rules (docs/fuzzing.md). Input: mode byte, text.
#include <cstddef>
#include <cstdint>
#include <string>

#include "FuzzCheck.h"
#include "framework/MultiByte.h"
#include "framework/TEException.h"
#include "sources/VxipnpInfo.h"

using namespace sm;
using fuzz::Fail;

namespace {

constexpr const char* target = "VxipnpParseFuzz";
constexpr std::string_view vinstrPrefix = "VPPVInstr->";

std::size_t ItemCount(const IniObj& document, std::string_view section) {
    const SectionEntry* found = document.FindSection(section);
    return found ? found->items.size() : 0;
}

bool PointsAt(const VxipnpInfo& source, const NameEntry& logical, std::string_view instrument) {
    std::string section = std::string(vinstrPrefix) + std::string(instrument);
    for (const auto& [name, targetSection] : source.VxipnpLogicalNames())
        if (name.View() == logical.name.View() && multibyte::Compare(targetSection.View(), section, true) == 0) return true;
    return false;
}

void CheckInstrument(VxipnpInfo& source, const VxipnpVInstr& instrument) {
    std::string_view name = instrument.name.View();
    if (instrument.resource.IsEmpty()) Fail(target, "instrument without a resource", name);
    if (instrument.names.empty() || instrument.names[0].name.View() != name ||
        instrument.names[0].flags != VirtualInstrumentName)
        Fail(target, "instrument's own name is not first", name);
    for (std::size_t index = 1; index < instrument.names.size(); ++index) {
        const NameEntry& logical = instrument.names[index];
        if (logical.flags != LogicalName || !PointsAt(source, logical, name))
            Fail(target, "logical name that does not point at its instrument", logical.name.View());
    }
    VxipnpVInstr found;
    if (!source.FindVInstr(name, found)) Fail(target, "instrument not found by its name", name);
    if (!ContainsName(found.names, name)) Fail(target, "found an instrument that does not answer to the name", name);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    if (size == 0) return 0;
    fuzz::SelectCodePage(data[0]);
    IniObj document;
    document.ReadString(std::string_view(reinterpret_cast<const char*>(data + 1), size - 1));

    VxipnpInfo source;
    try {
        source.Parse(document);
    } catch (const TEException& refused) {
        if (refused.GetErrorCode() != TE_INVALID_OR_OUT_OF_RANGE && refused.GetErrorCode() != TE_INVALID_PATHNAME)
            Fail(target, "unexpected refusal", refused.GetDescription());
        return 0;
    }
    if (source.VxipnpLogicalNames().size() != ItemCount(document, "VXIPNP Logical Names") ||
        source.VisaLogicalNames().size() != ItemCount(document, "VISA Logical Names"))
        Fail(target, "logical name lists do not hold every item");
    std::size_t candidates = 0;
    for (const SectionEntry& section : document.GetSections())
        if (multibyte::BeginsWith(section.name, vinstrPrefix, true)) ++candidates;
    if (source.VirtualInstruments().size() > candidates) Fail(target, "more instruments than sections");
    for (const VxipnpVInstr& instrument : source.VirtualInstruments()) CheckInstrument(source, instrument);

    std::size_t first = source.VirtualInstruments().size();
    source.Parse(document);
    if (source.VirtualInstruments().size() != first) Fail(target, "a second parse differs");
    return 0;
}
