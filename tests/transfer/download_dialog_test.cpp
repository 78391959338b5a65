// The download dialog driven as a person would, from a second thread, against the stand-in
// library beside the test program: its control file MarlixComm.txt and its call log.
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <thread>

#include "helpers/error_reporter.h"
#include "base/resource_ids.h"
#include "store/string_table.h"
#include "support/window_waits.h"
#include "transfer/download_dialog.h"

namespace {
namespace fs = std::filesystem;

using ui::OwnedDialog;
using ui::Text;
using ui::WaitFor;

fs::path Self() {
  wchar_t self[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, self, MAX_PATH);
  return self;
}
fs::path Beside(const wchar_t* name) { return Self().replace_filename(name); }
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

// Puts the block's free into the stand-in's log, so its order against Destroy shows.
void LogFree(const PointsBlock* block) {
  int intact = 0;
  for (const PointRecord& record : block->Records) intact += (record.Mark1 == -1) + (record.Mark2 == -1);
  std::ofstream(Beside(L"MarlixComm.log"), std::ios::app | std::ios::binary) << "FreePoints preset=" << intact << "\r\n";
}

void Click(HWND dialog, int id) { PostMessageW(GetDlgItem(dialog, id), BM_CLICK, 0, 0); }
bool Start(HWND dialog) {  // true once the transfer runs
  Click(dialog, IDC_TRANSFER_START);
  return WaitFor([&] { return Text(dialog, IDC_TRANSFER_STATUS) == L"Waiting for download..."; });
}

// Waits for the message box that `dialog` owns, checks its caption, dismisses it and returns its text.
std::wstring ReadBox(HWND dialog) {
  HWND box = nullptr;
  if (!WaitFor([&] { return (box = OwnedDialog(dialog)) != nullptr; })) return L"(no message box)";
  EXPECT_EQ(Text(box), L"Marlix Digital Levels");
  std::wstring text = Text(box, 0xFFFF);
  PostMessageW(box, WM_COMMAND, IDOK, 0);
  return text;
}

class DownloadDialogTest : public testing::Test {
 protected:
  void SetUp() override { PointsBlockFreeHook = LogFree; ASSERT_EQ(MakeDownloadTargetPath(target), 0u); }
  void TearDown() override { PointsBlockFreeHook = nullptr; DeleteFileW((target + L".txt").c_str()); }
  // Runs the dialog modally here and `script` on a second thread, then deletes the dialog as the
  // data object does. A dialog that the script leaves open is a failure, and is closed by force.
  INT_PTR Run(const std::function<void(HWND)>& script, const wchar_t* model = L"HRA20") {
    auto dialog = std::make_unique<CDownloadProgressDialog>(nullptr, Level(model), target);
    std::thread driver([&] {
      HWND window = nullptr;
      ASSERT_TRUE(WaitFor([&] { return (window = OwnedDialog(nullptr)) != nullptr; })) << "no dialog";
      EXPECT_EQ(DownloadDialogWindow, window);
      script(window);
      if (WaitFor([&] { return !IsWindow(window); })) return;
      ADD_FAILURE() << "the dialog stayed open";
      WaitFor([&] { HWND box = OwnedDialog(window); if (box) PostMessageW(box, WM_COMMAND, IDOK, 0); return !box; });
      PostMessageW(window, WM_COMMAND, IDOK, 0);
    });
    INT_PTR result = dialog->DoModal();
    driver.join();
    return result;
  }
  // Presses Start and returns the text of the message box; the dialog must end as failed.
  std::wstring StartAndReadFailure() {
    std::wstring text;
    EXPECT_EQ(Run([&](HWND dialog) { Click(dialog, IDC_TRANSFER_START); text = ReadBox(dialog); }), IDCANCEL);
    return text;
  }
  static CStationRecord Level(const wchar_t* model = L"HRA20") {
    CStationRecord level;  // values that show a crossing of stop bits and parity, or of data bits and flow
    level.Name = L"North \"benchmark\" \\ line";
    level.Port = 3, level.BaudRate = 19200, level.StopBits = 15, level.Parity = 2;
    level.DataBits = 7, level.Flow = 1, level.CheckSum = 0, level.Model = model;
    return level;
  }
  std::wstring target;
};

TEST_F(DownloadDialogTest, FullDownloadShowsItsTextsRunsTheContractInOrderAndEndsWithOk) {
  ConfigureStandIn("delay_ms=700\njob_bytes=5000\n");
  EXPECT_EQ(Run([](HWND dialog) {
    EXPECT_EQ(Text(dialog), L"Download file from Digital Level");
    const std::pair<int, std::wstring> texts[] = {
        {IDC_TRANSFER_INSTRUCTIONS, LoadTranslatedString(IDS_INSTRUCTIONS_HRA20)},
        {IDC_TRANSFER_STATUS, L"Waiting for start..."}, {IDC_TRANSFER_NAME, Level().Name},
        {IDC_TRANSFER_STATUS_LABEL, L"Status:"}, {IDC_TRANSFER_NAME_LABEL, L"File name:"},
        {IDC_TRANSFER_START, L"Start"}, {IDCANCEL, L"Cancel"}};
    for (const auto& [id, text] : texts) EXPECT_EQ(Text(dialog, id), text) << "control " << id;
    ASSERT_TRUE(Start(dialog));
    EXPECT_FALSE(IsWindowEnabled(GetDlgItem(dialog, IDC_TRANSFER_START)));
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

TEST_F(DownloadDialogTest, UnknownModelShowsNoInstructionsYetTransfersAndALateCallbackDoesNothing) {
  ConfigureStandIn("delay_ms=50\nlate_callback=1\n");
  EXPECT_EQ(Run([](HWND dialog) {
    EXPECT_EQ(Text(dialog, IDC_TRANSFER_INSTRUCTIONS), L"");
    EXPECT_TRUE(IsWindowEnabled(GetDlgItem(dialog, IDC_TRANSFER_START)));
    Click(dialog, IDC_TRANSFER_START);
  }, L"hra20"), IDOK);  // case counts: no known model
  EXPECT_GT(fs::file_size(target + L".txt"), 0u);
  std::vector<std::string> log = StandInLog();
  auto destroy = std::ranges::find(log, "Destroy 1 points=intact");
  ASSERT_NE(destroy, log.end());
  EXPECT_NE(std::find(destroy, log.end(), "Callback 0 late"), log.end());
}

TEST_F(DownloadDialogTest, CancelDuringTransferTerminatesOncePerPressAndWaitsForTheCallback) {
  ConfigureStandIn("wait_for_terminate=2\n");
  std::wstring text;
  EXPECT_EQ(Run([&](HWND dialog) {
    ASSERT_TRUE(Start(dialog));
    Click(dialog, IDCANCEL);
    EXPECT_TRUE(WaitFor([&] { return Text(dialog, IDC_TRANSFER_STATUS) == L"Terminating connection..."; }));
    Click(dialog, IDCANCEL);  // the dialog still waits for the library
    text = ReadBox(dialog);
  }), IDCANCEL);
  EXPECT_EQ(text, L"The communication's process is interrupted by the user");
  EXPECT_EQ(Count("TerminateConnection"), 2);
  EXPECT_EQ(Count("Callback -102"), 1);
}

TEST_F(DownloadDialogTest, AnyOkCommandIsAGoodEnd) {
  // The library reports 0 after a cancel: the cancel is forgotten.
  ConfigureStandIn("wait_for_terminate=1\nterminate_code=0\n");
  EXPECT_EQ(Run([](HWND dialog) { ASSERT_TRUE(Start(dialog)); Click(dialog, IDCANCEL); }), IDOK);
  // An OK that is not the library's, as Enter in the text box sends: good, yet no file.
  ConfigureStandIn("wait_for_terminate=1\n");
  EXPECT_EQ(Run([](HWND dialog) { ASSERT_TRUE(Start(dialog)); PostMessageW(dialog, WM_COMMAND, IDOK, 0); }), IDOK);
  EXPECT_FALSE(fs::exists(target + L".txt"));
  EXPECT_EQ(Count("Abandoned"), 1);
}

TEST_F(DownloadDialogTest, EachFailureShowsItsTextAndStopsTheCalls) {
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
    EXPECT_EQ(StartAndReadFailure(), c.text);
    // Nothing after the failing call; the object still goes with the dialog.
    std::vector<std::string> log = StandInLog();
    auto destroy = std::ranges::find_if(log, [](const std::string& line) { return line.starts_with("Destroy 1"); });
    ASSERT_TRUE(destroy != log.end() && destroy != log.begin());
    EXPECT_TRUE((destroy - 1)->starts_with(c.lastCall)) << *(destroy - 1);
  }
}

// Each needs a fresh process in a folder of its own: run by the launcher below.
TEST_F(DownloadDialogTest, DISABLED_CancelBeforeStartNeverLoadsTheLibrary) {
  std::wstring shown;
  auto script = [&](HWND dialog) { shown = Text(dialog, IDC_TRANSFER_INSTRUCTIONS); Click(dialog, IDCANCEL); };
  EXPECT_EQ(Run(script, L"HRB1X"), IDCANCEL);
  EXPECT_EQ(shown, LoadTranslatedString(IDS_INSTRUCTIONS_HRB1X));
  EXPECT_EQ(GetModuleHandleW(L"MarlixComm.dll"), nullptr);
}

TEST_F(DownloadDialogTest, DISABLED_MissingLibraryIsReportedWithItsPath) {
  // Wine's text for this code ("Module not found.") has no insert to show the path in.
  std::wstring expected = kld::ft::BuildErrorText(HRESULT(0x8007007E), CommLibraryPath().c_str(), nullptr, nullptr);
  EXPECT_FALSE(expected.empty());
  EXPECT_EQ(StartAndReadFailure(), expected);
}

TEST_F(DownloadDialogTest, DISABLED_LibraryWithoutCreateInstanceIsReportedWithoutPath) {
  EXPECT_EQ(StartAndReadFailure(), kld::ft::BuildErrorText(HRESULT(0x8007007F), nullptr, nullptr, nullptr));
}

// Runs the one test DISABLED_`name` in a copy of this program in a fresh folder, with `dll` of this
// folder beside it as MarlixComm.dll (none if empty). Its exit code, or -1.
int RunInCopy(const wchar_t* dll, const std::string& name) {
  fs::path folder = fs::temp_directory_path() / ("marlix_" + std::to_string(GetCurrentProcessId()) + name);
  fs::create_directory(folder);
  fs::copy_file(Self(), folder / "copy.exe", fs::copy_options::overwrite_existing);
  if (*dll) fs::copy_file(Beside(dll), folder / "MarlixComm.dll", fs::copy_options::overwrite_existing);
  std::wstring command = L"copy --gtest_also_run_disabled_tests --gtest_output=xml:result.xml "
                        L"--gtest_filter=DownloadDialogTest.DISABLED_" + fs::path(name).wstring();
  STARTUPINFOW startup{sizeof startup};
  PROCESS_INFORMATION process{};
  DWORD code = DWORD(-1);
  if (CreateProcessW((folder / "copy.exe").c_str(), command.data(), nullptr, nullptr, FALSE, 0, nullptr, folder.c_str(),
                     &startup, &process)) {
    if (WaitForSingleObject(process.hProcess, 60000) != WAIT_OBJECT_0 || !GetExitCodeProcess(process.hProcess, &code))
      TerminateProcess(process.hProcess, code = DWORD(-1));
    CloseHandle(process.hThread);
    CloseHandle(process.hProcess);
  }
  // gtest exits 0 when its filter matches nothing: a misspelt name must not pass.
  std::ifstream result(folder / "result.xml");
  std::string xml((std::istreambuf_iterator<char>(result)), std::istreambuf_iterator<char>());
  result.close();
  if (code == 0 && xml.find("<testcase name=\"DISABLED_" + name + "\"") == std::string::npos) code = DWORD(-2);
  Sleep(200);  // let the copy's image go before deleting it
  std::error_code ignored;
  fs::remove_all(folder, ignored);
  return static_cast<int>(code);
}

TEST(DownloadDialogFreshProcess, CancelBeforeStartMissingLibraryAndMissingExport) {
  const std::pair<const wchar_t*, const char*> runs[] = {
      {L"MarlixComm.dll", "CancelBeforeStartNeverLoadsTheLibrary"}, {L"", "MissingLibraryIsReportedWithItsPath"},
      {L"MarlixCommNoExport.dll", "LibraryWithoutCreateInstanceIsReportedWithoutPath"}};
  for (const auto& [dll, name] : runs) EXPECT_EQ(RunInCopy(dll, name), 0) << name;
}

}  // namespace
