#include "shell/view_notify.h"

#include "base/boundary.h"
#include "base/module_instance.h"

void BroadcastChange(UINT lastIdType) {
  PostMessageW(HWND_BROADCAST, GlobalNotifyMessage, 1, static_cast<LPARAM>(lastIdType));
}

namespace {

LRESULT CALLBACK NotifyWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept {
  return boundary::CallWindow(window, message, wParam, lParam, [&]() -> LRESULT {
    if (message == GlobalNotifyMessage) {
      auto* pair = reinterpret_cast<NotifyWindowPair*>(GetWindowLongPtrW(window, GWLP_USERDATA));
      if (pair) {
        SendMessageW(pair->ViewWindow, message, wParam, lParam);
        return 0;
      }
    }
    return DefWindowProcW(window, message, wParam, lParam);
  });
}

}  // namespace

HRESULT CreateNotifyWindow(NotifyWindowPair& pair, HWND viewWindow) {
  pair.ViewWindow = viewWindow;
  HINSTANCE module = ModuleInstance();
  if (!RegisterModuleClass(kNotifyWindowClass, NotifyWindowProc)) return E_FAIL;
  HWND hidden = CreateWindowExW(0, kNotifyWindowClass, nullptr, 0, 0, 0, 0, 0, nullptr, nullptr,
                                module, &pair);
  if (!hidden) return E_FAIL;
  pair.Hidden = hidden;
  SetWindowLongPtrW(hidden, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(&pair));
  return S_OK;
}

void DestroyNotifyWindow(NotifyWindowPair& pair) {
  // Cut the window from the pair first: should the window outlive this call (destroyed
  // from a thread that doesn't own it), it must not reach a pair that is freed.
  if (IsWindow(pair.Hidden)) {
    SetWindowLongPtrW(pair.Hidden, GWLP_USERDATA, 0);
    DestroyWindow(pair.Hidden);
  }
  pair.Hidden = nullptr;
}
