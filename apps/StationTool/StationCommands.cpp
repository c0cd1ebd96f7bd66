#include "StationCommands.h"

#include <cstdio>
#include <vector>

#include "JsonText.h"
#include "com/BstrConversion.h"
#include "com/ComPtr.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"

namespace station {
namespace {

using sm::ComPtr;
using sm::UniqueBstr;
using sm::UniqueVariant;

std::string Text(BSTR text) { return sm::BstrToMultiByte(text); }
UniqueBstr Bstr(const std::string& text) { return UniqueBstr(sm::AllocSysString(text)); }

std::string LastErrorDescription() {
    ComPtr<IErrorInfo> info;
    if (::GetErrorInfo(0, info.Put()) != S_OK || !info) return {};
    UniqueBstr description;
    info->GetDescription(description.Put());
    return Text(description.Get());
}

void Check(HRESULT result) {
    if (FAILED(result)) throw ToolFailure{result, LastErrorDescription()};
}

std::vector<std::string> BstrArray(SAFEARRAY* array) {
    std::vector<std::string> items;
    if (!array) return items;
    LONG lower = 0, upper = -1;
    ::SafeArrayGetLBound(array, 1, &lower);
    ::SafeArrayGetUBound(array, 1, &upper);
    for (LONG i = lower; i <= upper; ++i) {
        UniqueBstr item;
        if (SUCCEEDED(::SafeArrayGetElement(array, &i, item.Put()))) items.push_back(Text(item.Get()));
    }
    return items;
}

struct SafeArrayOwner {
    SAFEARRAY* array = nullptr;
    ~SafeArrayOwner() {
        if (array) ::SafeArrayDestroy(array);
    }
};

ComPtr<IInstrSessionMgr> Manager() {
    ComPtr<IInstrSessionMgr> manager;
    Check(::CoCreateInstance(CLSID_InstrSessionMgr, nullptr, CLSCTX_INPROC_SERVER, IID_IInstrSessionMgr,
                             reinterpret_cast<void**>(manager.Put())));
    return manager;
}

ComPtr<IInstrSession> Session(IInstrSessionMgr* manager, const std::string& name) {
    ComPtr<IInstrSession> session;
    Check(manager->GetInstrSession(Bstr(name).Get(), VARIANT_FALSE, session.Put()));
    return session;
}

struct LockState {
    std::string key;
    long level = 0;
};

LockState GetLock(IInstrSession* session) {
    UniqueBstr key;
    LONG level = 0;
    Check(session->GetLockState(key.Put(), &level));
    return {Text(key.Get()), level};
}

std::string LockText(const LockState& lock) {
    return lock.level ? "locked by '" + lock.key + "', level " + std::to_string(lock.level) : "unlocked";
}

std::string LockJson(const LockState& lock) {
    return JsonObject({{"ownerKey", JsonString(lock.key)}, {"level", std::to_string(lock.level)}});
}

std::string SessionProperty(IInstrSession* session, HRESULT (STDMETHODCALLTYPE IInstrSession::*getter)(BSTR*)) {
    UniqueBstr value;
    Check((session->*getter)(value.Put()));
    return Text(value.Get());
}

void PrintList(const CommandLine& line, std::ostream& out, const char* key, const std::vector<std::string>& items) {
    if (line.json) {
        out << JsonObject({{key, JsonStringArray(items)}}) << "\n";
        return;
    }
    for (const std::string& item : items) out << item << "\n";
}

std::string Positional(const CommandLine& line) { return line.positional.empty() ? "" : line.positional[0]; }

void List(const CommandLine& line, std::ostream& out) {
    long flags = ReturnLogicalNames | ReturnVirtualInstruments | IncludeCategoryPrefix | ReturnRoutes | ReturnRouteGroups;
    if (line.HasFlag("--hidden")) flags |= ReturnHiddenNames;
    SafeArrayOwner names;
    Check(Manager()->GetNames(Bstr(Positional(line)).Get(), static_cast<GetNamesOptions>(flags),
                              Bstr(line.Value("--filter")).Get(), &names.array));
    PrintList(line, out, "names", BstrArray(names.array));
}

void Categories(const CommandLine& line, std::ostream& out) {
    SafeArrayOwner categories;
    Check(Manager()->GetCategories(Bstr(Positional(line)).Get(), &categories.array));
    PrintList(line, out, "categories", BstrArray(categories.array));
}

// "*VISA::GPIB0::14::INSTR": a session of the shared process names itself "*GPIB0::14::INSTR"; the
// star leads the whole name, so the line can be passed back to the tool as it stands.
std::string QualifiedName(const std::string& category, const std::string& name) {
    if (!name.empty() && name[0] == '*') return "*" + category + "::" + name.substr(1);
    return category + "::" + name;
}

void Sessions(const CommandLine& line, std::ostream& out) {
    SafeArrayOwner sessions;
    Check(Manager()->GetSessions(Bstr(Positional(line)).Get(), &sessions.array));
    LONG lower = 0, upper = -1;
    ::SafeArrayGetLBound(sessions.array, 1, &lower);
    ::SafeArrayGetUBound(sessions.array, 1, &upper);
    std::vector<std::string> rows;
    for (LONG i = lower; i <= upper; ++i) {
        ComPtr<IDispatch> element;
        Check(::SafeArrayGetElement(sessions.array, &i, element.Put()));
        ComPtr<IInstrSession> session;
        Check(element->QueryInterface(IID_IInstrSession, reinterpret_cast<void**>(session.Put())));
        std::string category = SessionProperty(session.Get(), &IInstrSession::get_Category);
        std::string name = SessionProperty(session.Get(), &IInstrSession::get_Name);
        LockState lock = GetLock(session.Get());
        rows.push_back(line.json ? JsonObject({{"category", JsonString(category)},
                                               {"name", JsonString(name)},
                                               {"lock", LockJson(lock)}})
                                 : QualifiedName(category, name) + "  (" + LockText(lock) + ")");
    }
    if (line.json) {
        std::string json = "{\"sessions\":[";
        for (std::size_t i = 0; i < rows.size(); ++i) json += (i ? "," : "") + rows[i];
        out << json << "]}\n";
        return;
    }
    for (const std::string& row : rows) out << row << "\n";
}

void State(const CommandLine& line, std::ostream& out) {
    UniqueBstr text;
    Check(Manager()->get_StateDescription(text.Put()));
    if (line.json)
        out << JsonObject({{"state", JsonString(Text(text.Get()))}}) << "\n";
    else
        out << Text(text.Get());
}

// A handle as the session hands it out: VT_I4 for VISA and driver sessions, VT_UI8 for switch
// sessions, empty for levels a session does not serve.
std::string HandleText(const VARIANT& handle) {
    switch (handle.vt) {
    case VT_I4: return std::to_string(handle.lVal);
    case VT_UI4: return std::to_string(handle.ulVal);
    case VT_I8: return std::to_string(handle.llVal);
    case VT_UI8: return std::to_string(handle.ullVal);
    case VT_EMPTY: return "(none)";
    default: return "(VARIANT type " + std::to_string(handle.vt) + ")";
    }
}

void Open(const CommandLine& line, std::ostream& out) {
    auto manager = Manager();
    auto session = Session(manager.Get(), line.positional[0]);
    Check(session->Initialize(Bstr(line.Value("--options")).Get()));
    std::string category = SessionProperty(session.Get(), &IInstrSession::get_Category);
    static const char* levelNames[] = {"DefaultInterface", "ClassDriver", "SpecificDriver", "IODriver"};
    std::vector<std::pair<std::string, std::string>> handles;
    std::string handleText;
    for (int level = 0; level < 4; ++level) {
        UniqueVariant handle;
        HRESULT result = session->GetHandleEx(static_cast<InterfaceLevel>(level), handle.Get());
        std::string value;
        if (result == E_NOTIMPL) {
            value = "(not offered by this session)";
            handles.emplace_back(levelNames[level], "null");
        } else if (SUCCEEDED(result)) {
            value = HandleText(*handle.Get());
            handles.emplace_back(levelNames[level], JsonString(value));
        } else {
            char code[16];
            std::snprintf(code, sizeof code, "%ld", static_cast<long>(result));
            value = std::string("error ") + code + ": " + LastErrorDescription();
            handles.emplace_back(levelNames[level], JsonObject({{"error", code}, {"message", JsonString(LastErrorDescription())}}));
        }
        handleText += "  " + std::string(levelNames[level]) + ": " + value + "\n";
    }
    LockState lock = GetLock(session.Get());
    std::string state = SessionProperty(session.Get(), &IInstrSession::get_StateDescription);
    if (line.json) {
        out << JsonObject({{"name", JsonString(line.positional[0])},
                           {"category", JsonString(category)},
                           {"handles", JsonObject(handles)},
                           {"lock", LockJson(lock)},
                           {"state", JsonString(state)}})
            << "\n";
        return;
    }
    out << "Session: " << line.positional[0] << "\nCategory: " << category << "\nHandles:\n"
        << handleText << "Lock: " << LockText(lock) << "\nState:\n"
        << state;
}

ComPtr<IVPPBase> StandardFunctions(const CommandLine& line, ComPtr<IInstrSession>& session) {
    session = Session(Manager().Get(), line.positional[0]);
    ComPtr<IVPPBase> functions;
    Check(session->GetVPPBaseInterface(functions.Put()));
    return functions;
}

void Print(const CommandLine& line, std::ostream& out,
           const std::vector<std::pair<std::string, std::string>>& fields /* label, JSON value */,
           const std::vector<std::string>& plain) {
    if (line.json) {
        out << JsonObject(fields) << "\n";
        return;
    }
    for (std::size_t i = 0; i < fields.size(); ++i) out << fields[i].first << ": " << plain[i] << "\n";
}

void SelfTest(const CommandLine& line, std::ostream& out) {
    ComPtr<IInstrSession> session;
    auto functions = StandardFunctions(line, session);
    short result = 0;
    UniqueBstr message;
    LONG status = 0;
    Check(functions->Self_Test(&result, message.Put(), &status));
    Print(line, out,
          {{"result", std::to_string(result)}, {"message", JsonString(Text(message.Get()))}, {"status", std::to_string(status)}},
          {std::to_string(result), Text(message.Get()), std::to_string(status)});
}

void Revision(const CommandLine& line, std::ostream& out) {
    ComPtr<IInstrSession> session;
    auto functions = StandardFunctions(line, session);
    UniqueBstr driver, firmware;
    LONG status = 0;
    Check(functions->Revision_Query(driver.Put(), firmware.Put(), &status));
    Print(line, out,
          {{"driverRevision", JsonString(Text(driver.Get()))},
           {"firmwareRevision", JsonString(Text(firmware.Get()))},
           {"status", std::to_string(status)}},
          {Text(driver.Get()), Text(firmware.Get()), std::to_string(status)});
}

void ErrorQuery(const CommandLine& line, std::ostream& out) {
    ComPtr<IInstrSession> session;
    auto functions = StandardFunctions(line, session);
    LONG code = 0, status = 0;
    UniqueBstr message;
    Check(functions->Error_Query(&code, message.Put(), &status));
    Print(line, out,
          {{"errorCode", std::to_string(code)}, {"message", JsonString(Text(message.Get()))}, {"status", std::to_string(status)}},
          {std::to_string(code), Text(message.Get()), std::to_string(status)});
}

void PrintLock(const CommandLine& line, std::ostream& out, const LockState& lock) {
    if (line.json)
        out << JsonObject({{"name", JsonString(line.positional[0])}, {"lock", LockJson(lock)}}) << "\n";
    else
        out << line.positional[0] << ": " << LockText(lock) << "\n";
}

void Lock(const CommandLine& line, std::ostream& out) {
    auto session = Session(Manager().Get(), line.positional[0]);
    double timeout = std::strtod(line.Value("--timeout", "0").c_str(), nullptr);
    Check(session->LockSession(Bstr(line.Value("--key")).Get(), timeout, 0));
    PrintLock(line, out, GetLock(session.Get()));
}

void Unlock(const CommandLine& line, std::ostream& out) {
    auto session = Session(Manager().Get(), line.positional[0]);
    do {
        Check(session->UnlockSession());
    } while (line.HasFlag("--all") && GetLock(session.Get()).level > 0);
    PrintLock(line, out, GetLock(session.Get()));
}

}  // namespace

void RunCommand(const CommandLine& line, std::ostream& out) {
    using Runner = void (*)(const CommandLine&, std::ostream&);
    static const std::pair<const char*, Runner> runners[] = {
        {"list", List},         {"categories", Categories}, {"sessions", Sessions},     {"state", State},
        {"open", Open},         {"selftest", SelfTest},     {"revision", Revision},     {"errorquery", ErrorQuery},
        {"lock", Lock},         {"unlock", Unlock},
    };
    for (const auto& [name, runner] : runners)
        if (line.command == name) return runner(line, out);
}

}  // namespace station
