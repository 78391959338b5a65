#include "shell/shell_test_util.h"

#include "store/station_record.h"
#include "support/registry_sandbox.h"

UniqueList MakeId(tagPIDLTYPE type, const wchar_t* text) {
  CPidlMgr mgr;
  return UniqueList(mgr.CreateItem(type, text, static_cast<UINT>((wcslen(text) + 1) * sizeof(wchar_t))));
}

UniqueList MakeFull(const wchar_t* path) { return UniqueList(CPidlMgr().CreateListFromPath(path)); }

void SeedLevel(int n, const std::wstring& name) {
  RegWriteString(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\Station " + std::to_wstring(n), L"Name", name);
}

std::vector<std::pair<tagPIDLTYPE, std::wstring>> Ids(LPCITEMIDLIST list) {
  std::vector<std::pair<tagPIDLTYPE, std::wstring>> ids;
  for (LPCITEMIDLIST id = list; id && IdSize(id) != 0;
       id = reinterpret_cast<LPCITEMIDLIST>(reinterpret_cast<const BYTE*>(id) + IdSize(id)))
    ids.emplace_back(CPidlMgr::GetType(id), CPidlMgr::GetTextCopy(id));
  return ids;
}

std::wstring TakeStrRet(STRRET& strret) {
  if (strret.uType != STRRET_WSTR || !strret.pOleStr) return L"<not a wide string>";
  std::wstring text = strret.pOleStr;
  CoTaskMemFree(strret.pOleStr);
  strret.pOleStr = nullptr;
  return text;
}
