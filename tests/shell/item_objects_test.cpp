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

TEST(ItemObjects, ImageListsHoldThreePicturesAtBothSizesAndIconsComeFromThem) {
  long before = com::ModuleLockCount();
  {
    LoadImageLists();
    LoadImageLists();  // a second load replaces the lists
    ASSERT_TRUE(LargeImageList && SmallImageList);
    for (auto [list, x, y] : {std::tuple{LargeImageList, SM_CXICON, SM_CYICON},
                               std::tuple{SmallImageList, SM_CXSMICON, SM_CYSMICON}}) {
      int cx = 0, cy = 0;
      EXPECT_EQ(ImageList_GetImageCount(list), 3);
      ImageList_GetIconSize(list, &cx, &cy);
      EXPECT_EQ(cx, GetSystemMetrics(x));
      EXPECT_EQ(cy, GetSystemMetrics(y));
    }
    // The index follows the last id; a relative list has no parent id.
    auto icon = com::Make<CMarlixDLExtractIcon>();
    struct Row { UniqueList list; int index; } rows[] = {
        {MakeFull(L"Marlix Digital Levels\\Alpha"), 0}, {MakeFull(L"Marlix Digital Levels"), 1},
        {MakeFull(L"Marlix Digital Levels\\Alpha\\file1.tkf"), 2}, {MakeId(PIDL_LEVEL, L"Beta"), 0}};
    for (Row& row : rows) {
      SCOPED_TRACE(testing::Message() << "row " << &row - rows);
      ASSERT_TRUE(icon->SetItem(row.list.Get()));
      int index = -1, again = -1;
      UINT flags = 0;
      wchar_t file[8] = L"keep";  // not written to
      EXPECT_EQ(icon->GetIconLocation(GIL_FORSHELL, file, 8, &index, &flags), S_OK);
      EXPECT_EQ(flags, static_cast<UINT>(GIL_NOTFILENAME));
      icon->GetIconLocation(0, nullptr, 0, &again, &flags);
      EXPECT_EQ(index, row.index);
      EXPECT_EQ(again, row.index);
      EXPECT_STREQ(file, L"keep");
    }
    HICON large = nullptr, small = nullptr;
    EXPECT_EQ(icon->Extract(nullptr, 2, &large, &small, MAKELONG(48, 16)), S_OK);
    win::UniqueIcon largeIcon(large), smallIcon(small);
    ICONINFO parts{};
    BITMAP bitmap{};
    ASSERT_TRUE(small && GetIconInfo(large, &parts));
    GetObjectW(parts.hbmColor ? parts.hbmColor : parts.hbmMask, sizeof(bitmap), &bitmap);
    DeleteObject(parts.hbmColor);
    DeleteObject(parts.hbmMask);
    EXPECT_EQ(bitmap.bmWidth, GetSystemMetrics(SM_CXICON)) << "the size asked for is not looked at";
    EXPECT_EQ(icon->Extract(nullptr, 9, &large, &small, 0), S_OK);
    EXPECT_FALSE(large || small);
    DestroyImageLists();
    EXPECT_FALSE(LargeImageList || SmallImageList);
    auto info = com::Make<CMarlixDLQueryInfo>();
    UniqueList full = MakeFull(L"Marlix Digital Levels\\Gone level\\file1.tkf");
    ASSERT_TRUE(info->SetItem(full.Get()));
    win::UniqueCoMem<wchar_t> tip;
    EXPECT_EQ(info->GetInfoTip(0, tip.Put()), S_OK);
    EXPECT_STREQ(tip.Get(), L"Marlix Digital Levels\\Gone level\\file1.tkf") << "the tip is the full list's path";
    DWORD flags = 0;
    EXPECT_EQ(info->GetInfoFlags(&flags), E_NOTIMPL);
    com::ComPtr<IQueryInfo> made;
    EXPECT_EQ(CreateMarlixDLQueryInfo(IID_IQueryInfo, made.PutVoid()), S_OK);
    EXPECT_EQ(made->GetInfoTip(0, tip.Put()), S_OK) << "no list: an empty tip";
    EXPECT_STREQ(tip.Get(), L"");
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
}

TEST(ItemObjects, ContextMenuHasOneSampleEntryAndPutsNarrowTextsInWideBuffers) {
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
  for (auto [type, text, size] : {std::tuple{GCS_VERBW, "command\0x", 9},
                                     std::tuple{GCS_HELPTEXTW, "Explorer Bar command help text\0x", 32}}) {
    std::memset(buffer, 'x', sizeof(buffer));
    EXPECT_EQ(menu->GetCommandString(0, type, nullptr, buffer, 32), S_OK);
    EXPECT_EQ(std::memcmp(buffer, text, size), 0) << text << ": the narrow text and its terminator, nothing more";
    EXPECT_EQ(menu->GetCommandString(1, type, nullptr, buffer, 32), E_INVALIDARG);
  }
  EXPECT_EQ(menu->GetCommandString(5, GCS_VALIDATEW, nullptr, buffer, 32), S_OK);
  for (UINT narrow : {GCS_VERBA, GCS_HELPTEXTA, GCS_VALIDATEA})
    EXPECT_EQ(menu->GetCommandString(0, narrow, nullptr, buffer, 32), E_INVALIDARG);

  CMINVOKECOMMANDINFO info{sizeof(info)};
  for (LPCSTR verb : {LPCSTR("open"), LPCSTR(MAKEINTRESOURCEA(1))}) {
    info.lpVerb = verb;
    EXPECT_EQ(menu->InvokeCommand(&info), E_INVALIDARG);
  }
  // Offset 0 shows the sample message; a helper thread answers it.
  std::atomic<bool> seen{false};
  std::thread closer([&] {
    for (int i = 0; i < 500 && !seen; ++i, Sleep(10))
      if (HWND box = FindWindowW(nullptr, L"Sample Explorer Bar")) seen = PostMessageW(box, WM_COMMAND, IDOK, 0);
  });
  info.lpVerb = nullptr;
  EXPECT_EQ(menu->InvokeCommand(&info), S_OK);
  closer.join();
  EXPECT_TRUE(seen);
}

}  // namespace
