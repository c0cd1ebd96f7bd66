// Owning interface pointer: one reference, released on destruction.
#pragma once

#include <unknwn.h>

#include <utility>

namespace sm {

template <class Interface>
class ComPtr {
public:
    ComPtr() = default;
    ComPtr(std::nullptr_t) {}
    // Adopts nothing: takes its own reference to pointer.
    explicit ComPtr(Interface* pointer) : raw(pointer) { if (raw) raw->AddRef(); }
    ComPtr(const ComPtr& other) : ComPtr(other.raw) {}
    ComPtr(ComPtr&& other) noexcept : raw(std::exchange(other.raw, nullptr)) {}
    ComPtr& operator=(ComPtr other) noexcept {
        std::swap(raw, other.raw);
        return *this;
    }
    ~ComPtr() { Reset(); }

    // Takes over a reference the caller already owns.
    static ComPtr Attach(Interface* pointer) {
        ComPtr owned;
        owned.raw = pointer;
        return owned;
    }
    Interface* Detach() { return std::exchange(raw, nullptr); }
    void Reset() {
        if (auto* old = std::exchange(raw, nullptr)) old->Release();
    }

    Interface* Get() const { return raw; }
    Interface* operator->() const { return raw; }
    explicit operator bool() const { return raw != nullptr; }
    // For out-parameters: releases what is held first.
    Interface** Put() {
        Reset();
        return &raw;
    }
    void** PutVoid() { return reinterpret_cast<void**>(Put()); }

    template <class Other>
    ComPtr<Other> As() const {
        ComPtr<Other> result;
        if (raw) raw->QueryInterface(__uuidof(Other), result.PutVoid());
        return result;
    }
    // Copies out with a new reference, as out-parameters of COM methods want.
    void CopyTo(Interface** target) const {
        if (raw) raw->AddRef();
        *target = raw;
    }

private:
    Interface* raw = nullptr;
};

}  // namespace sm
