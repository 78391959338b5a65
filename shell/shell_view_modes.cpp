// The view's four modes, its one column, and sorting by the folder's order.
#include "shell/shell_view.h"

#include "base/resource_ids.h"
#include "shell/item_services.h"
#include "store/station_record.h"
#include "store/string_table.h"

int SortColumn = 1;
int SortDirection = 1;

namespace {

// Every mode: child, visible, tab stop, selection always shown, shared image lists,
// auto arrange; many rows can be selected and none edited.
constexpr DWORD kListBaseStyle = WS_CHILD | WS_VISIBLE | WS_TABSTOP | LVS_SHOWSELALWAYS | LVS_SHAREIMAGELISTS |
                                 LVS_AUTOARRANGE;
static_assert(kListBaseStyle == 0x50010148);

// The folder rides in as the sort's parameter; the row with no list compares equal to all.
int CALLBACK CompareRows(LPARAM first, LPARAM second, LPARAM folder, LPARAM parameter) {
  if (!folder) return 0;
  // The folder answers the order itself as the result, not as a code.
  return static_cast<int>(reinterpret_cast<IShellFolder*>(folder)->CompareIDs(
      parameter, reinterpret_cast<LPCITEMIDLIST>(first), reinterpret_cast<LPCITEMIDLIST>(second)));
}

int CALLBACK CompareDefault(LPARAM first, LPARAM second, LPARAM folder) {
  return CompareRows(first, second, folder, 0);
}

int CALLBACK CompareBySortColumn(LPARAM first, LPARAM second, LPARAM folder) {
  return CompareRows(first, second, folder, static_cast<LPARAM>(SortColumn * SortDirection));
}

}  // namespace

DWORD ListStyleOfMode(UINT mode) noexcept {
  switch (mode) {
    case FVM_ICON: return kListBaseStyle | LVS_ICON;
    case FVM_SMALLICON: return kListBaseStyle | LVS_SMALLICON;
    case FVM_LIST: return kListBaseStyle | LVS_LIST;
    case FVM_DETAILS: return kListBaseStyle | LVS_REPORT;
    default: return 0;
  }
}

// Empties the list and gives it the column and pictures of the current mode.
bool CMarlixDLShellView::InitListColumns() {
  if (!IsWindow(ListWindow)) return false;
  SendMessageW(ListWindow, LVM_DELETEALLITEMS, 0, 0);
  while (SendMessageW(ListWindow, LVM_DELETECOLUMN, 0, 0)) {
  }
  if (!PidlMgr || !PidlMgr->GetLast(FolderIdList)) return false;
  if (FolderSettings.ViewMode == FVM_DETAILS) {
    std::wstring name = LoadTranslatedString(IDS_COLUMN_NAME);
    LVCOLUMNW column{};
    column.mask = LVCF_FMT | LVCF_WIDTH | LVCF_TEXT | LVCF_SUBITEM;
    column.fmt = LVCFMT_LEFT;
    column.cx = ColumnWidths[0];
    column.pszText = name.data();
    column.iSubItem = 0;
    SendMessageW(ListWindow, LVM_INSERTCOLUMNW, 0, reinterpret_cast<LPARAM>(&column));
  }
  if (FolderSettings.ViewMode == FVM_ICON)
    SendMessageW(ListWindow, LVM_SETIMAGELIST, LVSIL_NORMAL, reinterpret_cast<LPARAM>(LargeImageList));
  else
    SendMessageW(ListWindow, LVM_SETIMAGELIST, LVSIL_SMALL, reinterpret_cast<LPARAM>(SmallImageList));
  return true;
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
  if (mode == FVM_ICON)
    SendMessageW(ListWindow, LVM_SETIMAGELIST, LVSIL_NORMAL, reinterpret_cast<LPARAM>(LargeImageList));
  else
    SendMessageW(ListWindow, LVM_SETIMAGELIST, LVSIL_SMALL, reinterpret_cast<LPARAM>(SmallImageList));
  BuildMenus();
  if (mode != FVM_LIST) SendMessageW(ListWindow, LVM_ARRANGE, LVA_SNAPTOGRID, 0);
}

// A second click on the same column turns the order round, in every view of the process.
void CMarlixDLShellView::SortByColumn(int column) {
  if (column + 1 == SortColumn) SortDirection = -SortDirection;
  SortColumn = column + 1;
  SortRows(true);
}

void CMarlixDLShellView::SortRows(bool bySortColumn) {
  if (!IsWindow(ListWindow)) return;
  SendMessageW(ListWindow, LVM_SORTITEMS, reinterpret_cast<WPARAM>(ShellFolder.Get()),
               reinterpret_cast<LPARAM>(bySortColumn ? CompareBySortColumn : CompareDefault));
}

void CMarlixDLShellView::StoreColumnWidths() {
  if (!IsWindow(ListWindow)) return;
  ColumnWidths[0] = static_cast<int>(SendMessageW(ListWindow, LVM_GETCOLUMNWIDTH, 0, 0));
  ColumnWidths[1] = static_cast<int>(SendMessageW(ListWindow, LVM_GETCOLUMNWIDTH, 1, 0));
}
