// The view's entries in the browser's File, Edit and View menus, and its context menu.
// States are worked out each time a menu is built, and again each time one of its popups opens.
#include <utility>

#include "base/boundary.h"
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

STDMETHODIMP CMarlixDLShellView::UIActivate(UINT state) noexcept {
  return boundary::Call([&] {
    if (state == UIState) return S_OK;
    ActivateUI(state);
    if (state != SVUIA_DEACTIVATE) SetStatusText();
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
    ShellBrowser->RemoveMenusSB(MergedMenu.Get());
  }
  MergedMenu.Reset();
}

// Runs at activation and at each mode change of an active view. An inactive view has no menu
// in the browser: one built then would replace the active view's.
void CMarlixDLShellView::BuildMenus() {
  if (!ShellBrowser || UIState == SVUIA_DEACTIVATE) return;
  win::UniqueMenu menu(CreateMenu());
  if (!menu) return;
  OLEMENUGROUPWIDTHS widths{};
  ShellBrowser->InsertMenusSB(menu.Get(), &widths);
  // Out of memory half way, the browser keeps the menu it shows and gets its popups back.
  struct GiveBack {
    IShellBrowser* browser;
    HMENU menu;
    ~GiveBack() {
      if (menu) browser->RemoveMenusSB(menu);
    }
  } giveBack{ShellBrowser.Get(), menu.Get()};
  if (HMENU file = SubMenu(menu.Get(), FCIDM_MENU_FILE)) FillFileMenu(file, true);
  if (HMENU view = SubMenu(menu.Get(), FCIDM_MENU_VIEW)) FillViewMenu(view, true);
  if (UIState == SVUIA_ACTIVATE_FOCUS) {
    if (HMENU edit = SubMenu(menu.Get(), FCIDM_MENU_EDIT)) {
      for (int i = GetMenuItemCount(edit) - 1; i >= 0; --i) DeleteMenu(edit, i, MF_BYPOSITION);
      FillEditMenu(edit, true);
    }
  }
  giveBack.menu = nullptr;
  // The menu of the build before is the browser's no more once the new one is set; its
  // own popups go back to it first.
  win::UniqueMenu previous = std::exchange(MergedMenu, std::move(menu));
  ShellBrowser->SetMenuSB(MergedMenu.Get(), nullptr, ViewWindow);
  if (previous) ShellBrowser->RemoveMenusSB(previous.Get());
}

// A popup about to open gets fresh states in place. Rebuilding the menu bar here would
// destroy the bar that holds this very popup, and it would open without our entries.
void CMarlixDLShellView::RefreshMenuStates(HMENU popup) {
  for (int i = 0, count = GetMenuItemCount(popup); i < count; ++i) {
    const UINT id = GetMenuItemID(popup, i);
    if (id < kCmdNewLevel || id > kCmdActivate) continue;
    MENUITEMINFOW item{sizeof(item)};
    item.fMask = MIIM_STATE;
    item.fState = EntryState(id);
    SetMenuItemInfoW(popup, static_cast<UINT>(i), TRUE, &item);
  }
}

// Level commands want a selection without the add row; Copy in the root wants the mouse over a
// level row as well, and Paste wants a selection too, though Ctrl+V works without one.
UINT CMarlixDLShellView::EntryState(UINT id) {
  const bool selected = IsWindow(ListWindow) && SendMessageW(ListWindow, LVM_GETSELECTEDCOUNT, 0, 0) > 0;
  const std::vector<int> rows = SelectedRows();
  const UINT levelState = selected && (rows.empty() || rows.front() != 0) ? MFS_ENABLED : MFS_GRAYED;
  switch (id) {
    case kCmdActivate:
      return MFS_DEFAULT | (selected ? 0 : MFS_GRAYED);
    case kCmdDelete:
    case kCmdProperties:
    case kCmdPaste:
      return levelState;
    case kCmdCopy:
      return selected && (FolderType() == PIDL_LEVEL || CursorOverLevel()) ? MFS_ENABLED : MFS_GRAYED;
    case kCmdLargeIcons:
    case kCmdSmallIcons:
    case kCmdList:
    case kCmdDetails:
      return FolderSettings.ViewMode == FVM_ICON + (id - kCmdLargeIcons) ? MFS_CHECKED : MFS_ENABLED;
    default:
      return MFS_ENABLED;
  }
}

bool CMarlixDLShellView::CursorOverLevel() {
  if (!IsWindow(ListWindow)) return false;
  LVHITTESTINFO hit{};
  return GetCursorPos(&hit.pt) && ScreenToClient(ListWindow, &hit.pt) &&
         SendMessageW(ListWindow, LVM_HITTEST, 0, reinterpret_cast<LPARAM>(&hit)) > 0;
}

// Select in a file dialog, Open elsewhere, and in the root the level commands. The
// merged positions give, in the root: separator, Delete, Properties, Open, Create.
void CMarlixDLShellView::FillFileMenu(HMENU menu, bool merged) {
  if (!HasFolderId()) return;
  AddEntry(menu, merged, 0, true, kCmdActivate, EntryState(kCmdActivate), MFT_STRING,
           CommDlgBrowser ? IDS_SELECT : IDS_OPEN);
  if (FolderType() != PIDL_ROOT) return;
  AddSeparator(menu, merged, 0, true);
  AddEntry(menu, merged, 2, true, kCmdNewLevel, EntryState(kCmdNewLevel), MFT_STRING, IDS_CREATE_LEVEL);
  AddEntry(menu, merged, 1, true, kCmdDelete, EntryState(kCmdDelete), MFT_STRING, IDS_DELETE);
  AddEntry(menu, merged, 2, true, kCmdProperties, EntryState(kCmdProperties), MFT_STRING, IDS_PROPERTIES);
}

void CMarlixDLShellView::FillViewMenu(HMENU menu, bool merged) {
  AddSeparator(menu, merged, FCIDM_MENU_VIEW_SEP_OPTIONS, false);
  const UINT texts[] = {IDS_LARGE_ICONS, IDS_SMALL_ICONS, IDS_LIST, IDS_DETAILS};
  for (UINT i = 0; i < 4; ++i) {
    const UINT id = kCmdLargeIcons + i;
    AddEntry(menu, merged, FCIDM_MENU_VIEW_SEP_OPTIONS, false, id, EntryState(id), MFT_STRING | MFT_RADIOCHECK,
             texts[i]);
  }
}

void CMarlixDLShellView::FillEditMenu(HMENU menu, bool merged) {
  const tagPIDLTYPE type = FolderType();
  if (type != PIDL_ROOT && type != PIDL_LEVEL) return;
  AddSeparator(menu, merged, FCIDM_MENU_EDIT, false);
  AddEntry(menu, merged, FCIDM_MENU_EDIT, false, kCmdCopy, EntryState(kCmdCopy), MFT_STRING, IDS_COPY);
  AddEntry(menu, merged, FCIDM_MENU_EDIT, false, kCmdPaste, EntryState(kCmdPaste), MFT_STRING, IDS_PASTE);
}

// The chosen entry comes back as WM_COMMAND. A position of (-1, -1) from the keyboard is
// used as it is.
void CMarlixDLShellView::OnContextMenu(int x, int y) {
  win::UniqueMenu popup(CreatePopupMenu());
  if (!popup) return;
  FillFileMenu(popup.Get(), false);
  if (!IsWindow(ListWindow) || !SendMessageW(ListWindow, LVM_GETSELECTEDCOUNT, 0, 0)) FillViewMenu(popup.Get(), false);
  FillEditMenu(popup.Get(), false);
  TrackPopupMenu(popup.Get(), TPM_RIGHTBUTTON, x, y, 0, ViewWindow, nullptr);
}
