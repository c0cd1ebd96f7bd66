// Stand-in for the IVI configuration library "iviconfig.dll": the IVI configuration store is the IVI
// area of the simulated setup file (docs/simulated-setup.md, "### IVI"). The store is read when it
// is opened and when it is reloaded; ConfigurationChanged reports a change when the file's
// ChangeCount differs from the one read last.
#include <windows.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <mutex>
#include <string>
#include <vector>

#include "RemoveExports.h"
#include "SimSetup.h"

namespace {

using Status = std::int32_t;
constexpr Status success = 0;
constexpr Status failure = -1;

struct DriverSession {
    std::string name, prefix, module, driverClass;
    std::vector<std::string> classes;
};

struct Store {
    std::vector<std::string> instruments;
    std::vector<std::string> instrumentDrivers;
    std::vector<DriverSession> drivers;
    std::vector<std::pair<std::string, std::string>> logicalNames;
    std::string changeCount;
};

std::mutex storeLock;
Store store;

void ReadStore() {
    sim::Setup setup = sim::Setup::Current();
    Store fresh;
    fresh.changeCount = setup.Get("IVI", "", "ChangeCount", "0");
    for (const std::string& instrument : setup.Objects("IVI Instrument")) {
        fresh.instruments.push_back(instrument);
        fresh.instrumentDrivers.push_back(setup.Get("IVI Instrument", instrument, "DriverSession"));
    }
    for (const std::string& name : setup.Objects("IVI DriverSession")) {
        DriverSession driver{name, setup.Get("IVI DriverSession", name, "Prefix"),
                             setup.Get("IVI DriverSession", name, "Module"),
                             setup.Get("IVI DriverSession", name, "Class"), {}};
        if (setup.Has("IVI DriverSession", name, "Classes"))
            driver.classes = sim::SplitList(setup.Get("IVI DriverSession", name, "Classes"));
        else if (!driver.driverClass.empty())
            driver.classes.push_back(driver.driverClass);
        fresh.drivers.push_back(driver);
    }
    if (const sim::Section* names = setup.Find("IVI", "LogicalNames"))
        for (const auto& [logicalName, instrument] : names->entries) fresh.logicalNames.emplace_back(logicalName, instrument);
    store = std::move(fresh);
}

const DriverSession* FindDriver(const char* name) {
    for (const DriverSession& driver : store.drivers)
        if (name && sim::EqualNoCase(driver.name, name)) return &driver;
    return nullptr;
}

Status Copy(const std::string& text, char* buffer, std::int32_t size) {
    if (!buffer || size <= 0) return failure;
    std::size_t length = std::min<std::size_t>(text.size(), static_cast<std::size_t>(size) - 1);
    std::memcpy(buffer, text.data(), length);
    buffer[length] = '\0';
    return success;
}

}  // namespace

extern "C" {

__declspec(dllexport) Status IviIni_OpenIniFile(const char*, void** handle) {
    sim::Count("IviIni_OpenIniFile");
    std::lock_guard guard(storeLock);
    if (sim::Setup::Current().GetLong("IVI", "", "OpenFails") != 0) {
        ::SetLastError(ERROR_FILE_NOT_FOUND);
        return failure;
    }
    ReadStore();
    *handle = &store;
    return success;
}

__declspec(dllexport) Status IviIni_CloseIniFile(void*, std::int32_t) {
    sim::Count("IviIni_CloseIniFile");
    return success;
}

__declspec(dllexport) Status IviIni_ConfigurationChanged(void*, unsigned char* changed) {
    sim::Count("IviIni_ConfigurationChanged");
    std::lock_guard guard(storeLock);
    *changed = sim::Setup::Current().Get("IVI", "", "ChangeCount", "0") != store.changeCount ? 1 : 0;
    return success;
}

__declspec(dllexport) Status IviIni_ReloadConfiguration(void*) {
    sim::Count("IviIni_ReloadConfiguration");
    std::lock_guard guard(storeLock);
    ReadStore();
    return success;
}

__declspec(dllexport) Status IviIni_GetNumberOfVIs(void*, std::int32_t* count) {
    sim::Count("IviIni_GetNumberOfVIs");
    std::lock_guard guard(storeLock);
    *count = static_cast<std::int32_t>(store.instruments.size());
    return success;
}

// The name stays valid until the store is read again; callers copy it at once.
__declspec(dllexport) Status IviIni_GetNthVI(void*, std::int32_t index, const char** name) {
    std::lock_guard guard(storeLock);
    if (index < 1 || static_cast<std::size_t>(index) > store.instruments.size()) return failure;
    *name = store.instruments[static_cast<std::size_t>(index) - 1].c_str();
    return success;
}

__declspec(dllexport) Status IviIni_GetVIDriver(void*, const char* instrument, char* buffer, std::int32_t size) {
    std::lock_guard guard(storeLock);
    for (std::size_t index = 0; index < store.instruments.size(); ++index)
        if (instrument && sim::EqualNoCase(store.instruments[index], instrument))
            return Copy(store.instrumentDrivers[index], buffer, size);
    return failure;
}

__declspec(dllexport) Status IviIni_GetDriverPrefix(void*, const char* driver, char* buffer, std::int32_t size) {
    std::lock_guard guard(storeLock);
    const DriverSession* found = FindDriver(driver);
    return found ? Copy(found->prefix, buffer, size) : failure;
}

__declspec(dllexport) Status IviIni_GetDriverModule(void*, const char* driver, char* buffer, std::int32_t size) {
    std::lock_guard guard(storeLock);
    const DriverSession* found = FindDriver(driver);
    return found ? Copy(found->module, buffer, size) : failure;
}

__declspec(dllexport) Status IviIni_GetDriverClass(void*, const char* driver, char* buffer, std::int32_t size) {
    std::lock_guard guard(storeLock);
    const DriverSession* found = FindDriver(driver);
    return found ? Copy(found->driverClass, buffer, size) : failure;
}

__declspec(dllexport) Status IviIni_GetDriverClassCount(void*, const char* driver, std::int32_t* count) {
    std::lock_guard guard(storeLock);
    const DriverSession* found = FindDriver(driver);
    if (!found) return failure;
    *count = static_cast<std::int32_t>(found->classes.size());
    return success;
}

__declspec(dllexport) Status IviIni_GetDriverClassByIndex(void*, const char* driver, std::int32_t index, char* buffer,
                                                          std::int32_t size) {
    std::lock_guard guard(storeLock);
    const DriverSession* found = FindDriver(driver);
    if (!found || index < 1 || static_cast<std::size_t>(index) > found->classes.size()) return failure;
    return Copy(found->classes[static_cast<std::size_t>(index) - 1], buffer, size);
}

__declspec(dllexport) Status IviIni_GetNumberOfLogicalNames(void*, std::int32_t* count) {
    std::lock_guard guard(storeLock);
    *count = static_cast<std::int32_t>(store.logicalNames.size());
    return success;
}

__declspec(dllexport) Status IviIni_GetNthLogicalName(void*, std::int32_t index, const char** name) {
    std::lock_guard guard(storeLock);
    if (index < 1 || static_cast<std::size_t>(index) > store.logicalNames.size()) return failure;
    *name = store.logicalNames[static_cast<std::size_t>(index) - 1].first.c_str();
    return success;
}

__declspec(dllexport) Status IviIni_GetLogicalNameVI(void*, const char* logicalName, char* buffer, std::int32_t size) {
    std::lock_guard guard(storeLock);
    for (const auto& [name, instrument] : store.logicalNames)
        if (logicalName && sim::EqualNoCase(name, logicalName)) return Copy(instrument, buffer, size);
    return failure;
}

BOOL WINAPI DllMain(HINSTANCE module, DWORD reason, LPVOID) {
    if (reason == DLL_PROCESS_ATTACH)
        sim::RemoveExports(module, sim::SplitList(sim::Setup::Current().Get("IVI", "", "Missing")));
    return TRUE;
}

}  // extern "C"
