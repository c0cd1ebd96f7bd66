// The host product's shared external-process server: a local COM server that creates objects in
// its own process. Only its CreateObjectInServer method is used.
#pragma once

#include <oaidl.h>

namespace sm {

// {B4D1E6F2-7A39-4C85-9E1B-3F60C2A8D7E5}
inline constexpr CLSID CLSID_ExternalProcessServer = {
    0xB4D1E6F2, 0x7A39, 0x4C85, {0x9E, 0x1B, 0x3F, 0x60, 0xC2, 0xA8, 0xD7, 0xE5}};
// {6E3F0A91-C27D-4B58-A4E6-D81B59F3027C}
inline constexpr IID IID_IExternalProcessServer = {
    0x6E3F0A91, 0xC27D, 0x4B58, {0xA4, 0xE6, 0xD8, 0x1B, 0x59, 0xF3, 0x02, 0x7C}};

struct IExternalProcessServer : public IDispatch {
    // Creates, in the server's process, an object of the class named by clsidText (registry form)
    // and returns its interface named by iidText.
    virtual HRESULT STDMETHODCALLTYPE CreateObjectInServer(BSTR clsidText, BSTR iidText, IUnknown** object) = 0;
};

}  // namespace sm
