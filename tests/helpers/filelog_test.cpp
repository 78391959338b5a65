// A support engineer's log: one UTC-stamped entry per call, errors with their details in order, and
// every failure stopped at the module's edge with its place and the thread's stack.
#include <gtest/gtest.h>
#include <windows.h>
#include <oleauto.h>
#include <regex>
#include <stdexcept>
#include "base/boundary.h"
#include "helpers/filelog.h"
#include "helpers/stack_dump.h"
#include "support/test_files.h"
using namespace kld::ft;
namespace {
std::wstring LogPath() {
  return testfiles::TempDirectory() + L"marlix_logtest_" + std::to_wstring(GetCurrentProcessId()) + L".log";
}
std::string Log() { return testfiles::ReadAll(LogPath()); }
bool Has(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }
struct Filelog : testing::Test {
  void SetUp() override { ASSERT_TRUE(StartFilelog(L"marlix_logtest", true)); }
  void TearDown() override { StopFilelog(), DeleteFileW(LogPath().c_str()); }
};
}  // namespace
TEST_F(Filelog, EntriesCarryOnePrefixAndIndentFurtherLines) {
  LogTextA("first %d\r\nsecond\rthird\n\n", 1);
  const std::string text = Log(), thread = std::to_string(GetCurrentThreadId());
  std::smatch match;
  const std::regex entry(R"((\d\d:\d\d:\d\d\.\d{4} +\d+ )first 1\r\n( +)second\r\n( +)third\r\n)");
  ASSERT_TRUE(std::regex_search(text, match, entry)) << text;
  EXPECT_EQ(match[1].length(), match[2].length());
  EXPECT_EQ(match[1].length(), match[3].length());
  EXPECT_EQ(match[1].str().substr(14), std::string(6 - thread.size(), ' ') + thread + " ");
  EXPECT_FALSE(Has(text, "\r\n\r\n")) << "empty lines vanish";
}
// The prefix tells UTC; the test runs in a zone far from it.
TEST_F(Filelog, PrefixIsUtc) {
  SYSTEMTIME utc, local;
  GetSystemTime(&utc);
  GetLocalTime(&local);
  ASSERT_NE(utc.wHour * 60 + utc.wMinute, local.wHour * 60 + local.wMinute) << "the zone must differ from UTC";
  LogTextA("now");
  const std::string text = Log();
  const int logged = std::stoi(text.substr(0, 2)) * 60 + std::stoi(text.substr(3, 2));
  EXPECT_LE(std::abs(logged - (utc.wHour * 60 + utc.wMinute)) % (24 * 60 - 1), 1) << text;
}
// A file that can't be made at once is tried once more.
HANDLE holder;
TEST_F(Filelog, CreationIsTriedTwice) {
  StopFilelog();
  holder = CreateFileW(LogPath().c_str(), GENERIC_READ, 0, nullptr, OPEN_ALWAYS, 0, nullptr);
  ASSERT_NE(holder, INVALID_HANDLE_VALUE);
  test_only::BeforeFilelogRetry = [] { CloseHandle(holder); };
  EXPECT_TRUE(StartFilelog(L"marlix_logtest", true));
  test_only::BeforeFilelogRetry = nullptr;
  LogTextA("after the retry");
  EXPECT_TRUE(Has(Log(), "after the retry"));
}
// A file that can't be made at all still counts as started: the log just stays silent.
TEST_F(Filelog, AFileThatCannotBeMadeStillAnswersTrue) {
  StopFilelog();
  HANDLE held = CreateFileW(LogPath().c_str(), GENERIC_READ, 0, nullptr, OPEN_ALWAYS, 0, nullptr);
  ASSERT_NE(held, INVALID_HANDLE_VALUE);
  EXPECT_TRUE(StartFilelog(L"marlix_logtest", true));
  LogTextA("nowhere");
  CloseHandle(held);
  EXPECT_EQ(Log(), "");
}
TEST_F(Filelog, RestartDeletesOldLogsAndErrorsKeepTheirDetailOrder) {
  const std::wstring old = testfiles::TempDirectory() + L"marlix_logtest_1.log",
                     other = testfiles::TempDirectory() + L"marlix_logtestx_1.log";
  testfiles::WriteBytes(old, "old");
  testfiles::WriteBytes(other, "other name");
  ASSERT_TRUE(StartFilelog(L"marlix_logtest", true));
  EXPECT_EQ(testfiles::ReadAll(old), "<none>");
  EXPECT_EQ(testfiles::ReadAll(other), "other name");
  DeleteFileW(other.c_str());
  ICreateErrorInfo* create = nullptr;
  IErrorInfo* info = nullptr;
  ASSERT_EQ(CreateErrorInfo(&create), S_OK);
  create->SetDescription(const_cast<LPOLESTR>(L"from the error object"));
  create->QueryInterface(IID_IErrorInfo, reinterpret_cast<void**>(&info));
  SetErrorInfo(0, info);
  info->Release(), create->Release();
  LogError("source.cpp", 42, L"Open %ls", HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), L"x.txt");
  const std::string text = Log();
  EXPECT_TRUE(Has(text, "Open x.txt - 0x80070002 (source.cpp, 42)\r\n")) << text;
  const size_t internal = text.find("Internal description: "), system = text.find("System description: "),
               object = text.find("IErrorInfo description: from the error object\r\n");
  ASSERT_NE(object, std::string::npos) << text;
  EXPECT_LT(internal, system) << "the detail lines keep their order";
  EXPECT_LT(system, object) << "the detail lines keep their order";
}
// A host entry that fails, as the module's boundary stops it.
__attribute__((noinline)) HRESULT MarlixStackProbe() {
  return boundary::Call([]() -> HRESULT { throw std::runtime_error("probe failure"); });
}
TEST_F(Filelog, AFailureAtTheModulesEdgeIsLoggedWithItsPlaceAndStack) {
  boundary::failureSink = &LogBoundaryFailure;
  EXPECT_EQ(MarlixStackProbe(), E_UNEXPECTED);
  boundary::failureSink = nullptr;
  const std::string text = Log();
  EXPECT_TRUE(Has(text, "Stopped at the module's edge (tests/helpers/filelog_test.cpp, ")) << text;
  EXPECT_TRUE(Has(text, "probe failure; the host was answered 0x8000FFFF")) << text;
  EXPECT_TRUE(Has(text, "MarlixStackProbe")) << "the stack names the failing entry's caller";
}
