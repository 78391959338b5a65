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

using ui::OwnedDialog;
using ui::Text;
using ui::WaitFor;
using Strings = std::vector<std::wstring>;

// The page window at `index`, null while the page was never shown.
inline HWND Page(HWND sheet, int index) {
  return reinterpret_cast<HWND>(SendMessageW(sheet, PSM_INDEXTOHWND, static_cast<WPARAM>(index), 0));
}
inline void ShowTab(HWND sheet, int index) { SendMessageW(sheet, PSM_SETCURSEL, static_cast<WPARAM>(index), 0); }
inline void Press(HWND sheet, int id) { user::Click(sheet, id); }
inline bool ApplyEnabled(HWND sheet) { return IsWindowEnabled(GetDlgItem(sheet, 12321)) != FALSE; }
inline std::wstring TabText(HWND sheet, int index) {
  wchar_t text[64] = {};
  TCITEMW item{.mask = TCIF_TEXT, .pszText = text, .cchTextMax = 64};
  SendMessageW(reinterpret_cast<HWND>(SendMessageW(sheet, PSM_GETTABCONTROL, 0, 0)), TCM_GETITEMW, index,
               reinterpret_cast<LPARAM>(&item));
  return text;
}

// Replaces the edit's text key by key; an empty text is a backspace over everything.
inline void Type(HWND page, int id, const std::wstring& text) {
  HWND edit = GetDlgItem(page, id);
  SendMessageW(edit, EM_SETSEL, 0, -1);
  if (text.empty()) SendMessageW(edit, WM_CHAR, VK_BACK, 0);
  for (wchar_t c : text) SendMessageW(edit, WM_CHAR, c, 0);
}

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

// Whether `window` and every window in it have painted what they show.
inline bool Painted(HWND window) {
  BOOL painted = !GetUpdateRect(window, nullptr, FALSE);
  EnumChildWindows(window, [](HWND child, LPARAM all) {
    if (GetUpdateRect(child, nullptr, FALSE)) *reinterpret_cast<BOOL*>(all) = FALSE;
    return TRUE;
  }, reinterpret_cast<LPARAM>(&painted));
  return painted != FALSE;
}

// Saves what the screen shows of `window`, once painted, as a 24-bit BMP (for the pictures in docs/).
inline bool SaveScreenshot(HWND window, const std::wstring& path) {
  if (!WaitFor([&] { return Painted(window); })) return false;
  RECT r{};
  GetWindowRect(window, &r);
  const int width = r.right - r.left, height = r.bottom - r.top, stride = (width * 3 + 3) & ~3;
  BITMAPINFOHEADER info{sizeof info, width, height, 1, 24, BI_RGB};
  std::vector<BYTE> pixels(static_cast<size_t>(stride) * height);
  HDC screen = GetDC(nullptr), memory = CreateCompatibleDC(screen);
  HBITMAP bitmap = CreateCompatibleBitmap(screen, width, height);
  HGDIOBJ old = SelectObject(memory, bitmap);
  BitBlt(memory, 0, 0, width, height, screen, r.left, r.top, SRCCOPY);
  SelectObject(memory, old);
  GetDIBits(memory, bitmap, 0, height, pixels.data(), reinterpret_cast<BITMAPINFO*>(&info), DIB_RGB_COLORS);
  DeleteObject(bitmap);
  DeleteDC(memory);
  ReleaseDC(nullptr, screen);
  BITMAPFILEHEADER file{0x4D42, DWORD(sizeof file + sizeof info + pixels.size()), 0, 0, sizeof file + sizeof info};
  HANDLE out = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  if (out == INVALID_HANDLE_VALUE) return false;
  DWORD written = 0;
  bool ok = WriteFile(out, &file, sizeof file, &written, nullptr) && WriteFile(out, &info, sizeof info, &written, nullptr) &&
            WriteFile(out, pixels.data(), DWORD(pixels.size()), &written, nullptr);
  CloseHandle(out);
  return ok;
}

// Pictures of both pages of a sheet over a sample level, into the folder named by
// MARLIX_SCREENSHOTS, as <prefix>-general.bmp and <prefix>-advanced.bmp.
inline void TakeScreenshots(const std::wstring& prefix) {
  wchar_t folder[MAX_PATH] = {};
  if (!GetEnvironmentVariableW(L"MARLIX_SCREENSHOTS", folder, MAX_PATH)) GTEST_SKIP() << "MARLIX_SCREENSHOTS not set";
  SetSerialPorts({{L"\\Device\\Serial0", L"COM1"}, {L"\\Device\\Serial1", L"COM3"}});
  CStationRecord level;
  level.Name = L"North benchmark line", level.Manufacturer = L"Tripod 4, spare battery", level.Port = 3;
  level.Parity = 1, level.BaudRate = 19200;
  ASSERT_EQ(AddStation(level), S_OK);
  RunSheet(level, false, [&](HWND window) {
    SetWindowPos(window, HWND_TOP, 20, 20, 0, 0, SWP_NOSIZE);
    EXPECT_TRUE(SaveScreenshot(window, std::wstring(folder) + L"\\" + prefix + L"-general.bmp"));
    ShowTab(window, 1);
    EXPECT_TRUE(SaveScreenshot(window, std::wstring(folder) + L"\\" + prefix + L"-advanced.bmp"));
    Press(window, IDCANCEL);
  });
}

}  // namespace sheet
