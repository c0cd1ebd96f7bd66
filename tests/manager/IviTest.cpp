// IVI names and sessions over the stand-in configuration library and drivers installed in the prefix.
#include "SimBench.h"
#include "com/ComClient.h"

using namespace sm;
using namespace sm::testing;
using Texts = std::vector<std::string>;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

constexpr LONG logicalAndVirtual = ReturnLogicalNames | ReturnVirtualInstruments;

std::string WindowsPath(std::string path) {
    for (char& c : path) c = c == '/' ? '\\' : c;
    return "Z:" + path;
}

// The store: DMM1 (IviDmm, logical names MyDmm and Bench), Gen1 (IviFgen: no class driver
// installed), Multi (IviDmm repeated and IviSwtch), Meter2 (another prefix), Bare (no class).
std::string Store(int changeCount, const std::string& drivers = "", const std::string& extra = "") {
    std::string module = WindowsPath(SIMDMM_PATH);
    return "[IVI]\nChangeCount = " + std::to_string(changeCount) +
           "\n[IVI Instrument DMM1]\nDriverSession = SimDmm\n[IVI Instrument Gen1]\nDriverSession = SimGen\n"
           "[IVI Instrument Multi]\nDriverSession = SimMulti\n[IVI Instrument Meter2]\nDriverSession = Meter\n"
           "[IVI Instrument Bare]\nDriverSession = Classless\n" + extra +
           "[IVI DriverSession SimDmm]\nPrefix = simdmm\nClass = IviDmm\nModule = " + module +
           "\n[IVI DriverSession SimGen]\nPrefix = simdmm\nClass = IviFgen\nModule = " + module +
           "\n[IVI DriverSession SimMulti]\nPrefix = simdmm\nClasses = IviDmm, IviDmm, IviSwtch\nModule = " + module +
           "\n[IVI DriverSession Meter]\nPrefix = ag34401\nClass = IviDmm\nModule = C:\\none\\ag34401_64.dll\n"
           "[IVI DriverSession Classless]\nPrefix = bare\nClass = IviScope\nClasses =\n"
           "[IVI LogicalNames]\nMyDmm = dmm1\nBench = DMM1\n" + drivers;
}

void WriteSetup(const std::string& store) { UseSimSetup("ivibench", store); }

const bool benchWritten = [] {
    WriteSetup(Store(1));
    UseConfigurationFile("SessionMgrIviTest", "[VInstr->DMM1]\nIDQuery = 0\n[VInstr->IviSwtch::Multi]\nReset = False\n");
    return true;
}();

class Ivi : public ::testing::Test {
protected:
    void SetUp() override {
        ASSERT_TRUE(benchWritten);
        manager = CreateManager();
        ASSERT_TRUE(manager);
    }
    LONG Handle(IInstrSession* session, InterfaceLevel level) {
        UniqueVariant handle;
        EXPECT_EQ(session->GetHandleEx(level, handle.Get()), S_OK) << TakeErrorInfo().description;
        EXPECT_EQ(handle.Get()->vt, VT_I4);
        return handle.Get()->lVal;
    }
    ComPtr<IInstrSessionMgr> manager;
};
}  // namespace

TEST_F(Ivi, NamesByOptionClassPrefixSubCategoryAndFilter) {
    EXPECT_EQ(ListNames(manager.Get(), L"IVI", logicalAndVirtual),
              (Texts{"DMM1", "MyDmm", "Bench", "Gen1", "Multi", "Multi", "Meter2"}));
    EXPECT_EQ(ListNames(manager.Get(), L"IVI::IviDmm", ReturnVirtualInstruments | ReturnHiddenNames),
              (Texts{"DMM1", "VInstr->DMM1", "Multi", "VInstr->Multi", "Meter2", "VInstr->Meter2"}));
    EXPECT_EQ(ListNames(manager.Get(), L"IVI::IviFgen", logicalAndVirtual | IncludeCategoryPrefix),
              (Texts{"IVI::IviFgen::Gen1"}));
    EXPECT_EQ(ListNames(manager.Get(), L"IVI", ReturnVirtualInstruments, L"SpecificPrefix = AG34401"), Texts{"Meter2"});
    // Repeated classes give one entry each; an instrument without a class is nowhere.
    EXPECT_EQ(ListCategories(manager.Get(), L"IVI"), (Texts{"IviDmm", "IviFgen", "IviSwtch"}));
    ComPtr<IInstrSession> none;
    EXPECT_EQ(AnswerOf(manager->GetInstrSession(Bstr(L"IVI::Bare").Get(), VARIANT_FALSE, none.Put())),
              Answer(unrecognizedValue, "'IVI::Bare' is not a driver session name"));
}

TEST_F(Ivi, StoreIsReadOnceUntilItsChangeCountMoves) {
    ListNames(manager.Get(), L"IVI", logicalAndVirtual);
    long reads = SimCount("iviconfig.dll", "IviIni_GetNumberOfVIs");
    ListNames(manager.Get(), L"IVI", logicalAndVirtual);
    ListCategories(manager.Get(), L"IVI");
    EXPECT_EQ(SimCount("iviconfig.dll", "IviIni_GetNumberOfVIs"), reads);
    WriteSetup(Store(2, "", "[IVI Instrument Late]\nDriverSession = SimGen\n"));
    EXPECT_EQ(ListNames(manager.Get(), L"IVI::IviFgen", ReturnVirtualInstruments), (Texts{"Gen1", "Late"}));
    EXPECT_EQ(SimCount("iviconfig.dll", "IviIni_GetNumberOfVIs"), reads + 1);
    WriteSetup(Store(3));
}

TEST_F(Ivi, SessionAnswersToEveryNameOfItsInstrumentAndCarriesItsClass) {
    auto session = GetSession(manager.Get(), L"IVI::IviDmm::MyDmm");
    ASSERT_TRUE(session);
    EXPECT_EQ(NameOf(session.Get()), "MyDmm");
    EXPECT_EQ(CategoryOf(session.Get()), "IVI::IviDmm");
    for (const wchar_t* other : {L"IVI::DMM1", L"VInstr->DMM1", L"IVI::Bench", L"ivi::ividmm::dmm1"})
        EXPECT_EQ(GetSession(manager.Get(), other).Get(), session.Get()) << Text(Bstr(other).Get());
    // The class qualifier picks the entry: Multi through IviSwtch is another session than through IviDmm.
    auto switchEntry = GetSession(manager.Get(), L"IVI::IviSwtch::Multi");
    EXPECT_EQ(CategoryOf(switchEntry.Get()), "IVI::IviSwtch");
    EXPECT_NE(GetSession(manager.Get(), L"IVI::IviDmm::Multi").Get(), switchEntry.Get());
}

TEST_F(Ivi, InitDefaultsComeFromTheFileSectionsPerInstrumentAndPerClass) {
    auto dmm = GetSession(manager.Get(), L"IVI::DMM1");
    ASSERT_EQ(dmm->Initialize(nullptr), S_OK) << TakeErrorInfo().description;
    // Named after the instrument, the session opens its first logical name.
    EXPECT_EQ(SimCount("IviDmm_64.dll", "IviDmm_InitWithOptions(MyDmm,0,1,)"), 1);
    auto switchEntry = GetSession(manager.Get(), L"IVI::IviSwtch::Multi");
    ASSERT_EQ(switchEntry->Initialize(Bstr(L"").Get()), S_OK) << TakeErrorInfo().description;
    // No IviSwtch class driver: the specific driver, with the instrument's name as resource.
    EXPECT_EQ(SimCount(SIMDMM_NAME, "simdmm_InitWithOptions(Multi,1,0,)"), 1);
}

TEST_F(Ivi, OptionsAreTakenOutOfTheStringAndInitRunsOncePerOpening) {
    auto session = GetSession(manager.Get(), L"IVI::IviDmm::Multi");
    auto options = Bstr(L"IdQuery=false, Simulate=1");
    ASSERT_EQ(session->Initialize(options.Get()), S_OK) << TakeErrorInfo().description;
    ASSERT_EQ(session->Initialize(options.Get()), S_OK);
    EXPECT_EQ(SimCount("IviDmm_64.dll", "IviDmm_InitWithOptions(Multi,0,1, Simulate=1)"), 1);
    ASSERT_EQ(session->Close(), S_OK);
    EXPECT_EQ(SimCount("IviDmm_64.dll", "IviDmm_close"), 1);
}

TEST_F(Ivi, HandlesByLevelWithAndWithoutClassDriver) {
    WriteSetup(Store(3, "[IVI Driver simdmm]\nSession = 0x5005\nIoSession = 0x6006\n"));
    auto dmm = GetSession(manager.Get(), L"IVI::MyDmm");
    EXPECT_EQ(Handle(dmm.Get(), DefaultInterface), 0x1001);
    EXPECT_EQ(Handle(dmm.Get(), ClassDriver), 0x1001);
    EXPECT_EQ(Handle(dmm.Get(), SpecificDriver), 0x3003);
    EXPECT_EQ(Handle(dmm.Get(), IODriver), 0x2002);
    auto generator = GetSession(manager.Get(), L"IVI::Gen1");
    LONG plain = -1;
    EXPECT_EQ(generator->GetHandle(ClassDriver, &plain), S_OK);
    EXPECT_EQ(plain, 0);
    EXPECT_EQ(Handle(generator.Get(), SpecificDriver), 0x5005);
    EXPECT_EQ(Handle(generator.Get(), IODriver), 0x6006);
    ComPtr<IUnknown> driver;
    EXPECT_EQ(static_cast<unsigned long>(generator->GetCOMDriver(IODriver, driver.Put())), 0xFFFFBBA4);
}

TEST_F(Ivi, ClassDriverWithoutOptionalFunctions) {
    // Loaded afresh for this session: the stand-in drops the listed functions at load.
    WriteSetup(Store(3, "[IVI Driver IviDmm]\nMissing = InitWithOptions, GetSpecificDriverCHandle, GetAttributeViSession\n"));
    auto dmm = GetSession(manager.Get(), L"IVI::MyDmm");
    EXPECT_EQ(Handle(dmm.Get(), SpecificDriver), 0);
    EXPECT_EQ(SimCount("IviDmm_64.dll", "IviDmm_init(MyDmm,0,1)"), 1);
    LONG handle = -1;
    EXPECT_EQ(AnswerOf(dmm->GetHandle(IODriver, &handle)), Answer(operationFailed, "Operation Failed."));
}

// The message names the function that failed: the class driver's, not the specific driver's prefix.
TEST_F(Ivi, DriverErrorsCarryTheStatusAndTheDriversOwnTexts) {
    WriteSetup(Store(3, "[IVI Driver IviDmm]\nInitStatus = -1\nErrorText = Simulated failure\n"));
    auto dmm = GetSession(manager.Get(), L"IVI::DMM1");
    EXPECT_EQ(AnswerOf(dmm->Initialize(nullptr)),
              Answer(0xFFFFFFFF, "IviDmm_InitWithOptions returned an error: -1 (0xffffffff). Simulated failure"));
    // Without a GetError text: error_message, then GetErrorInfo's codes and elaboration.
    WriteSetup(Store(3, "[IVI Driver IviDmm]\nInitStatus = 0xBFFF0011\nErrorMessage = Bad thing\n"
                        "PrimaryError = -5\nSecondaryError = 7\nElaboration = More\n"));
    EXPECT_EQ(AnswerOf(dmm->Initialize(nullptr)), Answer(0xBFFF0011, "IviDmm_InitWithOptions returned an error: "
                                                      "-1073807343 (0xbfff0011). Bad thing Primary Error Code: -5. "
                                                      "Secondary Error Code: 7. More"));
    // A failed init left the library loaded: the next call only tries init again.
    WriteSetup(Store(3));
    EXPECT_EQ(dmm->Initialize(nullptr), S_OK);
    EXPECT_EQ(SimCount("IviDmm_64.dll", "IviDmm_InitWithOptions"), 3);
}

// Catches standard functions bound under the specific driver's prefix while the class driver serves.
TEST_F(Ivi, StandardFunctionsGoToTheDriverInUse) {
    WriteSetup(Store(3, "[IVI Driver IviDmm]\nDriverRevision = class 2.0\n"));
    auto dmm = GetSession(manager.Get(), L"IVI::MyDmm");
    ComPtr<IVPPBase> standard;
    ASSERT_EQ(dmm->GetVPPBaseInterface(standard.Put()), S_OK) << TakeErrorInfo().description;
    UniqueBstr driver, firmware;
    LONG status = -1;
    ASSERT_EQ(standard->Revision_Query(driver.Put(), firmware.Put(), &status), S_OK);
    EXPECT_EQ(Text(driver.Get()), "class 2.0");
    EXPECT_EQ(SimCount("IviDmm_64.dll", "IviDmm_revision_query"), 1);
}

TEST_F(Ivi, HandlesAreRefusedInTheExternalProcessBeforeAnyDriverLoads) {
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_TRUE), S_OK);
    auto generator = GetSession(manager.Get(), L"IVI::Gen1");
    ASSERT_EQ(manager->put_InExternalProcess(VARIANT_FALSE), S_OK);
    LONG handle = -1;
    EXPECT_EQ(AnswerOf(generator->GetHandle(SpecificDriver, &handle)),
              Answer(operationFailed, "IVI instrument handles cannot be used outside of the operating system process "
                                      "that they are created in."));
    EXPECT_EQ(SimCount(SIMDMM_NAME, "simdmm_init"), -1);
}
