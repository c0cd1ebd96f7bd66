// The process-wide binding to the VISA library "visa32.dll". The library is loaded on the first call
// of any entry point below, by bare name through the normal DLL search order, once per process
// (serialised by a named mutex), and stays loaded for the life of the process. It counts as usable only
// when it exports every entry point a VISA application may rely on; otherwise each call answers with
// a VISA status instead of calling, and StatusDesc still describes the common statuses from a table of
// its own, so a machine without VISA gets a readable message.
#pragma once

#include <cstddef>
#include <cstdint>

namespace sm::visa {

using ViStatus = std::int32_t;
using ViSession = std::uint32_t;
using ViFindList = std::uint32_t;
using ViUInt16 = std::uint16_t;
using ViUInt32 = std::uint32_t;

inline constexpr ViStatus Success = 0;
inline constexpr ViStatus SystemError = static_cast<ViStatus>(0xBFFF0000);
inline constexpr ViStatus ResourceNotFound = static_cast<ViStatus>(0xBFFF0011);
inline constexpr ViStatus EntryPointMissing = static_cast<ViStatus>(0xBFFF0081);
inline constexpr ViStatus LibraryNotFound = static_cast<ViStatus>(0xBFFF009E);
inline constexpr ViStatus UnknownStatus = static_cast<ViStatus>(0x3FFF0085);

// Description buffers of the VISA calls hold this many bytes.
inline constexpr std::size_t DescriptionSize = 256;

// The name of the mutex that serialises loading within one process.
void LoadingMutexName(char (&name)[64], std::uint32_t processId);

// The VISA entry points, called through the binding. Arguments and results are those of the
// functions of the same name without the "vi" prefix.
ViStatus OpenDefaultRM(ViSession* resourceManager);
ViStatus FindRsrc(ViSession resourceManager, const char* expression, ViFindList* list, ViUInt32* count,
                  char (&description)[DescriptionSize]);
ViStatus FindNext(ViFindList list, char (&description)[DescriptionSize]);
ViStatus Open(ViSession resourceManager, const char* resource, ViUInt32 accessMode, ViUInt32 openTimeout,
              ViSession* session);
ViStatus Close(ViSession object);
ViStatus ParseRsrc(ViSession resourceManager, const char* resource, ViUInt16* interfaceType,
                   ViUInt16* interfaceNumber);
// Without a usable library: the built-in text, or "Unknown status value 0x..." with UnknownStatus.
ViStatus StatusDesc(ViSession object, ViStatus status, char (&description)[DescriptionSize]);

}  // namespace sm::visa
