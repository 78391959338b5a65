#include "shell/shell_folder.h"

#include <new>

#include "base/class_ids.h"
#include "store/pidl_manager.h"

CMarlixDLShellFolder::CMarlixDLShellFolder()
    : CGravonShellFolderImpl(new (std::nothrow) CPidlMgr) {}

// The same class at every depth.
STDMETHODIMP CMarlixDLShellFolder::GetClassID(CLSID* classId) noexcept {
  if (!classId) return E_POINTER;
  *classId = CLSID_MarlixDLShellFolder;
  return S_OK;
}

HRESULT CreateMarlixDLShellFolder(REFIID riid, void** ppv) noexcept { return com::CreateInstance<CMarlixDLShellFolder>(riid, ppv); }
