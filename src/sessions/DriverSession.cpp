#include "sessions/DriverSession.h"

namespace sm {

DynamicString DriverStatusMessage(const char* pattern, std::string_view prefix, ViStatus status) {
    DynamicString message(pattern);
    message.ReplaceArg(1, prefix);
    message.ReplaceArg(2, static_cast<std::int64_t>(status), "%d");
    message.ReplaceArg(3, static_cast<std::int64_t>(static_cast<std::uint32_t>(status)), "%x");
    return message;
}

}  // namespace sm
