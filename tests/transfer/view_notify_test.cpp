// Registered messages and change broadcasts through the hidden notify windows.
#include <gtest/gtest.h>

#include "shell/view_notify.h"

namespace {

struct Received {
  int count = 0;
  WPARAM wParam = 0;
  LPARAM lParam = 0;
};

LRESULT CALLBACK ViewProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  if (message == GlobalNotifyMessage) {
    auto* received = reinterpret_cast<Received*>(GetWindowLongPtrW(window, GWLP_USERDATA));
    ++received->count;
    received->wParam = wParam;
    received->lParam = lParam;
    return 0;
  }
  return DefWindowProcW(window, message, wParam, lParam);
}

HWND MakeView(Received* received) {
  WNDCLASSW wc{};
  wc.lpfnWndProc = ViewProc;
  wc.hInstance = GetModuleHandleW(nullptr);
  wc.lpszClassName = L"NotifyTestView";
  RegisterClassW(&wc);
  // A child-like window that a broadcast never reaches by itself.
  HWND view = CreateWindowExW(0, wc.lpszClassName, L"", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr,
                              wc.hInstance, nullptr);
  SetWindowLongPtrW(view, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(received));
  return view;
}

TEST(ViewNotify, MessagesAreRegisteredUnderTheirProtocolTexts) {
  EXPECT_EQ(GlobalNotifyMessage, RegisterWindowMessageW(L"TSShell Extension - Global Notify"));
  EXPECT_EQ(DownloadMessage,
            RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Download Message"));
  EXPECT_EQ(UploadMessage,
            RegisterWindowMessageW(L"Marlix Total Stations Shell Extension - Upload Message"));
  EXPECT_EQ(GetEnumIDListMessage, RegisterWindowMessageW(L"KLD Shell Extension - Get EnumIDList"));
  for (UINT message : {GlobalNotifyMessage, DownloadMessage, UploadMessage, GetEnumIDListMessage})
    EXPECT_GE(message, 0xC000u);
}

TEST(ViewNotify, BroadcastReachesEveryViewThroughItsHiddenWindow) {
  Received first, second;
  HWND firstView = MakeView(&first);
  HWND secondView = MakeView(&second);
  ASSERT_TRUE(firstView && secondView);
  NotifyWindowPair firstPair, secondPair;
  ASSERT_EQ(CreateNotifyWindow(firstPair, firstView), S_OK);
  ASSERT_EQ(CreateNotifyWindow(secondPair, secondView), S_OK);
  EXPECT_EQ(GetParent(firstPair.Hidden), nullptr);
  EXPECT_FALSE(IsWindowVisible(firstPair.Hidden));
  wchar_t className[64] = {};
  GetClassNameW(firstPair.Hidden, className, 64);
  EXPECT_STREQ(className, L"KLD Net Shell Extension - Notify");

  // Other messages take the default path and never reach the view.
  SendMessageW(firstPair.Hidden, WM_USER + 7, 1, 1);
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
