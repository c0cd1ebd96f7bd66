#include "sources/VisaInfo.h"

namespace sm {

void VisaInfo::ListNames(std::string_view, std::uint32_t, const StringVector&, StringVector& names) { names.clear(); }

bool VisaInfo::FindEntry(std::string_view, VisaEntry&) { return false; }

bool VisaInfo::ParseResource(std::string_view, VisaEntry&) { return false; }

bool VisaInfo::FindLogicalName(std::string_view, VisaEntry&) { return false; }

void VisaInfo::AppendStateDescription(String&) {}

}  // namespace sm
