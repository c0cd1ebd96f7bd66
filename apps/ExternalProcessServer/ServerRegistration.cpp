#include "ServerRegistration.h"

#include <ole2.h>

#include <string>

#include "com/Interfaces.h"
#include "com/TypeLibrary.h"
#include "com/UniqueHandles.h"
#include "manager/ExternalProcessServer.h"

namespace sm {

namespace {
constexpr const wchar_t* progId = L"SessionMgr.ExternalProcessServer.1";
constexpr const wchar_t* independentProgId = L"SessionMgr.ExternalProcessServer";
constexpr const wchar_t* description = L"SessionMgr External Process Server";

std::wstring GuidText(const GUID& guid) {
    wchar_t text[40] = {};
    ::StringFromGUID2(guid, text, 40);
    return text;
}

std::wstring ClassKey() { return L"CLSID\\" + GuidText(CLSID_ExternalProcessServer); }

LSTATUS SetString(const std::wstring& subKey, const wchar_t* valueName, const std::wstring& value) {
    UniqueRegistryKey key;
    LSTATUS status =
        ::RegCreateKeyExW(HKEY_CLASSES_ROOT, subKey.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, key.Put(), nullptr);
    if (status != ERROR_SUCCESS) return status;
    return ::RegSetValueExW(key.Get(), valueName, 0, REG_SZ, reinterpret_cast<const BYTE*>(value.c_str()),
                            static_cast<DWORD>((value.size() + 1) * sizeof(wchar_t)));
}

LSTATUS DeleteTree(const std::wstring& subKey) {
    LSTATUS status = ::RegDeleteTreeW(HKEY_CLASSES_ROOT, subKey.c_str());
    if (status == ERROR_SUCCESS) status = ::RegDeleteKeyW(HKEY_CLASSES_ROOT, subKey.c_str());
    return status == ERROR_FILE_NOT_FOUND ? ERROR_SUCCESS : status;
}

HRESULT Check(LSTATUS status) { return status == ERROR_SUCCESS ? S_OK : HRESULT_FROM_WIN32(status); }
}  // namespace

HRESULT RegisterExternalProcessServer() {
    std::wstring classKey = ClassKey();
    std::wstring classIdText = GuidText(CLSID_ExternalProcessServer);
    // Quoted: COM runs the command line as written, and installation paths hold blanks.
    std::wstring command = L"\"" + std::wstring(GetOwnModulePath()) + L"\"";
    const LSTATUS steps[] = {
        DeleteTree(classKey),
        SetString(classKey, nullptr, description),
        SetString(classKey + L"\\LocalServer32", nullptr, command),
        SetString(classKey + L"\\ProgID", nullptr, progId),
        SetString(classKey + L"\\VersionIndependentProgID", nullptr, independentProgId),
        SetString(classKey + L"\\TypeLib", nullptr, GuidText(LIBID_SM)),
        SetString(progId, nullptr, description),
        SetString(std::wstring(progId) + L"\\CLSID", nullptr, classIdText),
        SetString(independentProgId, nullptr, description),
        SetString(std::wstring(independentProgId) + L"\\CLSID", nullptr, classIdText),
        SetString(std::wstring(independentProgId) + L"\\CurVer", nullptr, progId),
    };
    for (LSTATUS status : steps)
        if (status != ERROR_SUCCESS) return Check(status);
    return S_OK;
}

HRESULT UnregisterExternalProcessServer() {
    const LSTATUS steps[] = {DeleteTree(ClassKey()), DeleteTree(progId), DeleteTree(independentProgId)};
    for (LSTATUS status : steps)
        if (status != ERROR_SUCCESS) return Check(status);
    return S_OK;
}

}  // namespace sm
