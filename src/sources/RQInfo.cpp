#include "sources/RQInfo.h"

namespace sm {

void RQInfo::ListNames(std::string_view, std::uint32_t, const StringVector&, StringVector& names) { names.clear(); }

}  // namespace sm
