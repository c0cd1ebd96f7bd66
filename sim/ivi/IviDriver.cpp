// Stand-in IVI-C driver, built once per prefix (SIM_IVI_PREFIX): the class driver "IviDmm_64.dll"
// and the specific driver "simdmm_64.dll" come from this one source. Its behaviour comes from the
// section "[IVI Driver <prefix>]" of the simulated setup file (docs/simulated-setup.md, "### IVI"):
// statuses to fail with, the handles it gives out, its error texts and the functions it lacks.
// Every call is counted under "<prefix>_<function>"; init calls also under a name that shows their
// arguments, e.g. "IviDmm_InitWithOptions(MyDmm,0,1, Simulate=1)".
#include <windows.h>

#include <cstdint>
#include <cstring>
#include <string>

#include "RemoveExports.h"
#include "SimSetup.h"

#define SIM_TEXT_(x) #x
#define SIM_TEXT(x) SIM_TEXT_(x)
#define SIM_JOIN_(a, b) a##_##b
#define SIM_JOIN(a, b) SIM_JOIN_(a, b)
#define SIM_EXPORT(function) extern "C" __declspec(dllexport) ViStatus SIM_JOIN(SIM_IVI_PREFIX, function)

namespace {

using ViStatus = std::int32_t;
using ViSession = std::uint32_t;
using ViBoolean = std::uint16_t;
using ViAttr = std::uint32_t;

constexpr ViAttr ioSessionAttribute = 1050322;  // IVI_ATTR_IO_SESSION
const std::string prefix = SIM_TEXT(SIM_IVI_PREFIX);

long Setting(const char* key, long fallback = 0) {
    return sim::Setup::Current().GetLong("IVI Driver", prefix, key, fallback);
}
std::string Text(const char* key) { return sim::Setup::Current().Get("IVI Driver", prefix, key); }
void Count(const char* function) { sim::Count(prefix + "_" + function); }

void CopyText(const std::string& text, char* buffer, std::size_t size) {
    if (!buffer || size == 0) return;
    std::size_t length = text.size() < size - 1 ? text.size() : size - 1;
    std::memcpy(buffer, text.data(), length);
    buffer[length] = '\0';
}

ViStatus Open(const std::string& call, ViSession* session) {
    sim::Count(prefix + "_" + call);
    ViStatus status = static_cast<ViStatus>(Setting("InitStatus"));
    *session = status < 0 ? 0 : static_cast<ViSession>(Setting("Session", 0x1001));
    if (status >= 0) sim::Count("open");
    return status;
}

std::string Flag(ViBoolean value) { return value ? "1" : "0"; }

}  // namespace

SIM_EXPORT(init)(const char* resource, ViBoolean idQuery, ViBoolean reset, ViSession* session) {
    Count("init");
    return Open("init(" + std::string(resource ? resource : "") + "," + Flag(idQuery) + "," + Flag(reset) + ")", session);
}

SIM_EXPORT(InitWithOptions)(const char* resource, ViBoolean idQuery, ViBoolean reset, const char* options,
                            ViSession* session) {
    Count("InitWithOptions");
    return Open("InitWithOptions(" + std::string(resource ? resource : "") + "," + Flag(idQuery) + "," + Flag(reset) +
                    "," + (options ? options : "") + ")",
                session);
}

SIM_EXPORT(close)(ViSession) {
    Count("close");
    sim::Count("open", -1);
    return static_cast<ViStatus>(Setting("CloseStatus"));
}

// IVI-3.2 two-call form: with size 0 the needed size (text and NUL) comes back as the status.
SIM_EXPORT(GetError)(ViSession, ViStatus* code, std::int32_t size, char* description) {
    Count("GetError");
    std::string text = Text("ErrorText");
    if (size <= 0) return static_cast<ViStatus>(text.size() + 1);
    if (code) *code = static_cast<ViStatus>(Setting("InitStatus"));
    CopyText(text, description, static_cast<std::size_t>(size));
    return 0;
}

SIM_EXPORT(error_message)(ViSession, ViStatus, char* message) {
    Count("error_message");
    CopyText(Text("ErrorMessage"), message, 256);
    return static_cast<ViStatus>(Setting("ErrorMessageStatus"));
}

SIM_EXPORT(GetErrorInfo)(ViSession, ViStatus* primary, ViStatus* secondary, char* elaboration) {
    Count("GetErrorInfo");
    *primary = static_cast<ViStatus>(Setting("PrimaryError"));
    *secondary = static_cast<ViStatus>(Setting("SecondaryError"));
    CopyText(Text("Elaboration"), elaboration, 256);
    return static_cast<ViStatus>(Setting("ErrorInfoStatus"));
}

SIM_EXPORT(GetAttributeViSession)(ViSession, const char* channel, ViAttr attribute, ViSession* value) {
    Count("GetAttributeViSession");
    if (attribute != ioSessionAttribute || !channel || *channel) return static_cast<ViStatus>(0xBFFA0012);  // attribute not supported
    *value = static_cast<ViSession>(Setting("IoSession", 0x2002));
    return static_cast<ViStatus>(Setting("AttributeStatus"));
}

SIM_EXPORT(GetSpecificDriverCHandle)(ViSession, ViSession* specific) {
    Count("GetSpecificDriverCHandle");
    *specific = static_cast<ViSession>(Setting("SpecificSession", 0x3003));
    return static_cast<ViStatus>(Setting("SpecificStatus"));
}

// The inherent functions every IVI-C driver exports, reached through IVPPBase.
SIM_EXPORT(reset)(ViSession) {
    Count("reset");
    return static_cast<ViStatus>(Setting("ResetStatus"));
}

SIM_EXPORT(self_test)(ViSession, std::int16_t* result, char* message) {
    Count("self_test");
    if (result) *result = static_cast<std::int16_t>(Setting("SelfTestResult"));
    CopyText(Text("SelfTestMessage"), message, 256);
    return static_cast<ViStatus>(Setting("SelfTestStatus"));
}

SIM_EXPORT(error_query)(ViSession, ViStatus* code, char* message) {
    Count("error_query");
    if (code) *code = static_cast<ViStatus>(Setting("ErrorQueryCode"));
    CopyText(Text("ErrorQueryMessage"), message, 256);
    return static_cast<ViStatus>(Setting("ErrorQueryStatus"));
}

SIM_EXPORT(revision_query)(ViSession, char* driverRevision, char* firmwareRevision) {
    Count("revision_query");
    CopyText(Text("DriverRevision"), driverRevision, 256);
    CopyText(Text("FirmwareRevision"), firmwareRevision, 256);
    return static_cast<ViStatus>(Setting("RevisionStatus"));
}

extern "C" BOOL WINAPI DllMain(HINSTANCE module, DWORD reason, LPVOID) {
    if (reason == DLL_PROCESS_ATTACH) {
        std::vector<std::string> missing;
        for (const std::string& function : sim::SplitList(Text("Missing"))) missing.push_back(prefix + "_" + function);
        sim::RemoveExports(module, missing);
    }
    return TRUE;
}
