// The brand-neutral part of a namespace folder: its position and every answer that
// needs no concrete class.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <memory>

#include "base/com_base.h"
#include "store/pidl_base.h"

class CGravonShellFolderBase : public com::ComObject<IShellFolder, IPersistFolder> {
 public:
  // Takes ownership of the manager (null if it could not be made).
  explicit CGravonShellFolderBase(CGravonPidlManagerBase* pidlMgr);

  // The folder behind an interface, when it is one of ours; null for a folder of anyone
  // else. Asked through COM, as the module is built without run-time type information.
  static CGravonShellFolderBase* FromFolder(IShellFolder* folder) noexcept;

  // The folder's address. Plain: the parent's address, a backslash and this folder's
  // text, so it starts with a backslash. Parsing: at the root the root's parsing
  // name, below it that and the level's text. False if it doesn't fit `size`.
  bool GetFolderPath(wchar_t* destination, UINT size, bool parsing) const;
  // Positions the folder under `parent` (null at the root) at `list` (null: the root).
  HRESULT Init(CGravonShellFolderBase* parent, LPCITEMIDLIST list);
  // False if the object could not get its allocator or list manager.
  bool IsUsable() const noexcept { return pidlMgr_ && malloc_; }

  // IShellFolder
  STDMETHODIMP ParseDisplayName(HWND window, IBindCtx* context, LPWSTR name, ULONG* eaten,
                                PIDLIST_RELATIVE* result, ULONG* attributes) noexcept override;
  STDMETHODIMP BindToStorage(PCUIDLIST_RELATIVE list, IBindCtx* context, REFIID riid, void** result) noexcept override;
  STDMETHODIMP CompareIDs(LPARAM parameter, PCUIDLIST_RELATIVE first, PCUIDLIST_RELATIVE second) noexcept override;
  STDMETHODIMP GetAttributesOf(UINT count, PCUITEMID_CHILD_ARRAY items, SFGAOF* attributes) noexcept override;
  STDMETHODIMP GetDisplayNameOf(PCUITEMID_CHILD item, SHGDNF flags, STRRET* name) noexcept override;
  STDMETHODIMP SetNameOf(HWND window, PCUITEMID_CHILD item, LPCWSTR name, SHGDNF flags,
                         PITEMID_CHILD* result) noexcept override;

  // IPersistFolder: always positions at the root, whatever the shell passes.
  STDMETHODIMP Initialize(PCIDLIST_ABSOLUTE list) noexcept override;

 protected:
  void* FindInterface(REFIID riid) noexcept override;
  // The bodies of the slots above that allocate; the slots keep exceptions inside.
  HRESULT AttributesOf(UINT count, PCUITEMID_CHILD_ARRAY items, SFGAOF& attributes);
  HRESULT DisplayNameOf(PCUITEMID_CHILD item, SHGDNF flags, STRRET& name);

  UniqueIdList list_;
  com::ComPtr<CGravonShellFolderBase> parent_;
  com::ComPtr<IMalloc> malloc_;
  std::unique_ptr<CGravonPidlManagerBase> pidlMgr_;
  std::unique_ptr<wchar_t[]> parsingName_;
  std::unique_ptr<wchar_t[]> pathText_;
};
