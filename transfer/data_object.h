// The data and drag source side of the virtual file "file1.tkf": offers the formats,
// and runs the download only when a receiver asks for the contents.
#pragma once
#include <windows.h>
#include <commctrl.h>
#include <objidl.h>
#include <shlobj.h>
#include <vector>

#include "server/com_base.h"

class CMarlixDLDataObject : public com::ComObject<IDataObject, IDropSource> {
 public:
  CMarlixDLDataObject() noexcept = default;

  // Keeps a copy of a full item list; false when memory is short.
  bool AddItem(LPCITEMIDLIST list);
  // Takes the image list over; QueryContinueDrag destroys it.
  void SetDragImage(HIMAGELIST image, HWND window, POINT hotSpot) noexcept;

  // IDataObject
  STDMETHODIMP GetData(FORMATETC* format, STGMEDIUM* medium) override;
  STDMETHODIMP GetDataHere(FORMATETC* format, STGMEDIUM* medium) override;
  STDMETHODIMP QueryGetData(FORMATETC* format) override;
  STDMETHODIMP GetCanonicalFormatEtc(FORMATETC* in, FORMATETC* out) override;
  STDMETHODIMP SetData(FORMATETC* format, STGMEDIUM* medium, BOOL release) override;
  STDMETHODIMP EnumFormatEtc(DWORD direction, IEnumFORMATETC** result) override;
  STDMETHODIMP DAdvise(FORMATETC* format, DWORD flags, IAdviseSink* sink, DWORD* connection) override;
  STDMETHODIMP DUnadvise(DWORD connection) override;
  STDMETHODIMP EnumDAdvise(IEnumSTATDATA** result) override;

  // IDropSource
  STDMETHODIMP QueryContinueDrag(BOOL escapePressed, DWORD keyState) override;
  STDMETHODIMP GiveFeedback(DWORD effect) override;

  std::vector<LPITEMIDLIST> ItemList;
  HIMAGELIST DragImage = nullptr;
  HWND DragWindow = nullptr;
  POINT DragHotSpot{0, 0};
  BOOL DragImageShown = FALSE;

 protected:
  ~CMarlixDLDataObject() override;

 private:
  HRESULT GetDropEffect(STGMEDIUM& medium);
  HRESULT GetGroupDescriptor(STGMEDIUM& medium);
  HRESULT GetFileContents(LONG index, STGMEDIUM& medium);
  HRESULT GetIdListArray(STGMEDIUM& medium);
  HRESULT GetStations(STGMEDIUM& medium);
};
