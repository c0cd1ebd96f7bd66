// What registration leaves in the registry: the served classes' keys are dumped and compared with
// registration.expected (a differing dump goes to registration.actual). Every test leaves the DLL registered.
#include <gtest/gtest.h>

#include <fstream>
#include <sstream>
#include <optional>
#include <set>
#include <string>

#include "com/ComClient.h"
#include "com/LibraryBinding.h"
#include "TempFolder.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

constexpr const char* libraryId = "{5C2F91A0-3E44-4B7D-9A15-2D6E8B0C47F1}";
const std::string expected = ReadFileBytes(REGISTRATION_EXPECTED);

bool KeyExists(const std::string& path) {
    UniqueRegistryKey key;
    return ::RegOpenKeyExA(HKEY_CLASSES_ROOT, path.c_str(), 0, KEY_READ, key.Put()) == ERROR_SUCCESS;
}

// A string value under HKEY_CLASSES_ROOT (a null name reads the default value); nullopt when missing.
std::optional<std::string> ReadString(const std::string& path, const char* valueName = nullptr) {
    char buffer[1024] = {};
    DWORD size = sizeof buffer;
    if (::RegGetValueA(HKEY_CLASSES_ROOT, path.c_str(), valueName, RRF_RT_REG_SZ, nullptr, buffer, &size) != ERROR_SUCCESS)
        return std::nullopt;
    return std::string(buffer);
}

// A key's values ("path: name = value") and subkeys, sorted; the module path reads as <module>.
std::string Dump(const std::string& path, const std::string& modulePath) {
    UniqueRegistryKey key;
    if (::RegOpenKeyExA(HKEY_CLASSES_ROOT, path.c_str(), 0, KEY_READ, key.Put()) != ERROR_SUCCESS) return "";
    std::set<std::string> values, subkeys;
    char name[256], data[1024];
    for (DWORD index = 0, length = sizeof name, size = sizeof data, type = 0;
         ::RegEnumValueA(key.Get(), index, name, &length, nullptr, &type, reinterpret_cast<BYTE*>(data), &size) == ERROR_SUCCESS;
         ++index, length = sizeof name, size = sizeof data) {
        std::string value = type == REG_SZ ? std::string(data) : "<type " + std::to_string(type) + ">";
        values.insert(path + ": " + name + " = " + (value == modulePath ? "<module>" : value) + "\n");
    }
    for (DWORD index = 0, length = sizeof name; ::RegEnumKeyExA(key.Get(), index, name, &length, nullptr, nullptr, nullptr, nullptr) == ERROR_SUCCESS;
         ++index, length = sizeof name)
        subkeys.insert(name);
    std::string text = path + "\n";
    for (const std::string& value : values) text += value;
    for (const std::string& subkey : subkeys) text += Dump(path + "\\" + subkey, modulePath);
    return text;
}

// Every root the expected file names (a ProgID, or CLSID\{class}), dumped in the file's order.
std::string DumpServedClasses(const std::string& modulePath) {
    std::string text;
    std::set<std::string> done;
    std::istringstream lines(expected);
    for (std::string line; std::getline(lines, line);) {
        std::string root = line.substr(0, line.find_first_of(":\\", line.rfind("CLSID\\", 0) == 0 ? 6 : 0));
        if (done.insert(root).second) text += Dump(root, modulePath);
    }
    return text;
}

class Registration : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(module) << "cannot load " << SESSIONMGR_DLL_PATH << ", error " << ::GetLastError();
        ASSERT_NE(registerServer, nullptr);
        ASSERT_NE(unregisterServer, nullptr);
        char path[MAX_PATH + 1] = {};
        ASSERT_GT(::GetModuleFileNameA(module.Get(), path, MAX_PATH), 0u);
        modulePath = path;
    }
    // Whatever a test did, the DLL stays registered for the other test programs.
    void TearDown() override {
        if (registerServer) {
            EXPECT_EQ(registerServer(), S_OK);
        }
    }
    HRESULT Call(const char* exportName) { return GetProcAddressAs<HRESULT STDAPICALLTYPE()>(module.Get(), exportName)(); }
    // The served classes' keys as the expected file has them; a difference leaves the whole dump behind.
    void ExpectTheClassKeys() {
        std::string actual = DumpServedClasses(modulePath);
        if (actual != expected) std::ofstream(REGISTRATION_ACTUAL, std::ios::binary) << actual;
        EXPECT_EQ(actual, expected) << "the whole dump is in " << REGISTRATION_ACTUAL;
    }

    UniqueModule module{::LoadLibraryA(SESSIONMGR_DLL_PATH)};
    HRESULT(STDAPICALLTYPE* registerServer)() = GetProcAddressAs<HRESULT STDAPICALLTYPE()>(module.Get(), "DllRegisterServer");
    HRESULT(STDAPICALLTYPE* unregisterServer)() = GetProcAddressAs<HRESULT STDAPICALLTYPE()>(module.Get(), "DllUnregisterServer");
    std::string modulePath;
};
}  // namespace

TEST_F(Registration, UnregisterRemovesEveryClassAndTheTypeLibrary) {
    ASSERT_EQ(registerServer(), S_OK);
    ASSERT_EQ(unregisterServer(), S_OK);
    EXPECT_EQ(DumpServedClasses(modulePath), "");
    EXPECT_FALSE(KeyExists(std::string("TypeLib\\") + libraryId));
    // Unregistering an unregistered server succeeds.
    EXPECT_EQ(unregisterServer(), S_OK);
}

// Leftovers of an older registration under a class key must not survive a new one, nor may a
// second registration over the first add anything.
TEST_F(Registration, WritesEveryKeyOfTheTableAndReplacesClassKeysWhole) {
    ASSERT_EQ(unregisterServer(), S_OK);
    ASSERT_EQ(registerServer(), S_OK);
    const std::string classKey = "CLSID\\{7D4A10B1-2C88-4E21-B3F6-91E5A07D2C3B}";
    for (const char* subkey : {"\\LocalServer32", "\\Programmable", "\\InprocServer32"})
        ASSERT_EQ(::RegSetKeyValueA(HKEY_CLASSES_ROOT, (classKey + subkey).c_str(), "Stale", REG_SZ, "1", 2), ERROR_SUCCESS);
    ASSERT_EQ(registerServer(), S_OK);
    ExpectTheClassKeys();
    // VISA sessions are made by the manager only: no keys of their own.
    EXPECT_FALSE(KeyExists("CLSID\\{A61E03D4-58B2-4C9F-8E07-3B9D12F6A5C8}"));
    // That the interfaces marshal through it is ListingTest's cross-apartment test.
    EXPECT_EQ(::LoadRegTypeLib(LIBID_SM, 1, 0, 0x409, ComPtr<ITypeLib>().Put()), S_OK);
    // Also filed under the neutral locale, where Wine's marshaler looks for it, naming the same file.
    const std::string versionKey = std::string("TypeLib\\") + libraryId + "\\1.0";
    ASSERT_TRUE(ReadString(versionKey + "\\409\\win64").has_value());
    EXPECT_EQ(ReadString(versionKey + "\\0\\win64"), ReadString(versionKey + "\\409\\win64"));
}

// Fault: a class object held by a client did not count in the module lock, so DllCanUnloadNow
// answered S_OK and the DLL could be unloaded under the client's factory.
TEST_F(Registration, HeldClassObjectKeepsTheModuleLoaded) {
    HRESULT before = Call("DllCanUnloadNow");
    ComPtr<IClassFactory> factory;
    auto getClassObject = GetProcAddressAs<HRESULT STDAPICALLTYPE(REFCLSID, REFIID, void**)>(module.Get(), "DllGetClassObject");
    // The manager makes VISA sessions; no class object may hand them out.
    EXPECT_EQ(getClassObject(CLSID_VisaInstrSession, IID_IClassFactory, factory.PutVoid()), CLASS_E_CLASSNOTAVAILABLE);
    ASSERT_EQ(getClassObject(CLSID_CustomInstrSession, IID_IClassFactory, factory.PutVoid()), S_OK);
    EXPECT_EQ(Call("DllCanUnloadNow"), S_FALSE);
    factory.Reset();
    EXPECT_EQ(Call("DllCanUnloadNow"), before);
}

// Fault: the module path went through the ANSI code page, so a folder named outside it was
// registered as question marks.
TEST_F(Registration, ModulePathOutsideTheAnsiCodePageIsRegisteredAsItIs) {
    wchar_t temp[MAX_PATH];
    ::GetTempPathW(MAX_PATH, temp);
    std::wstring folder = std::wstring(temp) + L"SessionMgr\u03A9\u6D4B", copy = folder + L"\\SessionMgrCopy.dll";
    ::CreateDirectoryW(folder.c_str(), nullptr);
    ASSERT_TRUE(::CopyFileW(std::wstring(modulePath.begin(), modulePath.end()).c_str(), copy.c_str(), FALSE));
    {
        UniqueModule copied(::LoadLibraryW(copy.c_str()));
        ASSERT_TRUE(copied);
        EXPECT_EQ(GetProcAddressAs<HRESULT STDAPICALLTYPE()>(copied.Get(), "DllRegisterServer")(), S_OK);
    }
    wchar_t registered[MAX_PATH * 2] = {};
    DWORD bytes = sizeof registered;
    EXPECT_EQ(::RegGetValueW(HKEY_CLASSES_ROOT, L"CLSID\\{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}\\InprocServer32", nullptr,
                             RRF_RT_REG_SZ, nullptr, registered, &bytes),
              ERROR_SUCCESS);
    EXPECT_EQ(std::wstring(registered), copy);
    ::DeleteFileW(copy.c_str());
    ::RemoveDirectoryW(folder.c_str());
}
