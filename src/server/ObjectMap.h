// The classes this module serves, in registration order, and their cached class objects.
#pragma once

#include <unknwn.h>

#include <atomic>
#include <span>

namespace sm {

struct ObjectMapEntry {
    const CLSID* classId;
    const char* className;           // "InstrSessionMgr": ProgIDs and registry names derive from it
    IClassFactory* (*createFactory)();
    std::atomic<IClassFactory*> cachedFactory;  // null until first requested
};

std::span<ObjectMapEntry> GetObjectMap();

}  // namespace sm
