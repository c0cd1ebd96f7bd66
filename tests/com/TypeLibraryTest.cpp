// The type library, the clients' contract, as data: a dump (one line per library, type, value, member,
// coclass) against tests/com/typelib.expected; a mismatch writes the actual dump (see docs/testing.md).
#include <gtest/gtest.h>
#include <windows.h>
#include <oleauto.h>

#include <cstdio>
#include <fstream>
#include <iterator>
#include <map>
#include <sstream>
#include <string>

#include "SessionMgr.h"
#include "com/BstrConversion.h"
#include "com/ComPtr.h"
#include "com/UniqueHandles.h"

using namespace sm;

namespace {
std::string Quoted(BSTR text) { return text ? "\"" + BstrToMultiByte(text) + "\"" : "null"; }

std::string GuidText(const GUID& guid) {
    wchar_t buffer[40] = {};
    return WideToMultiByte(buffer, ::StringFromGUID2(guid, buffer, 40) - 1);
}

std::string Hex(unsigned long value) {
    char buffer[16];
    std::snprintf(buffer, sizeof buffer, "0x%lX", value);
    return buffer;
}

std::string NameOf(ITypeInfo* info, MEMBERID member = MEMBERID_NIL, std::string* help = nullptr) {
    UniqueBstr name, helpText;
    info->GetDocumentation(member, name.Put(), helpText.Put(), nullptr, nullptr);
    if (help) *help = Quoted(helpText.Get());
    return BstrToMultiByte(name.Get());
}

std::string TypeText(ITypeInfo* context, const TYPEDESC& type) {
    switch (type.vt) {
        case VT_PTR: return TypeText(context, *type.lptdesc) + "*";
        case VT_SAFEARRAY: return "SAFEARRAY(" + TypeText(context, *type.lptdesc) + ")";
        case VT_USERDEFINED: {
            ComPtr<ITypeInfo> referenced;
            context->GetRefTypeInfo(type.hreftype, referenced.Put());
            return referenced ? NameOf(referenced.Get()) : "<unresolved>";
        }
        default: break;
    }
    static const std::map<VARTYPE, std::string> names{{VT_I2, "short"}, {VT_I4, "long"}, {VT_R8, "double"},
        {VT_BSTR, "BSTR"}, {VT_BOOL, "VARIANT_BOOL"}, {VT_VARIANT, "VARIANT"}, {VT_UNKNOWN, "IUnknown*"}, {VT_HRESULT, "HRESULT"}};
    auto known = names.find(type.vt);
    return known != names.end() ? known->second : "vt" + std::to_string(type.vt);
}

void DumpMembers(ITypeInfo* info, const TYPEATTR& attributes, std::ostream& out) {
    for (UINT index = 0; index < attributes.cVars; ++index) {
        VARDESC* variable = nullptr;
        info->GetVarDesc(index, &variable);
        out << "  value " << NameOf(info, variable->memid) << " = " << V_I4(variable->lpvarValue) << "\n";
        info->ReleaseVarDesc(variable);
    }
    for (UINT index = 0; index < attributes.cFuncs; ++index) {
        FUNCDESC* function = nullptr;
        info->GetFuncDesc(index, &function);
        std::string help, name = NameOf(info, function->memid, &help);
        BSTR names[16] = {};
        UINT count = 0;
        info->GetNames(function->memid, names, 16, &count);
        out << "  member " << name << " id=" << Hex(function->memid) << " kind=" << function->invkind
            << " slot=" << function->oVft / 8 << " flags=" << Hex(function->wFuncFlags) << " (";
        for (SHORT p = 0; p < function->cParams; ++p) {
            const ELEMDESC& parameter = function->lprgelemdescParam[p];
            // A property put shares its DISPID with the get, so its names are the getter's: left out.
            std::string paramName = function->invkind == INVOKE_PROPERTYPUT || UINT(p + 1) >= count
                                        ? std::string()
                                        : " " + BstrToMultiByte(names[p + 1]);
            out << (p ? ", " : "") << TypeText(info, parameter.tdesc) << paramName << " flags="
                << Hex(parameter.paramdesc.wParamFlags);
            if (parameter.paramdesc.wParamFlags & PARAMFLAG_FHASDEFAULT)
                out << " default=" << Quoted(parameter.paramdesc.pparamdescex->varDefaultValue.bstrVal);
        }
        out << ") -> " << TypeText(info, function->elemdescFunc.tdesc) << " help=" << help << "\n";
        for (BSTR text : names) ::SysFreeString(text);
        info->ReleaseFuncDesc(function);
    }
}

std::string Dump(ITypeLib* library) {
    std::ostringstream out;
    TLIBATTR* libraryAttributes = nullptr;
    library->GetLibAttr(&libraryAttributes);
    UniqueBstr name, help, helpFile;
    DWORD context = 0;
    library->GetDocumentation(-1, name.Put(), help.Put(), &context, helpFile.Put());
    out << "library " << BstrToMultiByte(name.Get()) << " " << GuidText(libraryAttributes->guid) << " "
        << libraryAttributes->wMajorVerNum << "." << libraryAttributes->wMinorVerNum << " lcid="
        << Hex(libraryAttributes->lcid) << " syskind=" << libraryAttributes->syskind << " help=" << Quoted(help.Get())
        << " helpfile=" << Quoted(helpFile.Get()) << " context=" << context << "\n";
    library->ReleaseTLibAttr(libraryAttributes);
    static const char* const kinds[] = {"enum", "record", "module", "interface", "dispatch", "coclass", "alias", "union"};
    for (UINT index = 0; index < library->GetTypeInfoCount(); ++index) {
        ComPtr<ITypeInfo> info;
        library->GetTypeInfo(index, info.Put());
        TYPEATTR* attributes = nullptr;
        info->GetTypeAttr(&attributes);
        std::string typeHelp, typeName = NameOf(info.Get(), MEMBERID_NIL, &typeHelp);
        out << kinds[attributes->typekind] << " " << typeName << " " << GuidText(attributes->guid)
            << " flags=" << Hex(attributes->wTypeFlags) << " help=" << typeHelp << "\n";
        for (UINT implemented = 0; implemented < attributes->cImplTypes; ++implemented) {
            HREFTYPE reference = 0;
            ComPtr<ITypeInfo> base;
            INT flags = 0;
            info->GetRefTypeOfImplType(implemented, &reference);
            info->GetRefTypeInfo(reference, base.Put());
            info->GetImplTypeFlags(implemented, &flags);
            out << "  implements " << NameOf(base.Get()) << " flags=" << Hex(flags) << "\n";
        }
        ComPtr<ITypeInfo> vtableView;
        HREFTYPE dual = 0;
        if (attributes->typekind == TKIND_DISPATCH && SUCCEEDED(info->GetRefTypeOfImplType(UINT(-1), &dual)) &&
            SUCCEEDED(info->GetRefTypeInfo(dual, vtableView.Put()))) {
            // A dual interface: its members as the vtable declares them; the dispatch view derives from it.
            TYPEATTR* vtable = nullptr;
            vtableView->GetTypeAttr(&vtable);
            out << "  vtable flags=" << Hex(vtable->wTypeFlags) << " slots=" << vtable->cbSizeVft / 8 << "\n";
            DumpMembers(vtableView.Get(), *vtable, out);
            vtableView->ReleaseTypeAttr(vtable);
        } else {
            DumpMembers(info.Get(), *attributes, out);
        }
        info->ReleaseTypeAttr(attributes);
    }
    return out.str();
}

class TypeLibrary : public ::testing::Test {
protected:
    void SetUp() override {
        UniqueBstr path(AllocSysString(SESSIONMGR_TLB_PATH));
        ASSERT_EQ(::LoadTypeLibEx(path.Get(), REGKIND_NONE, library.Put()), S_OK);
    }
    ComPtr<ITypeLib> library;
};
}  // namespace

TEST_F(TypeLibrary, MatchesTheExpectedDump) {
    std::ifstream expectedFile(SESSIONMGR_TLB_EXPECTED, std::ios::binary);
    std::string expected{std::istreambuf_iterator<char>(expectedFile), {}}, actual = Dump(library.Get());
    if (actual != expected) std::ofstream(SESSIONMGR_TLB_ACTUAL, std::ios::binary) << actual;
    EXPECT_EQ(actual, expected) << "the dump differs from " << SESSIONMGR_TLB_EXPECTED << " (actual in "
                                << SESSIONMGR_TLB_ACTUAL << ")";
}

// A client built against an older library may still send a retired DISPID: nothing may answer to it.
TEST_F(TypeLibrary, RetiredDispidsStayFree) {
    for (auto [interfaceId, retired] : {std::pair{IID_IInstrSession, 0x0F}, std::pair{IID_IInstrSessionMgr, 0x01}}) {
        ComPtr<ITypeInfo> info;
        ASSERT_EQ(library->GetTypeInfoOfGuid(interfaceId, info.Put()), S_OK);
        ComPtr<ITypeInfo2> info2 = info.As<ITypeInfo2>();
        ASSERT_TRUE(info2);
        UINT index = 0;
        for (INVOKEKIND kind : {INVOKE_FUNC, INVOKE_PROPERTYGET, INVOKE_PROPERTYPUT, INVOKE_PROPERTYPUTREF})
            EXPECT_EQ(info2->GetFuncIndexOfMemId(retired, kind, &index), TYPE_E_ELEMENTNOTFOUND) << retired;
    }
}

// The C++ header must not give Initialize a default: there it would be the literal L"", not a BSTR.
template <class Session>
concept InitializeCallableWithoutArguments = requires(Session* session) { session->Initialize(); };
static_assert(!InitializeCallableWithoutArguments<IInstrSession>);
