// The library contract (the points block, the temporary target path, the
// stand-in), the hidden window that carries changes to a view, and the download dialog driven
// as a person would, from a second thread, against the stand-in library beside the test
// program: its control file MarlixComm.txt and its call log.
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <thread>
#include <utility>

#include "helpers/error_reporter.h"
#include "base/resource_ids.h"
#include "store/string_table.h"
#include "shell/view_notify.h"
#include "support/window_waits.h"
#include "transfer/comm_interface.h"
#include "transfer/download_dialog.h"

// Rectangles compare and print as what they hold.
static bool operator==(const RECT& a, const RECT& b) { return EqualRect(&a, &b); }
static void PrintTo(const RECT& r, std::ostream* out) { *out << r.left << "," << r.top << "," << r.right << "," << r.bottom; }

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

// Read by byte offset, not through the struct the code writes with.
TEST(CommInterface, PointsBlockPresetsBytes20And92OfEachRecord) {
  PointsBlock* block = NewPointsBlock();
  ASSERT_TRUE(block);
  const auto* bytes = reinterpret_cast<const unsigned char*>(block);
  int preset = 0;
  for (size_t record = 0; record < 5000; ++record) {
    for (size_t offset : {20u, 92u}) {
      int32_t value = 0;
      std::memcpy(&value, bytes + record * 144 + offset, sizeof(value));
      preset += value == -1;
    }
  }
  EXPECT_EQ(preset, 10000);
  DeletePointsBlock(block);
}

TEST(CommInterface, CallbackPostsTheSignExtendedCodeToTheOpenDialogOnly) {
  MSG message;
  CommResultCallback(5);  // no dialog: a post to a null window would land in this thread's queue
  EXPECT_FALSE(PeekMessageW(&message, nullptr, DownloadMessage, DownloadMessage, PM_REMOVE));
  HWND target = CreateWindowExW(0, L"STATIC", L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, nullptr, nullptr);
  ASSERT_NE(target, nullptr);
  DownloadDialogWindow = target;
  // From a thread of the library's; a sent message would time out here, as this thread pumps none.
  auto library = [](void*) -> DWORD { CommResultCallback(-101); return 0; };
  HANDLE thread = CreateThread(nullptr, 0, library, nullptr, 0, nullptr);
  EXPECT_EQ(WaitForSingleObject(thread, 10000), WAIT_OBJECT_0);
  CloseHandle(thread);
  DownloadDialogWindow = nullptr;
  ASSERT_TRUE(PeekMessageW(&message, target, DownloadMessage, DownloadMessage, PM_REMOVE));
  EXPECT_EQ(message.wParam, 0u);
  EXPECT_EQ(message.lParam, static_cast<LPARAM>(-101));
  DestroyWindow(target);
}

TEST(CommInterface, TargetPathIsAFreshTkfNameWithoutExtensionInTheTempFolder) {
  std::wstring first, second;
  ASSERT_EQ(MakeDownloadTargetPath(first), 0u);
  ASSERT_EQ(MakeDownloadTargetPath(second), 0u);
  wchar_t temp[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, temp);
  ASSERT_TRUE(first.starts_with(temp)) << first;
  std::wstring name = first.substr(wcslen(temp));
  EXPECT_TRUE(name.starts_with(L"TKF")) << name;
  EXPECT_EQ(name.find_first_of(L".\\/"), std::wstring::npos) << name;
  EXPECT_EQ(GetFileAttributesW((first + L".tmp").c_str()), INVALID_FILE_ATTRIBUTES);  // deleted again
  EXPECT_NE(first, second);
}

// The stand-in honours the contract: each started transfer calls back, and Destroy
// waits for the library's own thread before anything is freed.
std::atomic<int> callbacks{0};
TEST(StandIn, EveryReceiveFileCallsBack) {
  ConfigureStandIn("delay_ms=50\n");
  std::wstring error;
  IMarlixComm* comm = CreateCommObject(error);
  ASSERT_TRUE(comm) << testing::PrintToString(error);
  comm->SetCallback([](int) { ++callbacks; });
  char temp[MAX_PATH] = {}, target[MAX_PATH] = {};
  GetTempPathA(MAX_PATH, temp);
  GetTempFileNameA(temp, "TKF", 0, target);
  comm->SetFilePath(target);
  EXPECT_EQ(comm->ReceiveFile(20, true), 0);
  EXPECT_EQ(comm->ReceiveFile(20, true), 0);
  for (ULONGLONG end = GetTickCount64() + 5000; callbacks < 2 && GetTickCount64() < end;) Sleep(10);
  comm->Destroy(1);
  EXPECT_EQ(callbacks.load(), 2);
  DeleteFileA(target);
  DeleteFileA((std::string(target) + ".txt").c_str());
}

// A transfer dialog as the dialog manager makes it from the module's template. The upload
// twin is the download's with the text box, and all below it, `up` dialog units higher.
void CheckTransferDialog(WORD id, const std::wstring& caption, LONG up) {
  SCOPED_TRACE(testing::Message() << "dialog " << id);
  HWND dialog = CreateDialogParamW(GetModuleHandleW(nullptr), MAKEINTRESOURCEW(id), nullptr,
                                   [](HWND, UINT, WPARAM, LPARAM) -> INT_PTR { return FALSE; }, 0);
  ASSERT_TRUE(dialog);
  const auto pixels = [&](RECT box) {  // x, y, width, height in dialog units, each mapped as the manager does
    MapDialogRect(dialog, &box);
    return RECT{box.left, box.top, box.left + box.right, box.top + box.bottom};
  };
  RECT client{}, control{};
  GetClientRect(dialog, &client);
  EXPECT_EQ(client, pixels({0, 0, 267, 178 - up}));
  EXPECT_EQ(ui::Text(dialog), caption);
  const DWORD frame = WS_POPUP | WS_CAPTION | WS_SYSMENU | DS_MODALFRAME;
  EXPECT_EQ(DWORD(GetWindowLongW(dialog, GWL_STYLE)) & frame, frame);
  LOGFONTW font{};
  GetObjectW(reinterpret_cast<HFONT>(SendMessageW(dialog, WM_GETFONT, 0, 0)), sizeof(font), &font);
  EXPECT_STREQ(font.lfFaceName, L"MS Sans Serif");
  const DWORD readOnlyText = ES_READONLY | ES_MULTILINE | ES_AUTOVSCROLL | WS_VSCROLL | WS_TABSTOP;
  const struct { int id; const wchar_t *type, *text; RECT box; DWORD style; } expected[] = {
      {IDCANCEL, L"Button", L"Cancel", {80, 157 - up, 50, 14}, WS_TABSTOP},
      {220, L"Button", L"Start", {140, 157 - up, 50, 14}, WS_TABSTOP},
      {215, L"Static", L"Status text", {45, 142 - up, 215, 10}, 0},
      {319, L"Static", L"Status:", {5, 142 - up, 25, 10}, 0},
      {214, L"Edit", L"", {5, 5, 255, 112 - up}, readOnlyText},
      {320, L"Static", L"File name:", {5, 127 - up, 35, 10}, 0},
      {217, L"Static", L"Name", {45, 127 - up, 215, 10}, 0},
  };
  for (const auto& e : expected) {
    SCOPED_TRACE(testing::Message() << "control " << e.id);
    HWND item = GetDlgItem(dialog, e.id);
    wchar_t type[16] = {};
    GetClassNameW(item, type, 16);
    EXPECT_STREQ(type, e.type);
    EXPECT_EQ(ui::Text(item), e.text);
    GetWindowRect(item, &control);
    MapWindowPoints(nullptr, dialog, reinterpret_cast<POINT*>(&control), 2);
    EXPECT_EQ(control, pixels(e.box));
    EXPECT_EQ(DWORD(GetWindowLongW(item, GWL_STYLE)) & (e.style | WS_VISIBLE), e.style | WS_VISIBLE);
  }
  DestroyWindow(dialog);
}

TEST(TransferDialogs, LayoutAndStyles) {
  CheckTransferDialog(213, L"Download file from Digital Level", 0);
  CheckTransferDialog(216, L"Upload file(s) to Digital Level", 32);
}

// The hidden window hands the view its notification only, and lets go of its pair before it
// is destroyed, so it can never outlive the pair holding it.
TEST(ViewNotify, TheHiddenWindowPassesOnlyItsMessageAndLetsGoOfItsPairFirst) {
  static HWND view, hidden;
  static std::vector<UINT> reachedView;
  static LONG_PTR pairAtDestroy = -1;
  view = CreateWindowExW(0, L"STATIC", L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, nullptr, nullptr);
  NotifyWindowPair pair;
  ASSERT_EQ(CreateNotifyWindow(pair, view), S_OK);
  hidden = pair.Hidden;
  HHOOK hook = SetWindowsHookExW(WH_CALLWNDPROC, [](int code, WPARAM w, LPARAM l) -> LRESULT {
    auto* call = reinterpret_cast<CWPSTRUCT*>(l);
    if (call->hwnd == view && (call->message == GlobalNotifyMessage || call->message == DownloadMessage))
      reachedView.push_back(call->message);
    if (call->hwnd == hidden && call->message == WM_DESTROY) pairAtDestroy = GetWindowLongPtrW(hidden, GWLP_USERDATA);
    return CallNextHookEx(nullptr, code, w, l);
  }, nullptr, GetCurrentThreadId());
  SendMessageW(hidden, DownloadMessage, 1, 1);
  SendMessageW(hidden, GlobalNotifyMessage, 1, 2);
  EXPECT_EQ(reachedView, std::vector<UINT>{GlobalNotifyMessage});
  DestroyNotifyWindow(pair);
  UnhookWindowsHookEx(hook);
  EXPECT_EQ(pairAtDestroy, 0);
  EXPECT_FALSE(IsWindow(hidden));
  DestroyNotifyWindow(pair);  // a second time is harmless
  DestroyWindow(view);
}

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
        {IDC_TRANSFER_STATUS, L"Waiting for start..."},
        {IDC_TRANSFER_NAME, Level().Name},
        {IDC_TRANSFER_STATUS_LABEL, L"Status:"},
        {IDC_TRANSFER_NAME_LABEL, L"File name:"},
        {IDC_TRANSFER_START, L"Start"},
        {IDCANCEL, L"Cancel"}};
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
      {L"MarlixComm.dll", "CancelBeforeStartNeverLoadsTheLibrary"},
      {L"", "MissingLibraryIsReportedWithItsPath"},
      {L"MarlixCommNoExport.dll", "LibraryWithoutCreateInstanceIsReportedWithoutPath"}};
  for (const auto& [dll, name] : runs) EXPECT_EQ(RunInCopy(dll, name), 0) << name;
}

}  // namespace
