#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

#include "server/class_creators.h"
#include "server/class_ids.h"
#include "server/registrar.h"
#include "server/resource_ids.h"
#include "server/server_module.h"
#include "support/registry_sandbox.h"

namespace {

const std::wstring kFolderKey = L"CLSID\\{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}";
const std::wstring kFolderGuid = L"{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}";
const std::wstring kApproved = L"Software\\Microsoft\\Windows\\CurrentVersion\\Shell Extensions\\Approved";
const std::wstring kNameSpace = L"Software\\Microsoft\\Windows\\CurrentVersion\\Explorer\\MyComputer\\NameSpace";
const std::wstring kTypeLibKey = L"TypeLib\\{1C83F5C4-5B89-4449-87FF-E494222081A6}";
const std::wstring kLevel = L"Software\\Gravon\\Shell Extensions\\Marlix DL View\\Levels\\Station 0";

struct ProgIdClass {
  const wchar_t* name;
  const wchar_t* clsid;
};
const ProgIdClass kProgIdClasses[] = {
    {L"MarlixDLShellView", L"{05F7AA87-193C-4ece-A11E-0F4C7703DB23}"},
    {L"MarlixDLEnumIDList", L"{5ED99E16-9878-487c-9BCB-552856BC0652}"},
    {L"MarlixDLExtractIcon", L"{0EC55AFE-FDF3-46f6-B30C-C458D72996BA}"},
    {L"MarlixDLDataObject", L"{FC3CF6F6-0DB9-4643-A589-89426A31A562}"},
    {L"MarlixDLQueryInfo", L"{5CEEEFDE-A499-429f-8384-734431E11F44}"},
    {L"MarlixDLDropTarget", L"{E1AFE45B-6E62-433e-90D3-B299CCB76BC1}"},
    {L"MarlixDLDropTargetOnListView", L"{3555C78D-F255-4f16-B260-7B365BF32995}"},
};

std::vector<BYTE> ReadAttributes() {
  BYTE data[16] = {};
  DWORD type = 0, size = sizeof(data);
  if (RegGetValueW(HKEY_CLASSES_ROOT, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes", RRF_RT_ANY, &type,
                   data, &size) != ERROR_SUCCESS || type != REG_BINARY)
    return {};
  return std::vector<BYTE>(data, data + size);
}
const std::vector<BYTE> kAttributes = {0x00, 0x00, 0x00, 0xA0};

class ServerModule : public testing::Test {
 protected:
  RegistrySandbox sandbox_{{HKEY_CLASSES_ROOT, HKEY_LOCAL_MACHINE, HKEY_CURRENT_USER}};
  CServerModule server_;
  std::wstring module_ = ModuleFilePath(GetModuleHandleW(nullptr));

  void SetUp() override {
    server_.SetTypeLibId(LIBID_MarlixDLShellExtLib);
    server_.Init(ModuleObjectMap(), GetModuleHandleW(nullptr));
  }
};

TEST_F(ServerModule, RegistrationWritesTheTables) {
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  const std::wstring libid = L"{1C83F5C4-5B89-4449-87FF-E494222081A6}";
  struct { HKEY root; std::wstring key; const wchar_t* value; std::wstring expected; } folder[] = {
      {HKEY_CLASSES_ROOT, kFolderKey, nullptr, L"Marlix Digital Levels"},
      {HKEY_CLASSES_ROOT, kFolderKey, L"InfoTip", L"Allows you to read files from Marlix Digital Levels"},
      {HKEY_CLASSES_ROOT, kFolderKey + L"\\DefaultIcon", nullptr, module_ + L",0"},
      {HKEY_CLASSES_ROOT, kFolderKey + L"\\InprocServer32", nullptr, module_},
      {HKEY_CLASSES_ROOT, kFolderKey + L"\\InprocServer32", L"ThreadingModel", L"Apartment"},
      {HKEY_CLASSES_ROOT, kFolderKey + L"\\TypeLib", nullptr, libid},
      {HKEY_LOCAL_MACHINE, kApproved, kFolderGuid.c_str(), L"Marlix Digital Levels"},
      {HKEY_LOCAL_MACHINE, kNameSpace + L"\\" + kFolderGuid, nullptr, L"Marlix Digital Levels"},
  };
  for (const auto& v : folder) EXPECT_EQ(RegReadString(v.root, v.key, v.value), v.expected) << v.key.c_str();
  EXPECT_EQ(ReadAttributes(), kAttributes);
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, L"MarlixDLShellExt.MarlixDLShellFolder"));
  EXPECT_TRUE(RegKeyExists(HKEY_CLASSES_ROOT, kTypeLibKey + L"\\1.0"));

  for (const auto& c : kProgIdClasses) {
    std::wstring name = c.name, progId = L"MarlixDLShellExt." + name, key = L"CLSID\\" + std::wstring(c.clsid);
    std::pair<std::wstring, std::wstring> values[] = {
        {progId + L".1", name + L" Class"},       {progId + L".1\\CLSID", c.clsid},
        {progId, name + L" Class"},               {progId + L"\\CLSID", c.clsid},
        {progId + L"\\CurVer", progId + L".1"}, {key, name + L" Class"},
        {key + L"\\ProgID", progId + L".1"},    {key + L"\\VersionIndependentProgID", progId},
        {key + L"\\InprocServer32", module_},   {key + L"\\TypeLib", libid},
    };
    for (const auto& [path, expected] : values) EXPECT_EQ(RegReadString(HKEY_CLASSES_ROOT, path, nullptr), expected);
    EXPECT_EQ(RegReadString(HKEY_CLASSES_ROOT, key + L"\\InprocServer32", L"ThreadingModel"), L"Apartment");
  }
}

TEST_F(ServerModule, RegisteringAgainReplacesTheClassKeys) {
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  RegWriteString(HKEY_CLASSES_ROOT, kFolderKey + L"\\Leftover", nullptr, L"stale");
  RegWriteString(HKEY_CLASSES_ROOT, kFolderKey, L"Stray", L"stale");
  RegDeleteKeyValueW(HKEY_CLASSES_ROOT, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes");

  ASSERT_EQ(server_.RegisterServer(), S_OK);
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, kFolderKey + L"\\Leftover"));
  EXPECT_EQ(RegReadString(HKEY_CLASSES_ROOT, kFolderKey, L"Stray"), L"<missing>");
  EXPECT_EQ(ReadAttributes(), kAttributes);
  EXPECT_EQ(RegReadString(HKEY_CLASSES_ROOT, kFolderKey, nullptr), L"Marlix Digital Levels");
}

TEST_F(ServerModule, UnregisteringKeepsParentsAndLevels) {
  RegWriteString(HKEY_CURRENT_USER, kLevel, L"Name", L"Station 0");
  RegWriteString(HKEY_LOCAL_MACHINE, kApproved, L"{SomeoneElse}", L"Other");
  EXPECT_EQ(server_.UnregisterServer(), S_OK) << "nothing registered yet";

  ASSERT_EQ(server_.RegisterServer(), S_OK);
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, kFolderKey));
  for (const auto& c : kProgIdClasses) {
    std::wstring progId = L"MarlixDLShellExt." + std::wstring(c.name);
    EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, progId));
    EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, progId + L".1"));
    EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, L"CLSID\\" + std::wstring(c.clsid)));
  }
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, kTypeLibKey + L"\\1.0"));
  EXPECT_FALSE(RegKeyExists(HKEY_LOCAL_MACHINE, kNameSpace + L"\\" + kFolderGuid));
  EXPECT_EQ(RegReadString(HKEY_LOCAL_MACHINE, kApproved, kFolderGuid.c_str()), L"<missing>");
  EXPECT_EQ(RegReadString(HKEY_LOCAL_MACHINE, kApproved, L"{SomeoneElse}"), L"Other");
  EXPECT_TRUE(RegKeyExists(HKEY_CLASSES_ROOT, L"CLSID"));
  EXPECT_TRUE(RegKeyExists(HKEY_LOCAL_MACHINE, kNameSpace));
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, kLevel, L"Name"), L"Station 0");

  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  ASSERT_EQ(server_.RegisterServer(), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, kLevel, L"Name"), L"Station 0");
}

TEST_F(ServerModule, FailedScriptLeavesAttributesUnwritten) {
  const ObjectMapEntry broken[] = {
      {&CLSID_MarlixDLShellFolder, IDR_REG_SHELLFOLDER, CreateMarlixDLShellFolder},
      {&CLSID_MarlixDLShellView, 999, CreateMarlixDLShellView},
      {&CLSID_MarlixDLEnumIDList, IDR_REG_ENUMIDLIST, CreateMarlixDLEnumIDList},
  };
  server_.Init(broken, GetModuleHandleW(nullptr));
  EXPECT_EQ(server_.RegisterServer(), HRESULT_FROM_WIN32(ERROR_RESOURCE_NAME_NOT_FOUND));
  EXPECT_TRUE(RegKeyExists(HKEY_CLASSES_ROOT, kFolderKey + L"\\ShellFolder")) << "entries before it ran";
  EXPECT_TRUE(ReadAttributes().empty());
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, L"MarlixDLShellExt.MarlixDLEnumIDList")) << "entries after it did not";
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, kTypeLibKey));

  // Unregistering stops at the same entry and still answers S_OK.
  RegSetKeyValueW(HKEY_CLASSES_ROOT, (kFolderKey + L"\\ShellFolder").c_str(), L"Attributes", REG_BINARY,
                  kAttributes.data(), 4);
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, kFolderKey));
}

TEST_F(ServerModule, ServesNothingBeforeInitOrAfterTerm) {
  server_.Term();
  void* ppv = reinterpret_cast<void*>(1);
  EXPECT_EQ(server_.GetClassObject(CLSID_MarlixDLShellFolder, IID_IClassFactory, &ppv), CLASS_E_CLASSNOTAVAILABLE);
  EXPECT_EQ(ppv, nullptr);
  EXPECT_EQ(server_.RegisterServer(), E_UNEXPECTED);
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, kFolderKey));
  EXPECT_EQ(server_.UnregisterServer(), S_OK);
}

}  // namespace
