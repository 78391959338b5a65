// A surveyor's download: the dialog's texts and buttons, each failure's message, cancelling, the library contract.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>

#include "helpers/app_helpers.h"
#include "helpers/error_reporter.h"
#include "base/resource_ids.h"
#include "store/string_table.h"
#include "shell/view_notify.h"
#include "support/modal_user.h"
#include "transfer/comm_interface.h"
#include "transfer/download_dialog.h"

namespace {
namespace fs = std::filesystem;

using ui::Text;
using ui::WaitFor;
using user::Click;

fs::path Beside(const wchar_t* name) { return kld::ft::GetAppPathW() + name; }
// The stand-in library beside this program reads its settings from MarlixComm.txt and logs its calls.
void ConfigureStandIn(const std::string& settings) {  // and empties the log
  std::ofstream(Beside(L"MarlixComm.txt"), std::ios::binary) << settings;
  std::ofstream(Beside(L"MarlixComm.log"), std::ios::binary);
}
std::vector<std::string> StandInLog() {
  std::ifstream file(Beside(L"MarlixComm.log"), std::ios::binary);
  std::vector<std::string> lines;
  for (std::string line; std::getline(file, line);) lines.push_back(line.substr(0, line.find('\r')));
  return lines;
}
long long Count(const std::string& line) { return std::ranges::count(StandInLog(), line); }

// The instrument's library reads the block by byte offset, not through our struct.
TEST(CommInterface, PointsBlockPresetsBytes20And92OfEachRecord) {
  PointsBlock* block = NewPointsBlock();
  ASSERT_TRUE(block);
  const auto* bytes = reinterpret_cast<const unsigned char*>(block);
  int preset = 0;
  for (size_t at = 0; at < 5000 * 144; at += 144) {
    int32_t marks[2] = {};
    std::memcpy(&marks[0], bytes + at + 20, 4);
    std::memcpy(&marks[1], bytes + at + 92, 4);
    preset += (marks[0] == -1) + (marks[1] == -1);
  }
  EXPECT_EQ(preset, 10000);
  DeletePointsBlock(block);
}

// The library calls back on a thread of its own while the dialog's thread may wait for it: a sent
// message would hang both. This thread pumps nothing, so only a post arrives.
TEST(CommInterface, CallbackPostsTheCodeToTheOpenDialogOnly) {
  MSG message;
  CommResultCallback(5);  // no dialog
  EXPECT_FALSE(PeekMessageW(&message, nullptr, DownloadMessage, DownloadMessage, PM_REMOVE));
  DownloadDialogWindow = CreateWindowExW(0, L"STATIC", L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, nullptr, nullptr);
  auto libraryThread = [](void*) -> DWORD {
    CommResultCallback(-101);
    return 0;
  };
  HANDLE library = CreateThread(nullptr, 0, libraryThread, nullptr, 0, nullptr);
  EXPECT_EQ(WaitForSingleObject(library, 5000), WAIT_OBJECT_0);
  CloseHandle(library);
  ASSERT_TRUE(PeekMessageW(&message, DownloadDialogWindow, DownloadMessage, DownloadMessage, PM_REMOVE));
  EXPECT_EQ(message.lParam, static_cast<LPARAM>(-101));
  DestroyWindow(DownloadDialogWindow);
  DownloadDialogWindow = nullptr;
}

int HeightOf(HWND window) {
  RECT r{};
  GetWindowRect(window, &r);
  return r.bottom - r.top;
}

// Both transfer dialogs as the dialog manager makes them from the module: what their user reads.
// The upload twin is the download's with the text box, and all below it, 32 dialog units higher.
TEST(TransferDialogs, CaptionLabelsAndLayoutAsShown) {
  HWND dialogs[2] = {};
  const std::pair<WORD, std::wstring> templates[] = {{213, L"Download file from Digital Level"},
                                                     {216, L"Upload file(s) to Digital Level"}};
  for (int i = 0; i < 2; ++i) {
    const auto& [id, caption] = templates[i];
    dialogs[i] = CreateDialogParamW(GetModuleHandleW(nullptr), MAKEINTRESOURCEW(id), nullptr,
                                    [](HWND, UINT, WPARAM, LPARAM) -> INT_PTR { return FALSE; }, 0);
    ASSERT_TRUE(dialogs[i]);
    EXPECT_EQ(Text(dialogs[i]), caption);
    EXPECT_EQ(Text(dialogs[i], IDCANCEL), L"Cancel") << caption;
    EXPECT_EQ(Text(dialogs[i], IDC_TRANSFER_START), L"Start") << caption;
    EXPECT_EQ(Text(dialogs[i], IDC_TRANSFER_STATUS_LABEL), L"Status:") << caption;
    EXPECT_EQ(Text(dialogs[i], IDC_TRANSFER_NAME_LABEL), L"File name:") << caption;
    const LONG readOnlyText = ES_READONLY | ES_MULTILINE | WS_VSCROLL;
    EXPECT_EQ(GetWindowLongW(GetDlgItem(dialogs[i], IDC_TRANSFER_INSTRUCTIONS), GWL_STYLE) & readOnlyText, readOnlyText);
  }
  RECT up{0, 0, 0, 32};
  MapDialogRect(dialogs[0], &up);
  EXPECT_EQ(HeightOf(dialogs[1]), HeightOf(dialogs[0]) - up.bottom);
  const int box = IDC_TRANSFER_INSTRUCTIONS;
  EXPECT_EQ(HeightOf(GetDlgItem(dialogs[1], box)), HeightOf(GetDlgItem(dialogs[0], box)) - up.bottom);
  for (HWND dialog : dialogs) DestroyWindow(dialog);
}

// Puts the block's free into the stand-in's log, so its order against Destroy shows.
void LogFree(const PointsBlock* block) {
  int intact = 0;
  for (const PointRecord& record : block->Records) intact += (record.Mark1 == -1) + (record.Mark2 == -1);
  std::ofstream(Beside(L"MarlixComm.log"), std::ios::app | std::ios::binary) << "FreePoints preset=" << intact << "\r\n";
}

bool Start(HWND dialog) {  // true once the transfer runs
  Click(dialog, IDC_TRANSFER_START);
  return WaitFor([&] { return Text(dialog, IDC_TRANSFER_STATUS) == L"Waiting for download..."; });
}

class DownloadDialog : public testing::Test {
 protected:
  void SetUp() override {
    PointsBlockFreeHook = LogFree;
    ASSERT_EQ(MakeDownloadTargetPath(target), 0u);
  }
  void TearDown() override {
    PointsBlockFreeHook = nullptr;
    DeleteFileW((target + L".txt").c_str());
  }
  // Runs the dialog over a level of `model` with `act` as its user, and deletes it as the data object does.
  INT_PTR Run(const std::function<void(HWND)>& act, const wchar_t* model = L"HRA20") {
    CStationRecord level;  // values that show a crossing of stop bits and parity, or of data bits and flow
    level.Name = L"North \"benchmark\" \\ line";
    level.Port = 3, level.BaudRate = 19200, level.StopBits = 15, level.Parity = 2;
    level.DataBits = 7, level.Flow = 1, level.CheckSum = 0, level.Model = model;
    return user::RunModal([&] { return std::make_unique<CDownloadProgressDialog>(nullptr, level, target)->DoModal(); },
                          act);
  }
  // Presses Start and returns the message box; the dialog must end as failed.
  user::Box StartAndReadFailure() {
    user::Box box;
    EXPECT_EQ(Run([&](HWND dialog) { Click(dialog, IDC_TRANSFER_START); box = user::ReadBox(dialog); }), IDCANCEL);
    EXPECT_EQ(box.caption, L"Marlix Digital Levels");
    return box;
  }
  std::wstring target;
};

TEST_F(DownloadDialog, FullDownloadRunsTheContractInOrderAndEndsWithOk) {
  ConfigureStandIn("delay_ms=700\njob_bytes=5000\n");
  EXPECT_EQ(Run([](HWND dialog) {
    EXPECT_EQ(Text(dialog, IDC_TRANSFER_INSTRUCTIONS), LoadTranslatedString(IDS_INSTRUCTIONS_HRA20));
    EXPECT_EQ(Text(dialog, IDC_TRANSFER_NAME), L"North \"benchmark\" \\ line");
    ASSERT_TRUE(Start(dialog));
    EXPECT_FALSE(IsWindowEnabled(GetDlgItem(dialog, IDC_TRANSFER_START))) << "no second Start";
  }), IDOK);
  EXPECT_EQ(DownloadDialogWindow, nullptr);
  EXPECT_EQ(fs::file_size(target + L".txt"), 5000u);
  char narrowTarget[MAX_PATH] = {};
  WideCharToMultiByte(CP_THREAD_ACP, 0, target.c_str(), -1, narrowTarget, MAX_PATH, nullptr, nullptr);
  const std::vector<std::string> expected = {
      "CreateInstance", "Initialize", "SetCallback set", std::string("SetFilePath ") + narrowTarget,
      "SetTimeout 30", "SetPoints preset=10000",
      "SetCommParameters 3 19200 2 15 1 7 0",  // parity before stop bits, flow before data bits
      "ReceiveFile 20 true", "Wrote 5000 bytes", "Callback 0", "Destroy 1 points=intact", "FreePoints preset=10000"};
  EXPECT_EQ(StandInLog(), expected);
}

TEST_F(DownloadDialog, UnknownModelShowsNoInstructionsYetTransfersAndALateCallbackDoesNothing) {
  ConfigureStandIn("delay_ms=50\nlate_callback=1\n");
  EXPECT_EQ(Run([](HWND dialog) {
    EXPECT_EQ(Text(dialog, IDC_TRANSFER_INSTRUCTIONS), L"");
    Click(dialog, IDC_TRANSFER_START);
  }, L"hra20"), IDOK);  // case counts: no known model
  EXPECT_GT(fs::file_size(target + L".txt"), 0u);
  std::vector<std::string> log = StandInLog();
  auto destroy = std::ranges::find(log, "Destroy 1 points=intact");
  EXPECT_NE(std::find(destroy, log.end(), "Callback 0 late"), log.end());
}

TEST_F(DownloadDialog, CancelDuringTransferTerminatesOncePerPressAndWaitsForTheCallback) {
  ConfigureStandIn("wait_for_terminate=2\n");
  user::Box box;
  EXPECT_EQ(Run([&](HWND dialog) {
    ASSERT_TRUE(Start(dialog));
    Click(dialog, IDCANCEL);
    EXPECT_TRUE(WaitFor([&] { return Text(dialog, IDC_TRANSFER_STATUS) == L"Terminating connection..."; }));
    Click(dialog, IDCANCEL);  // the dialog still waits for the library
    box = user::ReadBox(dialog);
  }), IDCANCEL);
  EXPECT_EQ(box.text, L"The communication's process is interrupted by the user");
  EXPECT_EQ(Count("TerminateConnection"), 2);
}

TEST_F(DownloadDialog, AnyOkCommandIsAGoodEnd) {
  // The library reports 0 after a cancel: the cancel is forgotten.
  ConfigureStandIn("wait_for_terminate=1\nterminate_code=0\n");
  EXPECT_EQ(Run([](HWND dialog) { ASSERT_TRUE(Start(dialog)); Click(dialog, IDCANCEL); }), IDOK);
  // An OK that is not the library's, as Enter in the text box sends: good, yet no file.
  ConfigureStandIn("wait_for_terminate=1\n");
  EXPECT_EQ(Run([](HWND dialog) { ASSERT_TRUE(Start(dialog)); PostMessageW(dialog, WM_COMMAND, IDOK, 0); }), IDOK);
  EXPECT_FALSE(fs::exists(target + L".txt"));
  EXPECT_EQ(Count("Abandoned"), 1);
}

TEST_F(DownloadDialog, EachFailureShowsItsTextAndStopsTheCalls) {
  const struct { const char* settings; const wchar_t* text; const char* lastCall; } cases[] = {
      {"result.SetFilePath=1", L"Unable to set file path", "SetFilePath"},
      {"result.SetTimeout=-5", L"Unable to set timeout", "SetTimeout 30"},
      {"result.SetPoints=7", L"Unable to set points", "SetPoints preset=10000"},
      {"result.SetCommParameters=2", L"Unable to set communication parameters", "SetCommParameters"},
      {"result.ReceiveFile=-101", L"The waiting time of the data has expired.", "ReceiveFile 20 true"},
      {"delay_ms=50\ncallback_code=-204", L"The checksum is incorrect", "Callback -204"},
      {"delay_ms=50\ncallback_code=12", L"Unknown error", "Callback 12"}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.settings);
    ConfigureStandIn(std::string(c.settings) + "\n");
    EXPECT_EQ(StartAndReadFailure().text, c.text);
    // Nothing after the failing call; the object still goes with the dialog.
    std::vector<std::string> log = StandInLog();
    auto destroy = std::ranges::find_if(log, [](const std::string& line) { return line.starts_with("Destroy 1"); });
    ASSERT_TRUE(destroy != log.end() && destroy != log.begin());
    EXPECT_TRUE((destroy - 1)->starts_with(c.lastCall)) << *(destroy - 1);
  }
}

// Each in a fresh process, in a folder of its own: run as tests of their own (comm.cmake).
TEST_F(DownloadDialog, DISABLED_CancelBeforeStartNeverLoadsTheLibrary) {
  EXPECT_EQ(Run([&](HWND dialog) { Click(dialog, IDCANCEL); }), IDCANCEL);
  EXPECT_EQ(GetModuleHandleW(L"MarlixComm.dll"), nullptr);
}

TEST_F(DownloadDialog, DISABLED_MissingLibraryIsReportedWithItsPath) {
  // Wine's text for this code ("Module not found.") has no insert to show the path in.
  std::wstring expected = kld::ft::BuildErrorText(HRESULT(0x8007007E), CommLibraryPath().c_str(), nullptr, nullptr);
  EXPECT_FALSE(expected.empty());
  EXPECT_EQ(StartAndReadFailure().text, expected);
}

TEST_F(DownloadDialog, DISABLED_LibraryWithoutCreateInstanceIsReportedWithoutPath) {
  EXPECT_EQ(StartAndReadFailure().text, kld::ft::BuildErrorText(HRESULT(0x8007007F), nullptr, nullptr, nullptr));
}

}  // namespace
