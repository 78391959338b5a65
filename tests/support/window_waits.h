// Waiting for windows, driving them as a person would, and pictures of what the screen shows.
#pragma once
#include <windows.h>
#include <filesystem>
#include <fstream>
#include <string>
namespace ui {
// Waits without handling messages, for a thread beside the one that owns the windows.
// Gives up after `milliseconds`, so a failing test cannot hang.
template <class Condition>
bool WaitFor(Condition condition, DWORD milliseconds = 10000) {
  for (ULONGLONG end = GetTickCount64() + milliseconds; !condition(); Sleep(20))
    if (GetTickCount64() > end) return false;
  return true;
}
// Waits while handling this thread's messages, for the thread that owns the windows.
template <class Condition>
bool PumpFor(Condition condition, DWORD milliseconds = 30000) {
  for (ULONGLONG end = GetTickCount64() + milliseconds; !condition();) {
    if (GetTickCount64() > end) return false;
    MsgWaitForMultipleObjects(0, nullptr, FALSE, 10, QS_ALLINPUT);
    for (MSG msg; PeekMessageW(&msg, nullptr, 0, 0, PM_REMOVE);) {
      TranslateMessage(&msg);
      DispatchMessageW(&msg);
    }
  }
  return true;
}
inline std::wstring Text(HWND window, int id = -1) {  // of control `id`, or of the window itself
  wchar_t text[2048] = {};
  GetWindowTextW(id < 0 ? window : GetDlgItem(window, id), text, 2048);
  return text;
}
inline bool OfThisProcess(HWND window) {
  DWORD process = 0;
  return IsWindowVisible(window) && GetWindowThreadProcessId(window, &process) && process == GetCurrentProcessId();
}
inline HWND OwnedDialog(HWND owner) {  // a visible dialog window or message box of this process
  for (HWND found = nullptr; (found = FindWindowExW(nullptr, found, L"#32770", nullptr)) != nullptr;)
    if (GetWindow(found, GW_OWNER) == owner && OfThisProcess(found)) return found;
  return nullptr;
}
inline HWND DialogWith(int control) {  // a visible dialog of this process with a child of id `control`
  for (HWND found = nullptr; (found = FindWindowExW(nullptr, found, L"#32770", nullptr)) != nullptr;)
    if (OfThisProcess(found) && GetDlgItem(found, control)) return found;
  return nullptr;
}
// True once the window and its children have nothing left to paint.
inline bool Painted(HWND window) {
  if (GetUpdateRect(window, nullptr, FALSE)) return false;
  for (HWND c = GetWindow(window, GW_CHILD); c; c = GetWindow(c, GW_HWNDNEXT))
    if (IsWindowVisible(c) && !Painted(c)) return false;
  return true;
}
inline POINT Centre(HWND window) {
  RECT rect{};
  GetWindowRect(window, &rect);
  return {(rect.left + rect.right) / 2, (rect.top + rect.bottom) / 2};
}
// Real mouse input: `flags` at `at` on the screen; a move waits until the pointer is there.
inline bool Mouse(DWORD flags, POINT at) {
  INPUT input{INPUT_MOUSE};
  input.mi.dx = at.x * 65535 / (GetSystemMetrics(SM_CXSCREEN) - 1);
  input.mi.dy = at.y * 65535 / (GetSystemMetrics(SM_CYSCREEN) - 1);
  input.mi.dwFlags = flags | MOUSEEVENTF_MOVE | MOUSEEVENTF_ABSOLUTE;
  SendInput(1, &input, sizeof(input));
  return WaitFor([&] {
    POINT now{};
    return GetCursorPos(&now) && now.x == at.x && now.y == at.y;
  }, 2000);
}
inline void Click(POINT at, int times = 1) {
  Mouse(0, at);
  for (int i = 0; i < times; ++i) {
    Mouse(MOUSEEVENTF_LEFTDOWN, at);
    Mouse(MOUSEEVENTF_LEFTUP, at);
  }
}
// Presses at `from`, moves in steps to `to` and lets go there. The system's drag loop reads the
// pointer on its own clock and shows nothing a test could wait on, so the steps are paced.
inline void Drag(POINT from, POINT to, int steps = 20) {
  Mouse(0, from);
  Sleep(200);  // as a hand rests on the item: the press must find the row under the pointer
  Mouse(MOUSEEVENTF_LEFTDOWN, from);
  for (int i = 1; i <= steps; ++i) {
    Sleep(40);
    Mouse(0, {from.x + (to.x - from.x) * i / steps, from.y + (to.y - from.y) * i / steps});
  }
  Sleep(200);
  Mouse(MOUSEEVENTF_LEFTUP, to);
}
// What the screen shows in `area`, saved as a 24-bit BMP; false if it could not be written.
inline bool Screenshot(const RECT& area, const std::wstring& path) {
  const int width = area.right - area.left, height = area.bottom - area.top, size = (width * 3 + 3) / 4 * 4 * height;
  BITMAPINFOHEADER info{sizeof info, width, height, 1, 24, BI_RGB};
  HDC screen = GetDC(nullptr), memory = CreateCompatibleDC(screen);
  void* bits = nullptr;
  HBITMAP bitmap = CreateDIBSection(screen, reinterpret_cast<BITMAPINFO*>(&info), DIB_RGB_COLORS, &bits, nullptr, 0);
  HGDIOBJ old = SelectObject(memory, bitmap);
  BitBlt(memory, 0, 0, width, height, screen, area.left, area.top, SRCCOPY);
  GdiFlush();
  BITMAPFILEHEADER file{0x4D42, DWORD(sizeof file + sizeof info + size), 0, 0, sizeof file + sizeof info};
  std::ofstream out(std::filesystem::path(path), std::ios::binary);
  out.write(reinterpret_cast<const char*>(&file), sizeof file).write(reinterpret_cast<const char*>(&info), sizeof info);
  out.write(static_cast<const char*>(bits), size);
  SelectObject(memory, old);
  DeleteObject(bitmap);
  DeleteDC(memory);
  ReleaseDC(nullptr, screen);
  return out.good();
}
// Text typed into an edit control, replacing what it held.
inline void Type(HWND edit, const wchar_t* text) {
  SendMessageW(edit, EM_SETSEL, 0, -1);
  for (const wchar_t* c = text; *c; ++c) SendMessageW(edit, WM_CHAR, *c, 0);
}
}  // namespace ui
