// Time from the download dialog's creation to its first paint, against a bare
// DialogBoxParamW on the same template with an empty dialog procedure.
#include <windows.h>
#include <ole2.h>

#include <algorithm>
#include <cstdio>
#include <vector>

#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "transfer/download_dialog.h"

namespace {

LARGE_INTEGER started;
double firstPaintMs = -1;
HHOOK hook = nullptr;

double MsSince(const LARGE_INTEGER& from) {
  LARGE_INTEGER now, frequency;
  QueryPerformanceCounter(&now);
  QueryPerformanceFrequency(&frequency);
  return 1000.0 * static_cast<double>(now.QuadPart - from.QuadPart) / static_cast<double>(frequency.QuadPart);
}

// Sees WM_PAINT as the modal loop takes it from the queue; closes the dialog after it.
LRESULT CALLBACK OnGetMessage(int code, WPARAM wParam, LPARAM lParam) {
  auto* message = reinterpret_cast<MSG*>(lParam);
  if (code == HC_ACTION && wParam == PM_REMOVE && message->message == WM_PAINT && firstPaintMs < 0) {
    HWND top = GetAncestor(message->hwnd, GA_ROOT);
    firstPaintMs = MsSince(started);
    PostMessageW(top, WM_COMMAND, IDCANCEL, 0);
  }
  return CallNextHookEx(hook, code, wParam, lParam);
}

INT_PTR CALLBACK BareProc(HWND window, UINT message, WPARAM wParam, LPARAM) {
  if (message == WM_INITDIALOG) return TRUE;
  if (message == WM_COMMAND && LOWORD(wParam) == IDCANCEL) {
    EndDialog(window, IDCANCEL);
    return TRUE;
  }
  return FALSE;
}

template <class Run>
double MedianFirstPaint(int rounds, Run run) {
  std::vector<double> times;
  for (int i = 0; i < rounds; ++i) {
    firstPaintMs = -1;
    QueryPerformanceCounter(&started);
    run();
    if (firstPaintMs >= 0) times.push_back(firstPaintMs);
  }
  if (times.empty()) return -1;
  std::sort(times.begin(), times.end());
  return times[times.size() / 2];
}

}  // namespace

int main() {
  OleInitialize(nullptr);
  hook = SetWindowsHookExW(WH_GETMESSAGE, OnGetMessage, nullptr, GetCurrentThreadId());
  const int rounds = 15;
  CStationRecord level;
  level.Name = L"Bench level";

  double bare = MedianFirstPaint(rounds, [] {
    DialogBoxParamW(ModuleInstance(), MAKEINTRESOURCEW(IDD_DOWNLOAD), nullptr, BareProc, 0);
  });
  double full = MedianFirstPaint(rounds, [&] {
    CDownloadProgressDialog dialog(nullptr, level, L"C:\\nowhere\\TKF0");
    dialog.DoModal();
  });
  UnhookWindowsHookEx(hook);

  std::printf("creation to first paint, median of %d (ms)\n", rounds);
  std::printf("  bare template:           %8.2f\n", bare);
  std::printf("  CDownloadProgressDialog: %8.2f\n", full);
  if (bare > 0 && full > 0) std::printf("  ratio dialog/bare:       %8.2f\n", full / bare);
  OleUninitialize();
  return 0;
}
