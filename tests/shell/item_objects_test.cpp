#include <gtest/gtest.h>

#include <atomic>
#include <cstring>
#include <thread>

#include "server/class_creators.h"
#include "shell/context_menu.h"
#include "shell/extract_icon.h"
#include "shell/item_services.h"
#include "shell/query_info.h"
#include "shell/shell_test_util.h"

namespace {

TEST(ImageLists, HoldTheThreePicturesAtBothSizes) {
  LoadImageLists();
  LoadImageLists();  // a second load replaces the lists
  ASSERT_TRUE(LargeImageList && SmallImageList);
  EXPECT_EQ(ImageList_GetImageCount(LargeImageList), 3);
  EXPECT_EQ(ImageList_GetImageCount(SmallImageList), 3);
  int cx = 0, cy = 0;
  ImageList_GetIconSize(LargeImageList, &cx, &cy);
  EXPECT_EQ(cx, GetSystemMetrics(SM_CXICON));
  EXPECT_EQ(cy, GetSystemMetrics(SM_CYICON));
  ImageList_GetIconSize(SmallImageList, &cx, &cy);
  EXPECT_EQ(cx, GetSystemMetrics(SM_CXSMICON));
  EXPECT_EQ(cy, GetSystemMetrics(SM_CYSMICON));
  DestroyImageLists();
  EXPECT_FALSE(LargeImageList || SmallImageList);
}

TEST(IconObject, IndexFollowsTheLastIdAndIconsComeFromTheLists) {
  long before = com::ModuleLockCount();
  {
    auto icon = com::Make<CMarlixDLExtractIcon>();
    struct Case { const wchar_t* path; int index; };
    for (Case c : {Case{L"Marlix Digital Levels\\Alpha", 0}, Case{L"Marlix Digital Levels\\Alpha\\file1.tkf", 2},
                   Case{L"Marlix Digital Levels", 1}}) {
      UniqueList full = MakeFull(c.path);
      ASSERT_TRUE(icon->SetItem(full.Get()));
      int index = -1;
      UINT flags = 0;
      wchar_t file[8] = L"keep";
      EXPECT_EQ(icon->GetIconLocation(GIL_FORSHELL, file, 8, &index, &flags), S_OK);
      EXPECT_EQ(index, c.index) << c.path;
      EXPECT_EQ(flags, static_cast<UINT>(GIL_NOTFILENAME));
      EXPECT_STREQ(file, L"keep");
    }
    UniqueList level = MakeId(PIDL_LEVEL, L"Beta");  // a relative list has no parent id
    ASSERT_TRUE(icon->SetItem(level.Get()));
    int index = -1;
    UINT flags = 0;
    icon->GetIconLocation(0, nullptr, 0, &index, &flags);
    EXPECT_EQ(index, 0);

    LoadImageLists();
    HICON large = nullptr, small = nullptr;
    EXPECT_EQ(icon->Extract(nullptr, 2, &large, &small, MAKELONG(48, 16)), S_OK);
    ICONINFO info{};
    ASSERT_TRUE(large && small);
    ASSERT_TRUE(GetIconInfo(large, &info));
    BITMAP bitmap{};
    GetObjectW(info.hbmColor ? info.hbmColor : info.hbmMask, sizeof(bitmap), &bitmap);
    EXPECT_EQ(bitmap.bmWidth, GetSystemMetrics(SM_CXICON)) << "the size asked for is not looked at";
    DeleteObject(info.hbmColor);
    DeleteObject(info.hbmMask);
    DestroyIcon(large);
    DestroyIcon(small);
    EXPECT_EQ(icon->Extract(nullptr, 9, &large, &small, 0), S_OK);
    EXPECT_FALSE(large || small);
    DestroyImageLists();
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
}

TEST(QueryInfo, TipIsThePathOfTheFullList) {
  long before = com::ModuleLockCount();
  {
    auto info = com::Make<CMarlixDLQueryInfo>();
    UniqueList full = MakeFull(L"Marlix Digital Levels\\Gone level\\file1.tkf");
    ASSERT_TRUE(info->SetItem(full.Get()));
    win::UniqueCoMem<wchar_t> tip;
    EXPECT_EQ(info->GetInfoTip(0, tip.Put()), S_OK);
    EXPECT_STREQ(tip.Get(), L"Marlix Digital Levels\\Gone level\\file1.tkf");
    DWORD flags = 0;
    EXPECT_EQ(info->GetInfoFlags(&flags), E_NOTIMPL);

    com::ComPtr<IQueryInfo> made;
    EXPECT_EQ(CreateMarlixDLQueryInfo(IID_IQueryInfo, made.PutVoid()), S_OK);
    EXPECT_EQ(made->GetInfoTip(0, tip.Put()), S_OK) << "no list: an empty tip";
    EXPECT_STREQ(tip.Get(), L"");
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
}

TEST(ContextMenu, OneSampleEntryAndNarrowTextsInWideBuffers) {
  auto menu = com::Make<CMarlixDLContextMenu>();
  win::UniqueMenu popup(CreatePopupMenu());
  EXPECT_EQ(menu->QueryContextMenu(popup.Get(), 0, 100, 200, CMF_DEFAULTONLY), S_OK);
  EXPECT_EQ(GetMenuItemCount(popup.Get()), 0);
  EXPECT_EQ(menu->QueryContextMenu(popup.Get(), 0, 100, 200, CMF_NORMAL), MAKE_HRESULT(0, 0, 1));
  ASSERT_EQ(GetMenuItemCount(popup.Get()), 1);
  wchar_t label[64] = {};
  GetMenuStringW(popup.Get(), 0, label, 64, MF_BYPOSITION);
  EXPECT_STREQ(label, L"&Sample Explorer Bar Command");
  EXPECT_EQ(GetMenuItemID(popup.Get(), 0), 100u);

  char buffer[64];
  std::memset(buffer, 'x', sizeof(buffer));
  EXPECT_EQ(menu->GetCommandString(0, GCS_VERBW, nullptr, buffer, 32), S_OK);
  EXPECT_EQ(std::memcmp(buffer, "command\0x", 9), 0) << "eight bytes, nothing more";
  std::memset(buffer, 'x', sizeof(buffer));
  EXPECT_EQ(menu->GetCommandString(0, GCS_HELPTEXTW, nullptr, buffer, 32), S_OK);
  EXPECT_EQ(std::memcmp(buffer, "Explorer Bar command help text\0x", 32), 0);
  EXPECT_EQ(menu->GetCommandString(1, GCS_VERBW, nullptr, buffer, 32), E_INVALIDARG);
  EXPECT_EQ(menu->GetCommandString(1, GCS_HELPTEXTW, nullptr, buffer, 32), E_INVALIDARG);
  EXPECT_EQ(menu->GetCommandString(5, GCS_VALIDATEW, nullptr, buffer, 32), S_OK);
  for (UINT narrow : {GCS_VERBA, GCS_HELPTEXTA, GCS_VALIDATEA})
    EXPECT_EQ(menu->GetCommandString(0, narrow, nullptr, buffer, 32), E_INVALIDARG);

  CMINVOKECOMMANDINFO info{sizeof(info)};
  info.lpVerb = "open";
  EXPECT_EQ(menu->InvokeCommand(&info), E_INVALIDARG);
  info.lpVerb = MAKEINTRESOURCEA(1);
  EXPECT_EQ(menu->InvokeCommand(&info), E_INVALIDARG);

  // Offset 0 shows the sample message; a helper thread answers it.
  std::atomic<bool> seen{false};
  std::thread closer([&] {
    for (int i = 0; i < 500 && !seen; ++i) {
      if (HWND box = FindWindowW(nullptr, L"Sample Explorer Bar")) {
        seen = true;
        PostMessageW(box, WM_COMMAND, IDOK, 0);
      }
      Sleep(10);
    }
  });
  info.lpVerb = nullptr;
  EXPECT_EQ(menu->InvokeCommand(&info), S_OK);
  closer.join();
  EXPECT_TRUE(seen);
}

}  // namespace
