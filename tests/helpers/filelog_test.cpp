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

std::string ReadAll(const std::wstring& path) {
  HANDLE h = CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr,
                         OPEN_EXISTING, 0, nullptr);
  if (h == INVALID_HANDLE_VALUE) return "<none>";
  std::string text(1 << 20, '\0');
  DWORD read = 0;
  ReadFile(h, text.data(), static_cast<DWORD>(text.size()), &read, nullptr);
  CloseHandle(h);
  text.resize(read);
  return text;
}

std::wstring LogPath() {
  return testfiles::TempDirectory() + L"marlix_logtest_" + std::to_wstring(GetCurrentProcessId()) + L".log";
}

// Runs `write` with standard output sent to a scratch file, and gives what arrived there.
template <class Write>
std::string CaptureStdout(Write write) {
  std::wstring path = testfiles::TempDirectory() + L"marlix_stdout.txt";
  HANDLE file = CreateFileW(path.c_str(), GENERIC_WRITE, FILE_SHARE_READ, nullptr, CREATE_ALWAYS, 0, nullptr);
  HANDLE saved = GetStdHandle(STD_OUTPUT_HANDLE);
  SetStdHandle(STD_OUTPUT_HANDLE, file);
  write();
  SetStdHandle(STD_OUTPUT_HANDLE, saved);
  CloseHandle(file);
  std::string text = ReadAll(path);
  DeleteFileW(path.c_str());
  return text;
}

class Filelog : public testing::Test {
 protected:
  void SetUp() override { ASSERT_TRUE(StartFilelog(L"marlix_logtest", true)); }
  void TearDown() override {
    SetFilelogMode(3);
    StopFilelog();
    DeleteFileW(LogPath().c_str());
  }
};

}  // namespace

TEST_F(Filelog, EntriesCarryOnePrefixAndIndentFurtherLines) {
  EXPECT_FALSE(StartFilelog(L"marlix_logtest", false)) << "already open";
  EXPECT_EQ(FilelogPath(), NarrowText(LogPath()));
  LogTextA("first %d\r\nsecond\rthird\n\n", 1);
  LogTextA("\r\n\n\r");
  LogTextW(L"wide %ls", L"text");
  std::string text = ReadAll(LogPath());
  std::smatch match;
  const std::regex entry(R"((\d\d:\d\d:\d\d\.\d{4} +\d+ )first 1\r\n( +)second\r\n( +)third\r\n)");
  ASSERT_TRUE(std::regex_search(text, match, entry)) << text;
  EXPECT_EQ(match[1].length(), match[2].length());
  EXPECT_EQ(match[1].length(), match[3].length());
  EXPECT_EQ(match[1].str().substr(14), std::string(6 - std::to_string(GetCurrentThreadId()).size(), ' ') +
                                           std::to_string(GetCurrentThreadId()) + " ");
  EXPECT_NE(text.find("wide text\r\n"), std::string::npos);
  EXPECT_EQ(text.find("\r\n\r\n"), std::string::npos) << "empty lines vanish";
}

TEST_F(Filelog, ModeFourWritesBareLinesToStandardOutputOnly) {
  const std::string before = ReadAll(LogPath());
  SetFilelogMode(4);
  EXPECT_EQ(CaptureStdout([] { LogTextA("alpha\nbeta"); }), "alpha\r\nbeta\r\n");
  EXPECT_EQ(ReadAll(LogPath()), before);
  StopFilelog();
  EXPECT_EQ(CaptureStdout([] { LogTextA("narrow"); }), "") << "narrow text needs an open file";
  EXPECT_EQ(CaptureStdout([] { LogTextW(L"wide"); }), "wide\r\n") << "wide text has no such test";
}

TEST_F(Filelog, StartDeletesEarlierLogsOfTheNameOnly) {
  const std::wstring temp = testfiles::TempDirectory();
  testfiles::WriteBytes(temp + L"marlix_logtest_1.log", "old");
  testfiles::WriteBytes(temp + L"marlix_logtestx_1.log", "other name");
  EXPECT_TRUE(StartFilelog(L"marlix_logtest", true));
  EXPECT_EQ(ReadAll(temp + L"marlix_logtest_1.log"), "<none>");
  EXPECT_EQ(ReadAll(temp + L"marlix_logtestx_1.log"), "other name");
  DeleteFileW((temp + L"marlix_logtestx_1.log").c_str());
}

TEST_F(Filelog, StreamsErrorsAndHeaderReachTheFile) {
  LogTextA("before restart");
  ASSERT_TRUE(StartFilelog(L"marlix_logtest", true));
  EXPECT_EQ(ReadAll(LogPath()), "") << "restart recreates the file";
  ICreateErrorInfo* create = nullptr;
  ASSERT_EQ(CreateErrorInfo(&create), S_OK);
  create->SetDescription(const_cast<LPOLESTR>(L"from the error object"));
  IErrorInfo* info = nullptr;
  create->QueryInterface(IID_IErrorInfo, reinterpret_cast<void**>(&info));
  SetErrorInfo(0, info);
  info->Release();
  create->Release();
  LogError("source.cpp", 42, L"Open %ls", HRESULT_FROM_WIN32(ERROR_FILE_NOT_FOUND), L"x.txt");
  DumpSystemInfo();
  std::string text = ReadAll(LogPath());
  EXPECT_NE(text.find("Open x.txt - 0x80070002 (source.cpp, 42)\r\n"), std::string::npos) << text;
  EXPECT_NE(text.find("System description: "), std::string::npos);
  EXPECT_NE(text.find("IErrorInfo description: from the error object\r\n"), std::string::npos);
  EXPECT_NE(text.find("Process id: " + std::to_string(GetCurrentProcessId()) + "\r\n"), std::string::npos);
  EXPECT_NE(text.find("64-bit build. Release version."), std::string::npos);
  EXPECT_NE(text.find("Languages root directory: "), std::string::npos);
  EXPECT_EQ(FormatByteSize(512), "512.00b");
  EXPECT_EQ(FormatByteSize(1536), "1.50Kb");
  EXPECT_EQ(FormatByteSize(3.0 * 1024 * 1024 * 1024), "3.00Gb");
}

TEST(FilelogStreams, ClogBufferWritesOneEntryPerSync) {
  ASSERT_TRUE(StartFilelog(L"marlix_logtest", true));
  RedirectLogStreams();
  std::clog << "one\ntwo" << std::flush;
  std::wclog << L"three" << std::flush;
  StopFilelog();
  std::clog << "restored" << std::flush;
  std::string text = ReadAll(LogPath());
  DeleteFileW(LogPath().c_str());
  EXPECT_NE(text.find(" one\r\n"), std::string::npos) << text;
  EXPECT_NE(text.find(" three\r\n"), std::string::npos) << text;
  std::regex indented(R"(\n {21}two\r\n)");
  EXPECT_TRUE(std::regex_search(text, indented)) << text;
  EXPECT_EQ(text.find("restored"), std::string::npos);
}

namespace {

struct Collector : CStackDumpHandler {
  void OnBegin() override { ++begins; }
  void OnFrame(std::uint64_t, const char* symbol, const char* place) override {
    frames.push_back(std::string(symbol ? symbol : "") + " @ " + (place ? place : ""));
  }
  void OnEnd() override { ++ends; }
  std::vector<std::string> frames;
  int begins = 0, ends = 0;
};

}  // namespace

// Kept out of line so that it stands as a frame of its own in the trace.
extern "C" __attribute__((noinline)) void MarlixStackProbe(Collector* collector) {
  DumpThreadStack({GetCurrentThread(), collector});
  asm volatile("");
}

TEST(StackDump, NamesTheCallersOwnFunction) {
  Collector collector;
  MarlixStackProbe(&collector);
  EXPECT_EQ(collector.begins, 1);
  EXPECT_EQ(collector.ends, 1);
  ASSERT_FALSE(collector.frames.empty());
  std::string all;
  for (const auto& f : collector.frames) all += f + "\n";
  EXPECT_NE(all.find("MarlixStackProbe"), std::string::npos) << all;

  // Another thread is suspended in place and goes on afterwards.
  HANDLE go = CreateEventW(nullptr, TRUE, FALSE, nullptr);
  HANDLE other = CreateThread(nullptr, 0, [](void* event) -> DWORD {
    return WaitForSingleObject(static_cast<HANDLE>(event), INFINITE);
  }, go, 0, nullptr);
  Sleep(50);
  Collector second;
  DumpThreadStack({other, &second});
  EXPECT_EQ(second.ends, 1);
  EXPECT_FALSE(second.frames.empty());
  SetEvent(go);
  EXPECT_EQ(WaitForSingleObject(other, 5000), WAIT_OBJECT_0);
  CloseHandle(other);
  CloseHandle(go);
}
