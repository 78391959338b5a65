// The list control of the view: its four modes, its one column, its rows and their order.
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
int CALLBACK CompareRows(LPARAM first, LPARAM second, LPARAM folder, LPARAM parameter) noexcept {
  if (!folder) return 0;
  // The folder answers the order itself as the result, not as a code.
  return static_cast<int>(reinterpret_cast<IShellFolder*>(folder)->CompareIDs(
      parameter, reinterpret_cast<LPCITEMIDLIST>(first), reinterpret_cast<LPCITEMIDLIST>(second)));
}

int CALLBACK CompareDefault(LPARAM first, LPARAM second, LPARAM folder) noexcept {
  return CompareRows(first, second, folder, 0);
}

int CALLBACK CompareBySortColumn(LPARAM first, LPARAM second, LPARAM folder) noexcept {
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

bool CMarlixDLShellView::HasFolderId() { return PidlMgr && PidlMgr->GetLast(FolderIdList.Get()); }

tagPIDLTYPE CMarlixDLShellView::FolderType() {
  LPCITEMIDLIST last = PidlMgr ? PidlMgr->GetLast(FolderIdList.Get()) : nullptr;
  return last ? CPidlMgr::GetType(last) : tagPIDLTYPE{};
}

bool CMarlixDLShellView::InitListColumns() {
  if (!IsWindow(ListWindow)) return false;
  SendMessageW(ListWindow, LVM_DELETEALLITEMS, 0, 0);
  while (SendMessageW(ListWindow, LVM_DELETECOLUMN, 0, 0)) {
  }
  if (!HasFolderId()) return false;
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
  ShowModeImages();
  return true;
}

void CMarlixDLShellView::ShowModeImages() {
  if (FolderSettings.ViewMode == FVM_ICON)
    SendMessageW(ListWindow, LVM_SETIMAGELIST, LVSIL_NORMAL, reinterpret_cast<LPARAM>(LargeImageList.Get()));
  else
    SendMessageW(ListWindow, LVM_SETIMAGELIST, LVSIL_SMALL, reinterpret_cast<LPARAM>(SmallImageList.Get()));
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

std::vector<int> CMarlixDLShellView::SelectedRows() {
  std::vector<int> rows;
  if (!IsWindow(ListWindow)) return rows;
  for (int row = -1; (row = static_cast<int>(SendMessageW(ListWindow, LVM_GETNEXTITEM, static_cast<WPARAM>(row),
                                                          LVNI_SELECTED))) >= 0;)
    rows.push_back(row);
  return rows;
}

LPCITEMIDLIST CMarlixDLShellView::RowId(int row) {
  LVITEMW item{};
  item.mask = LVIF_PARAM;
  item.iItem = row;
  if (!IsWindow(ListWindow) || !SendMessageW(ListWindow, LVM_GETITEMW, 0, reinterpret_cast<LPARAM>(&item)))
    return nullptr;
  return reinterpret_cast<LPCITEMIDLIST>(item.lParam);
}
