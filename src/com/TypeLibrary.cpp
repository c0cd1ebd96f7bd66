#include "com/TypeLibrary.h"

#include <windows.h>

#include <cstring>
#include <map>
#include <mutex>

#include "com/ComError.h"
#include "com/ComPtr.h"

namespace sm {

namespace {
struct GuidLess {
    bool operator()(const GUID& left, const GUID& right) const { return std::memcmp(&left, &right, sizeof(GUID)) < 0; }
};

struct TypeInfoCache {
    std::mutex lock;
    ComPtr<ITypeLib> library;
    std::map<GUID, ComPtr<ITypeInfo>, GuidLess> interfaces;
};

TypeInfoCache& Cache() {
    // Never destroyed: type infos may be used by objects that outlive static destruction at unload.
    static TypeInfoCache* cache = new TypeInfoCache;
    return *cache;
}
}  // namespace

const wchar_t* GetOwnModulePath() {
    static const wchar_t* path = [] {
        static wchar_t buffer[MAX_PATH + 1] = {};
        HMODULE self = nullptr;
        ::GetModuleHandleExW(GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT,
                             reinterpret_cast<LPCWSTR>(&GetOwnModulePath), &self);
        ::GetModuleFileNameW(self, buffer, MAX_PATH);
        return buffer;
    }();
    return path;
}

ITypeInfo* GetModuleTypeInfo(REFIID interfaceId) {
    TypeInfoCache& cache = Cache();
    std::lock_guard guard(cache.lock);
    if (auto found = cache.interfaces.find(interfaceId); found != cache.interfaces.end()) return found->second.Get();
    if (!cache.library) CheckHResult(::LoadTypeLibEx(GetOwnModulePath(), REGKIND_NONE, cache.library.Put()));
    ComPtr<ITypeInfo> info;
    CheckHResult(cache.library->GetTypeInfoOfGuid(interfaceId, info.Put()));
    ITypeInfo* raw = info.Get();
    cache.interfaces.emplace(interfaceId, std::move(info));
    return raw;
}

}  // namespace sm
