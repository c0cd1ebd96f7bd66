// The VISA entry points one owner (the VISA source, each VISA session) calls, and the one check that
// turns a VISA status other than success into an error.
#pragma once

#include <string_view>

#include "sources/VisaLibrary.h"

namespace sm {

struct VisaLink {
    decltype(&visa::OpenDefaultRM) viOpenDefaultRM = &visa::OpenDefaultRM;
    decltype(&visa::FindRsrc) viFindRsrc = &visa::FindRsrc;
    decltype(&visa::FindNext) viFindNext = &visa::FindNext;
    decltype(&visa::StatusDesc) viStatusDesc = &visa::StatusDesc;
    decltype(&visa::Open) viOpen = &visa::Open;
    decltype(&visa::Close) viClose = &visa::Close;
    decltype(&visa::ParseRsrc) viParseRsrc = &visa::ParseRsrc;

    // Returns for VI_SUCCESS. Any other status, warnings included, raises with the status as the code
    // and "<function> returned <status>. Description: '<the library's description>'.".
    void CheckVisaError(visa::ViSession session, visa::ViStatus status, std::string_view function) const;
};

}  // namespace sm
