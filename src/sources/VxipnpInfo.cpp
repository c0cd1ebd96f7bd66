#include "sources/VxipnpInfo.h"

namespace sm {

void VxipnpInfo::ListNames(std::string_view, std::uint32_t, const StringVector&, StringVector& names) { names.clear(); }

bool VxipnpInfo::FindVInstr(std::string_view, VxipnpVInstr&) { return false; }

void VxipnpInfo::AppendStateDescription(String&) {}

}  // namespace sm
