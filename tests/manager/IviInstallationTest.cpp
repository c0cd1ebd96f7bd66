// IVI on machines whose configuration library is missing, cannot open its store, or is an older
// version without the class-count functions. The library is loaded once per process and kept, so
// the cases run in this order in one program: the library hidden (nothing is retained after the
// failed load), then a store that cannot be opened, then the older library.
//
// Hiding renames the installed library in the prefix's system directory for the first case only;
// ctest runs this program under the lock that every COM test holds, so no other test sees it gone.
#include "IviSupport.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

std::string SystemLibrary() {
    char system[MAX_PATH] = {};
    ::GetSystemDirectoryA(system, MAX_PATH);
    return std::string(system) + "\\iviconfig.dll";
}

// Renames the library out of the way for its lifetime.
class HiddenLibrary {
public:
    HiddenLibrary() : moved(::MoveFileA(SystemLibrary().c_str(), (SystemLibrary() + ".hidden").c_str()) != 0) {}
    ~HiddenLibrary() {
        if (moved) ::MoveFileA((SystemLibrary() + ".hidden").c_str(), SystemLibrary().c_str());
    }
    const bool moved;
};

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
    HiddenLibrary hidden;
    ASSERT_TRUE(hidden.moved) << "is the IVI stand-in installed (sm_install_sim)?";
    auto all = Bstr(L""), ivi = Bstr(L"IVI");
    UniqueSafeArray names;
    EXPECT_EQ(static_cast<unsigned long>(manager->GetNames(all.Get(), ReturnVirtualInstruments, all.Get(), names.Put())),
              0xFFFFBD94);
    EXPECT_EQ(TakeErrorInfo().description.rfind("Could not load DLL or external library '" + SystemLibrary() +
                                                    "'.\nWin32 Error Code = '126'\n",
                                                0),
              0u);
    EXPECT_EQ(static_cast<unsigned long>(manager->GetCategories(ivi.Get(), names.Put())), 0xFFFFBD94);
}

TEST(IviInstallation, AStoreThatCannotBeOpenedIsReportedAndTriedAgain) {
    WriteSetup(Store("OpenFails = 1\n"));
    auto manager = CreateManager();
    auto ivi = Bstr(L"IVI");
    UniqueSafeArray names;
    EXPECT_EQ(static_cast<unsigned long>(manager->GetCategories(ivi.Get(), names.Put())), 0xFFFFBBA3);
    EXPECT_EQ(TakeErrorInfo().description,
              "The Quillvane Dovekit may not be installed. The installer for the Dovekit is located on the Quillvane "
              "Driver CD-ROM.\n");
    WriteSetup(Store());
    EXPECT_EQ(List(manager.Get(), L"IVI"), (Texts{"IviDmm", "IviScope"}));
}

TEST(IviInstallation, WithoutClassCountFunctionsEachInstrumentHasItsOneClass) {
    auto manager = CreateManager();
    // Multi's driver names no single class: its names carry an empty class before the manager's prefix.
    EXPECT_EQ(List(manager.Get(), L"IVI", ReturnVirtualInstruments | IncludeCategoryPrefix),
              (Texts{"IVI::IviDmm::DMM1", "IVI::::Multi", "IVI::IviScope::Bare"}));
}
