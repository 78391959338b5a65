// The download dialog driven as a person would, against the stand-in library.
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>

#include "helpers/error_reporter.h"
#include "server/resource_ids.h"
#include "store/string_table.h"
#include "transfer/comm_test_support.h"
#include "transfer/download_dialog.h"

using namespace commtest;

namespace {

CStationRecord TestLevel(const std::wstring& model = L"HRA20") {
  CStationRecord level;
  level.Name = L"North \"benchmark\" \\ line";
  level.Port = 3;
  level.BaudRate = 19200;
  level.StopBits = 1;
  level.Parity = 2;
  level.DataBits = 7;
  level.Flow = 1;
  level.CheckSum = 0;
  level.Model = model;
  return level;
}

std::wstring TargetPath() {
  std::wstring target;
  EXPECT_EQ(MakeDownloadTargetPath(target), 0u);
  return target;
}

// -1 if there is no such file.
long long FileSize(const std::wstring& path) {
  WIN32_FILE_ATTRIBUTE_DATA data{};
  if (!GetFileAttributesExW(path.c_str(), GetFileExInfoStandard, &data)) return -1;
  return data.nFileSizeLow;
}

bool Logged(const std::string& line) {
  std::vector<std::string> log = StandInLog();
  return std::find(log.begin(), log.end(), line) != log.end();
}

// The dialog is deleted before this returns, as the data object does.
INT_PTR RunDialog(const CStationRecord& level, const std::wstring& target, const std::function<void()>& script) {
  auto dialog = std::make_unique<CDownloadProgressDialog>(nullptr, level, target);
  INT_PTR result = RunWithDriver([&] { return dialog->DoModal(); }, script);
  dialog.reset();
  return result;
}

HWND StartAndWaitForDownload() {
  HWND dialog = WaitForDialog();
  if (!dialog) return nullptr;
  Click(dialog, IDC_TRANSFER_START);
  return WaitForControlText(dialog, IDC_TRANSFER_STATUS, L"Waiting for download...") ? dialog : nullptr;
}

// Presses Start, then reads and dismisses the failure's message box.
std::wstring StartAndReadFailure() {
  HWND dialog = WaitForDialog();
  if (!dialog) return L"(no dialog)";
  Click(dialog, IDC_TRANSFER_START);
  HWND box = WaitForMessageBox(dialog);
  if (!box) return L"(no message box)";
  std::wstring text = MessageBoxText(box);
  wchar_t caption[64] = {};
  GetWindowTextW(box, caption, 64);
  EXPECT_STREQ(caption, L"Marlix Digital Levels");
  PressOk(box);
  return text;
}

// Puts the block's free into the stand-in's log, so its order against Destroy shows.
void LogFree(const PointsBlock* block) {
  int intact = 0;
  for (const PointRecord& record : block->Records) intact += (record.Mark1 == -1) + (record.Mark2 == -1);
  AppendStandInLog("FreePoints preset=" + std::to_string(intact));
}

class DownloadDialogTest : public testing::Test {
 protected:
  void SetUp() override { PointsBlockFreeHook = LogFree; }
  void TearDown() override { PointsBlockFreeHook = nullptr; }
};

TEST_F(DownloadDialogTest, FullDownloadRunsTheContractInOrderAndEndsWithOk) {
  ConfigureStandIn("delay_ms=700\njob_bytes=5000\n");
  std::wstring target = TargetPath();
  CStationRecord level = TestLevel();
  INT_PTR result = RunDialog(level, target, [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    wchar_t title[64] = {};
    GetWindowTextW(dialog, title, 64);
    EXPECT_STREQ(title, L"Download file from Digital Level");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_INSTRUCTIONS), LoadTranslatedString(IDS_INSTRUCTIONS_HRA20));
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_STATUS), L"Waiting for start...");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_NAME), level.Name);
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_STATUS_LABEL), L"Status:");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_NAME_LABEL), L"File name:");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_START), L"Start");
    EXPECT_EQ(ControlText(dialog, IDCANCEL), L"Cancel");
    ASSERT_EQ(StartAndWaitForDownload(), dialog);
    EXPECT_FALSE(IsWindowEnabled(GetDlgItem(dialog, IDC_TRANSFER_START)));
  });
  EXPECT_EQ(result, IDOK);
  EXPECT_EQ(DownloadDialogWindow, nullptr);
  EXPECT_EQ(FileSize(target + L".txt"), 5000);
  DeleteFileW((target + L".txt").c_str());

  char narrowTarget[MAX_PATH] = {};
  WideCharToMultiByte(CP_THREAD_ACP, 0, target.c_str(), -1, narrowTarget, MAX_PATH, nullptr, nullptr);
  std::vector<std::string> expected = {
      "CreateInstance", "Initialize", "SetCallback set",
      std::string("SetFilePath ") + narrowTarget,
      "SetTimeout 30", "SetPoints preset=10000",
      "SetCommParameters 3 19200 2 1 1 7 0",  // parity before stop bits, flow before data bits
      "ReceiveFile 20 true", "Wrote 5000 bytes", "Callback 0",
      "Destroy 1 points=intact", "FreePoints preset=10000"};
  EXPECT_EQ(StandInLog(), expected);
}

TEST_F(DownloadDialogTest, InstructionsFollowTheModelAndAnUnknownModelStillTransfers) {
  std::wstring shown;
  INT_PTR result = RunDialog(TestLevel(L"HRB1X"), TargetPath(), [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    shown = ControlText(dialog, IDC_TRANSFER_INSTRUCTIONS);
    Click(dialog, IDCANCEL);
  });
  EXPECT_EQ(shown, LoadTranslatedString(IDS_INSTRUCTIONS_HRB1X));
  EXPECT_EQ(result, IDCANCEL);

  ConfigureStandIn("delay_ms=100\n");
  std::wstring target = TargetPath();
  result = RunDialog(TestLevel(L"hra20"), target, [&] {  // case counts: no known model
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    shown = ControlText(dialog, IDC_TRANSFER_INSTRUCTIONS);
    Click(dialog, IDC_TRANSFER_START);
  });
  EXPECT_EQ(shown, L"");
  EXPECT_EQ(result, IDOK);
  EXPECT_GT(FileSize(target + L".txt"), 0);
  DeleteFileW((target + L".txt").c_str());
}

TEST_F(DownloadDialogTest, CancelDuringTransferTerminatesOncePerPressAndWaitsForTheCallback) {
  ConfigureStandIn("wait_for_terminate=2\n");
  std::wstring text;
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] {
    HWND dialog = StartAndWaitForDownload();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDCANCEL);
    EXPECT_TRUE(WaitForControlText(dialog, IDC_TRANSFER_STATUS, L"Terminating connection..."));
    Sleep(200);
    EXPECT_TRUE(IsWindowVisible(dialog));  // still waiting for the library
    Click(dialog, IDCANCEL);
    HWND box = WaitForMessageBox(dialog);
    ASSERT_NE(box, nullptr);
    text = MessageBoxText(box);
    PressOk(box);
  });
  EXPECT_EQ(result, IDCANCEL);
  EXPECT_EQ(text, L"The communication's process is interrupted by the user");
  std::vector<std::string> log = StandInLog();
  EXPECT_EQ(std::count(log.begin(), log.end(), "TerminateConnection"), 2);
  EXPECT_TRUE(Logged("Callback -102"));
}

TEST_F(DownloadDialogTest, AnyOkCommandIsAGoodEnd) {
  // The library reports 0 after a cancel: the cancel is forgotten.
  ConfigureStandIn("wait_for_terminate=1\nterminate_code=0\n");
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] {
    HWND dialog = StartAndWaitForDownload();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDCANCEL);
  });
  EXPECT_EQ(result, IDOK);

  // An OK that is not the library's, as Enter in the text box sends: good, yet no file.
  ConfigureStandIn("wait_for_terminate=1\n");
  std::wstring target = TargetPath();
  result = RunDialog(TestLevel(), target, [&] {
    HWND dialog = StartAndWaitForDownload();
    ASSERT_NE(dialog, nullptr);
    PostMessageW(dialog, WM_COMMAND, IDOK, 0);
    EXPECT_TRUE(WaitUntilGone(dialog));
  });
  EXPECT_EQ(result, IDOK);
  EXPECT_EQ(FileSize(target + L".txt"), -1);
  EXPECT_TRUE(Logged("Abandoned"));
}

TEST_F(DownloadDialogTest, EachFailureShowsItsTextAndStopsTheCalls) {
  struct Case {
    const char* settings;
    const wchar_t* text;
    const char* lastCall;
  } const cases[] = {
      {"result.SetFilePath=1", L"Unable to set file path", "SetFilePath"},
      {"result.SetTimeout=-5", L"Unable to set timeout", "SetTimeout 30"},
      {"result.SetPoints=7", L"Unable to set points", "SetPoints preset=10000"},
      {"result.SetCommParameters=2", L"Unable to set communication parameters", "SetCommParameters"},
      {"result.ReceiveFile=-101", L"The waiting time of the data has expired.", "ReceiveFile 20 true"},
      {"delay_ms=50\ncallback_code=-204", L"The checksum is incorrect", "Callback -204"},
      {"delay_ms=50\ncallback_code=12", L"Unknown error", "Callback 12"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.settings);
    ConfigureStandIn(std::string(c.settings) + "\n");
    std::wstring text;
    INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] { text = StartAndReadFailure(); });
    EXPECT_EQ(result, IDCANCEL);
    EXPECT_EQ(text, c.text);
    // Nothing after the failing call; the object still goes with the dialog.
    std::vector<std::string> log = StandInLog();
    auto destroy = std::find_if(log.begin(), log.end(), [](const std::string& l) { return l.rfind("Destroy 1", 0) == 0; });
    ASSERT_TRUE(destroy != log.end() && destroy != log.begin());
    EXPECT_EQ((destroy - 1)->rfind(c.lastCall, 0), 0u) << *(destroy - 1);
  }
}

TEST_F(DownloadDialogTest, CallbackAfterTheDialogHasGoneDoesNothing) {
  ConfigureStandIn("delay_ms=50\nlate_callback=1\n");
  std::wstring target = TargetPath();
  INT_PTR result = RunDialog(TestLevel(), target, [&] { StartAndWaitForDownload(); });
  EXPECT_EQ(result, IDOK);
  std::vector<std::string> log = StandInLog();
  auto destroy = std::find(log.begin(), log.end(), "Destroy 1 points=intact");
  EXPECT_NE(destroy, log.end());
  EXPECT_GT(std::find(log.begin(), log.end(), "Callback 0 late"), destroy);
  DeleteFileW((target + L".txt").c_str());
}

// These need a fresh process in a folder of their own: run by the launcher below.
TEST(DISABLED_FreshProcess, CancelBeforeStartNeverLoadsTheLibrary) {
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDCANCEL);
  });
  EXPECT_EQ(result, IDCANCEL);
  EXPECT_EQ(GetModuleHandleW(L"MarlixComm.dll"), nullptr);
}

TEST(DISABLED_FreshProcess, MissingLibraryIsReportedWithItsPath) {
  std::wstring text;
  EXPECT_EQ(RunDialog(TestLevel(), TargetPath(), [&] { text = StartAndReadFailure(); }), IDCANCEL);
  // Wine's text for this code ("Module not found.") has no insert to show the path in.
  EXPECT_EQ(text, kld::ft::BuildErrorText(static_cast<HRESULT>(0x8007007E), CommLibraryPath().c_str(), nullptr, nullptr));
  EXPECT_FALSE(text.empty());
}

TEST(DISABLED_FreshProcess, LibraryWithoutCreateInstanceIsReportedWithoutPath) {
  std::wstring text;
  EXPECT_EQ(RunDialog(TestLevel(), TargetPath(), [&] { text = StartAndReadFailure(); }), IDCANCEL);
  EXPECT_EQ(text, kld::ft::BuildErrorText(static_cast<HRESULT>(0x8007007F), nullptr, nullptr, nullptr));
}

TEST(DownloadDialogFreshProcess, CancelBeforeStartMissingLibraryAndMissingExport) {
  EXPECT_EQ(RunCopyOfProgram(L"cancel", ProgramFolder() + L"MarlixComm.dll",
                             "DISABLED_FreshProcess.CancelBeforeStartNeverLoadsTheLibrary"), 0);
  EXPECT_EQ(RunCopyOfProgram(L"nolib", L"", "DISABLED_FreshProcess.MissingLibraryIsReportedWithItsPath"), 0);
  EXPECT_EQ(RunCopyOfProgram(L"noexport", ProgramFolder() + L"MarlixCommNoExport.dll",
                             "DISABLED_FreshProcess.LibraryWithoutCreateInstanceIsReportedWithoutPath"), 0);
}

}  // namespace
