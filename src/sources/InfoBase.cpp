#include "sources/InfoBase.h"

#include "framework/MultiByte.h"

namespace sm {

bool InfoBase::ExcludedBySpecificPrefix(const StringVector& filters, std::string_view specificPrefix) const {
    if (filters.empty()) return false;
    constexpr std::string_view keyword = "SpecificPrefix";
    for (const auto& filter : filters) {
        std::size_t keywordChar = 0;
        if (!filter.Find(keyword, 0, true, &keywordChar)) continue;
        std::string_view text = filter.View();
        std::size_t offset = multibyte::ByteOffset(text, keywordChar) + keyword.size();
        if (offset >= text.size()) continue;
        std::size_t equals = multibyte::FindBytes(text, "=", offset);
        if (equals == std::string_view::npos) continue;
        DynamicString value(text.substr(equals + 1));
        value.Trim();
        if (value.Compare(specificPrefix, true) == 0) return false;
    }
    return true;
}

void InfoBase::ListCategories(std::string_view, StringVector& categories) { categories.clear(); }

StringVector SplitFilterList(std::string_view filter) {
    StringVector filters;
    std::size_t start = 0;
    while (start < filter.size()) {
        std::size_t comma = multibyte::FindBytes(filter, ",", start);
        std::size_t end = comma == std::string_view::npos ? filter.size() : comma;
        DynamicString piece(filter.substr(start, end - start));
        piece.Trim();
        filters.push_back(piece);
        if (comma == std::string_view::npos) break;
        start = comma + 1;
    }
    return filters;
}

}  // namespace sm
