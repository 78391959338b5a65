// Explorer's own shell32 finds the installed folder under My Computer and lists its levels.
// Prints "computer: <name>" for each item of My Computer that is the folder, "level: <name>" for
// each level the folder shows, and exits with 1 if the shell cannot bind to the folder.
#include <windows.h>
#include <shlobj.h>
#include <shlwapi.h>
#include <cstdio>
namespace {
const wchar_t kFolderPath[] = L"::{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}";
void PrintNames(IShellFolder* folder, const char* label, bool onlyTheFolder) {
  IEnumIDList* items = nullptr;
  if (folder->EnumObjects(nullptr, SHCONTF_FOLDERS, &items) != S_OK) return;
  LPITEMIDLIST item = nullptr;
  while (items->Next(1, &item, nullptr) == S_OK) {
    STRRET name{};
    wchar_t text[MAX_PATH] = {}, parsing[MAX_PATH] = {};
    if (SUCCEEDED(folder->GetDisplayNameOf(item, SHGDN_INFOLDER, &name)) &&
        SUCCEEDED(StrRetToBufW(&name, item, text, MAX_PATH))) {
      bool show = !onlyTheFolder;
      if (onlyTheFolder && SUCCEEDED(folder->GetDisplayNameOf(item, SHGDN_INFOLDER | SHGDN_FORPARSING, &name)) &&
          SUCCEEDED(StrRetToBufW(&name, item, parsing, MAX_PATH))) {
        show = StrStrIW(parsing, kFolderPath) != nullptr;  // after My Computer's own "::{...}\"
      }
      if (show) std::printf("%s: %ls\n", label, text);
    }
    CoTaskMemFree(item);
  }
  items->Release();
}
}  // namespace
int wmain() {
  if (FAILED(CoInitialize(nullptr))) return 1;
  int result = 1;
  IShellFolder *desktop = nullptr, *computer = nullptr, *levels = nullptr;
  LPITEMIDLIST computerList = nullptr, folderList = nullptr;
  wchar_t path[MAX_PATH];
  lstrcpyW(path, kFolderPath);
  if (SUCCEEDED(SHGetDesktopFolder(&desktop)) &&
      SUCCEEDED(SHGetSpecialFolderLocation(nullptr, CSIDL_DRIVES, &computerList)) &&
      SUCCEEDED(desktop->BindToObject(computerList, nullptr, IID_IShellFolder, reinterpret_cast<void**>(&computer)))) {
    PrintNames(computer, "computer", true);
    if (SUCCEEDED(computer->ParseDisplayName(nullptr, nullptr, path, nullptr, &folderList, nullptr)) &&
        SUCCEEDED(computer->BindToObject(folderList, nullptr, IID_IShellFolder, reinterpret_cast<void**>(&levels)))) {
      PrintNames(levels, "level", false);
      result = 0;
    }
  }
  if (levels) levels->Release();
  if (computer) computer->Release();
  if (desktop) desktop->Release();
  CoTaskMemFree(folderList);
  CoTaskMemFree(computerList);
  CoUninitialize();
  return result;
}
