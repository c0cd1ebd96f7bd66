#include "sources/DriverPrefix.h"

#include <string>

#include "framework/MultiByte.h"

namespace sm {

namespace {
// Byte offset of needle in haystack ignoring case, or npos.
std::size_t FindNoCase(std::string_view haystack, std::string_view needle) {
    std::string lowered = multibyte::ToLower(haystack);
    return multibyte::FindBytes(lowered, multibyte::ToLower(needle), 0);
}

bool ContainsNoCase(std::string_view haystack, std::string_view needle) {
    return FindNoCase(haystack, needle) != std::string_view::npos;
}

bool Contains(std::string_view haystack, std::string_view needle) {
    return haystack.find(needle) != std::string_view::npos;
}
}  // namespace

bool DetectVxipnpPrefix(const StringVector& exportNames, String& prefix) {
    bool init = false, close = false, errorQuery = false, errorMessage = false, revisionQuery = false,
         selfTest = false, reset = false, ivi = false;
    for (const auto& exported : exportNames) {
        std::string_view name = exported.View();
        if (Contains(name, "_init")) {
            init = true;
        } else if (Contains(name, "_close")) {
            close = true;
        } else if (ContainsNoCase(name, "_error_query") || ContainsNoCase(name, "_errorquery")) {
            errorQuery = true;
        } else if (ContainsNoCase(name, "_error_message") || ContainsNoCase(name, "_errormessage")) {
            errorMessage = true;
        } else if (std::size_t at = FindNoCase(name, "_revision_query"); at != std::string_view::npos) {
            revisionQuery = true;
            prefix.Assign(name.substr(0, at));
        } else if (std::size_t at2 = FindNoCase(name, "_revisionquery"); at2 != std::string_view::npos) {
            revisionQuery = true;
            prefix.Assign(name.substr(0, at2));
        } else if (ContainsNoCase(name, "_self_test") || ContainsNoCase(name, "_selftest")) {
            selfTest = true;
        } else if (Contains(name, "_reset")) {
            reset = true;
        } else if (Contains(name, "_IviInit")) {
            ivi = true;
        }
    }
    return init && close && reset && errorMessage && errorQuery && revisionQuery && selfTest && !ivi;
}

}  // namespace sm
