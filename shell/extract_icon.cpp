#include "shell/extract_icon.h"

#include <new>

#include "server/class_creators.h"
#include "shell/item_services.h"

CMarlixDLExtractIcon::CMarlixDLExtractIcon() : m_pidlMgr(new (std::nothrow) CPidlMgr) {}

CMarlixDLExtractIcon::~CMarlixDLExtractIcon() {
  if (m_pidlMgr) m_pidlMgr->Free(m_list);
}

bool CMarlixDLExtractIcon::SetItem(LPCITEMIDLIST fullList) {
  return m_pidlMgr && m_pidlMgr->Assign(m_list, fullList);
}

// The index is the shell's cache key together with GIL_NOTFILENAME: no file is named.
STDMETHODIMP CMarlixDLExtractIcon::GetIconLocation(UINT, LPWSTR, UINT, int* index, UINT* outFlags) {
  if (outFlags) *outFlags = GIL_NOTFILENAME;
  int image = IMAGE_ADD_LEVEL;
  // An empty list has no type to read: it counts as "anything else".
  LPCITEMIDLIST last = m_pidlMgr ? m_pidlMgr->GetLast(m_list) : nullptr;
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

STDMETHODIMP CMarlixDLExtractIcon::Extract(LPCWSTR, UINT index, HICON* large, HICON* small, UINT) {
  if (large) *large = ImageList_GetIcon(LargeImageList, static_cast<int>(index), ILD_TRANSPARENT);
  if (small) *small = ImageList_GetIcon(SmallImageList, static_cast<int>(index), ILD_TRANSPARENT);
  return S_OK;
}

HRESULT CreateMarlixDLExtractIcon(REFIID riid, void** ppv) { return com::CreateInstance<CMarlixDLExtractIcon>(riid, ppv); }
