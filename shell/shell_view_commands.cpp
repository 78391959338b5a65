// The view's commands: one dispatcher for every source (menus, keys, the command
// target, the list's activation), and opening items.
#include "shell/shell_view.h"

#include "base/boundary.h"
#include "helpers/win_handles.h"
#include "server/class_ids.h"

LRESULT CMarlixDLShellView::OnCommand(UINT id) {
  switch (id) {
    case kCmdRefresh:
      Refresh();
      break;
    case kCmdLargeIcons:
    case kCmdSmallIcons:
    case kCmdList:
    case kCmdDetails:
      SetViewMode(FVM_ICON + (id - kCmdLargeIcons));
      break;
    case kCmdActivate:
      OnActivateItem();
      break;
    case kCmdNewLevel:
      OnNewLevel();
      break;
    case kCmdCopy:
      OnCopy();
      break;
    case kCmdPaste:
      OnPaste();
      break;
    case kCmdProperties:
      OnProperties();
      break;
    case kCmdDelete:
      OnDelete();
      break;
  }
  return 0;
}

STDMETHODIMP CMarlixDLShellView::QueryStatus(const GUID* group, ULONG count, OLECMD* commands, OLECMDTEXT*) {
  if (group && *group != CLSID_MarlixDLShellFolder && *group != CGID_Explorer && *group != CGID_ShellDocView)
    return OLECMDERR_E_UNKNOWNGROUP;
  if (!commands) return E_POINTER;
  for (ULONG i = 0; i < count; ++i) {
    const ULONG id = commands[i].cmdID;
    commands[i].cmdf = (id == OLECMDID_PROPERTIES || id == OLECMDID_COPY || id == OLECMDID_REFRESH)
                           ? OLECMDF_SUPPORTED | OLECMDF_ENABLED
                           : 0;
  }
  return S_OK;
}

// Runs the command for every group: the test below can never refuse one, since no
// group equals both.
STDMETHODIMP CMarlixDLShellView::Exec(const GUID* group, DWORD id, DWORD, VARIANT*, VARIANT*) {
  if (group && *group == CGID_Explorer && *group == CGID_ShellDocView) return OLECMDERR_E_UNKNOWNGROUP;
  return boundary::Call([&] {
    OnCommand(id);
    return S_OK;
  });
}

void CMarlixDLShellView::ActivateUI(UINT state) {
  if (state == UIState) return;
  DeactivateUI();
  UIState = state;
  if (state != SVUIA_DEACTIVATE) BuildMenus();
}

void CMarlixDLShellView::DeactivateUI() {
  ReleaseMergedMenu();
  UIState = SVUIA_DEACTIVATE;
}

// The browser's own popups in the merged menu are given back before the menu goes: destroyed
// with it, they would be gone from the browser too.
void CMarlixDLShellView::ReleaseMergedMenu() {
  if (!MergedMenu) return;
  if (ShellBrowser) {
    ShellBrowser->SetMenuSB(nullptr, nullptr, nullptr);
    ShellBrowser->RemoveMenusSB(MergedMenu);
  }
  DestroyMenu(MergedMenu);
  MergedMenu = nullptr;
}

// Opens the first selected row: a level is browsed into; the virtual file, which no
// browser can enter, is a file dialog's default command.
void CMarlixDLShellView::OnActivateItem() {
  if (!IsWindow(ListWindow)) return;
  int row = static_cast<int>(SendMessageW(ListWindow, LVM_GETNEXTITEM, static_cast<WPARAM>(-1), LVNI_SELECTED));
  if (row < 0) return;
  if (FolderType() == PIDL_ROOT && row == 0) {
    OnNewLevel();
    return;
  }
  LVITEMW item{};
  item.mask = LVIF_PARAM;
  item.iItem = row;
  if (!SendMessageW(ListWindow, LVM_GETITEMW, 0, reinterpret_cast<LPARAM>(&item))) return;
  if (!ShellBrowser || !PidlMgr) return;
  // Browsing away may destroy this view's window and release the view and its browser.
  com::ComPtr<CMarlixDLShellView> keep(this);
  com::ComPtr<IShellBrowser> browser = ShellBrowser;
  com::ComPtr<ICommDlgBrowser> dialog = CommDlgBrowser;
  // The row's list is freed with the window that browsing destroys: browse with a copy.
  win::UniqueCoMem<ITEMIDLIST> id(PidlMgr->Copy(reinterpret_cast<LPCITEMIDLIST>(item.lParam)));
  if (FAILED(browser->BrowseObject(id.Get(), SBSP_RELATIVE)) && dialog) dialog->OnDefaultCommand(this);
}
