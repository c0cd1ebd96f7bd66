// Recognising a VXIplug&play driver by its export names, and its function prefix.
#pragma once

#include "framework/String.h"

namespace sm {

// True when the exports carry all seven standard functions (init, close, reset, error query,
// error message, revision query, self test) and no IVI init; prefix is then the part before
// "_revision_query" (or "_revisionquery") of the last such export.
bool DetectVxipnpPrefix(const StringVector& exportNames, String& prefix);

}  // namespace sm
