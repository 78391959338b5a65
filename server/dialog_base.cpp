#include "server/dialog_base.h"

#include "base/boundary.h"
#include "base/module_instance.h"

std::wstring WindowText(HWND window) {
  int length = GetWindowTextLengthW(window);
  if (length <= 0) return {};
  std::wstring text(static_cast<size_t>(length) + 1, L'\0');
  int copied = GetWindowTextW(window, text.data(), length + 1);
  text.resize(copied > 0 ? static_cast<size_t>(copied) : 0);
  return text;
}

CDialog::CDialog(UINT templateId, HWND parent) noexcept : templateId_(templateId), parent_(parent) {}

CDialog::~CDialog() = default;

INT_PTR CDialog::DoModal() {
  return DialogBoxParamW(ModuleInstance(), MAKEINTRESOURCEW(templateId_), parent_, DialogProc,
                         reinterpret_cast<LPARAM>(this));
}

bool CDialog::UpdateData(bool toControls) {
  if (!window_) return false;
  DoDataExchange(toControls);
  return true;
}

void CDialog::EndDialog(INT_PTR result) {
  if (window_) ::EndDialog(window_, result);
}

void CDialog::DoDataExchange(bool) {}

BOOL CDialog::OnInitDialog() {
  UpdateData(true);
  return TRUE;
}

void CDialog::OnOK() {
  if (UpdateData(false)) EndDialog(IDOK);
}

void CDialog::OnCancel() { EndDialog(IDCANCEL); }

bool CDialog::OnCommand(WPARAM wParam, LPARAM) {
  UINT id = LOWORD(wParam);
  UINT code = HIWORD(wParam);
  // Buttons notify BN_CLICKED (0), the same value menus and accelerators carry.
  if (code == BN_CLICKED || code == 1) {
    for (const CommandEntry& entry : commands_) {
      if (entry.id == id) {
        entry.handler();
        return true;
      }
    }
  }
  if (id == IDOK) {
    OnOK();
    return true;
  }
  if (id == IDCANCEL) {
    OnCancel();
    return true;
  }
  return false;
}

void CDialog::PostNcDestroy() {}

void CDialog::MapCommand(UINT id, std::function<void()> handler) {
  commands_.push_back({id, std::move(handler)});
}

void CDialog::MapMessage(UINT message, std::function<LRESULT(WPARAM, LPARAM)> handler) {
  messages_.push_back({message, std::move(handler)});
}

void CDialog::DdxText(bool toControls, int id, std::wstring& value) { ddx::Text(window_, toControls, id, value); }
void CDialog::DdxComboIndex(bool toControls, int id, int& index) { ddx::ComboIndex(window_, toControls, id, index); }
void CDialog::DdxComboExact(bool toControls, int id, std::wstring& value) {
  ddx::ComboExact(window_, toControls, id, value);
}
void CDialog::DdxComboPrefix(bool toControls, int id, std::wstring& value) {
  ddx::ComboPrefix(window_, toControls, id, value);
}

namespace ddx {
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

void Text(HWND dialog, bool toControls, int id, std::wstring& value) {
  HWND control = GetDlgItem(dialog, id);
  if (!control) return;
  if (toControls) SetWindowTextW(control, value.c_str());
  else value = WindowText(control);
}

void ComboIndex(HWND dialog, bool toControls, int id, int& index) {
  HWND combo = GetDlgItem(dialog, id);
  if (!combo) return;
  if (toControls) SendMessageW(combo, CB_SETCURSEL, static_cast<WPARAM>(index), 0);
  else index = static_cast<int>(SendMessageW(combo, CB_GETCURSEL, 0, 0));
}

void ComboExact(HWND dialog, bool toControls, int id, std::wstring& value) {
  HWND combo = GetDlgItem(dialog, id);
  if (!combo) return;
  if (!toControls) {
    value = ComboText(combo);
    return;
  }
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

void ComboPrefix(HWND dialog, bool toControls, int id, std::wstring& value) {
  HWND combo = GetDlgItem(dialog, id);
  if (!combo) return;
  if (!toControls) {
    value = ComboText(combo);
    return;
  }
  LRESULT found = SendMessageW(combo, CB_SELECTSTRING, static_cast<WPARAM>(-1), reinterpret_cast<LPARAM>(value.c_str()));
  if (found == CB_ERR) KeepUnmatchedText(combo, value);
}
}  // namespace ddx

bool CDialog::Dispatch(UINT message, WPARAM wParam, LPARAM lParam, INT_PTR& result) {
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
    case WM_COMMAND:
      result = OnCommand(wParam, lParam) ? TRUE : FALSE;
      return true;
    default:
      return false;
  }
}

// A handler that throws gets the default handling: FALSE, not processed.
INT_PTR CALLBACK CDialog::DialogProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  return boundary::CallOr<INT_PTR>(FALSE, [&] { return Route(window, message, wParam, lParam); });
}

INT_PTR CDialog::Route(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  CDialog* self;
  if (message == WM_INITDIALOG) {
    self = reinterpret_cast<CDialog*>(lParam);
    SetWindowLongPtrW(window, DWLP_USER, lParam);
    self->window_ = window;
  } else {
    self = reinterpret_cast<CDialog*>(GetWindowLongPtrW(window, DWLP_USER));
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
}
