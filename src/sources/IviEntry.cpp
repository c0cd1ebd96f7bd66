#include "sources/IviEntry.h"

#include "framework/MultiByte.h"
#include "sources/SessionName.h"

namespace sm {

void SplitQualifier(std::string_view name, String& qualifier, String& rest) {
    std::size_t position = 0, length = 0;
    if (!FindCategorySeparator(name, &position, &length)) {
        qualifier.Empty();
        rest.Assign(name);
        return;
    }
    qualifier.Assign(name.substr(0, multibyte::ByteOffset(name, position)));
    rest.Assign(name.substr(multibyte::ByteOffset(name, position + length)));
}

bool FindEntry(const IviEntryList& entries, std::string_view name, std::size_t& index) {
    DynamicString qualifier, rest;
    SplitQualifier(name, qualifier, rest);
    for (std::size_t candidate = 0; candidate < entries.size(); ++candidate) {
        const IviEntry& entry = entries[candidate];
        if (!qualifier.IsEmpty() && entry.iviClass.Compare(qualifier.View(), true) != 0) continue;
        if (ContainsName(entry.names, rest.View())) {
            index = candidate;
            return true;
        }
    }
    return false;
}

Path MakeModulePath(std::string_view text) {
    std::string completed(text);
    bool driveLetter = completed.size() >= 2 && completed[1] == ':' &&
                       ((completed[0] >= 'A' && completed[0] <= 'Z') || (completed[0] >= 'a' && completed[0] <= 'z'));
    if (driveLetter && (completed.size() == 2 || completed[2] != '\\')) completed.insert(2, "\\");
    return Path(completed);
}

}  // namespace sm
