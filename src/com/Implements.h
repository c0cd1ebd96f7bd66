// The base of every COM class of the DLL. A class names its interfaces once:
//
//     class CCustomInstrSession : public Implements<CCustomInstrSession, IInstrSession> { ... };
//
// and gets QueryInterface over that list (plus IUnknown, IDispatch for dual interfaces and
// ISupportErrorInfo), one atomic reference count, aggregation, the module lock, IDispatch forwarded
// to the module's type library, and Boundary(), the error boundary with the class's own CLSID.
// Derived supplies `static const CLSID& ClassId()`.
#pragma once

#include <oaidl.h>

#include <atomic>
#include <new>
#include <type_traits>

#include "com/ComError.h"
#include "com/ErrorBoundary.h"
#include "com/ModuleLock.h"
#include "com/TypeLibrary.h"

namespace sm {

namespace detail {
template <class First, class... Rest>
struct FirstOf {
    using type = First;
};

// The first interface of the list that derives from IDispatch (void when none does).
template <class... Interfaces>
struct FirstDual {
    using type = void;
};
template <class First, class... Rest>
struct FirstDual<First, Rest...> {
    using type = std::conditional_t<std::is_base_of_v<IDispatch, First>, First, typename FirstDual<Rest...>::type>;
};
}  // namespace detail

template <class Derived, class... Interfaces>
class Implements : public ISupportErrorInfo, public Interfaces... {
    using Primary = typename detail::FirstOf<Interfaces...>::type;
    using Dual = typename detail::FirstDual<Interfaces...>::type;

public:
    // Creates an instance; with an outer unknown the object is aggregated and only IUnknown may be
    // asked for, as COM requires.
    template <class... Args>
    static HRESULT CreateInstance(IUnknown* outer, REFIID interfaceId, void** result, Args&&... args) {
        if (!result) return E_POINTER;
        *result = nullptr;
        if (outer && !IsEqualIID(interfaceId, IID_IUnknown)) return CLASS_E_NOAGGREGATION;
        auto* object = new (std::nothrow) Derived(std::forward<Args>(args)...);
        if (!object) return E_OUTOFMEMORY;
        object->outerUnknown = outer;
        HRESULT queried = object->inner.QueryInterface(interfaceId, result);
        object->inner.Release();
        return queried;
    }

    // IUnknown of every interface: an aggregated object delegates to its outer object.
    STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
        return outerUnknown ? outerUnknown->QueryInterface(interfaceId, result) : InternalQueryInterface(interfaceId, result);
    }
    STDMETHODIMP_(ULONG) AddRef() override { return outerUnknown ? outerUnknown->AddRef() : InternalAddRef(); }
    STDMETHODIMP_(ULONG) Release() override { return outerUnknown ? outerUnknown->Release() : InternalRelease(); }

    STDMETHODIMP InterfaceSupportsErrorInfo(REFIID interfaceId) override {
        return IsEqualIID(interfaceId, __uuidof(Primary)) ? S_OK : S_FALSE;
    }

    // IDispatch, forwarded to the type library (used only when an interface of the list is dual).
    STDMETHODIMP GetTypeInfoCount(UINT* count) {
        if (!count) return E_POINTER;
        *count = 1;
        return S_OK;
    }
    STDMETHODIMP GetTypeInfo(UINT index, LCID, ITypeInfo** info) {
        if (!info) return E_POINTER;
        *info = nullptr;
        if (index != 0) return DISP_E_BADINDEX;
        return DispatchCall([&] {
            *info = GetModuleTypeInfo(__uuidof(Dual));
            (*info)->AddRef();
        });
    }
    STDMETHODIMP GetIDsOfNames(REFIID, LPOLESTR* names, UINT count, LCID, DISPID* ids) {
        return DispatchCall([&] { return GetModuleTypeInfo(__uuidof(Dual))->GetIDsOfNames(names, count, ids); });
    }
    STDMETHODIMP Invoke(DISPID member, REFIID, LCID, WORD flags, DISPPARAMS* parameters, VARIANT* result,
                        EXCEPINFO* exception, UINT* argumentError) {
        return DispatchCall([&] {
            return GetModuleTypeInfo(__uuidof(Dual))->Invoke(static_cast<Dual*>(this), member, flags, parameters,
                                                             result, exception, argumentError);
        });
    }

    // The object's own IUnknown (its identity), whether or not it is aggregated.
    IUnknown* Identity() { return static_cast<ISupportErrorInfo*>(this); }

protected:
    Implements() {
        if (Derived::CountsInModuleLock()) LockModule();
    }
    virtual ~Implements() {
        if (Derived::CountsInModuleLock()) UnlockModule();
    }
    // Classes with a different lifetime rule (a cached singleton) opt out and count themselves.
    static constexpr bool CountsInModuleLock() { return true; }

    // Runs an automation method body inside the error boundary with this class's CLSID.
    template <class Body>
    HRESULT Boundary(Body&& body) {
        return ComBoundary(Derived::ClassId(), std::forward<Body>(body));
    }

    virtual HRESULT InternalQueryInterface(REFIID interfaceId, void** result) {
        if (!result) return E_POINTER;
        *result = nullptr;
        if (IsEqualIID(interfaceId, IID_IUnknown)) {
            *result = outerUnknown ? static_cast<IUnknown*>(&inner) : Identity();
        } else if (IsEqualIID(interfaceId, IID_ISupportErrorInfo)) {
            *result = static_cast<ISupportErrorInfo*>(this);
        } else if constexpr (!std::is_void_v<Dual>) {
            if (IsEqualIID(interfaceId, IID_IDispatch)) *result = static_cast<Dual*>(this);
        }
        if (!*result) ((*result = MatchInterface<Interfaces>(interfaceId)) || ...);
        if (!*result) return E_NOINTERFACE;
        static_cast<IUnknown*>(*result)->AddRef();
        return S_OK;
    }
    virtual ULONG InternalAddRef() { return ++references; }
    virtual ULONG InternalRelease() {
        ULONG left = --references;
        if (left == 0) delete this;
        return left;
    }
    std::atomic<ULONG> references{1};

private:
    template <class Interface>
    void* MatchInterface(REFIID interfaceId) {
        return IsEqualIID(interfaceId, __uuidof(Interface)) ? static_cast<Interface*>(this) : nullptr;
    }

    // Type-library failures come back as plain HRESULTs: IDispatch callers expect no error info here.
    template <class Body>
    static HRESULT DispatchCall(Body&& body) noexcept {
        try {
            if constexpr (std::is_same_v<std::invoke_result_t<Body>, HRESULT>) {
                return body();
            } else {
                body();
                return S_OK;
            }
        } catch (const ComError& error) {
            return error.Error();
        } catch (...) {
            return E_UNEXPECTED;
        }
    }

    // The non-delegating IUnknown an outer object holds when this object is aggregated.
    struct InnerUnknown final : IUnknown {
        Implements* owner;
        explicit InnerUnknown(Implements* object) : owner(object) {}
        STDMETHODIMP QueryInterface(REFIID interfaceId, void** result) override {
            return owner->InternalQueryInterface(interfaceId, result);
        }
        STDMETHODIMP_(ULONG) AddRef() override { return owner->InternalAddRef(); }
        STDMETHODIMP_(ULONG) Release() override { return owner->InternalRelease(); }
    };
    InnerUnknown inner{this};
    IUnknown* outerUnknown = nullptr;
};

}  // namespace sm
