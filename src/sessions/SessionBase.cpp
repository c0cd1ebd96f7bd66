#include "sessions/SessionBase.h"

#include <algorithm>
#include <chrono>
#include <limits>

#include "com/BstrConversion.h"
#include "framework/InitOptions.h"
#include "framework/LanguageStrings.h"
#include "framework/TEException.h"
#include "sessions/LifeTimeAlerts.h"

namespace sm {

namespace {
double SecondsNow() {
    using namespace std::chrono;
    return duration<double>(steady_clock::now().time_since_epoch()).count();
}

const char* const attachFunctions[] = {"SessionBase::base_AttachObject", "SessionBase::base_AttachLong",
                                       "SessionBase::base_AttachString", "SessionBase::base_AttachLongPtr"};
}  // namespace

SessionBase::SessionBase() { LifeTimeAlert(1000, 500); }

SessionBase::~SessionBase() {
    LifeTimeAlert(4000, 500);
    ownerReference.Reset();
    DetachData("");
}

// Equal texts have equal byte lengths (see SameCategory); most candidates differ in length.
bool SessionBase::HasName(std::string_view candidate) const {
    return name.Size() == candidate.size() && name.Compare(candidate, true) == 0;
}

bool SessionBase::AcceptsSubcategory(std::string_view subCategory) const {
    return subCategory.empty() || subCategory == "?";
}

void SessionBase::AttachToOwner(SessionOwner* newOwner, bool external) {
    owner = newOwner;
    ownerReference = ComPtr<IUnknown>(newOwner ? newOwner->OwnerIdentity() : nullptr);
    inExternalProcess = external;
}

// ---- data items -----------------------------------------------------------------------------------

void SessionBase::GenerateUniqueID(String& result) {
    ++uniqueIdCounter;
    result.Assign("UniqueId");
    result.AppendUnsigned(uniqueIdCounter);
}

DataItem* SessionBase::FindDataItem(std::string_view id) {
    for (auto& item : dataItems)
        if (item->id.View() == id) return item.get();
    return nullptr;
}

void SessionBase::AppendItem(std::unique_ptr<DataItem> item, std::string_view id) {
    item->id.Assign(id);
    dataItems.push_back(std::move(item));
}

void SessionBase::base_AttachObject(std::string_view id, IUnknown* object, std::string_view clsid, bool releaseOnClose) {
    if (FindDataItem(id)) TE_RAISE(TE_DUPLICATE_ITEM_OR_VALUE, attachFunctions[0]);
    auto item = std::make_unique<DataItem>();
    item->kind = DataItemKind::Object;
    item->object = ComPtr<IUnknown>(object);
    item->clsid.Assign(clsid);
    item->releaseOnClose = releaseOnClose;
    AppendItem(std::move(item), id);
}

void SessionBase::base_AttachLong(std::string_view id, std::int32_t value) {
    if (FindDataItem(id)) TE_RAISE(TE_DUPLICATE_ITEM_OR_VALUE, attachFunctions[1]);
    auto item = std::make_unique<DataItem>();
    item->kind = DataItemKind::Long;
    item->value = value;
    AppendItem(std::move(item), id);
}

void SessionBase::base_AttachString(std::string_view id, std::string_view value) {
    if (FindDataItem(id)) TE_RAISE(TE_DUPLICATE_ITEM_OR_VALUE, attachFunctions[2]);
    auto item = std::make_unique<DataItem>();
    item->kind = DataItemKind::String;
    item->text.Assign(value);
    AppendItem(std::move(item), id);
}

void SessionBase::base_AttachLongPtr(std::string_view id, const VARIANT& value) {
    if (FindDataItem(id)) TE_RAISE(TE_DUPLICATE_ITEM_OR_VALUE, attachFunctions[3]);
    auto item = std::make_unique<DataItem>();
    item->kind = DataItemKind::LongPtr;
    item->value = static_cast<std::int64_t>(Variant2Pointer(value));
    AppendItem(std::move(item), id);
}

DataItem& SessionBase::FindItemOfKind(std::string_view id, DataItemKind kind, const char* function) {
    DataItem* item = FindDataItem(id);
    if (!item) TE_RAISE(TE_UNRECOGNIZED_VALUE, function);
    if (item->kind != kind) TE_RAISE(TE_TYPE_MISMATCH_ERROR, function);
    return *item;
}

ComPtr<IUnknown> SessionBase::base_GetObject(std::string_view id) {
    constexpr const char* function = "SessionBase::base_GetObject";
    DataItem& item = FindItemOfKind(id, DataItemKind::Object, function);
    if (item.object) return item.object;
    if (item.clsid.IsEmpty()) TE_RAISE(TE_OPERATION_FAILED, function);
    UniqueBstr clsidText(AllocSysString(item.clsid.View()));
    CLSID classId{};
    HRESULT parsed = ::CLSIDFromString(clsidText.Get(), &classId);
    if (FAILED(parsed)) TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, function, RaiseDetails{.apiErrorCode = parsed});
    ComPtr<IUnknown> created;
    HRESULT creation = ::CoCreateInstance(classId, nullptr, CLSCTX_ALL, IID_IUnknown, created.PutVoid());
    if (FAILED(creation)) TE_RAISE(TE_OPERATION_FAILED, function, RaiseDetails{.apiErrorCode = creation});
    item.object = created;
    return created;
}

std::int32_t SessionBase::base_GetLong(std::string_view id) {
    return static_cast<std::int32_t>(FindItemOfKind(id, DataItemKind::Long, "SessionBase::base_GetLong").value);
}

void SessionBase::base_GetLongPtr(std::string_view id, VARIANT* result) {
    DataItem& item = FindItemOfKind(id, DataItemKind::LongPtr, "SessionBase::base_GetLongPtr");
    ::VariantInit(result);
    result->vt = VT_I8;
    result->llVal = item.value;
}

void SessionBase::base_GetString(std::string_view id, String& result) {
    result.Assign(FindItemOfKind(id, DataItemKind::String, "SessionBase::base_GetString").text);
}

void SessionBase::DetachData(std::string_view id) {
    // Taken out of the list before they are released: releasing an object may call back into us.
    for (std::size_t index = dataItems.size(); index-- > 0;) {
        if (id.empty() || dataItems[index]->id.View() == id) {
            std::unique_ptr<DataItem> removed = std::move(dataItems[index]);
            dataItems.erase(dataItems.begin() + static_cast<std::ptrdiff_t>(index));
            Drop(std::move(removed->object));
        }
    }
}

void SessionBase::Drop(ComPtr<IUnknown> object) {
    if (object && callDepth > 0) droppedObjects.push_back(std::move(object));
}

SessionBase::SessionCall::SessionCall(SessionBase& session) : session(session) {
    session.objectLock.Lock();
    ++session.callDepth;
}

SessionBase::SessionCall::~SessionCall() {
    std::vector<ComPtr<IUnknown>> dropped;
    if (--session.callDepth == 0) dropped.swap(session.droppedObjects);
    session.objectLock.Unlock();
    // dropped is released here, with objectLock left.
}

// ---- session lock ---------------------------------------------------------------------------------

bool SessionBase::TryLockSession(std::string_view key) {
    CriticalSectionGuard guard(objectLock);
    if (lockLevel == 0) {
        lockLevel = 1;
        lockKey.Assign(key);
        return true;
    }
    if (lockKey.Compare(key, true) == 0) {
        ++lockLevel;
        return true;
    }
    return false;
}

void SessionBase::base_LockSession(std::string_view key, double timeoutSeconds) {
    double start = SecondsNow();
    if (key.empty()) TE_RAISE(TE_INVALID_OR_OUT_OF_RANGE, "SessionBase::base_LockSession");
    double deadline = timeoutSeconds < 0 ? std::numeric_limits<double>::max() : start + timeoutSeconds;
    do {
        std::uint64_t seen = released.Count();
        if (TryLockSession(key)) return;
        // Written so that a NaN timeout (a NaN deadline) waits no time instead of converting NaN.
        double remaining = deadline - SecondsNow();
        remaining = remaining > 0.2 ? 0.2 : remaining > 0.0 ? remaining : 0.0;
        released.WaitForChange(seen, static_cast<DWORD>(remaining * 1000.0));
    } while (deadline > SecondsNow());
    TE_RAISE(TE_OPERATION_TIMED_OUT, "SessionBase::base_LockSession");
}

void SessionBase::base_UnlockSession() {
    CriticalSectionGuard guard(objectLock);
    if (lockLevel < 1) TE_RAISE(TE_OPERATION_FAILED, "SessionBase::base_UnlockSession");
    if (--lockLevel == 0) {
        lockKey.Empty();
        released.Signal();
    }
}

void SessionBase::GetLockState(String& ownerKey, std::int32_t& nestingLevel) {
    CriticalSectionGuard guard(objectLock);
    ownerKey.Assign(lockKey);
    nestingLevel = lockLevel;
}

// ---- close and state text -------------------------------------------------------------------------

void SessionBase::RunCloseActions(IInstrSession* self) {
    if (closeFunction != 0) {
        auto function = reinterpret_cast<void(__stdcall*)(IInstrSession*)>(static_cast<std::uintptr_t>(closeFunction));
        closeFunction = 0;
        function(self);
    }
    for (std::size_t index = 0; index < dataItems.size(); ++index) {
        DataItem& item = *dataItems[index];
        if (item.kind == DataItemKind::Object && item.releaseOnClose && item.object) Drop(std::move(item.object));
    }
}

void SessionBase::AppendDataItemsDescription(String& text) const {
    if (dataItems.empty()) return;
    text.Append("      Data Items: ");
    text.AppendUnsigned(dataItems.size());
    text.Append("\n");
    for (std::size_t index = 0; index < dataItems.size(); ++index) {
        const DataItem& item = *dataItems[index];
        text.Append("         Item #");
        text.AppendUnsigned(index);
        text.Append(", Id: ").Append(item.id).Append(", DataType: ");
        switch (item.kind) {
            case DataItemKind::Object:
                text.Append("Object: ");
                text.AppendUnsigned(reinterpret_cast<std::uintptr_t>(item.object.Get()), "%x");
                text.Append(", ReleaseOnClose: ").Append(item.releaseOnClose ? "true" : "false");
                text.Append(", CLSID: ").Append(item.clsid);
                break;
            case DataItemKind::Long:
                text.Append("Long: ");
                text.AppendInteger(item.value);
                break;
            case DataItemKind::String:
                text.Append("String: ").Append(item.text);
                break;
            case DataItemKind::LongPtr:
                text.Append("LongPtr: ");
                text.AppendInteger(item.value);
                break;
        }
        text.Append("\n");
    }
}

// ---- helpers for category classes -----------------------------------------------------------------

bool SessionBase::ExtractInitOption(String& options, std::string_view optionName, String& value) {
    return sm::ExtractInitOption(options, optionName, value);
}

bool SessionBase::GetBooleanInitOptionValue(std::string_view value) { return sm::GetBooleanInitOptionValue(value); }

std::uint64_t SessionBase::Variant2Pointer(const VARIANT& value) {
    if (value.vt == VT_I8) return static_cast<std::uint64_t>(value.llVal);
    if (value.vt == VT_UI8) return value.ullVal;
    TE_RAISE(TE_INVALID_POINTER, "Variant2Pointer");
}

}  // namespace sm
