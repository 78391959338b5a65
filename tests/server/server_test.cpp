#include <gtest/gtest.h>
#include <span>
#include <string>
#include <vector>
#include "server/class_creators.h"
#include "server/class_ids.h"
#include "server/com_base.h"
#include "server/registrar.h"
#include "base/resource_ids.h"
#include "marlix_version.h"
#include "server/server_module.h"
#include "support/registry_sandbox.h"
namespace {
const HKEY kHKCR = HKEY_CLASSES_ROOT, kHKLM = HKEY_LOCAL_MACHINE;
const wchar_t kModule[] = L"C:\\Some Dir\\Module.dll";
const std::wstring kFolderKey = L"CLSID\\{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}";
const std::wstring kTypeLibKey = L"TypeLib\\{1C83F5C4-5B89-4449-87FF-E494222081A6}";
const std::vector<BYTE> kAttributes = {0x00, 0x00, 0x00, 0xA0};
// A map whose second entry names no script.
const ObjectMapEntry kBroken[] = {{&CLSID_MarlixDLShellFolder, IDR_REG_SHELLFOLDER, CreateMarlixDLShellFolder},
                                  {&CLSID_MarlixDLShellView, 999, CreateMarlixDLShellView},
                                  {&CLSID_MarlixDLEnumIDList, IDR_REG_ENUMIDLIST, CreateMarlixDLEnumIDList}};
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
};
TEST_F(ServerModule, FailedScriptLeavesAttributesUnwrittenAndNothingIsServedAfterTerm) {
  server_.Init(kBroken, GetModuleHandleW(nullptr));
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
  server_.Init(kBroken, GetModuleHandleW(nullptr));
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  EXPECT_FALSE(RegKeyExists(kHKCR, kFolderKey));
  EXPECT_TRUE(RegKeyExists(kHKCR, L"MarlixDLShellExt.MarlixDLEnumIDList"));
  EXPECT_TRUE(RegKeyExists(kHKCR, kTypeLibKey + L"\\" MARLIX_TYPELIB_VERSION_WIDE));
}
// Whatever failed before, "Attributes" is removed.
TEST_F(ServerModule, UnregisteringRemovesAttributesAfterAFailure) {
  server_.Init(std::span(kBroken + 1, 1), GetModuleHandleW(nullptr));
  RegSetKeyValueW(kHKCR, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes", REG_BINARY, kAttributes.data(), 4);
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  EXPECT_TRUE(RegKeyExists(kHKCR, kFolderKey + L"\\ShellFolder"));
  EXPECT_TRUE(ReadAttributes().empty());
}
}  // namespace
