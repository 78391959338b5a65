// The paths the download dialog builds, folders made for a download, and the error texts a user reads.
#include <gtest/gtest.h>
#include "helpers/error_reporter.h"
#include "helpers/file_helpers.h"
#include "helpers/path_parts.h"
#include "support/test_files.h"
using namespace kld::ft;
namespace {
HRESULT Code(unsigned long value) { return static_cast<HRESULT>(value); }
}  // namespace
TEST(PathParts, FolderAndTitleOfAPath) {
  struct { const wchar_t *path, *directory, *title; } rows[] = {
      {L"c:\\a/b", L"c:\\a/", L"b"},
      {L"c:/a\\b", L"c:/a\\", L"b"},
      {L"c:\\a\\", L"c:\\a\\", L"c:\\a\\"},
      {L"c:\\x.y\\name", L"c:\\x.y\\", L"name"},
      {L"a.b.c", L"", L"a.b"},
      {nullptr, L"", L""},
  };
  for (const auto& r : rows) {
    EXPECT_EQ(GetDirectoryPart(r.path), r.directory) << (r.path ? r.path : L"null");
    EXPECT_EQ(GetTitlePart(r.path), r.title) << (r.path ? r.path : L"null");
  }
  EXPECT_EQ(AddTrailingSeparator(nullptr), L"");
  EXPECT_EQ(AddTrailingSeparator(L"c:\\a/"), L"c:\\a/");
  EXPECT_EQ(AddTrailingSeparator(L"c:\\a"), L"c:\\a\\");
}
TEST(FileSystem, CreatesMissingFoldersOnlyFromAnExistingStart) {
  const std::wstring root = testfiles::TempDirectory() + L"marlix_fh_test", deep = root + L"\\one/two\\three";
  std::filesystem::remove_all(root);
  EXPECT_TRUE(CreateDirectoryPath(deep.c_str(), nullptr));
  EXPECT_TRUE(FileExists(deep.c_str(), false));
  EXPECT_TRUE(CreateDirectoryPath(deep.c_str(), nullptr)) << "an existing folder is success";
  EXPECT_FALSE(CreateDirectoryPath(L"nosuchroot_8a7f\\x\\y", nullptr));
  EXPECT_FALSE(FileExists(L"nosuchroot_8a7f", false)) << "nothing was created";
  const std::wstring file = root + L"\\one\\f.txt";
  HANDLE h = CreateFileW(file.c_str(), GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, CREATE_ALWAYS, 0,
                         nullptr);
  ASSERT_NE(h, INVALID_HANDLE_VALUE);
  EXPECT_TRUE(FileExists(file.c_str(), false));
  EXPECT_FALSE(FileExists(file.c_str(), true)) << "a writer is there, and reading shares nothing but reading";
  CloseHandle(h);
  EXPECT_TRUE(FileExists(file.c_str(), true));
  EXPECT_FALSE(CreateDirectoryPath((file + L"\\sub").c_str(), nullptr)) << "a file stands where a folder must be";
  std::filesystem::remove_all(root);
}
// A system table that knows every code, with all three inserts, in place of Wine's.
DWORD WINAPI TableWithInserts(DWORD flags, LPCVOID source, DWORD code, DWORD language, LPWSTR buffer, DWORD size,
                              va_list* arguments) {
  if (flags & FORMAT_MESSAGE_FROM_SYSTEM)
    return FormatMessageW((flags & ~FORMAT_MESSAGE_FROM_SYSTEM) | FORMAT_MESSAGE_FROM_STRING, L"%1|%2|%3\r\n", code,
                          language, buffer, size, arguments);
  return FormatMessageW(flags, source, code, language, buffer, size, arguments);
}
struct SystemTableWithInserts : testing::Test {
  void SetUp() override { StdReporterMessageSource = TableWithInserts; }
  void TearDown() override { StdReporterMessageSource = &FormatMessageW; }
};
// The second text goes in twice and the third never; facility 4 never reaches the system table.
TEST_F(SystemTableWithInserts, TextsPerCode) {
  struct { DWORD code; const wchar_t *one, *two, *three, *text; } rows[] = {
      {0x80070005, L"one", L"two", L"three", L"one|two|two"},
      {0x80070005, nullptr, nullptr, nullptr, L"||"},
      {0x80040154, L"one", L"two", nullptr, L""},
      {0x00040200, L"one", L"two", nullptr, L""},
  };
  for (const auto& r : rows)
    EXPECT_EQ(TStdErrorReporter().GetErrorText(Code(r.code), r.one, r.two, r.three), r.text) << std::hex << r.code;
}
TEST(ErrorReporter, SystemTextsTakeInsertsAndInternetCodesNeedTheirLibrary) {
  EXPECT_EQ(BuildErrorText(Code(0x80040154)), L"# 80040154");
  EXPECT_EQ(BuildErrorText(Code(0x00040301)), L"# 40301");
  const std::wstring path = L"C:\\dir\\MarlixComm.dll";
  const std::wstring missing = BuildErrorText(Code(0x8007007E), path.c_str());
  ASSERT_FALSE(missing.empty());
  EXPECT_NE(missing[0], L'#') << "the system knows it";
  EXPECT_EQ(missing.find_last_not_of(L"\r\n"), missing.size() - 1) << "the line end goes";
  // ERROR_BAD_EXE_FORMAT reads "%1 is not a valid ... application."
  EXPECT_NE(BuildErrorText(Code(0x800700C1), path.c_str(), L"2nd").find(path), std::wstring::npos);
  EXPECT_EQ(BuildErrorText(Code(0x800700C1)).find(L"%1"), std::wstring::npos);
  const HRESULT timeout = Code(0x80072EE2);
  if (!GetModuleHandleW(L"wininet.dll")) {
    (void)BuildErrorText(timeout);
    EXPECT_FALSE(GetModuleHandleW(L"wininet.dll")) << "never loaded by the reporter";
  }
  HMODULE wininet = LoadLibraryW(L"wininet.dll");
  ASSERT_TRUE(wininet);
  EXPECT_NE(BuildErrorText(timeout)[0], L'#');
  FreeLibrary(wininet);
}
