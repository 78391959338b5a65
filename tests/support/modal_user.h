// Runs a modal window on this thread while a second thread acts as its user, so no test hangs on it.
#pragma once
#include <windows.h>
#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <string>
#include <thread>

#include "support/window_waits.h"

namespace user {

// A user's click: only on a control that shows and is enabled, and posted, so the user never
// waits for what it sets off.
inline void Click(HWND dialog, int id) {
  HWND control = GetDlgItem(dialog, id);
  if (IsWindowVisible(control) && IsWindowEnabled(control)) PostMessageW(control, BM_CLICK, 0, 0);
  else ADD_FAILURE() << "control " << id << " cannot be clicked";
}

// Closes `window` as a user in a hurry would: confirms its message boxes and cancels it.
inline void Dismiss(HWND window) {
  ui::WaitFor([&] {
    if (HWND box = ui::OwnedDialog(window)) PostMessageW(box, WM_COMMAND, IDOK, 0);
    else PostMessageW(window, WM_COMMAND, IDCANCEL, 0);
    return !IsWindow(window);
  });
}

// Runs `modal` here. Meanwhile a second thread waits up to `limitMs` for the dialog of this
// process that `owner` owns and runs `act` on it; the dialog must then close. Without `act`, no
// dialog may come up. Either failure is reported, and the dialog is closed.
inline INT_PTR RunModal(const std::function<INT_PTR()>& modal, const std::function<void(HWND)>& act,
                        HWND owner = nullptr, DWORD limitMs = 10000) {
  std::atomic<bool> done{false};
  std::thread second([&] {
    HWND window = nullptr;
    if (!ui::WaitFor([&] { return done || (window = ui::OwnedDialog(owner)) != nullptr; }, limitMs) || !window) {
      if (act) ADD_FAILURE() << "no dialog came up";
      return;
    }
    if (!act) {
      ADD_FAILURE() << "a dialog came up: " << testing::PrintToString(ui::Text(window));
      return Dismiss(window);
    }
    act(window);
    if (ui::WaitFor([&] { return !IsWindow(window); })) return;
    ADD_FAILURE() << "the dialog stayed open";
    Dismiss(window);
  });
  const INT_PTR result = modal();
  done = true;
  second.join();
  return result;
}

// A message box as its user reads it. Its icon: "error", "warning" or "".
struct Box {
  std::wstring caption, text, icon;
  bool operator==(const Box&) const = default;
};
inline void PrintTo(const Box& box, std::ostream* out) {
  *out << testing::PrintToString(box.icon + L" box \"" + box.caption + L"\": " + box.text);
}

// Waits for the message box that `owner` shows, reads it and confirms it.
inline Box ReadBox(HWND owner) {
  HWND box = nullptr;
  if (!ui::WaitFor([&] { return (box = ui::OwnedDialog(owner)) != nullptr; })) return {L"(no message box)"};
  HWND image = GetDlgItem(box, 0x14) ? GetDlgItem(box, 0x14) : GetDlgItem(box, 0x440);  // Windows' id, Wine's
  const auto icon = reinterpret_cast<HICON>(SendMessageW(image, STM_GETICON, 0, 0));
  Box read{ui::Text(box), ui::Text(box, 0xFFFF),
           icon == LoadIconW(nullptr, IDI_ERROR) ? L"error" : icon == LoadIconW(nullptr, IDI_WARNING) ? L"warning" : L""};
  PostMessageW(box, WM_COMMAND, IDOK, 0);
  ui::WaitFor([&] { return !IsWindow(box); });
  return read;
}

}  // namespace user
