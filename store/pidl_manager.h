// Builds, reads and compares the namespace's item identifier lists.
#pragma once
#include <windows.h>
#include <shlobj.h>
#include <cstddef>
#include <cstring>
#include <cwchar>
#include <string>
#include <vector>

#include "store/pidl_base.h"

// The texts of the namespace's fixed ids: the folder itself, and the virtual file of a level.
inline constexpr wchar_t kRootText[] = L"Marlix Digital Levels";
inline constexpr wchar_t kFileText[] = L"file1.tkf";

// A path text cut at every backslash and slash, without empty components.
std::vector<std::wstring> PathComponents(const wchar_t* path);
// Component `index` of a path text; empty if there is none.
std::wstring PathComponent(const wchar_t* path, size_t index);

// The operations that read an id's text: its path, and the order of two lists.
template <class TYPE, class DATA>
class CGravonPidlManagerImpl : public CGravonPidlManagerBase {
 public:
  static constexpr size_t kTextOffset = sizeof(USHORT) + offsetof(DATA, text);

  static TYPE GetType(LPCITEMIDLIST id) {
    TYPE type;
    std::memcpy(&type, reinterpret_cast<const BYTE*>(id) + sizeof(USHORT) + offsetof(DATA, type), sizeof(type));
    return type;
  }
  // Points into the id; unaligned for every id after the first of a list.
  static const wchar_t* GetText(LPCITEMIDLIST id) {
    return reinterpret_cast<const wchar_t*>(reinterpret_cast<const BYTE*>(id) + kTextOffset);
  }
  // A copy of the id's text, which never reaches past its cb.
  static std::wstring GetTextCopy(LPCITEMIDLIST id) {
    std::wstring text;
    const BYTE* at = reinterpret_cast<const BYTE*>(id) + kTextOffset;
    const USHORT cb = IdSize(id);
    for (size_t offset = kTextOffset; offset + 1 < cb; offset += 2, at += 2) {
      wchar_t c = static_cast<wchar_t>(at[0] | (at[1] << 8));
      if (c == 0) break;
      text.push_back(c);
    }
    return text;
  }

  // Without a destination: the characters a destination needs, terminator included.
  // With one: the ids' texts joined by backslashes, cut to fit; returns the text's length.
  UINT GetPath(LPCITEMIDLIST list, wchar_t* destination, UINT length) override {
    if (!list) return 0;
    if (!destination) {
      UINT needed = 1;
      for (LPCITEMIDLIST id = list; IdSize(id) != 0; id = Next(id)) needed += GetTextCopy(id).size() + 1;
      return needed;
    }
    if (length == 0) return 0;
    std::wstring path;
    for (LPCITEMIDLIST id = list; IdSize(id) != 0 && path.size() < length; id = Next(id))
      path += GetTextCopy(id) + L'\\';
    if (path.size() > length - 1) path.resize(length - 1);
    if (!path.empty() && path.back() == L'\\') path.pop_back();
    std::memcpy(destination, path.c_str(), (path.size() + 1) * sizeof(wchar_t));
    return static_cast<UINT>(path.size());
  }

  // 0 for lists of different types: they are never ordered. Otherwise the paths
  // compared without case, times the parameter (a sort direction) in 32 bits.
  int Compare(LPARAM parameter, LPCITEMIDLIST first, LPCITEMIDLIST second) override {
    if (!first || !second || IdSize(first) == 0 || IdSize(second) == 0) return 0;
    if (GetType(first) != GetType(second)) return 0;
    wchar_t a[MAX_PATH], b[MAX_PATH];
    GetPath(first, a, MAX_PATH);
    GetPath(second, b, MAX_PATH);
    int order = _wcsicmp(a, b);
    if (parameter == 0) return order;
    return static_cast<int>(static_cast<uint32_t>(order) * static_cast<uint32_t>(parameter));
  }

 private:
  static LPCITEMIDLIST Next(LPCITEMIDLIST id) {
    return reinterpret_cast<LPCITEMIDLIST>(reinterpret_cast<const BYTE*>(id) + IdSize(id));
  }
};

// The one manager of the namespace's lists. Cheap: holds only the allocator.
class CPidlMgr : public CGravonPidlManagerImpl<tagPIDLTYPE, tagPIDLDATA> {
 public:
  LPITEMIDLIST CreateRoot() override;
  // The id of the deepest of components 0 and 1: the root, or a level.
  LPITEMIDLIST CreateItemFromPath(const wchar_t* path) override;
  // The full list of components 0, 1 and 2.
  LPITEMIDLIST CreateListFromPath(const wchar_t* path) override;
  UINT GetRootParsingName(wchar_t* destination, UINT length) override;
  // False only for a level id whose level is no longer in the store.
  bool IsValid(LPCITEMIDLIST list) override;
  bool IsRoot(LPCITEMIDLIST list) override;
  bool IsFolder(LPCITEMIDLIST list) override;
  bool IsFile(LPCITEMIDLIST list) override;
  bool IsTopLevel(LPCITEMIDLIST list) override;

  // A one-id list; `size` is the text's size in bytes with its terminator.
  LPITEMIDLIST CreateItem(tagPIDLTYPE type, const wchar_t* text, UINT size);

 private:
  LPITEMIDLIST MakeId(tagPIDLTYPE type, const std::wstring& text);
  bool LastIs(LPCITEMIDLIST list, tagPIDLTYPE a, tagPIDLTYPE b);
};
