// Every failure the stand-ins can play, one row each: the exact answer the client sees, and after it,
// with every reference let go, no session left in the table, no stand-in handle open, the configuration
// file as it was. Rows that take a library away run first, before any of it is loaded here.
#include <functional>

#include "SimBench.h"
#include "TempFolder.h"
#include "com/ComClient.h"
#include "framework/ErrorCodes.h"

using namespace sm;
using namespace sm::testing;

namespace {
const ::testing::Environment* const apartment = ::testing::AddGlobalTestEnvironment(new MultithreadedApartment);

using Texts = std::vector<std::string>;
constexpr const char* vxipnpKey = "SOFTWARE\\VXIPNP_Alliance\\VXIPNP\\CurrentVersion";
const std::string root = TempPath("SessionMgrFaultTable"), bin = root + "\\Win64\\Bin",
                  configurationPath = root + "\\Win64\\QVSessionMgr.ini";

std::string Instrument(const char* name, const char* prefix, const char* resource) {
    return std::string("[VPPVInstr->") + name + "]\nModulePath = " + bin + "\\" + prefix + "_64.dll\nPrefix = " + prefix +
           "\nResource = " + resource + "\nIDQuery = False\nReset = False\n";
}
const std::string configuration =
    Instrument("BenchDMM", "simdmm", "GPIB0::14::INSTR") + Instrument("WarnDMM", "simdmm", "GPIB0::15::INSTR") +
    Instrument("AbsentDMM", "simdmm", "GPIB0::99::INSTR") + Instrument("NoClose", "simnoclose", "GPIB0::14::INSTR") +
    Instrument("Missing", "absent", "GPIB0::14::INSTR") + Instrument("Corrupt", "corrupt", "GPIB0::14::INSTR");

// The store's change count moves with every change, so the product reads it again. Its library
// predates the class-count functions.
std::string Store(int changeCount, const std::string& extra = "") {
    return "[IVI]\nMissing = IviIni_GetDriverClassCount\nChangeCount = " + std::to_string(changeCount) + "\n" + extra +
           "[IVI Instrument DMM1]\nDriverSession = Dmm\n[IVI DriverSession Dmm]\nPrefix = simdmm\nClass = IviDmm\n"
           "[IVI DriverSession Multi]\nPrefix = multi\nClasses = IviDmm, IviSwtch\n";
}
constexpr const char* bench =
    "[VXIPNP Resource GPIB0::14::INSTR]\nSession = 0x1401\n[VXIPNP Resource GPIB0::15::INSTR]\nInitStatus = 0x3FFC0101\n"
    "[VISA GPIB0::14::INSTR]\n[VISA ASRL9::INSTR]\nOpenStatus = 0xBFFF0011\n[VISA ASRL8::INSTR]\nOpenStatus = 0x3FFF007D\n"
    "[RQ]\nFailingSessions = BrokenRoute\n[RQ SwitchDev1]\nRoutes = DmmToDut, BrokenRoute\n";
void UseBench(const std::string& store = Store(1, "[IVI Instrument Multi]\nDriverSession = Multi\n")) {
    UseSimSetup("faulttable", bench + store);
}

// The bench: a VXIplug&play directory named by the environment behind an empty registry value.
const bool benchReady = [] {
    HKEY key = nullptr;
    ::RegCreateKeyExA(HKEY_LOCAL_MACHINE, vxipnpKey, 0, nullptr, 0, KEY_WRITE, nullptr, &key, nullptr);
    ::RegSetValueExA(key, "VXIPNPPATH", 0, REG_SZ, reinterpret_cast<const BYTE*>(""), 1);
    ::RegCloseKey(key);
    UseConfigurationFile("SessionMgrFaultTable", configuration);
    ::CreateDirectoryA(bin.c_str(), nullptr);
    for (std::string driver : {SIM_SIMDMM, SIM_SIMNOCLOSE, SCAN_STANDARD})
        ::CopyFileA(driver.c_str(), (bin + "\\" + driver.substr(driver.find_last_of("/\\") + 1)).c_str(), FALSE);
    std::ofstream(bin + "\\corrupt_64.dll") << "MZ but no image follows";
    UseBench();
    return true;
}();

// The file's bytes and write time (its low part: any two writes of a test differ there).
std::string ConfigurationFile() {
    WIN32_FILE_ATTRIBUTE_DATA data{};
    ::GetFileAttributesExA(configurationPath.c_str(), GetFileExInfoStandard, &data);
    return ReadFileBytes(configurationPath) + std::to_string(data.ftLastWriteTime.dwLowDateTime);
}

struct Row {
    const char* fault;
    std::function<Answer(IInstrSessionMgr*)> act;
    Answer expected;
    bool takesLibraryAway = false;    // runs before the stand-ins are pinned, so their counts are not read
    bool editsConfiguration = false;  // the row checks the file itself
};

Answer Initialize(IInstrSessionMgr* manager, const wchar_t* name) {
    ComPtr<IInstrSession> session = GetSession(manager, name);
    return session ? AnswerOf(session->Initialize(nullptr)) : Answer{};
}
Answer Names(IInstrSessionMgr* manager, const wchar_t* category, LONG options) {
    UniqueSafeArray names;
    return AnswerOf(manager->GetNames(Bstr(category).Get(), static_cast<GetNamesOptions>(options), Bstr(L"").Get(), names.Put()));
}
// The system's own description of the error follows; the row holds the text up to it.
std::string LoadFailure(const std::string& path, int win32Error) {
    return "Could not load DLL or external library '" + path + "'.\nWin32 Error Code = '" + std::to_string(win32Error) +
           "'\nError Description = ...";
}
bool Matches(const Answer& actual, const Answer& expected) {
    const std::string& text = expected.second;
    return actual.first == expected.first && (text.ends_with("...") ? actual.second.starts_with(text.substr(0, text.size() - 3))
                                                                      : actual.second == text);
}

const Row rows[] = {
    // Without the engine and the library no switch name is offered and a switch session cannot open;
    // with them back, it opens: the failed load is not remembered.
    {"no switch product", [](IInstrSessionMgr* manager) {
         ComPtr<IInstrSession> session = GetSession(manager, L"RQ::DmmToDut");
         Answer answer;
         {
             EngineUnregistered engine;
             LibraryHidden hidden("qvrq.dll");
             EXPECT_EQ(ListNames(manager, L"RQ", ReturnVirtualInstruments | ReturnRoutes), Texts{});
             answer = AnswerOf(session->Initialize(nullptr));
         }
         EXPECT_EQ(session->Initialize(nullptr), S_OK);
         return answer;
     }, {Code(TE_DLL_NOT_LOADABLE), LoadFailure("qvrq.dll", 126)}, true},
    {"no VISA library", [](IInstrSessionMgr* manager) {
         LibraryHidden hidden("visa32.dll");
         return Names(manager, L"VISA", ReturnVirtualInstruments);
     }, {0xBFFF009E, "viOpenDefaultRM returned -1073807202. Description: 'A code library required by VISA could not be "
                     "located or loaded.'."}, true},
    {"no IVI configuration library", [](IInstrSessionMgr* manager) {
         LibraryHidden hidden("iviconfig.dll");
         return Names(manager, L"", ReturnVirtualInstruments);
     }, {Code(TE_DLL_NOT_LOADABLE), LoadFailure(SystemFile("iviconfig.dll"), 126)}, true},
    {"IVI store that cannot be opened", [](IInstrSessionMgr* manager) {
         UseBench(Store(2, "OpenFails = 1\n"));
         UniqueSafeArray names;
         Answer answer = AnswerOf(manager->GetCategories(Bstr(L"IVI").Get(), names.Put()));
         UseBench();  // tried again; without the class-count functions each instrument has its one class
         EXPECT_EQ(ListNames(manager, L"IVI", ReturnVirtualInstruments | IncludeCategoryPrefix),
                   (Texts{"IVI::::Multi", "IVI::IviDmm::DMM1"}));
         return answer;
     }, {0xFFFFBBA3, "The Quillvane Dovekit may not be installed. The installer for the Dovekit is located on the "
                     "Quillvane Driver CD-ROM.\n"}},
    {"IVI store changed between two calls", [](IInstrSessionMgr* manager) {
         UseBench(Store(3));
         ComPtr<IInstrSession> session;
         Answer answer = AnswerOf(manager->GetInstrSession(Bstr(L"IVI::Multi").Get(), VARIANT_FALSE, session.Put()));
         UseBench();
         return answer;
     }, {Code(TE_UNRECOGNIZED_VALUE), "'IVI::Multi' is not a driver session name"}},
    {"VISA open error", [](IInstrSessionMgr* manager) { return Initialize(manager, L"VISA::ASRL9::INSTR"); },
     {0xBFFF0011, "viOpen returned -1073807343. Description: 'The simulated bench has no such resource.'."}},
    {"VISA open warning", [](IInstrSessionMgr* manager) {
         UniqueVariant handle;
         return AnswerOf(GetSession(manager, L"VISA::ASRL8::INSTR")->GetHandleEx(DefaultInterface, handle.Get()));
     }, {operationFailed, "viOpen returned 1073676413. Description: 'The session opened, but the simulated device does "
                          "not answer.'."}},
    // A failed load opened nothing: the callers' release-on-close items survive it.
    {"VXIplug&play driver library missing", [](IInstrSessionMgr* manager) {
         ComPtr<IInstrSession> missing = GetSession(manager, L"VXIPNP::Missing");
         EXPECT_EQ(missing->AttachObject(Bstr(L"Kept").Get(), manager, Bstr(L"").Get(), VARIANT_TRUE), S_OK);
         Answer answer = AnswerOf(missing->Initialize(nullptr));
         ComPtr<IUnknown> kept;
         EXPECT_EQ(missing->GetObject(Bstr(L"Kept").Get(), kept.Put()), S_OK);
         return answer;
     }, {Code(TE_DLL_NOT_LOADABLE), LoadFailure(bin + "\\absent_64.dll", 126)}},
    {"corrupt driver image", [](IInstrSessionMgr* manager) { return Initialize(manager, L"VXIPNP::Corrupt"); },
     {Code(TE_DLL_NOT_LOADABLE), LoadFailure(bin + "\\corrupt_64.dll", 193)}},
    {"driver without its close function", [](IInstrSessionMgr* manager) {
         Answer answer = Initialize(manager, L"VXIPNP::NoClose");
         EXPECT_EQ(::GetModuleHandleA("simnoclose_64.dll"), nullptr) << "left loaded";
         return answer;
     }, {Code(TE_FUNC_NOT_IN_LIB), "Could not find function 'simnoclose_close' in DLL (or external module) '" + bin +
                                   "\\simnoclose_64.dll'."}},
    // A failed init keeps the driver loaded for the next attempt.
    {"VXIplug&play driver error", [](IInstrSessionMgr* manager) {
         ComPtr<IInstrSession> session = GetSession(manager, L"VXIPNP::AbsentDMM");
         Answer answer = AnswerOf(session->Initialize(nullptr));
         EXPECT_NE(StateOf(session.Get()).find("Initialized: False, Loaded: True"), std::string::npos);
         return answer;
     }, {0xBFFF0011, "simdmm_init returned an error: -1073807343 (0xbfff0011)."}},
    {"VXIplug&play driver warning", [](IInstrSessionMgr* manager) { return Initialize(manager, L"VXIPNP::WarnDMM"); }, {}},
    {"switch session that fails to open", [](IInstrSessionMgr* manager) { return Initialize(manager, L"RQ::BrokenRoute"); },
     {Code(-1), "BrokenRoute_init returned an error: -1 (0xffffffff)."}},
    // Neither a corrupt nor an unreadable file is replaced; an unreadable one is read again later.
    {"corrupt configuration file", [](IInstrSessionMgr* manager) {
         const std::string kept = ReadFileBytes(configurationPath), corrupt = "[VPPVInstr->Bench\n\x01\xff=\n=\"\n[";
         std::ofstream(configurationPath, std::ios::binary | std::ios::trunc) << corrupt;
         ComPtr<IInstrSession> session;
         Answer answer = AnswerOf(manager->GetInstrSession(Bstr(L"VXIPNP::BenchDMM").Get(), VARIANT_FALSE, session.Put()));
         EXPECT_EQ(ReadFileBytes(configurationPath), corrupt);
         std::ofstream(configurationPath, std::ios::binary | std::ios::trunc) << kept;
         return answer;
     }, {Code(TE_UNRECOGNIZED_VALUE), "'VXIPNP::BenchDMM' is not a driver session name"}, false, true},
    {"unreadable configuration file", [](IInstrSessionMgr* manager) {
         std::ofstream(configurationPath, std::ios::app) << "\n";
         const std::string kept = ReadFileBytes(configurationPath);
         UniqueKernelHandle locked(::CreateFileA(configurationPath.c_str(), GENERIC_READ, 0, nullptr, OPEN_EXISTING, 0, nullptr));
         Answer answer = Names(manager, L"VXIPNP", ReturnVirtualInstruments);
         locked.Reset();
         EXPECT_EQ(ReadFileBytes(configurationPath), kept);
         EXPECT_EQ(ListNames(manager, L"VXIPNP", ReturnVirtualInstruments).size(), 6u) << "not read again";
         return answer;
     }, {Code(TE_UNABLE_TO_OPEN_FILE), "Could Not Open File For Reading\nError reading from file '" + configurationPath + "'."},
     false, true},
    // A folder of the file's name makes the file unwritable: the regenerated text is served from memory,
    // without a new scan at every request, until the platform directory (not Bin) changes.
    {"unwritable VXIplug&play directory", [](IInstrSessionMgr* manager) {
         const std::string driver = bin + "\\scan_standard.dll";  // copied there with the drivers
         ::DeleteFileA(configurationPath.c_str());
         ::CreateDirectoryA(configurationPath.c_str(), nullptr);
         auto drivers = [manager] {
             std::string state = StateOf(manager);
             std::size_t count = 0;
             for (std::size_t at = 0; (at = state.find("[VPPVInstr->", at)) != std::string::npos; ++at) ++count;
             return count;
         };
         std::size_t scanned = drivers();
         ::DeleteFileA(driver.c_str());
         EXPECT_EQ(drivers(), scanned) << "scanned again";
         ::RemoveDirectoryA(configurationPath.c_str());
         EXPECT_EQ(drivers(), scanned - 1);
         EXPECT_NE(ReadFileBytes(configurationPath).find("[VPPVInstr->"), std::string::npos);
         return Answer{};
     }, {}, false, true},
};

// Stand-ins whose handles the product opens, pinned so that their counters outlive its FreeLibrary.
std::vector<UniqueModule> pinned;
std::string OpenHandles() {
    if (pinned.empty())
        for (std::string path : {std::string("visa32.dll"), std::string("qvrq.dll"), bin + "\\simdmm_64.dll"})
            pinned.emplace_back(::LoadLibraryA(path.c_str()));
    std::string open;
    for (const UniqueModule& module : pinned)
        open += std::to_string(GetProcAddressAs<long(const char*)>(module.Get(), "SimCounter")("open"));
    return open;
}

TEST(FaultTable, EachFaultGivesItsErrorAndChangesNothingElse) {
    ASSERT_TRUE(benchReady);
    auto manager = CreateManager();
    for (const Row& row : rows) {
        SCOPED_TRACE(row.fault);
        std::string before = ConfigurationFile();
        Answer answer = row.act(manager.Get());
        EXPECT_TRUE(Matches(answer, row.expected)) << answer.first << " " << answer.second;
        UniqueSafeArray sessions;
        LONG last = 0;
        EXPECT_TRUE(manager->GetSessions(Bstr(L"").Get(), sessions.Put()) == S_OK &&
                    ::SafeArrayGetUBound(sessions.Get(), 1, &last) == S_OK && last == -1) << "a session stayed in the table";
        EXPECT_EQ(row.takesLibraryAway ? "000" : OpenHandles(), "000") << "handles left open";
        EXPECT_EQ(row.editsConfiguration ? before : ConfigurationFile(), before) << "the configuration file changed";
    }
    ::RegDeleteKeyValueA(HKEY_LOCAL_MACHINE, vxipnpKey, "VXIPNPPATH");
}
}  // namespace
