// Native builds have no configuration file on disk: the lists are whatever Parse built last, which
// is how the tests of the document rules drive this source.
#include "sources/VxipnpInfo.h"

namespace sm {

std::int32_t VxipnpInfo::GetConfigurationLists() { return parsedGeneration; }

void VxipnpInfo::AppendStateDescription(String&) {}

}  // namespace sm
