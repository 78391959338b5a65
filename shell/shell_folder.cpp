#include "shell/shell_folder.h"

#include <new>

#include "server/class_creators.h"
#include "server/class_ids.h"
#include "store/pidl_manager.h"

CMarlixDLShellFolder::CMarlixDLShellFolder()
    : CGravonShellFolderImpl(new (std::nothrow) CPidlMgr) {}

// The same class at every depth.
STDMETHODIMP CMarlixDLShellFolder::GetClassID(CLSID* classId) {
  if (!classId) return E_POINTER;
  *classId = CLSID_MarlixDLShellFolder;
  return S_OK;
}

HRESULT CreateMarlixDLShellFolder(REFIID riid, void** ppv) { return com::CreateInstance<CMarlixDLShellFolder>(riid, ppv); }
