#include <gtest/gtest.h>

#include <filesystem>

#include "helpers/app_helpers.h"
#include "support/registry_sandbox.h"
#include "test_files.h"

using namespace kld::ft;

TEST(AppHelpers, HandedOverPathIsConsumedByTheFirstCallOnly) {
  RegistrySandbox sandbox;
  RegWriteString(HKEY_CURRENT_USER, L"Software\\Gravon", L"AppPath", L"D:\\Handed Over\\");
  test_only::ForgetAppPath();
  EXPECT_EQ(GetAppPathW(), L"D:\\Handed Over\\");
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, L"Software\\Gravon", L"AppPath"), L"<missing>");
  EXPECT_EQ(GetAppPathW(), L"D:\\Handed Over\\") << "kept for the process";

  test_only::ForgetAppPath();  // as a process started afterwards
  EXPECT_EQ(GetAppPathW(), testfiles::ExeDirectory());

  HKEY key = nullptr;
  ASSERT_EQ(RegCreateKeyExW(HKEY_CURRENT_USER, L"Software\\Gravon", 0, nullptr, 0, KEY_ALL_ACCESS,
                            nullptr, &key, nullptr), ERROR_SUCCESS);
  RegSetValueExW(key, L"AppPath", 0, REG_SZ, nullptr, 0);
  test_only::ForgetAppPath();
  EXPECT_EQ(GetAppPathW(), testfiles::ExeDirectory()) << "an empty value is no path";
  EXPECT_EQ(RegQueryValueExW(key, L"AppPath", nullptr, nullptr, nullptr, nullptr),
            ERROR_FILE_NOT_FOUND) << "but it is consumed";
  RegCloseKey(key);
  test_only::ForgetAppPath();
}

TEST(AppHelpers, NameComesFromTheVersionBlockOrTheFileName) {
  EXPECT_EQ(GetAppNameW(), L"Marlix Digital Levels") << "as it stands, spaces and all";
  EXPECT_EQ(GetAppVersionW(), L"4.0.1");
  std::wstring plain = testfiles::TempDirectory() + L"tool.v2.exe";
  testfiles::WriteBytes(plain, "MZ no version block");
  EXPECT_EQ(AppNameOfExecutable(plain), L"tool") << "cut at the first dot";
  DeleteFileW(plain.c_str());
  EXPECT_EQ(AppNameOfExecutable(L"noseparator"), L"noseparator");

  EXPECT_EQ(AppVersionFor(L"gravon tools"), L"9");
  EXPECT_EQ(AppVersionFor(L"GRAVON OFFICE"), L"9");
  EXPECT_EQ(AppVersionFor(L"Gravon GIS Office"), L"8.1");
  EXPECT_EQ(AppVersionFor(L"Gravon GIS"), L"4.0.1");
}

TEST(AppHelpers, LanguagesRootFollowsTheNotInstalledMarker) {
  test_only::ForgetAppPath();
  const std::wstring app = GetAppPathW();
  std::wstring common = GetCommonDataDirW();
  ASSERT_GE(common.size(), 8u);
  EXPECT_EQ(common.substr(common.size() - 8), L"\\FENROD\\");
  EXPECT_TRUE(std::filesystem::is_directory(common));
  EXPECT_EQ(GetLanguagesRootDirW(L"Gravon Tools"), common + L"Gravon Tools\\4.0.1\\Languages\\");

  std::filesystem::create_directories(app + L"components");
  std::wstring marker = app + L"components\\NotInstalledApp.txt";
  testfiles::WriteBytes(marker, "");
  EXPECT_EQ(GetLanguagesRootDirW(L"Gravon Tools"), app + L"Languages\\");
  HANDLE locked = CreateFileW(marker.c_str(), GENERIC_WRITE, 0, nullptr, OPEN_EXISTING, 0, nullptr);
  EXPECT_EQ(GetLanguagesRootDirW(L"X"), common + L"X\\4.0.1\\Languages\\") << "must open for reading";
  CloseHandle(locked);
  std::filesystem::remove_all(app + L"components");
}
