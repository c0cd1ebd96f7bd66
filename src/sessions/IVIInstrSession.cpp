#include "sessions/IVIInstrSession.h"

#include <type_traits>
#include <vector>

#include "com/ModuleLock.h"
#include "framework/MultiByte.h"
#include "framework/TEException.h"
#include "sources/SessionName.h"

namespace sm {

namespace {
constexpr std::uint32_t ioSessionAttribute = 1050322;  // IVI_ATTR_IO_SESSION
constexpr std::size_t messageSize = 256;
constexpr const char* handleFunction = "CIVIInstrSession::GetHandle_Internal";
}  // namespace

// ---- names ----------------------------------------------------------------------------------------

void CIVIInstrSession::StripClassQualifier(String& text) const {
    if (entry.iviClass.IsEmpty()) return;
    std::size_t classStart = 0;
    if (!text.Find(entry.iviClass.View(), 0, true, &classStart)) return;
    std::size_t classChars = entry.iviClass.CharCount();
    std::size_t separator = 0, separatorChars = 0;
    if (!FindCategorySeparator(text.View(), &separator, &separatorChars)) return;
    if (separator != classStart + classChars) return;
    text.Delete(classStart, static_cast<std::int64_t>(classChars + separatorChars));
}

void CIVIInstrSession::GetName(String& result) const {
    result.Assign(name);
    StripClassQualifier(result);
}

void CIVIInstrSession::GetCategory(String& result) const {
    result.Assign(category);
    if (!entry.iviClass.IsEmpty()) result.Append("::").Append(entry.iviClass);
}

bool CIVIInstrSession::HasName(std::string_view candidate) const {
    DynamicString bare(candidate), own;
    StripClassQualifier(bare);
    GetName(own);
    return own.Compare(bare.View(), true) == 0 || ContainsName(entry.names, bare.View());
}

bool CIVIInstrSession::AcceptsSubcategory(std::string_view subCategory) const {
    return IsAnyCategory(subCategory) || entry.iviClass.Compare(subCategory, true) == 0;
}

// ---- driver library -------------------------------------------------------------------------------

std::string CIVIInstrSession::MakeClassDriverPath() const {
    // No directory: the system's usual search finds the class driver by name.
    return std::string(entry.iviClass.View()) + "_64.dll";
}

void CIVIInstrSession::LoadDriver() {
    if (library.IsLoaded()) return;
    try {
        try {
            library.Load(MakeClassDriverPath().c_str(), "CIVIInstrSession::LoadClassDLL");
            usingClassDriver = true;
        } catch (...) {
            library.Load(entry.modulePath.GetText(), "CIVIInstrSession::LoadSpecificDLL");
            usingClassDriver = false;
        }
        driverLibraryPath.Assign(library.Path());
        BindDriverFunctions();
    } catch (...) {
        // Nothing was opened: only the library goes; the close actions stay for the real close.
        ReleaseLibrary();
        throw;
    }
}

void CIVIInstrSession::PrepareVPPBase() {
    LoadDriver();
    Bind(library, ActivePrefix().View());
}

void CIVIInstrSession::BindDriverFunctions() {
    std::string prefix(ActivePrefix().View());
    Functions bound;
    auto optional = [&](auto*& slot, const char* suffix) {
        slot = library.BindOptional<std::remove_pointer_t<std::remove_reference_t<decltype(slot)>>>((prefix + suffix).c_str());
    };
    auto required = [&](auto*& slot, const char* suffix) {
        slot = library.Bind<std::remove_pointer_t<std::remove_reference_t<decltype(slot)>>>((prefix + suffix).c_str(),
                                                                                         "LoadFunctionPtr");
    };
    optional(bound.initWithOptions, "_InitWithOptions");
    optional(bound.errorMessage, "_error_message");
    optional(bound.getErrorInfo, "_GetErrorInfo");
    optional(bound.getError, "_GetError");
    optional(bound.getAttributeViSession, "_GetAttributeViSession");
    optional(bound.getSpecificDriverCHandle, "_GetSpecificDriverCHandle");
    required(bound.init, "_init");
    required(bound.close, "_close");
    functions = bound;
}

// ---- init -----------------------------------------------------------------------------------------

void CIVIInstrSession::ChooseResourceName(String& resource) const {
    const NameEntry* firstLogical = nullptr;
    bool sessionNameIsLogical = false;
    for (const NameEntry& known : entry.names) {
        if (!(known.flags & LogicalName)) continue;
        if (!firstLogical) firstLogical = &known;
        sessionNameIsLogical = sessionNameIsLogical || known.name.View() == name.View();
    }
    if (sessionNameIsLogical)
        resource.Assign(name);
    else if (firstLogical)
        resource.Assign(firstLogical->name);
    else
        resource.Assign(entry.viName);
    StripExternalPrefix(resource);
}

void CIVIInstrSession::ReadInitOptions(String& options, bool& idQuery, bool& reset) const {
    auto read = [&](std::string_view option, bool& target) {
        DynamicString value;
        if (!ExtractInitOption(options, option, value)) return;
        target = value.Compare("true", true) == 0 || GetBooleanInitOptionValue(value.View());
    };
    read("IdQuery", idQuery);
    read("Reset", reset);
}

void CIVIInstrSession::ImplementInit(std::string_view options) {
    DynamicString remaining(options);
    LoadDriver();
    if (initialized) return;
    DynamicString resource;
    ChooseResourceName(resource);
    bool idQuery = entry.idQuery, reset = entry.reset;
    ReadInitOptions(remaining, idQuery, reset);
    ViSession opened = 0;
    if (functions.initWithOptions) {
        ViStatus status = functions.initWithOptions(resource.GetText(), idQuery, reset, remaining.GetText(), &opened);
        if (status < 0) RaiseDriverError(status, "%1_InitWithOptions returned an error: %2 (0x%3).", "CIVIInstrSession::ImplementInit");
    } else {
        ViStatus status = functions.init(resource.GetText(), idQuery, reset, &opened);
        if (status < 0) RaiseDriverError(status, "%1_init returned an error: %2 (0x%3).", "CIVIInstrSession::ImplementInit");
    }
    viSession = opened;
    initialized = true;
}

// ---- driver errors --------------------------------------------------------------------------------

void CIVIInstrSession::RaiseDriverError(ViStatus status, const char* pattern, const char* function) {
    // Named after the function that failed: the class driver's when it is the one loaded.
    DynamicString message(pattern);
    message.ReplaceArg(1, ActivePrefix());
    message.ReplaceArg(2, status, "%d");
    message.ReplaceArg(3, static_cast<std::uint32_t>(status), "%x");
    AppendDriverErrorDetails(message, status);
    TE_RAISE(status, function, message);
}

void CIVIInstrSession::AppendDriverErrorDetails(String& message, ViStatus status) {
    ViSession handle = initialized ? viSession : 0;
    try {
        if (functions.getError) {
            char none[1] = {};
            ViStatus needed = functions.getError(handle, nullptr, 0, none);
            if (needed > 1) {
                std::vector<char> text(static_cast<std::size_t>(needed) + 1, '\0');
                ViStatus code = 0;
                functions.getError(handle, &code, needed, text.data());
                text.back() = '\0';
                message.Append(" ").Append(text.data());
                return;
            }
        }
        if (functions.errorMessage) {
            char text[messageSize] = {};
            if (functions.errorMessage(handle, status, text) >= 0) {
                text[messageSize - 1] = '\0';
                if (text[0]) message.Append(" ").Append(text);
            }
        }
        if (functions.getErrorInfo) {
            char elaboration[messageSize] = {};
            ViStatus primary = 0, secondary = 0;
            if (functions.getErrorInfo(handle, &primary, &secondary, elaboration) >= 0) {
                elaboration[messageSize - 1] = '\0';
                if (primary != 0 && primary != status) message.Append(" Primary Error Code: ").AppendInteger(primary).Append(".");
                if (secondary != 0) message.Append(" Secondary Error Code: ").AppendInteger(secondary).Append(".");
                if (elaboration[0]) message.Append(" ").Append(elaboration);
            }
        }
    } catch (...) {
        // The details only enrich the message; the driver's status is what the caller gets.
    }
}

// ---- handles --------------------------------------------------------------------------------------

ViSession CIVIInstrSession::GetHandle_Internal(InterfaceLevel level, bool checkProcess) {
    if (checkProcess && inExternalProcess)
        TE_RAISE(TE_OPERATION_FAILED, handleFunction,
                 "IVI instrument handles cannot be used outside of the operating system process that they are "
                 "created in.");
    if (level < DefaultInterface || level > IODriver) return 0;
    ImplementInit("");
    switch (level) {
        case SpecificDriver: {
            if (!usingClassDriver) return viSession;
            if (!functions.getSpecificDriverCHandle) return 0;
            ViSession specific = 0;
            ViStatus status = functions.getSpecificDriverCHandle(viSession, &specific);
            if (status < 0) RaiseDriverError(status, "%1_GetSpecificDriverCHandle returned an error: %2 (0x%3).", handleFunction);
            return specific;
        }
        case IODriver: {
            if (!functions.getAttributeViSession) TE_RAISE(TE_OPERATION_FAILED, handleFunction);
            ViSession io = 0;
            ViStatus status = functions.getAttributeViSession(viSession, "", ioSessionAttribute, &io);
            if (status < 0) RaiseDriverError(status, "%1_GetAttributeViSession returned an error: %2 (0x%3).", handleFunction);
            return io;
        }
        default:
            return usingClassDriver ? viSession : 0;
    }
}

// IVPPBase objects call this without the session's own lock held; initializing on demand changes
// the session, so it takes that lock here.
ViSession CIVIInstrSession::GetVPPSession() {
    CriticalSectionGuard guard(objectLock);
    ImplementInit("");
    return usingClassDriver ? viSession : 0;
}

// ---- close ----------------------------------------------------------------------------------------

void CIVIInstrSession::CloseDriverHandle() {
    // A module that is being detached calls no driver any more.
    if (functions.close && !IsModuleDetaching()) functions.close(viSession);
    viSession = 0;
}

// ---- automation methods ---------------------------------------------------------------------------

STDMETHODIMP CIVIInstrSession::Initialize(BSTR options) {
    return Locked([&] { ImplementInit(BstrToMultiByte(options)); });
}

STDMETHODIMP CIVIInstrSession::GetCOMDriver(InterfaceLevel level, IUnknown** driverObject) {
    return Locked(driverObject, [&] {
        if (level >= DefaultInterface && level <= IODriver) TE_RAISE(TE_OPERATION_FAILED, "CIVIInstrSession::GetCOMDriver");
    });
}

void CIVIInstrSession::AppendStateHeader(String& text) const {
    DynamicString value;
    GetName(value);
    text.Append("   Name: ").Append(value).Append(", Category: ");
    GetCategory(value);
    text.Append(value).Append("\nName List: ");
    AppendNameListText(entry.names, text);
    text.Append("\n      Initialized: ").Append(initialized ? "True" : "False");
    text.Append(", Loaded: ").Append(library.IsLoaded() ? "True" : "False");
    text.Append(", Driver Type: ");
    text.Append(!library.IsLoaded() ? "<unknown, not loaded>" : usingClassDriver ? "Class" : "Specific");
    text.Append(inExternalProcess ? ", Out of Process" : ", In Process");
    text.Append(", Class Module: ").Append(MakeClassDriverPath());
    text.Append(", Specific Module: ").Append(entry.modulePath.View()).Append("\n");
}

}  // namespace sm
