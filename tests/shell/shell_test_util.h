#pragma once
#include <windows.h>
#include <shlobj.h>

#include <string>
#include <vector>

#include "helpers/win_handles.h"
#include "store/pidl_manager.h"

using UniqueList = win::UniqueCoMem<ITEMIDLIST>;

// One id of `type` with `text`.
UniqueList MakeId(tagPIDLTYPE type, const wchar_t* text);
// The full list of a path text such as L"Marlix Digital Levels\\Alpha\\file1.tkf".
UniqueList MakeFull(const wchar_t* path);
// Adds a level key "Station <n>" with a "Name" under the current user's store.
void SeedLevel(int n, const std::wstring& name);
// Type and text of every id of a list.
std::vector<std::pair<tagPIDLTYPE, std::wstring>> Ids(LPCITEMIDLIST list);
// Takes the text out of a STRRET_WSTR and frees it.
std::wstring TakeStrRet(STRRET& strret);
