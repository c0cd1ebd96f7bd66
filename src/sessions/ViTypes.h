// The scalar types of the VXIplug&play and IVI-C driver interfaces, as drivers built for 64-bit
// Windows pass them: statuses are 32-bit signed (negative means failure, positive a warning), a
// session is a 32-bit handle, booleans are 16-bit and pass 0 or 1.
#pragma once

#include <cstdint>

namespace sm {

using ViStatus = std::int32_t;
using ViSession = std::uint32_t;
using ViInt16 = std::int16_t;
using ViInt32 = std::int32_t;
using ViBoolean = std::uint16_t;
using ViRsrc = char*;
using ViConstRsrc = const char*;

constexpr ViBoolean ToViBoolean(bool value) { return value ? 1 : 0; }

}  // namespace sm
