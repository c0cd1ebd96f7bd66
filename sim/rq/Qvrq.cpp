// Stand-in for the switch product's function library "qvrq.dll": its configuration queries (Css...),
// its string objects (SSString_...) and its session functions (qvRQ_...). Every object it hands out
// is a real heap object checked on the way back in, so a handle used after destroying it, or of the
// wrong kind, is caught as an error status instead of going unnoticed. The devices come from the
// [RQ <device>] sections of the simulated setup file; [RQ] FailingSessions / OpenStatus make opens fail.
#include <windows.h>

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "SimSetup.h"

namespace {

constexpr std::uint32_t liveMark = 0x51565251;  // "QRVQ"
constexpr std::uint32_t deadMark = 0xDEADBEEF;
constexpr std::int32_t badHandle = -1;

constexpr std::uint32_t deviceNameAttribute = 0xB8C0000B;
constexpr std::uint32_t routeNameAttribute = 0xB8C00801;
constexpr std::uint32_t iviDeviceNameAttribute = 0xB8C00A00;

enum class Kind { String, System, BaseObject, Device, RouteGroupData, RouteData, IviDeviceData, Query, Session };

struct Entry {
    std::string name;
    bool isGroup = false;
};

struct Object {
    explicit Object(Kind what) : kind(what) {
        sim::Count("ObjectsCreated");
        sim::Count("open");
    }
    ~Object() {
        mark = deadMark;
        sim::Count("ObjectsDestroyed");
        sim::Count("open", -1);
    }
    std::uint32_t mark = liveMark;
    Kind kind;
    std::string text;             // String: its text; Device and Session: the name
    std::vector<Entry> entries;   // Query: its items; data objects: what their query covers
    std::size_t position = 0;     // Query: the current item
    std::uint32_t attribute = 0;  // Query: the attribute that names its items
    std::vector<std::unique_ptr<Object>> owned;  // System: the device objects it handed out
};

Object* Checked(void* handle, Kind kind, std::int32_t* err) {
    auto* object = static_cast<Object*>(handle);
    bool valid = object && object->mark == liveMark && object->kind == kind;
    if (err) *err = valid ? 0 : badHandle;
    return valid ? object : nullptr;
}

void Destroy(void* handle, Kind kind, std::int32_t* err) {
    if (Object* object = Checked(handle, kind, err)) delete object;
}

std::vector<Entry> Names(const std::string& list, bool isGroup = false) {
    std::vector<Entry> entries;
    for (std::string& name : sim::SplitList(list)) entries.push_back({std::move(name), isGroup});
    return entries;
}

void* NewQuery(const std::vector<Entry>& entries, std::uint32_t attribute) {
    auto* query = new Object(Kind::Query);
    query->entries = entries;
    query->attribute = attribute;
    return query;
}

void* NewDeviceData(Kind kind, void* device, std::int32_t* err) {
    Object* owner = Checked(device, Kind::Device, err);
    if (!owner) return nullptr;
    sim::Setup setup = sim::Setup::Current();
    auto* data = new Object(kind);
    data->text = owner->text;
    if (kind == Kind::RouteGroupData) {
        // The route group data of a device covers its groups and the routes within them; the
        // "route groups only" restriction narrows a query to the groups.
        data->entries = Names(setup.Get("RQ", owner->text, "RouteGroups"), true);
        for (Entry& route : Names(setup.Get("RQ", owner->text, "Routes"))) data->entries.push_back(route);
    } else if (kind == Kind::RouteData) {
        data->entries = Names(setup.Get("RQ", owner->text, "Routes"));
    } else {
        data->entries = Names(setup.Get("RQ", owner->text, "IviDevices"));
    }
    return data;
}

void* NewDataQuery(void* data, Kind kind, std::uint32_t attribute, std::int32_t* err) {
    Object* owner = Checked(data, kind, err);
    return owner ? NewQuery(owner->entries, attribute) : nullptr;
}

// A name the product can open a session for: any device, route, route group or IVI device.
bool IsKnownName(const sim::Setup& setup, const std::string& name) {
    for (const std::string& device : setup.Objects("RQ")) {
        if (device.empty()) continue;
        if (sim::EqualNoCase(device, name)) return true;
        for (const char* key : {"Routes", "RouteGroups", "IviDevices"})
            for (const std::string& known : sim::SplitList(setup.Get("RQ", device, key)))
                if (sim::EqualNoCase(known, name)) return true;
    }
    return false;
}

}  // namespace

extern "C" {

void* SSString_Create__() {
    sim::Count("SSString_Create__");
    return new Object(Kind::String);
}

const char* SSString_c_str(void* string) {
    sim::Count("SSString_c_str");
    Object* object = Checked(string, Kind::String, nullptr);
    return object ? object->text.c_str() : nullptr;
}

void SSString_Destroy__(void* string) {
    sim::Count("SSString_Destroy__");
    Destroy(string, Kind::String, nullptr);
}

void* CssSSDeviceData_Create__(std::int32_t* err) {
    sim::Count("CssSSDeviceData_Create__");
    if (err) *err = 0;
    return new Object(Kind::System);
}

void CssSSDeviceData_Destroy__(void* system, std::int32_t* err) {
    sim::Count("CssSSDeviceData_Destroy__");
    Destroy(system, Kind::System, err);
}

void* CssSSDeviceData_CreateQuery(void* system, std::int32_t* err) {
    sim::Count("CssSSDeviceData_CreateQuery");
    if (!Checked(system, Kind::System, err)) return nullptr;
    std::vector<Entry> devices;
    for (const std::string& device : sim::Setup::Current().Objects("RQ"))
        if (!device.empty()) devices.push_back({device, false});
    return NewQuery(devices, deviceNameAttribute);
}

void* CssSSDeviceData_GetObjPtrFromName(void* system, std::int32_t* err, char* name) {
    sim::Count("CssSSDeviceData_GetObjPtrFromName");
    Object* owner = Checked(system, Kind::System, err);
    if (!owner || !name) return nullptr;
    for (const std::string& device : sim::Setup::Current().Objects("RQ")) {
        if (device.empty() || !sim::EqualNoCase(device, name)) continue;
        // Device objects belong to the system data and go with it.
        owner->owned.push_back(std::make_unique<Object>(Kind::Device));
        owner->owned.back()->text = device;
        return owner->owned.back().get();
    }
    return nullptr;
}

void* CssBaseObjectData_Create__(std::int32_t* err) {
    sim::Count("CssBaseObjectData_Create__");
    if (err) *err = 0;
    return new Object(Kind::BaseObject);
}

void CssBaseObjectData_Destroy__(void* object, std::int32_t* err) {
    sim::Count("CssBaseObjectData_Destroy__");
    Destroy(object, Kind::BaseObject, err);
}

void* CssRouteGroupData_Create__(std::int32_t* err, void* device) {
    sim::Count("CssRouteGroupData_Create__");
    return NewDeviceData(Kind::RouteGroupData, device, err);
}

void* CssRouteData_Create__(std::int32_t* err, void* device) {
    sim::Count("CssRouteData_Create__");
    return NewDeviceData(Kind::RouteData, device, err);
}

void* CssIviDeviceData_Create__(std::int32_t* err, void* device) {
    sim::Count("CssIviDeviceData_Create__");
    return NewDeviceData(Kind::IviDeviceData, device, err);
}

void* CssRouteGroupData_CreateQuery(void* data, std::int32_t* err) {
    sim::Count("CssRouteGroupData_CreateQuery");
    return NewDataQuery(data, Kind::RouteGroupData, routeNameAttribute, err);
}

void* CssRouteData_CreateQuery(void* data, std::int32_t* err) {
    sim::Count("CssRouteData_CreateQuery");
    return NewDataQuery(data, Kind::RouteData, routeNameAttribute, err);
}

void* CssIviDeviceData_CreateQuery(void* data, std::int32_t* err) {
    sim::Count("CssIviDeviceData_CreateQuery");
    return NewDataQuery(data, Kind::IviDeviceData, iviDeviceNameAttribute, err);
}

void CssRouteGroupData_QueryForRGsOnly(void* data, std::int32_t* err, void* query) {
    sim::Count("CssRouteGroupData_QueryForRGsOnly");
    if (!Checked(data, Kind::RouteGroupData, err)) return;
    Object* narrowed = Checked(query, Kind::Query, err);
    if (!narrowed) return;
    std::erase_if(narrowed->entries, [](const Entry& entry) { return !entry.isGroup; });
    narrowed->position = 0;
}

void CssRouteGroupData_Destroy__(void* data, std::int32_t* err) {
    sim::Count("CssRouteGroupData_Destroy__");
    Destroy(data, Kind::RouteGroupData, err);
}

void CssRouteData_Destroy__(void* data, std::int32_t* err) {
    sim::Count("CssRouteData_Destroy__");
    Destroy(data, Kind::RouteData, err);
}

void CssIviDeviceData_Destroy__(void* data, std::int32_t* err) {
    sim::Count("CssIviDeviceData_Destroy__");
    Destroy(data, Kind::IviDeviceData, err);
}

std::int32_t CssQueryData_Count(void* query, std::int32_t* err) {
    sim::Count("CssQueryData_Count");
    Object* object = Checked(query, Kind::Query, err);
    return object ? static_cast<std::int32_t>(object->entries.size()) : 0;
}

// Items are the query's own entries, valid while the query lives.
void* CssQueryData_ThisObject(void* query, std::int32_t* err) {
    sim::Count("CssQueryData_ThisObject");
    Object* object = Checked(query, Kind::Query, err);
    if (!object || object->position >= object->entries.size()) {
        if (err) *err = badHandle;
        return nullptr;
    }
    return &object->entries[object->position];
}

void CssQueryData_Next(void* query, std::int32_t* err) {
    sim::Count("CssQueryData_Next");
    if (Object* object = Checked(query, Kind::Query, err)) ++object->position;
}

void CssQueryData_Destroy__(void* query, std::int32_t* err) {
    sim::Count("CssQueryData_Destroy__");
    Destroy(query, Kind::Query, err);
}

// The attribute must be the one that names items of that data: a device name on the system data,
// a route (group) name on route (group) data, an IVI device name on IVI device data.
void CssBaseObjectData_GetAttrValue_String(void* data, std::int32_t* err, void* item,
                                                                 std::uint32_t attribute, void* string) {
    sim::Count("CssBaseObjectData_GetAttrValue_String");
    Object* target = Checked(string, Kind::String, err);
    auto* owner = static_cast<Object*>(data);
    if (!target || !owner || owner->mark != liveMark || !item) {
        if (err) *err = badHandle;
        return;
    }
    bool matches = (owner->kind == Kind::System && attribute == deviceNameAttribute) ||
                   ((owner->kind == Kind::RouteGroupData || owner->kind == Kind::RouteData) &&
                    attribute == routeNameAttribute) ||
                   (owner->kind == Kind::IviDeviceData && attribute == iviDeviceNameAttribute);
    target->text = matches ? static_cast<Entry*>(item)->name : std::string();
    if (err) *err = matches ? 0 : badHandle;
}

std::int32_t qvRQ_OpenSession(const char* name, const char* options, std::uintptr_t* handle) {
    sim::Count("qvRQ_OpenSession");
    if (options && *options) sim::Count("qvRQ_OpenSession with options");
    if (!name || !handle) return badHandle;
    sim::Setup setup = sim::Setup::Current();
    bool failing = false;
    for (const std::string& listed : sim::SplitList(setup.Get("RQ", "", "FailingSessions")))
        failing = failing || sim::EqualNoCase(listed, name);
    if (failing || !IsKnownName(setup, name)) return static_cast<std::int32_t>(setup.GetLong("RQ", "", "OpenStatus", -1));
    auto* session = new Object(Kind::Session);
    session->text = name;
    *handle = reinterpret_cast<std::uintptr_t>(session);
    return 0;
}

std::int32_t qvRQ_CloseSession(std::uintptr_t handle) {
    sim::Count("qvRQ_CloseSession");
    std::int32_t err = 0;
    Destroy(reinterpret_cast<void*>(handle), Kind::Session, &err);
    return err;
}

}  // extern "C"
