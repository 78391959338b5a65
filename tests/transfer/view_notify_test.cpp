// Change broadcasts reach each view through its hidden notify window.
#include <gtest/gtest.h>

#include "shell/view_notify.h"

namespace {

struct Received {
  int count = 0;
  WPARAM wParam = 0;
  LPARAM lParam = 0;
};

LRESULT CALLBACK ViewProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  auto* received = reinterpret_cast<Received*>(GetWindowLongPtrW(window, GWLP_USERDATA));
  if (received && message == GlobalNotifyMessage) *received = {received->count + 1, wParam, lParam};
  return DefWindowProcW(window, message, wParam, lParam);
}

// A window that a broadcast never reaches by itself, like a view inside a browser.
HWND MakeView(Received* received) {
  WNDCLASSW wc{};
  wc.lpfnWndProc = ViewProc;
  wc.hInstance = GetModuleHandleW(nullptr);
  wc.lpszClassName = L"NotifyTestView";
  RegisterClassW(&wc);
  HWND view = CreateWindowExW(0, wc.lpszClassName, L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr, wc.hInstance, nullptr);
  SetWindowLongPtrW(view, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(received));
  return view;
}

TEST(ViewNotify, BroadcastReachesEveryViewThroughItsHiddenWindow) {
  Received first, second;
  HWND firstView = MakeView(&first), secondView = MakeView(&second);
  NotifyWindowPair firstPair, secondPair;
  ASSERT_EQ(CreateNotifyWindow(firstPair, firstView), S_OK);
  ASSERT_EQ(CreateNotifyWindow(secondPair, secondView), S_OK);
  EXPECT_EQ(GetParent(firstPair.Hidden), nullptr);
  EXPECT_FALSE(IsWindowVisible(firstPair.Hidden));

  // Other registered messages take the default path and stay away from the view.
  SendMessageW(firstPair.Hidden, DownloadMessage, 1, 1);
  EXPECT_EQ(first.count, 0);

  BroadcastChange(2);
  ULONGLONG end = GetTickCount64() + 5000;
  MSG message;
  while ((first.count == 0 || second.count == 0) && GetTickCount64() < end) {
    while (PeekMessageW(&message, nullptr, 0, 0, PM_REMOVE)) DispatchMessageW(&message);
    Sleep(10);
  }
  EXPECT_EQ(first.count, 1);
  EXPECT_EQ(second.count, 1);
  EXPECT_EQ(first.wParam, 1u);
  EXPECT_EQ(first.lParam, 2);
  EXPECT_EQ(second.lParam, 2);

  HWND hidden = firstPair.Hidden;
  DestroyNotifyWindow(firstPair);
  EXPECT_FALSE(IsWindow(hidden));
  DestroyNotifyWindow(firstPair);  // a second time is harmless
  DestroyNotifyWindow(secondPair);
  DestroyWindow(firstView);
  DestroyWindow(secondView);
}

}  // namespace
