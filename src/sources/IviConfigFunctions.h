// The IVI configuration library's functions the session manager calls, as that library exports them.
#pragma once

#include <cstdint>

namespace sm {

struct IviConfigFunctions {
    using Handle = void*;
    using Status = std::int32_t;
    Status (*closeIniFile)(Handle, std::int32_t) = nullptr;
    Status (*openIniFile)(const char*, Handle*) = nullptr;
    Status (*configurationChanged)(Handle, unsigned char*) = nullptr;
    Status (*reloadConfiguration)(Handle) = nullptr;
    Status (*getNumberOfVIs)(Handle, std::int32_t*) = nullptr;
    Status (*getNthVI)(Handle, std::int32_t, const char**) = nullptr;
    Status (*getVIDriver)(Handle, const char*, char*, std::int32_t) = nullptr;
    Status (*getDriverPrefix)(Handle, const char*, char*, std::int32_t) = nullptr;
    Status (*getDriverModule)(Handle, const char*, char*, std::int32_t) = nullptr;
    Status (*getDriverClass)(Handle, const char*, char*, std::int32_t) = nullptr;
    Status (*getDriverClassCount)(Handle, const char*, std::int32_t*) = nullptr;
    Status (*getDriverClassByIndex)(Handle, const char*, std::int32_t, char*, std::int32_t) = nullptr;
    Status (*getNumberOfLogicalNames)(Handle, std::int32_t*) = nullptr;
    Status (*getNthLogicalName)(Handle, std::int32_t, const char**) = nullptr;
    Status (*getLogicalNameVI)(Handle, const char*, char*, std::int32_t) = nullptr;
};

}  // namespace sm
