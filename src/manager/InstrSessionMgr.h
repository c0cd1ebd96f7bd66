// The one session manager of a process: resolves names to categories, keeps the table of live
// sessions, creates sessions from the configuration sources, lists names, sessions and categories,
// and forwards prefixed requests to the manager of the shared external process.
#pragma once

#include <cstdint>
#include <string_view>
#include <vector>

#include "com/Implements.h"
#include "com/Interfaces.h"
#include "com/UniqueHandles.h"
#include "manager/ExternalConnection.h"
#include "manager/SessionIndex.h"
#include "sessions/SessionBase.h"
#include "sources/IviInfo.h"
#include "sources/RQInfo.h"
#include "sources/VisaInfo.h"
#include "sources/VxipnpInfo.h"

namespace sm {

class CInstrSessionMgr : public Implements<CInstrSessionMgr, IInstrSessionMgr>, public SessionOwner {
public:
    static const CLSID& ClassId() { return CLSID_InstrSessionMgr; }
    // The singleton factory's reference must not keep the DLL loaded: see InternalAddRef.
    static constexpr bool CountsInModuleLock() { return false; }

    CInstrSessionMgr();
    ~CInstrSessionMgr() override;

    // IInstrSessionMgr
    STDMETHODIMP InstallInstrSession(BSTR name, IInstrSession* session) override;
    STDMETHODIMP GetInstrSession(BSTR name, VARIANT_BOOL newSession, IInstrSession** session) override;
    STDMETHODIMP GetNames(BSTR category, GetNamesOptions flags, BSTR filter, SAFEARRAY** names) override;
    STDMETHODIMP get_StateDescription(BSTR* result) override;
    STDMETHODIMP get_InExternalProcess(VARIANT_BOOL* result) override;
    STDMETHODIMP put_InExternalProcess(VARIANT_BOOL value) override;
    STDMETHODIMP GetSessions(BSTR category, SAFEARRAY** sessions) override;
    STDMETHODIMP GetCategories(BSTR baseCategory, SAFEARRAY** categories) override;
    STDMETHODIMP HideCategory(BSTR category, VARIANT_BOOL hide) override;
    STDMETHODIMP get_AudibleLifeTimeAlerts(VARIANT_BOOL* result) override;
    STDMETHODIMP put_AudibleLifeTimeAlerts(VARIANT_BOOL value) override;
    STDMETHODIMP InvalidateVisaResourceList() override;
    STDMETHODIMP GetUniqueKeyName(BSTR* keyName) override;

    // IDispatch: the plain late-bound GetInstrSession is answered without the type library.
    STDMETHODIMP Invoke(DISPID member, REFIID iid, LCID locale, WORD flags, DISPPARAMS* parameters, VARIANT* result,
                        EXCEPINFO* exception, UINT* argumentError) override;

    // SessionOwner
    void LockTable() override { lock.Lock(); }
    void UnlockTable() override { lock.Unlock(); }
    void RemoveSession(SessionBase& session) override;
    IUnknown* OwnerIdentity() override { return Identity(); }
    void SessionNamesChanged(SessionBase& session) override { sessionIndex.NoteRenamed(session); }

    // Name rules that depend on this manager's hidden categories.
    bool IsVisibleCategoryName(std::string_view text) const;
    void SplitSessionName(std::string_view text, String& category, String& name) const;
    void SplitSessionName(std::string_view text, std::string_view& category, std::string_view& name) const;
    void SplitCategoryArgument(std::string_view text, String& category, String& subCategory) const;

protected:
    ULONG InternalAddRef() override;
    ULONG InternalRelease() override;

private:
    struct TableEntry {
        IInstrSession* session;  // holds no reference: the session removes itself at final release
        SessionBase* base;
    };

    template <class Body>
    HRESULT ManagerCall(Body&& body) {
        return Boundary([&] {
            CriticalSectionGuard guard(lock);
            return body();
        });
    }

    bool FindExistingSession(std::string_view category, std::string_view name, ComPtr<IInstrSession>& found);
    bool CreateInstrSession(std::string_view category, std::string_view name, ComPtr<IInstrSession>& created);
    template <class Session>
    Session* AddSession(std::string_view category, std::string_view name, ComPtr<IInstrSession>& created);
    void MakeSessionNameUnique(SessionBase& session);
    bool IsHidden(std::string_view token) const;

    void GetConfigurationNames(std::string_view argument, std::uint32_t options, const StringVector& filters,
                               StringVector& result);
    void GetCategoryNames(std::string_view argument, StringVector& result);
    SAFEARRAY* GetSessionListSafeArray(std::string_view argument);
    void AppendStateDescription(String& text);

    // The external process managers (index 0: 64-bit, 1: 32-bit).
    ComPtr<IInstrSessionMgr> GetExternalMgr(int index);
    // Runs call (IInstrSessionMgr* -> HRESULT) on the external manager of index; see
    // CallKeptOrReconnect for a kept manager whose server has gone.
    template <class Call>
    HRESULT CallExternal(int index, Call&& call) {
        return CallKeptOrReconnect(
            static_cast<bool>(externalManager[index]), [&] { return GetExternalMgr(index); },
            [&] { externalManager[index].Reset(); },
            [&](const ComPtr<IInstrSessionMgr>& external) { return call(external.Get()); });
    }
    bool ShouldForward(std::string_view trimmedText) const;

    CriticalSection lock;
    std::vector<TableEntry> sessions;
    SessionIndex sessionIndex;  // follows sessions; see FindExistingSession
    VxipnpInfo vxipnpInfo;
    IviInfo iviInfo;
    RQInfo rqInfo;
    VisaInfo visaInfo;
    bool vxipnpHidden = false;
    bool visaHidden = false;
    bool iviHidden = false;
    bool daqHidden = false;
    bool customHidden = false;
    bool inExternalProcess = false;
    ComPtr<IUnknown> externalServer[2];
    // The external manager obtained at the first connection, kept with the server pointer: the
    // server's manager is a singleton, so asking the server again on every forwarded request (four
    // cross-process calls) would hand back the same object.
    ComPtr<IInstrSessionMgr> externalManager[2];
    std::int32_t uniqueKeyCounter = 0;
};

}  // namespace sm
