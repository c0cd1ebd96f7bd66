// A C++ client of the registered SessionMgr DLL showing the switch category: the virtual devices,
// route groups and routes that the switch product offers (here its stand-ins with the bench of
// sim/simsetup.ini) and a switch session whose pointer-sized handle comes as a VT_UI8.
#include <cstdio>
#include <string>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

std::string Narrow(BSTR text) {
    int length = text ? static_cast<int>(::SysStringLen(text)) : 0;
    int bytes = ::WideCharToMultiByte(CP_ACP, 0, text, length, nullptr, 0, nullptr, nullptr);
    std::string narrow(static_cast<std::size_t>(bytes), '\0');
    ::WideCharToMultiByte(CP_ACP, 0, text, length, narrow.data(), bytes, nullptr, nullptr);
    return narrow;
}

UniqueBstr Wide(const wchar_t* text) { return UniqueBstr(::SysAllocString(text)); }

void PrintNames(IInstrSessionMgr* manager, const char* title, LONG options, const wchar_t* filter) {
    UniqueSafeArray names;
    HRESULT result = manager->GetNames(Wide(L"RQ").Get(), static_cast<GetNamesOptions>(options), Wide(filter).Get(),
                                       names.Put());
    std::printf("%-40s", title);
    LONG upper = -1;
    if (SUCCEEDED(result)) ::SafeArrayGetUBound(names.Get(), 1, &upper);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr name;
        ::SafeArrayGetElement(names.Get(), &index, name.Put());
        std::printf("%s%s", index ? ", " : "", Narrow(name.Get()).c_str());
    }
    std::printf(SUCCEEDED(result) ? "\n" : "failed: 0x%08lx\n", static_cast<unsigned long>(result));
}

std::string ErrorText() {
    ComPtr<IErrorInfo> info;
    UniqueBstr description;
    if (::GetErrorInfo(0, info.Put()) == S_OK && info) info->GetDescription(description.Put());
    return Narrow(description.Get());
}

}  // namespace

int main() {
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 1;
    int status = 1;
    {
        ComPtr<IInstrSessionMgr> manager;
        if (FAILED(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                      manager.PutVoid()))) {
            std::printf("SessionMgr is not registered\n");
            return 1;
        }
        std::printf("== Switch names ==\n");
        PrintNames(manager.Get(), "GetNames(\"RQ\") devices:", ReturnVirtualInstruments | IncludeCategoryPrefix, L"");
        PrintNames(manager.Get(), "route groups and routes of SwitchDev1:",
                   ReturnRouteGroups | ReturnRoutes | IncludeCategoryPrefix, L"SwitchDev1");

        std::printf("\n== A switch session ==\n");
        ComPtr<IInstrSession> session;
        UniqueVariant handle;
        VARIANT_BOOL initialized = VARIANT_FALSE;
        if (SUCCEEDED(manager->GetInstrSession(Wide(L"RQ::DmmToDut").Get(), VARIANT_FALSE, session.Put())) &&
            SUCCEEDED(session->GetHandleEx(DefaultInterface, handle.Get())) &&
            SUCCEEDED(session->IsInitialized(&initialized))) {
            std::printf("RQ::DmmToDut: GetHandleEx gives vt %d (VT_UI8 = %d), handle 0x%llx, initialized %s\n",
                        handle->vt, VT_UI8, static_cast<unsigned long long>(handle->ullVal),
                        initialized ? "true" : "false");
            session->Close();
            session->IsInitialized(&initialized);
            std::printf("after Close: initialized %s\n", initialized ? "true" : "false");
            status = 0;
        } else {
            std::printf("RQ::DmmToDut failed: %s\n", ErrorText().c_str());
        }
        ComPtr<IInstrSession> broken;
        if (SUCCEEDED(manager->GetInstrSession(Wide(L"RQ::BrokenRoute").Get(), VARIANT_FALSE, broken.Put()))) {
            HRESULT result = broken->Initialize(Wide(L"").Get());
            std::printf("RQ::BrokenRoute: Initialize gives %ld \"%s\"\n", static_cast<long>(result), ErrorText().c_str());
        }
    }
    ::CoUninitialize();
    std::printf("RQDemo finished\n");
    return status;
}
