// The floor under GetNames(""): the outside libraries' own calls for the same names, made directly
// through their published interfaces and loaded as the manager loads them (VISA by its bare name,
// the IVI configuration library from the system directory, the switch engine through COM). Which of
// them one listing makes is read from the stand-ins' counters around one GetNames(""), so the floor
// repeats exactly what the manager asked for, no more.
#pragma once

#include <windows.h>
#include <ole2.h>

#include <cstdint>
#include <cstdio>
#include <functional>
#include <string>

#include "com/ComPtr.h"
#include "com/LibraryBinding.h"
#include "com/UniqueHandles.h"
#include "sources/IviConfigFunctions.h"
#include "sources/RQEngine.h"

namespace bench {

// One stand-in's counters, read in the very instance the manager loaded.
class SimCounters {
public:
    explicit SimCounters(const char* moduleName) : module(::GetModuleHandleA(moduleName)) {}
    long Get(const char* name) const {
        auto read = module ? sm::GetProcAddressAs<long(const char*)>(module, "SimCounter") : nullptr;
        return read ? read(name) : 0;
    }
    void Reset() const {
        auto reset = module ? sm::GetProcAddressAs<void()>(module, "SimResetCounters") : nullptr;
        if (reset) reset();
    }
    bool Loaded() const { return module != nullptr; }

private:
    HMODULE module;
};

// VISA: the resource scan of a listing (viOpenDefaultRM, viFindRsrc "?*INSTR", viFindNext per
// further resource, viClose of the resource manager, which releases the find list).
class VisaScan {
public:
    VisaScan() : library(::LoadLibraryA("visa32.dll")) {
        if (!library) return;
        openDefaultRM = sm::GetProcAddressAs<Status(Session*)>(library.Get(), "viOpenDefaultRM");
        findRsrc = sm::GetProcAddressAs<Status(Session, const char*, Session*, std::uint32_t*, char*)>(library.Get(), "viFindRsrc");
        findNext = sm::GetProcAddressAs<Status(Session, char*)>(library.Get(), "viFindNext");
        close = sm::GetProcAddressAs<Status(Session)>(library.Get(), "viClose");
    }
    bool Usable() const { return openDefaultRM && findRsrc && findNext && close; }
    std::uint32_t operator()() const {
        Session manager = 0, list = 0;
        std::uint32_t count = 0, found = 0;
        char description[256] = {};
        if (openDefaultRM(&manager) != 0) return 0;
        if (findRsrc(manager, "?*INSTR", &list, &count, description) == 0) {
            found = count;
            while (count > 1 && findNext(list, description) == 0) --count;
        }
        close(manager);
        return found;
    }

private:
    using Status = std::int32_t;
    using Session = std::uint32_t;
    sm::UniqueModule library;
    Status (*openDefaultRM)(Session*) = nullptr;
    Status (*findRsrc)(Session, const char*, Session*, std::uint32_t*, char*) = nullptr;
    Status (*findNext)(Session, char*) = nullptr;
    Status (*close)(Session) = nullptr;
};

// IVI: the configuration store's change query that every listing makes, its reload, and the whole
// read of instruments, drivers, classes and logical names the manager makes when the store changed.
class IviStore {
public:
    IviStore() {
        library.Reset(::LoadLibraryA(sm::SystemDirectoryPath("iviconfig.dll").c_str()));
        if (!library) return;
        HMODULE module = library.Get();
        Bind(module, functions.openIniFile, "IviIni_OpenIniFile");
        Bind(module, functions.closeIniFile, "IviIni_CloseIniFile");
        Bind(module, functions.configurationChanged, "IviIni_ConfigurationChanged");
        Bind(module, functions.reloadConfiguration, "IviIni_ReloadConfiguration");
        Bind(module, functions.getNumberOfVIs, "IviIni_GetNumberOfVIs");
        Bind(module, functions.getNthVI, "IviIni_GetNthVI");
        Bind(module, functions.getVIDriver, "IviIni_GetVIDriver");
        Bind(module, functions.getDriverPrefix, "IviIni_GetDriverPrefix");
        Bind(module, functions.getDriverModule, "IviIni_GetDriverModule");
        Bind(module, functions.getDriverClass, "IviIni_GetDriverClass");
        Bind(module, functions.getDriverClassCount, "IviIni_GetDriverClassCount");
        Bind(module, functions.getDriverClassByIndex, "IviIni_GetDriverClassByIndex");
        Bind(module, functions.getNumberOfLogicalNames, "IviIni_GetNumberOfLogicalNames");
        Bind(module, functions.getNthLogicalName, "IviIni_GetNthLogicalName");
        Bind(module, functions.getLogicalNameVI, "IviIni_GetLogicalNameVI");
        if (functions.openIniFile) functions.openIniFile("", &handle);
    }
    ~IviStore() {
        if (handle && functions.closeIniFile) functions.closeIniFile(handle, 0);
    }
    IviStore(const IviStore&) = delete;
    IviStore& operator=(const IviStore&) = delete;

    bool Usable() const {
        const sm::IviConfigFunctions& f = functions;
        return handle && f.configurationChanged && f.reloadConfiguration && f.getNumberOfVIs && f.getNthVI && f.getVIDriver &&
               f.getDriverPrefix && f.getDriverModule && (f.getDriverClass || f.getDriverClassCount) &&
               f.getNumberOfLogicalNames && f.getNthLogicalName && f.getLogicalNameVI;
    }
    void Changed() const {
        unsigned char changed = 0;
        functions.configurationChanged(handle, &changed);
    }
    void Reload() const { functions.reloadConfiguration(handle); }
    // The calls of one read of the store, in the manager's order; returns the instruments read.
    std::int32_t Read() const {
        char text[1024];
        std::int32_t logicalCount = 0;
        functions.getNumberOfLogicalNames(handle, &logicalCount);
        for (std::int32_t index = 1; index <= logicalCount; ++index) {
            const char* name = nullptr;
            functions.getNthLogicalName(handle, index, &name);
            std::string logicalName(name ? name : "");
            functions.getLogicalNameVI(handle, logicalName.c_str(), text, sizeof text);
        }
        std::int32_t count = 0;
        functions.getNumberOfVIs(handle, &count);
        for (std::int32_t index = 1; index <= count; ++index) {
            const char* name = nullptr;
            functions.getNthVI(handle, index, &name);
            std::string instrument(name ? name : "");
            char driver[1024] = {};
            functions.getVIDriver(handle, instrument.c_str(), driver, sizeof driver);
            driver[sizeof driver - 1] = '\0';
            functions.getDriverPrefix(handle, driver, text, sizeof text);
            functions.getDriverModule(handle, driver, text, sizeof text);
            if (!functions.getDriverClassCount || !functions.getDriverClassByIndex) {
                functions.getDriverClass(handle, driver, text, sizeof text);
                continue;
            }
            std::int32_t classes = 0;
            functions.getDriverClassCount(handle, driver, &classes);
            for (std::int32_t which = 1; which <= classes; ++which)
                functions.getDriverClassByIndex(handle, driver, which, text, sizeof text);
        }
        return count;
    }

private:
    template <class Function>
    static void Bind(HMODULE module, Function*& slot, const char* name) {
        slot = sm::GetProcAddressAs<Function>(module, name);
    }
    sm::UniqueModule library;
    void* handle = nullptr;
    sm::IviConfigFunctions functions;
};

// Switch: the engine calls of one listing with the device names, route groups, routes and logical
// names asked for and no device filter: the engine created and run, the device count, each device
// and its name, then the count and each device again (the filter finds none to expand). Returns
// the devices named, or -1 when the engine cannot be created.
inline long SwitchEngineListing() {
    sm::ComPtr<IUnknown> created;
    if (FAILED(::CoCreateInstance(sm::CLSID_RQEngine, nullptr, CLSCTX_ALL, IID_IUnknown, created.PutVoid())) || !created)
        return -1;
    if (FAILED(::OleRun(created.Get()))) return -1;
    sm::ComPtr<sm::RQEngine> engine;
    if (created->QueryInterface(sm::IID_RQEngine, engine.PutVoid()) != S_OK) return -1;
    auto device = [&](LONG index) {
        VARIANT which;
        ::VariantInit(&which);
        which.vt = VT_INT;
        which.intVal = index;
        sm::ComPtr<sm::RQVirtualDevice> item;
        engine->Item(which, item.Put());
        return item;
    };
    LONG count = 0;
    engine->get_Count(&count);
    for (LONG index = 1; index <= count; ++index) {
        auto item = device(index);
        sm::UniqueBstr name;
        if (item) item->get_Name(name.Put());
    }
    engine->get_Count(&count);
    for (LONG index = 1; index <= count; ++index) device(index);
    return count;
}

}  // namespace bench
