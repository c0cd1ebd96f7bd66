// Listing names, sessions and categories, hiding categories and describing the manager's state.
#include <iterator>

#include "com/BstrConversion.h"
#include "framework/TEException.h"
#include "manager/InstrSessionMgr.h"
#include "sources/SessionName.h"

namespace sm {

namespace {
[[noreturn]] void RaiseCategoryError(std::string_view category, const char* function) {
    DynamicString message("'");
    message.Append(category).Append("' ").Append("is not a driver session category");
    TE_RAISE(TE_UNRECOGNIZED_VALUE, function, message);
}

void PrefixNames(std::string_view token, StringVector& names) {
    for (auto& name : names) {
        DynamicString prefixed(token);
        prefixed.Append("::").Append(name);
        name = std::move(prefixed);
    }
}
}  // namespace

STDMETHODIMP CInstrSessionMgr::GetNames(BSTR category, GetNamesOptions flags, BSTR filter, SAFEARRAY** names) {
    if (!names) return E_POINTER;
    *names = nullptr;
    return ManagerCall([&]() -> HRESULT {
        DynamicString text = TrimmedString(category);
        if (ShouldForward(text.View()))
            return CallExternal(ExternalProcessIndex(text.View()), [&](IInstrSessionMgr* external) {
                return external->GetNames(category, flags, filter, names);
            });
        bool starPrefix = HasExternalPrefix(text.View()) && ExternalProcessIndex(text.View()) == 0;
        StripExternalPrefix(text);
        StringVector filters = SplitFilterList(BstrToMultiByte(filter));
        StringVector result;
        GetConfigurationNames(text.View(), static_cast<std::uint32_t>(flags), filters, result);
        if (starPrefix)
            for (auto& name : result) AddExternalPrefix(name);
        *names = CreateSafeArray(result);
        return S_OK;
    });
}

void CInstrSessionMgr::GetConfigurationNames(std::string_view argument, std::uint32_t options,
                                             const StringVector& filters, StringVector& result) {
    result.clear();
    DynamicString category, subCategory;
    SplitCategoryArgument(argument, category, subCategory);
    bool any = IsAnyCategory(category.View());
    bool includePrefix = (options & IncludeCategoryPrefix) != 0;
    bool matched = false;
    auto applies = [&](std::string_view token) {
        return !IsHidden(token) && (any || SameCategory(category.View(), token));
    };
    auto collect = [&](InfoBase& source, std::string_view token) {
        StringVector names;
        source.ListNames(subCategory.View(), options, filters, names);
        if (includePrefix) PrefixNames(token, names);
        result.insert(result.end(), std::make_move_iterator(names.begin()), std::make_move_iterator(names.end()));
        matched = true;
    };
    if (applies(CategoryIVI)) collect(iviInfo, CategoryIVI);
    if (applies(CategoryRQ)) collect(rqInfo, CategoryRQ);
    if (applies(CategoryDAQ)) matched = true;
    if (applies(CategoryVISA)) collect(visaInfo, CategoryVISA);
    if (applies(CategoryVXIPNP)) collect(vxipnpInfo, CategoryVXIPNP);
    if (applies(CategoryCUSTOM)) matched = true;
    if (!matched) RaiseCategoryError(category.View(), "CInstrSessionMgr::GetConfigurationNames");
}

STDMETHODIMP CInstrSessionMgr::GetSessions(BSTR category, SAFEARRAY** result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    return ManagerCall([&]() -> HRESULT {
        DynamicString text = TrimmedString(category);
        if (ShouldForward(text.View()))
            return CallExternal(ExternalProcessIndex(text.View()),
                                [&](IInstrSessionMgr* external) { return external->GetSessions(category, result); });
        StripExternalPrefix(text);
        *result = GetSessionListSafeArray(text.View());
        return S_OK;
    });
}

SAFEARRAY* CInstrSessionMgr::GetSessionListSafeArray(std::string_view argument) {
    CriticalSectionGuard guard(lock);
    std::vector<TableEntry> kept = sessions;
    DynamicString category, subCategory;
    SplitCategoryArgument(argument, category, subCategory);
    for (std::size_t index = kept.size(); index-- > 0;) {
        CriticalSectionGuard sessionGuard(kept[index].base->objectLock);  // its category may change meanwhile
        DynamicString sessionCategory(kept[index].base->Category().View());
        bool categoryMatches = IsAnyCategory(category.View()) || SameCategory(category.View(), sessionCategory.View());
        if (!categoryMatches || !kept[index].base->AcceptsSubcategory(subCategory.View()))
            kept.erase(kept.begin() + static_cast<std::ptrdiff_t>(index));
    }
    UniqueSafeArray array(::SafeArrayCreateVector(VT_DISPATCH, 0, static_cast<ULONG>(kept.size())));
    if (!array) TE_RAISE(TE_OUT_OF_MEMORY, "CInstrSessionMgr::GetSessionListSafeArray");
    for (LONG index = 0; index < static_cast<LONG>(kept.size()); ++index) {
        // SafeArrayPutElement adds the element's own reference.
        IDispatch* element = kept[static_cast<std::size_t>(index)].session;
        if (FAILED(::SafeArrayPutElement(array.Get(), &index, element)))
            TE_RAISE(TE_OUT_OF_MEMORY, "CInstrSessionMgr::GetSessionListSafeArray");
    }
    return array.Release();
}

STDMETHODIMP CInstrSessionMgr::GetCategories(BSTR baseCategory, SAFEARRAY** result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    return ManagerCall([&]() -> HRESULT {
        DynamicString text = TrimmedString(baseCategory);
        if (ShouldForward(text.View()))
            return CallExternal(ExternalProcessIndex(text.View()),
                                [&](IInstrSessionMgr* external) { return external->GetCategories(baseCategory, result); });
        StripExternalPrefix(text);
        StringVector list;
        GetCategoryNames(text.View(), list);
        *result = CreateSafeArray(list);
        return S_OK;
    });
}

void CInstrSessionMgr::GetCategoryNames(std::string_view argument, StringVector& result) {
    DynamicString category, subCategory;
    SplitCategoryArgument(argument, category, subCategory);
    if (!iviHidden && SameCategory(category.View(), CategoryIVI)) {
        iviInfo.ListCategories(subCategory.View(), result);
        return;
    }
    for (std::string_view token : {CategoryDAQ, CategoryVISA, CategoryVXIPNP, CategoryCUSTOM})
        if (SameCategory(category.View(), token) && !IsHidden(token)) return;
    if (category.View() != AnyCategory) RaiseCategoryError(argument, "CInstrSessionMgr::GetCategoryNames");
    for (std::string_view token : {CategoryIVI, CategoryVISA, CategoryVXIPNP, CategoryCUSTOM})
        if (!IsHidden(token)) result.emplace_back(token);
}

STDMETHODIMP CInstrSessionMgr::HideCategory(BSTR category, VARIANT_BOOL hide) {
    return ManagerCall([&] {
        DynamicString text = TrimmedString(category);
        StripExternalPrefix(text);
        bool* flags[] = {&iviHidden, &daqHidden, &visaHidden, &vxipnpHidden, &customHidden};
        std::string_view tokens[] = {CategoryIVI, CategoryDAQ, CategoryVISA, CategoryVXIPNP, CategoryCUSTOM};
        for (std::size_t index = 0; index < std::size(tokens); ++index) {
            if (SameCategory(text.View(), tokens[index])) {
                *flags[index] = hide != 0;
                return;
            }
        }
        RaiseCategoryError(BstrToMultiByte(category), "CInstrSessionMgr::HideCategory");
    });
}

STDMETHODIMP CInstrSessionMgr::get_StateDescription(BSTR* result) {
    if (!result) return E_POINTER;
    *result = nullptr;
    return ManagerCall([&] {
        DynamicString text;
        AppendStateDescription(text);
        *result = AllocSysString(text);
    });
}

void CInstrSessionMgr::AppendStateDescription(String& text) {
    CriticalSectionGuard guard(lock);
    text.Append(inExternalProcess ? "Out of Process State:\n" : "In Process State:\n");
    if (!vxipnpHidden) vxipnpInfo.AppendStateDescription(text);
    if (!iviHidden) iviInfo.AppendStateDescription(text);
    if (!visaHidden) visaInfo.AppendStateDescription(text);
    text.Append("\nNumber of Sessions:");
    text.AppendUnsigned(sessions.size());
    text.Append("\n");
    for (std::size_t index = 0; index < sessions.size(); ++index) {
        text.Append("   Session #");
        text.AppendUnsigned(index);
        text.Append("\n");
        UniqueBstr description;
        CheckHResult(sessions[index].session->get_StateDescription(description.Put()));
        text.Append(BstrToMultiByte(description.Get()));
    }
    if (inExternalProcess) return;
    for (int index = 0; index < 2; ++index) {
        if (!externalServer[index]) continue;
        UniqueBstr external;
        CheckHResult(CallExternal(index, [&](IInstrSessionMgr* manager) { return manager->get_StateDescription(external.Put()); }));
        text.Append("\n\n").Append(BstrToMultiByte(external.Get()));
    }
}

}  // namespace sm
