// The switch routes of the switch-management product: its virtual devices and, for the devices a
// listing names in its filters, their route groups, routes and IVI switch devices. The product's
// automation engine is asked first; without it, its function library "qvrq.dll". The source only
// lists names: switch sessions are made for any name of the category.
#pragma once

#include <cstdint>

#include "com/DriverLibrary.h"
#include "sources/InfoBase.h"

namespace sm {

// The functions of "qvrq.dll" that listing uses, each optional. Objects of the library are opaque
// handles; `err` is the status variable every call receives and no caller reads.
struct RQLibraryFunctions {
    using Handle = void*;
    using Status = std::int32_t;
    Handle (*CssRouteGroupData_CreateQuery)(Handle data, Status* err) = nullptr;
    void (*CssRouteGroupData_QueryForRGsOnly)(Handle data, Status* err, Handle query) = nullptr;
    Handle (*CssRouteGroupData_Create__)(Status* err, Handle device) = nullptr;
    void (*CssRouteGroupData_Destroy__)(Handle data, Status* err) = nullptr;
    Handle (*CssRouteData_CreateQuery)(Handle data, Status* err) = nullptr;
    Handle (*CssRouteData_Create__)(Status* err, Handle device) = nullptr;
    void (*CssRouteData_Destroy__)(Handle data, Status* err) = nullptr;
    Status (*CssQueryData_Count)(Handle query, Status* err) = nullptr;
    Handle (*CssSSDeviceData_Create__)(Status* err) = nullptr;
    Handle (*CssBaseObjectData_Create__)(Status* err) = nullptr;
    Handle (*CssSSDeviceData_GetObjPtrFromName)(Handle system, Status* err, char* name) = nullptr;
    void (*CssSSDeviceData_Destroy__)(Handle system, Status* err) = nullptr;
    void (*CssBaseObjectData_Destroy__)(Handle object, Status* err) = nullptr;
    void (*CssQueryData_Destroy__)(Handle query, Status* err) = nullptr;
    Handle (*CssQueryData_ThisObject)(Handle query, Status* err) = nullptr;
    void (*CssQueryData_Next)(Handle query, Status* err) = nullptr;
    Handle (*CssSSDeviceData_CreateQuery)(Handle system, Status* err) = nullptr;
    void (*CssBaseObjectData_GetAttrValue_String)(Handle data, Status* err, Handle item, std::uint32_t attribute,
                                                  Handle string) = nullptr;
    Handle (*CssIviDeviceData_Create__)(Status* err, Handle device) = nullptr;
    void (*CssIviDeviceData_Destroy__)(Handle data, Status* err) = nullptr;
    Handle (*CssIviDeviceData_CreateQuery)(Handle data, Status* err) = nullptr;
    const char* (*SSString_c_str)(Handle string) = nullptr;
    Handle (*SSString_Create__)() = nullptr;
    void (*SSString_Destroy__)(Handle string) = nullptr;
};

class RQInfo : public InfoBase {
public:
    // Filters name the virtual devices whose route groups, routes or IVI devices are wanted; the
    // sub-category is not used. Neither engine nor library installed: no names, and no error.
    void ListNames(std::string_view subCategory, std::uint32_t options, const StringVector& filters,
                   StringVector& names) override;

private:
    void ListNamesByLibrary(std::uint32_t options, const StringVector& filters, StringVector& names);
    // Loads the library once and binds what it offers; a library that cannot be loaded leaves the
    // source without one (and the next listing tries again).
    void LoadDLL();
    void UnloadLibrary();

    DriverLibrary module;
    RQLibraryFunctions functions;
};

}  // namespace sm
