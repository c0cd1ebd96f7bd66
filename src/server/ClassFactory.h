// Class objects: the ordinary factory of the session classes and VPPBase, and the singleton factory
// that gives every caller in the process the same manager.
#pragma once

#include <unknwn.h>

#include "com/ComPtr.h"
#include "com/ModuleLock.h"
#include "com/UniqueHandles.h"

namespace sm {

// Reference counting shared by both factories. Class objects live in the object map until the
// process detaches; the map's own reference does not keep the DLL loaded, but every reference a
// client holds beyond it does, or the DLL could be unloaded under a client's factory.
class ClassFactoryBase : public IClassFactory {
public:
    virtual ~ClassFactoryBase() = default;
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        if (!result) return E_POINTER;
        *result = nullptr;
        if (!IsEqualIID(interfaceId, IID_IUnknown) && !IsEqualIID(interfaceId, IID_IClassFactory)) return E_NOINTERFACE;
        *result = static_cast<IClassFactory*>(this);
        AddRef();
        return S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override {
        ULONG count = ++references;
        if (count > 1) LockModule();
        return count;
    }
    STDMETHODIMP_(ULONG) Release() override {
        ULONG left = --references;
        if (left > 0) UnlockModule();
        if (left == 0) delete this;
        return left;
    }
    STDMETHODIMP LockServer(BOOL lock) override {
        if (lock)
            LockModule();
        else
            UnlockModule();
        return S_OK;
    }

private:
    std::atomic<ULONG> references{1};
};

template <class Object>
class ClassFactory final : public ClassFactoryBase {
public:
    STDMETHODIMP CreateInstance(IUnknown* outer, REFIID interfaceId, void** result) override {
        return Object::CreateInstance(outer, interfaceId, result);
    }
};

// One object per process, created at the first request; a failed creation is remembered and
// returned to every later request without a new attempt.
template <class Object>
class SingletonClassFactory final : public ClassFactoryBase {
public:
    ~SingletonClassFactory() override { instance.Reset(); }

    STDMETHODIMP CreateInstance(IUnknown* outer, REFIID interfaceId, void** result) override {
        if (!result) return E_POINTER;
        *result = nullptr;
        if (outer) return CLASS_E_NOAGGREGATION;
        if (!instance && SUCCEEDED(creationResult)) {
            CriticalSectionGuard guard(creationLock);
            if (!instance && SUCCEEDED(creationResult))
                creationResult = Object::CreateInstance(nullptr, IID_IUnknown, instance.PutVoid());
        }
        if (FAILED(creationResult)) return creationResult;
        return instance->QueryInterface(interfaceId, result);
    }

private:
    CriticalSection creationLock;
    ComPtr<IUnknown> instance;
    HRESULT creationResult = S_OK;
};

}  // namespace sm
