// The tip of one item: its path text, nothing of the level's settings.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <memory>

#include "server/com_base.h"
#include "shell/shell_uuids.h"
#include "store/pidl_base.h"

class CGravonQueryInfoBase : public com::ComObject<IQueryInfo> {
 public:
  // Takes ownership of the manager, which may be null if it could not be made.
  explicit CGravonQueryInfoBase(CGravonPidlManagerBase* pidlMgr);
  ~CGravonQueryInfoBase() override;

  // Keeps a copy of the item's full list; false if it could not be copied.
  bool SetItem(LPCITEMIDLIST fullList);
  bool IsUsable() const noexcept { return m_pidlMgr && m_malloc; }

  STDMETHODIMP GetInfoTip(DWORD flags, LPWSTR* text) override;
  STDMETHODIMP GetInfoFlags(DWORD* flags) override;

 private:
  LPITEMIDLIST m_list = nullptr;
  IMalloc* m_malloc = nullptr;
  std::unique_ptr<CGravonPidlManagerBase> m_pidlMgr;
};

class CMarlixDLQueryInfo : public CGravonQueryInfoBase {
 public:
  CMarlixDLQueryInfo();
};
