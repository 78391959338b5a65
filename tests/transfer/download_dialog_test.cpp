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

std::string Narrow(const std::wstring& text) {
  char buffer[MAX_PATH] = {};
  WideCharToMultiByte(CP_THREAD_ACP, 0, text.c_str(), -1, buffer, MAX_PATH, nullptr, nullptr);
  return buffer;
}

// Runs a dialog for `level` with `script` on the driver thread; the dialog is deleted
// before this returns, as the data object does.
INT_PTR RunDialog(const CStationRecord& level, const std::wstring& target,
                  const std::function<void()>& script) {
  auto dialog = std::make_unique<CDownloadProgressDialog>(nullptr, level, target);
  INT_PTR result = RunWithDriver([&] { return dialog->DoModal(); }, script);
  dialog.reset();
  return result;
}

void RecordFree(const PointsBlock* block) {
  int intact = 0;
  for (const PointRecord& record : block->Records) intact += (record.Mark1 == -1) + (record.Mark2 == -1);
  AppendStandInLog("FreePoints preset=" + std::to_string(intact));
}

// Presses Start, then reads the message box that the failure brings up and dismisses it.
std::wstring StartAndReadFailure() {
  std::wstring text;
  HWND dialog = WaitForDialog();
  if (!dialog) return L"(no dialog)";
  Click(dialog, IDC_TRANSFER_START);
  HWND box = WaitForMessageBox(dialog);
  if (!box) return L"(no message box)";
  text = MessageBoxText(box);
  wchar_t caption[128] = {};
  GetWindowTextW(box, caption, 128);
  EXPECT_EQ(std::wstring(caption), LoadTranslatedString(IDS_ROOT_NAME));
  PressOk(box);
  return text;
}

class DownloadDialogTest : public testing::Test {
 protected:
  void SetUp() override { PointsBlockFreeHook = RecordFree; }
  void TearDown() override {
    PointsBlockFreeHook = nullptr;
    ConfigureStandIn("");
  }
};

TEST_F(DownloadDialogTest, FullDownloadRunsTheContractInOrderAndEndsWithOk) {
  ConfigureStandIn("delay_ms=700\njob_bytes=5000\n");
  std::wstring target = TargetPath();
  CStationRecord level = TestLevel();
  INT_PTR result = RunDialog(level, target, [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    wchar_t title[128] = {};
    GetWindowTextW(dialog, title, 128);
    EXPECT_STREQ(title, L"Download file from Digital Level");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_INSTRUCTIONS), LoadTranslatedString(IDS_INSTRUCTIONS_HRA20));
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_STATUS), L"Waiting for start...");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_NAME), level.Name);
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_STATUS_LABEL), L"Status:");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_NAME_LABEL), L"File name:");
    EXPECT_EQ(ControlText(dialog, IDC_TRANSFER_START), L"Start");
    EXPECT_EQ(ControlText(dialog, IDCANCEL), L"Cancel");
    Click(dialog, IDC_TRANSFER_START);
    EXPECT_TRUE(WaitForControlText(dialog, IDC_TRANSFER_STATUS, L"Waiting for download..."));
    EXPECT_FALSE(IsWindowEnabled(GetDlgItem(dialog, IDC_TRANSFER_START)));
    EXPECT_TRUE(WaitUntilGone(dialog));
  });
  EXPECT_EQ(result, IDOK);
  EXPECT_EQ(DownloadDialogWindow, nullptr);
  EXPECT_EQ(FileSizeAt(target + L".txt"), 5000u);
  DeleteFileW((target + L".txt").c_str());

  std::vector<std::string> expected = {
      "CreateInstance",
      "Initialize",
      "SetCallback set",
      "SetFilePath " + Narrow(target),
      "SetTimeout 30",
      "SetPoints preset=10000",
      "SetCommParameters 3 19200 2 1 1 7 0",  // parity before stop bits, flow before data bits
      "ReceiveFile 20 true",
      "Wrote 5000 bytes",
      "Callback 0",
      "Destroy 1 points=intact",
      "FreePoints preset=10000"};
  EXPECT_EQ(StandInLog(), expected);
}

TEST_F(DownloadDialogTest, InstructionsFollowTheModelAndAnUnknownModelStillTransfers) {
  for (auto [model, id] : {std::pair{L"HRA40", IDS_INSTRUCTIONS_HRA40}, std::pair{L"HRB1X", IDS_INSTRUCTIONS_HRB1X}}) {
    std::wstring shown;
    INT_PTR result = RunDialog(TestLevel(model), TargetPath(), [&] {
      HWND dialog = WaitForDialog();
      ASSERT_NE(dialog, nullptr);
      shown = ControlText(dialog, IDC_TRANSFER_INSTRUCTIONS);
      Click(dialog, IDCANCEL);
    });
    EXPECT_EQ(shown, LoadTranslatedString(id));
    EXPECT_EQ(result, IDCANCEL);
  }

  ConfigureStandIn("delay_ms=100\n");
  std::wstring target = TargetPath();
  std::wstring shown = L"?";
  // Case counts: "hra20" is no known model.
  INT_PTR result = RunDialog(TestLevel(L"hra20"), target, [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    shown = ControlText(dialog, IDC_TRANSFER_INSTRUCTIONS);
    Click(dialog, IDC_TRANSFER_START);
  });
  EXPECT_EQ(shown, L"");
  EXPECT_EQ(result, IDOK);
  EXPECT_TRUE(FileExistsAt(target + L".txt"));
  DeleteFileW((target + L".txt").c_str());
}

TEST_F(DownloadDialogTest, CancelDuringTransferTerminatesOncePerPressAndWaitsForTheCallback) {
  ConfigureStandIn("wait_for_terminate=2\n");
  std::wstring text;
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDC_TRANSFER_START);
    ASSERT_TRUE(WaitForControlText(dialog, IDC_TRANSFER_STATUS, L"Waiting for download..."));
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
  EXPECT_NE(std::find(log.begin(), log.end(), "Callback -102"), log.end());
}

TEST_F(DownloadDialogTest, GoodCallbackAfterCancelIsAGoodEnd) {
  ConfigureStandIn("wait_for_terminate=1\nterminate_code=0\n");
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDC_TRANSFER_START);
    ASSERT_TRUE(WaitForControlText(dialog, IDC_TRANSFER_STATUS, L"Waiting for download..."));
    Click(dialog, IDCANCEL);
  });
  EXPECT_EQ(result, IDOK);
}

TEST_F(DownloadDialogTest, AnOkCommandNotFromTheLibraryEndsWithOkAndNoFile) {
  ConfigureStandIn("wait_for_terminate=1\n");
  std::wstring target = TargetPath();
  INT_PTR result = RunDialog(TestLevel(), target, [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDC_TRANSFER_START);
    ASSERT_TRUE(WaitForControlText(dialog, IDC_TRANSFER_STATUS, L"Waiting for download..."));
    // What the dialog manager sends for Enter in the text box, there being no default button.
    PostMessageW(dialog, WM_COMMAND, IDOK, 0);
    EXPECT_TRUE(WaitUntilGone(dialog, 5000));
  });
  EXPECT_EQ(result, IDOK);
  EXPECT_FALSE(FileExistsAt(target + L".txt"));
  std::vector<std::string> log = StandInLog();
  EXPECT_NE(std::find(log.begin(), log.end(), "Abandoned"), log.end());
}

TEST_F(DownloadDialogTest, EachFailingStepShowsItsTextAndStopsTheCalls) {
  struct Case {
    const char* settings;
    std::wstring text;
    const char* lastCall;
  };
  const Case cases[] = {
      {"result.SetFilePath=1", L"Unable to set file path", "SetFilePath"},
      {"result.SetTimeout=-5", L"Unable to set timeout", "SetTimeout 30"},
      {"result.SetPoints=7", L"Unable to set points", "SetPoints preset=10000"},
      {"result.SetCommParameters=2", L"Unable to set communication parameters", "SetCommParameters"},
      {"result.ReceiveFile=-101", L"The waiting time of the data has expired.", "ReceiveFile 20 true"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.settings);
    ConfigureStandIn(std::string(c.settings) + "\n");
    std::wstring text;
    INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] { text = StartAndReadFailure(); });
    EXPECT_EQ(result, IDCANCEL);
    EXPECT_EQ(text, c.text);
    // The object outlives the failure and goes with the dialog; nothing after the failing call.
    std::vector<std::string> log = StandInLog();
    auto destroy = std::find_if(log.begin(), log.end(),
                                [](const std::string& line) { return line.rfind("Destroy 1", 0) == 0; });
    ASSERT_NE(destroy, log.end());
    ASSERT_NE(destroy, log.begin());
    EXPECT_EQ((destroy - 1)->rfind(c.lastCall, 0), 0u) << *(destroy - 1);
  }
}

TEST_F(DownloadDialogTest, CallbackCodesAreShownByTheirText) {
  // The whole table is checked on CommResultText; here the way from callback to box.
  const std::pair<int, std::wstring> cases[] = {
      {-204, L"The checksum is incorrect"},
      {12, L"Unknown error"},
  };
  for (const auto& [code, expected] : cases) {
    SCOPED_TRACE(code);
    ConfigureStandIn("delay_ms=50\ncallback_code=" + std::to_string(code) + "\n");
    std::wstring text;
    INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] { text = StartAndReadFailure(); });
    EXPECT_EQ(result, IDCANCEL);
    EXPECT_EQ(text, expected);
  }
}

TEST_F(DownloadDialogTest, CallbackAfterTheDialogHasGoneDoesNothing) {
  ConfigureStandIn("delay_ms=50\nlate_callback=1\n");
  std::wstring target = TargetPath();
  INT_PTR result = RunDialog(TestLevel(), target, [&] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDC_TRANSFER_START);
  });
  EXPECT_EQ(result, IDOK);
  std::vector<std::string> log = StandInLog();
  auto destroy = std::find(log.begin(), log.end(), "Destroy 1 points=intact");
  auto late = std::find(log.begin(), log.end(), "Callback 0 late");
  EXPECT_NE(destroy, log.end());
  EXPECT_GT(late, destroy);
  DeleteFileW((target + L".txt").c_str());
}

// Tests that need a fresh process in a folder of their own; run through the
// launchers below, never directly.
TEST(DISABLED_FreshProcess, CancelBeforeStartNeverLoadsTheLibrary) {
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [] {
    HWND dialog = WaitForDialog();
    ASSERT_NE(dialog, nullptr);
    Click(dialog, IDCANCEL);
  });
  EXPECT_EQ(result, IDCANCEL);
  EXPECT_EQ(GetModuleHandleW(L"MarlixComm.dll"), nullptr);
}

TEST(DISABLED_FreshProcess, MissingLibraryNamesItsPath) {
  std::wstring text;
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] { text = StartAndReadFailure(); });
  EXPECT_EQ(result, IDCANCEL);
  std::wstring path = CommLibraryPath();
  EXPECT_EQ(text, kld::ft::BuildErrorText(static_cast<HRESULT>(0x8007007E), path.c_str(), nullptr, nullptr));
  // Wine's system text for this code has no insert ("Module not found."), so the path
  // shows only where the system's message takes one.
  EXPECT_FALSE(text.empty());
}

TEST(DISABLED_FreshProcess, LibraryWithoutCreateInstanceHasNoPathInItsText) {
  std::wstring text;
  INT_PTR result = RunDialog(TestLevel(), TargetPath(), [&] { text = StartAndReadFailure(); });
  EXPECT_EQ(result, IDCANCEL);
  EXPECT_EQ(text, kld::ft::BuildErrorText(static_cast<HRESULT>(0x8007007F), nullptr, nullptr, nullptr));
  EXPECT_EQ(text.find(L"MarlixComm"), std::wstring::npos);
}

TEST(DownloadDialogFreshProcess, CancelBeforeStartMissingLibraryAndMissingExport) {
  EXPECT_EQ(RunCopyOfProgram(L"cancel", ProgramFolder() + L"MarlixComm.dll",
                             "DISABLED_FreshProcess.CancelBeforeStartNeverLoadsTheLibrary"), 0);
  EXPECT_EQ(RunCopyOfProgram(L"nolib", L"", "DISABLED_FreshProcess.MissingLibraryNamesItsPath"), 0);
  EXPECT_EQ(RunCopyOfProgram(L"noexport", ProgramFolder() + L"MarlixCommNoExport.dll",
                             "DISABLED_FreshProcess.LibraryWithoutCreateInstanceHasNoPathInItsText"), 0);
}

}  // namespace
