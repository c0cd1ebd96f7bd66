#include "sources/RQEngine.h"

#include <ole2.h>

#include "com/BstrConversion.h"
#include "com/ComError.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"
#include "framework/MultiByte.h"

namespace sm {
namespace {

// A needed interface that a member handed back as null is a broken engine, reported as E_POINTER.
template <class Interface>
Interface& Required(const ComPtr<Interface>& pointer) {
    if (!pointer) throw ComError(E_POINTER);
    return *pointer.Get();
}

VARIANT IndexVariant(LONG index) {
    VARIANT value;
    ::VariantInit(&value);
    value.vt = VT_INT;
    value.intVal = index;
    return value;
}

DynamicString NameOf(RQNamedItem& item, REFIID iid) {
    UniqueBstr name;
    CheckMember(item.get_Name(name.Put()), &item, iid);
    DynamicString text;
    Assign(text, name.Get());
    return text;
}

DynamicString NameOf(RQVirtualDevice& device) {
    UniqueBstr name;
    CheckMember(device.get_Name(name.Put()), &device, IID_RQVirtualDevice);
    DynamicString text;
    Assign(text, name.Get());
    return text;
}

ComPtr<RQVirtualDevice> DeviceAt(RQEngine& engine, LONG index) {
    ComPtr<RQVirtualDevice> device;
    CheckMember(engine.Item(IndexVariant(index), device.Put()), &engine, IID_RQEngine);
    Required(device);
    return device;
}

LONG CountOf(RQEngine& engine) {
    LONG count = 0;
    CheckMember(engine.get_Count(&count), &engine, IID_RQEngine);
    return count;
}

// Appends the names of every item of one collection of a device.
void AppendItemNames(RQVirtualDevice& device, HRESULT (STDMETHODCALLTYPE RQVirtualDevice::*member)(RQCollection**),
                     REFIID collectionId, REFIID itemId, StringVector& names) {
    ComPtr<RQCollection> collection;
    CheckMember((device.*member)(collection.Put()), &device, IID_RQVirtualDevice);
    RQCollection& items = Required(collection);
    LONG count = 0;
    CheckMember(items.get_Count(&count), &items, collectionId);
    for (LONG index = 1; index <= count; ++index) {
        ComPtr<RQNamedItem> item;
        CheckMember(items.Item(IndexVariant(index), item.Put()), &items, collectionId);
        names.push_back(NameOf(Required(item), itemId));
    }
}

bool Named(const StringVector& filters, std::string_view name) {
    for (const DynamicString& filter : filters)
        if (multibyte::Compare(filter.View(), name, true) == 0) return true;
    return false;
}

}  // namespace

ComPtr<RQEngine> CreateRQEngine() {
    ComPtr<IUnknown> created;
    if (FAILED(::CoCreateInstance(CLSID_RQEngine, nullptr, CLSCTX_ALL, IID_IUnknown, created.PutVoid())) || !created)
        return {};
    if (FAILED(::OleRun(created.Get()))) return {};
    ComPtr<RQEngine> engine;
    if (created->QueryInterface(IID_RQEngine, engine.PutVoid()) != S_OK) return {};
    return engine;
}

void ListNamesByEngine(RQEngine& engine, std::uint32_t options, const StringVector& filters, StringVector& names) {
    if (options & ReturnVirtualInstruments) {
        LONG count = CountOf(engine);
        for (LONG index = 1; index <= count; ++index) names.push_back(NameOf(*DeviceAt(engine, index).Get()));
    }
    if (!(options & (ReturnLogicalNames | ReturnRouteGroups | ReturnRoutes))) return;
    LONG count = CountOf(engine);
    for (LONG index = 1; index <= count; ++index) {
        ComPtr<RQVirtualDevice> device = DeviceAt(engine, index);
        if (filters.empty() || !Named(filters, NameOf(*device.Get()).View())) continue;
        if (options & ReturnRouteGroups)
            AppendItemNames(*device.Get(), &RQVirtualDevice::get_RouteGroups, IID_RQRouteGroups, IID_RQRouteGroup, names);
        if (options & ReturnRoutes)
            AppendItemNames(*device.Get(), &RQVirtualDevice::get_Routes, IID_RQRoutes, IID_RQRoute, names);
        if (options & ReturnLogicalNames)
            AppendItemNames(*device.Get(), &RQVirtualDevice::get_IviDevices, IID_RQIviDevices, IID_RQIviDevice, names);
    }
}

}  // namespace sm
