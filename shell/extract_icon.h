// The picture of one item, served from the process-wide image lists.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <memory>

#include "server/com_base.h"
#include "shell/shell_uuids.h"
#include "store/pidl_manager.h"

class CMarlixDLExtractIcon : public com::ComObject<IExtractIconW> {
 public:
  CMarlixDLExtractIcon();
  ~CMarlixDLExtractIcon() override;

  // Keeps a copy of the item's full list; false if it could not be copied.
  bool SetItem(LPCITEMIDLIST fullList);
  // False if the object could not get its list manager.
  bool IsUsable() const noexcept { return m_pidlMgr != nullptr; }

  STDMETHODIMP GetIconLocation(UINT flags, LPWSTR file, UINT size, int* index, UINT* outFlags) override;
  STDMETHODIMP Extract(LPCWSTR file, UINT index, HICON* large, HICON* small, UINT sizes) override;

 private:
  LPITEMIDLIST m_list = nullptr;
  std::unique_ptr<CPidlMgr> m_pidlMgr;
};
