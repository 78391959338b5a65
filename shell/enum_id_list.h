// The contents of a folder as the shell walks them: the levels at the root, the
// virtual file in a level. Built in full at creation; later store changes don't show.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include "server/com_base.h"
#include "store/pidl_manager.h"

// A singly linked list of item lists, nodes and items both from the task allocator.
class CEnumIDListImpl : public com::ComObject<IEnumIDList> {
 public:
  // Takes ownership of the manager (null if it could not be made).
  explicit CEnumIDListImpl(CGravonPidlManagerBase* pidlMgr);
  ~CEnumIDListImpl() override;

  // Appends and takes the item; false (the item stays the caller's) without a node.
  bool AddToEnumList(LPITEMIDLIST item);

  STDMETHODIMP Next(ULONG count, LPITEMIDLIST* items, ULONG* fetched) override;
  STDMETHODIMP Skip(ULONG count) override;
  STDMETHODIMP Reset() override;
  STDMETHODIMP Clone(IEnumIDList** result) override;

 protected:
  struct Node {
    Node* next;
    LPITEMIDLIST item;
  };

  CGravonPidlManagerBase* m_pidlMgr;
  IMalloc* m_malloc = nullptr;
  Node* m_first = nullptr;
  Node* m_last = nullptr;
  Node* m_current = nullptr;
};

class CMarlixDLEnumIDList : public CEnumIDListImpl {
 public:
  CMarlixDLEnumIDList();

  // Builds the list for the folder at `path` (plain form) with SHCONTF `flags`.
  // *result is S_OK, or E_OUTOFMEMORY for any failure, and then this object has
  // released its own reference and is gone.
  void Create(const wchar_t* path, DWORD flags, HRESULT* result);

 private:
  HRESULT Build(const wchar_t* path, DWORD flags);
  HRESULT AddLevels(const std::wstring& path);

  CPidlMgr* m_marlixPidlMgr;
};
