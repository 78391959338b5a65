// The contents of a folder as the shell walks them: the levels at the root, the
// virtual file in a level. Built in full at creation; later store changes don't show.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <memory>

#include "base/com_base.h"
#include "store/pidl_manager.h"

// A singly linked list of item lists, nodes and items both from the task allocator.
class CEnumIDListImpl : public com::ComObject<IEnumIDList> {
 public:
  // Takes ownership of the manager (null if it could not be made).
  explicit CEnumIDListImpl(CGravonPidlManagerBase* pidlMgr);
  ~CEnumIDListImpl() override;

  // Appends and takes the item; false (the item stays the caller's) without a node.
  bool AddToEnumList(UniqueIdList& item);

  STDMETHODIMP Next(ULONG count, LPITEMIDLIST* items, ULONG* fetched) noexcept override;
  STDMETHODIMP Skip(ULONG count) noexcept override;
  STDMETHODIMP Reset() noexcept override;
  STDMETHODIMP Clone(IEnumIDList** result) noexcept override;

 protected:
  struct Node {
    Node* next;
    LPITEMIDLIST item;
  };

  std::unique_ptr<CGravonPidlManagerBase> pidlMgr_;
  com::ComPtr<IMalloc> malloc_;
  Node* first_ = nullptr;
  Node* last_ = nullptr;
  Node* current_ = nullptr;
};

class CMarlixDLEnumIDList : public CEnumIDListImpl {
 public:
  CMarlixDLEnumIDList();

  // Builds the list for the folder at `path` (plain form) with SHCONTF `flags`.
  // *result is S_OK, or E_OUTOFMEMORY for any failure, and then this object has
  // released its own reference and is gone.
  void Create(const wchar_t* path, DWORD flags, HRESULT* result) noexcept;

 private:
  HRESULT Build(const wchar_t* path, DWORD flags);
  HRESULT AddLevels(const std::wstring& path);

  CPidlMgr* marlixPidlMgr_;
};

// The class object's creator: an empty enumerator.
HRESULT CreateMarlixDLEnumIDList(REFIID riid, void** ppv) noexcept;
