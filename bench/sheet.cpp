// Time from DoModal to the level sheet's first paint, with 8 serial ports and 10,000 levels
// in the store, against a bare PropertySheetW of the same two templates with empty page procedures.
// The registry roots are redirected onto scratch keys for the run.
#include <windows.h>
#include <commctrl.h>
#include <ole2.h>

#include <cstdio>
#include <string>

#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "bench/bench_support.h"
#include "config/station_dialog.h"

namespace {

INT_PTR CALLBACK BarePageProc(HWND, UINT message, WPARAM, LPARAM) { return message == WM_INITDIALOG; }

void BareSheet() {
  PROPSHEETPAGEW pages[2] = {};
  for (int i = 0; i < 2; ++i) {
    pages[i].dwSize = sizeof pages[i];
    pages[i].hInstance = ModuleInstance();
    pages[i].pszTemplate = MAKEINTRESOURCEW(i == 0 ? IDD_STATION_GENERAL : IDD_STATION_ADVANCED);
    pages[i].pfnDlgProc = BarePageProc;
  }
  PROPSHEETHEADERW header{};
  header.dwSize = sizeof header;
  header.dwFlags = PSH_PROPSHEETPAGE;
  header.hInstance = ModuleInstance();
  header.pszCaption = MAKEINTRESOURCEW(IDS_LEVEL_PROPERTIES);
  header.nPages = 2;
  header.ppsp = pages;
  PropertySheetW(&header);
}

HKEY Scratch(const std::wstring& path) {
  RegDeleteTreeW(HKEY_CURRENT_USER, path.c_str());
  HKEY key = nullptr;
  RegCreateKeyExW(HKEY_CURRENT_USER, path.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &key, nullptr);
  return key;
}

void FillStore() {
  HKEY ports = nullptr;
  RegCreateKeyExW(HKEY_LOCAL_MACHINE, L"HARDWARE\\DEVICEMAP\\SERIALCOMM", 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &ports,
                  nullptr);
  for (int i = 1; i <= 8; ++i) {
    std::wstring name = L"\\Device\\Serial" + std::to_wstring(i), port = L"COM" + std::to_wstring(i);
    RegSetValueExW(ports, name.c_str(), 0, REG_SZ, reinterpret_cast<const BYTE*>(port.c_str()),
                   DWORD((port.size() + 1) * sizeof(wchar_t)));
  }
  RegCloseKey(ports);
  // Written key by key: AddStation would search the growing store 10,000 times.
  for (int i = 0; i < 10000; ++i) {
    CStationRecord level;
    level.Name = L"Level " + std::to_wstring(i);
    HKEY key = nullptr;
    std::wstring path = GetLevelsKeyName() + L"\\Station " + std::to_wstring(i);
    RegCreateKeyExW(HKEY_CURRENT_USER, path.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &key, nullptr);
    WriteStation(level, key);
    RegCloseKey(key);
  }
}

}  // namespace

int main() {
  OleInitialize(nullptr);
  const std::wstring base = L"Software\\MarlixBenchScratch\\" + std::to_wstring(GetCurrentProcessId());
  HKEY user = Scratch(base + L"\\user"), machine = Scratch(base + L"\\machine");
  RegOverridePredefKey(HKEY_LOCAL_MACHINE, machine);
  RegOverridePredefKey(HKEY_CURRENT_USER, user);
  FillStore();

  const int rounds = 9;
  CStationRecord level;
  level.Name = L"Level 9999";
  FindStation(level);
  double bare = bench::MedianFirstPaint(rounds, [] { BareSheet(); });
  double full = bench::MedianFirstPaint(rounds, [&] {
    CStationDialog dialog(nullptr, level, false);
    dialog.DoModal();
  });

  RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
  RegOverridePredefKey(HKEY_LOCAL_MACHINE, nullptr);
  RegCloseKey(user);
  RegCloseKey(machine);
  RegDeleteTreeW(HKEY_CURRENT_USER, base.c_str());

  std::printf("DoModal to first paint, 8 serial ports, 10,000 levels, median of %d (ms)\n", rounds);
  std::printf("  bare PropertySheetW:  %8.2f\n", bare);
  std::printf("  CStationDialog:       %8.2f\n", full);
  if (bare > 0 && full > 0) std::printf("  ratio sheet/bare:     %8.2f\n", full / bare);
  OleUninitialize();
  return 0;
}
