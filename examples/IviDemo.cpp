// A C++ client of the registered SessionMgr DLL showing IVI: the classes and names of the IVI
// configuration store, and one session opened by its logical name through the IVI class driver,
// with its class, specific and I/O handles. ./scripts/demo.sh runs it over the bench
// sim/simsetup.ini (named by SM_SIM_SETUP, which the stand-ins read).
#include <cstdio>
#include <string>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {

std::string Narrow(BSTR text) {
    if (!text || !*text) return {};
    int length = ::SysStringLen(text);
    int bytes = ::WideCharToMultiByte(CP_ACP, 0, text, length, nullptr, 0, nullptr, nullptr);
    std::string narrow(static_cast<std::size_t>(bytes), '\0');
    ::WideCharToMultiByte(CP_ACP, 0, text, length, narrow.data(), bytes, nullptr, nullptr);
    return narrow;
}

bool Check(HRESULT result, const char* what) {
    if (SUCCEEDED(result)) return true;
    std::string description = "(no error info)";
    ComPtr<IErrorInfo> info;
    if (::GetErrorInfo(0, info.Put()) == S_OK && info) {
        UniqueBstr text;
        info->GetDescription(text.Put());
        description = Narrow(text.Get());
    }
    std::printf("%s failed: 0x%08lX %s\n", what, static_cast<unsigned long>(result), description.c_str());
    return false;
}

std::string Joined(SAFEARRAY* array) {
    std::string text;
    LONG upper = -1;
    ::SafeArrayGetUBound(array, 1, &upper);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr element;
        ::SafeArrayGetElement(array, &index, element.Put());
        text += (index ? ", " : "") + Narrow(element.Get());
    }
    return text;
}

bool Run(IInstrSessionMgr* manager) {
    UniqueBstr ivi(::SysAllocString(L"IVI")), noFilter(::SysAllocString(L"")), name(::SysAllocString(L"IVI::MyDmm"));
    UniqueSafeArray categories, names, prefixed;
    auto both = static_cast<GetNamesOptions>(ReturnLogicalNames | ReturnVirtualInstruments);
    if (!Check(manager->GetCategories(ivi.Get(), categories.Put()), "GetCategories") ||
        !Check(manager->GetNames(ivi.Get(), both, noFilter.Get(), names.Put()), "GetNames") ||
        !Check(manager->GetNames(ivi.Get(), static_cast<GetNamesOptions>(both | IncludeCategoryPrefix), noFilter.Get(),
                                 prefixed.Put()),
               "GetNames"))
        return false;
    std::printf("GetCategories(\"IVI\"):               %s\n", Joined(categories.Get()).c_str());
    std::printf("GetNames(\"IVI\", logical + virtual): %s\n", Joined(names.Get()).c_str());
    std::printf("  with class and category prefix:  %s\n", Joined(prefixed.Get()).c_str());

    ComPtr<IInstrSession> session;
    if (!Check(manager->GetInstrSession(name.Get(), VARIANT_FALSE, session.Put()), "GetInstrSession")) return false;
    UniqueBstr category;
    session->get_Category(category.Put());
    std::printf("GetInstrSession(\"IVI::MyDmm\"): category %s\n", Narrow(category.Get()).c_str());
    const struct {
        InterfaceLevel level;
        const char* what;
    } levels[] = {{ClassDriver, "class driver handle   "}, {SpecificDriver, "specific driver handle"}, {IODriver, "I/O session           "}};
    for (const auto& [level, what] : levels) {
        LONG handle = 0;
        if (!Check(session->GetHandle(level, &handle), what)) return false;
        std::printf("  %s 0x%lX\n", what, static_cast<unsigned long>(handle));
    }
    UniqueBstr state;
    session->get_StateDescription(state.Put());
    std::printf("%s", Narrow(state.Get()).c_str());
    return SUCCEEDED(session->Close());
}

}  // namespace

int main() {
    if (FAILED(::CoInitializeEx(nullptr, COINIT_MULTITHREADED))) return 1;
    bool ok = false;
    {
        ComPtr<IInstrSessionMgr> manager;
        if (Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                     manager.PutVoid()),
                  "CoCreateInstance"))
            ok = Run(manager.Get());
    }
    ::CoUninitialize();
    if (ok) std::printf("IviDemo finished\n");
    return ok ? 0 : 1;
}
