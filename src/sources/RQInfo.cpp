#include "sources/RQInfo.h"

#include <string>
#include <type_traits>

#include "com/Interfaces.h"
#include "framework/TEException.h"
#include "sources/RQEngine.h"

namespace sm {
namespace {

constexpr const char* libraryName = "qvrq.dll";
constexpr std::uint32_t deviceNameAttribute = 0xB8C0000B;
constexpr std::uint32_t routeNameAttribute = 0xB8C00801;
constexpr std::uint32_t iviDeviceNameAttribute = 0xB8C00A00;

using Handle = RQLibraryFunctions::Handle;
using Status = RQLibraryFunctions::Status;
using DestroyFunction = void (*)(Handle, Status*);

// Appends the text of attribute `attribute` of every item of `query`, reading it through `data`.
void AppendQueryNames(const RQLibraryFunctions& f, Handle data, Handle query, std::uint32_t attribute, Handle string,
                      Status* err, StringVector& names) {
    Status count = f.CssQueryData_Count(query, err);
    for (Status i = 0; i < count; ++i) {
        Handle item = f.CssQueryData_ThisObject(query, err);
        f.CssBaseObjectData_GetAttrValue_String(data, err, item, attribute, string);
        const char* text = f.SSString_c_str(string);
        names.emplace_back(text ? text : "");
        f.CssQueryData_Next(query, err);
    }
}

void DestroyWith(DestroyFunction destroy, Handle object, Status* err) {
    if (destroy && object) destroy(object, err);
}

}  // namespace

void RQInfo::ListNames(std::string_view, std::uint32_t options, const StringVector& filters, StringVector& names) {
    names.clear();
    if (ComPtr<RQEngine> engine = CreateRQEngine())
        ListNamesByEngine(*engine.Get(), options, filters, names);
    else
        ListNamesByLibrary(options, filters, names);
}

void RQInfo::LoadDLL() {
    if (module.IsLoaded()) return;
    try {
        module.Load(libraryName, "RQInfo::LoadDLL");
        RQLibraryFunctions& f = functions;
        auto bind = [&](auto& slot, const char* name) {
            slot = module.BindOptional<std::remove_pointer_t<std::remove_reference_t<decltype(slot)>>>(name);
        };
        bind(f.CssRouteGroupData_CreateQuery, "CssRouteGroupData_CreateQuery");
        bind(f.CssRouteGroupData_QueryForRGsOnly, "CssRouteGroupData_QueryForRGsOnly");
        bind(f.CssRouteGroupData_Create__, "CssRouteGroupData_Create__");
        bind(f.CssRouteGroupData_Destroy__, "CssRouteGroupData_Destroy__");
        bind(f.CssRouteData_CreateQuery, "CssRouteData_CreateQuery");
        bind(f.CssRouteData_Create__, "CssRouteData_Create__");
        bind(f.CssRouteData_Destroy__, "CssRouteData_Destroy__");
        bind(f.CssQueryData_Count, "CssQueryData_Count");
        bind(f.CssSSDeviceData_Create__, "CssSSDeviceData_Create__");
        bind(f.CssBaseObjectData_Create__, "CssBaseObjectData_Create__");
        bind(f.CssSSDeviceData_GetObjPtrFromName, "CssSSDeviceData_GetObjPtrFromName");
        bind(f.CssSSDeviceData_Destroy__, "CssSSDeviceData_Destroy__");
        bind(f.CssBaseObjectData_Destroy__, "CssBaseObjectData_Destroy__");
        bind(f.CssQueryData_Destroy__, "CssQueryData_Destroy__");
        bind(f.CssQueryData_ThisObject, "CssQueryData_ThisObject");
        bind(f.CssQueryData_Next, "CssQueryData_Next");
        bind(f.CssSSDeviceData_CreateQuery, "CssSSDeviceData_CreateQuery");
        bind(f.CssBaseObjectData_GetAttrValue_String, "CssBaseObjectData_GetAttrValue_String");
        bind(f.CssIviDeviceData_Create__, "CssIviDeviceData_Create__");
        bind(f.CssIviDeviceData_Destroy__, "CssIviDeviceData_Destroy__");
        bind(f.CssIviDeviceData_CreateQuery, "CssIviDeviceData_CreateQuery");
        bind(f.SSString_c_str, "SSString_c_str");
        bind(f.SSString_Create__, "SSString_Create__");
        bind(f.SSString_Destroy__, "SSString_Destroy__");
    } catch (const TEException&) {
        UnloadLibrary();
    }
}

void RQInfo::UnloadLibrary() {
    functions = RQLibraryFunctions{};
    module.Unload();
}

void RQInfo::ListNamesByLibrary(std::uint32_t options, const StringVector& filters, StringVector& names) {
    LoadDLL();
    const RQLibraryFunctions& f = functions;
    if (!f.CssSSDeviceData_Create__ || !f.SSString_Create__ || !f.SSString_c_str) return;
    Status err = 0;
    Handle string = f.SSString_Create__();
    Handle system = f.CssSSDeviceData_Create__(&err);
    bool canRead = f.CssQueryData_Count && f.CssQueryData_ThisObject && f.CssQueryData_Next &&
                   f.CssBaseObjectData_GetAttrValue_String;

    if ((options & ReturnVirtualInstruments) && canRead && f.CssSSDeviceData_CreateQuery) {
        Handle query = f.CssSSDeviceData_CreateQuery(system, &err);
        if (query) AppendQueryNames(f, system, query, deviceNameAttribute, string, &err, names);
        DestroyWith(f.CssQueryData_Destroy__, query, &err);
    }

    if ((options & (ReturnLogicalNames | ReturnRouteGroups | ReturnRoutes)) && canRead &&
        f.CssBaseObjectData_Create__ && f.CssSSDeviceData_GetObjPtrFromName) {
        for (const DynamicString& filter : filters) {
            std::string deviceName(filter.View());
            Handle device = f.CssSSDeviceData_GetObjPtrFromName(system, &err, deviceName.data());
            if (!device) continue;
            Handle data = nullptr;
            Handle query = nullptr;
            DestroyFunction destroyData = nullptr;
            std::uint32_t attribute = 0;
            if ((options & ReturnRouteGroups) && f.CssRouteGroupData_CreateQuery && f.CssRouteGroupData_Create__ &&
                f.CssRouteGroupData_QueryForRGsOnly) {
                data = f.CssRouteGroupData_Create__(&err, device);
                query = data ? f.CssRouteGroupData_CreateQuery(data, &err) : nullptr;
                if (query) f.CssRouteGroupData_QueryForRGsOnly(data, &err, query);
                destroyData = f.CssRouteGroupData_Destroy__;
                attribute = routeNameAttribute;
            } else if ((options & ReturnRoutes) && f.CssRouteData_Create__ && f.CssRouteData_CreateQuery) {
                data = f.CssRouteData_Create__(&err, device);
                query = data ? f.CssRouteData_CreateQuery(data, &err) : nullptr;
                destroyData = f.CssRouteData_Destroy__;
                attribute = routeNameAttribute;
            } else if ((options & ReturnLogicalNames) && f.CssIviDeviceData_Create__ && f.CssIviDeviceData_CreateQuery) {
                data = f.CssIviDeviceData_Create__(&err, device);
                query = data ? f.CssIviDeviceData_CreateQuery(data, &err) : nullptr;
                destroyData = f.CssIviDeviceData_Destroy__;
                attribute = iviDeviceNameAttribute;
            }
            if (data && query) AppendQueryNames(f, data, query, attribute, string, &err, names);
            DestroyWith(f.CssQueryData_Destroy__, query, &err);
            DestroyWith(destroyData, data, &err);
        }
    }

    if (f.SSString_Destroy__ && string) f.SSString_Destroy__(string);
    DestroyWith(f.CssSSDeviceData_Destroy__, system, &err);
}

}  // namespace sm
