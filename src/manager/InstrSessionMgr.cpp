// The session table, name resolution and session creation.
#include "manager/InstrSessionMgr.h"

#include "com/BstrConversion.h"
#include "com/ModuleLock.h"
#include "framework/MultiByte.h"
#include "framework/TEException.h"
#include "sessions/CustomInstrSession.h"
#include "sessions/DriverSession.h"
#include "sessions/RQInstrSession.h"
#include "sessions/IVIInstrSession.h"
#include "sessions/LifeTimeAlerts.h"
#include "sessions/VXIPNPInstrSession.h"
#include "sessions/VisaInstrSession.h"
#include "sources/SessionName.h"

namespace sm {

CInstrSessionMgr::CInstrSessionMgr() : visaInfo(vxipnpInfo) {
    for (unsigned frequency = 1000; frequency < 3000; frequency += 200) LifeTimeAlert(frequency, 10);
}

CInstrSessionMgr::~CInstrSessionMgr() {
    CriticalSectionGuard guard(lock);
    // Every session holds a reference on its manager, so the table is empty by now; its entries
    // never owned a reference and are not released here.
    sessions.clear();
    for (unsigned frequency = 3000; frequency > 1000; frequency -= 200) LifeTimeAlert(frequency, 10);
    // While the process goes away the proxies' channels may already be gone: a release would have
    // to call out to the server and could hang the exit. The server notices the ended process.
    for (int index = 0; index < 2; ++index) {
        if (IsModuleDetaching()) {
            externalManager[index].Detach();
            externalServer[index].Detach();
        } else {
            externalManager[index].Reset();
            externalServer[index].Reset();
        }
    }
}

// The singleton factory keeps one reference for the life of the process. Only references beyond
// that one keep the DLL loaded.
ULONG CInstrSessionMgr::InternalAddRef() {
    ULONG count = ++references;
    if (count == 2) LockModule();
    return count;
}

ULONG CInstrSessionMgr::InternalRelease() {
    ULONG count = --references;
    if (count == 1) UnlockModule();
    if (count == 0) delete this;
    return count;
}

// ---- name rules -----------------------------------------------------------------------------------

bool CInstrSessionMgr::IsHidden(std::string_view token) const {
    if (SameCategory(token, CategoryIVI)) return iviHidden;
    if (SameCategory(token, CategoryDAQ)) return daqHidden;
    if (SameCategory(token, CategoryVISA)) return visaHidden;
    if (SameCategory(token, CategoryVXIPNP)) return vxipnpHidden;
    if (SameCategory(token, CategoryCUSTOM)) return customHidden;
    return false;
}

bool CInstrSessionMgr::IsVisibleCategoryName(std::string_view text) const {
    for (std::string_view token : {CategoryIVI, CategoryRQ, CategoryDAQ, CategoryVISA, CategoryVXIPNP, CategoryCUSTOM})
        if (SameCategory(text, token)) return !IsHidden(token);
    return false;
}

void CInstrSessionMgr::SplitSessionName(std::string_view text, String& category, String& name) const {
    std::string_view categoryPart, namePart;
    SplitSessionName(text, categoryPart, namePart);
    category.Assign(categoryPart);
    name.Assign(namePart);
}

// The parts are views into text (or AnyCategory): a lookup splits a name without copying it.
void CInstrSessionMgr::SplitSessionName(std::string_view text, std::string_view& category,
                                        std::string_view& name) const {
    std::size_t position = 0, length = 0;
    if (!FindCategorySeparator(text, &position, &length)) {
        name = text;
        category = AnyCategory;
        return;
    }
    std::size_t nameStart = multibyte::ByteOffset(text, position + length);
    std::string_view prefix = text.substr(0, multibyte::ByteOffset(text, position));
    if (!IsVisibleCategoryName(prefix) && !IsAnyCategory(prefix)) {
        // The prefix was no category after all: the whole text is the name.
        name = text;
        category = AnyCategory;
        return;
    }
    category = prefix;
    name = text.substr(nameStart);
}

void CInstrSessionMgr::SplitCategoryArgument(std::string_view text, String& category, String& subCategory) const {
    std::size_t position = 0, length = 0;
    if (!FindCategorySeparator(text, &position, &length)) {
        category.Assign(text);
        subCategory.Assign(AnyCategory);
    } else {
        SplitSessionName(text, category, subCategory);
    }
    if (category.IsEmpty()) category.Assign(AnyCategory);
    if (subCategory.IsEmpty()) subCategory.Assign(AnyCategory);
}

// ---- sessions -------------------------------------------------------------------------------------

STDMETHODIMP CInstrSessionMgr::InstallInstrSession(BSTR, IInstrSession*) {
    CriticalSectionGuard guard(lock);
    return E_NOTIMPL;
}

STDMETHODIMP CInstrSessionMgr::GetInstrSession(BSTR name, VARIANT_BOOL newSession, IInstrSession** session) {
    if (!session) return E_POINTER;
    *session = nullptr;
    return ManagerCall([&]() -> HRESULT {
        // A hit is the hot path of every test step: the name is taken apart as views of one
        // converted text, without copies.
        BstrText converted(name);
        std::string_view text = multibyte::Trimmed(converted.View());
        if (ShouldForward(text))
            return CallExternal(ExternalProcessIndex(text), [&](IInstrSessionMgr* external) {
                return external->GetInstrSession(name, newSession, session);
            });
        text = WithoutExternalPrefix(text);
        std::string_view category, sessionName;
        SplitSessionName(text, category, sessionName);
        ComPtr<IInstrSession> found;
        if (newSession || !FindExistingSession(category, sessionName, found)) {
            if (!CreateInstrSession(category, sessionName, found)) {
                DynamicString message("'");
                message.Append(text).Append("' ").Append("is not a driver session name");
                TE_RAISE(TE_UNRECOGNIZED_VALUE, "CInstrSessionMgr::GetInstrSession", message);
            }
            if (newSession) MakeSessionNameUnique(*sessions.back().base);
        }
        *session = found.Detach();
        return S_OK;
    });
}

// The caller holds the manager lock (GetInstrSession, from entry to exit).
bool CInstrSessionMgr::FindExistingSession(std::string_view category, std::string_view name,
                                           ComPtr<IInstrSession>& found) {
    // The index gives the session a scan of the table in order would give, without asking each.
    sessionIndex.CatchUp(sessions);
    IInstrSession* session = sessionIndex.Find(category, name);
    if (!session) return false;
    found = ComPtr<IInstrSession>(session);
    return true;
}

template <class Session>
Session* CInstrSessionMgr::AddSession(std::string_view category, std::string_view name, ComPtr<IInstrSession>& created) {
    auto* session = new Session();
    created = ComPtr<IInstrSession>::Attach(session->Self());
    session->SetName(DynamicString(name));
    session->SetCategory(DynamicString(category));
    session->AttachToOwner(this, inExternalProcess);
    sessions.push_back({session->Self(), session});
    return session;
}

bool CInstrSessionMgr::CreateInstrSession(std::string_view category, std::string_view name,
                                          ComPtr<IInstrSession>& created) {
    CriticalSectionGuard guard(lock);
    auto is = [&](std::string_view token) { return SameCategory(category, token) && !IsHidden(token); };
    if (is(CategoryIVI)) {
        IviEntry entry;
        if (!iviInfo.FindEntry(name, entry)) return false;
        AddSession<CIVIInstrSession>(category, name, created);
        static_cast<CIVIInstrSession*>(sessions.back().base)->SetEntry(entry);
        return true;
    }
    if (is(CategoryRQ)) {
        AddSession<CRQInstrSession>(category, name, created);
        static_cast<CRQInstrSession*>(created.Get())->SetDeviceName(name);
        return true;
    }
    if (is(CategoryDAQ)) return false;
    if (is(CategoryVISA)) {
        VisaEntry entry;
        bool found = visaInfo.FindEntry(name, entry);
        if (!found && multibyte::BeginsWith(name, "TCPIP", true)) found = visaInfo.ParseResource(name, entry);
        if (!found) found = visaInfo.FindLogicalName(name, entry);
        if (!found) return false;
        AddSession<CVisaInstrSession>(category, name, created)->SetEntry(entry);
        return true;
    }
    if (is(CategoryVXIPNP)) {
        VxipnpVInstr instrument;
        if (!vxipnpInfo.FindVInstr(name, instrument)) return false;
        AddSession<CVXIPNPInstrSession>(category, name, created)->SetVirtualInstrument(instrument);
        return true;
    }
    if (is(CategoryCUSTOM)) {
        AddSession<CCustomInstrSession>(category, name, created);
        return true;
    }
    if (!IsAnyCategory(category)) {
        DynamicString message("'");
        message.Append(category).Append("' ").Append("is not a driver session category");
        TE_RAISE(TE_UNRECOGNIZED_VALUE, "CInstrSessionMgr::CreateInstrSession", message);
    }
    for (std::string_view token : {CategoryIVI, CategoryVXIPNP, CategoryDAQ, CategoryVISA}) {
        if (IsHidden(token)) continue;
        if (CreateInstrSession(token, name, created)) return true;
    }
    return false;
}

void CInstrSessionMgr::MakeSessionNameUnique(SessionBase& session) {
    CriticalSectionGuard guard(lock);
    std::size_t noted = sessions.size();
    DynamicString base;
    {
        CriticalSectionGuard sessionGuard(session.objectLock);
        session.GetName(base);
    }
    for (std::int64_t counter = 2;; ++counter) {
        DynamicString candidate(base);
        candidate.Append("_").AppendInteger(counter);
        bool taken = false;
        for (std::size_t index = 0; index < noted && !taken; ++index) {
            DynamicString existing;
            {
                CriticalSectionGuard sessionGuard(sessions[index].base->objectLock);
                sessions[index].base->GetName(existing);
            }
            taken = existing.Compare(candidate.View(), true) == 0;
        }
        if (!taken) {
            CriticalSectionGuard sessionGuard(session.objectLock);
            session.SetName(candidate);
            return;
        }
    }
}

void CInstrSessionMgr::RemoveSession(SessionBase& session) {
    CriticalSectionGuard guard(lock);
    for (std::size_t position = sessions.size(); position-- > 0;)
        if (sessions[position].base == &session) sessions.erase(sessions.begin() + static_cast<std::ptrdiff_t>(position));
    sessionIndex.Remove(session);
}

// ---- process switches -----------------------------------------------------------------------------

STDMETHODIMP CInstrSessionMgr::get_InExternalProcess(VARIANT_BOOL* result) {
    if (!result) return E_POINTER;
    *result = VARIANT_FALSE;
    return ManagerCall([&] { *result = inExternalProcess ? VARIANT_TRUE : VARIANT_FALSE; });
}

STDMETHODIMP CInstrSessionMgr::put_InExternalProcess(VARIANT_BOOL value) {
    return ManagerCall([&] { inExternalProcess = value != 0; });
}

STDMETHODIMP CInstrSessionMgr::get_AudibleLifeTimeAlerts(VARIANT_BOOL* result) {
    if (!result) return E_POINTER;
    *result = VARIANT_FALSE;
    return ManagerCall([&] { *result = AudibleLifeTimeAlertsEnabled() ? VARIANT_TRUE : VARIANT_FALSE; });
}

STDMETHODIMP CInstrSessionMgr::put_AudibleLifeTimeAlerts(VARIANT_BOOL value) {
    return ManagerCall([&] {
        SetAudibleLifeTimeAlerts(value != 0);
        if (inExternalProcess) return;
        for (int index = 0; index < 2; ++index)
            if (externalServer[index])
                CallExternal(index, [&](IInstrSessionMgr* external) { return external->put_AudibleLifeTimeAlerts(value); });
    });
}

STDMETHODIMP CInstrSessionMgr::InvalidateVisaResourceList() {
    return ManagerCall([&] {
        visaInfo.InvalidateResourceList();
        if (inExternalProcess) return;
        for (int index = 0; index < 2; ++index)
            if (externalServer[index])
                CallExternal(index, [](IInstrSessionMgr* external) { return external->InvalidateVisaResourceList(); });
    });
}

STDMETHODIMP CInstrSessionMgr::GetUniqueKeyName(BSTR* keyName) {
    if (!keyName) return E_POINTER;
    *keyName = nullptr;
    return ManagerCall([&] {
        ++uniqueKeyCounter;
        // Fixed-width fields: run together without separators, numbers of varying width let two
        // processes (or two counters and ticks) form the same digits.
        DynamicString key("Lock");
        key.AppendUnsigned(static_cast<std::uint32_t>(uniqueKeyCounter), "%010u");
        key.AppendUnsigned(::GetTickCount(), "%010u");
        key.AppendUnsigned(::GetCurrentProcessId(), "%010u");
        *keyName = AllocSysString(key);
    });
}

bool CInstrSessionMgr::ShouldForward(std::string_view trimmedText) const {
    return HasExternalPrefix(trimmedText) && !inExternalProcess;
}

}  // namespace sm
