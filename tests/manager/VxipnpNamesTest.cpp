// The manager over a configuration file: VXIplug&play names in listings, in the search over all
// categories and in the state description. The directory comes from VXIPNPPATH, set before the
// manager first reads it.
#include <gtest/gtest.h>

#include <fstream>
#include <string>
#include <vector>

#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

const std::string root = [] {
    char temp[MAX_PATH];
    ::GetTempPathA(MAX_PATH, temp);
    std::string folder = std::string(temp) + "SessionMgrVxipnpNames";
    ::CreateDirectoryA(folder.c_str(), nullptr);
    ::CreateDirectoryA((folder + "\\Win64").c_str(), nullptr);
    std::ofstream(folder + "\\Win64\\QVSessionMgr.ini", std::ios::trunc)
        << "[VXIPNP Logical Names]\n"
           "DMM1 = \"VPPVInstr->Fluke\"\n"
           "[VPPVInstr->Fluke]\n"
           "ModulePath = \"fl45_64.dll\"\nPrefix = \"fl45\"\nResource = \"GPIB::14::INSTR\"\nIDQuery = True\nReset = True\n"
           "[VPPVInstr->Scope]\n"
           "ModulePath = \"sc_64.dll\"\nPrefix = \"sc\"\nResource = \"GPIB::15::INSTR\"\nIDQuery = True\nReset = True\n";
    ::SetEnvironmentVariableA("VXIPNPPATH", folder.c_str());
    return folder;
}();

std::vector<std::string> GetNames(IInstrSessionMgr* manager, const wchar_t* category, long flags, const wchar_t* filter) {
    auto categoryText = Bstr(category), filterText = Bstr(filter);
    UniqueSafeArray names;
    HRESULT result = manager->GetNames(categoryText.Get(), static_cast<GetNamesOptions>(flags), filterText.Get(), names.Put());
    EXPECT_EQ(result, S_OK) << TakeErrorInfo().description;
    std::vector<std::string> plain;
    if (!names) return plain;
    LONG upper = -1;
    ::SafeArrayGetUBound(names.Get(), 1, &upper);
    for (LONG index = 0; index <= upper; ++index) {
        UniqueBstr element;
        ::SafeArrayGetElement(names.Get(), &index, element.Put());
        plain.push_back(Text(element.Get()));
    }
    return plain;
}

using Names = std::vector<std::string>;
}  // namespace

TEST(VxipnpNames, ListedByKindPrefixAndFilter) {
    auto manager = CreateManager();
    EXPECT_EQ(GetNames(manager.Get(), L"VXIPNP", 2, L""), (Names{"Fluke", "Scope"}));
    EXPECT_EQ(GetNames(manager.Get(), L"VXIPNP", 1, L""), (Names{"DMM1"}));
    EXPECT_EQ(GetNames(manager.Get(), L"vxipnp", 3 | 8, L""), (Names{"VXIPNP::Fluke", "VXIPNP::DMM1", "VXIPNP::Scope"}));
    EXPECT_EQ(GetNames(manager.Get(), L"VXIPNP", 3, L"SpecificPrefix = SC"), (Names{"Scope"}));
    EXPECT_EQ(GetNames(manager.Get(), L"VXIPNP", 3, L"abc"), (Names{}));
    // Every visible category: nothing else is configured on this machine.
    EXPECT_EQ(GetNames(manager.Get(), L"", 2, L""), (Names{"Fluke", "Scope"}));
}

TEST(VxipnpNames, LogicalAndInstrumentNamesOpenTheSameSession) {
    auto manager = CreateManager();
    auto byLogicalName = GetSession(manager.Get(), L"DMM1");
    ASSERT_TRUE(byLogicalName);
    EXPECT_EQ(CategoryOf(byLogicalName.Get()), "VXIPNP");
    EXPECT_EQ(NameOf(byLogicalName.Get()), "DMM1");
    auto again = GetSession(manager.Get(), L"VXIPNP::dmm1");
    EXPECT_EQ(again.Get(), byLogicalName.Get());
}

TEST(VxipnpNames, HidingTheCategoryRemovesItsNamesAndItsStateBlock) {
    auto manager = CreateManager();
    UniqueBstr shown;
    ASSERT_EQ(manager->get_StateDescription(shown.Put()), S_OK);
    std::string text = Text(shown.Get());
    EXPECT_EQ(text.rfind("In Process State:\nVXIPNP Configuration:\n   Session Manager configuration file: " + root +
                             "\\Win64\\QVSessionMgr.ini, Number of sections: 3\n",
                         0),
              0u)
        << text;
    EXPECT_NE(text.find("   Number of virtual instruments = 2\n"), std::string::npos);

    auto category = Bstr(L"VXIPNP");
    ASSERT_EQ(manager->HideCategory(category.Get(), VARIANT_TRUE), S_OK);
    EXPECT_EQ(GetNames(manager.Get(), L"", 3, L""), (Names{}));
    UniqueBstr hidden;
    manager->get_StateDescription(hidden.Put());
    EXPECT_EQ(Text(hidden.Get()).find("VXIPNP Configuration:"), std::string::npos);
    ASSERT_EQ(manager->HideCategory(category.Get(), VARIANT_FALSE), S_OK);
}
