#include "transfer/data_object.h"

#include <memory>
#include <new>
#include <string>

#include "base/boundary.h"
#include "base/win_handles.h"
#include "helpers/filelog.h"
#include "store/pidl_manager.h"
#include "store/station_record.h"
#include "transfer/download_dialog.h"
#include "transfer/enum_format_etc.h"
#include "transfer/stream2.h"

namespace {

constexpr UINT kClipboardFlags = GMEM_MOVEABLE | GMEM_ZEROINIT | GMEM_SHARE;  // 0x2042

// Registered anew at each use; the request carries the 16-bit number.
CLIPFORMAT Format(const wchar_t* name) noexcept {
  return static_cast<CLIPFORMAT>(RegisterClipboardFormatW(name));
}
CLIPFORMAT FileContentsFormat() noexcept { return Format(L"FileContents"); }
CLIPFORMAT GroupDescriptorFormat() noexcept { return Format(L"FileGroupDescriptorW"); }
CLIPFORMAT IdListArrayFormat() noexcept { return Format(L"Shell IDList Array"); }
CLIPFORMAT DropEffectFormat() noexcept { return Format(L"Preferred DropEffect"); }
CLIPFORMAT StationsFormat() noexcept { return Format(kStationsFormat); }

bool IsStreamRequest(const FORMATETC& f, CLIPFORMAT cf) noexcept {
  return f.cfFormat == cf && (f.tymed & TYMED_ISTREAM) != 0;
}
bool IsGlobalRequest(const FORMATETC& f, CLIPFORMAT cf) noexcept {
  return f.cfFormat == cf && f.tymed == TYMED_HGLOBAL;
}

// No second transfer may start while a transfer dialog runs on any thread.
bool TransferDialogOpen() noexcept {
  return IsWindow(DownloadDialogWindow) || IsWindow(UploadDialogWindow);
}

void HandOver(STGMEDIUM& medium, HGLOBAL block) noexcept {
  medium.tymed = TYMED_HGLOBAL;
  medium.hGlobal = block;
  medium.pUnkForRelease = nullptr;
}

}  // namespace

bool CMarlixDLDataObject::AddItem(LPCITEMIDLIST list) {
  UniqueIdList copy(CPidlMgr().Copy(list));
  if (!copy) return false;
  return boundary::CallOr(false, [&] {
    ItemList.push_back(std::move(copy));
    return true;
  });
}

void CMarlixDLDataObject::SetDragImage(win::UniqueImageList image, HWND window, POINT hotSpot) noexcept {
  DragImage = std::move(image);
  DragWindow = window;
  DragHotSpot = hotSpot;
}

STDMETHODIMP CMarlixDLDataObject::GetData(FORMATETC* format, STGMEDIUM* medium) noexcept {
  if (!format || !medium) return E_INVALIDARG;
  if (TransferDialogOpen()) return E_INVALIDARG;
  const FORMATETC& f = *format;
  return boundary::Call([&] {
    if (IsGlobalRequest(f, DropEffectFormat())) return GetDropEffect(*medium);
    if (IsGlobalRequest(f, GroupDescriptorFormat())) return GetGroupDescriptor(*medium);
    if (IsStreamRequest(f, FileContentsFormat())) return GetFileContents(f.lindex, *medium);
    if (IsGlobalRequest(f, IdListArrayFormat())) return GetIdListArray(*medium);
    if (IsGlobalRequest(f, StationsFormat())) return GetStations(*medium);
    return E_INVALIDARG;
  });
}

HRESULT CMarlixDLDataObject::GetDropEffect(STGMEDIUM& medium) {
  HGLOBAL block = GlobalAlloc(kClipboardFlags, sizeof(DWORD));
  if (!block) return E_OUTOFMEMORY;
  {
    win::GlobalLockGuard<DWORD> lock(block);
    *lock.Get() = DROPEFFECT_COPY;
  }
  HandOver(medium, block);
  return S_OK;
}

HRESULT CMarlixDLDataObject::GetGroupDescriptor(STGMEDIUM& medium) {
  static_assert(sizeof(FILEDESCRIPTORW) == 592);
  if (ItemList.empty()) return S_FALSE;
  const size_t n = ItemList.size();
  HGLOBAL block = GlobalAlloc(kClipboardFlags, sizeof(UINT) + sizeof(FILEDESCRIPTORW) * n);
  if (!block) return E_OUTOFMEMORY;
  {
    win::GlobalLockGuard<FILEGROUPDESCRIPTORW> lock(block);
    FILEGROUPDESCRIPTORW* group = lock.Get();
    group->cItems = static_cast<UINT>(n);
    // Name only: the receiver learns no size, time or attributes.
    for (size_t i = 0; i < n; ++i) wcscpy_s(group->fgd[i].cFileName, kFileText);
  }
  HandOver(medium, block);
  return S_OK;
}

HRESULT CMarlixDLDataObject::GetFileContents(LONG index, STGMEDIUM& medium) {
  if (ItemList.empty()) return S_FALSE;
  if (index < 0 || static_cast<size_t>(index) >= ItemList.size()) return S_FALSE;
  LPCITEMIDLIST item = ItemList[static_cast<size_t>(index)].Get();
  CPidlMgr pidl;
  if (!pidl.IsFile(item)) return S_FALSE;

  wchar_t path[260] = {};
  pidl.GetPath(item, path, 260);
  CStationRecord level;
  level.Name = PathComponent(path, 1);
  kld::ft::LogTextA("Download: the receiver asks for the file of level '%ls'", level.Name.c_str());
  if (HRESULT hr = FindStation(level); hr != 0) {
    kld::ft::LogTextA("Download: the level is not in the store (0x%08lX)", hr);
    return hr;
  }
  kld::ft::LogTextA("Download: settings COM%d, %d baud, parity %d, %d data bits, stop bits %d, flow %d, "
                    "checksum %d, model '%ls'", level.Port, level.BaudRate, level.Parity, level.DataBits,
                    level.StopBits, level.Flow, level.CheckSum, level.Model.c_str());

  std::wstring target;
  // The bare system code goes back as it is, not converted.
  if (DWORD error = MakeDownloadTargetPath(target); error != 0) {
    kld::ft::LogTextA("Download: no temporary file name (system error %lu)", error);
    return static_cast<HRESULT>(error);
  }

  INT_PTR result;
  {
    auto dialog = std::make_unique<CDownloadProgressDialog>(nullptr, level, target);
    result = dialog->DoModal();
  }
  kld::ft::LogTextA("Download: the dialog ended with %d", static_cast<int>(result));
  if (result == IDCANCEL) return S_FALSE;

  target += L".txt";
  auto stream = com::Make<CStream2>();
  if (!stream) return E_OUTOFMEMORY;
  stream->AttachFile(target, kFileText, true);
  kld::ft::LogTextA("Download: the receiver gets '%ls' as %ls", target.c_str(), kFileText);
  medium.tymed = TYMED_ISTREAM;
  medium.pstm = stream.Detach();
  medium.pUnkForRelease = nullptr;
  return S_OK;
}

HRESULT CMarlixDLDataObject::GetIdListArray(STGMEDIUM& medium) {
  if (ItemList.empty()) return S_FALSE;
  CPidlMgr pidl;
  UniqueIdList parent(pidl.CopyParent(ItemList.front().Get()));
  if (!parent) return S_FALSE;

  const size_t n = ItemList.size();
  const UINT tableEnd = static_cast<UINT>(4 * n + 8);
  SIZE_T size = tableEnd + pidl.GetSize(parent.Get());
  for (const UniqueIdList& item : ItemList) size += pidl.GetSize(pidl.GetLast(item.Get()));

  HGLOBAL block = GlobalAlloc(kClipboardFlags, size);
  if (block) {
    win::GlobalLockGuard<BYTE> lock(block);
    BYTE* base = lock.Get();
    auto* cida = reinterpret_cast<CIDA*>(base);
    cida->cidl = static_cast<UINT>(n);
    UINT offset = tableEnd;
    cida->aoffset[0] = offset;
    UINT parentSize = pidl.GetSize(parent.Get());
    memcpy(base + offset, parent.Get(), parentSize);
    offset += parentSize;
    for (size_t i = 0; i < n; ++i) {
      LPCITEMIDLIST child = pidl.GetLast(ItemList[i].Get());
      UINT childSize = pidl.GetSize(child);
      cida->aoffset[i + 1] = offset;
      if (child) memcpy(base + offset, child, childSize);
      offset += childSize;
    }
  }
  if (!block) return E_OUTOFMEMORY;
  HandOver(medium, block);
  return S_OK;
}

HRESULT CMarlixDLDataObject::GetStations(STGMEDIUM& medium) {
  CPidlMgr pidl;
  std::vector<CStationRecord> found;
  for (const UniqueIdList& item : ItemList) {
    wchar_t path[260] = {};
    pidl.GetPath(item.Get(), path, 260);
    CStationRecord level;
    level.Name = PathComponent(path, 1);
    // A level gone meanwhile is left out silently.
    if (FindStation(level) == 0) found.push_back(level);
  }
  HGLOBAL block = PackStations(found);
  if (!block) return E_OUTOFMEMORY;
  HandOver(medium, block);
  return S_OK;
}

STDMETHODIMP CMarlixDLDataObject::GetDataHere(FORMATETC*, STGMEDIUM*) noexcept { return E_NOTIMPL; }

STDMETHODIMP CMarlixDLDataObject::QueryGetData(FORMATETC* format) noexcept {
  if (!format) return E_INVALIDARG;
  if (TransferDialogOpen()) return E_INVALIDARG;
  const FORMATETC& f = *format;
  if (IsStreamRequest(f, FileContentsFormat()) || IsGlobalRequest(f, GroupDescriptorFormat()) ||
      IsGlobalRequest(f, IdListArrayFormat()) || IsGlobalRequest(f, DropEffectFormat()) ||
      IsGlobalRequest(f, StationsFormat())) {
    return S_OK;
  }
  return S_FALSE;
}

STDMETHODIMP CMarlixDLDataObject::GetCanonicalFormatEtc(FORMATETC*, FORMATETC*) noexcept { return E_NOTIMPL; }

// Accepted and forgotten: the medium stays the caller's.
STDMETHODIMP CMarlixDLDataObject::SetData(FORMATETC*, STGMEDIUM*, BOOL) noexcept { return S_OK; }

STDMETHODIMP CMarlixDLDataObject::EnumFormatEtc(DWORD, IEnumFORMATETC** result) noexcept {
  if (!result) return E_POINTER;
  *result = nullptr;
  // "Preferred DropEffect" is answered on request but deliberately not listed.
  const FORMATETC formats[4] = {
      {FileContentsFormat(), nullptr, DVASPECT_CONTENT, -1, TYMED_ISTREAM},
      {GroupDescriptorFormat(), nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
      {IdListArrayFormat(), nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
      {StationsFormat(), nullptr, DVASPECT_CONTENT, -1, TYMED_HGLOBAL},
  };
  auto list = com::Make<CEnumFormatEtc>(formats, 4);
  if (!list) return E_OUTOFMEMORY;
  *result = list.Detach();
  return S_OK;
}

STDMETHODIMP CMarlixDLDataObject::DAdvise(FORMATETC*, DWORD, IAdviseSink*, DWORD*) noexcept { return E_NOTIMPL; }
STDMETHODIMP CMarlixDLDataObject::DUnadvise(DWORD) noexcept { return E_NOTIMPL; }
STDMETHODIMP CMarlixDLDataObject::EnumDAdvise(IEnumSTATDATA**) noexcept { return E_NOTIMPL; }

STDMETHODIMP CMarlixDLDataObject::QueryContinueDrag(BOOL escapePressed, DWORD keyState) noexcept {
  // The picture goes only when nothing at all is held any more.
  if (keyState == 0) {
    ImageList_EndDrag();
    ImageList_DragLeave(DragWindow);
    DragImage.Reset();
    DragImageShown = FALSE;
  }
  if (escapePressed) return DRAGDROP_S_CANCEL;
  if (keyState & MK_LBUTTON) return S_OK;
  return DRAGDROP_S_DROP;
}

STDMETHODIMP CMarlixDLDataObject::GiveFeedback(DWORD) noexcept {
  if (!DragImage) return DRAGDROP_S_USEDEFAULTCURSORS;
  if (!DragImageShown) {
    ImageList_DragEnter(DragWindow, 0, 0);
    ImageList_BeginDrag(DragImage.Get(), 0, 0, 0);
    DragImageShown = TRUE;
    return DRAGDROP_S_USEDEFAULTCURSORS;
  }
  POINT cursor;
  if (!GetCursorPos(&cursor)) return DRAGDROP_S_USEDEFAULTCURSORS;
  // The picture shows only over the source list.
  HWND under = WindowFromPoint(cursor);
  if (under != DragWindow && !IsChild(DragWindow, under)) {
    ImageList_DragShowNolock(FALSE);
  } else {
    ImageList_DragMove(cursor.x + DragHotSpot.x, cursor.y + DragHotSpot.y);
    ImageList_DragShowNolock(TRUE);
  }
  return DRAGDROP_S_USEDEFAULTCURSORS;
}

HRESULT CreateMarlixDLDataObject(REFIID riid, void** ppv) noexcept { return com::CreateInstance<CMarlixDLDataObject>(riid, ppv); }
