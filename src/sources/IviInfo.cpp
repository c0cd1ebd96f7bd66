#include "sources/IviInfo.h"

namespace sm {

void IviInfo::ListNames(std::string_view, std::uint32_t, const StringVector&, StringVector& names) { names.clear(); }

void IviInfo::ListCategories(std::string_view, StringVector& categories) { categories.clear(); }

bool IviInfo::FindEntry(std::string_view, IviEntry&) { return false; }

void IviInfo::AppendStateDescription(String&) {}

}  // namespace sm
