// Holder of a driver's bound VXIplug&play standard functions. Sessions of categories without such
// functions keep it empty.
#pragma once

#include <cstdint>

namespace sm {

class VPPBaseCaller {
public:
    virtual void PrepareVPPBase() {}
    virtual std::uint64_t GetVPPSession() { return 0; }
    virtual ~VPPBaseCaller() = default;
};

}  // namespace sm
