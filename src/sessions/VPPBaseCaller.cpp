#include "sessions/VPPBaseCaller.h"

#include "com/LoadFunctionPtr.h"

namespace sm {

void VPPBaseCaller::Bind(const DriverLibrary& library, std::string_view prefix) {
    if (boundModule) return;
    const std::string stem(prefix);
    errorQueryName = stem + "_error_query";
    errorMessageName = stem + "_error_message";
    resetName = stem + "_reset";
    selfTestName = stem + "_self_test";
    revisionQueryName = stem + "_revision_query";
    // Resolved into locals first: a driver that lacks one leaves no half-filled table behind.
    ErrorQueryFunction* query = nullptr;
    ErrorMessageFunction* message = nullptr;
    ResetFunction* reset = nullptr;
    SelfTestFunction* test = nullptr;
    RevisionQueryFunction* revision = nullptr;
    LoadFunctionPtr(query, library, errorQueryName.c_str());
    LoadFunctionPtr(message, library, errorMessageName.c_str());
    LoadFunctionPtr(reset, library, resetName.c_str());
    LoadFunctionPtr(test, library, selfTestName.c_str());
    LoadFunctionPtr(revision, library, revisionQueryName.c_str());
    errorQuery = query;
    errorMessage = message;
    resetFunction = reset;
    selfTest = test;
    revisionQuery = revision;
    boundModule = library.Handle();
}

void VPPBaseCaller::Unbind() {
    errorQuery = nullptr;
    errorMessage = nullptr;
    resetFunction = nullptr;
    selfTest = nullptr;
    revisionQuery = nullptr;
    boundModule = nullptr;
}

}  // namespace sm
