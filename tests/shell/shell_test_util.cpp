// Reaching the folder as the shell does, and waiting on what a person would see.
#include "shell/shell_test_util.h"

#include <commctrl.h>
#include <gtest/gtest.h>

#include "store/station_record.h"
#include "support/registry_sandbox.h"

UniqueList MakeId(tagPIDLTYPE type, const wchar_t* text) {
  return UniqueList(CPidlMgr().CreateItem(type, text, static_cast<UINT>((wcslen(text) + 1) * sizeof(wchar_t))));
}
UniqueList MakeFull(const wchar_t* path) { return UniqueList(CPidlMgr().CreateListFromPath(path)); }

void SeedLevel(int n, const std::wstring& name) {
  RegWriteString(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\Station " + std::to_wstring(n), L"Name", name);
}
IdList Ids(LPCITEMIDLIST list) {
  IdList ids;
  for (LPCITEMIDLIST id = list; id && IdSize(id) != 0;
       id = reinterpret_cast<LPCITEMIDLIST>(reinterpret_cast<const BYTE*>(id) + IdSize(id)))
    ids.emplace_back(CPidlMgr::GetType(id), CPidlMgr::GetTextCopy(id));
  return ids;
}
std::vector<UniqueList> Drain(IEnumIDList* list) {
  std::vector<UniqueList> items;
  LPITEMIDLIST item = nullptr;
  ULONG fetched = list ? 7 : 0;
  while (list && list->Next(1, &item, &fetched) == S_OK) items.emplace_back(item);
  EXPECT_EQ(fetched, 0u);
  return items;
}
com::ComPtr<IShellFolder> Bind(IShellFolder* parent, LPCITEMIDLIST item) {
  com::ComPtr<IShellFolder> child;
  EXPECT_EQ(parent->BindToObject(item, nullptr, IID_IShellFolder, child.PutVoid()), S_OK);
  return child;
}
std::wstring Name(IShellFolder* folder, LPCITEMIDLIST item, SHGDNF flags, HRESULT* hr) {
  STRRET strret{};
  HRESULT result = folder->GetDisplayNameOf(item, flags, &strret);
  if (hr) *hr = result;
  if (FAILED(result)) return L"<failed>";
  if (strret.uType != STRRET_WSTR || !strret.pOleStr) return L"<not a wide string>";
  return win::UniqueCoMem<wchar_t>(strret.pOleStr).Get();
}

com::ComPtr<IExplorerBrowser> BrowseToFolder(HWND frame, RECT rect) {
  com::ComPtr<IExplorerBrowser> browser;
  FOLDERSETTINGS settings{FVM_DETAILS, 0};
  UniqueList folder;
  EXPECT_EQ(CoCreateInstance(CLSID_ExplorerBrowser, nullptr, CLSCTX_INPROC_SERVER, IID_IExplorerBrowser,
                             browser.PutVoid()), S_OK);
  EXPECT_EQ(SHParseDisplayName(kFolderPath, nullptr, folder.Put(), 0, nullptr), S_OK);
  if (!browser || FAILED(browser->Initialize(frame, &rect, &settings)) ||
      FAILED(browser->BrowseToIDList(folder.Get(), SBSP_ABSOLUTE)))
    return nullptr;
  return browser;
}
HWND CurrentList(IExplorerBrowser* browser) {
  com::ComPtr<IShellView> view;
  HWND window = nullptr;
  if (FAILED(browser->GetCurrentView(IID_IShellView, view.PutVoid())) || FAILED(view->GetWindow(&window))) return nullptr;
  HWND list = GetDlgItem(window, 2000);
  EXPECT_TRUE(ui::PumpFor([&] { return !FindWindowExW(list, nullptr, ANIMATE_CLASSW, nullptr); })) << "filled";
  return list;
}

std::vector<std::wstring> ListRows(HWND list, bool images) {
  std::vector<std::wstring> rows;
  for (int i = 0; i < ListView_GetItemCount(list); ++i) {
    wchar_t text[MAX_PATH] = {};
    LVITEMW item{LVIF_IMAGE, i, 0, 0, 0, text, MAX_PATH};
    SendMessageW(list, images ? LVM_GETITEMW : LVM_GETITEMTEXTW, i, reinterpret_cast<LPARAM>(&item));
    rows.push_back(images ? std::to_wstring(item.iImage) : text);
  }
  return rows;
}

long KernelHandleCount() {
  using Query = LONG(WINAPI*)(ULONG, void*, ULONG, ULONG*);
  auto query = reinterpret_cast<Query>(
      reinterpret_cast<void*>(GetProcAddress(GetModuleHandleW(L"ntdll.dll"), "NtQuerySystemInformation")));
  struct Entry { ULONG pid; BYTE type, flags; USHORT value; void* object; ULONG access; };
  std::vector<BYTE> buffer(1 << 20);
  ULONG size = 0;
  while (query(16 /* SystemHandleInformation */, buffer.data(), static_cast<ULONG>(buffer.size()), &size) ==
         static_cast<LONG>(0xC0000004))
    buffer.resize(buffer.size() * 2);
  ULONG count = *reinterpret_cast<ULONG*>(buffer.data());
  auto* entries = reinterpret_cast<Entry*>(buffer.data() + sizeof(void*));
  long mine = 0;
  for (ULONG i = 0; i < count && sizeof(void*) + (i + 1) * sizeof(Entry) <= buffer.size(); ++i)
    mine += entries[i].pid == GetCurrentProcessId();
  return mine;
}
