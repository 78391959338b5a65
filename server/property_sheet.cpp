#include "server/property_sheet.h"

#include "base/boundary.h"
#include "base/module_instance.h"
#include "server/dialog_base.h"

namespace {

// The sheet whose PropertySheetW call is running on this thread: the callback has no
// parameter of ours, and modal sheets nest only through their own message loops.
thread_local CPropertySheet* constructingSheet = nullptr;

}  // namespace

int CComboBox::AddString(const std::wstring& text) const {
  return static_cast<int>(SendMessageW(window_, CB_ADDSTRING, 0, reinterpret_cast<LPARAM>(text.c_str())));
}

bool CPropertyPage::UpdateData(bool toControls) {
  if (!window_) return false;
  DoDataExchange(toControls);
  return true;
}

void CPropertyPage::SetModified(bool changed) {
  HWND sheet = window_ ? GetParent(window_) : nullptr;
  if (!sheet) return;
  SendMessageW(sheet, changed ? PSM_CHANGED : PSM_UNCHANGED, reinterpret_cast<WPARAM>(window_), 0);
}

void CPropertyPage::DoDataExchange(bool) {}

BOOL CPropertyPage::OnInitDialog() {
  UpdateData(true);
  return TRUE;
}

void CPropertyPage::MapNotification(int id, UINT code, std::function<void()> handler) {
  notifications_.push_back({id, code, std::move(handler)});
}

INT_PTR CALLBACK CPropertyPage::PageProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  return boundary::CallOr<INT_PTR>(FALSE, [&]() -> INT_PTR {
    CPropertyPage* self;
    if (message == WM_INITDIALOG) {
      // The platform hands over its copy of our PROPSHEETPAGEW; the page rides in its lParam.
      self = reinterpret_cast<CPropertyPage*>(reinterpret_cast<const PROPSHEETPAGEW*>(lParam)->lParam);
      SetWindowLongPtrW(window, DWLP_USER, reinterpret_cast<LONG_PTR>(self));
      self->window_ = window;
    } else {
      self = reinterpret_cast<CPropertyPage*>(GetWindowLongPtrW(window, DWLP_USER));
    }
    if (!self) return FALSE;
    switch (message) {
      case WM_INITDIALOG:
        return self->OnInitDialog();
      case WM_COMMAND:
        for (const NotificationEntry& entry : self->notifications_) {
          if (entry.id == LOWORD(wParam) && entry.code == HIWORD(wParam)) {
            entry.handler();
            return TRUE;
          }
        }
        return FALSE;
      case WM_NCDESTROY:
        SetWindowLongPtrW(window, DWLP_USER, 0);
        self->window_ = nullptr;
        return FALSE;
      default:
        return FALSE;
    }
  });
}

CPropertySheet::CPropertySheet(UINT captionId, HWND parent, UINT startPage) noexcept
    : captionId_(captionId), parent_(parent), startPage_(startPage) {}

void CPropertySheet::AddPage(CPropertyPage* page) { pages_.push_back(page); }

INT_PTR CPropertySheet::DoModal() {
  std::vector<PROPSHEETPAGEW> pageInfos;
  for (CPropertyPage* page : pages_) {
    PROPSHEETPAGEW info{};
    info.dwSize = sizeof info;
    info.dwFlags = PSP_DEFAULT;
    info.hInstance = ModuleInstance();
    info.pszTemplate = MAKEINTRESOURCEW(page->templateId_);
    info.pfnDlgProc = CPropertyPage::PageProc;
    info.lParam = reinterpret_cast<LPARAM>(page);
    pageInfos.push_back(info);
  }
  PROPSHEETHEADERW header{};
  header.dwSize = sizeof header;
  header.dwFlags = PSH_PROPSHEETPAGE | PSH_USECALLBACK;
  header.hwndParent = parent_;
  header.hInstance = ModuleInstance();
  header.pszCaption = MAKEINTRESOURCEW(captionId_);
  header.nPages = static_cast<UINT>(pageInfos.size());
  header.nStartPage = startPage_;
  header.ppsp = pageInfos.data();
  header.pfnCallback = SheetCallback;

  endedWithOk_ = false;
  CPropertySheet* outer = constructingSheet;
  constructingSheet = this;
  INT_PTR result = PropertySheetW(&header);
  constructingSheet = outer;
  window_ = nullptr;
  if (result < 0) return -1;
  return endedWithOk_ ? IDOK : IDCANCEL;
}

int CALLBACK CPropertySheet::SheetCallback(HWND window, UINT message, LPARAM) {
  return boundary::CallOr(0, [&] {
    CPropertySheet* self = constructingSheet;
    if (message != PSCB_INITIALIZED || !self || self->window_) return 0;
    constructingSheet = nullptr;  // a sheet opened from inside this one finds its own
    self->window_ = window;
    SetPropW(window, L"MarlixPropertySheet", self);
    self->platformProc_ = reinterpret_cast<WNDPROC>(
        SetWindowLongPtrW(window, GWLP_WNDPROC, reinterpret_cast<LONG_PTR>(SheetProc)));
    self->OnInitDialog();
    return 0;
  });
}

LRESULT CALLBACK CPropertySheet::SheetProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  auto* self = static_cast<CPropertySheet*>(GetPropW(window, L"MarlixPropertySheet"));
  if (!self) return DefWindowProcW(window, message, wParam, lParam);  // never: the property lives as long
  WNDPROC platform = self->platformProc_;
  return boundary::CallOr<LRESULT>(0, [&]() -> LRESULT {
    switch (message) {
      case WM_COMMAND:
        self->OnCommand(wParam, lParam);
        return 0;
      case WM_NCDESTROY:
        RemovePropW(window, L"MarlixPropertySheet");
        SetWindowLongPtrW(window, GWLP_WNDPROC, reinterpret_cast<LONG_PTR>(platform));
        self->window_ = nullptr;
        return CallWindowProcW(platform, window, message, wParam, lParam);
      default:
        return CallWindowProcW(platform, window, message, wParam, lParam);
    }
  });
}

BOOL CPropertySheet::OnCommand(WPARAM wParam, LPARAM lParam) {
  CallWindowProcW(platformProc_, window_, WM_COMMAND, wParam, lParam);
  // The platform lets go of its current page once OK has been accepted by every page.
  if (LOWORD(wParam) == IDOK && window_ && !SendMessageW(window_, PSM_GETCURRENTPAGEHWND, 0, 0))
    endedWithOk_ = true;
  return TRUE;
}

BOOL CPropertySheet::OnInitDialog() { return TRUE; }
