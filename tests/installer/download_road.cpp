// A surveyor downloads one job on the installed product, from the folder to the receiving program.
// Wine's ExplorerBrowser opens "Marlix Digital Levels", the add row opens the property
// sheet, a new level is saved and opened, and file1.tkf is dragged to another program's
// window, which takes it as Explorer would; the download dialog shows the level's
// instructions, Start is pressed and the practice instrument sends its job.
// Every action is real mouse input or a key typed into a control, from a second thread
// while this one runs the browser; nothing of ours stands between the steps.
//   download_road <shell_peer.exe> <receiving folder> <screenshot folder> [pause ms before each step]
// Says each step on the terminal, saves a picture of the screen after each (BMP), and
// exits 0 only if the job arrived whole and no temporary file stayed behind.
#include <windows.h>
#include <commctrl.h>
#include <shellapi.h>
#include <shlobj.h>

#include <algorithm>
#include <atomic>
#include <set>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include "base/resource_ids.h"
#include "shell/shell_test_util.h"
#include "support/child_process.h"
#include "support/test_files.h"
#include "store/string_table.h"
#include "transfer/data_test_support.h"

namespace {

const wchar_t kLevel[] = L"Road Level";
std::wstring g_shots;
int g_shot = 0;
int g_failures = 0;

DWORD g_pause = 0;  // for a person following the demo
void Say(const char* text) {
  std::printf("road: %s\n", text);
  std::fflush(stdout);
  Sleep(g_pause);
}
void Check(bool ok, const char* what) {
  if (!ok) std::printf("FAIL: %s\n", what), ++g_failures;
}

// A picture of the screen's top left 1024x768.
void Shot(const wchar_t* name) {
  wchar_t path[MAX_PATH];
  swprintf(path, MAX_PATH, L"%ls\\%02d-%ls.bmp", g_shots.c_str(), ++g_shot, name);
  ui::Screenshot({0, 0, 1024, 768}, path);
}

int RowOf(HWND list, const wchar_t* text) {  // -1 if no row shows it
  const std::vector<std::wstring> rows = ListRows(list);
  const auto row = std::find(rows.begin(), rows.end(), text);
  return row == rows.end() ? -1 : static_cast<int>(row - rows.begin());
}
POINT RowPoint(HWND list, int row) {
  RECT rect{LVIR_LABEL};
  SendMessageW(list, LVM_GETITEMRECT, row, reinterpret_cast<LPARAM>(&rect));
  POINT point{rect.left + 12, (rect.top + rect.bottom) / 2};
  ClientToScreen(list, &point);
  return point;
}

int Road(const std::wstring& peer, const std::wstring& receiving) {
  const std::set<std::wstring> temporaryBefore = TransferFiles();
  HWND frame = CreateWindowExW(0, L"STATIC", L"Marlix Digital Levels", WS_POPUP | WS_VISIBLE | WS_BORDER, 0, 0, 600,
                               420, nullptr, nullptr, nullptr, nullptr);
  Say("1. Wine's ExplorerBrowser opens My Computer\\Marlix Digital Levels");
  com::ComPtr<IExplorerBrowser> browser = BrowseToFolder(frame, {0, 0, 600, 420});
  if (!browser) return Say("the browser cannot open the folder"), 1;
  HWND root = nullptr;
  Check(ui::PumpFor([&] { return (root = CurrentList(browser.Get())) && RowOf(root, L"Add New Digital Level") == 0; }),
        "the root lists the add row first");
  ui::PumpFor([&] { return ui::Painted(frame); });
  Shot(L"folder");

  std::atomic<int> step{0};
  std::wstring instructions;
  std::thread person([&] {
    Say("2. A double click on \"Add New Digital Level\" opens the property sheet");
    ui::Click(RowPoint(root, 0), 2);
    HWND sheet = nullptr;
    if (!ui::WaitFor([&] { return (sheet = ui::DialogWith(IDOK)) && PropSheet_GetCurrentPageHwnd(sheet); })) return;
    HWND page = PropSheet_GetCurrentPageHwnd(sheet);
    ui::Type(GetDlgItem(page, IDC_STATION_NAME), kLevel);
    ui::Type(GetDlgItem(page, IDC_STATION_NOTE), L"Practice instrument");
    HWND models = GetDlgItem(page, IDC_STATION_MODEL);
    SendMessageW(models, CB_SETCURSEL, SendMessageW(models, CB_FINDSTRINGEXACT, WPARAM(-1),
                                                      LPARAM(LoadTranslatedString(IDS_MODEL_HRB1X).c_str())), 0);
    SendMessageW(page, WM_COMMAND, MAKEWPARAM(IDC_STATION_MODEL, CBN_SELCHANGE), LPARAM(models));
    ui::WaitFor([&] { return ui::Painted(sheet); });
    Shot(L"sheet");
    Say("   the sheet is filled in and closed with OK");
    ui::Click(ui::Centre(GetDlgItem(sheet, IDOK)));
    step = 1;
    if (!ui::WaitFor([&] { return step == 2; })) return;
    Say("4. A double click on the new level opens it");
    ui::Click(RowPoint(root, RowOf(root, kLevel)), 2);
    if (!ui::WaitFor([&] { return step == 3; })) return;
    HWND list = CurrentList(browser.Get());
    Say("5. file1.tkf is dragged to a folder window of another program");
    POINT from = RowPoint(list, 0), to{800, 175};
    ui::Drag(from, to);
    HWND dialog = nullptr;
    if (!ui::WaitFor([&] { return (dialog = ui::DialogWith(IDC_TRANSFER_START)); })) return;
    wchar_t text[2048] = {};
    GetDlgItemTextW(dialog, IDC_TRANSFER_INSTRUCTIONS, text, 2048);
    instructions = text;
    ui::WaitFor([&] { return ui::Painted(dialog); });
    Shot(L"download");
    Say("6. The download dialog shows the level's instructions; Start is pressed");
    ui::Click(ui::Centre(GetDlgItem(dialog, IDC_TRANSFER_START)));
    step = 4;
    // A download that never ends must fail the road, not hold it: the drop waits on the dialog.
    if (!ui::WaitFor([&] { return !IsWindow(dialog); }, 60000)) {
      Say("   the download dialog is still open after a minute: cancelled");
      step = 5;
      PostMessageW(dialog, WM_COMMAND, IDCANCEL, 0);
      // A dialog that cannot even be cancelled holds this thread's drop for good: end here.
      if (!ui::WaitFor([&] { return !IsWindow(dialog); }, 10000)) {
        std::printf("FAIL: the download dialog neither ends nor cancels\n");
        std::fflush(stdout);
        TerminateProcess(GetCurrentProcess(), 1);
      }
    }
  });

  Check(ui::PumpFor([&] { return step == 1; }), "the sheet came up and was closed with OK");
  Check(ui::PumpFor([&] { return RowOf(root, kLevel) > 0; }), "the new level appears in the folder");
  Say("3. The new level appears");
  ui::PumpFor([&] { return ui::Painted(frame); });
  Shot(L"level-added");
  step = 2;
  Check(ui::PumpFor([&] {
    HWND list = CurrentList(browser.Get());
    return list && list != root && RowOf(list, L"file1.tkf") == 0;
  }), "the level opens and shows file1.tkf");
  ui::PumpFor([&] { return ui::Painted(frame); });
  Shot(L"level-opened");

  child::Process receiver(peer, {L"drop", receiving, L"700", L"100", L"60"});
  Check(receiver.Started(), "the receiving program starts");
  ui::PumpFor([] { return FindWindowW(L"MarlixShellPeer", L"Receiver") != nullptr; });
  step = 3;
  Check(ui::PumpFor([&] { return WaitForSingleObject(receiver.Handle(), 0) == WAIT_OBJECT_0; }, 90000),
        "the receiving program took the file and ended");
  const DWORD code = receiver.ExitCode();
  person.join();
  Check(step == 4, "the download dialog came up and Start was pressed");
  Check(instructions.find(LoadTranslatedString(IDS_INSTRUCTIONS_HRB1X)) != std::wstring::npos,
        "the dialog shows the instructions of the level's model");
  Check(code == 0, "the receiver wrote every file it was offered");
  Say("7. The practice instrument's job lies in the receiving folder as file1.tkf");
  const std::string job = testfiles::ReadAll(receiving + L"\\file1.tkf");
  Check(IsStandInJob({job.begin(), job.end()}), "file1.tkf is the practice instrument's job");
  Check(TransferFiles() == temporaryBefore, "the temporary .txt file is gone");
  Shot(L"done");
  browser->Destroy();
  browser.Reset();
  DestroyWindow(frame);
  return g_failures;
}

}  // namespace

int main() {
  int argc = 0;
  wchar_t** argv = CommandLineToArgvW(GetCommandLineW(), &argc);
  if (argc < 4) return std::printf("usage: download_road <shell_peer> <receiving folder> <shots>\n"), 2;
  g_shots = argv[3];
  g_pause = argc > 4 ? _wtoi(argv[4]) : 0;
  CreateDirectoryW(argv[2], nullptr);
  CreateDirectoryW(argv[3], nullptr);
  OleInitialize(nullptr);
  int failures = Road(argv[1], argv[2]);
  OleUninitialize();
  std::printf("%d passed, %d failed\n", failures ? 0 : 1, failures ? 1 : 0);
  return failures ? 1 : 0;
}
