#include "support/browser_double.h"

#include <commctrl.h>

#include "shell/shell_view.h"

namespace {
// A popup `id` of the menu bar, as a browser merges its own; "-" is a separator.
using Entries = std::initializer_list<std::pair<UINT, const wchar_t*>>;  // no allocation: the sweep fails those
void AddPopup(HMENU bar, UINT id, const wchar_t* title, Entries entries) {
  HMENU popup = CreatePopupMenu();
  for (auto [entryId, text] : entries) {
    MENUITEMINFOW item{sizeof(item), MIIM_ID | MIIM_FTYPE | MIIM_STRING};
    item.fType = *text == L'-' ? MFT_SEPARATOR : MFT_STRING;
    item.wID = entryId;
    item.dwTypeData = const_cast<wchar_t*>(text);
    InsertMenuItemW(popup, GetMenuItemCount(popup), TRUE, &item);
  }
  MENUITEMINFOW item{sizeof(item), MIIM_ID | MIIM_SUBMENU | MIIM_STRING};
  item.wID = id;
  item.hSubMenu = popup;
  item.dwTypeData = const_cast<wchar_t*>(title);
  InsertMenuItemW(bar, GetMenuItemCount(bar), TRUE, &item);
}
// Kept where memory allows: the allocation sweep fails this process's allocations too.
template <class T, class Make>
void Record(std::vector<T>& record, Make make) noexcept {
  try {
    record.push_back(make());
  } catch (...) {
  }
}
}  // namespace

std::vector<std::wstring> MenuEntries(HMENU menu) {
  std::vector<std::wstring> entries;
  for (int i = 0; i < GetMenuItemCount(menu); ++i) {
    wchar_t text[64] = {};
    MENUITEMINFOW item{sizeof(item), MIIM_STATE | MIIM_FTYPE | MIIM_STRING};
    item.dwTypeData = text;
    item.cch = 64;
    GetMenuItemInfoW(menu, i, TRUE, &item);
    std::wstring entry = (item.fType & MFT_SEPARATOR) ? L"-" : text;
    if (item.fState & MFS_DEFAULT) entry += L" default";
    if (item.fState & MFS_GRAYED) entry += L" grey";
    if (item.fState & MFS_CHECKED) entry += L" checked";
    entries.push_back(entry);
  }
  return entries;
}

BrowserDouble::BrowserDouble() {
  WNDCLASSW wc{0, FrameProc, 0, 0, GetModuleHandleW(nullptr), nullptr, nullptr, nullptr, nullptr, kClass};
  RegisterClassW(&wc);
  frame = CreateWindowExW(0, kClass, nullptr, WS_OVERLAPPEDWINDOW, 0, 0, 600, 400, nullptr, nullptr,
                          GetModuleHandleW(nullptr), nullptr);
  SetWindowLongPtrW(frame, GWLP_USERDATA, reinterpret_cast<LONG_PTR>(this));
}

// As Explorer's frame does, what its merged menu shows and chooses goes to the active view.
LRESULT CALLBACK BrowserDouble::FrameProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
  auto* self = reinterpret_cast<BrowserDouble*>(GetWindowLongPtrW(window, GWLP_USERDATA));
  if (!self) return DefWindowProcW(window, message, wParam, lParam);
  const bool viewsCommand = message == WM_COMMAND && wParam >= kCmdNewLevel && wParam <= kCmdActivate;
  if (self->active_ && (message == WM_INITMENUPOPUP || viewsCommand))
    return SendMessageW(self->active_, message, wParam, lParam);
  if (message == WM_COMMAND) Record(self->commands, [&] { return wParam; });
  if (message == WM_COMMAND && wParam == kCmdBrowserRefresh) ++self->reloads;
  return DefWindowProcW(window, message, wParam, lParam);
}

void BrowserDouble::SeedMode(UINT mode) {
  CreateStreamOnHGlobal(nullptr, TRUE, stream.Put());
  stream->Write(&mode, sizeof(mode), nullptr);
}

UINT BrowserDouble::StoredMode() {
  UINT mode = 0;
  LARGE_INTEGER zero{};
  if (!stream || FAILED(stream->Seek(zero, STREAM_SEEK_SET, nullptr))) return 0;
  stream->Read(&mode, sizeof(mode), nullptr);
  return mode;
}

std::vector<std::wstring> BrowserDouble::Popup(UINT id) {
  MENUITEMINFOW item{sizeof(item), MIIM_SUBMENU};
  if (!shown || !GetMenuItemInfoW(shown, id, FALSE, &item)) return {L"<no popup>"};
  SendMessageW(frame, WM_INITMENUPOPUP, reinterpret_cast<WPARAM>(item.hSubMenu), 0);
  return MenuEntries(item.hSubMenu);
}

// As Explorer merges: File, Edit and View popups holding entries of the browser's own.
STDMETHODIMP BrowserDouble::InsertMenusSB(HMENU menu, LPOLEMENUGROUPWIDTHS) noexcept {
  ++lent;
  AddPopup(menu, FCIDM_MENU_FILE, L"&File", {{0x7001, L"Close"}});
  AddPopup(menu, FCIDM_MENU_EDIT, L"&Edit", {{0x7002, L"Undo"}});
  AddPopup(menu, FCIDM_MENU_VIEW, L"&View",
           {{0x7003, L"Status Bar"}, {FCIDM_MENU_VIEW_SEP_OPTIONS, L"-"}, {0x7004, L"Options"}});
  return S_OK;
}

STDMETHODIMP BrowserDouble::SetMenuSB(HMENU menu, HOLEMENU, HWND active) noexcept {
  shown = menu;
  active_ = active;
  SetMenu(frame, menu);
  return S_OK;
}

STDMETHODIMP BrowserDouble::RemoveMenusSB(HMENU menu) noexcept {
  --lent;
  while (GetMenuItemCount(menu) > 0) DeleteMenu(menu, 0, MF_BYPOSITION);
  return S_OK;
}

STDMETHODIMP BrowserDouble::GetViewStateStream(DWORD mode, IStream** result) noexcept {
  *result = nullptr;
  if ((mode & STGM_WRITE) || !stream) CreateStreamOnHGlobal(nullptr, TRUE, stream.Put());
  LARGE_INTEGER zero{};
  stream->Seek(zero, STREAM_SEEK_SET, nullptr);
  return stream.CopyTo(result);
}

STDMETHODIMP BrowserDouble::SendControlMsg(UINT id, UINT message, WPARAM wParam, LPARAM lParam,
                                           LRESULT* result) noexcept {
  const auto parts = [&] { return L"parts " + std::to_wstring(wParam) + L" " + std::to_wstring(*reinterpret_cast<int*>(lParam)); };
  const auto text = [&] { return std::wstring(reinterpret_cast<LPCWSTR>(lParam)); };
  if (id == FCW_STATUS && message == SB_SETPARTS) Record(status, parts);
  if (id == FCW_STATUS && message == SB_SETTEXTW) Record(status, text);
  if (result) *result = 0;
  return S_OK;
}
