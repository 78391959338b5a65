#include "base/dialog_base.h"

#include "base/boundary.h"
#include "base/module_instance.h"

namespace {

std::wstring ItemText(HWND combo, LRESULT index) {
  LRESULT length = SendMessageW(combo, CB_GETLBTEXTLEN, static_cast<WPARAM>(index), 0);
  if (length == CB_ERR) return {};
  std::wstring text(static_cast<size_t>(length) + 1, L'\0');
  LRESULT copied = SendMessageW(combo, CB_GETLBTEXT, static_cast<WPARAM>(index), reinterpret_cast<LPARAM>(text.data()));
  text.resize(copied > 0 ? static_cast<size_t>(copied) : 0);
  return text;
}

std::wstring ComboText(HWND combo) {
  LRESULT selection = SendMessageW(combo, CB_GETCURSEL, 0, 0);
  return selection == CB_ERR ? WindowText(combo) : ItemText(combo, selection);
}

// A drop-down list has no edit part to keep a text that no item matches.
void KeepUnmatchedText(HWND combo, const std::wstring& value) {
  if ((GetWindowLongW(combo, GWL_STYLE) & 3) != CBS_DROPDOWNLIST) SetWindowTextW(combo, value.c_str());
}

}  // namespace

std::wstring WindowText(HWND window) {
  int length = GetWindowTextLengthW(window);
  if (length <= 0) return {};
  std::wstring text(static_cast<size_t>(length) + 1, L'\0');
  int copied = GetWindowTextW(window, text.data(), length + 1);
  text.resize(copied > 0 ? static_cast<size_t>(copied) : 0);
  return text;
}

bool CDialogWindow::UpdateData(bool toControls) {
  if (!window_) return false;
  DoDataExchange(toControls);
  return true;
}

void CDialogWindow::DoDataExchange(bool) {}

BOOL CDialogWindow::OnInitDialog() {
  UpdateData(true);
  return TRUE;
}

bool CDialogWindow::OnCommand(WPARAM, LPARAM) { return false; }

void CDialogWindow::PostNcDestroy() {}

void CDialogWindow::MapCommand(UINT id, std::function<void()> handler) {
  commands_.push_back({id, kClick, std::move(handler)});
}

void CDialogWindow::MapNotification(UINT id, UINT code, std::function<void()> handler) {
  commands_.push_back({id, code, std::move(handler)});
}

void CDialogWindow::MapMessage(UINT message, std::function<LRESULT(WPARAM, LPARAM)> handler) {
  messages_.push_back({message, std::move(handler)});
}

void CDialogWindow::DdxText(bool toControls, int id, std::wstring& value) {
  HWND control = Item(id);
  if (!control) return;
  if (toControls) SetWindowTextW(control, value.c_str());
  else value = WindowText(control);
}

HWND CDialogWindow::ComboToFill(bool toControls, int id, std::wstring& value) {
  HWND combo = Item(id);
  if (combo && !toControls) value = ComboText(combo);
  return toControls ? combo : nullptr;
}

void CDialogWindow::DdxComboExact(bool toControls, int id, std::wstring& value) {
  HWND combo = ComboToFill(toControls, id, value);
  if (!combo) return;
  // CB_FINDSTRINGEXACT ignores case: walk its matches until one equals the text.
  LRESULT first = SendMessageW(combo, CB_FINDSTRINGEXACT, static_cast<WPARAM>(-1), reinterpret_cast<LPARAM>(value.c_str()));
  for (LRESULT found = first; found != CB_ERR;) {
    if (ItemText(combo, found) == value) {
      SendMessageW(combo, CB_SETCURSEL, static_cast<WPARAM>(found), 0);
      return;
    }
    found = SendMessageW(combo, CB_FINDSTRINGEXACT, static_cast<WPARAM>(found), reinterpret_cast<LPARAM>(value.c_str()));
    if (found <= first) break;  // the search wraps around
  }
  KeepUnmatchedText(combo, value);
}

void CDialogWindow::DdxComboPrefix(bool toControls, int id, std::wstring& value) {
  HWND combo = ComboToFill(toControls, id, value);
  if (!combo) return;
  LRESULT found = SendMessageW(combo, CB_SELECTSTRING, static_cast<WPARAM>(-1), reinterpret_cast<LPARAM>(value.c_str()));
  if (found == CB_ERR) KeepUnmatchedText(combo, value);
}

bool CDialogWindow::Dispatch(UINT message, WPARAM wParam, LPARAM lParam, INT_PTR& result) {
  for (const MessageEntry& entry : messages_) {
    if (entry.message == message && message != 0) {  // 0: a registration that failed
      LRESULT answer = entry.handler(wParam, lParam);
      if (window_) SetWindowLongPtrW(window_, DWLP_MSGRESULT, answer);
      result = TRUE;
      return true;
    }
  }
  switch (message) {
    case WM_INITDIALOG:
      result = OnInitDialog();
      return true;
    case WM_COMMAND: {
      const UINT id = LOWORD(wParam), code = HIWORD(wParam);
      // Buttons notify BN_CLICKED (0), the same value menus carry; accelerators carry 1.
      for (const CommandEntry& entry : commands_) {
        if (entry.id == id && (entry.code == code || (entry.code == kClick && (code == BN_CLICKED || code == 1)))) {
          entry.handler();
          result = TRUE;
          return true;
        }
      }
      result = OnCommand(wParam, lParam) ? TRUE : FALSE;
      return true;
    }
    default:
      return false;
  }
}

INT_PTR CDialogWindow::Route(CDialogWindow* arriving, HWND window, UINT message, WPARAM wParam,
                             LPARAM lParam) noexcept {
  return boundary::CallOr<INT_PTR>(FALSE, [&]() -> INT_PTR {
    CDialogWindow* self;
    if (message == WM_INITDIALOG) {
      self = arriving;
      SetWindowLongPtrW(window, DWLP_USER, reinterpret_cast<LONG_PTR>(self));
      if (self) self->window_ = window;
    } else {
      self = reinterpret_cast<CDialogWindow*>(GetWindowLongPtrW(window, DWLP_USER));
    }
    if (!self) return FALSE;  // messages before WM_INITDIALOG, such as WM_SETFONT
    if (message == WM_NCDESTROY) {
      SetWindowLongPtrW(window, DWLP_USER, 0);
      self->window_ = nullptr;
      self->PostNcDestroy();
      return FALSE;
    }
    INT_PTR result = FALSE;
    return self->Dispatch(message, wParam, lParam, result) ? result : FALSE;
  });
}

INT_PTR CDialog::DoModal() {
  return DialogBoxParamW(ModuleInstance(), MAKEINTRESOURCEW(templateId_), parent_, DialogProc,
                         reinterpret_cast<LPARAM>(this));
}

void CDialog::EndDialog(INT_PTR result) {
  if (Handle()) ::EndDialog(Handle(), result);
}

void CDialog::OnOK() {
  if (UpdateData(false)) EndDialog(IDOK);
}

void CDialog::OnCancel() { EndDialog(IDCANCEL); }

bool CDialog::OnCommand(WPARAM wParam, LPARAM) {
  switch (LOWORD(wParam)) {
    case IDOK:
      OnOK();
      return true;
    case IDCANCEL:
      OnCancel();
      return true;
    default:
      return false;
  }
}

INT_PTR CALLBACK CDialog::DialogProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept {
  CDialogWindow* arriving = message == WM_INITDIALOG ? reinterpret_cast<CDialog*>(lParam) : nullptr;
  return Route(arriving, window, message, wParam, lParam);
}
