// One owning type per OS and automation resource, so class code never frees anything by hand.
#pragma once

#include <windows.h>
#include <oleauto.h>

#include <utility>

namespace sm {

// Generic owner of a handle value with a free function.
template <class Handle, auto Free, Handle Invalid = Handle{}>
class UniqueHandle {
public:
    UniqueHandle() = default;
    explicit UniqueHandle(Handle value) : handle(value) {}
    UniqueHandle(UniqueHandle&& other) noexcept : handle(std::exchange(other.handle, Invalid)) {}
    UniqueHandle& operator=(UniqueHandle&& other) noexcept {
        if (this != &other) Reset(std::exchange(other.handle, Invalid));
        return *this;
    }
    UniqueHandle(const UniqueHandle&) = delete;
    UniqueHandle& operator=(const UniqueHandle&) = delete;
    ~UniqueHandle() { Reset(); }

    Handle Get() const { return handle; }
    Handle Release() { return std::exchange(handle, Invalid); }
    void Reset(Handle value = Invalid) {
        Handle old = std::exchange(handle, value);
        if (old != Invalid) Free(old);
    }
    Handle* Put() {
        Reset();
        return &handle;
    }
    explicit operator bool() const { return handle != Invalid; }

private:
    Handle handle = Invalid;
};

inline void ReleaseModuleHandle(HMODULE module) { ::FreeLibrary(module); }
inline void CloseKernelHandle(HANDLE handle) { ::CloseHandle(handle); }
inline void CloseRegistryKey(HKEY key) { ::RegCloseKey(key); }
inline void DestroySafeArray(SAFEARRAY* array) { ::SafeArrayDestroy(array); }

using UniqueModule = UniqueHandle<HMODULE, ReleaseModuleHandle>;
using UniqueKernelHandle = UniqueHandle<HANDLE, CloseKernelHandle>;
using UniqueRegistryKey = UniqueHandle<HKEY, CloseRegistryKey>;
using UniqueBstr = UniqueHandle<BSTR, ::SysFreeString>;
using UniqueSafeArray = UniqueHandle<SAFEARRAY*, DestroySafeArray>;

// VARIANT that clears itself.
class UniqueVariant {
public:
    UniqueVariant() { ::VariantInit(&value); }
    UniqueVariant(const UniqueVariant&) = delete;
    UniqueVariant& operator=(const UniqueVariant&) = delete;
    UniqueVariant(UniqueVariant&& other) noexcept : value(other.value) { ::VariantInit(&other.value); }
    ~UniqueVariant() { ::VariantClear(&value); }
    VARIANT* operator&() { return &value; }
    VARIANT* Get() { return &value; }
    const VARIANT* Get() const { return &value; }
    VARIANT* operator->() { return &value; }
    // Hands the value to an out-parameter and forgets it.
    void Detach(VARIANT* target) {
        *target = value;
        ::VariantInit(&value);
    }

private:
    VARIANT value;
};

// EXCEPINFO that frees the strings IDispatch::Invoke filled in.
struct UniqueExcepInfo : EXCEPINFO {
    UniqueExcepInfo() : EXCEPINFO{} {}
    UniqueExcepInfo(const UniqueExcepInfo&) = delete;
    UniqueExcepInfo& operator=(const UniqueExcepInfo&) = delete;
    ~UniqueExcepInfo() {
        ::SysFreeString(bstrSource);
        ::SysFreeString(bstrDescription);
        ::SysFreeString(bstrHelpFile);
    }
};

// Recursive critical section with a scoped guard.
class CriticalSection {
public:
    CriticalSection() { ::InitializeCriticalSection(&section); }
    ~CriticalSection() { ::DeleteCriticalSection(&section); }
    CriticalSection(const CriticalSection&) = delete;
    CriticalSection& operator=(const CriticalSection&) = delete;
    void Lock() { ::EnterCriticalSection(&section); }
    void Unlock() { ::LeaveCriticalSection(&section); }
    bool TryLock() { return ::TryEnterCriticalSection(&section) != FALSE; }

private:
    CRITICAL_SECTION section;
};

class CriticalSectionGuard {
public:
    explicit CriticalSectionGuard(CriticalSection& guarded) : section(guarded) { section.Lock(); }
    ~CriticalSectionGuard() { section.Unlock(); }
    CriticalSectionGuard(const CriticalSectionGuard&) = delete;
    CriticalSectionGuard& operator=(const CriticalSectionGuard&) = delete;

private:
    CriticalSection& section;
};

}  // namespace sm
