#include "store/pidl_base.h"

#include <cstring>

namespace {

const BYTE* Bytes(LPCITEMIDLIST list) { return reinterpret_cast<const BYTE*>(list); }

LPITEMIDLIST Advance(LPCITEMIDLIST id, size_t bytes) {
  return reinterpret_cast<LPITEMIDLIST>(const_cast<BYTE*>(Bytes(id) + bytes));
}

}  // namespace

CGravonPidlManagerBase::CGravonPidlManagerBase() {
  if (FAILED(SHGetMalloc(malloc_.Put()))) malloc_.Reset();
}

CGravonPidlManagerBase::~CGravonPidlManagerBase() = default;

LPITEMIDLIST CGravonPidlManagerBase::Allocate(size_t size) {
  return malloc_ ? static_cast<LPITEMIDLIST>(malloc_->Alloc(size)) : nullptr;
}

void CGravonPidlManagerBase::Free(LPCITEMIDLIST list) {
  if (list && malloc_) malloc_->Free(const_cast<LPITEMIDLIST>(list));
}

UINT CGravonPidlManagerBase::GetSize(LPCITEMIDLIST list) {
  if (!list) return 0;
  UINT size = 0;
  for (USHORT cb; (cb = IdSize(Advance(list, size))) != 0;) size += cb;
  return size + sizeof(USHORT);
}

UINT CGravonPidlManagerBase::GetCount(LPCITEMIDLIST list) {
  if (!list) return 0;
  UINT count = 0;
  for (LPCITEMIDLIST id = list; IdSize(id) != 0; id = Advance(id, IdSize(id))) ++count;
  return count;
}

LPITEMIDLIST CGravonPidlManagerBase::GetNext(LPCITEMIDLIST list) {
  if (!list || IdSize(list) == 0) return nullptr;
  return Advance(list, IdSize(list));
}

LPITEMIDLIST CGravonPidlManagerBase::GetLast(LPCITEMIDLIST list) {
  if (!list || IdSize(list) == 0) return nullptr;
  LPCITEMIDLIST last = list;
  for (LPCITEMIDLIST next = Advance(last, IdSize(last)); IdSize(next) != 0; next = Advance(next, IdSize(next)))
    last = next;
  return const_cast<LPITEMIDLIST>(last);
}

LPITEMIDLIST CGravonPidlManagerBase::Copy(LPCITEMIDLIST list) {
  if (!list) return nullptr;
  UINT size = GetSize(list);
  LPITEMIDLIST copy = Allocate(size);
  if (copy) std::memcpy(copy, list, size);
  return copy;
}

LPITEMIDLIST CGravonPidlManagerBase::Concatenate(LPCITEMIDLIST first, LPCITEMIDLIST second) {
  if (!first) return Copy(second);
  if (!second) return Copy(first);
  UINT head = GetSize(first) - sizeof(USHORT), tail = GetSize(second);
  LPITEMIDLIST joined = Allocate(head + tail);
  if (!joined) return nullptr;
  std::memcpy(joined, first, head);
  std::memcpy(Advance(joined, head), second, tail);
  return joined;
}

LPITEMIDLIST CGravonPidlManagerBase::CopyFrom(LPCITEMIDLIST list, UINT index) {
  if (index >= GetCount(list)) return nullptr;
  LPCITEMIDLIST id = list;
  for (UINT i = 0; i < index; ++i) id = Advance(id, IdSize(id));
  return Copy(id);
}

LPITEMIDLIST CGravonPidlManagerBase::CopyParent(LPCITEMIDLIST list) {
  if (GetCount(list) < 2) return nullptr;
  const size_t head = reinterpret_cast<const BYTE*>(GetLast(list)) - Bytes(list);
  LPITEMIDLIST parent = Allocate(head + sizeof(USHORT));
  if (!parent) return nullptr;
  std::memcpy(parent, list, head);
  std::memset(Advance(parent, head), 0, sizeof(USHORT));
  return parent;
}

bool CGravonPidlManagerBase::Assign(UniqueIdList& slot, LPCITEMIDLIST list) {
  LPITEMIDLIST copy = Copy(list);
  if (list && !copy) return false;
  slot.Reset(copy);
  return true;
}
