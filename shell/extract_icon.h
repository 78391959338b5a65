// The picture of one item, served from the process-wide image lists.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <memory>

#include "base/com_base.h"
#include "shell/shell_uuids.h"
#include "store/pidl_manager.h"

class CMarlixDLExtractIcon : public com::ComObject<IExtractIconW> {
 public:
  CMarlixDLExtractIcon();

  // Keeps a copy of the item's full list; false if it could not be copied.
  bool SetItem(LPCITEMIDLIST fullList);
  // False if the object could not get its list manager.
  bool IsUsable() const noexcept { return pidlMgr_ != nullptr; }

  STDMETHODIMP GetIconLocation(UINT flags, LPWSTR file, UINT size, int* index, UINT* outFlags) noexcept override;
  STDMETHODIMP Extract(LPCWSTR file, UINT index, HICON* large, HICON* small, UINT sizes) noexcept override;

 private:
  std::unique_ptr<CPidlMgr> pidlMgr_;
  UniqueIdList list_;
};

// The class object's creator: an icon object with no item.
HRESULT CreateMarlixDLExtractIcon(REFIID riid, void** ppv) noexcept;
