// Stand-in for the switch product's automation engine: an in-process COM server whose objects are
// built from the [RQ <device>] sections of the simulated setup file each time the engine is created.
// The [RQ] keys EngineFailure / EngineFailureResult make one member fail with error info that names
// its interface, as the real engine reports errors.
#include <windows.h>
#include <ole2.h>
#include <olectl.h>

#include <atomic>
#include <memory>
#include <string>
#include <vector>

#include "RQEngine.h"
#include "SimSetup.h"

namespace {

std::atomic<long> liveObjects{0};
std::atomic<long> serverLocks{0};
HMODULE selfModule = nullptr;

struct Device {
    std::string name;
    std::string description;
    std::vector<std::string> iviDevices;
    std::vector<std::string> routes;
    std::vector<std::string> routeGroups;
};
using Devices = std::shared_ptr<const std::vector<Device>>;

Devices ReadDevices() {
    auto devices = std::make_shared<std::vector<Device>>();
    sim::Setup setup = sim::Setup::Current();
    for (const std::string& object : setup.Objects("RQ")) {
        if (object.empty()) continue;
        Device device{object, setup.Get("RQ", object, "Description"), sim::SplitList(setup.Get("RQ", object, "IviDevices")),
                      sim::SplitList(setup.Get("RQ", object, "Routes")),
                      sim::SplitList(setup.Get("RQ", object, "RouteGroups"))};
        devices->push_back(std::move(device));
    }
    return devices;
}

BSTR ToBstr(const std::string& text) {
    int length = ::MultiByteToWideChar(CP_ACP, 0, text.data(), static_cast<int>(text.size()), nullptr, 0);
    BSTR result = ::SysAllocStringLen(nullptr, static_cast<UINT>(length));
    if (result) ::MultiByteToWideChar(CP_ACP, 0, text.data(), static_cast<int>(text.size()), result, length);
    return result;
}

std::string FromBstr(BSTR text) {
    if (!text) return {};
    int length = ::WideCharToMultiByte(CP_ACP, 0, text, static_cast<int>(::SysStringLen(text)), nullptr, 0, nullptr, nullptr);
    std::string result(static_cast<std::size_t>(length), '\0');
    ::WideCharToMultiByte(CP_ACP, 0, text, static_cast<int>(::SysStringLen(text)), result.data(), length, nullptr, nullptr);
    return result;
}

std::string JoinNames(const std::vector<std::string>& names) {
    std::string joined;
    for (const std::string& name : names) joined += (joined.empty() ? "" : ", ") + name;
    return joined;
}

long FindName(const std::vector<std::string>& names, BSTR wanted) {
    std::string text = FromBstr(wanted);
    for (std::size_t i = 0; i < names.size(); ++i)
        if (sim::EqualNoCase(names[i], text)) return static_cast<long>(i) + 1;
    return 0;
}

// The configured failure of `member` ("Routes.Count"), reported the way automation servers do.
HRESULT Failure(const char* member, REFIID iid) {
    sim::Setup setup = sim::Setup::Current();
    if (!sim::EqualNoCase(setup.Get("RQ", "", "EngineFailure"), member)) return S_OK;
    HRESULT result = static_cast<HRESULT>(sim::ParseNumber(setup.Get("RQ", "", "EngineFailureResult"), E_FAIL));
    ICreateErrorInfo* creator = nullptr;
    if (SUCCEEDED(::CreateErrorInfo(&creator))) {
        creator->SetGUID(iid);
        BSTR description = ToBstr(std::string("Simulated failure of ") + member + ".");
        creator->SetDescription(description);
        ::SysFreeString(description);
        IErrorInfo* info = nullptr;
        if (SUCCEEDED(creator->QueryInterface(IID_IErrorInfo, reinterpret_cast<void**>(&info)))) {
            ::SetErrorInfo(0, info);
            info->Release();
        }
        creator->Release();
    }
    return FAILED(result) ? result : E_FAIL;
}

// A 1-based index of type VT_INT (other integer types are accepted too, as automation clients pass them).
bool IndexFrom(const VARIANT& index, std::size_t count, std::size_t& position) {
    VARIANT converted;
    ::VariantInit(&converted);
    if (FAILED(::VariantChangeType(&converted, const_cast<VARIANT*>(&index), 0, VT_I4))) return false;
    if (converted.lVal < 1 || static_cast<std::size_t>(converted.lVal) > count) return false;
    position = static_cast<std::size_t>(converted.lVal) - 1;
    return true;
}

ITypeInfo* TypeInfoOf(REFIID iid) {
    wchar_t path[MAX_PATH] = {};
    ::GetModuleFileNameW(selfModule, path, MAX_PATH);
    ITypeLib* library = nullptr;
    if (FAILED(::LoadTypeLibEx(path, REGKIND_NONE, &library))) return nullptr;
    ITypeInfo* info = nullptr;
    library->GetTypeInfoOfGuid(iid, &info);
    library->Release();
    return info;
}

// IUnknown, IDispatch (through the embedded type library) and ISupportErrorInfo for one interface.
template <class Interface>
class Automation : public Interface, public ISupportErrorInfo {
public:
    Automation() { ++liveObjects; sim::Count("EngineObjectsCreated"); }
    virtual ~Automation() { --liveObjects; sim::Count("EngineObjectsDestroyed"); }

    STDMETHODIMP QueryInterface(REFIID iid, void** object) override {
        if (!object) return E_POINTER;
        if (iid == IID_IUnknown || iid == IID_IDispatch || iid == __uuidof(Interface)) {
            *object = static_cast<Interface*>(this);
        } else if (iid == IID_ISupportErrorInfo) {
            *object = static_cast<ISupportErrorInfo*>(this);
        } else {
            *object = nullptr;
            return E_NOINTERFACE;
        }
        AddRef();
        return S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return ++references; }
    STDMETHODIMP_(ULONG) Release() override {
        ULONG left = --references;
        if (left == 0) delete this;
        return left;
    }
    STDMETHODIMP GetTypeInfoCount(UINT* count) override {
        if (!count) return E_POINTER;
        *count = 1;
        return S_OK;
    }
    STDMETHODIMP GetTypeInfo(UINT index, LCID, ITypeInfo** info) override {
        if (!info) return E_POINTER;
        *info = index == 0 ? Info() : nullptr;
        if (!*info) return index == 0 ? TYPE_E_ELEMENTNOTFOUND : DISP_E_BADINDEX;
        (*info)->AddRef();
        return S_OK;
    }
    STDMETHODIMP GetIDsOfNames(REFIID, LPOLESTR* names, UINT count, LCID, DISPID* ids) override {
        return Info() ? ::DispGetIDsOfNames(Info(), names, count, ids) : TYPE_E_ELEMENTNOTFOUND;
    }
    STDMETHODIMP Invoke(DISPID id, REFIID, LCID, WORD flags, DISPPARAMS* parameters, VARIANT* result,
                        EXCEPINFO* exception, UINT* argumentError) override {
        if (!Info()) return TYPE_E_ELEMENTNOTFOUND;
        return ::DispInvoke(static_cast<Interface*>(this), Info(), id, flags, parameters, result, exception,
                            argumentError);
    }
    STDMETHODIMP InterfaceSupportsErrorInfo(REFIID iid) override {
        return iid == __uuidof(Interface) ? S_OK : S_FALSE;
    }

protected:
    HRESULT Fail(const char* member) { return Failure(member, __uuidof(Interface)); }
    // Read once per interface from the type library embedded in this DLL, and kept for the process.
    static ITypeInfo* Info() {
        static ITypeInfo* const info = TypeInfoOf(__uuidof(Interface));
        return info;
    }

private:
    std::atomic<ULONG> references{1};
};

template <class Interface>
class NamedItem : public Automation<Interface> {
public:
    NamedItem(const char* itemKind, std::string itemName, std::string itemDescription)
        : kind(itemKind), name(std::move(itemName)), description(std::move(itemDescription)) {}
    STDMETHODIMP get_Name(BSTR* result) override {
        if (!result) return E_POINTER;
        *result = nullptr;
        if (HRESULT failed = this->Fail((kind + ".Name").c_str()); FAILED(failed)) return failed;
        *result = ToBstr(name);
        return S_OK;
    }
    STDMETHODIMP get_Description(BSTR* result) override {
        if (!result) return E_POINTER;
        *result = ToBstr(description);
        return S_OK;
    }

private:
    std::string kind;
    std::string name;
    std::string description;
};

template <class Interface, class ItemInterface>
class Collection : public Automation<Interface> {
public:
    Collection(const char* collectionKind, const char* itemsKind, IRqVirtualDevice* device,
               std::vector<std::string> itemNames)
        : kind(collectionKind), itemKind(itemsKind), parent(device), names(std::move(itemNames)) {
        parent->AddRef();
    }
    ~Collection() override { parent->Release(); }

    STDMETHODIMP Item(VARIANT index, ItemInterface** item) override {
        if (!item) return E_POINTER;
        *item = nullptr;
        if (HRESULT failed = this->Fail((kind + ".Item").c_str()); FAILED(failed)) return failed;
        std::size_t position = 0;
        if (!IndexFrom(index, names.size(), position)) return DISP_E_BADINDEX;
        *item = new NamedItem<ItemInterface>(itemKind.c_str(), names[position], kind + " item");
        return S_OK;
    }
    STDMETHODIMP Exists(BSTR name, VARIANT_BOOL* exists) override {
        if (!exists) return E_POINTER;
        *exists = FindName(names, name) ? VARIANT_TRUE : VARIANT_FALSE;
        return S_OK;
    }
    STDMETHODIMP IndexOf(BSTR name, long* index) override {
        if (!index) return E_POINTER;
        *index = FindName(names, name);
        return S_OK;
    }
    STDMETHODIMP get_Names(BSTR* result) override {
        if (!result) return E_POINTER;
        *result = ToBstr(JoinNames(names));
        return S_OK;
    }
    STDMETHODIMP get_Parent(IRqVirtualDevice** result) override {
        if (!result) return E_POINTER;
        parent->AddRef();
        *result = parent;
        return S_OK;
    }
    STDMETHODIMP get_Count(long* count) override {
        if (!count) return E_POINTER;
        *count = 0;
        if (HRESULT failed = this->Fail((kind + ".Count").c_str()); FAILED(failed)) return failed;
        *count = static_cast<long>(names.size());
        return S_OK;
    }

private:
    std::string kind;
    std::string itemKind;
    IRqVirtualDevice* parent;
    std::vector<std::string> names;
};

class VirtualDevice : public Automation<IRqVirtualDevice> {
public:
    VirtualDevice(Devices all, std::size_t position) : devices(std::move(all)), device((*devices)[position]) {}

    STDMETHODIMP get_Name(BSTR* result) override {
        if (!result) return E_POINTER;
        *result = nullptr;
        if (HRESULT failed = Fail("VirtualDevice.Name"); FAILED(failed)) return failed;
        *result = ToBstr(device.name);
        return S_OK;
    }
    STDMETHODIMP get_Description(BSTR* result) override { return Text(device.description, result); }
    STDMETHODIMP get_IviDeviceCount(long* count) override { return Size(device.iviDevices, count); }
    STDMETHODIMP get_RouteCount(long* count) override { return Size(device.routes, count); }
    STDMETHODIMP get_RouteGroupCount(long* count) override { return Size(device.routeGroups, count); }
    STDMETHODIMP HasRoute(BSTR name, VARIANT_BOOL* found) override { return Has(device.routes, name, found); }
    STDMETHODIMP HasRouteGroup(BSTR name, VARIANT_BOOL* found) override { return Has(device.routeGroups, name, found); }
    STDMETHODIMP HasIviDevice(BSTR name, VARIANT_BOOL* found) override { return Has(device.iviDevices, name, found); }
    STDMETHODIMP get_RouteNames(BSTR* result) override { return Text(JoinNames(device.routes), result); }
    STDMETHODIMP get_RouteGroupNames(BSTR* result) override { return Text(JoinNames(device.routeGroups), result); }
    STDMETHODIMP get_IviDevices(IRqIviDevices** result) override {
        return Make<Collection<IRqIviDevices, IRqIviDevice>>("IviDevices", "IviDevice", device.iviDevices, result);
    }
    STDMETHODIMP get_Routes(IRqRoutes** result) override {
        return Make<Collection<IRqRoutes, IRqRoute>>("Routes", "Route", device.routes, result);
    }
    STDMETHODIMP get_RouteGroups(IRqRouteGroups** result) override {
        return Make<Collection<IRqRouteGroups, IRqRouteGroup>>("RouteGroups", "RouteGroup", device.routeGroups, result);
    }

private:
    static HRESULT Text(const std::string& text, BSTR* result) {
        if (!result) return E_POINTER;
        *result = ToBstr(text);
        return S_OK;
    }
    static HRESULT Size(const std::vector<std::string>& names, long* count) {
        if (!count) return E_POINTER;
        *count = static_cast<long>(names.size());
        return S_OK;
    }
    static HRESULT Has(const std::vector<std::string>& names, BSTR name, VARIANT_BOOL* found) {
        if (!found) return E_POINTER;
        *found = FindName(names, name) ? VARIANT_TRUE : VARIANT_FALSE;
        return S_OK;
    }
    template <class Made, class Interface>
    HRESULT Make(const char* kind, const char* itemKind, const std::vector<std::string>& names, Interface** result) {
        if (!result) return E_POINTER;
        *result = nullptr;
        if (HRESULT failed = Fail((std::string("VirtualDevice.") + kind).c_str()); FAILED(failed)) return failed;
        *result = new Made(kind, itemKind, this, names);
        return S_OK;
    }

    Devices devices;
    const Device& device;
};

class Engine : public Automation<IRqEngine> {
public:
    Engine() : devices(ReadDevices()) {}

    STDMETHODIMP Item(VARIANT index, IRqVirtualDevice** device) override {
        if (!device) return E_POINTER;
        *device = nullptr;
        if (HRESULT failed = Fail("Engine.Item"); FAILED(failed)) return failed;
        std::size_t position = 0;
        if (!IndexFrom(index, devices->size(), position)) return DISP_E_BADINDEX;
        *device = new VirtualDevice(devices, position);
        return S_OK;
    }
    STDMETHODIMP Exists(BSTR name, VARIANT_BOOL* exists) override {
        if (!exists) return E_POINTER;
        *exists = IndexOfName(name) ? VARIANT_TRUE : VARIANT_FALSE;
        return S_OK;
    }
    STDMETHODIMP IndexOf(BSTR name, long* index) override {
        if (!index) return E_POINTER;
        *index = IndexOfName(name);
        return S_OK;
    }
    STDMETHODIMP get_Names(BSTR* result) override {
        if (!result) return E_POINTER;
        std::vector<std::string> names;
        for (const Device& device : *devices) names.push_back(device.name);
        *result = ToBstr(JoinNames(names));
        return S_OK;
    }
    STDMETHODIMP get_Count(long* count) override {
        if (!count) return E_POINTER;
        *count = 0;
        if (HRESULT failed = Fail("Engine.Count"); FAILED(failed)) return failed;
        *count = static_cast<long>(devices->size());
        return S_OK;
    }

private:
    long IndexOfName(BSTR name) const {
        std::vector<std::string> names;
        for (const Device& device : *devices) names.push_back(device.name);
        return FindName(names, name);
    }

    Devices devices;
};

class EngineFactory : public IClassFactory {
public:
    STDMETHODIMP QueryInterface(REFIID iid, void** object) override {
        if (!object) return E_POINTER;
        if (iid != IID_IUnknown && iid != IID_IClassFactory) {
            *object = nullptr;
            return E_NOINTERFACE;
        }
        *object = static_cast<IClassFactory*>(this);
        return S_OK;
    }
    STDMETHODIMP_(ULONG) AddRef() override { return 2; }
    STDMETHODIMP_(ULONG) Release() override { return 1; }
    STDMETHODIMP CreateInstance(IUnknown* outer, REFIID iid, void** object) override {
        if (!object) return E_POINTER;
        *object = nullptr;
        if (outer) return CLASS_E_NOAGGREGATION;
        sim::Count("EngineCreated");
        Engine* engine = new Engine();
        HRESULT result = engine->QueryInterface(iid, object);
        engine->Release();
        return result;
    }
    STDMETHODIMP LockServer(BOOL lock) override {
        serverLocks += lock ? 1 : -1;
        return S_OK;
    }
};

EngineFactory factory;

std::wstring ClassKey() {
    wchar_t clsid[64] = {};
    ::StringFromGUID2(CLSID_RqEngine, clsid, 64);
    return std::wstring(L"CLSID\\") + clsid;
}

LONG SetValue(const std::wstring& key, const wchar_t* name, const std::wstring& value) {
    HKEY handle = nullptr;
    LONG result = ::RegCreateKeyExW(HKEY_CLASSES_ROOT, key.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, &handle, nullptr);
    if (result != ERROR_SUCCESS) return result;
    result = ::RegSetValueExW(handle, name, 0, REG_SZ, reinterpret_cast<const BYTE*>(value.c_str()),
                              static_cast<DWORD>((value.size() + 1) * sizeof(wchar_t)));
    ::RegCloseKey(handle);
    return result;
}

}  // namespace

extern "C" BOOL WINAPI DllMain(HINSTANCE instance, DWORD reason, LPVOID) {
    if (reason == DLL_PROCESS_ATTACH) selfModule = instance;
    return TRUE;
}

extern "C" HRESULT __stdcall DllGetClassObject(REFCLSID clsid, REFIID iid, void** object) {
    if (!object) return E_POINTER;
    *object = nullptr;
    if (clsid != CLSID_RqEngine) return CLASS_E_CLASSNOTAVAILABLE;
    return factory.QueryInterface(iid, object);
}

extern "C" HRESULT __stdcall DllCanUnloadNow() { return liveObjects == 0 && serverLocks == 0 ? S_OK : S_FALSE; }

extern "C" HRESULT __stdcall DllRegisterServer() {
    wchar_t path[MAX_PATH] = {};
    ::GetModuleFileNameW(selfModule, path, MAX_PATH);
    std::wstring key = ClassKey();
    if (SetValue(key, nullptr, L"Simulated switch engine") != ERROR_SUCCESS) return SELFREG_E_CLASS;
    if (SetValue(key + L"\\InprocServer32", nullptr, path) != ERROR_SUCCESS) return SELFREG_E_CLASS;
    if (SetValue(key + L"\\InprocServer32", L"ThreadingModel", L"Both") != ERROR_SUCCESS) return SELFREG_E_CLASS;
    return S_OK;
}

extern "C" HRESULT __stdcall DllUnregisterServer() {
    LONG result = ::RegDeleteTreeW(HKEY_CLASSES_ROOT, ClassKey().c_str());
    return result == ERROR_SUCCESS || result == ERROR_FILE_NOT_FOUND ? S_OK : SELFREG_E_CLASS;
}
