// The byte format of the namespace's item identifiers and the operations on raw lists.
#pragma once
#include <windows.h>
#include <shlobj.h>
#include <cstddef>
#include <cstdint>
#include <cstring>

#include "base/com_base.h"
#include "base/win_handles.h"

enum tagPIDLTYPE : uint32_t {
  PIDL_ROOT = 1,   // the namespace folder itself
  PIDL_LEVEL = 2,  // one digital level, by its name
  PIDL_FILE = 3,   // the virtual file of a level
};

// An id from offset 2 on. Ids are packed back to back with odd sizes, so fields
// are often unaligned: read them through the accessors, not through this struct.
#pragma pack(push, 1)
struct tagPIDLDATA {
  tagPIDLTYPE type;
  BYTE reserved[8];
  wchar_t text[1];  // NUL-terminated, followed by 5 unused bytes
};
#pragma pack(pop)
static_assert(offsetof(tagPIDLDATA, text) == 12, "text lies at offset 14 of an id");

// An owned list: the task allocator is the shell's IMalloc, so its owner frees it as Free does.
using UniqueIdList = win::UniqueCoMem<ITEMIDLIST>;

// Operations that know nothing of an id beyond its cb. All accept a null list.
// Every list made here comes from the shell's task allocator and is the caller's to Free.
class CGravonPidlManagerBase {
 public:
  CGravonPidlManagerBase();
  virtual ~CGravonPidlManagerBase();

  virtual LPITEMIDLIST CreateRoot() = 0;
  virtual LPITEMIDLIST CreateItemFromPath(const wchar_t* path) = 0;
  virtual LPITEMIDLIST CreateListFromPath(const wchar_t* path) = 0;
  virtual UINT GetRootParsingName(wchar_t* destination, UINT length) = 0;
  virtual bool IsValid(LPCITEMIDLIST list) = 0;
  virtual bool IsRoot(LPCITEMIDLIST list) = 0;
  virtual bool IsFolder(LPCITEMIDLIST list) = 0;
  virtual bool IsFile(LPCITEMIDLIST list) = 0;
  virtual bool IsTopLevel(LPCITEMIDLIST list) = 0;
  virtual UINT GetPath(LPCITEMIDLIST list, wchar_t* destination, UINT length) = 0;
  virtual int Compare(LPARAM parameter, LPCITEMIDLIST first, LPCITEMIDLIST second) = 0;

  // Both null: null. One null: a copy of the other.
  LPITEMIDLIST Concatenate(LPCITEMIDLIST first, LPCITEMIDLIST second);
  LPITEMIDLIST Copy(LPCITEMIDLIST list);
  // The ids from `index` on; null if there are not more than `index` ids.
  LPITEMIDLIST CopyFrom(LPCITEMIDLIST list, UINT index);
  // All ids but the last; null for fewer than two ids.
  LPITEMIDLIST CopyParent(LPCITEMIDLIST list);
  void Free(LPCITEMIDLIST list);
  // Replaces `slot` by a copy of `list`, freeing what it held; false, with `slot` unchanged,
  // when a non-null list cannot be copied.
  bool Assign(UniqueIdList& slot, LPCITEMIDLIST list);
  UINT GetCount(LPCITEMIDLIST list);
  // The last id inside the list; null for a null or empty list.
  LPITEMIDLIST GetLast(LPCITEMIDLIST list);
  // The id after the first (perhaps the terminator); null for a null or empty list.
  LPITEMIDLIST GetNext(LPCITEMIDLIST list);
  // Bytes with the terminator: 0 for null, 2 for an empty list.
  UINT GetSize(LPCITEMIDLIST list);

 protected:
  // Task allocator memory of `size` bytes; null if there is none.
  LPITEMIDLIST Allocate(size_t size);

 private:
  com::ComPtr<IMalloc> malloc_;
};

// cb of the id at `id`, read unaligned.
inline USHORT IdSize(LPCITEMIDLIST id) {
  USHORT cb;
  memcpy(&cb, id, sizeof(cb));
  return cb;
}
