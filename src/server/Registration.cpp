// DllRegisterServer and DllUnregisterServer: the ProgID and CLSID keys of every class in the object
// map, and the type library.
#include <windows.h>
#include <ole2.h>

#include <cwchar>
#include <functional>
#include <string>

#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/TypeLibrary.h"
#include "com/UniqueHandles.h"
#include "server/ObjectMap.h"

namespace sm {
namespace {

std::string GuidText(const GUID& guid) {
    wchar_t wide[40] = {};
    ::StringFromGUID2(guid, wide, 40);
    char narrow[40] = {};
    ::WideCharToMultiByte(CP_ACP, 0, wide, -1, narrow, sizeof narrow, nullptr, nullptr);
    return narrow;
}

// The module path goes in wide, as the loader gave it: a folder name outside the ANSI code page must
// still name this file.
LSTATUS SetModulePath(HKEY root, const std::string& subKey) {
    UniqueRegistryKey key;
    LSTATUS status = ::RegCreateKeyExA(root, subKey.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, key.Put(), nullptr);
    if (status != ERROR_SUCCESS) return status;
    const wchar_t* path = GetOwnModulePath();
    auto bytes = static_cast<DWORD>((std::wcslen(path) + 1) * sizeof(wchar_t));
    return ::RegSetValueExW(key.Get(), nullptr, 0, REG_SZ, reinterpret_cast<const BYTE*>(path), bytes);
}

// Creates root\subKey (and its parents) and sets one string value; a null value name is the default.
LSTATUS SetString(HKEY root, const std::string& subKey, const char* valueName, const std::string& value) {
    UniqueRegistryKey key;
    LSTATUS status = ::RegCreateKeyExA(root, subKey.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, key.Put(), nullptr);
    if (status != ERROR_SUCCESS) return status;
    return ::RegSetValueExA(key.Get(), valueName, 0, REG_SZ, reinterpret_cast<const BYTE*>(value.c_str()),
                            static_cast<DWORD>(value.size() + 1));
}

LSTATUS CreateKey(HKEY root, const std::string& subKey) {
    UniqueRegistryKey key;
    return ::RegCreateKeyExA(root, subKey.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, key.Put(), nullptr);
}

LSTATUS DeleteTree(HKEY root, const std::string& subKey) {
    LSTATUS status = ::RegDeleteTreeA(root, subKey.c_str());
    if (status == ERROR_SUCCESS) status = ::RegDeleteKeyA(root, subKey.c_str());
    return status == ERROR_FILE_NOT_FOUND ? ERROR_SUCCESS : status;
}

HRESULT Check(LSTATUS status) { return status == ERROR_SUCCESS ? S_OK : HRESULT_FROM_WIN32(status); }

HRESULT RegisterClass(const ObjectMapEntry& entry) {
    std::string name = entry.className;
    std::string description = name + " Class";
    std::string classIdText = GuidText(*entry.classId);
    std::string progId = "SessionMgr." + name + ".1";
    std::string independentProgId = "SessionMgr." + name;
    std::string classKey = "CLSID\\" + classIdText;
    // Each step runs only when the one before it succeeded: the first failure is the answer.
    const std::function<LSTATUS()> steps[] = {
        [&] { return SetString(HKEY_CLASSES_ROOT, progId, nullptr, description); },
        [&] { return SetString(HKEY_CLASSES_ROOT, progId + "\\CLSID", nullptr, classIdText); },
        [&] { return SetString(HKEY_CLASSES_ROOT, independentProgId, nullptr, description); },
        [&] { return SetString(HKEY_CLASSES_ROOT, independentProgId + "\\CLSID", nullptr, classIdText); },
        [&] { return SetString(HKEY_CLASSES_ROOT, independentProgId + "\\CurVer", nullptr, progId); },
        // The class key is replaced whole, so nothing of an older registration survives.
        [&] { return DeleteTree(HKEY_CLASSES_ROOT, classKey); },
        [&] { return SetString(HKEY_CLASSES_ROOT, classKey, nullptr, description); },
        [&] { return SetString(HKEY_CLASSES_ROOT, classKey + "\\ProgID", nullptr, progId); },
        [&] { return SetString(HKEY_CLASSES_ROOT, classKey + "\\VersionIndependentProgID", nullptr, independentProgId); },
        [&] { return CreateKey(HKEY_CLASSES_ROOT, classKey + "\\Programmable"); },
        [&] { return SetModulePath(HKEY_CLASSES_ROOT, classKey + "\\InprocServer32"); },
        [&] { return SetString(HKEY_CLASSES_ROOT, classKey + "\\InprocServer32", "ThreadingModel", "Free"); },
        [&] { return SetString(HKEY_CLASSES_ROOT, classKey + "\\TypeLib", nullptr, GuidText(LIBID_SM)); },
    };
    for (const auto& step : steps)
        if (LSTATUS status = step(); status != ERROR_SUCCESS) return Check(status);
    return S_OK;
}

HRESULT UnregisterClass(const ObjectMapEntry& entry) {
    std::string name = entry.className;
    const std::string keys[] = {"SessionMgr." + name + ".1", "SessionMgr." + name, "CLSID\\" + GuidText(*entry.classId)};
    for (const std::string& key : keys)
        if (LSTATUS status = DeleteTree(HKEY_CLASSES_ROOT, key); status != ERROR_SUCCESS) return Check(status);
    return S_OK;
}

// The type library is filed under its own locale (0x409). Wine's type-library marshaler looks a
// library up under the neutral locale only, so without a neutral entry our interfaces cannot be
// marshaled between apartments and every early-bound call from a single-threaded apartment fails
// with E_NOINTERFACE. The neutral entry names the same file.
std::string NeutralLocaleKey() { return "TypeLib\\" + GuidText(LIBID_SM) + "\\1.0\\0"; }

HRESULT RegisterNeutralLocale() {
    UniqueBstr path;
    if (HRESULT found = ::QueryPathOfRegTypeLib(LIBID_SM, 1, 0, 0x409, path.Put()); FAILED(found)) return found;
    std::wstring platformKey;
    for (char c : NeutralLocaleKey() + "\\win64") platformKey += static_cast<wchar_t>(c);
    UniqueRegistryKey key;
    LSTATUS status = ::RegCreateKeyExW(HKEY_CLASSES_ROOT, platformKey.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr,
                                       key.Put(), nullptr);
    if (status != ERROR_SUCCESS) return Check(status);
    auto bytes = static_cast<DWORD>((::SysStringLen(path.Get()) + 1) * sizeof(wchar_t));
    return Check(::RegSetValueExW(key.Get(), nullptr, 0, REG_SZ, reinterpret_cast<const BYTE*>(path.Get()), bytes));
}

}  // namespace
}  // namespace sm

using namespace sm;

extern "C" HRESULT STDAPICALLTYPE DllRegisterServer() {
    for (const ObjectMapEntry& entry : GetObjectMap())
        if (HRESULT result = RegisterClass(entry); FAILED(result)) return result;
    ComPtr<ITypeLib> library;
    if (HRESULT result = ::LoadTypeLibEx(GetOwnModulePath(), REGKIND_REGISTER, library.Put()); FAILED(result))
        return result;
    return RegisterNeutralLocale();
}

extern "C" HRESULT STDAPICALLTYPE DllUnregisterServer() {
    for (const ObjectMapEntry& entry : GetObjectMap())
        if (HRESULT result = UnregisterClass(entry); FAILED(result)) return result;
    // Removed first: the library's version key goes away only when no locale is left under it.
    if (HRESULT result = Check(DeleteTree(HKEY_CLASSES_ROOT, NeutralLocaleKey())); FAILED(result)) return result;
    // An installer that unregisters twice must not fail the second time: a library that is no
    // longer registered is already where unregistering would put it.
    UniqueBstr registered;
    if (FAILED(::QueryPathOfRegTypeLib(LIBID_SM, 1, 0, 0x409, registered.Put()))) return S_OK;
    return ::UnRegisterTypeLib(LIBID_SM, 1, 0, 0x409, SYS_WIN64);
}
