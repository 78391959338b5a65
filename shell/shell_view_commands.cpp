// The view's commands: one dispatcher for every source (menus, keys, the command
// target, the list's activation), and opening items.
#include "shell/shell_view.h"

#include "base/boundary.h"
#include "base/class_ids.h"
#include "base/win_handles.h"

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

STDMETHODIMP CMarlixDLShellView::QueryStatus(const GUID* group, ULONG count, OLECMD* commands, OLECMDTEXT*) noexcept {
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
STDMETHODIMP CMarlixDLShellView::Exec(const GUID* group, DWORD id, DWORD, VARIANT*, VARIANT*) noexcept {
  if (group && *group == CGID_Explorer && *group == CGID_ShellDocView) return OLECMDERR_E_UNKNOWNGROUP;
  return boundary::Call([&] {
    OnCommand(id);
    return S_OK;
  });
}

// Only the change to Details enumerates again; the column stays after leaving it.
void CMarlixDLShellView::SetViewMode(UINT mode) {
  DWORD style = ListStyleOfMode(mode);
  if (!style) return;
  FolderSettings.ViewMode = mode;
  if (!IsWindow(ListWindow)) return;
  if (static_cast<DWORD>(GetWindowLongW(ListWindow, GWL_STYLE)) != style) SetWindowLongW(ListWindow, GWL_STYLE, style);
  SetWindowPos(ListWindow, nullptr, 0, 0, 0, 0,
               SWP_NOSIZE | SWP_NOMOVE | SWP_NOZORDER | SWP_NOACTIVATE | SWP_SHOWWINDOW);
  if (mode == FVM_DETAILS) {
    if (InitListColumns()) StartEnumeration();
    BuildMenus();
    return;
  }
  ShowModeImages();
  BuildMenus();
  if (mode != FVM_LIST) SendMessageW(ListWindow, LVM_ARRANGE, LVA_SNAPTOGRID, 0);
}

// A second click on the same column turns the order round, in every view of the process.
void CMarlixDLShellView::SortByColumn(int column) {
  if (column + 1 == SortColumn) SortDirection = -SortDirection;
  SortColumn = column + 1;
  SortRows(true);
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
  UniqueIdList id(PidlMgr->Copy(reinterpret_cast<LPCITEMIDLIST>(item.lParam)));
  if (FAILED(browser->BrowseObject(id.Get(), SBSP_RELATIVE)) && dialog) dialog->OnDefaultCommand(this);
}
