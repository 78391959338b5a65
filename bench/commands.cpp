// What the view's commands cost against the bare store: deleting one of 10,000 levels
// until the view shows the list again, against DeleteStation and the folder's
// enumeration alone; and pasting 100 levels until the view shows them, against 100
// AddStation calls. Runs on a scratch copy of HKEY_CURRENT_USER and removes it afterwards.
#include <windows.h>
#include <commctrl.h>
#include <ole2.h>
#include <shlobj.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <functional>
#include <string>
#include <vector>

#include "bench/bench_support.h"
#include "shell/shell_folder.h"
#include "shell/shell_view.h"
#include "store/station_record.h"

namespace {

using Clock = std::chrono::steady_clock;

using bench::Browser;

CStationRecord NamedRecord(const std::wstring& name) {
  CStationRecord record;
  record.Name = name;
  return record;
}

void ReseedLevels(int count) {
  RegDeleteTreeW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str());
  bench::SeedLevels(count);
}

void PumpUntil(const std::function<bool()>& done) {
  while (!done()) {
    MsgWaitForMultipleObjects(0, nullptr, FALSE, 1, QS_ALLINPUT);
    MSG msg;
    while (PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&msg);
  }
}

// Until the list holds `rows` rows and no enumeration runs, then until the reload that
// the view's own broadcast brings has settled too (not timed by the caller).
bool Filled(HWND list, int rows) {
  return !FindWindowExW(list, nullptr, ANIMATE_CLASSW, nullptr) &&
         SendMessageW(list, LVM_GETITEMCOUNT, 0, 0) == rows;
}
void Settle(HWND list, int rows) {
  for (int i = 0; i < 3; ++i) {
    Sleep(30);
    PumpUntil([&] { return Filled(list, rows); });
  }
}

double Since(Clock::time_point start) { return std::chrono::duration<double>(Clock::now() - start).count(); }

double Median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

size_t Enumerate(IShellFolder* folder) {
  com::ComPtr<IEnumIDList> items;
  if (folder->EnumObjects(nullptr, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, items.Put()) != S_OK) return 0;
  size_t count = 0;
  LPITEMIDLIST id = nullptr;
  ULONG fetched = 0;
  while (items->Next(1, &id, &fetched) == S_OK && fetched) {
    CoTaskMemFree(id);
    ++count;
  }
  return count;
}

void ClipLevels(int count) {
  std::vector<CStationRecord> records;
  for (int i = 0; i < count; ++i) records.push_back(NamedRecord(L"Pasted " + std::to_wstring(i)));
  HGLOBAL block = PackStations(records);
  OpenClipboard(nullptr);
  EmptyClipboard();
  SetClipboardData(RegisterClipboardFormatW(L"Marlix Total Stations"), block);
  CloseClipboard();
}

}  // namespace

int main() {
  OleInitialize(nullptr);
  bench::ScratchStore store(L"MarlixBenchCommands");
  {
    HWND frame = CreateWindowExW(0, L"STATIC", nullptr, WS_OVERLAPPEDWINDOW, 0, 0, 640, 480, nullptr, nullptr,
                                 nullptr, nullptr);
    auto browser = com::Make<Browser>(frame);
    auto folder = com::Make<CMarlixDLShellFolder>();
    folder->Initialize(nullptr);
    com::ComPtr<IShellView> view;
    folder->CreateViewObject(nullptr, IID_IShellView, view.PutVoid());
    FOLDERSETTINGS settings{FVM_DETAILS, 0};
    RECT rect{0, 0, 640, 480};
    HWND window = nullptr;

    const int levels = 10000, rounds = 5;
    ReseedLevels(levels);
    view->CreateViewWindow(nullptr, &settings, browser.Get(), &rect, &window);
    HWND list = GetDlgItem(window, kListWindowId);
    Settle(list, levels + 1);
    // Both sides delete a level near the front of the store's walk: the view the first
    // row below the add row (Level 0, 1, 10, ...), the bare side Level 1001, 1002, ...
    std::vector<double> command, bare;
    int left = levels;
    for (int i = 0; i < rounds; ++i) {
      LVITEMW select{};
      select.stateMask = select.state = LVIS_SELECTED;
      SendMessageW(list, LVM_SETITEMSTATE, 1, reinterpret_cast<LPARAM>(&select));
      auto start = Clock::now();
      SendMessageW(window, WM_COMMAND, kCmdDelete, 0);
      PumpUntil([&] { return Filled(list, left); });
      command.push_back(Since(start));
      Settle(list, left);
      start = Clock::now();
      DeleteStation(NamedRecord(L"Level " + std::to_wstring(1001 + i)));
      size_t seen = Enumerate(folder.Get());
      bare.push_back(Since(start));
      left -= 2;
      if (seen != static_cast<size_t>(left)) std::printf("bare enumeration saw %zu levels\n", seen);
      view->Refresh();
      Settle(list, left + 1);
    }
    std::printf("delete 1 of %d levels until the view is refilled %9.3f ms, DeleteStation + enumeration %9.3f ms, "
                "ratio %.2f\n", levels, Median(command) * 1e3, Median(bare) * 1e3, Median(command) / Median(bare));

    const int pasted = 100, base = 10;
    command.clear(), bare.clear();
    for (int i = 0; i < rounds; ++i) {
      ReseedLevels(base);
      view->Refresh();
      Settle(list, base + 1);
      ClipLevels(pasted);
      auto start = Clock::now();
      SendMessageW(window, WM_COMMAND, kCmdPaste, 0);
      PumpUntil([&] { return Filled(list, base + pasted + 1); });
      command.push_back(Since(start));
      Settle(list, base + pasted + 1);
      ReseedLevels(base);
      start = Clock::now();
      for (int n = 0; n < pasted; ++n) {
        CStationRecord record = NamedRecord(L"Pasted " + std::to_wstring(n));
        AddStation(record);
      }
      bare.push_back(Since(start));
    }
    std::printf("paste %d levels until the view shows them %9.3f ms, %d AddStation calls %9.3f ms, ratio %.2f\n",
                pasted, Median(command) * 1e3, pasted, Median(bare) * 1e3, Median(command) / Median(bare));
    view->DestroyViewWindow();
    view.Reset();
    OpenClipboard(nullptr);
    EmptyClipboard();
    CloseClipboard();
    DestroyWindow(frame);
  }
  OleUninitialize();
  return 0;
}
