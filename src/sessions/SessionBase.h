// The category-independent part of every session: identity, data items, the keyed session lock,
// the close function and the helpers category classes share. Automation wrappers (InstrSession.h)
// call these operations with converted arguments while holding objectLock.
#pragma once

#include <cstdint>
#include <memory>
#include <mutex>
#include <string_view>
#include <vector>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/ReleaseSignal.h"
#include "com/UniqueHandles.h"
#include "framework/String.h"
#include "sessions/SessionOwner.h"
#include "sessions/VPPBaseCaller.h"

namespace sm {

enum class DataItemKind : std::int32_t { Object = 0, Long = 1, String = 2, LongPtr = 3 };

struct DataItem {
    DataItemKind kind = DataItemKind::Long;
    DynamicString id;
    DynamicString clsid;
    ComPtr<IUnknown> object;
    bool releaseOnClose = false;
    std::int64_t value = 0;
    DynamicString text;
};

class SessionBase : public VPPBaseCaller {
public:
    SessionBase();
    ~SessionBase() override;
    SessionBase(const SessionBase&) = delete;
    SessionBase& operator=(const SessionBase&) = delete;

    virtual void GetName(String& result) const { result.Assign(name); }
    virtual void GetCategory(String& result) const { result.Assign(category); }
    // The category as the session was created with it; GetCategory may add a sub-category.
    const String& Category() const { return category; }
    virtual void SetName(const String& value) {
        name.Assign(value);
        if (owner) owner->SessionNamesChanged(*this);
    }
    virtual void SetCategory(const String& value) {
        category.Assign(value);
        if (owner) owner->SessionNamesChanged(*this);
    }
    virtual bool HasName(std::string_view candidate) const;
    // Every name HasName accepts, for the manager's lookup index. A class that overrides HasName
    // overrides AppendNames in the same class, or its sessions are found by scanning instead.
    virtual void AppendNames(StringVector& names) const { names.push_back(name); }
    // False when AppendNames may miss names HasName accepts (see InstrSession::ListNames).
    virtual bool ListNames(StringVector&) const { return false; }
    virtual bool AcceptsSubcategory(std::string_view subCategory) const;

    // Set by the manager right after creation; the session keeps a counted reference on it.
    void AttachToOwner(SessionOwner* owner, bool external);
    SessionOwner* Owner() const { return owner; }
    bool IsInExternalProcess() const { return inExternalProcess; }
    void SetInExternalProcess(bool value) { inExternalProcess = value; }

    // Data items.
    void GenerateUniqueID(String& result);
    DataItem* FindDataItem(std::string_view id);
    void base_AttachObject(std::string_view id, IUnknown* object, std::string_view clsid, bool releaseOnClose);
    void base_AttachLong(std::string_view id, std::int32_t value);
    void base_AttachLongPtr(std::string_view id, const VARIANT& value);
    void base_AttachString(std::string_view id, std::string_view value);
    ComPtr<IUnknown> base_GetObject(std::string_view id);
    std::int32_t base_GetLong(std::string_view id);
    void base_GetLongPtr(std::string_view id, VARIANT* result);
    void base_GetString(std::string_view id, String& result);
    void DetachData(std::string_view id);

    // The keyed, nestable, advisory session lock.
    bool TryLockSession(std::string_view key);
    void base_LockSession(std::string_view key, double timeoutSeconds);
    void base_UnlockSession();
    void GetLockState(String& ownerKey, std::int32_t& nestingLevel);

    // Calls the close function once (it is cleared first) and drops release-on-close objects.
    // Objects dropped inside a SessionCall are released when the outermost call leaves objectLock.
    void RunCloseActions(IInstrSession* self);
    void AppendDataItemsDescription(String& text) const;

    // The init-option rules themselves live in framework/InitOptions.h.
    static bool ExtractInitOption(String& options, std::string_view optionName, String& value);
    static bool GetBooleanInitOptionValue(std::string_view value);
    static std::uint64_t Variant2Pointer(const VARIANT& value);

    // Serialises the automation methods; recursive, so a close function may call back in.
    CriticalSection objectLock;

    // Holds objectLock for one automation call. Releasing an object may run its owner's code, which
    // may reach a final release that takes the manager's lock, while the manager takes a session's
    // lock after its own: so objects that calls drop are released only when the outermost call has
    // left objectLock.
    class SessionCall {
    public:
        explicit SessionCall(SessionBase& session);
        ~SessionCall();
        SessionCall(const SessionCall&) = delete;
        SessionCall& operator=(const SessionCall&) = delete;

    private:
        SessionBase& session;
    };

protected:
    bool initialized = false;
    bool inExternalProcess = false;
    DynamicString name;
    DynamicString category;
    bool closeEnabled = true;
    std::uint64_t closeFunction = 0;
    std::uint32_t uniqueIdCounter = 0;
    std::vector<std::unique_ptr<DataItem>> dataItems;
    DynamicString driverLibraryPath;
    DynamicString lockKey;
    std::int32_t lockLevel = 0;

private:
    // Releases at once outside a SessionCall, otherwise when the outermost call leaves objectLock.
    void Drop(ComPtr<IUnknown> object);
    void AppendItem(std::unique_ptr<DataItem> item, std::string_view id);
    DataItem& FindItemOfKind(std::string_view id, DataItemKind kind, const char* function);

    SessionOwner* owner = nullptr;
    ComPtr<IUnknown> ownerReference;
    // Waiters for the session lock sleep here between attempts; a release wakes them at once
    // instead of leaving them to their next poll.
    ReleaseSignal released;
    // Guarded by objectLock.
    std::uint32_t callDepth = 0;
    std::vector<ComPtr<IUnknown>> droppedObjects;
};

}  // namespace sm
