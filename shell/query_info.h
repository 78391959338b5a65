// The tip of one item: its path text, nothing of the level's settings.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <memory>

#include "base/com_base.h"
#include "shell/shell_uuids.h"
#include "store/pidl_base.h"

class CGravonQueryInfoBase : public com::ComObject<IQueryInfo> {
 public:
  // Takes ownership of the manager, which may be null if it could not be made.
  explicit CGravonQueryInfoBase(CGravonPidlManagerBase* pidlMgr);

  // Keeps a copy of the item's full list; false if it could not be copied.
  bool SetItem(LPCITEMIDLIST fullList);
  bool IsUsable() const noexcept { return pidlMgr_ && malloc_; }

  STDMETHODIMP GetInfoTip(DWORD flags, LPWSTR* text) noexcept override;
  STDMETHODIMP GetInfoFlags(DWORD* flags) noexcept override;

 private:
  com::ComPtr<IMalloc> malloc_;
  std::unique_ptr<CGravonPidlManagerBase> pidlMgr_;
  UniqueIdList list_;
};

class CMarlixDLQueryInfo : public CGravonQueryInfoBase {
 public:
  CMarlixDLQueryInfo();
};

// The class object's creator: a tip object with no item.
HRESULT CreateMarlixDLQueryInfo(REFIID riid, void** ppv) noexcept;
