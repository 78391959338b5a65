// The drop targets. Data moves one way only, from the instrument to the disk: the list
// of the root view looks like a target (the row under the pointer lights up, the cursor
// says copy), and the item that finally gets the drop refuses it.
#pragma once
#include <windows.h>
#include <oleidl.h>
#include <shlobj.h>

#include <memory>

#include "base/com_base.h"
#include "store/pidl_manager.h"

// The target of one item, handed out by the folder: refuses everything.
class CMarlixDLDropTarget : public com::ComObject<IDropTarget> {
 public:
  CMarlixDLDropTarget();

  // Keeps a copy of the item's full list; false if it could not be copied.
  bool SetItem(LPCITEMIDLIST fullList);
  bool IsUsable() const noexcept { return pidlMgr_ != nullptr; }

  STDMETHODIMP DragEnter(IDataObject* data, DWORD keyState, POINTL point, DWORD* effect) noexcept override;
  STDMETHODIMP DragOver(DWORD keyState, POINTL point, DWORD* effect) noexcept override;
  STDMETHODIMP DragLeave() noexcept override;
  STDMETHODIMP Drop(IDataObject* data, DWORD keyState, POINTL point, DWORD* effect) noexcept override;

 private:
  std::unique_ptr<CPidlMgr> pidlMgr_;
  UniqueIdList ItemIdList;
};

// The target registered on a view's list control: accepts files, highlights the level
// row under the pointer and hands a drop to that row's own target.
class CMarlixDLDropTargetOnListView : public com::ComObject<IDropTarget> {
 public:
  // The list borrows the view's own list, so the view must outlive every call: the
  // counted reference on the view sees to that until RevokeDragDrop lets the target go.
  void SetTarget(HWND listWindow, IShellView* view, LPCITEMIDLIST folderIdList);

  STDMETHODIMP DragEnter(IDataObject* data, DWORD keyState, POINTL point, DWORD* effect) noexcept override;
  STDMETHODIMP DragOver(DWORD keyState, POINTL point, DWORD* effect) noexcept override;
  STDMETHODIMP DragLeave() noexcept override;
  STDMETHODIMP Drop(IDataObject* data, DWORD keyState, POINTL point, DWORD* effect) noexcept override;

 private:
  // False in a level's own view, and for a target nobody has set up.
  bool TakesDrops() const;
  // The level row under a screen point, made the only selected and focused row; -1 if
  // the point is on the add row or on no row.
  int SelectRowAt(POINTL point) const;

  HWND ListWindow = nullptr;
  com::ComPtr<IShellView> ShellView;
  LPCITEMIDLIST FolderIdList = nullptr;
};

// The class objects' creators: targets that refuse everything, the list's until it is set up.
HRESULT CreateMarlixDLDropTarget(REFIID riid, void** ppv) noexcept;
HRESULT CreateMarlixDLDropTargetOnListView(REFIID riid, void** ppv) noexcept;
