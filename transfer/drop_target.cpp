#include "transfer/drop_target.h"

#include <commctrl.h>
#include <new>


CMarlixDLDropTarget::CMarlixDLDropTarget() : pidlMgr_(new (std::nothrow) CPidlMgr) {}

bool CMarlixDLDropTarget::SetItem(LPCITEMIDLIST fullList) {
  return pidlMgr_ && pidlMgr_->Assign(ItemIdList, fullList);
}

// Nothing is ever uploaded to an instrument: every answer is a refusal, whatever came.
STDMETHODIMP CMarlixDLDropTarget::DragEnter(IDataObject*, DWORD, POINTL, DWORD*) noexcept { return E_INVALIDARG; }
STDMETHODIMP CMarlixDLDropTarget::DragOver(DWORD, POINTL, DWORD*) noexcept { return E_INVALIDARG; }
STDMETHODIMP CMarlixDLDropTarget::DragLeave() noexcept { return E_INVALIDARG; }
STDMETHODIMP CMarlixDLDropTarget::Drop(IDataObject*, DWORD, POINTL, DWORD*) noexcept { return E_INVALIDARG; }

void CMarlixDLDropTargetOnListView::SetTarget(HWND listWindow, IShellView* view, LPCITEMIDLIST folderIdList) {
  ListWindow = listWindow;
  if (view != ShellView.Get()) ShellView = com::ComPtr<IShellView>(view);
  FolderIdList = folderIdList;
}

bool CMarlixDLDropTargetOnListView::TakesDrops() const {
  if (!ListWindow || !ShellView || !FolderIdList) return false;
  LPCITEMIDLIST last = CPidlMgr().GetLast(FolderIdList);
  return last && CPidlMgr::GetType(last) != PIDL_LEVEL;
}

namespace {
// Only an answer of exactly S_OK counts: S_FALSE and failures alike mean "not offered".
bool Offers(IDataObject* data, const wchar_t* formatName, CLIPFORMAT format, DWORD medium) {
  if (formatName) format = static_cast<CLIPFORMAT>(RegisterClipboardFormatW(formatName));
  FORMATETC query{format, nullptr, DVASPECT_CONTENT, -1, medium};
  return data->QueryGetData(&query) == S_OK;
}
}  // namespace

// Files on disk, an id array, or both halves of a virtual file: a descriptor alone
// promises nothing that could be read.
STDMETHODIMP CMarlixDLDropTargetOnListView::DragEnter(IDataObject* data, DWORD, POINTL, DWORD*) noexcept {
  if (!TakesDrops() || !data) return E_INVALIDARG;
  if (Offers(data, nullptr, CF_HDROP, TYMED_HGLOBAL)) return S_OK;
  if (Offers(data, CFSTR_SHELLIDLIST, 0, TYMED_HGLOBAL)) return S_OK;
  if (!Offers(data, CFSTR_FILEDESCRIPTORW, 0, TYMED_HGLOBAL)) return E_INVALIDARG;
  return Offers(data, CFSTR_FILECONTENTS, 0, TYMED_ISTREAM) ? S_OK : E_INVALIDARG;
}

int CMarlixDLDropTargetOnListView::SelectRowAt(POINTL point) const {
  POINT client{point.x, point.y};
  ScreenToClient(ListWindow, &client);
  LVHITTESTINFO hit{};
  hit.pt = client;
  // Row 0 of the root is "Add New Digital Level": no level to drop on.
  int row = static_cast<int>(SendMessageW(ListWindow, LVM_HITTEST, 0, reinterpret_cast<LPARAM>(&hit)));
  if (row <= 0) return -1;
  LVITEMW state{};
  state.stateMask = LVIS_FOCUSED | LVIS_SELECTED;
  SendMessageW(ListWindow, LVM_SETITEMSTATE, static_cast<WPARAM>(-1), reinterpret_cast<LPARAM>(&state));
  state.state = LVIS_FOCUSED | LVIS_SELECTED;
  SendMessageW(ListWindow, LVM_SETITEMSTATE, static_cast<WPARAM>(row), reinterpret_cast<LPARAM>(&state));
  return row;
}

// Copy whatever the source allowed and whatever keys are held: the drop is refused later.
STDMETHODIMP CMarlixDLDropTargetOnListView::DragOver(DWORD, POINTL point, DWORD* effect) noexcept {
  if (!TakesDrops() || SelectRowAt(point) < 0) return E_INVALIDARG;
  if (effect) *effect = DROPEFFECT_COPY;
  return S_OK;
}

// The last highlighted row stays selected: the drag's picture of where it would land.
STDMETHODIMP CMarlixDLDropTargetOnListView::DragLeave() noexcept { return S_OK; }

STDMETHODIMP CMarlixDLDropTargetOnListView::Drop(IDataObject* data, DWORD keyState, POINTL point, DWORD* effect) noexcept {
  if (!TakesDrops() || SelectRowAt(point) < 0) return E_INVALIDARG;
  com::ComPtr<IDropTarget> item;
  HRESULT hr = ShellView->GetItemObject(SVGIO_SELECTION, IID_IDropTarget, item.PutVoid());
  if (FAILED(hr)) return hr;
  return item->Drop(data, keyState, point, effect);
}

HRESULT CreateMarlixDLDropTarget(REFIID riid, void** ppv) noexcept { return com::CreateInstance<CMarlixDLDropTarget>(riid, ppv); }
HRESULT CreateMarlixDLDropTargetOnListView(REFIID riid, void** ppv) noexcept {
  return com::CreateInstance<CMarlixDLDropTargetOnListView>(riid, ppv);
}
