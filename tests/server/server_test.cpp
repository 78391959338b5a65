// Registration and unregistration leave the registry as Explorer and an uninstaller need it; texts fill in right.
#include <gtest/gtest.h>
#include <regex>
#include <span>
#include <string>
#include <vector>
#include "shell/shell_folder.h"
#include "base/class_ids.h"
#include "base/com_base.h"
#include "base/resource_ids.h"
#include "marlix_version.h"
#include "server/server_module.h"
#include "store/string_table.h"
#include "support/registry_sandbox.h"
namespace {
const HKEY kHKCR = HKEY_CLASSES_ROOT, kHKLM = HKEY_LOCAL_MACHINE;
const std::wstring kFolderKey = L"CLSID\\{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}";
const std::wstring kTypeLibKey = L"TypeLib\\{1C83F5C4-5B89-4449-87FF-E494222081A6}";
const std::vector<BYTE> kAttributes = {0x00, 0x00, 0x00, 0xA0};
// A map whose second entry names no script.
const ObjectMapEntry kBroken[] = {{&CLSID_MarlixDLShellFolder, IDR_REG_SHELLFOLDER, CreateMarlixDLShellFolder},
                                  {&CLSID_MarlixDLShellView, 999, CreateMarlixDLShellView},
                                  {&CLSID_MarlixDLEnumIDList, IDR_REG_ENUMIDLIST, CreateMarlixDLEnumIDList}};
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
TEST_F(ServerModule, FailedScriptLeavesAttributesUnwritten) {
  server_.Init(kBroken, GetModuleHandleW(nullptr));
  EXPECT_EQ(server_.RegisterServer(), HRESULT_FROM_WIN32(ERROR_RESOURCE_NAME_NOT_FOUND));
  EXPECT_TRUE(RegKeyExists(kHKCR, kFolderKey + L"\\ShellFolder")) << "entries before it ran";
  EXPECT_TRUE(ReadAttributes().empty());
  EXPECT_FALSE(RegKeyExists(kHKCR, L"MarlixDLShellExt.MarlixDLEnumIDList")) << "entries after it did not";
  EXPECT_FALSE(RegKeyExists(kHKCR, kTypeLibKey));
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
// A text with a placeholder gets from its caller exactly what the placeholder asks for.
TEST(StringTable, FormatTextsHoldThePlaceholdersTheirCallersFill) {
  const std::pair<UINT, std::vector<std::wstring>> rows[] = {
      {IDS_LEVEL_EXISTS, {L"%s"}},  // the sheet puts in the level's name
  };
  const std::wregex directive(L"%[-+ #0]*[0-9*]*(\\.[0-9*]+)?[a-zA-Z%]");
  for (const auto& [id, expected] : rows) {
    const std::wstring text = LoadTranslatedString(id);
    std::vector<std::wstring> found;
    for (std::wsregex_iterator i(text.begin(), text.end(), directive), end; i != end; ++i) found.push_back(i->str());
    EXPECT_EQ(found, expected) << id;
  }
}
}  // namespace
