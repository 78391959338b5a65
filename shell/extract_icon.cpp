#include "shell/extract_icon.h"

#include <new>

#include "shell/item_services.h"

CMarlixDLExtractIcon::CMarlixDLExtractIcon() : pidlMgr_(new (std::nothrow) CPidlMgr) {}

bool CMarlixDLExtractIcon::SetItem(LPCITEMIDLIST fullList) { return pidlMgr_ && pidlMgr_->Assign(list_, fullList); }

// The index is the shell's cache key together with GIL_NOTFILENAME: no file is named.
STDMETHODIMP CMarlixDLExtractIcon::GetIconLocation(UINT, LPWSTR, UINT, int* index, UINT* outFlags) noexcept {
  if (outFlags) *outFlags = GIL_NOTFILENAME;
  int image = IMAGE_ADD_LEVEL;
  // An empty list has no type to read: it counts as "anything else".
  LPCITEMIDLIST last = pidlMgr_ ? pidlMgr_->GetLast(list_.Get()) : nullptr;
  if (last) {
    switch (CPidlMgr::GetType(last)) {
      case PIDL_LEVEL: image = IMAGE_LEVEL; break;
      case PIDL_FILE: image = IMAGE_VIRTUAL_FILE; break;
      default: break;
    }
  }
  if (index) *index = image;
  return S_OK;
}

STDMETHODIMP CMarlixDLExtractIcon::Extract(LPCWSTR, UINT index, HICON* large, HICON* small, UINT) noexcept {
  if (large) *large = ImageList_GetIcon(LargeImageList.Get(), static_cast<int>(index), ILD_TRANSPARENT);
  if (small) *small = ImageList_GetIcon(SmallImageList.Get(), static_cast<int>(index), ILD_TRANSPARENT);
  return S_OK;
}

HRESULT CreateMarlixDLExtractIcon(REFIID riid, void** ppv) noexcept { return com::CreateInstance<CMarlixDLExtractIcon>(riid, ppv); }
