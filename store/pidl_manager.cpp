#include "store/pidl_manager.h"

#include "store/station_record.h"

namespace {

// Deliberately not the folder's class id: it is a parsing name only, never resolved.
const wchar_t kRootParsingName[] = L"::{D8B818CA-E47C-49a1-96A5-C2AA5FB57F15}";
constexpr UINT kRootParsingNameSize = 41;
constexpr size_t kIdOverhead = 19;  // cb, type, reserved bytes and tail around the text

}  // namespace

std::vector<std::wstring> PathComponents(const wchar_t* path) {
  std::vector<std::wstring> components;
  if (!path) return components;
  std::wstring current;
  for (const wchar_t* at = path;; ++at) {
    if (*at == L'\\' || *at == L'/' || *at == 0) {
      if (!current.empty()) components.push_back(std::move(current));
      current.clear();
      if (*at == 0) break;
    } else {
      current.push_back(*at);
    }
  }
  return components;
}

std::wstring PathComponent(const wchar_t* path, size_t index) {
  std::vector<std::wstring> components = PathComponents(path);
  return index < components.size() ? components[index] : std::wstring();
}

LPITEMIDLIST CPidlMgr::CreateItem(tagPIDLTYPE type, const wchar_t* text, UINT size) {
  const size_t n = size & 0xFFFF;
  if ((n != 0 && !text) || n + kIdOverhead > 0xFFFF) return nullptr;
  const size_t cb = n + kIdOverhead;
  LPITEMIDLIST id = Allocate(cb + sizeof(USHORT));
  if (!id) return nullptr;
  BYTE* bytes = reinterpret_cast<BYTE*>(id);
  std::memset(bytes, 0, cb + sizeof(USHORT));
  const USHORT size16 = static_cast<USHORT>(cb);
  std::memcpy(bytes, &size16, sizeof(size16));
  std::memcpy(bytes + sizeof(USHORT) + offsetof(tagPIDLDATA, type), &type, sizeof(type));
  if (n) std::memcpy(bytes + kTextOffset, text, n);
  return id;
}

LPITEMIDLIST CPidlMgr::MakeId(tagPIDLTYPE type, const std::wstring& text) {
  return CreateItem(type, text.c_str(), static_cast<UINT>((text.size() + 1) * sizeof(wchar_t)));
}

LPITEMIDLIST CPidlMgr::CreateRoot() { return MakeId(PIDL_ROOT, kRootText); }

LPITEMIDLIST CPidlMgr::CreateItemFromPath(const wchar_t* path) {
  std::vector<std::wstring> parts = PathComponents(path);
  if (parts.empty()) return nullptr;
  // Component 2 is not looked at: a level's path gives the relative level id.
  if (parts.size() > 1) return MakeId(PIDL_LEVEL, parts[1]);
  return MakeId(PIDL_ROOT, parts[0]);
}

LPITEMIDLIST CPidlMgr::CreateListFromPath(const wchar_t* path) {
  std::vector<std::wstring> parts = PathComponents(path);
  if (parts.empty()) return nullptr;
  LPITEMIDLIST list = MakeId(PIDL_ROOT, parts[0]);
  const tagPIDLTYPE deeper[] = {PIDL_LEVEL, PIDL_FILE};
  for (size_t i = 1; i < parts.size() && i < 3 && list; ++i) {
    LPITEMIDLIST id = MakeId(deeper[i - 1], parts[i]);
    LPITEMIDLIST joined = id ? Concatenate(list, id) : nullptr;
    Free(id);
    Free(list);
    list = joined;
  }
  return list;
}

UINT CPidlMgr::GetRootParsingName(wchar_t* destination, UINT length) {
  if (!destination || length == 0) return kRootParsingNameSize;
  wcsncpy(destination, kRootParsingName, length);
  return length < kRootParsingNameSize ? length : kRootParsingNameSize;
}

bool CPidlMgr::IsValid(LPCITEMIDLIST list) {
  if (!list || IdSize(list) == 0 || GetType(list) != PIDL_LEVEL) return true;
  CStationRecord record;
  record.Name = GetTextCopy(list);
  return FindStation(record) == S_OK;
}

// An empty list has no type to read, so it is none of the kinds.
bool CPidlMgr::LastIs(LPCITEMIDLIST list, tagPIDLTYPE a, tagPIDLTYPE b) {
  LPCITEMIDLIST last = GetLast(list);
  if (!last) return false;
  tagPIDLTYPE type = GetType(last);
  return type == a || type == b;
}

bool CPidlMgr::IsRoot(LPCITEMIDLIST list) { return LastIs(list, PIDL_ROOT, PIDL_ROOT); }
bool CPidlMgr::IsFolder(LPCITEMIDLIST list) { return LastIs(list, PIDL_ROOT, PIDL_LEVEL); }
bool CPidlMgr::IsFile(LPCITEMIDLIST list) { return LastIs(list, PIDL_FILE, PIDL_FILE); }
bool CPidlMgr::IsTopLevel(LPCITEMIDLIST list) { return LastIs(list, PIDL_ROOT, PIDL_ROOT); }
