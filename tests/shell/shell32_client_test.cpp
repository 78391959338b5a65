// Drives the registered module through Wine's own shell32, as Explorer would.
#include <gtest/gtest.h>
#include <windows.h>
#include <shellapi.h>
#include <shlwapi.h>
#include <shlobj.h>

#include <string>
#include <vector>

#include "helpers/win_handles.h"
#include "server/com_base.h"
#include "shell/shell_uuids.h"
#include "shell/shell_test_util.h"
#include "support/registry_sandbox.h"

namespace {

// The 32-bit pixels of an icon's colour image, at the icon's own size.
std::vector<DWORD> IconPixels(HICON icon, int* size) {
  ICONINFO info{};
  std::vector<DWORD> pixels;
  if (!icon || !GetIconInfo(icon, &info)) return pixels;
  BITMAP bitmap{};
  GetObjectW(info.hbmColor, sizeof(bitmap), &bitmap);
  *size = bitmap.bmWidth;
  BITMAPINFO header{};
  header.bmiHeader = {sizeof(BITMAPINFOHEADER), bitmap.bmWidth, -bitmap.bmHeight, 1, 32, BI_RGB};
  pixels.resize(static_cast<size_t>(bitmap.bmWidth) * bitmap.bmHeight);
  HDC dc = GetDC(nullptr);
  GetDIBits(dc, info.hbmColor, 0, bitmap.bmHeight, pixels.data(), &header, DIB_RGB_COLORS);
  ReleaseDC(nullptr, dc);
  DeleteObject(info.hbmColor);
  DeleteObject(info.hbmMask);
  return pixels;
}

// Share of pixels whose colours differ clearly.
double Difference(const std::vector<DWORD>& a, const std::vector<DWORD>& b) {
  if (a.size() != b.size() || a.empty()) return 1.0;
  size_t differ = 0;
  for (size_t i = 0; i < a.size(); ++i) {
    int d = 0;
    for (int shift : {0, 8, 16}) d += abs(int((a[i] >> shift) & 0xFF) - int((b[i] >> shift) & 0xFF));
    if (d > 60) ++differ;
  }
  return double(differ) / a.size();
}

const wchar_t kFolderPath[] = L"::{20D04FE0-3AEA-1069-A2D8-08002B30309D}\\::{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}";

class Shell32Client : public ::testing::Test {
 protected:
  void SetUp() override {
    SeedLevel(0, L"North Site");
    SeedLevel(1, L"South Site");
    ASSERT_EQ(SHGetDesktopFolder(desktop_.Put()), S_OK);
    ULONG eaten = 0;
    std::wstring path = kFolderPath;
    ASSERT_EQ(desktop_->ParseDisplayName(nullptr, nullptr, path.data(), &eaten, folderList_.Put(), nullptr), S_OK);
    ASSERT_EQ(desktop_->BindToObject(folderList_.Get(), nullptr, IID_IShellFolder, folder_.PutVoid()), S_OK);
  }

  std::vector<UniqueList> Items(SHCONTF flags) {
    std::vector<UniqueList> items;
    com::ComPtr<IEnumIDList> list;
    EXPECT_EQ(folder_->EnumObjects(nullptr, flags, list.Put()), S_OK);
    if (!list) return items;
    LPITEMIDLIST item = nullptr;
    while (list->Next(1, &item, nullptr) == S_OK) items.emplace_back(item);
    return items;
  }

  std::wstring Name(IShellFolder* folder, LPCITEMIDLIST item, SHGDNF flags) {
    STRRET strret{};
    if (folder->GetDisplayNameOf(item, flags, &strret) != S_OK) return L"<failed>";
    wchar_t text[MAX_PATH] = {};
    StrRetToBufW(&strret, item, text, MAX_PATH);
    return text;
  }

  RegistrySandbox sandbox_;
  com::ComPtr<IShellFolder> desktop_;
  UniqueList folderList_;
  com::ComPtr<IShellFolder> folder_;
};

TEST_F(Shell32Client, ReachesTheFolderUnderMyComputerAndWalksIt) {
  CLSID clsid{};
  com::ComPtr<IPersist> persist;
  ASSERT_EQ(folder_.As(&persist), S_OK);
  persist->GetClassID(&clsid);
  wchar_t text[64];
  StringFromGUID2(clsid, text, 64);
  EXPECT_STREQ(text, L"{7F0C89F4-CE25-42B8-918B-4118CE2CC5DF}");

  auto levels = Items(SHCONTF_FOLDERS | SHCONTF_NONFOLDERS);
  ASSERT_EQ(levels.size(), 2u);
  EXPECT_EQ(Name(folder_.Get(), levels[0].Get(), SHGDN_INFOLDER), L"North Site");
  EXPECT_EQ(Name(folder_.Get(), levels[1].Get(), SHGDN_FORPARSING),
            L"::{D8B818CA-E47C-49a1-96A5-C2AA5FB57F15}\\South Site");
  LPCITEMIDLIST both[] = {levels[0].Get(), levels[1].Get()};
  SFGAOF attributes = SFGAO_FILESYSTEM;
  EXPECT_EQ(folder_->GetAttributesOf(2, both, &attributes), S_OK);
  EXPECT_EQ(attributes, static_cast<SFGAOF>(SFGAO_FOLDER | SFGAO_DROPTARGET));

  com::ComPtr<IShellFolder> level;
  ASSERT_EQ(folder_->BindToObject(levels[0].Get(), nullptr, IID_IShellFolder, level.PutVoid()), S_OK);
  com::ComPtr<IEnumIDList> files;
  ASSERT_EQ(level->EnumObjects(nullptr, SHCONTF_NONFOLDERS, files.Put()), S_OK);
  LPITEMIDLIST raw = nullptr;
  ASSERT_EQ(files->Next(1, &raw, nullptr), S_OK);
  UniqueList file(raw);
  EXPECT_EQ(Name(level.Get(), file.Get(), SHGDN_NORMAL), L"file1.tkf");
}

TEST_F(Shell32Client, AbsoluteListsGiveNamesAndIconsThroughTheShell) {
  auto levels = Items(SHCONTF_FOLDERS);
  ASSERT_FALSE(levels.empty());
  UniqueList absolute(ILCombine(folderList_.Get(), levels[0].Get()));
  ASSERT_TRUE(absolute);

  // The desktop finds the level's parent (our folder) for its display name.
  EXPECT_EQ(Name(desktop_.Get(), absolute.Get(), SHGDN_INFOLDER), L"North Site");

  SHFILEINFOW info{};
  ASSERT_NE(SHGetFileInfoW(reinterpret_cast<LPCWSTR>(absolute.Get()), 0, &info, sizeof(info),
                           SHGFI_PIDL | SHGFI_DISPLAYNAME | SHGFI_ATTRIBUTES | SHGFI_ICON | SHGFI_LARGEICON),
            0u);
  EXPECT_STREQ(info.szDisplayName, L"North Site");
  EXPECT_EQ(info.dwAttributes & (SFGAO_FOLDER | SFGAO_DROPTARGET), static_cast<DWORD>(SFGAO_FOLDER | SFGAO_DROPTARGET));
  // Wine's shell32 (8.0) doesn't honour GIL_NOTFILENAME: it takes the location's
  // file text as an icon file and never calls Extract, so it shows a picture of its own.
  EXPECT_TRUE(info.hIcon);
  if (info.hIcon) DestroyIcon(info.hIcon);

  com::ComPtr<IShellFolder> parent;
  LPCITEMIDLIST child = nullptr;
  ASSERT_EQ(SHBindToParent(absolute.Get(), IID_IShellFolder, parent.PutVoid(), &child), S_OK);
  com::ComPtr<IQueryInfo> tip;
  ASSERT_EQ(parent->GetUIObjectOf(nullptr, 1, &child, IID_IQueryInfo, nullptr, tip.PutVoid()), S_OK);
  win::UniqueCoMem<wchar_t> text;
  ASSERT_EQ(tip->GetInfoTip(0, text.Put()), S_OK);
  EXPECT_STREQ(text.Get(), L"Marlix Digital Levels\\North Site");

  // What a shell that honours the flag does: location, then Extract from the module's lists.
  com::ComPtr<IExtractIconW> extract;
  ASSERT_EQ(parent->GetUIObjectOf(nullptr, 1, &child, IID_IExtractIconW, nullptr, extract.PutVoid()), S_OK);
  int index = -1;
  UINT flags = 0;
  wchar_t file[MAX_PATH] = {};
  ASSERT_EQ(extract->GetIconLocation(GIL_FORSHELL, file, MAX_PATH, &index, &flags), S_OK);
  EXPECT_EQ(flags, static_cast<UINT>(GIL_NOTFILENAME));
  EXPECT_EQ(index, 0);
  HICON large = nullptr;
  ASSERT_EQ(extract->Extract(file, index, &large, nullptr, 0), S_OK);
  if (!large) GTEST_SKIP() << "the loaded module has not built its image lists at start";
  HMODULE module = GetModuleHandleW(L"MarlixDLShellExt.dll");
  ASSERT_TRUE(module);
  int shown = 0, own = 0;
  std::vector<DWORD> shownPixels = IconPixels(large, &shown);
  win::UniqueIcon level(static_cast<HICON>(LoadImageW(module, MAKEINTRESOURCEW(101), IMAGE_ICON, shown, shown, 0)));
  EXPECT_LT(Difference(shownPixels, IconPixels(level.Get(), &own)), 0.1) << "the level's picture";
  DestroyIcon(large);
}

// Runs last: the tests above have released all they got from the shell.
TEST(Shell32ClientModule, UnloadsOnceTheShellHasLetGo) {
  HMODULE module = GetModuleHandleW(L"MarlixDLShellExt.dll");
  ASSERT_TRUE(module) << "loaded by the shell in the tests before";
  auto canUnload = reinterpret_cast<HRESULT(STDAPICALLTYPE*)()>(GetProcAddress(module, "DllCanUnloadNow"));
  ASSERT_TRUE(canUnload);
  EXPECT_EQ(canUnload(), S_OK) << "every object of the module was released";
}

}  // namespace
