// Waiting for windows and reading them, for the threads that drive modal dialogs.
#pragma once
#include <windows.h>

#include <string>

namespace ui {

// Every wait gives up after 10 s, so a failing test cannot hang.
template <class Condition>
bool WaitFor(Condition condition) {
  for (ULONGLONG end = GetTickCount64() + 10000; !condition(); Sleep(20))
    if (GetTickCount64() > end) return false;
  return true;
}

inline std::wstring Text(HWND window, int id = -1) {  // of control `id`, or of the window itself
  wchar_t text[2048] = {};
  GetWindowTextW(id < 0 ? window : GetDlgItem(window, id), text, 2048);
  return text;
}

inline HWND OwnedDialog(HWND owner) {  // a visible dialog window or message box of this process
  DWORD process = 0;
  for (HWND found = nullptr; (found = FindWindowExW(nullptr, found, L"#32770", nullptr)) != nullptr;)
    if (GetWindow(found, GW_OWNER) == owner && IsWindowVisible(found) && GetWindowThreadProcessId(found, &process) &&
        process == GetCurrentProcessId())
      return found;
  return nullptr;
}

}  // namespace ui
