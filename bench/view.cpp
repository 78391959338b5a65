// What opening the view costs as the store grows. CreateViewWindow must not read the
// store, so its time should not grow from 10 to 10,000 levels; the time until the list
// is filled is set against the bare registry walk of the same levels.
// Runs on a scratch copy of HKEY_CURRENT_USER and removes it afterwards.
#include <windows.h>
#include <commctrl.h>
#include <shlobj.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <string>
#include <vector>

#include "bench/bench_support.h"
#include "shell/shell_folder.h"
#include "shell/shell_view.h"
#include "store/station_record.h"

namespace {

using Clock = std::chrono::steady_clock;

using bench::Browser;


double Since(Clock::time_point start) { return std::chrono::duration<double>(Clock::now() - start).count(); }

double Median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

struct Times {
  double create, filled, bare;
  size_t rows;
};

// Median of `rounds` openings, each followed by a bare walk, so both sides see the same machine.
Times Measure(IShellFolder* folder, IShellBrowser* browser, int rounds) {
  std::vector<double> create, filled, bare;
  size_t rows = 0;
  for (int i = 0; i < rounds; ++i) {
    com::ComPtr<IShellView> view;
    folder->CreateViewObject(nullptr, IID_IShellView, view.PutVoid());
    FOLDERSETTINGS settings{FVM_DETAILS, 0};
    RECT rect{0, 0, 640, 480};
    HWND window = nullptr;
    auto start = Clock::now();
    view->CreateViewWindow(nullptr, &settings, browser, &rect, &window);
    create.push_back(Since(start));
    HWND list = GetDlgItem(window, kListWindowId);
    while (FindWindowExW(list, nullptr, ANIMATE_CLASSW, nullptr)) {
      MsgWaitForMultipleObjects(0, nullptr, FALSE, 1, QS_ALLINPUT);
      MSG msg;
      while (PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&msg);
    }
    filled.push_back(Since(start));
    rows = static_cast<size_t>(SendMessageW(list, LVM_GETITEMCOUNT, 0, 0));
    view->DestroyViewWindow();
    view.Reset();
    start = Clock::now();
    bench::BareWalk();
    bare.push_back(Since(start));
  }
  return {Median(create), Median(filled), Median(bare), rows};
}

}  // namespace

int main() {
  OleInitialize(nullptr);
  bench::ScratchStore store(L"MarlixBenchView");
  {
    HWND frame = CreateWindowExW(0, L"STATIC", nullptr, WS_OVERLAPPEDWINDOW, 0, 0, 640, 480, nullptr, nullptr,
                                 nullptr, nullptr);
    auto browser = com::Make<Browser>(frame);
    auto folder = com::Make<CMarlixDLShellFolder>();
    folder->Initialize(nullptr);
    Times small{}, large{};
    for (auto [levels, rounds, out] : {std::tuple{10, 201, &small}, std::tuple{10000, 7, &large}}) {
      bench::SeedLevels(levels);  // the first keys are rewritten, the rest added
      *out = Measure(folder.Get(), browser.Get(), rounds);
      std::printf("%6d levels: CreateViewWindow %8.3f ms, filled list %9.3f ms, bare registry %9.3f ms, "
                  "filled/bare %6.2f (rows %zu)\n",
                  levels, out->create * 1e3, out->filled * 1e3, out->bare * 1e3, out->filled / out->bare, out->rows);
    }
    std::printf("CreateViewWindow 10,000/10 levels: ratio %.2f\n", large.create / small.create);
    DestroyWindow(frame);
  }
  OleUninitialize();
  return 0;
}
