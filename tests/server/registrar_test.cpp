#include <gtest/gtest.h>

#include "server/registrar.h"
#include "support/registry_sandbox.h"

namespace {

const wchar_t kModule[] = L"C:\\Some Dir\\Module.dll";

TEST(Registrar, WritesKeysAndValuesAndTakesThemBack) {
  RegistrySandbox sandbox({HKEY_CLASSES_ROOT, HKEY_LOCAL_MACHINE});
  RegWriteString(HKEY_LOCAL_MACHINE, L"Shared", L"Other", L"kept");
  RegWriteString(HKEY_CLASSES_ROOT, L"Owned\\Stale", nullptr, L"old");
  const wchar_t script[] =
      L"; a comment\r\n"
      L"replace HKCR\\Owned\r\n"
      L"@ = Owned Class\r\n"
      L"key HKCR\\Owned\\Server\r\n"
      L"  @ =  %MODULE%,0  \r\n"
      L"Threading Model = Apartment\r\n"
      L"\r\n"
      L"open HKLM\\Shared\n"
      L"{GUID} = Approved Name\n";
  ASSERT_EQ(RunRegistryScript(script, kModule, true), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CLASSES_ROOT, L"Owned", nullptr), L"Owned Class");
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, L"Owned\\Stale")) << "replace drops the old tree";
  EXPECT_EQ(RegReadString(HKEY_CLASSES_ROOT, L"Owned\\Server", nullptr), L"C:\\Some Dir\\Module.dll,0");
  EXPECT_EQ(RegReadString(HKEY_CLASSES_ROOT, L"Owned\\Server", L"Threading Model"), L"Apartment");
  EXPECT_EQ(RegReadString(HKEY_LOCAL_MACHINE, L"Shared", L"{GUID}"), L"Approved Name");
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, sandbox.ScratchPath(HKEY_CLASSES_ROOT) + L"\\Owned\\Server"))
      << "the classes root is redirected";

  ASSERT_EQ(RunRegistryScript(script, kModule, false), S_OK);
  EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, L"Owned"));
  EXPECT_TRUE(RegKeyExists(HKEY_LOCAL_MACHINE, L"Shared")) << "an opened key is not the script's";
  EXPECT_EQ(RegReadString(HKEY_LOCAL_MACHINE, L"Shared", L"{GUID}"), L"<missing>");
  EXPECT_EQ(RegReadString(HKEY_LOCAL_MACHINE, L"Shared", L"Other"), L"kept");

  // Taking back what is already gone is no failure.
  EXPECT_EQ(RunRegistryScript(script, kModule, false), S_OK);
}

TEST(Registrar, SyntaxErrorsChangeNothing) {
  RegistrySandbox sandbox({HKEY_CLASSES_ROOT});
  const wchar_t* bad[] = {
      L"key HKCR\\A\n@ = x\nvalue without equals\n",
      L"@ = a value before any key\n",
      L"key HKXX\\A\n",
      L"key HKCR\\A\nkey HKCR\n",
      L"remove HKCR\\A\n",
      L"key HKCR\\A\n = nameless\n",
      L"key\n",
  };
  for (const wchar_t* script : bad) {
    EXPECT_EQ(RunRegistryScript(script, kModule, true), kScriptSyntaxError) << testing::PrintToString(script);
    EXPECT_FALSE(RegKeyExists(HKEY_CLASSES_ROOT, L"A"));
  }
  EXPECT_EQ(RunRegistryScript(L"", kModule, true), S_OK);
}

TEST(Registrar, ResourceScriptsNeedTheirResource) {
  HMODULE self = GetModuleHandleW(nullptr);
  EXPECT_EQ(RunRegistryResource(self, 999, true), HRESULT_FROM_WIN32(ERROR_RESOURCE_NAME_NOT_FOUND));
  std::wstring path = ModuleFilePath(self);
  EXPECT_GT(path.size(), 4u);
  EXPECT_EQ(path.substr(path.size() - 4), L".exe");
}

}  // namespace
