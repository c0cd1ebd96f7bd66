// Type-library contract tests.
//
// Script and early-bound clients see SessionMgr only through its type library, so every name,
// identifier, DISPID, vtable slot, flag, parameter and help text in it belongs to the public
// contract. These tests load the compiled SessionMgr.tlb from disk the way a client does
// (LoadTypeLibEx, no registration) and compare it, row by row, with the tables below. Each table
// row is its own test case so a broken row names itself.

#include <windows.h>
#include <oleauto.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <cwchar>
#include <cwctype>
#include <optional>
#include <ostream>
#include <string>
#include <utility>
#include <vector>

#include "SessionMgr.h"
#include "com/ComPtr.h"
#include "com/UniqueHandles.h"

#ifndef SESSIONMGR_TLB_PATH
#error "SESSIONMGR_TLB_PATH must name the compiled SessionMgr.tlb"
#endif

namespace {

// ---------------------------------------------------------------------------------------------
// Owning wrappers for the handles these tests touch.

template <class T>
using ComRef = sm::ComPtr<T>;

using Bstr = sm::UniqueBstr;

// A null BSTR (no text at all) is distinct from an empty one in a type library.
std::optional<std::wstring> TextOf(const Bstr& value)
{
    if (value.Get() == nullptr) {
        return std::nullopt;
    }
    return std::wstring(value.Get(), SysStringLen(value.Get()));
}

// ITypeInfo::GetNames fills a caller-provided array of BSTRs.
template <size_t Capacity>
class BstrArray {
public:
    BstrArray() = default;
    BstrArray(const BstrArray&) = delete;
    BstrArray& operator=(const BstrArray&) = delete;
    ~BstrArray()
    {
        for (BSTR value : values_) {
            SysFreeString(value);
        }
    }
    BSTR* data() { return values_; }
    static constexpr UINT capacity() { return Capacity; }
    std::wstring at(size_t index) const
    {
        return values_[index] != nullptr ? std::wstring(values_[index], SysStringLen(values_[index])) : L"<null>";
    }

private:
    BSTR values_[Capacity] = {};
};

// TYPEATTR, FUNCDESC and VARDESC are lent by the ITypeInfo and must be handed back to it.
template <class Desc, void (STDMETHODCALLTYPE ITypeInfo::*Release)(Desc*)>
class LentDesc {
public:
    LentDesc() = default;
    LentDesc(const LentDesc&) = delete;
    LentDesc& operator=(const LentDesc&) = delete;
    ~LentDesc() { reset(); }

    void reset()
    {
        if (desc_ != nullptr) {
            (owner_->*Release)(std::exchange(desc_, nullptr));
        }
    }
    Desc** put(ITypeInfo* owner)
    {
        reset();
        owner_ = owner;
        return &desc_;
    }
    const Desc* operator->() const { return desc_; }
    const Desc& operator*() const { return *desc_; }
    explicit operator bool() const { return desc_ != nullptr; }

private:
    ITypeInfo* owner_ = nullptr;
    Desc* desc_ = nullptr;
};

using TypeAttr = LentDesc<TYPEATTR, &ITypeInfo::ReleaseTypeAttr>;
using FuncDesc = LentDesc<FUNCDESC, &ITypeInfo::ReleaseFuncDesc>;
using VarDesc = LentDesc<VARDESC, &ITypeInfo::ReleaseVarDesc>;

class LibAttr {
public:
    LibAttr() = default;
    LibAttr(const LibAttr&) = delete;
    LibAttr& operator=(const LibAttr&) = delete;
    ~LibAttr()
    {
        if (attr_ != nullptr) {
            owner_->ReleaseTLibAttr(attr_);
        }
    }
    TLIBATTR** put(ITypeLib* owner)
    {
        owner_ = owner;
        return &attr_;
    }
    const TLIBATTR* operator->() const { return attr_; }

private:
    ITypeLib* owner_ = nullptr;
    TLIBATTR* attr_ = nullptr;
};

// ---------------------------------------------------------------------------------------------
// Small readers that turn type-library data into comparable text.

std::wstring guidText(const GUID& guid)
{
    wchar_t buffer[40] = {};
    StringFromGUID2(guid, buffer, static_cast<int>(std::size(buffer)));
    return buffer;
}

std::wstring hresultText(HRESULT hr)
{
    wchar_t buffer[16] = {};
    std::swprintf(buffer, std::size(buffer), L"0x%08lX", static_cast<unsigned long>(hr));
    return buffer;
}

std::wstring tlbPath()
{
    const char* narrow = SESSIONMGR_TLB_PATH;
    const int length = MultiByteToWideChar(CP_ACP, 0, narrow, -1, nullptr, 0);
    std::wstring wide(static_cast<size_t>(length), L'\0');
    MultiByteToWideChar(CP_ACP, 0, narrow, -1, wide.data(), length);
    wide.resize(static_cast<size_t>(length) - 1);
    return wide;
}

std::optional<std::wstring> typeName(ITypeInfo* info)
{
    Bstr name;
    if (FAILED(info->GetDocumentation(MEMBERID_NIL, name.Put(), nullptr, nullptr, nullptr))) {
        return std::nullopt;
    }
    return TextOf(name);
}

std::optional<std::wstring> typeHelp(ITypeInfo* info)
{
    Bstr help;
    if (FAILED(info->GetDocumentation(MEMBERID_NIL, nullptr, help.Put(), nullptr, nullptr))) {
        return std::nullopt;
    }
    return TextOf(help);
}

// Renders a parameter or return type in the notation of the interface definition, so that the
// expected tables read like the declarations clients see ("BSTR*", "IVPPBase**",
// "SAFEARRAY(BSTR)*"). Interfaces referenced by name render without their pointer star: the
// pointer is a separate VT_PTR level in the library.
std::wstring typeText(ITypeInfo* context, const TYPEDESC& type)
{
    switch (type.vt) {
    case VT_PTR:
        return typeText(context, *type.lptdesc) + L"*";
    case VT_SAFEARRAY:
        return L"SAFEARRAY(" + typeText(context, *type.lptdesc) + L")";
    case VT_USERDEFINED: {
        ComRef<ITypeInfo> referenced;
        if (FAILED(context->GetRefTypeInfo(type.hreftype, referenced.Put()))) {
            return L"<unresolved reference>";
        }
        return typeName(referenced.Get()).value_or(L"<unnamed>");
    }
    case VT_BSTR: return L"BSTR";
    case VT_BOOL: return L"VARIANT_BOOL";
    case VT_I2: return L"short";
    case VT_I4: return L"long";
    case VT_INT: return L"int";
    case VT_R8: return L"double";
    case VT_VARIANT: return L"VARIANT";
    case VT_UNKNOWN: return L"IUnknown*";
    case VT_DISPATCH: return L"IDispatch*";
    case VT_HRESULT: return L"HRESULT";
    case VT_VOID: return L"void";
    default: return L"vt" + std::to_wstring(type.vt);
    }
}

class TypeLibraryFixture : public testing::Test {
protected:
    void SetUp() override
    {
        const HRESULT hr = LoadTypeLibEx(tlbPath().c_str(), REGKIND_NONE, lib_.Put());
        ASSERT_EQ(hresultText(hr), hresultText(S_OK)) << "LoadTypeLibEx(" << SESSIONMGR_TLB_PATH << ")";
    }

    // The type info registered under a GUID; for a dual interface this is its dispatch view.
    ComRef<ITypeInfo> infoOf(const wchar_t* guidString)
    {
        GUID guid{};
        ComRef<ITypeInfo> info;
        if (SUCCEEDED(IIDFromString(guidString, &guid))) {
            lib_->GetTypeInfoOfGuid(guid, info.Put());
        }
        return info;
    }

    // The vtable view of a dual interface, reached the way a marshaller or binder does.
    static ComRef<ITypeInfo> vtableViewOf(ITypeInfo* dispatchView)
    {
        ComRef<ITypeInfo> view;
        HREFTYPE ref = 0;
        if (SUCCEEDED(dispatchView->GetRefTypeOfImplType(static_cast<UINT>(-1), &ref))) {
            dispatchView->GetRefTypeInfo(ref, view.Put());
        }
        return view;
    }

    ComRef<ITypeLib> lib_;
};

// =============================================================================================
// Library identity

TEST_F(TypeLibraryFixture, LibraryCarriesItsNameLibidVersionAndLocale)
{
    LibAttr attr;
    ASSERT_EQ(hresultText(lib_->GetLibAttr(attr.put(lib_.Get()))), hresultText(S_OK));
    EXPECT_EQ(guidText(attr->guid), L"{5C2F91A0-3E44-4B7D-9A15-2D6E8B0C47F1}");
    EXPECT_EQ(attr->wMajorVerNum, 1);
    EXPECT_EQ(attr->wMinorVerNum, 0);
    EXPECT_EQ(attr->lcid, 0x409u);
    EXPECT_EQ(attr->syskind, SYS_WIN64);
}

TEST_F(TypeLibraryFixture, LibraryCarriesItsHelpStringAndHelpFile)
{
    Bstr name;
    Bstr help;
    Bstr helpFile;
    DWORD helpContext = 0xFFFFFFFF;
    ASSERT_EQ(hresultText(lib_->GetDocumentation(-1, name.Put(), help.Put(), &helpContext, helpFile.Put())),
              hresultText(S_OK));
    EXPECT_EQ(TextOf(name), L"SM");
    EXPECT_EQ(TextOf(help), L"QV Session Manager");
    EXPECT_EQ(TextOf(helpFile), L"SMgrRef.chm");
    EXPECT_EQ(helpContext, 0u);
}

TEST_F(TypeLibraryFixture, IDispatchIsTakenFromTheImportedStandardOleLibrary)
{
    // Binding IDispatch to stdole2 rather than redefining it keeps its IID and layout canonical.
    ComRef<ITypeInfo> session = infoOf(L"{5C2F91AC-3E44-4B7D-9A15-2D6E8B0C47F1}");
    ASSERT_TRUE(session);
    HREFTYPE baseRef = 0;
    ASSERT_EQ(hresultText(session->GetRefTypeOfImplType(0, &baseRef)), hresultText(S_OK));
    ComRef<ITypeInfo> base;
    ASSERT_EQ(hresultText(session->GetRefTypeInfo(baseRef, base.Put())), hresultText(S_OK));
    EXPECT_EQ(typeName(base.Get()), L"IDispatch");

    ComRef<ITypeLib> container;
    UINT index = 0;
    ASSERT_EQ(hresultText(base->GetContainingTypeLib(container.Put(), &index)), hresultText(S_OK));
    LibAttr attr;
    ASSERT_EQ(hresultText(container->GetLibAttr(attr.put(container.Get()))), hresultText(S_OK));
    EXPECT_EQ(guidText(attr->guid), L"{00020430-0000-0000-C000-000000000046}");
}

// Every type the library holds, so that an accidental extra (a stray typedef alias, a helper
// interface) shows up as well as a missing one.
TEST_F(TypeLibraryFixture, LibraryHoldsExactlyTheContractTypes)
{
    std::vector<std::pair<std::wstring, int>> expected = {
        {L"InterfaceLevel", TKIND_ENUM},      {L"GetNamesOptions", TKIND_ENUM},
        {L"IInstrSession", TKIND_DISPATCH},   {L"IInstrSessionMgr", TKIND_DISPATCH},
        {L"IVPPBase", TKIND_DISPATCH},        {L"InstrSessionMgr", TKIND_COCLASS},
        {L"IVIInstrSession", TKIND_COCLASS},  {L"VXIPNPInstrSession", TKIND_COCLASS},
        {L"VisaInstrSession", TKIND_COCLASS}, {L"CustomInstrSession", TKIND_COCLASS},
        {L"RQInstrSession", TKIND_COCLASS},   {L"VPPBase", TKIND_COCLASS},
        {L"IExternalProcessServer", TKIND_DISPATCH},
    };
    std::vector<std::pair<std::wstring, int>> actual;
    for (UINT i = 0; i < lib_->GetTypeInfoCount(); ++i) {
        ComRef<ITypeInfo> info;
        ASSERT_EQ(hresultText(lib_->GetTypeInfo(i, info.Put())), hresultText(S_OK));
        TypeAttr attr;
        ASSERT_EQ(hresultText(info->GetTypeAttr(attr.put(info.Get()))), hresultText(S_OK));
        actual.emplace_back(typeName(info.Get()).value_or(L"<unnamed>"), attr->typekind);
    }
    std::sort(expected.begin(), expected.end());
    std::sort(actual.begin(), actual.end());
    EXPECT_EQ(actual, expected);
}

// =============================================================================================
// Enumerations

struct EnumValue {
    const wchar_t* name;
    long value;
};

struct EnumContract {
    const wchar_t* name;
    std::vector<EnumValue> values;
};

const std::vector<EnumContract>& enumTable()
{
    static const std::vector<EnumContract> table = {
        {L"InterfaceLevel",
         {{L"DefaultInterface", 0}, {L"ClassDriver", 1}, {L"SpecificDriver", 2}, {L"IODriver", 3}}},
        {L"GetNamesOptions",
         {{L"ReturnLogicalNames", 1},
          {L"ReturnVirtualInstruments", 2},
          {L"ReturnHiddenNames", 4},
          {L"IncludeCategoryPrefix", 8},
          {L"ReturnRouteGroups", 16},
          {L"ReturnRoutes", 32}}},
    };
    return table;
}

struct EnumRow {
    const EnumContract* owner;
    size_t index;
};

std::vector<EnumRow> enumRows()
{
    std::vector<EnumRow> rows;
    for (const EnumContract& contract : enumTable()) {
        for (size_t i = 0; i < contract.values.size(); ++i) {
            rows.push_back({&contract, i});
        }
    }
    return rows;
}

void PrintTo(const EnumContract* contract, std::ostream* out)
{
    *out << testing::PrintToString(std::wstring(contract->name));
}

void PrintTo(const EnumRow& row, std::ostream* out)
{
    *out << testing::PrintToString(std::wstring(row.owner->name)) << "."
         << testing::PrintToString(std::wstring(row.owner->values[row.index].name));
}

std::string asciiName(const wchar_t* text)
{
    std::string result;
    for (; *text != L'\0'; ++text) {
        result += (*text < 0x80 && std::iswalnum(static_cast<wint_t>(*text)) != 0) ? static_cast<char>(*text) : '_';
    }
    return result;
}

// Finds a type by name (the way a client's binder resolves "InterfaceLevel").
ComRef<ITypeInfo> findType(ITypeLib* lib, const wchar_t* name)
{
    std::wstring buffer(name);
    ITypeInfo* found[4] = {};
    MEMBERID ids[4] = {};
    USHORT count = 4;
    if (FAILED(lib->FindName(buffer.data(), 0, found, ids, &count))) {
        return {};
    }
    ComRef<ITypeInfo> owned[4];
    for (USHORT i = 0; i < count; ++i) {
        *owned[i].Put() = found[i];
    }
    for (USHORT i = 0; i < count; ++i) {
        if (ids[i] == MEMBERID_NIL) {  // the type itself, not a member that shares its name
            return std::move(owned[i]);
        }
    }
    return {};
}

template <class T>
std::vector<const T*> addressesOf(const std::vector<T>& table)
{
    std::vector<const T*> result;
    for (const T& entry : table) {
        result.push_back(&entry);
    }
    return result;
}

class EnumTypeTest : public TypeLibraryFixture, public testing::WithParamInterface<const EnumContract*> {};

TEST_P(EnumTypeTest, IsAnEnumerationWithExactlyTheListedMembers)
{
    const EnumContract& contract = *GetParam();
    ComRef<ITypeInfo> info = findType(lib_.Get(), contract.name);
    ASSERT_TRUE(info) << "no type named " << testing::PrintToString(std::wstring(contract.name));
    TypeAttr attr;
    ASSERT_EQ(hresultText(info->GetTypeAttr(attr.put(info.Get()))), hresultText(S_OK));
    EXPECT_EQ(attr->typekind, TKIND_ENUM);
    EXPECT_EQ(attr->cVars, contract.values.size());
    EXPECT_EQ(attr->cFuncs, 0);
}

INSTANTIATE_TEST_SUITE_P(Enums, EnumTypeTest,
                         testing::ValuesIn(addressesOf(enumTable())),
                         [](const testing::TestParamInfo<const EnumContract*>& info) {
                             return asciiName(info.param->name);
                         });

class EnumValueTest : public TypeLibraryFixture, public testing::WithParamInterface<EnumRow> {};

TEST_P(EnumValueTest, HasItsNameAndValueAtItsPosition)
{
    const EnumContract& contract = *GetParam().owner;
    const size_t index = GetParam().index;
    const EnumValue& expected = contract.values[index];
    ComRef<ITypeInfo> info = findType(lib_.Get(), contract.name);
    ASSERT_TRUE(info);

    VarDesc var;
    ASSERT_EQ(hresultText(info->GetVarDesc(static_cast<UINT>(index), var.put(info.Get()))),
              hresultText(S_OK));
    Bstr name;
    ASSERT_EQ(hresultText(info->GetDocumentation(var->memid, name.Put(), nullptr, nullptr, nullptr)),
              hresultText(S_OK));
    EXPECT_EQ(TextOf(name), expected.name);
    EXPECT_EQ(var->varkind, VAR_CONST);
    ASSERT_NE(var->lpvarValue, nullptr);
    EXPECT_EQ(V_VT(var->lpvarValue), VT_I4);
    EXPECT_EQ(V_I4(var->lpvarValue), expected.value);
}

INSTANTIATE_TEST_SUITE_P(Enums, EnumValueTest, testing::ValuesIn(enumRows()),
                         [](const testing::TestParamInfo<EnumRow>& info) {
                             return asciiName(info.param.owner->name) + "_" +
                                    asciiName(info.param.owner->values[info.param.index].name);
                         });

// =============================================================================================
// Interfaces and their members

enum class Kind { Method, Get, Put };

INVOKEKIND invokeKind(Kind kind)
{
    switch (kind) {
    case Kind::Get: return INVOKE_PROPERTYGET;
    case Kind::Put: return INVOKE_PROPERTYPUT;
    case Kind::Method: break;
    }
    return INVOKE_FUNC;
}

constexpr USHORT In = PARAMFLAG_FIN;
constexpr USHORT Out = PARAMFLAG_FOUT;
constexpr USHORT RetVal = PARAMFLAG_FOUT | PARAMFLAG_FRETVAL;
constexpr USHORT OptionalIn = PARAMFLAG_FIN | PARAMFLAG_FOPT | PARAMFLAG_FHASDEFAULT;

constexpr WORD Hidden = FUNCFLAG_FHIDDEN;
constexpr WORD RestrictedHidden = FUNCFLAG_FRESTRICTED | FUNCFLAG_FHIDDEN;

struct Param {
    const wchar_t* name;  // nullptr: the value argument of a property put, which has no name
    const wchar_t* type;
    USHORT flags;
    const wchar_t* defaultText = nullptr;  // a BSTR default value, when the parameter has one
};

struct Member {
    const wchar_t* name;
    MEMBERID dispid;
    Kind kind;
    WORD flags;
    std::vector<Param> params;
    const wchar_t* help;  // nullptr: no help string at all
};

struct InterfaceContract {
    const wchar_t* name;
    const wchar_t* iid;
    const wchar_t* help;
    std::vector<Member> members;  // in vtable order
};

const std::vector<InterfaceContract>& interfaceTable()
{
    static const wchar_t* const nameHelp = L"Returns the session name, which does not include a category prefix.";
    static const wchar_t* const sessionExternalHelp =
        L"Indicates if the session exists in the shared external process or in the current process.";
    static const wchar_t* const categoryHelp = L"Returns the session category.";
    static const wchar_t* const closeEnabledHelp = L"Controls whether calls to InstrSession.Close are honored. ";
    static const wchar_t* const closeFunctionHelp =
        L"This property is obsolete. Use the InstrSession.CloseFunctionEx property instead.";
    static const wchar_t* const closeFunctionExHelp =
        L"Stores the address of a function the session calls when it closes. If the function address is zero, "
        L"the session does not call the function.";
    static const wchar_t* const managerExternalHelp =
        L"Indicates whether Session Manager exists in the external process or in the current process.";
    static const wchar_t* const alertsHelp =
        L"Specifies whether a beep signifies the creation and destruction of session manager and individual "
        L"sessions. Enable this property when debugging to help monitor the lifetime of session manager objects.";

    static const std::vector<InterfaceContract> table = {
        {L"IInstrSession",
         L"{5C2F91AC-3E44-4B7D-9A15-2D6E8B0C47F1}",
         L"Use objects of the InstrSession class to share instrument driver instances or I/O resource handles "
         L"between software modules.  Each InstrSession object has a unique name that you use to retrieve the "
         L"session from the session manager.",
         {
             {L"Initialize", 0x01, Kind::Method, 0, {{L"options", L"BSTR", OptionalIn, L""}},
              L"Initializes the driver or I/O resource for the session. This method does nothing if the session is "
              L"already initialized. Typically, you do not call this method directly."},
             {L"IsInitialized", 0x02, Kind::Method, 0, {{L"IsInitialized", L"VARIANT_BOOL*", RetVal}},
              L"Returns a value that indicates whether the driver or I/O resource for the session is currently "
              L"initialized."},
             {L"Name", 0x03, Kind::Get, 0, {{L"pVal", L"BSTR*", RetVal}}, nameHelp},
             {L"Name", 0x03, Kind::Put, 0, {{nullptr, L"BSTR", In}}, nameHelp},
             {L"GetHandle", 0x04, Kind::Method, Hidden,
              {{L"level", L"InterfaceLevel", In}, {L"handle", L"long*", RetVal}},
              L"This method is obsolete. Use the InstrSession.GetHandleEx method instead."},
             {L"GetCOMDriver", 0x05, Kind::Method, 0,
              {{L"level", L"InterfaceLevel", In}, {L"driver", L"IUnknown**", RetVal}},
              L"Returns a COM pointer to the driver API object for the interface level you specify. The driver "
              L"initializes, if necessary. "},
             {L"Close", 0x06, Kind::Method, 0, {},
              L"This method is obsolete. Use the InstrSession.CloseFunctionEx method instead."},
             {L"InExternalProcess", 0x07, Kind::Get, 0, {{L"pVal", L"VARIANT_BOOL*", RetVal}}, sessionExternalHelp},
             {L"InExternalProcess", 0x07, Kind::Put, 0, {{nullptr, L"VARIANT_BOOL", In}}, sessionExternalHelp},
             {L"Category", 0x08, Kind::Get, 0, {{L"pVal", L"BSTR*", RetVal}}, categoryHelp},
             {L"Category", 0x08, Kind::Put, 0, {{nullptr, L"BSTR", In}}, categoryHelp},
             {L"StateDescription", 0x09, Kind::Get, 0, {{L"pVal", L"BSTR*", RetVal}},
              L"Returns a string that describes the session properties and all attached data."},
             {L"GenerateUniqueID", 0x0A, Kind::Method, 0, {{L"uniqueId", L"BSTR*", RetVal}},
              L"Returns the unique string you use to attach a data item to the session. Use the ID to retrieve "
              L"the data item from the session."},
             {L"AttachObject", 0x0B, Kind::Method, 0,
              {{L"uniqueId", L"BSTR", In},
               {L"iPtr", L"IUnknown*", In},
               {L"clsid", L"BSTR", In},
               {L"releaseOnClose", L"VARIANT_BOOL", In}},
              L"Attaches an object to the session. Pass True to the releaseOnClose parameter to release the "
              L"object when closing a session."},
             {L"AttachLong", 0x0C, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}, {L"value", L"long", In}},
              L"Attaches a user-defined long integer value to the session. Call the InstrSession.GetLong method "
              L"to retrieve the value."},
             {L"AttachString", 0x0D, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}, {L"value", L"BSTR", In}},
              L"Attaches a user-defined string value to the session. Call the InstrSession.GetString method to "
              L"retrieve the value."},
             {L"GetObject", 0x0E, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}, {L"iPtr", L"IUnknown**", RetVal}},
              L"Returns the ActiveX object attached to the session with the string ID you specify. Call "
              L"QueryInterface on the object to obtain a specific interface."},
             {L"GetLong", 0x10, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}, {L"value", L"long*", RetVal}},
              L"Returns the long integer value attached to the session with the string ID you specify."},
             {L"GetString", 0x11, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}, {L"value", L"BSTR*", RetVal}},
              L"Returns the string value attached to the session with the string ID you specify."},
             {L"DetachData", 0x12, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}},
              L"Removes a user-defined data item from the session and disposes of the data. Pass an empty string "
              L"as the uniqueId parameter to detach all user-defined data items."},
             {L"CloseEnabled", 0x13, Kind::Get, 0, {{L"pVal", L"VARIANT_BOOL*", RetVal}}, closeEnabledHelp},
             {L"CloseEnabled", 0x13, Kind::Put, 0, {{nullptr, L"VARIANT_BOOL", In}}, closeEnabledHelp},
             {L"GetVPPBaseInterface", 0x14, Kind::Method, 0, {{L"vppBaseInterface", L"IVPPBase**", RetVal}},
              L"Returns an interface that provides the standard VPP functions, except init and close, on a "
              L"session to a VXIplug&play-compliant driver."},
             {L"LockSession", 0x15, Kind::Method, 0,
              {{L"keyName", L"BSTR", In}, {L"timeout", L"double", In}, {L"reserved", L"long", In}},
              L"Locks the session with the case-insensitive key name you specify. If the session is locked with a "
              L"different key name, the method waits until the session becomes available or returns an error when "
              L"the timeout period expires."},
             {L"UnlockSession", 0x16, Kind::Method, 0, {},
              L"Releases the most recent lock. You must call this method to balance each successful call to the "
              L"InstrSession.LockSession method."},
             {L"GetLockState", 0x17, Kind::Method, 0,
              {{L"ownerKey", L"BSTR*", Out}, {L"nestingLevel", L"long*", Out}},
              L"Returns the key that owns the lock and the number of times the key acquired the lock."},
             {L"CloseFunction", 0x18, Kind::Get, Hidden, {{L"pVal", L"long*", RetVal}}, closeFunctionHelp},
             {L"CloseFunction", 0x18, Kind::Put, Hidden, {{nullptr, L"long", In}}, closeFunctionHelp},
             {L"GetHandleEx", 0x19, Kind::Method, 0,
              {{L"level", L"InterfaceLevel", In}, {L"handle", L"VARIANT*", RetVal}},
              L"Returns the C-based instrument API handle to the driver for a specific interface level."},
             {L"CloseFunctionEx", 0x1A, Kind::Get, 0, {{L"pVal", L"VARIANT*", RetVal}}, closeFunctionExHelp},
             {L"CloseFunctionEx", 0x1A, Kind::Put, 0, {{nullptr, L"VARIANT", In}}, closeFunctionExHelp},
             {L"AttachLongPtr", 0x1B, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}, {L"value", L"VARIANT", In}},
              L"Attaches a user-defined pointer-sized integer value to the session. Call the "
              L"InstrSession.GetLongPtr method to retrieve the value."},
             {L"GetLongPtr", 0x1C, Kind::Method, 0, {{L"uniqueId", L"BSTR", In}, {L"value", L"VARIANT*", RetVal}},
              L"Returns the pointer-sized integer value attached to the session with the string ID you specify."},
         }},
        {L"IInstrSessionMgr",
         L"{7D4A10B0-2C88-4E21-B3F6-91E5A07D2C3B}",
         L"This interface provides lists of the available logical and virtual instrument names.  In addition, it "
         L"returns an instrument session interface for a given logical or virtual instrument name.",
         {
             {L"InstallInstrSession", 0x02, Kind::Method, RestrictedHidden,
              {{L"Name", L"BSTR", In}, {L"instrSession", L"IInstrSession*", In}}, nullptr},
             {L"GetInstrSession", 0x03, Kind::Method, 0,
              {{L"Name", L"BSTR", In},
               {L"newSession", L"VARIANT_BOOL", In},
               {L"instrSession", L"IInstrSession**", RetVal}},
              L"Returns the specified instrument session or creates the session if it does not already exist."},
             {L"GetNames", 0x04, Kind::Method, 0,
              {{L"Category", L"BSTR", In},
               {L"flags", L"GetNamesOptions", In},
               {L"filter", L"BSTR", In},
               {L"names", L"SAFEARRAY(BSTR)*", RetVal}},
              L"Returns an array of the names for which you can obtain sessions. "},
             {L"StateDescription", 0x05, Kind::Get, 0, {{L"pVal", L"BSTR*", RetVal}},
              L"Returns a string that describes all session names and all session objects for the current process "
              L"and the shared external process."},
             {L"InExternalProcess", 0x06, Kind::Get, 0, {{L"pVal", L"VARIANT_BOOL*", RetVal}}, managerExternalHelp},
             {L"InExternalProcess", 0x06, Kind::Put, 0, {{nullptr, L"VARIANT_BOOL", In}}, managerExternalHelp},
             // The array element is recorded as the session interface itself, without a pointer
             // level: the IDL compiler accepts no pointer inside SAFEARRAY(...).
             {L"GetSessions", 0x07, Kind::Method, 0,
              {{L"Category", L"BSTR", In}, {L"sessions", L"SAFEARRAY(IInstrSession)*", RetVal}},
              L"Returns an array of all existing session objects that are in the category you specify."},
             {L"GetCategories", 0x08, Kind::Method, 0,
              {{L"baseCategory", L"BSTR", In}, {L"categories", L"SAFEARRAY(BSTR)*", RetVal}},
              L"Returns an array of category names."},
             {L"HideCategory", 0x09, Kind::Method, 0, {{L"Category", L"BSTR", In}, {L"hide", L"VARIANT_BOOL", In}},
              L"Hides a top level category."},
             {L"AudibleLifeTimeAlerts", 0x0A, Kind::Get, 0, {{L"pVal", L"VARIANT_BOOL*", RetVal}}, alertsHelp},
             {L"AudibleLifeTimeAlerts", 0x0A, Kind::Put, 0, {{nullptr, L"VARIANT_BOOL", In}}, alertsHelp},
             {L"InvalidateVisaResourceList", 0x0B, Kind::Method, 0, {},
              L"Invalidates the internal list of VISA resources, causing VISA to rescan the system for the list of "
              L"available resources the next time you request a list of available session names that include "
              L"VISA sessions."},
             {L"GetUniqueKeyName", 0x0C, Kind::Method, 0, {{L"keyName", L"BSTR*", Out}},
              L"Generates a unique key name you can pass to the InstrSession.LockSession method of a session "
              L"object."},
         }},
        {L"IVPPBase",
         L"{C93B5E27-0D41-4A6E-B2F8-7E1A94C03D56}",
         L"This interface provides the standard VPP functions, except init and close, on a session to a VXIPNP "
         L"compliant driver.  You obtain this from interface from a session for a VPP driver.",
         {
             {L"Error_Query", 0x01, Kind::Method, 0,
              {{L"errorCode", L"long*", Out}, {L"errorMessage", L"BSTR*", Out}, {L"status", L"long*", RetVal}},
              L"Reads an error code and a message from the instrument error queue."},
             {L"Error_Message", 0x02, Kind::Method, 0,
              {{L"errorCode", L"long", In}, {L"errorMessage", L"BSTR*", Out}, {L"status", L"long*", RetVal}},
              L"Converts a status code an instrument driver function returns into a user-readable message string."},
             {L"Revision_Query", 0x03, Kind::Method, 0,
              {{L"instrumentDriverRevision", L"BSTR*", Out},
               {L"firmwareRevision", L"BSTR*", Out},
               {L"status", L"long*", RetVal}},
              L"Returns the revision numbers of the instrument driver and instrument firmware."},
             {L"Self_Test", 0x04, Kind::Method, 0,
              {{L"selfTestResult", L"short*", Out}, {L"selfTestMessage", L"BSTR*", Out}, {L"status", L"long*", RetVal}},
              L"Runs the instrument self test routine and the test result(s)."},
             {L"Reset", 0x05, Kind::Method, 0, {{L"status", L"long*", RetVal}},
              L"Resets the instrument to a known state and sends initialization commands to the instrument."},
         }},
    };
    return table;
}

constexpr UINT DispatchSlots = 7;  // IUnknown (3) + IDispatch (4) precede every member

struct MemberRow {
    const InterfaceContract* owner;
    size_t index;
    const Member& member() const { return owner->members[index]; }
};

std::vector<MemberRow> memberRows()
{
    std::vector<MemberRow> rows;
    for (const InterfaceContract& contract : interfaceTable()) {
        for (size_t i = 0; i < contract.members.size(); ++i) {
            rows.push_back({&contract, i});
        }
    }
    return rows;
}

std::string memberRowName(const MemberRow& row)
{
    const Member& m = row.member();
    const char* kind = m.kind == Kind::Get ? "get" : m.kind == Kind::Put ? "put" : "call";
    char slot[8] = {};
    std::snprintf(slot, sizeof slot, "%02u", static_cast<unsigned>(row.index + 1));
    return asciiName(row.owner->name) + "_" + slot + "_" + kind + "_" + asciiName(m.name);
}

void PrintTo(const MemberRow& row, std::ostream* out) { *out << memberRowName(row); }
void PrintTo(const InterfaceContract* contract, std::ostream* out) { *out << asciiName(contract->name); }

const Param* retvalOf(const Member& member)
{
    for (const Param& p : member.params) {
        if ((p.flags & PARAMFLAG_FRETVAL) != 0) {
            return &p;
        }
    }
    return nullptr;
}

// ---- interface level ----

class InterfaceTest : public TypeLibraryFixture, public testing::WithParamInterface<const InterfaceContract*> {};

TEST_P(InterfaceTest, DispatchViewIsDualWithItsNameAndHelpString)
{
    const InterfaceContract& contract = *GetParam();
    ComRef<ITypeInfo> info = infoOf(contract.iid);
    ASSERT_TRUE(info) << "no type with IID " << testing::PrintToString(std::wstring(contract.iid));
    TypeAttr attr;
    ASSERT_EQ(hresultText(info->GetTypeAttr(attr.put(info.Get()))), hresultText(S_OK));
    EXPECT_EQ(attr->typekind, TKIND_DISPATCH);
    EXPECT_EQ(attr->wTypeFlags, TYPEFLAG_FDUAL | TYPEFLAG_FDISPATCHABLE);
    EXPECT_EQ(typeName(info.Get()), contract.name);
    EXPECT_EQ(typeHelp(info.Get()), contract.help);
    // Late-bound clients see the IUnknown/IDispatch slots followed by every member.
    EXPECT_EQ(attr->cFuncs, DispatchSlots + contract.members.size());
}

TEST_P(InterfaceTest, VtableViewIsOleAutomationDerivedFromIDispatch)
{
    const InterfaceContract& contract = *GetParam();
    ComRef<ITypeInfo> info = infoOf(contract.iid);
    ASSERT_TRUE(info);
    ComRef<ITypeInfo> vtable = vtableViewOf(info.Get());
    ASSERT_TRUE(vtable) << "dual interface without a vtable view";
    TypeAttr attr;
    ASSERT_EQ(hresultText(vtable->GetTypeAttr(attr.put(vtable.Get()))), hresultText(S_OK));
    EXPECT_EQ(attr->typekind, TKIND_INTERFACE);
    EXPECT_EQ(attr->wTypeFlags, TYPEFLAG_FDUAL | TYPEFLAG_FDISPATCHABLE | TYPEFLAG_FOLEAUTOMATION);
    EXPECT_EQ(guidText(attr->guid), contract.iid);
    EXPECT_EQ(typeName(vtable.Get()), contract.name);
    EXPECT_EQ(typeHelp(vtable.Get()), contract.help);
    EXPECT_EQ(attr->cFuncs, contract.members.size());
    EXPECT_EQ(attr->cbSizeVft, (DispatchSlots + contract.members.size()) * sizeof(void*));
    ASSERT_EQ(attr->cImplTypes, 1);

    HREFTYPE baseRef = 0;
    ASSERT_EQ(hresultText(vtable->GetRefTypeOfImplType(0, &baseRef)), hresultText(S_OK));
    ComRef<ITypeInfo> base;
    ASSERT_EQ(hresultText(vtable->GetRefTypeInfo(baseRef, base.Put())), hresultText(S_OK));
    EXPECT_EQ(typeName(base.Get()), L"IDispatch");
}

INSTANTIATE_TEST_SUITE_P(Interfaces, InterfaceTest,
                         testing::ValuesIn(addressesOf(interfaceTable())),
                         [](const testing::TestParamInfo<const InterfaceContract*>& info) {
                             return asciiName(info.param->name);
                         });

// ---- member level ----

class MemberTest : public TypeLibraryFixture, public testing::WithParamInterface<MemberRow> {
protected:
    void SetUp() override
    {
        TypeLibraryFixture::SetUp();
        if (HasFatalFailure()) {
            return;
        }
        dispatch_ = infoOf(GetParam().owner->iid);
        ASSERT_TRUE(dispatch_);
        vtable_ = vtableViewOf(dispatch_.Get());
        ASSERT_TRUE(vtable_);
    }

    ComRef<ITypeInfo> dispatch_;
    ComRef<ITypeInfo> vtable_;
};

TEST_P(MemberTest, OccupiesItsVtableSlotWithItsDispidAndInvokeKind)
{
    const MemberRow& row = GetParam();
    const Member& expected = row.member();
    FuncDesc func;
    ASSERT_EQ(hresultText(vtable_->GetFuncDesc(static_cast<UINT>(row.index), func.put(vtable_.Get()))),
              hresultText(S_OK));
    EXPECT_EQ(func->oVft, static_cast<SHORT>((DispatchSlots + row.index) * sizeof(void*)));
    EXPECT_EQ(func->memid, expected.dispid);
    EXPECT_EQ(func->invkind, invokeKind(expected.kind));
    EXPECT_EQ(func->funckind, FUNC_PUREVIRTUAL);
    EXPECT_EQ(func->callconv, CC_STDCALL);
    EXPECT_EQ(func->wFuncFlags, expected.flags);
    EXPECT_EQ(typeText(vtable_.Get(), func->elemdescFunc.tdesc), L"HRESULT");
}

TEST_P(MemberTest, DeclaresItsParametersWithTypesDirectionsAndDefaults)
{
    const MemberRow& row = GetParam();
    const Member& expected = row.member();
    FuncDesc func;
    ASSERT_EQ(hresultText(vtable_->GetFuncDesc(static_cast<UINT>(row.index), func.put(vtable_.Get()))),
              hresultText(S_OK));
    ASSERT_EQ(func->cParams, static_cast<SHORT>(expected.params.size()));
    for (size_t i = 0; i < expected.params.size(); ++i) {
        SCOPED_TRACE("parameter " + std::to_string(i));
        const Param& p = expected.params[i];
        const ELEMDESC& actual = func->lprgelemdescParam[i];
        EXPECT_EQ(typeText(vtable_.Get(), actual.tdesc), p.type);
        EXPECT_EQ(actual.paramdesc.wParamFlags, p.flags);
        if (p.defaultText != nullptr) {
            ASSERT_NE(actual.paramdesc.pparamdescex, nullptr);
            const VARIANT& value = actual.paramdesc.pparamdescex->varDefaultValue;
            ASSERT_EQ(V_VT(&value), VT_BSTR);
            ASSERT_NE(V_BSTR(&value), nullptr);
            EXPECT_EQ(std::wstring(V_BSTR(&value), SysStringLen(V_BSTR(&value))), p.defaultText);
        }
    }
}

// Names and help strings are looked up by DISPID, which a property's get and put share; the
// lookup yields the getter's, so for a put only the member name is observable (its value
// argument is unnamed anyway).
TEST_P(MemberTest, CarriesItsMemberAndParameterNames)
{
    const Member& expected = GetParam().member();
    std::vector<std::wstring> wanted = {expected.name};
    if (expected.kind != Kind::Put) {
        for (const Param& p : expected.params) {
            wanted.emplace_back(p.name);
        }
    }
    BstrArray<16> names;
    UINT count = 0;
    ASSERT_EQ(hresultText(vtable_->GetNames(expected.dispid, names.data(), names.capacity(), &count)),
              hresultText(S_OK));
    std::vector<std::wstring> actual;
    for (UINT i = 0; i < count; ++i) {
        actual.push_back(names.at(i));
    }
    if (expected.kind == Kind::Put) {
        actual.resize(std::min<size_t>(actual.size(), 1));
    }
    EXPECT_EQ(actual, wanted);
}

TEST_P(MemberTest, CarriesItsHelpString)
{
    const Member& expected = GetParam().member();
    Bstr help;
    ASSERT_EQ(hresultText(vtable_->GetDocumentation(expected.dispid, nullptr, help.Put(), nullptr, nullptr)),
              hresultText(S_OK));
    if (expected.help == nullptr) {
        EXPECT_EQ(TextOf(help), std::nullopt);
    } else {
        EXPECT_EQ(TextOf(help), expected.help);
    }
}

// What a late-bound caller (IDispatch forwarded to this type info) works with: the member at the
// same position after the IDispatch slots, the retval parameter turned into the result.
TEST_P(MemberTest, AppearsInTheDispatchViewWithItsRetvalAsResult)
{
    const MemberRow& row = GetParam();
    const Member& expected = row.member();
    FuncDesc func;
    ASSERT_EQ(hresultText(dispatch_->GetFuncDesc(static_cast<UINT>(DispatchSlots + row.index),
                                                 func.put(dispatch_.Get()))),
              hresultText(S_OK));
    EXPECT_EQ(func->memid, expected.dispid);
    EXPECT_EQ(func->invkind, invokeKind(expected.kind));
    EXPECT_EQ(func->funckind, FUNC_DISPATCH);
    EXPECT_EQ(func->wFuncFlags, expected.flags);

    const Param* retval = retvalOf(expected);
    std::wstring result = L"void";
    if (retval != nullptr) {
        result = retval->type;
        result.pop_back();  // the result is what the retval pointer points to
    }
    EXPECT_EQ(typeText(dispatch_.Get(), func->elemdescFunc.tdesc), result);
    EXPECT_EQ(func->cParams, static_cast<SHORT>(expected.params.size() - (retval != nullptr ? 1 : 0)));
}

TEST_P(MemberTest, ResolvesByNameToItsDispidAndParameterPositions)
{
    const Member& expected = GetParam().member();
    std::vector<std::wstring> storage = {expected.name};
    std::vector<MEMBERID> wanted = {expected.dispid};
    if (expected.kind != Kind::Put) {
        MEMBERID position = 0;
        for (const Param& p : expected.params) {
            if ((p.flags & PARAMFLAG_FRETVAL) == 0) {
                storage.emplace_back(p.name);
                wanted.push_back(position++);
            }
        }
    }
    std::vector<LPOLESTR> names;
    for (std::wstring& s : storage) {
        names.push_back(s.data());
    }
    std::vector<MEMBERID> actual(names.size(), DISPID_UNKNOWN);
    ASSERT_EQ(hresultText(dispatch_->GetIDsOfNames(names.data(), static_cast<UINT>(names.size()), actual.data())),
              hresultText(S_OK));
    EXPECT_EQ(actual, wanted);
}

INSTANTIATE_TEST_SUITE_P(Members, MemberTest, testing::ValuesIn(memberRows()),
                         [](const testing::TestParamInfo<MemberRow>& info) { return memberRowName(info.param); });

// ---- identifiers that must stay free ----

// A client compiled against an older library may still send a retired DISPID; nothing may answer to it.
struct FreeDispid {
    const wchar_t* iid;
    const char* label;
    MEMBERID dispid;
    MEMBERID neighbour;        // an assigned DISPID, to show the lookup does find members
    UINT neighbourIndex;       // its position in the vtable view
};

void PrintTo(const FreeDispid& free, std::ostream* out) { *out << free.label; }

class FreeDispidTest : public TypeLibraryFixture, public testing::WithParamInterface<FreeDispid> {};

TEST_P(FreeDispidTest, IsNotAssignedToAnyMember)
{
    ComRef<ITypeInfo> info = infoOf(GetParam().iid);
    ASSERT_TRUE(info);
    ComRef<ITypeInfo> vtable = vtableViewOf(info.Get());
    ASSERT_TRUE(vtable);
    ComRef<ITypeInfo2> info2;
    ASSERT_EQ(hresultText(vtable->QueryInterface(__uuidof(ITypeInfo2), reinterpret_cast<void**>(info2.Put()))),
              hresultText(S_OK));
    UINT found = 12345;
    ASSERT_EQ(hresultText(info2->GetFuncIndexOfMemId(GetParam().neighbour, INVOKE_FUNC, &found)),
              hresultText(S_OK));
    EXPECT_EQ(found, GetParam().neighbourIndex);
    for (INVOKEKIND kind : {INVOKE_FUNC, INVOKE_PROPERTYGET, INVOKE_PROPERTYPUT, INVOKE_PROPERTYPUTREF}) {
        UINT index = 12345;
        EXPECT_EQ(hresultText(info2->GetFuncIndexOfMemId(GetParam().dispid, kind, &index)),
                  hresultText(TYPE_E_ELEMENTNOTFOUND))
            << "invoke kind " << kind << " found at index " << index;
    }
}

INSTANTIATE_TEST_SUITE_P(Dispids, FreeDispidTest,
                         testing::Values(FreeDispid{L"{5C2F91AC-3E44-4B7D-9A15-2D6E8B0C47F1}",
                                                    "IInstrSession_0x0F", 0x0F, 0x10, 17},
                                         FreeDispid{L"{7D4A10B0-2C88-4E21-B3F6-91E5A07D2C3B}",
                                                    "IInstrSessionMgr_0x01", 0x01, 0x02, 0}),
                         [](const testing::TestParamInfo<FreeDispid>& info) { return std::string(info.param.label); });

// =============================================================================================
// Classes

struct ClassContract {
    const wchar_t* name;
    const wchar_t* clsid;
    bool creatable;
    const wchar_t* defaultInterface;
    const wchar_t* help;
};

const std::vector<ClassContract>& coclassTable()
{
    static const std::vector<ClassContract> table = {
        {L"InstrSessionMgr", L"{7D4A10B1-2C88-4E21-B3F6-91E5A07D2C3B}", true, L"IInstrSessionMgr",
         L"InstrSessionMgr Class"},
        {L"IVIInstrSession", L"{5C2F91AD-3E44-4B7D-9A15-2D6E8B0C47F1}", false, L"IInstrSession",
         L"Do not create directly"},
        {L"VXIPNPInstrSession", L"{5C2F91AF-3E44-4B7D-9A15-2D6E8B0C47F1}", false, L"IInstrSession",
         L"Do not create directly"},
        {L"VisaInstrSession", L"{A61E03D4-58B2-4C9F-8E07-3B9D12F6A5C8}", false, L"IInstrSession",
         L"Do not create directly"},
        {L"CustomInstrSession", L"{F4075B3A-6E92-41D8-A3C6-5B2E09D7F184}", false, L"IInstrSession",
         L"Do not create directly"},
        {L"RQInstrSession", L"{0B6C8A45-D3F7-4E19-87A2-C4E51F906B3D}", false, L"IInstrSession",
         L"Do not create directly"},
        {L"VPPBase", L"{2E8D6F19-A7C3-4B05-9D4E-60F3B8A21C7E}", false, L"IVPPBase", L"Do not create directly"},
    };
    return table;
}

void PrintTo(const ClassContract& contract, std::ostream* out) { *out << asciiName(contract.name); }

class CoclassTest : public TypeLibraryFixture, public testing::WithParamInterface<ClassContract> {};

TEST_P(CoclassTest, HasItsClsidNameHelpAndCreatability)
{
    const ClassContract& contract = GetParam();
    ComRef<ITypeInfo> info = infoOf(contract.clsid);
    ASSERT_TRUE(info) << "no type with CLSID " << testing::PrintToString(std::wstring(contract.clsid));
    TypeAttr attr;
    ASSERT_EQ(hresultText(info->GetTypeAttr(attr.put(info.Get()))), hresultText(S_OK));
    EXPECT_EQ(attr->typekind, TKIND_COCLASS);
    EXPECT_EQ(typeName(info.Get()), contract.name);
    EXPECT_EQ(typeHelp(info.Get()), contract.help);
    // Only the manager may be created by clients; the rest come from the manager or a session.
    EXPECT_EQ(attr->wTypeFlags, contract.creatable ? TYPEFLAG_FCANCREATE : 0);
}

TEST_P(CoclassTest, ImplementsOnlyItsDefaultInterface)
{
    const ClassContract& contract = GetParam();
    ComRef<ITypeInfo> info = infoOf(contract.clsid);
    ASSERT_TRUE(info);
    TypeAttr attr;
    ASSERT_EQ(hresultText(info->GetTypeAttr(attr.put(info.Get()))), hresultText(S_OK));
    ASSERT_EQ(attr->cImplTypes, 1);
    INT flags = -1;
    ASSERT_EQ(hresultText(info->GetImplTypeFlags(0, &flags)), hresultText(S_OK));
    EXPECT_EQ(flags, IMPLTYPEFLAG_FDEFAULT);
    HREFTYPE ref = 0;
    ASSERT_EQ(hresultText(info->GetRefTypeOfImplType(0, &ref)), hresultText(S_OK));
    ComRef<ITypeInfo> implemented;
    ASSERT_EQ(hresultText(info->GetRefTypeInfo(ref, implemented.Put())), hresultText(S_OK));
    EXPECT_EQ(typeName(implemented.Get()), contract.defaultInterface);
}

INSTANTIATE_TEST_SUITE_P(Classes, CoclassTest, testing::ValuesIn(coclassTable()),
                         [](const testing::TestParamInfo<ClassContract>& info) { return asciiName(info.param.name); });

// =============================================================================================
// The generated header and GUID definitions that the server and C++ clients compile against must
// name the same identifiers as the library they ship with.

TEST(GeneratedHeader, GuidConstantsMatchTheLibrary)
{
    EXPECT_EQ(guidText(LIBID_SM), L"{5C2F91A0-3E44-4B7D-9A15-2D6E8B0C47F1}");
    EXPECT_EQ(guidText(IID_IInstrSession), interfaceTable()[0].iid);
    EXPECT_EQ(guidText(IID_IInstrSessionMgr), interfaceTable()[1].iid);
    EXPECT_EQ(guidText(IID_IVPPBase), interfaceTable()[2].iid);
    EXPECT_EQ(guidText(CLSID_InstrSessionMgr), coclassTable()[0].clsid);
    EXPECT_EQ(guidText(CLSID_IVIInstrSession), coclassTable()[1].clsid);
    EXPECT_EQ(guidText(CLSID_VXIPNPInstrSession), coclassTable()[2].clsid);
    EXPECT_EQ(guidText(CLSID_VisaInstrSession), coclassTable()[3].clsid);
    EXPECT_EQ(guidText(CLSID_CustomInstrSession), coclassTable()[4].clsid);
    EXPECT_EQ(guidText(CLSID_RQInstrSession), coclassTable()[5].clsid);
    EXPECT_EQ(guidText(CLSID_VPPBase), coclassTable()[6].clsid);
}

TEST(GeneratedHeader, UuidofMatchesTheLibrary)
{
    EXPECT_EQ(guidText(__uuidof(IInstrSession)), interfaceTable()[0].iid);
    EXPECT_EQ(guidText(__uuidof(IInstrSessionMgr)), interfaceTable()[1].iid);
    EXPECT_EQ(guidText(__uuidof(IVPPBase)), interfaceTable()[2].iid);
    EXPECT_EQ(guidText(__uuidof(InstrSessionMgr)), coclassTable()[0].clsid);
}

// In C++ an omitted options argument would be the literal L"", which is not a BSTR; the header
// therefore makes early-bound callers pass one (nullptr is the empty BSTR).
template <class Session>
concept InitializeCallableWithoutArguments = requires(Session* session) { session->Initialize(); };
static_assert(!InitializeCallableWithoutArguments<IInstrSession>,
              "SessionMgr.h must not give Initialize a string-literal default argument");
static_assert(requires(IInstrSession* session) { session->Initialize(nullptr); });

TEST(GeneratedHeader, EnumValuesMatchTheLibrary)
{
    EXPECT_EQ(DefaultInterface, 0);
    EXPECT_EQ(ClassDriver, 1);
    EXPECT_EQ(SpecificDriver, 2);
    EXPECT_EQ(IODriver, 3);
    EXPECT_EQ(ReturnLogicalNames, 1);
    EXPECT_EQ(ReturnVirtualInstruments, 2);
    EXPECT_EQ(ReturnHiddenNames, 4);
    EXPECT_EQ(IncludeCategoryPrefix, 8);
    EXPECT_EQ(ReturnRouteGroups, 16);
    EXPECT_EQ(ReturnRoutes, 32);
}

}  // namespace
