#include "base/property_sheet.h"

#include "base/boundary.h"
#include "base/module_instance.h"

namespace {

// The sheet whose PropertySheetW call is running on this thread: the callback has no
// parameter of ours, and modal sheets nest only through their own message loops.
thread_local CPropertySheet* constructingSheet = nullptr;

constexpr wchar_t kSheetProperty[] = L"MarlixPropertySheet";

}  // namespace

int CComboBox::AddString(const std::wstring& text) const {
  return static_cast<int>(SendMessageW(window_, CB_ADDSTRING, 0, reinterpret_cast<LPARAM>(text.c_str())));
}

void CPropertyPage::SetModified(bool changed) {
  HWND sheet = Handle() ? GetParent(Handle()) : nullptr;
  if (!sheet) return;
  SendMessageW(sheet, changed ? PSM_CHANGED : PSM_UNCHANGED, reinterpret_cast<WPARAM>(Handle()), 0);
}

// The platform hands over its copy of our PROPSHEETPAGEW; the page rides in its lParam.
INT_PTR CALLBACK CPropertyPage::PageProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept {
  CDialogWindow* arriving = nullptr;
  if (message == WM_INITDIALOG && lParam)
    arriving = reinterpret_cast<CPropertyPage*>(reinterpret_cast<const PROPSHEETPAGEW*>(lParam)->lParam);
  return Route(arriving, window, message, wParam, lParam);
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

int CALLBACK CPropertySheet::SheetCallback(HWND window, UINT message, LPARAM) noexcept {
  return boundary::CallOr(0, [&] {
    CPropertySheet* self = constructingSheet;
    if (message != PSCB_INITIALIZED || !self || self->window_) return 0;
    constructingSheet = nullptr;  // a sheet opened from inside this one finds its own
    self->window_ = window;
    SetPropW(window, kSheetProperty, self);
    self->platformProc_ = reinterpret_cast<WNDPROC>(
        SetWindowLongPtrW(window, GWLP_WNDPROC, reinterpret_cast<LONG_PTR>(SheetProc)));
    self->OnInitDialog();
    return 0;
  });
}

LRESULT CALLBACK CPropertySheet::SheetProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) noexcept {
  auto* self = static_cast<CPropertySheet*>(GetPropW(window, kSheetProperty));
  if (!self) return DefWindowProcW(window, message, wParam, lParam);  // never: the property lives as long
  WNDPROC platform = self->platformProc_;
  return boundary::CallOr<LRESULT>(0, [&]() -> LRESULT {
    switch (message) {
      case WM_COMMAND:
        self->OnCommand(wParam, lParam);
        return 0;
      case WM_NCDESTROY:
        RemovePropW(window, kSheetProperty);
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
