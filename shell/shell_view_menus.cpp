// The view's entries in the browser's File, Edit and View menus, and its context menu.
// States are worked out each time a menu is built, and menus are rebuilt each time one opens.
#include <utility>

#include "base/resource_ids.h"
#include "shell/shell_view.h"
#include "store/string_table.h"

namespace {

// Puts one entry into `menu`: in the merged form at `where` (a position, or the entry
// before the command `where`), in the append form at the end, where a separator is
// left out while the menu is still empty.
void AddEntry(HMENU menu, bool merged, UINT where, bool byPosition, UINT id, UINT state, UINT type = MFT_STRING,
              UINT textId = 0) {
  const int count = GetMenuItemCount(menu);
  if (!merged) {
    if (type == MFT_SEPARATOR && count <= 0) return;
    where = count < 0 ? 0 : static_cast<UINT>(count);
    byPosition = true;
  }
  std::wstring text = textId ? LoadTranslatedString(textId) : std::wstring();
  MENUITEMINFOW item{sizeof(item)};
  item.fMask = MIIM_STATE | MIIM_ID | MIIM_TYPE;
  item.fType = type;
  item.fState = state;
  item.wID = id;
  if (type != MFT_SEPARATOR) item.dwTypeData = text.data();
  InsertMenuItemW(menu, where, byPosition, &item);
}

void AddSeparator(HMENU menu, bool merged, UINT where, bool byPosition) {
  AddEntry(menu, merged, where, byPosition, 0, 0, MFT_SEPARATOR);
}

HMENU SubMenu(HMENU menu, UINT id) {
  MENUITEMINFOW item{sizeof(item)};
  item.fMask = MIIM_SUBMENU;
  return GetMenuItemInfoW(menu, id, FALSE, &item) ? item.hSubMenu : nullptr;
}

}  // namespace

// Runs at activation, at each mode change and at every WM_INITMENUPOPUP.
void CMarlixDLShellView::BuildMenus() {
  if (!ShellBrowser) return;
  HMENU menu = CreateMenu();
  if (!menu) return;
  OLEMENUGROUPWIDTHS widths{};
  ShellBrowser->InsertMenusSB(menu, &widths);
  try {
    if (HMENU file = SubMenu(menu, FCIDM_MENU_FILE)) FillFileMenu(file, true);
    if (HMENU view = SubMenu(menu, FCIDM_MENU_VIEW)) FillViewMenu(view, true);
    if (UIState == SVUIA_ACTIVATE_FOCUS) {
      if (HMENU edit = SubMenu(menu, FCIDM_MENU_EDIT)) {
        for (int i = GetMenuItemCount(edit) - 1; i >= 0; --i) DeleteMenu(edit, i, MF_BYPOSITION);
        FillEditMenu(edit, true);
      }
    }
  } catch (...) {
    // Out of memory half way: the browser keeps the menu it shows, and gets this one back.
    ShellBrowser->RemoveMenusSB(menu);
    DestroyMenu(menu);
    throw;
  }
  // The menu of the build before is the browser's no more once the new one is set; its
  // own popups go back to it first.
  HMENU previous = std::exchange(MergedMenu, menu);
  ShellBrowser->SetMenuSB(menu, nullptr, ViewWindow);
  if (previous && previous != menu) {
    ShellBrowser->RemoveMenusSB(previous);
    DestroyMenu(previous);
  }
}

// Select in a file dialog, Open elsewhere, and in the root the level commands. The
// merged positions give, in the root: separator, Delete, Properties, Open, Create.
void CMarlixDLShellView::FillFileMenu(HMENU menu, bool merged) {
  if (!PidlMgr || !PidlMgr->GetLast(FolderIdList)) return;
  const bool selected = IsWindow(ListWindow) && SendMessageW(ListWindow, LVM_GETSELECTEDCOUNT, 0, 0) > 0;
  const std::vector<int> rows = SelectedRows();
  const bool addRowSelected = !rows.empty() && rows.front() == 0;
  const UINT levelState = selected && !addRowSelected ? MFS_ENABLED : MFS_GRAYED;
  AddEntry(menu, merged, 0, true, kCmdActivate, MFS_DEFAULT | (selected ? 0 : MFS_GRAYED), MFT_STRING,
           CommDlgBrowser ? IDS_SELECT : IDS_OPEN);
  if (FolderType() != PIDL_ROOT) return;
  AddSeparator(menu, merged, 0, true);
  AddEntry(menu, merged, 2, true, kCmdNewLevel, MFS_ENABLED, MFT_STRING, IDS_CREATE_LEVEL);
  AddEntry(menu, merged, 1, true, kCmdDelete, levelState, MFT_STRING, IDS_DELETE);
  AddEntry(menu, merged, 2, true, kCmdProperties, levelState, MFT_STRING, IDS_PROPERTIES);
}

void CMarlixDLShellView::FillViewMenu(HMENU menu, bool merged) {
  AddSeparator(menu, merged, FCIDM_MENU_VIEW_SEP_OPTIONS, false);
  const UINT texts[] = {IDS_LARGE_ICONS, IDS_SMALL_ICONS, IDS_LIST, IDS_DETAILS};
  for (UINT i = 0; i < 4; ++i) {
    const UINT id = kCmdLargeIcons + i;
    const UINT state = FolderSettings.ViewMode == FVM_ICON + i ? MFS_CHECKED : MFS_ENABLED;
    AddEntry(menu, merged, FCIDM_MENU_VIEW_SEP_OPTIONS, false, id, state, MFT_STRING | MFT_RADIOCHECK, texts[i]);
  }
}

// Copy in the root wants the mouse over a level row as well as a selection; Paste wants a
// selection too, though Ctrl+V works without one.
void CMarlixDLShellView::FillEditMenu(HMENU menu, bool merged) {
  const tagPIDLTYPE type = FolderType();
  if (type != PIDL_ROOT && type != PIDL_LEVEL) return;
  const bool selected = IsWindow(ListWindow) && SendMessageW(ListWindow, LVM_GETSELECTEDCOUNT, 0, 0) > 0;
  const std::vector<int> rows = SelectedRows();
  const bool addRowSelected = !rows.empty() && rows.front() == 0;
  bool overLevel = false;
  if (type != PIDL_LEVEL && IsWindow(ListWindow)) {
    LVHITTESTINFO hit{};
    if (GetCursorPos(&hit.pt) && ScreenToClient(ListWindow, &hit.pt))
      overLevel = SendMessageW(ListWindow, LVM_HITTEST, 0, reinterpret_cast<LPARAM>(&hit)) > 0;
  }
  const UINT copyState = selected && (type == PIDL_LEVEL || overLevel) ? MFS_ENABLED : MFS_GRAYED;
  AddSeparator(menu, merged, FCIDM_MENU_EDIT, false);
  AddEntry(menu, merged, FCIDM_MENU_EDIT, false, kCmdCopy, copyState, MFT_STRING, IDS_COPY);
  AddEntry(menu, merged, FCIDM_MENU_EDIT, false, kCmdPaste, selected && !addRowSelected ? MFS_ENABLED : MFS_GRAYED,
           MFT_STRING, IDS_PASTE);
}

// The chosen entry comes back as WM_COMMAND. A position of (-1, -1) from the keyboard is
// used as it is.
void CMarlixDLShellView::OnContextMenu(int x, int y) {
  HMENU popup = CreatePopupMenu();
  if (!popup) return;
  FillFileMenu(popup, false);
  if (!IsWindow(ListWindow) || !SendMessageW(ListWindow, LVM_GETSELECTEDCOUNT, 0, 0)) FillViewMenu(popup, false);
  FillEditMenu(popup, false);
  TrackPopupMenu(popup, TPM_RIGHTBUTTON, x, y, 0, ViewWindow, nullptr);
  DestroyMenu(popup);
}
