// Class objects and the module lock, and the module path written at registration, through the
// DLL's own exports.
#include <gtest/gtest.h>

#include <string>

#include "com/ComClient.h"
#include "com/LibraryBinding.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

using GetClassObjectFunction = HRESULT STDAPICALLTYPE(REFCLSID, REFIID, void**);
using PlainFunction = HRESULT STDAPICALLTYPE();

HRESULT CallExport(HMODULE module, const char* name) {
    auto* function = GetProcAddressAs<PlainFunction>(module, name);
    return function ? function() : E_NOTIMPL;
}

std::wstring Widened(const char* text) { return std::wstring(text, text + std::char_traits<char>::length(text)); }
}  // namespace

// Fault: a class object held by a client did not count in the module lock, so DllCanUnloadNow
// answered S_OK and the DLL could be unloaded under the client's factory.
TEST(ClassObjectFaults, HeldClassObjectKeepsTheModuleLoaded) {
    UniqueModule module(::LoadLibraryA(SESSIONMGR_DLL_PATH));
    ASSERT_TRUE(module);
    auto* getClassObject = GetProcAddressAs<GetClassObjectFunction>(module.Get(), "DllGetClassObject");
    ASSERT_NE(getClassObject, nullptr);
    HRESULT before = CallExport(module.Get(), "DllCanUnloadNow");
    ComPtr<IClassFactory> factory;
    ASSERT_EQ(getClassObject(CLSID_CustomInstrSession, IID_IClassFactory, factory.PutVoid()), S_OK);
    EXPECT_EQ(CallExport(module.Get(), "DllCanUnloadNow"), S_FALSE);
    factory.Reset();
    EXPECT_EQ(CallExport(module.Get(), "DllCanUnloadNow"), before);
}

// Fault: the module path went through the ANSI code page, so a folder named outside it was
// registered as question marks. The original DLL is registered again afterwards.
TEST(RegistrationFaults, ModulePathOutsideTheAnsiCodePageIsRegisteredAsItIs) {
    wchar_t temp[MAX_PATH];
    ::GetTempPathW(MAX_PATH, temp);
    std::wstring folder = std::wstring(temp) + L"SessionMgr\u03A9\u6D4B";
    ::CreateDirectoryW(folder.c_str(), nullptr);
    std::wstring copy = folder + L"\\SessionMgrCopy.dll";
    ASSERT_TRUE(::CopyFileW(Widened(SESSIONMGR_DLL_PATH).c_str(), copy.c_str(), FALSE));
    {
        UniqueModule copied(::LoadLibraryW(copy.c_str()));
        ASSERT_TRUE(copied);
        EXPECT_EQ(CallExport(copied.Get(), "DllRegisterServer"), S_OK);
    }
    wchar_t registered[MAX_PATH * 2] = {};
    DWORD bytes = sizeof registered;
    LSTATUS read = ::RegGetValueW(HKEY_CLASSES_ROOT, L"CLSID\\{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}\\InprocServer32",
                                  nullptr, RRF_RT_REG_SZ, nullptr, registered, &bytes);

    UniqueModule original(::LoadLibraryA(SESSIONMGR_DLL_PATH));
    ASSERT_TRUE(original);
    ASSERT_EQ(CallExport(original.Get(), "DllRegisterServer"), S_OK);
    ::DeleteFileW(copy.c_str());
    ::RemoveDirectoryW(folder.c_str());
    ASSERT_EQ(read, ERROR_SUCCESS);
    EXPECT_EQ(std::wstring(registered), copy);
}
