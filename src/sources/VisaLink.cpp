#include "sources/VisaLink.h"

#include "framework/TEException.h"

namespace sm {

void VisaLink::CheckVisaError(visa::ViSession session, visa::ViStatus status, std::string_view function) const {
    if (status == visa::Success) return;
    char description[visa::DescriptionSize] = {};
    viStatusDesc(session, status, description);
    description[visa::DescriptionSize - 1] = '\0';
    DynamicString message("%1 returned %2. Description: '%3'.");
    message.ReplaceArg(1, function);
    message.ReplaceArg(2, status, "%d");
    message.ReplaceArg(3, description);
    TE_RAISE(status, "VisaLink::CheckVisaError", RaiseDetails{.message = message.View(), .source = "visalink"});
}

}  // namespace sm
