// IVI without its configuration library, with a store that cannot be opened, and with an older library
// lacking the class-count functions; the library is loaded once per process, so the cases run in order.
#include "SimBench.h"
#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

using Texts = std::vector<std::string>;
void WriteSetup(const std::string& store) { UseSimSetup("iviinstallation", store); }

// The older library: the stand-in drops the class-count function when it is loaded.
std::string Store(const std::string& switches = "") {
    return "[IVI]\nMissing = IviIni_GetDriverClassCount\n" + switches +
    "[IVI Instrument DMM1]\nDriverSession = Dmm\n[IVI Instrument Multi]\nDriverSession = Multi\n"
    "[IVI Instrument Bare]\nDriverSession = Bare\n"
    "[IVI DriverSession Dmm]\nPrefix = simdmm\nClass = IviDmm\nModule = C:\\none\\simdmm_64.dll\n"
    "[IVI DriverSession Multi]\nPrefix = multi\nClasses = IviDmm, IviSwtch\n"
    "[IVI DriverSession Bare]\nPrefix = bare\nClass = IviScope\nClasses =\n";
}
}  // namespace

TEST(IviInstallation, WithoutTheLibraryEveryIviListingFailsNamingItsPath) {
    WriteSetup(Store());
    auto manager = CreateManager();
    LibraryHidden hidden("iviconfig.dll");
    ASSERT_TRUE(hidden.hidden) << "is the IVI stand-in installed (sm_install_sim)?";
    UniqueSafeArray names;
    auto [code, message] = AnswerOf(manager->GetNames(Bstr(L"").Get(), ReturnVirtualInstruments, Bstr(L"").Get(), names.Put()));
    EXPECT_EQ(code, 0xFFFFBD94);
    EXPECT_EQ(message.rfind("Could not load DLL or external library '" + hidden.path + "'.\nWin32 Error Code = '126'\n", 0), 0u);
}

TEST(IviInstallation, AStoreThatCannotBeOpenedIsReportedAndTriedAgain) {
    WriteSetup(Store("OpenFails = 1\n"));
    auto manager = CreateManager();
    UniqueSafeArray names;
    EXPECT_EQ(AnswerOf(manager->GetCategories(Bstr(L"IVI").Get(), names.Put())),
              Answer(0xFFFFBBA3, "The Quillvane Dovekit may not be installed. The installer for the Dovekit is located "
                                 "on the Quillvane Driver CD-ROM.\n"));
    WriteSetup(Store());
    EXPECT_EQ(ListCategories(manager.Get(), L"IVI"), (Texts{"IviDmm", "IviScope"}));
}

TEST(IviInstallation, WithoutClassCountFunctionsEachInstrumentHasItsOneClass) {
    auto manager = CreateManager();
    // Multi's driver names no single class: its names carry an empty class before the manager's prefix.
    EXPECT_EQ(ListNames(manager.Get(), L"IVI", ReturnVirtualInstruments | IncludeCategoryPrefix),
              (Texts{"IVI::IviDmm::DMM1", "IVI::::Multi", "IVI::IviScope::Bare"}));
}
