// What DllRegisterServer and DllUnregisterServer leave in the registry: the ProgID and class keys of
// every served class, read back value by value, and the type library. The DLL is loaded by path and
// its exports are called directly; every test leaves the DLL registered for the tests after it.
#include <gtest/gtest.h>

#include <optional>
#include <set>
#include <string>
#include <vector>

#include "com/ComClient.h"
#include "com/LibraryBinding.h"

#ifndef SESSIONMGR_DLL_PATH
#error "SESSIONMGR_DLL_PATH must name the built SessionMgr.dll"
#endif

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

constexpr const char* libraryId = "{5C2F91A0-3E44-4B7D-9A15-2D6E8B0C47F1}";
constexpr const char* automationMarshaler = "{00020424-0000-0000-C000-000000000046}";

struct ServedClass {
    const char* name;
    const char* classId;
};

// Every class with a class object, as the registry must show it.
const ServedClass servedClasses[] = {
    {"IVIInstrSession", "{5C2F91AD-3E44-4B7D-9A15-2D6E8B0C47F1}"},
    {"VXIPNPInstrSession", "{5C2F91AF-3E44-4B7D-9A15-2D6E8B0C47F1}"},
    {"RQInstrSession", "{0B6C8A45-D3F7-4E19-87A2-C4E51F906B3D}"},
    {"InstrSessionMgr", "{7D4A10B1-2C88-4E21-B3F6-91E5A07D2C3B}"},
    {"VPPBase", "{2E8D6F19-A7C3-4B05-9D4E-60F3B8A21C7E}"},
    {"CustomInstrSession", "{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}"},
};

const char* const interfaceIds[] = {
    "{5C2F91AC-3E44-4B7D-9A15-2D6E8B0C47F1}",  // IInstrSession
    "{7D4A10B0-2C88-4E21-B3F6-91E5A07D2C3B}",  // IInstrSessionMgr
    "{C93B5E27-0D41-4A6E-B2F8-7E1A94C03D56}",  // IVPPBase
};

std::string ClassKey(const ServedClass& served) { return std::string("CLSID\\") + served.classId; }
std::string ProgId(const ServedClass& served) { return std::string("SessionMgr.") + served.name + ".1"; }
std::string IndependentProgId(const ServedClass& served) { return std::string("SessionMgr.") + served.name; }
std::string Description(const ServedClass& served) { return std::string(served.name) + " Class"; }

UniqueRegistryKey OpenKey(const std::string& path) {
    UniqueRegistryKey key;
    if (::RegOpenKeyExA(HKEY_CLASSES_ROOT, path.c_str(), 0, KEY_READ, key.Put()) != ERROR_SUCCESS) key.Reset();
    return key;
}

bool KeyExists(const std::string& path) { return static_cast<bool>(OpenKey(path)); }

// A string value of a key under HKEY_CLASSES_ROOT; nullopt when the key or value is missing or is
// not a plain string. A null name reads the default value.
std::optional<std::string> ReadString(const std::string& path, const char* valueName = nullptr) {
    UniqueRegistryKey key = OpenKey(path);
    if (!key) return std::nullopt;
    DWORD type = 0;
    char buffer[1024] = {};
    DWORD size = sizeof buffer - 1;
    if (::RegQueryValueExA(key.Get(), valueName, nullptr, &type, reinterpret_cast<BYTE*>(buffer), &size) !=
            ERROR_SUCCESS ||
        type != REG_SZ)
        return std::nullopt;
    return std::string(buffer);
}

// Names of a key's subkeys, or of its values (the default value appears as "").
std::set<std::string> Names(const std::string& path, bool values) {
    std::set<std::string> names;
    UniqueRegistryKey key = OpenKey(path);
    if (!key) return names;
    char name[256];
    for (DWORD index = 0;; ++index) {
        DWORD length = sizeof name;
        LSTATUS status = values ? ::RegEnumValueA(key.Get(), index, name, &length, nullptr, nullptr, nullptr, nullptr)
                                : ::RegEnumKeyExA(key.Get(), index, name, &length, nullptr, nullptr, nullptr, nullptr);
        if (status != ERROR_SUCCESS) break;
        names.insert(name);
    }
    return names;
}

std::set<std::string> SubkeyNames(const std::string& path) { return Names(path, false); }
std::set<std::string> ValueNames(const std::string& path) { return Names(path, true); }
const std::set<std::string> classSubkeys = {"InprocServer32", "ProgID", "Programmable", "TypeLib",
                                            "VersionIndependentProgID"};

void WriteString(const std::string& path, const char* valueName, const std::string& value) {
    UniqueRegistryKey key;
    ASSERT_EQ(::RegCreateKeyExA(HKEY_CLASSES_ROOT, path.c_str(), 0, nullptr, 0, KEY_WRITE, nullptr, key.Put(), nullptr),
              ERROR_SUCCESS);
    ASSERT_EQ(::RegSetValueExA(key.Get(), valueName, 0, REG_SZ, reinterpret_cast<const BYTE*>(value.c_str()),
                               static_cast<DWORD>(value.size() + 1)),
              ERROR_SUCCESS);
}

HRESULT LoadRegisteredTypeLibrary() {
    ComPtr<ITypeLib> library;
    return ::LoadRegTypeLib(LIBID_SM, 1, 0, 0x409, library.Put());
}

class Registration : public ::testing::Test {
protected:
    void SetUp() override {
        module.Reset(::LoadLibraryA(SESSIONMGR_DLL_PATH));
        ASSERT_TRUE(module) << "cannot load " << SESSIONMGR_DLL_PATH << ", error " << ::GetLastError();
        registerServer = GetProcAddressAs<HRESULT STDAPICALLTYPE()>(module.Get(), "DllRegisterServer");
        unregisterServer = GetProcAddressAs<HRESULT STDAPICALLTYPE()>(module.Get(), "DllUnregisterServer");
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

    UniqueModule module;
    HRESULT(STDAPICALLTYPE* registerServer)() = nullptr;
    HRESULT(STDAPICALLTYPE* unregisterServer)() = nullptr;
    std::string modulePath;
};
}  // namespace

TEST_F(Registration, UnregisterRemovesEveryClassAndTheTypeLibrary) {
    ASSERT_EQ(registerServer(), S_OK);
    ASSERT_EQ(unregisterServer(), S_OK);
    for (const ServedClass& served : servedClasses) {
        SCOPED_TRACE(served.name);
        EXPECT_FALSE(KeyExists(ProgId(served)));
        EXPECT_FALSE(KeyExists(IndependentProgId(served)));
        EXPECT_FALSE(KeyExists(ClassKey(served)));
    }
    // The shared key that holds every class stays.
    EXPECT_TRUE(KeyExists("CLSID"));
    EXPECT_FALSE(KeyExists(std::string("TypeLib\\") + libraryId));
    for (const char* interfaceId : interfaceIds) EXPECT_FALSE(KeyExists(std::string("Interface\\") + interfaceId));
    EXPECT_EQ(LoadRegisteredTypeLibrary(), TYPE_E_LIBNOTREGISTERED);

    ComPtr<IInstrSessionMgr> manager;
    EXPECT_EQ(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                 manager.PutVoid()),
              REGDB_E_CLASSNOTREG);
    // Unregistering an unregistered server succeeds.
    EXPECT_EQ(unregisterServer(), S_OK);
}

TEST_F(Registration, WritesEveryKeyOfTheTable) {
    ASSERT_EQ(unregisterServer(), S_OK);
    ASSERT_EQ(registerServer(), S_OK);
    for (const ServedClass& served : servedClasses) {
        SCOPED_TRACE(served.name);
        EXPECT_EQ(ReadString(ProgId(served)), Description(served));
        EXPECT_EQ(ReadString(ProgId(served) + "\\CLSID"), served.classId);
        EXPECT_EQ(SubkeyNames(ProgId(served)), std::set<std::string>{"CLSID"});

        EXPECT_EQ(ReadString(IndependentProgId(served)), Description(served));
        EXPECT_EQ(ReadString(IndependentProgId(served) + "\\CLSID"), served.classId);
        EXPECT_EQ(ReadString(IndependentProgId(served) + "\\CurVer"), ProgId(served));
        EXPECT_EQ(SubkeyNames(IndependentProgId(served)), (std::set<std::string>{"CLSID", "CurVer"}));

        const std::string classKey = ClassKey(served);
        EXPECT_EQ(ReadString(classKey), Description(served));
        EXPECT_EQ(SubkeyNames(classKey), classSubkeys);
        EXPECT_EQ(ReadString(classKey + "\\ProgID"), ProgId(served));
        EXPECT_EQ(ReadString(classKey + "\\VersionIndependentProgID"), IndependentProgId(served));
        EXPECT_EQ(ValueNames(classKey + "\\Programmable"), std::set<std::string>{});
        EXPECT_EQ(SubkeyNames(classKey + "\\Programmable"), std::set<std::string>{});
        EXPECT_EQ(ReadString(classKey + "\\InprocServer32"), modulePath);
        EXPECT_EQ(ReadString(classKey + "\\InprocServer32", "ThreadingModel"), "Free");
        EXPECT_EQ(ValueNames(classKey + "\\InprocServer32"), (std::set<std::string>{"", "ThreadingModel"}));
        EXPECT_EQ(ReadString(classKey + "\\TypeLib"), libraryId);
    }
    // The type library is registered: found by its LIBID, and the interfaces marshal through it.
    EXPECT_EQ(LoadRegisteredTypeLibrary(), S_OK);
    // Also filed under the neutral locale, where Wine's marshaler looks for it, naming the same file.
    const std::string versionKey = std::string("TypeLib\\") + libraryId + "\\1.0";
    ASSERT_TRUE(ReadString(versionKey + "\\409\\win64").has_value());
    EXPECT_EQ(ReadString(versionKey + "\\0\\win64"), ReadString(versionKey + "\\409\\win64"));
    for (const char* interfaceId : interfaceIds) {
        SCOPED_TRACE(interfaceId);
        EXPECT_EQ(ReadString(std::string("Interface\\") + interfaceId + "\\ProxyStubClsid32"), automationMarshaler);
        EXPECT_EQ(ReadString(std::string("Interface\\") + interfaceId + "\\TypeLib"), libraryId);
    }

    // And the classes can be created again.
    ComPtr<IInstrSessionMgr> manager;
    EXPECT_EQ(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                                 manager.PutVoid()),
              S_OK);
}

TEST_F(Registration, VisaSessionsHaveNoKeysAndRegisteringTwiceGivesTheSameKeys) {
    ASSERT_EQ(registerServer(), S_OK);
    ASSERT_EQ(registerServer(), S_OK);
    EXPECT_EQ(SubkeyNames(ClassKey(servedClasses[3])), classSubkeys);
    EXPECT_EQ(ReadString(IndependentProgId(servedClasses[3]) + "\\CurVer"), "SessionMgr.InstrSessionMgr.1");
    EXPECT_EQ(LoadRegisteredTypeLibrary(), S_OK);
    EXPECT_FALSE(KeyExists("SessionMgr.VisaInstrSession"));
    EXPECT_FALSE(KeyExists("SessionMgr.VisaInstrSession.1"));
    EXPECT_FALSE(KeyExists("CLSID\\{A61E03D4-58B2-4C9F-8E07-3B9D12F6A5C8}"));
}

TEST_F(Registration, ClassKeysAreReplacedWhole) {
    // Leftovers of an older registration under a class key must not survive a new one.
    const std::string classKey = ClassKey(servedClasses[3]);
    WriteString(classKey + "\\LocalServer32", nullptr, "C:\\old\\server.exe");
    WriteString(classKey + "\\Programmable", "Stale", "1");
    WriteString(classKey + "\\InprocServer32", "ThreadingModel", "Apartment");
    WriteString(classKey + "\\InprocServer32", "Stale", "1");
    ASSERT_EQ(registerServer(), S_OK);
    EXPECT_FALSE(KeyExists(classKey + "\\LocalServer32"));
    EXPECT_EQ(ValueNames(classKey + "\\Programmable"), std::set<std::string>{});
    EXPECT_EQ(ValueNames(classKey + "\\InprocServer32"), (std::set<std::string>{"", "ThreadingModel"}));
    EXPECT_EQ(ReadString(classKey + "\\InprocServer32", "ThreadingModel"), "Free");
}
