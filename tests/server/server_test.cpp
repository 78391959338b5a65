#include <gtest/gtest.h>
#include <shlobj.h>
#include <span>
#include <string>
#include <utility>
#include <vector>
#include "server/class_creators.h"
#include "server/class_ids.h"
#include "server/com_base.h"
#include "server/registrar.h"
#include "marlix_version.h"
#include "base/resource_ids.h"
#include "server/server_module.h"
#include "support/registry_sandbox.h"

namespace {
const HKEY kHKCR = HKEY_CLASSES_ROOT, kHKLM = HKEY_LOCAL_MACHINE;
const wchar_t kModule[] = L"C:\\Some Dir\\Module.dll";
struct Class { const CLSID* clsid; const wchar_t* name; const wchar_t* guid; };
const Class kClasses[] = {  // the folder, the seven classes with a ProgID, then one in the type library only
    {&CLSID_MarlixDLShellFolder, L"MarlixDLShellFolder", L"{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}"},
    {&CLSID_MarlixDLShellView, L"MarlixDLShellView", L"{05F7AA87-193C-4ece-A11E-0F4C7703DB23}"},
    {&CLSID_MarlixDLEnumIDList, L"MarlixDLEnumIDList", L"{5ED99E16-9878-487c-9BCB-552856BC0652}"},
    {&CLSID_MarlixDLExtractIcon, L"MarlixDLExtractIcon", L"{0EC55AFE-FDF3-46f6-B30C-C458D72996BA}"},
    {&CLSID_MarlixDLDataObject, L"MarlixDLDataObject", L"{FC3CF6F6-0DB9-4643-A589-89426A31A562}"},
    {&CLSID_MarlixDLQueryInfo, L"MarlixDLQueryInfo", L"{5CEEEFDE-A499-429f-8384-734431E11F44}"},
    {&CLSID_MarlixDLDropTarget, L"MarlixDLDropTarget", L"{E1AFE45B-6E62-433e-90D3-B299CCB76BC1}"},
    {&CLSID_MarlixDLDropTargetOnListView, L"MarlixDLDropTargetOnListView", L"{3555C78D-F255-4f16-B260-7B365BF32995}"},
    {&CLSID_MarlixDLContextMenu, L"MarlixDLContextMenu", nullptr},
};
const std::span<const Class> kProgIdClasses(kClasses + 1, 7);
const std::wstring kFolderGuid = kClasses[0].guid, kFolderKey = L"CLSID\\" + kFolderGuid;
const std::wstring kLibId = L"{1C83F5C4-5B89-4449-87FF-E494222081A6}", kTypeLibKey = L"TypeLib\\" + kLibId;
const std::wstring kApproved = L"Software\\Microsoft\\Windows\\CurrentVersion\\Shell Extensions\\Approved";
const std::wstring kNameSpace = L"Software\\Microsoft\\Windows\\CurrentVersion\\Explorer\\MyComputer\\NameSpace";
const std::wstring kLevel = L"Software\\Gravon\\Shell Extensions\\Marlix DL View\\Levels\\Station 0";
const std::vector<BYTE> kAttributes = {0x00, 0x00, 0x00, 0xA0};

TEST(Registrar, ScriptsWriteAndTakeBackAndSyntaxErrorsChangeNothing) {
  RegistrySandbox sandbox({kHKCR, kHKLM});
  RegWriteString(kHKLM, L"Shared", L"Other", L"kept");
  RegWriteString(kHKCR, L"Owned\\Stale", nullptr, L"old");
  const wchar_t script[] =
      L"; a comment\r\nreplace HKCR\\Owned\r\n@ = Owned Class\r\nkey HKCR\\Owned\\Server\r\n"
      L"  @ =  %MODULE%,0  \r\nThreading Model = Apartment\r\n\r\nopen HKLM\\Shared\n{GUID} = Approved Name\n";
  ASSERT_EQ(RunRegistryScript(script, kModule, true), S_OK);
  EXPECT_EQ(RegReadString(kHKCR, L"Owned", nullptr), L"Owned Class");
  EXPECT_FALSE(RegKeyExists(kHKCR, L"Owned\\Stale")) << "replace drops the old tree";
  EXPECT_EQ(RegReadString(kHKCR, L"Owned\\Server", nullptr), L"C:\\Some Dir\\Module.dll,0");
  EXPECT_EQ(RegReadString(kHKCR, L"Owned\\Server", L"Threading Model"), L"Apartment");
  EXPECT_EQ(RegReadString(kHKLM, L"Shared", L"{GUID}"), L"Approved Name");
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, sandbox.ScratchPath(kHKCR) + L"\\Owned\\Server"))
      << "the classes root is redirected";
  ASSERT_EQ(RunRegistryScript(script, kModule, false), S_OK);
  EXPECT_FALSE(RegKeyExists(kHKCR, L"Owned"));
  EXPECT_TRUE(RegKeyExists(kHKLM, L"Shared")) << "an opened key is not the script's";
  EXPECT_EQ(RegReadString(kHKLM, L"Shared", L"{GUID}"), L"<missing>");
  EXPECT_EQ(RegReadString(kHKLM, L"Shared", L"Other"), L"kept");
  EXPECT_EQ(RunRegistryScript(script, kModule, false), S_OK) << "taking back what is already gone is no failure";
  for (const wchar_t* bad : {L"key HKCR\\A\n@ = x\nvalue without equals\n", L"@ = a value before any key\n",
                             L"key HKXX\\A\n", L"key HKCR\\A\nkey HKCR\n", L"remove HKCR\\A\n",
                             L"key HKCR\\A\n = nameless\n", L"key\n"}) {
    EXPECT_EQ(RunRegistryScript(bad, kModule, true), kScriptSyntaxError) << testing::PrintToString(bad);
    EXPECT_FALSE(RegKeyExists(kHKCR, L"A"));
  }
  EXPECT_EQ(RunRegistryScript(L"", kModule, true), S_OK);
  HMODULE self = GetModuleHandleW(nullptr);
  EXPECT_EQ(RunRegistryResource(self, 999, true), HRESULT_FROM_WIN32(ERROR_RESOURCE_NAME_NOT_FOUND));
  std::wstring path = ModuleFilePath(self);
  EXPECT_TRUE(path.size() > 4 && path.ends_with(L".exe")) << testing::PrintToString(path);
}

std::vector<BYTE> ReadAttributes() {  // empty unless a binary value
  BYTE data[16] = {};
  DWORD type = 0, size = sizeof(data);
  LONG rc = RegGetValueW(kHKCR, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes", RRF_RT_ANY, &type, data, &size);
  return rc == ERROR_SUCCESS && type == REG_BINARY ? std::vector<BYTE>(data, data + size) : std::vector<BYTE>();
}

struct ServerModule : testing::Test {
  void SetUp() override {
    server_.SetTypeLibId(LIBID_MarlixDLShellExtLib);
    server_.Init(ModuleObjectMap(), GetModuleHandleW(nullptr));
  }
  RegistrySandbox sandbox_{{kHKCR, kHKLM, HKEY_CURRENT_USER}};
  CServerModule server_;
  std::wstring module_ = ModuleFilePath(GetModuleHandleW(nullptr));
};

TEST_F(ServerModule, RegistrationWritesTheTablesAndReplacesThemWhenRepeated) {
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  struct { HKEY root; std::wstring key; const wchar_t* value; std::wstring expected; } folder[] = {
      {kHKCR, kFolderKey, nullptr, L"Marlix Digital Levels"},
      {kHKCR, kFolderKey, L"InfoTip", L"Allows you to read files from Marlix Digital Levels"},
      {kHKCR, kFolderKey + L"\\DefaultIcon", nullptr, module_ + L",0"},
      {kHKCR, kFolderKey + L"\\InprocServer32", nullptr, module_},
      {kHKCR, kFolderKey + L"\\InprocServer32", L"ThreadingModel", L"Apartment"},
      {kHKCR, kFolderKey + L"\\TypeLib", nullptr, kLibId},
      {kHKLM, kApproved, kFolderGuid.c_str(), L"Marlix Digital Levels"},
      {kHKLM, kNameSpace + L"\\" + kFolderGuid, nullptr, L"Marlix Digital Levels"},
  };
  for (const auto& v : folder) EXPECT_EQ(RegReadString(v.root, v.key, v.value), v.expected) << v.key;
  EXPECT_EQ(ReadAttributes(), kAttributes);
  EXPECT_FALSE(RegKeyExists(kHKCR, L"MarlixDLShellExt.MarlixDLShellFolder"));
  EXPECT_TRUE(RegKeyExists(kHKCR, kTypeLibKey + L"\\" MARLIX_TYPELIB_VERSION_WIDE));
  for (const auto& c : kProgIdClasses) {
    std::wstring name = c.name, progId = L"MarlixDLShellExt." + name, key = L"CLSID\\" + std::wstring(c.guid);
    std::pair<std::wstring, std::wstring> values[] = {
        {progId + L".1", name + L" Class"},       {progId + L".1\\CLSID", c.guid},
        {progId, name + L" Class"},               {progId + L"\\CLSID", c.guid},
        {progId + L"\\CurVer", progId + L".1"}, {key, name + L" Class"},
        {key + L"\\ProgID", progId + L".1"},    {key + L"\\VersionIndependentProgID", progId},
        {key + L"\\InprocServer32", module_},   {key + L"\\TypeLib", kLibId},
    };
    for (const auto& [path, expected] : values) EXPECT_EQ(RegReadString(kHKCR, path, nullptr), expected) << path;
    EXPECT_EQ(RegReadString(kHKCR, key + L"\\InprocServer32", L"ThreadingModel"), L"Apartment");
  }
  RegWriteString(kHKCR, kFolderKey + L"\\Leftover", nullptr, L"stale");
  RegWriteString(kHKCR, kFolderKey, L"Stray", L"stale");
  RegDeleteKeyValueW(kHKCR, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes");
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  EXPECT_FALSE(RegKeyExists(kHKCR, kFolderKey + L"\\Leftover")) << "registering again replaces the class keys";
  EXPECT_EQ(RegReadString(kHKCR, kFolderKey, L"Stray"), L"<missing>");
  EXPECT_EQ(ReadAttributes(), kAttributes);
  EXPECT_EQ(RegReadString(kHKCR, kFolderKey, nullptr), L"Marlix Digital Levels");
}

TEST_F(ServerModule, UnregisteringKeepsParentsAndLevels) {
  RegWriteString(HKEY_CURRENT_USER, kLevel, L"Name", L"Station 0");
  RegWriteString(kHKLM, kApproved, L"{SomeoneElse}", L"Other");
  EXPECT_EQ(server_.UnregisterServer(), S_OK) << "nothing registered yet";
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  std::vector<std::wstring> gone = {kFolderKey, kTypeLibKey + L"\\" MARLIX_TYPELIB_VERSION_WIDE};
  for (const auto& c : kProgIdClasses) {
    std::wstring progId = L"MarlixDLShellExt." + std::wstring(c.name);
    gone.insert(gone.end(), {progId, progId + L".1", L"CLSID\\" + std::wstring(c.guid)});
  }
  for (const std::wstring& key : gone) EXPECT_FALSE(RegKeyExists(kHKCR, key)) << key;
  EXPECT_FALSE(RegKeyExists(kHKLM, kNameSpace + L"\\" + kFolderGuid));
  EXPECT_EQ(RegReadString(kHKLM, kApproved, kFolderGuid.c_str()), L"<missing>");
  EXPECT_EQ(RegReadString(kHKLM, kApproved, L"{SomeoneElse}"), L"Other");
  EXPECT_TRUE(RegKeyExists(kHKCR, L"CLSID") && RegKeyExists(kHKLM, kNameSpace)) << "parents stay";
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, kLevel, L"Name"), L"Station 0");
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, kLevel, L"Name"), L"Station 0");
}

TEST_F(ServerModule, FailedScriptLeavesAttributesUnwrittenAndNothingIsServedAfterTerm) {
  const ObjectMapEntry broken[] = {{&CLSID_MarlixDLShellFolder, IDR_REG_SHELLFOLDER, CreateMarlixDLShellFolder},
                                   {&CLSID_MarlixDLShellView, 999, CreateMarlixDLShellView},
                                   {&CLSID_MarlixDLEnumIDList, IDR_REG_ENUMIDLIST, CreateMarlixDLEnumIDList}};
  server_.Init(broken, GetModuleHandleW(nullptr));
  EXPECT_EQ(server_.RegisterServer(), HRESULT_FROM_WIN32(ERROR_RESOURCE_NAME_NOT_FOUND));
  EXPECT_TRUE(RegKeyExists(kHKCR, kFolderKey + L"\\ShellFolder")) << "entries before it ran";
  EXPECT_TRUE(ReadAttributes().empty());
  EXPECT_FALSE(RegKeyExists(kHKCR, L"MarlixDLShellExt.MarlixDLEnumIDList")) << "entries after it did not";
  EXPECT_FALSE(RegKeyExists(kHKCR, kTypeLibKey));
  RegSetKeyValueW(kHKCR, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes", REG_BINARY, kAttributes.data(), 4);
  EXPECT_EQ(server_.UnregisterServer(), S_OK) << "unregistering stops at the same entry and still answers S_OK";
  EXPECT_FALSE(RegKeyExists(kHKCR, kFolderKey));
  server_.Term();
  void* ppv = reinterpret_cast<void*>(1);
  EXPECT_EQ(server_.GetClassObject(CLSID_MarlixDLShellFolder, IID_IClassFactory, &ppv), CLASS_E_CLASSNOTAVAILABLE);
  EXPECT_EQ(ppv, nullptr);
  EXPECT_EQ(server_.RegisterServer(), E_UNEXPECTED);
  EXPECT_FALSE(RegKeyExists(kHKCR, kFolderKey));
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
}

TEST(ObjectMap, EightEntriesInTheirOrderWithTheirScripts) {
  const std::pair<const CLSID*, UINT> expected[] = {
      {&CLSID_MarlixDLShellFolder, 6},
      {&CLSID_MarlixDLShellView, 7},
      {&CLSID_MarlixDLEnumIDList, 3},
      {&CLSID_MarlixDLExtractIcon, 4},
      {&CLSID_MarlixDLDataObject, 2},
      {&CLSID_MarlixDLQueryInfo, 5},
      {&CLSID_MarlixDLDropTarget, 8},
      {&CLSID_MarlixDLDropTargetOnListView, 9},
  };
  const auto map = ModuleObjectMap();
  ASSERT_EQ(map.size(), std::size(expected));
  for (size_t i = 0; i < map.size(); ++i) {
    EXPECT_TRUE(IsEqualCLSID(*map[i].clsid, *expected[i].first)) << "entry " << i;
    EXPECT_EQ(map[i].script, expected[i].second) << "entry " << i;
  }
}

// A failed entry ends the unregistration of entries and of the type library.
TEST_F(ServerModule, UnregisteringStopsAtAFailedEntry) {
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  const ObjectMapEntry broken[] = {{&CLSID_MarlixDLShellFolder, IDR_REG_SHELLFOLDER, CreateMarlixDLShellFolder},
                                   {&CLSID_MarlixDLShellView, 999, CreateMarlixDLShellView},
                                   {&CLSID_MarlixDLEnumIDList, IDR_REG_ENUMIDLIST, CreateMarlixDLEnumIDList}};
  server_.Init(broken, GetModuleHandleW(nullptr));
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  EXPECT_FALSE(RegKeyExists(kHKCR, kFolderKey));
  EXPECT_TRUE(RegKeyExists(kHKCR, L"MarlixDLShellExt.MarlixDLEnumIDList"));
  EXPECT_TRUE(RegKeyExists(kHKCR, kTypeLibKey + L"\\" MARLIX_TYPELIB_VERSION_WIDE));
}

// Whatever failed before, "Attributes" is removed.
TEST_F(ServerModule, UnregisteringRemovesAttributesAfterAFailure) {
  const ObjectMapEntry broken[] = {{&CLSID_MarlixDLShellView, 999, CreateMarlixDLShellView},
                                   {&CLSID_MarlixDLShellFolder, IDR_REG_SHELLFOLDER, CreateMarlixDLShellFolder}};
  server_.Init(broken, GetModuleHandleW(nullptr));
  RegSetKeyValueW(kHKCR, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes", REG_BINARY, kAttributes.data(), 4);
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  EXPECT_TRUE(RegKeyExists(kHKCR, kFolderKey + L"\\ShellFolder"));
  EXPECT_TRUE(ReadAttributes().empty());
}

template <class T>  // the name and help text of a type library (index -1) or of one of its entries
std::pair<std::wstring, std::wstring> Documentation(T* owner, int index) {
  BSTR name = nullptr, help = nullptr;
  owner->GetDocumentation(index, &name, &help, nullptr, nullptr);
  std::pair<std::wstring, std::wstring> doc(name ? name : L"", help ? help : L"");
  SysFreeString(name);
  SysFreeString(help);
  return doc;
}

TEST(TypeLibrary, EmbeddedLibraryListsTheClassesAndTheViewInterface) {
  com::ComPtr<ITypeLib> lib;
  ASSERT_EQ(LoadTypeLibEx(ModuleFilePath(GetModuleHandleW(nullptr)).c_str(), REGKIND_NONE, lib.Put()), S_OK);
  TLIBATTR* attr = nullptr;
  ASSERT_EQ(lib->GetLibAttr(&attr), S_OK);
  EXPECT_TRUE(IsEqualGUID(attr->guid, LIBID_MarlixDLShellExtLib));
  EXPECT_EQ(std::make_tuple(attr->wMajorVerNum, attr->wMinorVerNum, attr->syskind),
            std::make_tuple(MARLIX_VERSION_MAJOR, MARLIX_VERSION_MINOR, SYS_WIN64));
  lib->ReleaseTLibAttr(attr);
  EXPECT_EQ(Documentation(lib.Get(), -1),
            std::make_pair(std::wstring(L"MarlixDLShellExtLib"), std::wstring(L"MarlixDLShellExt 1.0 Type Library")));
  for (const auto& c : kClasses) {
    SCOPED_TRACE(testing::PrintToString(c.name));
    com::ComPtr<ITypeInfo> info;
    ASSERT_EQ(lib->GetTypeInfoOfGuid(*c.clsid, info.Put()), S_OK);
    TYPEATTR* type = nullptr;
    ASSERT_EQ(info->GetTypeAttr(&type), S_OK);
    EXPECT_EQ(type->typekind, TKIND_COCLASS);
    info->ReleaseTypeAttr(type);
    EXPECT_EQ(Documentation(info.Get(), MEMBERID_NIL).second, std::wstring(c.name) + L" Class");
  }
  com::ComPtr<ITypeInfo> view;
  ASSERT_EQ(lib->GetTypeInfoOfGuid(IID_IMarlixDigitalLevelsShellView, view.Put()), S_OK);
  TYPEATTR* type = nullptr;
  ASSERT_EQ(view->GetTypeAttr(&type), S_OK);
  EXPECT_EQ(type->typekind, TKIND_INTERFACE);
  EXPECT_EQ(type->cFuncs, 0) << "nothing beyond IUnknown";
  view->ReleaseTypeAttr(type);
  EXPECT_TRUE(IsEqualIID(__uuidof(IMarlixDigitalLevelsShellView), IID_IMarlixDigitalLevelsShellView));
}
}  // namespace
