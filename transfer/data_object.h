// The data and drag source side of the virtual file "file1.tkf": offers the formats,
// and runs the download only when a receiver asks for the contents.
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <objidl.h>
#include <shlobj.h>
#include <vector>

#include "base/com_base.h"
#include "base/win_handles.h"
#include "store/pidl_base.h"

class CMarlixDLDataObject : public com::ComObject<IDataObject, IDropSource> {
 public:
  CMarlixDLDataObject() noexcept = default;

  // Keeps a copy of a full item list; false when memory is short.
  bool AddItem(LPCITEMIDLIST list);
  // Takes the image list over; QueryContinueDrag destroys it.
  void SetDragImage(win::UniqueImageList image, HWND window, POINT hotSpot) noexcept;

  // IDataObject
  STDMETHODIMP GetData(FORMATETC* format, STGMEDIUM* medium) noexcept override;
  STDMETHODIMP GetDataHere(FORMATETC* format, STGMEDIUM* medium) noexcept override;
  STDMETHODIMP QueryGetData(FORMATETC* format) noexcept override;
  STDMETHODIMP GetCanonicalFormatEtc(FORMATETC* in, FORMATETC* out) noexcept override;
  STDMETHODIMP SetData(FORMATETC* format, STGMEDIUM* medium, BOOL release) noexcept override;
  STDMETHODIMP EnumFormatEtc(DWORD direction, IEnumFORMATETC** result) noexcept override;
  STDMETHODIMP DAdvise(FORMATETC* format, DWORD flags, IAdviseSink* sink, DWORD* connection) noexcept override;
  STDMETHODIMP DUnadvise(DWORD connection) noexcept override;
  STDMETHODIMP EnumDAdvise(IEnumSTATDATA** result) noexcept override;

  // IDropSource
  STDMETHODIMP QueryContinueDrag(BOOL escapePressed, DWORD keyState) noexcept override;
  STDMETHODIMP GiveFeedback(DWORD effect) noexcept override;

  std::vector<UniqueIdList> ItemList;
  win::UniqueImageList DragImage;  // one that a cancelled drag never cleaned up goes with the object
  HWND DragWindow = nullptr;
  POINT DragHotSpot{0, 0};
  BOOL DragImageShown = FALSE;

 private:
  HRESULT GetDropEffect(STGMEDIUM& medium);
  HRESULT GetGroupDescriptor(STGMEDIUM& medium);
  HRESULT GetFileContents(LONG index, STGMEDIUM& medium);
  HRESULT GetIdListArray(STGMEDIUM& medium);
  HRESULT GetStations(STGMEDIUM& medium);
};

// The class object's creator: a data object with no items.
HRESULT CreateMarlixDLDataObject(REFIID riid, void** ppv) noexcept;
