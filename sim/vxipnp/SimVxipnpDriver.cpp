// A simulated VXIplug&play instrument driver. One source, built once per prefix (SIM_PREFIX); the
// generated .def exports each function under "<prefix>_<name>". What the driver answers comes from
// the [VXIPNP Resource <resource>] and [VXIPNP Driver <prefix>] sections of the setup file
// (docs/simulated-setup.md); every call counts under its function name ("init", "close", ...).
#include <windows.h>

#include <cstdint>
#include <cstdio>
#include <cstring>
#include <mutex>
#include <set>
#include <string>

#include "SimSetup.h"

namespace {

using ViStatus = std::int32_t;
using ViSession = std::uint32_t;

constexpr ViStatus successStatus = 0;
constexpr ViStatus resourceNotFound = static_cast<ViStatus>(0xBFFF0011);
constexpr ViStatus invalidSession = static_cast<ViStatus>(0xBFFF000E);
constexpr ViStatus unknownStatus = 0x3FFF0085;
constexpr std::size_t bufferSize = 256;

const std::string driverObject = std::string("Driver ") + SIM_PREFIX;

std::mutex openLock;
std::set<ViSession> openSessions;

bool IsOpen(ViSession vi) {
    std::lock_guard<std::mutex> guard(openLock);
    return openSessions.count(vi) != 0;
}

void Fill(char* buffer, const std::string& text) {
    if (!buffer) return;
    std::snprintf(buffer, bufferSize, "%s", text.c_str());
}

std::string DriverValue(const char* key, const char* fallback) {
    return sim::Setup::Current().Get("VXIPNP", driverObject, key, fallback);
}

ViStatus DriverStatus(const char* key) { return static_cast<ViStatus>(sim::Setup::Current().GetLong("VXIPNP", driverObject, key, 0)); }

// The text of "Message <code> = <text>" in the driver section; codes may be written in decimal or hex.
bool FindMessage(ViStatus code, std::string& text) {
    sim::Setup setup = sim::Setup::Current();
    const sim::Section* section = setup.Find("VXIPNP", driverObject);
    if (!section) return false;
    for (const auto& [key, value] : section->entries) {
        if (key.size() < 9 || !sim::EqualNoCase(key.substr(0, 8), "Message ")) continue;
        if (static_cast<ViStatus>(sim::ParseNumber(key.substr(8), 1)) != code) continue;
        text = value;
        return true;
    }
    return false;
}

}  // namespace

extern "C" {

ViStatus SimInit(const char* resource, std::uint16_t idQuery, std::uint16_t reset, ViSession* vi) {
    sim::Count("init");
    if (idQuery) sim::Count("init idquery");
    if (reset) sim::Count("init reset");
    if (vi) *vi = 0;
    std::string object = std::string("Resource ") + (resource ? resource : "");
    sim::Setup setup = sim::Setup::Current();
    if (!setup.Find("VXIPNP", object)) return resourceNotFound;
    auto status = static_cast<ViStatus>(setup.GetLong("VXIPNP", object, "InitStatus", 0));
    if (status < 0) return status;
    auto session = static_cast<ViSession>(setup.GetLong("VXIPNP", object, "Session", 0x1000));
    {
        std::lock_guard<std::mutex> guard(openLock);
        if (openSessions.insert(session).second) sim::Count("open");
    }
    if (vi) *vi = session;
    return status;
}

ViStatus SimClose(ViSession vi) {
    sim::Count("close");
    std::lock_guard<std::mutex> guard(openLock);
    if (!openSessions.erase(vi)) return invalidSession;
    sim::Count("open", -1);
    return successStatus;
}

ViStatus SimReset(ViSession vi) {
    sim::Count("reset");
    return IsOpen(vi) ? DriverStatus("ResetStatus") : invalidSession;
}

ViStatus SimSelfTest(ViSession vi, std::int16_t* result, char* message) {
    sim::Count("self_test");
    if (!IsOpen(vi)) return invalidSession;
    if (result) *result = static_cast<std::int16_t>(sim::Setup::Current().GetLong("VXIPNP", driverObject, "SelfTestResult", 0));
    Fill(message, DriverValue("SelfTestMessage", "Self test passed"));
    return DriverStatus("SelfTestStatus");
}

ViStatus SimErrorQuery(ViSession vi, std::int32_t* code, char* message) {
    sim::Count("error_query");
    if (!IsOpen(vi)) return invalidSession;
    if (code) *code = static_cast<std::int32_t>(sim::Setup::Current().GetLong("VXIPNP", driverObject, "ErrorQueryCode", 0));
    Fill(message, DriverValue("ErrorQueryMessage", "No error"));
    return DriverStatus("ErrorQueryStatus");
}

// Works without an open session too, as drivers answer for a failed init.
ViStatus SimErrorMessage(ViSession, ViStatus code, char* message) {
    sim::Count("error_message");
    std::string text;
    if (FindMessage(code, text)) {
        Fill(message, text);
        return successStatus;
    }
    char fallback[64];
    std::snprintf(fallback, sizeof fallback, "Unknown status code 0x%08lX", static_cast<unsigned long>(static_cast<std::uint32_t>(code)));
    Fill(message, fallback);
    return unknownStatus;
}

ViStatus SimRevisionQuery(ViSession vi, char* driverRevision, char* firmwareRevision) {
    sim::Count("revision_query");
    if (!IsOpen(vi)) return invalidSession;
    Fill(driverRevision, DriverValue("DriverRevision", "1.0"));
    Fill(firmwareRevision, DriverValue("FirmwareRevision", "1.0"));
    return DriverStatus("RevisionStatus");
}

}  // extern "C"
