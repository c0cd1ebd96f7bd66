// The switch product's automation engine, as this DLL uses it: the class to create and, for each
// interface, the methods called by their place in the vtable (after IUnknown and IDispatch). Places
// this DLL never calls are declared only to keep the later ones where they are.
#pragma once

#include <windows.h>
#include <oaidl.h>

#include "com/ComPtr.h"
#include "framework/String.h"

namespace sm {

// {21BADE02-6A6A-4768-B2ED-66FFDCC99396}
inline constexpr CLSID CLSID_RQEngine = {0x21BADE02, 0x6A6A, 0x4768, {0xB2, 0xED, 0x66, 0xFF, 0xDC, 0xC9, 0x93, 0x96}};
inline constexpr IID IID_RQEngine = {0x6102DD70, 0x63E8, 0x440E, {0x9D, 0xD8, 0x90, 0x4F, 0x07, 0x48, 0x96, 0x71}};
inline constexpr IID IID_RQVirtualDevice = {0x83FAAC57, 0x2F56, 0x4652, {0x86, 0x6D, 0xE4, 0x86, 0x52, 0x2C, 0x4F, 0x8D}};
inline constexpr IID IID_RQIviDevices = {0x781B9A43, 0xD04C, 0x450B, {0x86, 0x20, 0xF0, 0x87, 0x7E, 0x5F, 0xE3, 0x81}};
inline constexpr IID IID_RQRoutes = {0x06E7DF8E, 0x1EB1, 0x466E, {0xB9, 0xF7, 0x4D, 0x60, 0xAC, 0x03, 0x03, 0x1E}};
inline constexpr IID IID_RQRouteGroups = {0xB7C03984, 0x2BE3, 0x4ECC, {0x9F, 0x07, 0xA2, 0x23, 0x56, 0x3E, 0xBC, 0x38}};
inline constexpr IID IID_RQIviDevice = {0xC35D7D3B, 0x92E4, 0x416E, {0xA7, 0xE4, 0x7F, 0xFC, 0x28, 0x4A, 0x2D, 0x4F}};
inline constexpr IID IID_RQRoute = {0x2E09E4B8, 0x245E, 0x4EBC, {0x81, 0x7A, 0xF7, 0x08, 0x20, 0x74, 0x73, 0xB7}};
inline constexpr IID IID_RQRouteGroup = {0x91D5D9EF, 0xB044, 0x4527, {0x9D, 0x17, 0x75, 0xA9, 0x3C, 0xDB, 0xA2, 0x84}};

// An IVI device, route or route group: 1st method, its name.
struct RQNamedItem : IDispatch {
    virtual HRESULT STDMETHODCALLTYPE get_Name(BSTR* name) = 0;
};

// The IVI device, route and route group collections: 1st method, item by 1-based VT_INT index;
// 6th, the count.
struct RQCollection : IDispatch {
    virtual HRESULT STDMETHODCALLTYPE Item(VARIANT index, RQNamedItem** item) = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused2() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused3() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused4() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused5() = 0;
    virtual HRESULT STDMETHODCALLTYPE get_Count(LONG* count) = 0;
};

// A virtual device: 1st method, its name; 7th, its IVI devices; 12th, its routes; 13th, its route groups.
struct RQVirtualDevice : IDispatch {
    virtual HRESULT STDMETHODCALLTYPE get_Name(BSTR* name) = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused2() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused3() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused4() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused5() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused6() = 0;
    virtual HRESULT STDMETHODCALLTYPE get_IviDevices(RQCollection** devices) = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused8() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused9() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused10() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused11() = 0;
    virtual HRESULT STDMETHODCALLTYPE get_Routes(RQCollection** routes) = 0;
    virtual HRESULT STDMETHODCALLTYPE get_RouteGroups(RQCollection** groups) = 0;
};

// The engine: 1st method, virtual device by 1-based VT_INT index; 5th, the count.
struct RQEngine : IDispatch {
    virtual HRESULT STDMETHODCALLTYPE Item(VARIANT index, RQVirtualDevice** device) = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused2() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused3() = 0;
    virtual HRESULT STDMETHODCALLTYPE Unused4() = 0;
    virtual HRESULT STDMETHODCALLTYPE get_Count(LONG* count) = 0;
};

// The engine, created and running; null when it is not installed, cannot start or does not offer
// its interface (the caller then asks the library instead).
ComPtr<RQEngine> CreateRQEngine();

// The names the engine gives for the listing options (ReturnVirtualInstruments, ReturnRouteGroups,
// ReturnRoutes, ReturnLogicalNames) and the virtual devices named in filters, appended to names. A
// failing member raises ComError with its HRESULT, carrying the engine's error info for that interface.
void ListNamesByEngine(RQEngine& engine, std::uint32_t options, const StringVector& filters, StringVector& names);

}  // namespace sm
