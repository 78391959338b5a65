// The file log and the stack dump.
#include <gtest/gtest.h>
#include <windows.h>
#include <oleauto.h>
#include <iostream>
#include <regex>
#include "helpers/filelog.h"
#include "helpers/stack_dump.h"
#include "test_files.h"
using namespace kld::ft;
namespace {
std::wstring LogPath() {
  return testfiles::TempDirectory() + L"marlix_logtest_" + std::to_wstring(GetCurrentProcessId()) + L".log";
}
std::string Log() { return testfiles::ReadAll(LogPath()); }
bool Has(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }
// Runs `write` with standard output sent to a scratch file, and gives what arrived there.
template <class Write> std::string CaptureStdout(Write write) {
  const std::wstring path = testfiles::TempDirectory() + L"marlix_stdout.txt";
  HANDLE file = CreateFileW(path.c_str(), GENERIC_WRITE, FILE_SHARE_READ, nullptr, CREATE_ALWAYS, 0, nullptr);
  HANDLE saved = GetStdHandle(STD_OUTPUT_HANDLE);
  SetStdHandle(STD_OUTPUT_HANDLE, file);
  write();
  SetStdHandle(STD_OUTPUT_HANDLE, saved);
  CloseHandle(file);
  const std::string text = testfiles::ReadAll(path);
  DeleteFileW(path.c_str());
  return text;
}
struct Filelog : testing::Test {
  void SetUp() override { ASSERT_TRUE(StartFilelog(L"marlix_logtest", true)); }
  void TearDown() override { SetFilelogMode(3), StopFilelog(), DeleteFileW(LogPath().c_str()); }
};
struct Collector : CStackDumpHandler {
  void OnBegin() override { ++begins; }
  void OnFrame(std::uint64_t, const char* symbol, const char* place) override {
    frames += std::string(symbol ? symbol : "") + " @ " + (place ? place : "") + "\n";
  }
  void OnEnd() override { ++ends; }
  std::string frames;
  int begins = 0, ends = 0;
};
}  // namespace
TEST_F(Filelog, EntriesCarryOnePrefixAndIndentFurtherLinesOrGoToStandardOutput) {
  EXPECT_FALSE(StartFilelog(L"marlix_logtest", false)) << "already open";
  EXPECT_EQ(FilelogPath(), NarrowText(LogPath()));
  LogTextA("first %d\r\nsecond\rthird\n\n", 1);
  LogTextA("\r\n\n\r");
  LogTextW(L"wide %ls", L"text");
  const std::string text = Log(), thread = std::to_string(GetCurrentThreadId());
  std::smatch match;
  const std::regex entry(R"((\d\d:\d\d:\d\d\.\d{4} +\d+ )first 1\r\n( +)second\r\n( +)third\r\n)");
  ASSERT_TRUE(std::regex_search(text, match, entry)) << text;
  EXPECT_EQ(match[1].length(), match[2].length());
  EXPECT_EQ(match[1].length(), match[3].length());
  EXPECT_EQ(match[1].str().substr(14), std::string(6 - thread.size(), ' ') + thread + " ");
  EXPECT_TRUE(Has(text, "wide text\r\n"));
  EXPECT_FALSE(Has(text, "\r\n\r\n")) << "empty lines vanish";
  // Mode 4 writes bare lines to standard output only.
  const std::string before = Log();
  SetFilelogMode(4);
  EXPECT_EQ(CaptureStdout([] { LogTextA("alpha\nbeta"); }), "alpha\r\nbeta\r\n");
  EXPECT_EQ(Log(), before);
  StopFilelog();
  EXPECT_EQ(CaptureStdout([] { LogTextA("narrow"); }), "") << "narrow text needs an open file";
  EXPECT_EQ(CaptureStdout([] { LogTextW(L"wide"); }), "wide\r\n") << "wide text has no such test";
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
  EXPECT_EQ(FilelogPath(), NarrowText(LogPath()));
  LogTextA("nowhere");
  CloseHandle(held);
  EXPECT_EQ(Log(), "");
}
TEST_F(Filelog, RestartDeletesOldLogsThenErrorsHeaderAndStreamsFollow) {
  const std::wstring old = testfiles::TempDirectory() + L"marlix_logtest_1.log",
                     other = testfiles::TempDirectory() + L"marlix_logtestx_1.log";
  testfiles::WriteBytes(old, "old");
  testfiles::WriteBytes(other, "other name");
  LogTextA("before restart");
  ASSERT_TRUE(StartFilelog(L"marlix_logtest", true));
  EXPECT_EQ(Log(), "") << "restart recreates the file";
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
  DumpSystemInfo();
  const std::string text = Log();
  for (const std::string& line : {std::string("Open x.txt - 0x80070002 (source.cpp, 42)\r\n"),
                                  std::string("System description: "),
                                  std::string("IErrorInfo description: from the error object\r\n"),
                                  "Process id: " + std::to_string(GetCurrentProcessId()) + "\r\n",
                                  std::string("64-bit build. Release version."),
                                  std::string("Languages root directory: ")})
    EXPECT_TRUE(Has(text, line)) << line << " in\n" << text;
  const size_t internal = text.find("Internal description: "), system = text.find("System description: "),
               object = text.find("IErrorInfo description: ");
  EXPECT_LT(internal, system) << "the detail lines keep their order";
  EXPECT_LT(system, object) << "the detail lines keep their order";
  EXPECT_EQ(FormatByteSize(512), "512.00b");
  EXPECT_EQ(FormatByteSize(1536), "1.50Kb");
  EXPECT_EQ(FormatByteSize(3.0 * 1024 * 1024 * 1024), "3.00Gb");
  // The clog buffer writes one entry per sync.
  RedirectLogStreams();
  std::clog << "one\ntwo" << std::flush;
  std::wclog << L"three" << std::flush;
  StopFilelog();
  std::clog << "restored" << std::flush;
  const std::string streamed = Log();
  EXPECT_TRUE(Has(streamed, " one\r\n") && Has(streamed, " three\r\n") && !Has(streamed, "restored")) << streamed;
  EXPECT_TRUE(std::regex_search(streamed, std::regex(R"(\n {21}two\r\n)"))) << streamed;
}
// Kept out of line so that it stands as a frame of its own in the trace.
extern "C" __attribute__((noinline)) void MarlixStackProbe(Collector* collector) {
  DumpThreadStack({GetCurrentThread(), collector});
  asm volatile("");
}
TEST(StackDump, NamesTheCallersOwnFunctionAndDumpsOtherThreads) {
  Collector own, other;
  MarlixStackProbe(&own);
  EXPECT_EQ(std::make_pair(own.begins, own.ends), std::make_pair(1, 1));
  EXPECT_TRUE(Has(own.frames, "MarlixStackProbe")) << own.frames;
  // Another thread is suspended in place and goes on afterwards.
  HANDLE go = CreateEventW(nullptr, TRUE, FALSE, nullptr);
  HANDLE thread = CreateThread(nullptr, 0, [](void* event) -> DWORD {
    return WaitForSingleObject(static_cast<HANDLE>(event), INFINITE);
  }, go, 0, nullptr);
  Sleep(50);
  DumpThreadStack({thread, &other});
  EXPECT_EQ(other.ends, 1);
  EXPECT_FALSE(other.frames.empty());
  SetEvent(go);
  EXPECT_EQ(WaitForSingleObject(thread, 5000), WAIT_OBJECT_0);
  CloseHandle(thread), CloseHandle(go);
}
