// Time from the download dialog's creation to its first paint, against a bare
// DialogBoxParamW on the same template with an empty dialog procedure.
#include <windows.h>
#include <ole2.h>

#include <cstdio>

#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "bench/bench_support.h"
#include "transfer/download_dialog.h"

namespace {

INT_PTR CALLBACK BareProc(HWND window, UINT message, WPARAM wParam, LPARAM) {
  if (message == WM_INITDIALOG) return TRUE;
  if (message == WM_COMMAND && LOWORD(wParam) == IDCANCEL) {
    EndDialog(window, IDCANCEL);
    return TRUE;
  }
  return FALSE;
}

}  // namespace

int main() {
  OleInitialize(nullptr);
  const int rounds = 15;
  CStationRecord level;
  level.Name = L"Bench level";

  double bare = bench::MedianFirstPaint(rounds, [] {
    DialogBoxParamW(ModuleInstance(), MAKEINTRESOURCEW(IDD_DOWNLOAD), nullptr, BareProc, 0);
  });
  double full = bench::MedianFirstPaint(rounds, [&] {
    CDownloadProgressDialog dialog(nullptr, level, L"C:\\nowhere\\TKF0");
    dialog.DoModal();
  });

  std::printf("creation to first paint, median of %d (ms)\n", rounds);
  std::printf("  bare template:           %8.2f\n", bare);
  std::printf("  CDownloadProgressDialog: %8.2f\n", full);
  if (bare > 0 && full > 0) std::printf("  ratio dialog/bare:       %8.2f\n", full / bare);
  OleUninitialize();
  return 0;
}
