#include <gtest/gtest.h>

#include <filesystem>

#include "helpers/file_helpers.h"
#include "helpers/path_parts.h"

using namespace kld::ft;

namespace {

std::wstring ScratchDir(const wchar_t* name) {
  wchar_t temp[MAX_PATH];
  GetTempPathW(MAX_PATH, temp);
  std::wstring dir = std::wstring(temp) + name;
  std::filesystem::remove_all(dir);
  return dir;
}

}  // namespace

TEST(PathParts, NamePartsUseTheLaterOfBothSeparators) {
  EXPECT_EQ(GetDirectoryPart(L"c:\\a/b"), L"c:\\a/");
  EXPECT_EQ(GetNamePart(L"c:\\a/b"), L"b");
  EXPECT_EQ(GetDirectoryPart(L"c:/a\\b"), L"c:/a\\");
  EXPECT_EQ(GetDirectoryPart(L"file"), L"");
  EXPECT_EQ(GetNamePart(L"file"), L"file");
  EXPECT_EQ(GetNamePart(L"c:\\a\\"), L"");
  EXPECT_EQ(GetTitlePart(L"c:\\a\\"), L"c:\\a\\");
  EXPECT_EQ(GetTitlePart(L"a.b.c"), L"a.b");
  EXPECT_EQ(GetTitlePart(L"c:\\x.y\\name"), L"name");
  EXPECT_EQ(GetDirectoryPart(nullptr), L"");
  EXPECT_EQ(GetNamePart(nullptr), L"");
  EXPECT_EQ(GetTitlePart(nullptr), L"");
  EXPECT_EQ(AddTrailingSeparator(L""), L"");
  EXPECT_EQ(AddTrailingSeparator(nullptr), L"");
  EXPECT_EQ(AddTrailingSeparator(L"c:\\a/"), L"c:\\a/");
  EXPECT_EQ(AddTrailingSeparator(L"c:\\a"), L"c:\\a\\");
}

TEST(PathParts, SplitsAndComposesLocalAndNetworkPaths) {
  CPathParts local(L"c:\\dir\\sub/name.tar.gz");
  EXPECT_EQ(local.network, 0);
  EXPECT_EQ(local.drive, L"c");
  EXPECT_EQ(local.directory, L"\\dir\\sub");
  EXPECT_EQ(local.title, L"name.tar");
  EXPECT_EQ(local.extension, L".gz");
  EXPECT_EQ(local.Compose(31), L"c:\\dir\\sub\\name.tar.gz");
  EXPECT_EQ(local.Compose(CPathParts::Title), L"name.tar");

  CPathParts dottedFolder(L"c:\\a.b\\c");
  EXPECT_EQ(dottedFolder.extension, L"");
  EXPECT_EQ(dottedFolder.title, L"c");

  CPathParts unc(L"\\\\server\\share\\dir\\f.txt");
  EXPECT_EQ(unc.network, 1);
  EXPECT_EQ(unc.server, L"server");
  EXPECT_EQ(unc.drive, L"share");
  EXPECT_EQ(unc.directory, L"\\dir");
  EXPECT_EQ(unc.Compose(31), L"\\\\server\\share\\dir\\f.txt");

  CPathParts rootFile(L"c:\\f.txt");
  EXPECT_EQ(rootFile.directory, L"");
  EXPECT_EQ(rootFile.Compose(31), L"c:\\f.txt");
  CPathParts bare(L"plain");
  EXPECT_EQ(bare.title, L"plain");
  EXPECT_EQ(bare.Compose(31), L"plain");
  CPathParts none(nullptr);
  EXPECT_EQ(none.Compose(31), L"");
}

TEST(PathComponents, CutsAtRunsOfDelimitersAndSelectsRanges) {
  CPathComponents parts(L"\\\\srv//a\\\\b/c\\");
  ASSERT_EQ(parts.Size(), 4u);
  EXPECT_EQ(parts.Join(), L"srv\\a\\b\\c");
  EXPECT_EQ(parts.SubPath(1, 2).Join(), L"a\\b");
  EXPECT_EQ(parts.SubPath(3, 1).Join(), L"c");
  EXPECT_EQ(parts.SubPath(3, 2).Size(), 0u);
  EXPECT_EQ(parts.SubPath(9, 0).Size(), 0u);
  EXPECT_EQ(CPathComponents(nullptr).Size(), 0u);
  EXPECT_EQ(CPathComponents(L"///").Size(), 0u);
}

TEST(FileSystem, CreatesMissingFoldersOnlyFromAnExistingStart) {
  std::wstring root = ScratchDir(L"marlix_fh_test");
  std::wstring deep = root + L"\\one/two\\three";
  EXPECT_TRUE(CreateDirectoryPath(deep.c_str(), nullptr));
  EXPECT_TRUE(FileExists(deep.c_str(), false));
  EXPECT_TRUE(CreateDirectoryPath(deep.c_str(), nullptr)) << "an existing folder is success";
  EXPECT_FALSE(CreateDirectoryPath(nullptr, nullptr));
  EXPECT_FALSE(CreateDirectoryPath(L"nosuchroot_8a7f\\x\\y", nullptr));
  EXPECT_FALSE(FileExists(L"nosuchroot_8a7f", false));

  std::wstring file = root + L"\\one\\f.txt";
  HANDLE h = CreateFileW(file.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  ASSERT_NE(h, INVALID_HANDLE_VALUE);
  EXPECT_TRUE(FileExists(file.c_str(), false));
  EXPECT_FALSE(FileExists(file.c_str(), true)) << "locked against sharing";
  CloseHandle(h);
  EXPECT_TRUE(FileExists(file.c_str(), true));
  EXPECT_TRUE(FileExists((root + L"\\one\\*.txt").c_str(), false));
  EXPECT_FALSE(FileExists((root + L"\\one").c_str(), true));
  EXPECT_FALSE(FileExists(nullptr, true));
  std::filesystem::remove_all(root);
}
