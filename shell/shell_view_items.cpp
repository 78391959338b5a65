// What the view's commands do to items: create, edit and delete levels, copy and paste
// them, and drag the virtual file out. Every command fails silently; only the property
// sheet speaks to the user.
#include <ole2.h>

#include "base/resource_ids.h"
#include "base/win_handles.h"
#include "config/station_dialog.h"
#include "shell/shell_folder_base.h"
#include "shell/shell_view.h"
#include "store/station_record.h"
#include "store/string_table.h"
#include "transfer/data_object.h"

// The add row has no id, so it adds the folder's own list: a copy of the folder as an item.
int CMarlixDLShellView::AddSelection(CMarlixDLDataObject* data) {
  wchar_t path[MAX_PATH] = {};
  if (FolderBase) FolderBase->GetFolderPath(path, MAX_PATH, false);
  int last = -1;
  for (int row : SelectedRows()) {
    UniqueIdList folder(PidlMgr->CreateListFromPath(path));
    UniqueIdList full(PidlMgr->Concatenate(folder.Get(), RowId(row)));
    if (full) data->AddItem(full.Get());
    last = row;
  }
  return last;
}

// The sheet stores the level itself; the view only shows the result.
void CMarlixDLShellView::OnNewLevel() {
  CStationRecord record;
  record.Name = MakeUniqueStationName(LoadTranslatedString(IDS_NEW_LEVEL_NAME));
  com::ComPtr<CMarlixDLShellView> keep(this);  // the sheet's modal loop may see the browser let go
  INT_PTR result = 0;
  {
    CStationDialog sheet(nullptr, record, true);
    result = sheet.DoModal();
  }
  if (result != IDOK) return;
  RefreshAll();
  BroadcastChange();
}

// One sheet after another while they are cancelled: an OK reloads the list, which ends the walk.
void CMarlixDLShellView::OnProperties() {
  if (!HasFolderId() || !IsWindow(ListWindow)) return;
  if (!SendMessageW(ListWindow, LVM_GETSELECTEDCOUNT, 0, 0)) return;
  com::ComPtr<CMarlixDLShellView> keep(this);
  for (int row = -1; FolderType() == PIDL_ROOT && IsWindow(ListWindow) &&
                     (row = static_cast<int>(SendMessageW(ListWindow, LVM_GETNEXTITEM, static_cast<WPARAM>(row),
                                                          LVNI_SELECTED))) >= 0;) {
    LPCITEMIDLIST id = RowId(row);
    if (!id) continue;
    CStationRecord record;
    record.Name = PidlMgr->GetTextCopy(id);  // the row may be gone once the sheet has run
    FindStation(record);  // a level deleted meanwhile opens with default values
    INT_PTR result = 0;
    {
      CStationDialog sheet(nullptr, record, false);
      result = sheet.DoModal();
    }
    if (result == IDOK) RefreshAll();
  }
  BroadcastChange();
}

// No confirmation. In a level's view nothing is deleted, yet the views are told.
void CMarlixDLShellView::OnDelete() {
  if (!HasFolderId() || !IsWindow(ListWindow)) return;
  if (!SendMessageW(ListWindow, LVM_GETSELECTEDCOUNT, 0, 0)) return;
  if (FolderType() == PIDL_ROOT) {
    for (int row : SelectedRows()) {
      LPCITEMIDLIST id = RowId(row);
      if (!id) continue;
      CStationRecord record;
      record.Name = PidlMgr->GetTextCopy(id);
      DeleteStation(record);
    }
  }
  RefreshAll();
  BroadcastChange();
}

// The clipboard keeps the only reference to the data object.
void CMarlixDLShellView::OnCopy() {
  if (!IsWindow(ListWindow) || !PidlMgr) return;
  tagPIDLTYPE type = FolderType();
  if (type != PIDL_ROOT && type != PIDL_LEVEL) return;
  auto data = com::Make<CMarlixDLDataObject>();
  if (!data || AddSelection(data.Get()) < 0) return;
  OleSetClipboard(data.Get());
}

// Levels from the clipboard come in under a free name, "Copy of " in front as often as
// needed; every other field as it came. The store refuses a record it could not read back
// whole; one whose every copy name is taken is left out.
void CMarlixDLShellView::OnPaste() {
  com::ComPtr<IDataObject> clipboard;
  if (FAILED(OleGetClipboard(clipboard.Put())) || !clipboard) return;
  if (!HasFolderId()) return;
  com::ComPtr<CMarlixDLShellView> keep(this);
  if (FolderType() == PIDL_ROOT) {
    FORMATETC format{static_cast<CLIPFORMAT>(RegisterClipboardFormatW(kStationsFormat)), nullptr, DVASPECT_CONTENT,
                     -1, TYMED_HGLOBAL};
    win::UniqueMedium medium;
    if (clipboard->GetData(&format, medium.Put()) == S_OK) {
      // Unpacking can run out of memory; the medium is the clipboard's copy, ours to free.
      std::vector<CStationRecord> records;
      if (medium.Get().tymed == TYMED_HGLOBAL) UnpackStations(medium.Get().hGlobal, records);
      medium.Reset();
      const std::wstring prefix = LoadTranslatedString(IDS_COPY_OF);
      for (CStationRecord& record : records) {
        record.Name = FreeCopyName(record.Name, prefix);
        if (!record.Name.empty()) AddStation(record);
      }
      RefreshAll();
    }
  }
  BroadcastChange();
}

// Only a level's view drags: its rows are virtual files, whose contents the receiver
// asks for inside DoDragDrop, which is where the download dialog runs.
void CMarlixDLShellView::OnBeginDrag() {
  if (FolderType() != PIDL_LEVEL || !IsWindow(ListWindow) || !PidlMgr) return;
  auto data = com::Make<CMarlixDLDataObject>();
  if (!data) return;
  int last = AddSelection(data.Get());
  if (last < 0) return;
  com::ComPtr<CMarlixDLShellView> keep(this);
  DragImagePos = {};
  DragImage.Reset(reinterpret_cast<HIMAGELIST>(
      SendMessageW(ListWindow, LVM_CREATEDRAGIMAGE, last, reinterpret_cast<LPARAM>(&DragImagePos))));
  ClientToScreen(ListWindow, &DragImagePos);
  POINT hotSpot{0, 0}, cursor{};
  if (GetCursorPos(&cursor)) hotSpot = {DragImagePos.x - cursor.x, DragImagePos.y - cursor.y};
  data->SetDragImage(std::move(DragImage), ListWindow, hotSpot);
  DWORD effect = DROPEFFECT_NONE;
  DoDragDrop(data.Get(), data.Get(), DROPEFFECT_COPY, &effect);
}
