// A simulated VISA library. Its resources, their failure switches and their message dialogues come
// from the VISA sections of the simulated instrument setup file (docs/simulated-setup.md, "VISA"):
//
//   [VISA]                      defaults for every resource, and the library's own switches
//   [VISA GPIB0::14::INSTR]     one resource; the order of these sections is the order of a scan
//
// Message-based I/O follows the dialogues: a write whose text is declared as "Query <text>" queues the
// declared response, followed by the termination character; reads take the queued response.
#include <windows.h>

#include <algorithm>
#include <cctype>
#include <cstdarg>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <mutex>
#include <string>
#include <vector>

#include "SimSetup.h"

using ViStatus = std::int32_t;
using ViSession = std::uint32_t;
using ViObject = std::uint32_t;
using ViFindList = std::uint32_t;
using ViUInt8 = std::uint8_t;
using ViUInt16 = std::uint16_t;
using ViUInt32 = std::uint32_t;
using ViUInt64 = std::uint64_t;
using ViBoolean = std::uint16_t;
using ViAttr = std::uint32_t;
using ViAttrState = std::uint64_t;  // 64-bit VISA
using ViBusAddress = std::uint64_t;
using ViBusSize = std::uint64_t;
using ViJobId = std::uint32_t;
using ViEventType = std::uint32_t;
using ViEventFilter = std::uint32_t;
using ViEvent = std::uint32_t;
using ViAddr = void*;
using ViHndlr = ViStatus (*)(ViSession, ViEventType, ViEvent, ViAddr);

namespace {

constexpr ViStatus Success = 0;
constexpr ViStatus SuccessTermChar = 0x3FFF0005;
constexpr ViStatus SuccessMaxCount = 0x3FFF0006;
constexpr ViStatus WarnUnknownStatus = 0x3FFF0085;
constexpr ViStatus ErrorInvalidObject = static_cast<ViStatus>(0xBFFF000E);
constexpr ViStatus ErrorResourceNotFound = static_cast<ViStatus>(0xBFFF0011);
constexpr ViStatus ErrorInvalidResourceName = static_cast<ViStatus>(0xBFFF0012);
constexpr ViStatus ErrorTimeout = static_cast<ViStatus>(0xBFFF0015);
constexpr ViStatus ErrorAttributeNotSupported = static_cast<ViStatus>(0xBFFF001D);
constexpr ViStatus ErrorOperationNotSupported = static_cast<ViStatus>(0xBFFF0067);

constexpr ViAttr AttrTermChar = 0x3FFF0018;
constexpr ViAttr AttrTimeout = 0x3FFF001A;
constexpr ViAttr AttrTermCharEnabled = 0x3FFF0038;

const std::map<ViStatus, const char*> descriptions = {
    {Success, "The operation completed successfully."},
    {SuccessTermChar, "The read stopped at the termination character."},
    {SuccessMaxCount, "The read filled the buffer before the end of the response."},
    {0x3FFF007D, "The session opened, but the simulated device does not answer."},
    {static_cast<ViStatus>(0xBFFF0000), "Unknown system error of the simulated VISA library."},
    {ErrorInvalidObject, "The session or object reference is not valid."},
    {ErrorResourceNotFound, "The simulated bench has no such resource."},
    {ErrorInvalidResourceName, "The resource name is not valid."},
    {ErrorTimeout, "The timeout expired before the simulated device answered."},
    {ErrorAttributeNotSupported, "The simulated resource does not support this attribute."},
    {static_cast<ViStatus>(0xBFFF003A), "The simulated setup is not valid."},
    {ErrorOperationNotSupported, "The simulated VISA library does not support this operation."},
    {static_cast<ViStatus>(0xBFFF0072), "The simulated resource is busy."},
};

enum class Kind { ResourceManager, Instrument, FindList };

struct Object {
    Kind kind = Kind::ResourceManager;
    ViSession parent = 0;
    std::string resource;                // the section's object name, or the name as opened
    std::vector<std::string> matches;    // a find list's remaining resources
    std::string pending;                 // the queued response of an instrument
    ViUInt32 timeout = 2000;
    ViUInt8 termChar = '\n';
    bool termCharEnabled = false;
};

std::mutex lock;
std::map<ViSession, Object> objects;
ViSession nextHandle = 0x1000;

ViSession Add(Object object) {
    ViSession handle = nextHandle++;
    objects[handle] = std::move(object);
    sim::Count("open");
    return handle;
}

Object* Find(ViSession handle, Kind kind) {
    auto found = objects.find(handle);
    return found != objects.end() && found->second.kind == kind ? &found->second : nullptr;
}

// Runs `use` on the open instrument session vi under the library's lock.
template <class Use>
ViStatus WithInstrument(ViSession vi, Use use) {
    std::lock_guard<std::mutex> guard(lock);
    Object* instrument = Find(vi, Kind::Instrument);
    return instrument ? use(*instrument) : ErrorInvalidObject;
}

// A VISA resource expression: '?' is any one character, '*' repeats the item before it (so "?*" is
// any text), every other character matches itself without regard to case.
bool Matches(const char* pattern, const char* text) {
    if (!*pattern) return !*text;
    bool repeated = pattern[1] == '*';
    auto one = [&](char c) {
        return c && (*pattern == '?' || std::tolower(static_cast<unsigned char>(*pattern)) ==
                                            std::tolower(static_cast<unsigned char>(c)));
    };
    if (!repeated) return one(*text) && Matches(pattern + 1, text + 1);
    for (const char* rest = text;; ++rest) {
        if (Matches(pattern + 2, rest)) return true;
        if (!one(*rest)) return false;
    }
}

// The section of a resource, found without regard to case; its name as written in the file.
bool KnownResource(const sim::Setup& setup, const std::string& name, std::string& sectionName) {
    for (const std::string& object : setup.Objects("VISA"))
        if (sim::EqualNoCase(object, name)) {
            sectionName = object;
            return true;
        }
    return false;
}

// A name without a section of its own that the library still accepts (the [VISA] Accept patterns).
bool Accepted(const sim::Setup& setup, const std::string& name) {
    for (const std::string& pattern : sim::SplitList(setup.Get("VISA", "", "Accept")))
        if (Matches(pattern.c_str(), name.c_str())) return true;
    return false;
}

// A key of the resource's section, else of [VISA], else the fallback.
std::string Value(const sim::Setup& setup, const std::string& resource, const std::string& key,
                  const std::string& fallback = "") {
    if (setup.Has("VISA", resource, key)) return setup.Get("VISA", resource, key);
    return setup.Get("VISA", "", key, fallback);
}

long Number(const sim::Setup& setup, const std::string& resource, const std::string& key, long fallback) {
    return sim::ParseNumber(Value(setup, resource, key), fallback);
}

bool Flag(const sim::Setup& setup, const std::string& resource, const std::string& key, bool fallback) {
    std::string value = Value(setup, resource, key);
    if (value.empty()) return fallback;
    return sim::EqualNoCase(value, "true") || sim::EqualNoCase(value, "yes") || value == "1";
}

// Queues the answer of a written message: the declared response, else the resource's UnknownQuery
// response for a text that ends in '?', else nothing (a command).
void Answer(Object& instrument, std::string message) {
    while (!message.empty() && (message.back() == '\n' || message.back() == '\r' ||
                                message.back() == static_cast<char>(instrument.termChar)))
        message.pop_back();
    sim::Setup setup = sim::Setup::Current();
    if (const sim::Section* section = setup.Find("VISA", instrument.resource))
        for (const auto& [key, value] : section->entries)
            if (key.size() > 6 && sim::EqualNoCase(key.substr(0, 6), "Query ") && sim::EqualNoCase(key.substr(6), message)) {
                instrument.pending += value + static_cast<char>(instrument.termChar);
                return;
            }
    if (!message.empty() && message.back() == '?' &&
        (setup.Has("VISA", instrument.resource, "UnknownQuery") || setup.Has("VISA", "", "UnknownQuery")))
        instrument.pending += Value(setup, instrument.resource, "UnknownQuery") + static_cast<char>(instrument.termChar);
}

ViStatus Write(ViSession vi, const char* data, ViUInt32 count, ViUInt32* written) {
    if (written) *written = 0;
    return WithInstrument(vi, [&](Object& instrument) -> ViStatus {
        Answer(instrument, std::string(data, count));
        if (written) *written = count;
        return Success;
    });
}

// Writes the printf-formatted message (VI_ERROR_INV_FMT for a format it cannot use).
ViStatus WriteFormatted(ViSession vi, const char* format, va_list arguments) {
    char text[4096];
    int length = std::vsnprintf(text, sizeof text, format, arguments);
    if (length < 0) return static_cast<ViStatus>(0xBFFF002C);
    return Write(vi, text, static_cast<ViUInt32>(std::min<int>(length, sizeof text - 1)), nullptr);
}

// Takes the queued response, without its termination character.
ViStatus TakeResponse(ViSession vi, std::string& text) {
    return WithInstrument(vi, [&](Object& instrument) -> ViStatus {
        if (instrument.pending.empty()) return ErrorTimeout;
        text.swap(instrument.pending);
        instrument.pending.clear();
        while (!text.empty() && (text.back() == static_cast<char>(instrument.termChar) || text.back() == '\n'))
            text.pop_back();
        return Success;
    });
}

// The number of arguments a printf format takes ('*' widths included), so that a query can pass on
// the rest of its argument list to the read. Every variadic argument takes one slot on x64.
int ArgumentCount(const char* format) {
    int count = 0;
    for (const char* p = format; *p; ++p) {
        if (*p != '%') continue;
        if (*++p == '%') continue;
        for (; *p && !std::strchr("diouxXeEfFgGaAcspn", *p); ++p)
            if (*p == '*') ++count;
        if (!*p) break;
        ++count;
    }
    return count;
}

ViStatus Scan(ViSession vi, const char* format, va_list arguments) {
    std::string text;
    ViStatus status = TakeResponse(vi, text);
    if (status != Success) return status;
    // "%t" and "%T" take the whole response; everything else is a C scanf format.
    if (std::strcmp(format, "%t") == 0 || std::strcmp(format, "%T") == 0) {
        std::strcpy(va_arg(arguments, char*), text.c_str());
        return Success;
    }
    std::vsscanf(text.c_str(), format, arguments);
    return Success;
}

ViStatus Unsupported() {
    sim::Count("unsupported");
    return ErrorOperationNotSupported;
}

}  // namespace

extern "C" {

ViStatus viOpenDefaultRM(ViSession* vi) {
    sim::Count("viOpenDefaultRM");
    *vi = 0;
    ViStatus status = sim::Setup::Current().GetLong("VISA", "", "OpenDefaultRMStatus", 0);
    if (status < 0) return status;
    std::lock_guard<std::mutex> guard(lock);
    *vi = Add(Object{});
    return status;
}

ViStatus viFindRsrc(ViSession rm, const char* expression, ViFindList* list, ViUInt32* count, char* description) {
    sim::Count("viFindRsrc");
    if (list) *list = 0;
    if (count) *count = 0;
    if (description) *description = '\0';
    sim::Setup setup = sim::Setup::Current();
    ViStatus forced = setup.GetLong("VISA", "", "FindRsrcStatus", 0);
    if (forced != 0) return forced;
    std::lock_guard<std::mutex> guard(lock);
    if (!Find(rm, Kind::ResourceManager)) return ErrorInvalidObject;
    Object found;
    found.kind = Kind::FindList;
    found.parent = rm;
    for (const std::string& resource : setup.Objects("VISA"))
        if (Flag(setup, resource, "Listed", true) && Matches(expression, resource.c_str())) found.matches.push_back(resource);
    if (found.matches.empty()) return ErrorResourceNotFound;
    std::snprintf(description, 256, "%s", found.matches.front().c_str());
    if (count) *count = static_cast<ViUInt32>(found.matches.size());
    found.matches.erase(found.matches.begin());
    ViFindList handle = Add(std::move(found));
    if (list) *list = handle;
    return Success;
}

ViStatus viFindNext(ViFindList list, char* description) {
    sim::Count("viFindNext");
    std::lock_guard<std::mutex> guard(lock);
    Object* found = Find(list, Kind::FindList);
    if (!found) return ErrorInvalidObject;
    if (found->matches.empty()) return ErrorResourceNotFound;
    std::snprintf(description, 256, "%s", found->matches.front().c_str());
    found->matches.erase(found->matches.begin());
    return Success;
}

ViStatus viParseRsrc(ViSession rm, const char* name, ViUInt16* interfaceType, ViUInt16* interfaceNumber) {
    sim::Count("viParseRsrc");
    sim::Setup setup = sim::Setup::Current();
    std::string section;
    bool known = KnownResource(setup, name, section);
    if (!(known ? Flag(setup, section, "Parse", true) : Accepted(setup, name))) return ErrorInvalidResourceName;
    {
        std::lock_guard<std::mutex> guard(lock);
        if (!Find(rm, Kind::ResourceManager)) return ErrorInvalidObject;
    }
    static const std::pair<const char*, ViUInt16> interfaces[] = {{"GPIB-VXI", 3}, {"GPIB", 1}, {"VXI", 2}, {"ASRL", 4},
                                                                  {"PXI", 5},      {"TCPIP", 6}, {"USB", 7}};
    for (const auto& [prefix, type] : interfaces) {
        std::size_t length = std::strlen(prefix);
        if (_strnicmp(name, prefix, length) != 0) continue;
        if (interfaceType) *interfaceType = type;
        if (interfaceNumber) *interfaceNumber = static_cast<ViUInt16>(std::atoi(name + length));
        break;
    }
    return Success;
}

ViStatus viOpen(ViSession rm, const char* name, ViUInt32, ViUInt32, ViSession* vi) {
    sim::Count("viOpen");
    *vi = 0;
    sim::Setup setup = sim::Setup::Current();
    std::string resource;
    if (!KnownResource(setup, name, resource)) {
        if (!Accepted(setup, name)) return ErrorResourceNotFound;
        resource = name;
    }
    ViStatus status = Number(setup, resource, "OpenStatus", 0);
    if (status < 0) return status;
    std::lock_guard<std::mutex> guard(lock);
    if (!Find(rm, Kind::ResourceManager)) return ErrorInvalidObject;
    Object instrument;
    instrument.kind = Kind::Instrument;
    instrument.parent = rm;
    instrument.resource = resource;
    instrument.timeout = static_cast<ViUInt32>(Number(setup, resource, "Timeout", 2000));
    instrument.termChar = static_cast<ViUInt8>(Number(setup, resource, "TermChar", '\n'));
    instrument.termCharEnabled = Flag(setup, resource, "TermCharEnabled", false);
    *vi = Add(std::move(instrument));
    return status;
}

ViStatus viClose(ViObject vi) {
    sim::Count("viClose");
    std::lock_guard<std::mutex> guard(lock);
    auto found = objects.find(vi);
    if (found == objects.end()) return ErrorInvalidObject;
    if (found->second.kind == Kind::ResourceManager) {
        // Closing a resource manager closes what it opened; a caller that closes its instrument
        // sessions first never relies on that.
        for (auto child = objects.begin(); child != objects.end();) {
            if (child->second.parent != vi) {
                ++child;
                continue;
            }
            // Its find lists go with it, as VISA defines; an instrument session left to it stays open.
            if (child->second.kind == Kind::Instrument) sim::Count("viClose RM before INSTR");
            else sim::Count("open", -1);
            child = objects.erase(child);
        }
    }
    objects.erase(vi);
    sim::Count("open", -1);
    return Success;
}

ViStatus viStatusDesc(ViObject, ViStatus status, char* description) {
    auto found = descriptions.find(status);
    if (found != descriptions.end()) {
        std::snprintf(description, 256, "%s", found->second);
        return Success;
    }
    std::snprintf(description, 256, "Unknown status 0x%08lX.", static_cast<unsigned long>(static_cast<ViUInt32>(status)));
    return WarnUnknownStatus;
}

ViStatus viWrite(ViSession vi, const unsigned char* buffer, ViUInt32 count, ViUInt32* written) {
    sim::Count("viWrite");
    return Write(vi, reinterpret_cast<const char*>(buffer), count, written);
}

ViStatus viRead(ViSession vi, unsigned char* buffer, ViUInt32 count, ViUInt32* read) {
    sim::Count("viRead");
    if (read) *read = 0;
    return WithInstrument(vi, [&](Object& instrument) -> ViStatus {
        if (instrument.pending.empty()) return ErrorTimeout;
        std::size_t length = std::min<std::size_t>(count, instrument.pending.size());
        ViStatus status = length == instrument.pending.size() ? Success : SuccessMaxCount;
        if (instrument.termCharEnabled) {
            std::size_t term = instrument.pending.find(static_cast<char>(instrument.termChar));
            if (term != std::string::npos && term < length) {
                length = term + 1;
                status = length == instrument.pending.size() ? Success : SuccessTermChar;
            }
        }
        std::memcpy(buffer, instrument.pending.data(), length);
        instrument.pending.erase(0, length);
        if (read) *read = static_cast<ViUInt32>(length);
        return status;
    });
}

ViStatus viVPrintf(ViSession vi, const char* format, va_list arguments) {
    sim::Count("viVPrintf");
    return WriteFormatted(vi, format, arguments);
}

ViStatus viVScanf(ViSession vi, const char* format, va_list arguments) {
    sim::Count("viVScanf");
    return Scan(vi, format, arguments);
}

ViStatus viVQueryf(ViSession vi, const char* writeFormat, const char* readFormat, va_list arguments) {
    sim::Count("viVQueryf");
    va_list writeArguments;
    va_copy(writeArguments, arguments);
    ViStatus status = WriteFormatted(vi, writeFormat, writeArguments);
    va_end(writeArguments);
    if (status != Success) return status;
    for (int skipped = ArgumentCount(writeFormat); skipped > 0; --skipped) (void)va_arg(arguments, void*);
    return Scan(vi, readFormat, arguments);
}

ViStatus viPrintf(ViSession vi, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    ViStatus status = viVPrintf(vi, format, arguments);
    va_end(arguments);
    return status;
}

ViStatus viScanf(ViSession vi, const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    ViStatus status = viVScanf(vi, format, arguments);
    va_end(arguments);
    return status;
}

ViStatus viQueryf(ViSession vi, const char* writeFormat, const char* readFormat, ...) {
    va_list arguments;
    va_start(arguments, readFormat);
    ViStatus status = viVQueryf(vi, writeFormat, readFormat, arguments);
    va_end(arguments);
    return status;
}

ViStatus viClear(ViSession vi) {
    sim::Count("viClear");
    return WithInstrument(vi, [&](Object& instrument) -> ViStatus {
        instrument.pending.clear();
        return Success;
    });
}

ViStatus viReadSTB(ViSession vi, ViUInt16* statusByte) {
    sim::Count("viReadSTB");
    return WithInstrument(vi, [&](Object& instrument) -> ViStatus {
        *statusByte = static_cast<ViUInt16>(Number(sim::Setup::Current(), instrument.resource, "StatusByte", 0));
        return Success;
    });
}

ViStatus viSetAttribute(ViObject vi, ViAttr attribute, ViAttrState value) {
    return WithInstrument(vi, [&](Object& instrument) -> ViStatus {
        switch (attribute) {
        case AttrTimeout: instrument.timeout = static_cast<ViUInt32>(value); return Success;
        case AttrTermChar: instrument.termChar = static_cast<ViUInt8>(value); return Success;
        case AttrTermCharEnabled: instrument.termCharEnabled = value != 0; return Success;
        default: return ErrorAttributeNotSupported;
        }
    });
}

ViStatus viGetAttribute(ViObject vi, ViAttr attribute, void* value) {
    return WithInstrument(vi, [&](Object& instrument) -> ViStatus {
        switch (attribute) {
        case AttrTimeout: *static_cast<ViUInt32*>(value) = instrument.timeout; return Success;
        case AttrTermChar: *static_cast<ViUInt8*>(value) = instrument.termChar; return Success;
        case AttrTermCharEnabled: *static_cast<ViBoolean*>(value) = instrument.termCharEnabled ? 1 : 0; return Success;
        default: return ErrorAttributeNotSupported;
        }
    });
}

// The rest of the library's entry points exist with their standard signatures; the simulated
// resources are message-based only, so these answer "not supported".
ViStatus viTerminate(ViObject, ViUInt16, ViJobId) { return Unsupported(); }
ViStatus viLock(ViSession, ViUInt32, ViUInt32, const char*, char*) { return Unsupported(); }
ViStatus viUnlock(ViSession) { return Unsupported(); }
ViStatus viEnableEvent(ViSession, ViEventType, ViUInt16, ViEventFilter) { return Unsupported(); }
ViStatus viDisableEvent(ViSession, ViEventType, ViUInt16) { return Unsupported(); }
ViStatus viDiscardEvents(ViSession, ViEventType, ViUInt16) { return Unsupported(); }
ViStatus viWaitOnEvent(ViSession, ViEventType, ViUInt32, ViEventType*, ViEvent*) { return Unsupported(); }
ViStatus viInstallHandler(ViSession, ViEventType, ViHndlr, ViAddr) { return Unsupported(); }
ViStatus viUninstallHandler(ViSession, ViEventType, ViHndlr, ViAddr) { return Unsupported(); }
ViStatus viReadAsync(ViSession, unsigned char*, ViUInt32, ViJobId*) { return Unsupported(); }
ViStatus viWriteAsync(ViSession, const unsigned char*, ViUInt32, ViJobId*) { return Unsupported(); }
ViStatus viAssertTrigger(ViSession, ViUInt16) { return Unsupported(); }
ViStatus viSetBuf(ViSession, ViUInt16, ViUInt32) { return Unsupported(); }
ViStatus viFlush(ViSession, ViUInt16) { return Unsupported(); }
ViStatus viIn8(ViSession, ViUInt16, ViBusAddress, ViUInt8*) { return Unsupported(); }
ViStatus viOut8(ViSession, ViUInt16, ViBusAddress, ViUInt8) { return Unsupported(); }
ViStatus viIn16(ViSession, ViUInt16, ViBusAddress, ViUInt16*) { return Unsupported(); }
ViStatus viOut16(ViSession, ViUInt16, ViBusAddress, ViUInt16) { return Unsupported(); }
ViStatus viIn32(ViSession, ViUInt16, ViBusAddress, ViUInt32*) { return Unsupported(); }
ViStatus viOut32(ViSession, ViUInt16, ViBusAddress, ViUInt32) { return Unsupported(); }
ViStatus viMoveIn8(ViSession, ViUInt16, ViBusAddress, ViBusSize, ViUInt8*) { return Unsupported(); }
ViStatus viMoveOut8(ViSession, ViUInt16, ViBusAddress, ViBusSize, ViUInt8*) { return Unsupported(); }
ViStatus viMoveIn16(ViSession, ViUInt16, ViBusAddress, ViBusSize, ViUInt16*) { return Unsupported(); }
ViStatus viMoveOut16(ViSession, ViUInt16, ViBusAddress, ViBusSize, ViUInt16*) { return Unsupported(); }
ViStatus viMoveIn32(ViSession, ViUInt16, ViBusAddress, ViBusSize, ViUInt32*) { return Unsupported(); }
ViStatus viMoveOut32(ViSession, ViUInt16, ViBusAddress, ViBusSize, ViUInt32*) { return Unsupported(); }
ViStatus viMapAddress(ViSession, ViUInt16, ViBusAddress, ViBusSize, ViBoolean, ViAddr, ViAddr*) { return Unsupported(); }
ViStatus viUnmapAddress(ViSession) { return Unsupported(); }
void viPeek8(ViSession, ViAddr, ViUInt8*) { Unsupported(); }
void viPoke8(ViSession, ViAddr, ViUInt8) { Unsupported(); }
void viPeek16(ViSession, ViAddr, ViUInt16*) { Unsupported(); }
void viPoke16(ViSession, ViAddr, ViUInt16) { Unsupported(); }
void viPeek32(ViSession, ViAddr, ViUInt32*) { Unsupported(); }
void viPoke32(ViSession, ViAddr, ViUInt32) { Unsupported(); }
ViStatus viMemAlloc(ViSession, ViBusSize, ViBusAddress*) { return Unsupported(); }
ViStatus viMemFree(ViSession, ViBusAddress) { return Unsupported(); }

}  // extern "C"
