#include "sources/VisaLibrary.h"

#include <windows.h>

#include <atomic>
#include <cstdio>
#include <cstring>

#include "com/LibraryBinding.h"
#include "com/UniqueHandles.h"

namespace sm::visa {
namespace {

// Calling conventions of the library: on x64 there is one, so the standard signatures are plain.
using OpenDefaultRMFunction = ViStatus(ViSession*);
using FindRsrcFunction = ViStatus(ViSession, const char*, ViFindList*, ViUInt32*, char*);
using FindNextFunction = ViStatus(ViFindList, char*);
using StatusDescFunction = ViStatus(ViSession, ViStatus, char*);
using OpenFunction = ViStatus(ViSession, const char*, ViUInt32, ViUInt32, ViSession*);
using CloseFunction = ViStatus(ViSession);
using ParseRsrcFunction = ViStatus(ViSession, const char*, ViUInt16*, ViUInt16*);

// Without every one of these the library is not a usable VISA library.
constexpr const char* requiredEntryPoints[] = {
    "viOpenDefaultRM", "viFindRsrc", "viFindNext", "viOpen", "viClose", "viSetAttribute", "viGetAttribute",
    "viStatusDesc", "viTerminate", "viLock", "viUnlock", "viEnableEvent", "viDisableEvent", "viDiscardEvents",
    "viWaitOnEvent", "viInstallHandler", "viUninstallHandler", "viRead", "viReadAsync", "viWrite",
    "viWriteAsync", "viAssertTrigger", "viReadSTB", "viClear", "viSetBuf", "viFlush", "viVPrintf", "viVScanf",
    "viVQueryf", "viIn8", "viOut8", "viIn16", "viOut16", "viIn32", "viOut32", "viMoveIn8", "viMoveOut8",
    "viMoveIn16", "viMoveOut16", "viMoveIn32", "viMoveOut32", "viMapAddress", "viUnmapAddress", "viPeek8",
    "viPoke8", "viPeek16", "viPoke16", "viPeek32", "viPoke32", "viMemAlloc", "viMemFree"};

struct Binding {
    std::atomic<bool> loaded{false};
    std::atomic<HANDLE> mutex{nullptr};
    HMODULE module = nullptr;
    OpenDefaultRMFunction* openDefaultRM = nullptr;
    FindRsrcFunction* findRsrc = nullptr;
    FindNextFunction* findNext = nullptr;
    StatusDescFunction* statusDesc = nullptr;
    OpenFunction* open = nullptr;
    CloseFunction* close = nullptr;
    ParseRsrcFunction* parseRsrc = nullptr;
};

// Process-wide and never destroyed: the library stays loaded until the process ends.
Binding& State() {
    static Binding binding;
    return binding;
}

// Owns the loading mutex between WaitForSingleObject and the release on every way out.
class MutexOwnership {
public:
    explicit MutexOwnership(HANDLE owned) : mutex(owned) {}
    ~MutexOwnership() { ::ReleaseMutex(mutex); }
    MutexOwnership(const MutexOwnership&) = delete;
    MutexOwnership& operator=(const MutexOwnership&) = delete;

private:
    HANDLE mutex;
};

// Takes the one loading mutex of the process, creating it on first use; null when it cannot be made.
HANDLE AcquireLoadingMutex(Binding& binding) {
    if (HANDLE stored = binding.mutex.load()) {
        ::WaitForSingleObject(stored, INFINITE);
        return stored;
    }
    char name[64];
    LoadingMutexName(name, ::GetCurrentProcessId());
    UniqueKernelHandle own(::CreateMutexA(nullptr, FALSE, name));
    if (!own) return nullptr;
    ::WaitForSingleObject(own.Get(), INFINITE);
    HANDLE expected = nullptr;
    if (binding.mutex.compare_exchange_strong(expected, own.Get())) return own.Release();
    // Another thread stored its handle meanwhile: use that one.
    ::ReleaseMutex(own.Get());
    own.Reset();
    ::WaitForSingleObject(expected, INFINITE);
    return expected;
}

ViStatus Load() {
    Binding& binding = State();
    HANDLE mutex = AcquireLoadingMutex(binding);
    if (!mutex) return SystemError;
    MutexOwnership ownership(mutex);
    if (binding.module) return Success;
    UniqueModule library(::LoadLibraryA("visa32.dll"));
    if (!library) return LibraryNotFound;
    for (const char* name : requiredEntryPoints)
        if (!::GetProcAddress(library.Get(), name)) return SystemError;
    binding.openDefaultRM = GetProcAddressAs<OpenDefaultRMFunction>(library.Get(), "viOpenDefaultRM");
    binding.findRsrc = GetProcAddressAs<FindRsrcFunction>(library.Get(), "viFindRsrc");
    binding.findNext = GetProcAddressAs<FindNextFunction>(library.Get(), "viFindNext");
    binding.statusDesc = GetProcAddressAs<StatusDescFunction>(library.Get(), "viStatusDesc");
    binding.open = GetProcAddressAs<OpenFunction>(library.Get(), "viOpen");
    binding.close = GetProcAddressAs<CloseFunction>(library.Get(), "viClose");
    binding.parseRsrc = GetProcAddressAs<ParseRsrcFunction>(library.Get(), "viParseRsrc");
    binding.module = library.Release();
    binding.loaded.store(true);
    return Success;
}

// Runs the loader when needed, then the entry point (or the status that stands in for it).
template <class Function, class... Args>
ViStatus Call(Function* Binding::*slot, Args... args) {
    Binding& binding = State();
    if (!binding.loaded.load()) {
        ViStatus loaded = Load();
        if (loaded < 0) return loaded;
    }
    Function* function = binding.*slot;
    return function ? function(args...) : EntryPointMissing;
}

struct StatusText {
    std::uint32_t status;
    const char* text;
};

constexpr StatusText builtInDescriptions[] = {
    {0x00000000, "Operation completed successfully."},
    {0xBFFF003C, "Insufficient system resources to perform necessary memory allocation."},
    {0xBFFF000E, "The given session or object reference is invalid."},
    {0xBFFF0000, "Unknown system error (miscellaneous error).  Possibly, unable to load visa32.dll."},
    {0xBFFF003A, "Some implementation-specific configuration file is corrupt or does not exist."},
    {0xBFFF009E, "A code library required by VISA could not be located or loaded."},
};

}  // namespace

void LoadingMutexName(char (&name)[64], std::uint32_t processId) {
    std::snprintf(name, sizeof name, "Quillvane Ledgerwin VISA Library %d", static_cast<int>(processId));
}

ViStatus OpenDefaultRM(ViSession* resourceManager) { return Call(&Binding::openDefaultRM, resourceManager); }

ViStatus FindRsrc(ViSession resourceManager, const char* expression, ViFindList* list, ViUInt32* count,
                  char (&description)[DescriptionSize]) {
    return Call(&Binding::findRsrc, resourceManager, expression, list, count, static_cast<char*>(description));
}

ViStatus FindNext(ViFindList list, char (&description)[DescriptionSize]) {
    return Call(&Binding::findNext, list, static_cast<char*>(description));
}

ViStatus Open(ViSession resourceManager, const char* resource, ViUInt32 accessMode, ViUInt32 openTimeout,
              ViSession* session) {
    return Call(&Binding::open, resourceManager, resource, accessMode, openTimeout, session);
}

ViStatus Close(ViSession object) { return Call(&Binding::close, object); }

ViStatus ParseRsrc(ViSession resourceManager, const char* resource, ViUInt16* interfaceType,
                   ViUInt16* interfaceNumber) {
    return Call(&Binding::parseRsrc, resourceManager, resource, interfaceType, interfaceNumber);
}

ViStatus StatusDesc(ViSession object, ViStatus status, char (&description)[DescriptionSize]) {
    Binding& binding = State();
    if (!binding.loaded.load()) Load();
    if (binding.loaded.load()) return binding.statusDesc(object, status, description);
    for (const StatusText& known : builtInDescriptions) {
        if (static_cast<ViStatus>(known.status) != status) continue;
        std::snprintf(description, DescriptionSize, "%s", known.text);
        return Success;
    }
    std::snprintf(description, DescriptionSize, "Unknown status value 0x%08lX",
                  static_cast<unsigned long>(static_cast<std::uint32_t>(status)));
    return UnknownStatus;
}

}  // namespace sm::visa
