// The IInstrSession methods every session class shares, written once. A session class derives as
//
//     class CCustomInstrSession : public InstrSession<CCustomInstrSession> { ... };
//
// and implements only the category methods (Initialize, IsInitialized, GetHandle, GetHandleEx,
// GetCOMDriver, Close, GetVPPBaseInterface) and its state header. Every method follows the same
// rules: outputs cleared first, objectLock held for the whole call (LockSession excepted), errors
// translated by the class's own error boundary.
#pragma once

#include <string>
#include <type_traits>

#include "com/BstrConversion.h"
#include "com/Implements.h"
#include "com/Interfaces.h"
#include "framework/LanguageStrings.h"
#include "sessions/SessionBase.h"
#include "sources/SessionName.h"

namespace sm {

// The class that declares a member function, from the type of a pointer to it.
template <class Member>
struct MemberClass;
template <class Class, class Result, class... Arguments>
struct MemberClass<Result (Class::*)(Arguments...) const> {
    using Type = Class;
};

inline VARIANT_BOOL ToVariantBool(bool value) { return value ? VARIANT_TRUE : VARIANT_FALSE; }

template <class Session>
class InstrSession : public Implements<Session, IInstrSession>, public SessionBase {
    using Base = Implements<Session, IInstrSession>;

public:
    STDMETHODIMP get_Name(BSTR* result) override {
        return Locked(result, [&] {
            DynamicString text;
            GetName(text);
            if (inExternalProcess) AddExternalPrefix(text);
            *result = AllocSysString(text);
        });
    }
    STDMETHODIMP put_Name(BSTR value) override {
        return Locked([&] {
            DynamicString text;
            Assign(text, value);
            SetName(text);
        });
    }
    STDMETHODIMP get_InExternalProcess(VARIANT_BOOL* result) override {
        return Locked(result, [&] { *result = ToVariantBool(inExternalProcess); });
    }
    STDMETHODIMP put_InExternalProcess(VARIANT_BOOL value) override {
        return Locked([&] { inExternalProcess = value != 0; });
    }
    STDMETHODIMP get_Category(BSTR* result) override {
        return Locked(result, [&] {
            DynamicString text;
            GetCategory(text);
            *result = AllocSysString(text);
        });
    }
    STDMETHODIMP put_Category(BSTR value) override {
        return Locked([&] {
            DynamicString text;
            Assign(text, value);
            SetCategory(text);
        });
    }
    STDMETHODIMP get_StateDescription(BSTR* result) override {
        return Locked(result, [&] {
            DynamicString text;
            static_cast<Session*>(this)->AppendStateHeader(text);
            AppendDataItemsDescription(text);
            *result = AllocSysString(text);
        });
    }
    STDMETHODIMP GenerateUniqueID(BSTR* result) override {
        return Locked(result, [&] {
            DynamicString id;
            SessionBase::GenerateUniqueID(id);
            *result = AllocSysString(id);
        });
    }
    STDMETHODIMP AttachObject(BSTR id, IUnknown* object, BSTR clsid, VARIANT_BOOL releaseOnClose) override {
        return Locked([&] { base_AttachObject(BstrToMultiByte(id), object, BstrToMultiByte(clsid), releaseOnClose != 0); });
    }
    STDMETHODIMP AttachLong(BSTR id, LONG value) override {
        return Locked([&] { base_AttachLong(BstrToMultiByte(id), value); });
    }
    STDMETHODIMP AttachString(BSTR id, BSTR value) override {
        return Locked([&] { base_AttachString(BstrToMultiByte(id), BstrToMultiByte(value)); });
    }
    STDMETHODIMP AttachLongPtr(BSTR id, VARIANT value) override {
        return Locked([&] { base_AttachLongPtr(BstrToMultiByte(id), value); });
    }
    STDMETHODIMP GetObject(BSTR id, IUnknown** result) override {
        return Locked(result, [&] { base_GetObject(BstrToMultiByte(id)).CopyTo(result); });
    }
    STDMETHODIMP GetLong(BSTR id, LONG* result) override {
        return Locked(result, [&] { *result = base_GetLong(BstrToMultiByte(id)); });
    }
    STDMETHODIMP GetString(BSTR id, BSTR* result) override {
        return Locked(result, [&] {
            DynamicString text;
            base_GetString(BstrToMultiByte(id), text);
            *result = AllocSysString(text);
        });
    }
    STDMETHODIMP GetLongPtr(BSTR id, VARIANT* result) override {
        return Locked(result, [&] { base_GetLongPtr(BstrToMultiByte(id), result); });
    }
    STDMETHODIMP DetachData(BSTR id) override {
        return Locked([&] { SessionBase::DetachData(BstrToMultiByte(id)); });
    }
    STDMETHODIMP get_CloseEnabled(VARIANT_BOOL* result) override {
        return Locked(result, [&] { *result = ToVariantBool(closeEnabled); });
    }
    STDMETHODIMP put_CloseEnabled(VARIANT_BOOL value) override {
        return Locked([&] { closeEnabled = value != 0; });
    }
    // Waits without objectLock so that the holder can unlock meanwhile.
    STDMETHODIMP LockSession(BSTR key, double timeout, LONG) override {
        return this->Boundary([&] { base_LockSession(BstrToMultiByte(key), timeout); });
    }
    STDMETHODIMP UnlockSession() override {
        return Locked([&] { base_UnlockSession(); });
    }
    STDMETHODIMP GetLockState(BSTR* ownerKey, LONG* nestingLevel) override {
        if (ownerKey) *ownerKey = nullptr;
        if (nestingLevel) *nestingLevel = 0;
        return Locked([&] {
            if (!ownerKey || !nestingLevel) TE_RAISE(TE_INVALID_POINTER, QualifiedName("GetLockState").c_str());
            DynamicString key;
            std::int32_t level = 0;
            SessionBase::GetLockState(key, level);
            *ownerKey = AllocSysString(key);
            *nestingLevel = level;
        });
    }
    STDMETHODIMP get_CloseFunction(LONG* result) override {
        return Locked(result, [&] { RaiseObsoleteCloseFunction(QualifiedName("get_CloseFunction").c_str()); });
    }
    STDMETHODIMP put_CloseFunction(LONG) override {
        return Locked([&] { RaiseObsoleteCloseFunction(QualifiedName("put_CloseFunction").c_str()); });
    }
    STDMETHODIMP get_CloseFunctionEx(VARIANT* result) override {
        return Locked(result, [&] {
            result->vt = VT_UI8;
            result->ullVal = closeFunction;
        });
    }
    STDMETHODIMP put_CloseFunctionEx(VARIANT value) override {
        return Locked([&] { closeFunction = Variant2Pointer(value); });
    }

    // The common state header: name, category, initialized, in or out of process.
    void AppendStateHeader(String& text) const {
        DynamicString value;
        text.Append("   Name: ");
        GetName(value);
        text.Append(value);
        text.Append(", Category: ");
        GetCategory(value);
        text.Append(value);
        text.Append("      Initialized: ").Append(initialized ? "True" : "False");
        text.Append(inExternalProcess ? ", Out of Process" : ", In Process");
        text.Append("\n");
    }

    IInstrSession* Self() { return static_cast<IInstrSession*>(this); }

    // The names are complete only when the class that decides HasName also lists them.
    bool ListNames(StringVector& names) const override {
        using HasNameClass = typename MemberClass<decltype(&Session::HasName)>::Type;
        using AppendNamesClass = typename MemberClass<decltype(&Session::AppendNames)>::Type;
        if constexpr (!std::is_same_v<HasNameClass, AppendNamesClass>) {
            return false;
        } else {
            static_cast<const Session*>(this)->AppendNames(names);
            return true;
        }
    }

    // "CCustomInstrSession::Close": how raise sites of a session class name themselves.
    static std::string QualifiedName(const char* method) { return std::string(Session::ClassName()) + "::" + method; }

protected:
    // Clears one out-parameter, then runs the body under objectLock inside the error boundary.
    template <class Output, class Body>
    HRESULT Locked(Output* output, Body&& body) {
        if (!output) return E_POINTER;
        Clear(output);
        return Locked(std::forward<Body>(body));
    }
    template <class Body>
    HRESULT Locked(Body&& body) {
        return this->Boundary([&] {
            SessionCall call(*this);
            return body();
        });
    }

public:
    // The close work of the final release, run while the object is still whole. The close
    // function and release-on-close objects run even when Close was never called or was
    // disabled. A session class with more to close (a driver, a library) hides this with its own
    // FinalClose, safe to run twice.
    void FinalClose() {
        SessionCall call(*this);
        closeEnabled = true;
        RunCloseActions(Self());
    }

protected:
    // Final release: a session that belongs to a manager leaves its table under the manager's
    // lock, so FindExistingSession can never hand out an object that is going away. The close
    // work then runs with the count pinned far from zero: a close function or a release-on-close
    // object that takes and drops a reference to the session must not start a second release.
    ULONG InternalRelease() override {
        // A release that leaves other references behind cannot be the final one and needs no table
        // lock; only a release that finds the count at 1 goes on below, and it takes the lock.
        for (ULONG current = this->references.load(); current > 1;)
            if (this->references.compare_exchange_weak(current, current - 1)) return current - 1;
        ULONG left = 0;
        if (SessionOwner* tableOwner = Owner()) {
            tableOwner->LockTable();
            if (this->references.load() == 1) tableOwner->RemoveSession(*this);
            left = --this->references;
            tableOwner->UnlockTable();
        } else {
            left = --this->references;
        }
        if (left != 0) return left;
        this->references = pinnedReferences;
        static_cast<Session*>(this)->FinalClose();
        delete this;
        return 0;
    }
    static constexpr ULONG pinnedReferences = 0x40000000;

private:
    static void Clear(BSTR* output) { *output = nullptr; }
    static void Clear(IUnknown** output) { *output = nullptr; }
    static void Clear(VARIANT_BOOL* output) { *output = VARIANT_FALSE; }
    static void Clear(LONG* output) { *output = 0; }
    static void Clear(VARIANT* output) { ::VariantInit(output); }
    [[noreturn]] static void RaiseObsoleteCloseFunction(const char* function) {
        TE_RAISE(TE_INVALID_POINTER, function,
                 GetLanguageString("ERRORS", "ERROR_32_BIT_POINTER_WITH_64_BIT_PLATFORM"));
    }
};

}  // namespace sm
