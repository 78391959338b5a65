// Paths, application identity and error texts.
#include <gtest/gtest.h>
#include "helpers/app_helpers.h"
#include "helpers/error_reporter.h"
#include "helpers/errors_source.h"
#include "helpers/file_helpers.h"
#include "helpers/path_parts.h"
#include "support/registry_sandbox.h"
#include "test_files.h"
using namespace kld::ft;
namespace {
struct FixedReporter : TErrorReporter {
  explicit FixedReporter(HRESULT code) : code(code) {}
  std::wstring GetErrorText(HRESULT c, const wchar_t* text1, const wchar_t*, const wchar_t*) const override {
    return c == code ? std::wstring(L"fixed:") + (text1 ? text1 : L"-") : std::wstring();
  }
  HRESULT code;
};
struct NamedSource : CErrorsSourceBase {
  using CErrorsSourceBase::CErrorsSourceBase;
  std::wstring GetErrorText(HRESULT) const override { return L"named"; }
};
HRESULT Code(unsigned long value) { return static_cast<HRESULT>(value); }
}  // namespace
TEST(PathParts, NamePartsSplitsAndComponents) {
  // path, then its directory, name and title parts
  const wchar_t* rows[][4] = {
      {L"c:\\a/b", L"c:\\a/", L"b", L"b"},
      {L"c:/a\\b", L"c:/a\\", L"b", L"b"},
      {L"c:\\a\\", L"c:\\a\\", L"", L"c:\\a\\"},
      {L"c:\\x.y\\name", L"c:\\x.y\\", L"name", L"name"},
      {L"a.b.c", L"", L"a.b.c", L"a.b"},
      {L"file", L"", L"file", L"file"},
      {nullptr, L"", L"", L""}};
  for (const auto& r : rows) {
    const std::wstring parts[] = {GetDirectoryPart(r[0]), GetNamePart(r[0]), GetTitlePart(r[0])};
    for (int i = 0; i < 3; ++i) EXPECT_EQ(parts[i], r[i + 1]) << (r[0] ? r[0] : L"null") << " part " << i;
  }
  const wchar_t* separated[][2] = {
      {L"", L""},
      {nullptr, L""},
      {L"c:\\a/", L"c:\\a/"},
      {L"c:\\a", L"c:\\a\\"}};
  for (const auto& r : separated) EXPECT_EQ(AddTrailingSeparator(r[0]), r[1]) << (r[0] ? r[0] : L"null");
  // Split into network|server|drive|directory|title|extension|all fields composed again
  const auto fields = [](const CPathParts& p) {
    return std::to_wstring(p.network) + L"|" + p.server + L"|" + p.drive + L"|" + p.directory + L"|" + p.title +
           L"|" + p.extension + L"|" + p.Compose(31);
  };
  const wchar_t* splits[][2] = {
      {L"c:\\dir\\sub/name.tar.gz", L"0||c|\\dir\\sub|name.tar|.gz|c:\\dir\\sub\\name.tar.gz"},
      {L"c:\\a.b\\c", L"0||c|\\a.b|c||c:\\a.b\\c"},
      {L"\\\\server\\share\\dir\\f.txt", L"1|server|share|\\dir|f|.txt|\\\\server\\share\\dir\\f.txt"},
      {L"c:\\f.txt", L"0||c||f|.txt|c:\\f.txt"},
      {L"plain", L"0||||plain||plain"},
      {nullptr, L"0||||||"}};
  for (const auto& r : splits) EXPECT_EQ(fields(CPathParts(r[0])), r[1]) << (r[0] ? r[0] : L"null");
  EXPECT_EQ(CPathParts(L"c:\\dir\\name.tar.gz").Compose(CPathParts::Title), L"name.tar");
  // Components: runs of delimiters count as one, and ranges past the end are empty.
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
  const std::wstring root = testfiles::TempDirectory() + L"marlix_fh_test", deep = root + L"\\one/two\\three";
  std::filesystem::remove_all(root);
  EXPECT_TRUE(CreateDirectoryPath(deep.c_str(), nullptr));
  EXPECT_TRUE(FileExists(deep.c_str(), false));
  EXPECT_TRUE(CreateDirectoryPath(deep.c_str(), nullptr)) << "an existing folder is success";
  EXPECT_FALSE(CreateDirectoryPath(nullptr, nullptr));
  EXPECT_FALSE(CreateDirectoryPath(L"nosuchroot_8a7f\\x\\y", nullptr));
  EXPECT_FALSE(FileExists(L"nosuchroot_8a7f", false)) << "nothing was created";
  const std::wstring file = root + L"\\one\\f.txt";
  HANDLE h = CreateFileW(file.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  ASSERT_NE(h, INVALID_HANDLE_VALUE);
  EXPECT_TRUE(FileExists(file.c_str(), false));
  EXPECT_FALSE(FileExists(file.c_str(), true)) << "locked against sharing";
  CloseHandle(h);
  h = CreateFileW(file.c_str(), GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, OPEN_EXISTING, 0, nullptr);
  EXPECT_FALSE(FileExists(file.c_str(), true)) << "a writer is there, and reading shares nothing but reading";
  CloseHandle(h);
  EXPECT_FALSE(CreateDirectoryPath((file + L"\\sub").c_str(), nullptr)) << "a file stands where a folder must be";
  EXPECT_TRUE(FileExists(file.c_str(), true));
  EXPECT_TRUE(FileExists((root + L"\\one\\*.txt").c_str(), false));
  EXPECT_FALSE(FileExists((root + L"\\one").c_str(), true));
  EXPECT_FALSE(FileExists(nullptr, true));
  std::filesystem::remove_all(root);
}
TEST(AppHelpers, HandedOverPathIsConsumedByTheFirstCallOnly) {
  RegistrySandbox sandbox;
  const wchar_t* key = L"Software\\Gravon";
  RegWriteString(HKEY_CURRENT_USER, key, L"AppPath", L"D:\\Handed Over\\");
  test_only::ForgetAppPath();
  EXPECT_EQ(GetAppPathW(), L"D:\\Handed Over\\");
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, key, L"AppPath"), L"<missing>");
  EXPECT_EQ(GetAppPathW(), L"D:\\Handed Over\\") << "kept for the process";
  test_only::ForgetAppPath();  // as a process started afterwards
  EXPECT_EQ(GetAppPathW(), testfiles::ExeDirectory());
  ASSERT_EQ(RegSetKeyValueW(HKEY_CURRENT_USER, key, L"AppPath", REG_SZ, nullptr, 0), ERROR_SUCCESS);
  test_only::ForgetAppPath();
  EXPECT_EQ(GetAppPathW(), testfiles::ExeDirectory()) << "an empty value is no path";
  EXPECT_EQ(RegGetValueW(HKEY_CURRENT_USER, key, L"AppPath", RRF_RT_ANY, nullptr, nullptr, nullptr),
            ERROR_FILE_NOT_FOUND) << "but it is consumed";
  test_only::ForgetAppPath();
}
TEST(AppHelpers, NameAndLanguagesRoot) {
  const std::wstring plain = testfiles::TempDirectory() + L"tool.v2.exe";
  testfiles::WriteBytes(plain, "MZ no version block");
  EXPECT_EQ(AppNameOfExecutable(plain), L"tool") << "cut at the first dot";
  DeleteFileW(plain.c_str());
  EXPECT_EQ(AppNameOfExecutable(L"noseparator"), L"noseparator");
  // The languages root follows the not installed marker.
  test_only::ForgetAppPath();
  const std::wstring app = GetAppPathW(), common = GetCommonDataDirW();
  EXPECT_TRUE(std::filesystem::is_directory(common));
  EXPECT_EQ(GetLanguagesRootDirW(L"Gravon Tools"), common + L"Gravon Tools\\4.0.1\\Languages\\");
  testfiles::MarkNotInstalled(app);
  EXPECT_EQ(GetLanguagesRootDirW(L"Gravon Tools"), app + L"Languages\\");
  const std::wstring marker = app + L"components\\NotInstalledApp.txt";
  HANDLE locked = CreateFileW(marker.c_str(), GENERIC_WRITE, 0, nullptr, OPEN_EXISTING, 0, nullptr);
  EXPECT_EQ(GetLanguagesRootDirW(L"X"), common + L"X\\4.0.1\\Languages\\") << "must open for reading";
  CloseHandle(locked);
  std::filesystem::remove_all(app + L"components");
}
TEST(ErrorReporter, TwoModuleReportersComeFirstAndOthersJoinInOrder) {
  ASSERT_EQ(ErrorReporterCount(), 2u);
  EXPECT_FALSE(ErrorReporterAt(0)->GetErrorText(E_OUTOFMEMORY, nullptr, nullptr, nullptr).empty()) << "system table first";
  {
    FixedReporter a(0x8004ABCD), b(0x8004ABCD), c(0x8004ABCE);
    ASSERT_EQ(ErrorReporterCount(), 5u);
    EXPECT_EQ(ErrorReporterAt(2), &a);
    EXPECT_EQ(BuildErrorText(0x8004ABCD, L"x"), L"fixed:x");
    { FixedReporter d(0x8004ABCF), e(0), f(0); EXPECT_EQ(ErrorReporterCount(), 8u); }
    EXPECT_EQ(ErrorReporterCount(), 5u);
    EXPECT_EQ(ErrorReporterAt(4), &c) << "removal keeps the order";
    EXPECT_EQ(BuildErrorText(0x8004ABCE), L"fixed:-");
  }
  EXPECT_EQ(ErrorReporterCount(), 2u);
  EXPECT_EQ(BuildErrorText(0x8004ABCD), L"# 8004abcd");
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
TEST(ErrorReporter, SystemTableInternetCodesAndNamedSources) {
  EXPECT_EQ(BuildErrorText(Code(0x80040154)), L"# 80040154");
  EXPECT_EQ(BuildErrorText(Code(0x80040111)), L"# 80040111") << "row with no text";
  EXPECT_EQ(BuildErrorText(Code(0x00040301)), L"# 40301");
  // System messages lose their line end and take inserts.
  const std::wstring path = L"C:\\dir\\MarlixComm.dll";
  for (HRESULT code : {Code(0x8007007E), S_OK}) {
    const std::wstring text = BuildErrorText(code, code ? path.c_str() : nullptr);
    ASSERT_FALSE(text.empty()) << code;
    EXPECT_NE(text[0], L'#') << "the system knows " << code;
    EXPECT_EQ(text.find_last_not_of(L"\r\n"), text.size() - 1) << code;
  }
  // ERROR_BAD_EXE_FORMAT reads "%1 is not a valid ... application."
  EXPECT_NE(BuildErrorText(Code(0x800700C1), path.c_str(), L"2nd").find(path), std::wstring::npos);
  EXPECT_EQ(BuildErrorText(Code(0x800700C1)).find(L"%1"), std::wstring::npos);
  // Internet codes need the library loaded by others.
  const HRESULT timeout = Code(0x80072EE2);
  if (!GetModuleHandleW(L"wininet.dll")) {
    (void)BuildErrorText(timeout);
    EXPECT_FALSE(GetModuleHandleW(L"wininet.dll")) << "never loaded by the reporter";
  }
  HMODULE wininet = LoadLibraryW(L"wininet.dll");
  ASSERT_TRUE(wininet);
  const std::wstring text = BuildErrorText(timeout);
  ASSERT_FALSE(text.empty());
  EXPECT_NE(text[0], L'#');
  FreeLibrary(wininet);
  // Named error sources are found while they live.
  EXPECT_EQ(CErrorsSourceBase::Find(L"comm"), nullptr) << "the module defines none";
  {
    NamedSource first(L"comm"), second(L"comm");
    EXPECT_EQ(CErrorsSourceBase::Find(L"comm"), &first);
  }
  EXPECT_EQ(CErrorsSourceBase::Find(L"comm"), nullptr);
}
