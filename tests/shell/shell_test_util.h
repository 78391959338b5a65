// What the shell tests share to reach the folder as the shell does and to wait on what a person would see.
#pragma once
#include <windows.h>
#include <shlobj.h>
#include <string>
#include <vector>
#include "base/win_handles.h"
#include "base/com_base.h"
#include "store/pidl_manager.h"
#include "support/window_waits.h"

using UniqueList = win::UniqueCoMem<ITEMIDLIST>;
using IdList = std::vector<std::pair<tagPIDLTYPE, std::wstring>>;
const std::wstring kParsingRoot = L"::{D8B818CA-E47C-49a1-96A5-C2AA5FB57F15}";
// The registered folder under My Computer, as the shell parses it.
const wchar_t kFolderPath[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}";

UniqueList MakeId(tagPIDLTYPE type, const wchar_t* text);
UniqueList MakeFull(const wchar_t* path);  // e.g. L"Marlix Digital Levels\\Alpha\\file1.tkf"
void SeedLevel(int n, const std::wstring& name);  // a level key "Station <n>" with a "Name" in the user's store
IdList Ids(LPCITEMIDLIST list);  // type and text of every id
std::vector<UniqueList> Drain(IEnumIDList* list);  // checks the last Next reports none fetched
com::ComPtr<IShellFolder> Bind(IShellFolder* parent, LPCITEMIDLIST item);
// A display name, which must come as a wide string; "<failed>" if the call fails.
std::wstring Name(IShellFolder* folder, LPCITEMIDLIST item, SHGDNF flags, HRESULT* hr = nullptr);
// Wine's ExplorerBrowser in `frame`, in Details, moved to the registered folder; null on failure.
com::ComPtr<IExplorerBrowser> BrowseToFolder(HWND frame, RECT rect);
// The list of the browser's current view, once its thread has filled it.
HWND CurrentList(IExplorerBrowser* browser);
// Kernel handles of this process (registry keys among them), from the system's handle list:
// Wine answers 0 to GetProcessHandleCount.
long KernelHandleCount();
// The text, or with `images` the picture index, of every row of a list view.
std::vector<std::wstring> ListRows(HWND list, bool images = false);
