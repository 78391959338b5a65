// Drives the modal level sheet from a second thread as a person would: types, picks list
// entries, switches tabs and presses its buttons; reads back what the store holds.
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>
#include <vector>

#include "config/station_dialog.h"
#include "support/modal_user.h"
#include "support/registry_sandbox.h"

namespace sheet {

using Strings = std::vector<std::wstring>;

// The page window at `index`, null while the page was never shown.
inline HWND Page(HWND sheet, int index) {
  return reinterpret_cast<HWND>(SendMessageW(sheet, PSM_INDEXTOHWND, static_cast<WPARAM>(index), 0));
}
inline void ShowTab(HWND sheet, int index) { SendMessageW(sheet, PSM_SETCURSEL, static_cast<WPARAM>(index), 0); }
inline bool ApplyEnabled(HWND sheet) { return IsWindowEnabled(GetDlgItem(sheet, 12321)) != FALSE; }
// Replaces the edit's text key by key; L"\b" is a backspace over all it held.
inline void Type(HWND page, int id, const std::wstring& text) { ui::Type(GetDlgItem(page, id), text.c_str()); }

inline std::wstring Entry(HWND combo, LRESULT at) {
  wchar_t text[256] = {};
  SendMessageW(combo, CB_GETLBTEXT, static_cast<WPARAM>(at), reinterpret_cast<LPARAM>(text));
  return text;
}
inline Strings Entries(HWND page, int id) {
  Strings entries;
  for (LRESULT i = 0, n = SendDlgItemMessageW(page, id, CB_GETCOUNT, 0, 0); i < n; ++i)
    entries.push_back(Entry(GetDlgItem(page, id), i));
  return entries;
}
inline std::wstring Selected(HWND page, int id) {
  LRESULT at = SendDlgItemMessageW(page, id, CB_GETCURSEL, 0, 0);
  return at == CB_ERR ? L"<none>" : Entry(GetDlgItem(page, id), at);
}

// Chooses the entry as the list does for a click: select, then notify the page.
inline void Pick(HWND page, int id, const std::wstring& entry) {
  HWND combo = GetDlgItem(page, id);
  LRESULT at = SendMessageW(combo, CB_FINDSTRINGEXACT, static_cast<WPARAM>(-1), reinterpret_cast<LPARAM>(entry.c_str()));
  ASSERT_NE(at, CB_ERR) << "no entry " << testing::PrintToString(entry);
  SendMessageW(combo, CB_SETCURSEL, static_cast<WPARAM>(at), 0);
  SendMessageW(page, WM_COMMAND, MAKEWPARAM(id, CBN_SELCHANGE), reinterpret_cast<LPARAM>(combo));
}

// Runs the sheet modally here and `script` on a second thread, as its user.
inline INT_PTR RunSheet(CStationRecord& record, bool newLevel, const std::function<void(HWND)>& script) {
  CStationDialog dialog(nullptr, record, newLevel);
  return user::RunModal([&] { return dialog.DoModal(); }, script);
}

// Every stored level, as "name|port|baud|stop|parity|data|flow|checksum|note|model", read from the registry.
inline Strings StoredLevels() {
  Strings levels;
  HKEY key = nullptr;
  if (RegOpenKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, KEY_READ, &key) != ERROR_SUCCESS) return levels;
  wchar_t name[300];
  for (DWORD i = 0, length = 300; RegEnumKeyExW(key, i, name, &length, nullptr, nullptr, nullptr, nullptr) == 0;
       ++i, length = 300) {
    std::wstring path = GetLevelsKeyName() + L"\\" + name, line = RegReadString(HKEY_CURRENT_USER, path, L"Name");
    for (const wchar_t* value : {L"Port", L"BaudRate", L"StopBits", L"Parity", L"DataBits", L"Flow", L"CheckSum"})
      line += L"|" + std::to_wstring(static_cast<int>(RegReadDword(HKEY_CURRENT_USER, path, value)));
    line += L"|" + RegReadString(HKEY_CURRENT_USER, path, L"Manufacturer");
    line += L"|" + RegReadString(HKEY_CURRENT_USER, path, L"Model");
    levels.push_back(line);
  }
  RegCloseKey(key);
  return levels;
}

// The machine's serial ports as SERIALCOMM lists them: value name, data.
inline void SetSerialPorts(const std::vector<std::pair<std::wstring, std::wstring>>& ports) {
  const std::wstring path = L"HARDWARE\\DEVICEMAP\\SERIALCOMM";
  RegDeleteTreeW(HKEY_LOCAL_MACHINE, path.c_str());
  for (const auto& [name, port] : ports) RegWriteString(HKEY_LOCAL_MACHINE, path, name.c_str(), port);
}

}  // namespace sheet
