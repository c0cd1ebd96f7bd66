// The shared external-process server: a local COM server that creates objects in its own process.
// Its interface, IExternalProcessServer, comes from the type library so that it marshals; the
// manager uses only its CreateObjectInServer method.
#pragma once

#include "com/Interfaces.h"

namespace sm {

// {B4D1E6F2-7A39-4C85-9E1B-3F60C2A8D7E5}
inline constexpr CLSID CLSID_ExternalProcessServer = {
    0xB4D1E6F2, 0x7A39, 0x4C85, {0x9E, 0x1B, 0x3F, 0x60, 0xC2, 0xA8, 0xD7, 0xE5}};

}  // namespace sm
