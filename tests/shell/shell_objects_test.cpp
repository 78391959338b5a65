// What the folder's objects answer the shell where no real host asks it: odd stores, names, attributes and icons.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <functional>

#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "shell/context_menu.h"
#include "shell/enum_id_list.h"
#include "shell/extract_icon.h"
#include "shell/item_services.h"
#include "shell/shell_folder.h"
#include "shell/shell_test_util.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {
using Texts = std::vector<std::wstring>;
const wchar_t kRoot[] = L"\\Marlix Digital Levels";

// The pixels of a square drawn on white.
std::vector<DWORD> Pixels(int size, const std::function<void(HDC)>& draw) {
  BITMAPINFO info{{sizeof(BITMAPINFOHEADER), size, -size, 1, 32, BI_RGB}};
  void* bits = nullptr;
  HDC dc = CreateCompatibleDC(nullptr);
  HBITMAP dib = CreateDIBSection(dc, &info, DIB_RGB_COLORS, &bits, nullptr, 0);
  HGDIOBJ old = SelectObject(dc, dib);
  RECT all{0, 0, size, size};
  FillRect(dc, &all, static_cast<HBRUSH>(GetStockObject(WHITE_BRUSH)));
  draw(dc);
  GdiFlush();
  std::vector<DWORD> pixels(static_cast<DWORD*>(bits), static_cast<DWORD*>(bits) + size * size);
  SelectObject(dc, old);
  DeleteObject(dib);
  DeleteDC(dc);
  return pixels;
}

const int kIconOrder[] = {IDI_LEVEL, IDI_ADD_LEVEL, IDI_VIRTUAL_FILE};

// Which of the three icons of the module looks most like `pixels`.
int NearestIcon(const std::vector<DWORD>& pixels, int size) {
  int nearest = 0;
  long long best = -1;
  for (int id : kIconOrder) {
    HICON icon = static_cast<HICON>(LoadImageW(ModuleInstance(), MAKEINTRESOURCEW(id), IMAGE_ICON, size, size, 0));
    const auto drawn = Pixels(size, [&](HDC dc) { DrawIconEx(dc, 0, 0, icon, size, size, 0, nullptr, DI_NORMAL); });
    DestroyIcon(icon);
    long long distance = 0;
    for (size_t i = 0; i < pixels.size(); ++i)
      for (int shift : {0, 8, 16}) distance += std::abs(int((pixels[i] >> shift) & 0xFF) - int((drawn[i] >> shift) & 0xFF));
    if (best < 0 || distance < best) best = distance, nearest = id;
  }
  return nearest;
}

// "type:text" of each item an enumerator of `path` lists; "<failed>" if it can't be made.
Texts Walk(const wchar_t* path, DWORD flags) {
  auto* list = new CMarlixDLEnumIDList();
  HRESULT hr = E_UNEXPECTED;
  list->Create(path, flags, &hr);  // a failed Create destroys the object
  if (FAILED(hr)) return {L"<failed>"};
  auto owned = com::ComPtr<CMarlixDLEnumIDList>::Attach(list);
  Texts texts;
  for (const UniqueList& item : Drain(list)) {
    IdList ids = Ids(item.Get());
    texts.push_back(ids.size() == 1 ? std::to_wstring(ids[0].first) + L":" + ids[0].second : L"<not one id>");
  }
  return texts;
}

// An empty store; by the end of a test every object must have let go of the module.
class Shell : public ::testing::Test {
 protected:
  void TearDown() override { EXPECT_EQ(com::ModuleLockCount(), before_); }
  long before_ = com::ModuleLockCount();
  RegistrySandbox sandbox_;
};

// A root folder and its level "Alpha".
class ShellFolder : public Shell {
 protected:
  void TearDown() override { root_.Reset(), level_.Reset(), Shell::TearDown(); }
  com::ComPtr<CMarlixDLShellFolder> root_ = com::Make<CMarlixDLShellFolder>();
  HRESULT initialized_ = root_->Initialize(nullptr);
  UniqueList alpha_ = MakeId(PIDL_LEVEL, L"Alpha"), file_ = MakeId(PIDL_FILE, L"file1.tkf");
  com::ComPtr<IShellFolder> level_ = Bind(root_.Get(), alpha_.Get());
};

// Enumeration and the common names through the folder are the shell32 client's test.
TEST_F(ShellFolder, ParsesNamesAndAttributesWithoutTheStore) {
  ASSERT_EQ(initialized_, S_OK);
  UniqueList tooLong = MakeId(PIDL_LEVEL, std::wstring(240, L'l').c_str());  // a name written by an old version
  com::ComPtr<IEnumIDList> none;
  EXPECT_EQ(Bind(root_.Get(), tooLong.Get())->EnumObjects(nullptr, SHCONTF_FOLDERS, none.Put()), E_FAIL)
      << "a level whose address doesn't fit lists nothing, not every level";
  struct Parse { IShellFolder* folder; const wchar_t* name; HRESULT hr; IdList ids; };
  const Parse parses[] = {
      {root_.Get(), L"A/file1.tkf", S_OK, {{PIDL_LEVEL, L"A"}, {PIDL_FILE, L"file1.tkf"}}},
      {root_.Get(), L"A\\B\\C", E_INVALIDARG, {}},
      {level_.Get(), L"x\\y", S_OK, {{PIDL_LEVEL, L"Alpha"}, {PIDL_FILE, L"x"}}},
      {level_.Get(), L"x\\y\\z", E_INVALIDARG, {}}};
  for (const Parse& row : parses) {
    std::wstring text = row.name;
    PIDLIST_RELATIVE result = nullptr;
    EXPECT_EQ(row.folder->ParseDisplayName(nullptr, nullptr, text.data(), nullptr, &result, nullptr), row.hr) << row.name;
    EXPECT_EQ(Ids(result), row.ids) << row.name;
    CoTaskMemFree(result);
  }
  struct Named { SHGDNF flags; std::wstring text; };
  const Named names[] = {
      {SHGDN_FORADDRESSBAR, L"Alpha"},
      {SHGDN_FORPARSING | SHGDN_INFOLDER, L"Alpha"},
      {SHGDN_FORPARSING | 0x02, L""},
      {SHGDN_FOREDITING, L"<failed>"},
      {SHGDN_FORPARSING | SHGDN_FORADDRESSBAR, L"<failed>"}};
  for (const Named& row : names) EXPECT_EQ(Name(root_.Get(), alpha_.Get(), row.flags), row.text) << std::hex << row.flags;
  UniqueList a = MakeId(PIDL_LEVEL, L"alpha"), b = MakeId(PIDL_LEVEL, L"Beta"), upper = MakeId(PIDL_LEVEL, L"ALPHA");
  EXPECT_GT(root_->CompareIDs(-1, a.Get(), b.Get()), 0) << "the parameter is a direction";
  EXPECT_EQ(root_->CompareIDs(0, a.Get(), upper.Get()), 0);
  // Attributes start full and narrow with each item; a gone level is no failure unless first.
  SeedLevel(0, L"Alpha");
  UniqueList gone = MakeId(PIDL_LEVEL, L"Gone");
  struct Row { std::vector<LPCITEMIDLIST> items; SFGAOF out; HRESULT hr; };
  Row rows[] = {
      {{}, 0xFFFFFFFF, S_OK},
      {{alpha_.Get(), file_.Get()}, 0, S_OK},
      {{gone.Get()}, 0, E_FAIL},
      {{alpha_.Get(), gone.Get()}, SFGAO_FOLDER | SFGAO_DROPTARGET, S_OK}};
  for (Row& row : rows) {
    SFGAOF attributes = 0;
    EXPECT_EQ(root_->GetAttributesOf(static_cast<UINT>(row.items.size()), row.items.data(), &attributes), row.hr);
    EXPECT_EQ(SUCCEEDED(row.hr) ? attributes : 0, row.out) << "row " << &row - rows;
  }
}

TEST_F(Shell, EnumeratorListsWhatTheStoreReadsInRegistryOrder) {
  EXPECT_EQ(Walk(kRoot, SHCONTF_FOLDERS), Texts{});
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, GetLevelsKeyName())) << "a missing store key is created";
  EXPECT_EQ(Walk(L"\\/\\", SHCONTF_FOLDERS), Texts{L"<failed>"});
  SeedLevel(0, L"Gamma/West");
  RegWriteDword(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\Station 1", L"Port", 3);  // no "Name"
  // A value stored without its terminator ends where its bytes end; a name too long is invisible.
  std::wstring full(259, L'n');
  HKEY raw = nullptr;
  ASSERT_EQ(RegCreateKeyExW(HKEY_CURRENT_USER, (GetLevelsKeyName() + L"\\Station 2").c_str(), 0, nullptr, 0,
                            KEY_ALL_ACCESS, nullptr, &raw, nullptr), ERROR_SUCCESS);
  win::UniqueHKey level(raw);
  ASSERT_EQ(RegSetValueExW(raw, L"Name", 0, REG_SZ, reinterpret_cast<const BYTE*>(full.data()), 518), ERROR_SUCCESS);
  SeedLevel(3, std::wstring(300, L'x'));
  // An odd size lists as the store reads it, so the level can be found by what is listed.
  ASSERT_EQ(RegSetKeyValueW(HKEY_CURRENT_USER, (GetLevelsKeyName() + L"\\Station 4").c_str(), L"Name", REG_BINARY,
                            L"odd!", 5), ERROR_SUCCESS);
  SeedLevel(5, L"beta");
  EXPECT_EQ(Walk(L"", SHCONTF_FOLDERS | SHCONTF_NONFOLDERS), (Texts{L"2:Gamma", L"2:" + full, L"2:odd", L"2:beta"}));
  EXPECT_EQ(Walk(kRoot, SHCONTF_NONFOLDERS), Texts{});
  EXPECT_EQ(Walk(L"\\Marlix Digital Levels\\Delta", SHCONTF_NONFOLDERS), Texts{L"3:file1.tkf"});
  EXPECT_EQ(Walk(L"\\Marlix Digital Levels\\Delta", SHCONTF_FOLDERS), Texts{});
}

TEST_F(Shell, EnumeratorHandsOutCopiesAndKeepsItsItemsOverReset) {
  SeedLevel(0, L"A");
  SeedLevel(1, L"B");
  auto* list = new CMarlixDLEnumIDList();
  HRESULT hr = E_UNEXPECTED;
  list->Create(kRoot, SHCONTF_FOLDERS, &hr);
  ASSERT_EQ(hr, S_OK);
  auto owned = com::ComPtr<CMarlixDLEnumIDList>::Attach(list);
  EXPECT_EQ(com::ModuleLockCount(), before_ + 1) << "a living enumerator holds the module";
  LPITEMIDLIST items[3] = {};
  ULONG fetched = 9;
  EXPECT_EQ(list->Next(3, items, &fetched), S_FALSE);
  EXPECT_EQ(fetched, 2u);
  UniqueList first(items[0]), second(items[1]);
  SeedLevel(2, L"Late");
  list->Reset();
  auto again = Drain(list);
  ASSERT_EQ(again.size(), 2u) << "later store changes don't show";
  EXPECT_NE(again[0].Get(), first.Get()) << "each Next hands out a new copy";
  EXPECT_EQ(Ids(again[0].Get()), Ids(first.Get()));
}

TEST_F(Shell, EachImageListPlaceHoldsItsPictureAndIconsComeFromThem) {
  LoadImageLists();
  for (auto [list, x] : {std::pair{LargeImageList.Get(), SM_CXICON}, std::pair{SmallImageList.Get(), SM_CXSMICON}}) {
    const int size = GetSystemMetrics(x);
    for (int place = 0; place < 3; ++place) {
      const auto entry = Pixels(size, [&](HDC dc) { ImageList_Draw(list, place, dc, 0, 0, ILD_NORMAL); });
      EXPECT_EQ(NearestIcon(entry, size), kIconOrder[place]) << "size " << size << ", place " << place;
    }
  }
  LoadImageLists(GetModuleHandleW(L"kernel32.dll"));
  EXPECT_EQ(ImageList_GetImageCount(SmallImageList.Get()), 3) << "a picture that can't be loaded keeps its place";
  LoadImageLists();
  // The index follows the last id; a relative list has no parent id.
  auto icon = com::Make<CMarlixDLExtractIcon>();
  struct Row { UniqueList list; int index; } rows[] = {
      {MakeFull(L"Marlix Digital Levels\\Alpha"), IMAGE_LEVEL},
      {MakeFull(L"Marlix Digital Levels"), IMAGE_ADD_LEVEL},
      {MakeFull(L"Marlix Digital Levels\\Alpha\\file1.tkf"), IMAGE_VIRTUAL_FILE},
      {MakeId(PIDL_LEVEL, L"Beta"), IMAGE_LEVEL}};
  for (Row& row : rows) {
    ASSERT_TRUE(icon->SetItem(row.list.Get()));
    int index = -1;
    UINT flags = 0;
    EXPECT_EQ(icon->GetIconLocation(GIL_FORSHELL, nullptr, 0, &index, &flags), S_OK);
    EXPECT_EQ(index, row.index) << "row " << &row - rows;
    EXPECT_EQ(flags, static_cast<UINT>(GIL_NOTFILENAME));
  }
  HICON large = nullptr, small = nullptr;
  EXPECT_EQ(icon->Extract(nullptr, IMAGE_VIRTUAL_FILE, &large, &small, MAKELONG(48, 16)), S_OK);
  win::UniqueIcon largeIcon(large), smallIcon(small);
  EXPECT_TRUE(large && small);
  EXPECT_EQ(icon->Extract(nullptr, 9, &large, &small, 0), S_OK);
  EXPECT_FALSE(large || small);
}

TEST_F(Shell, ContextMenuPutsItsNarrowHelpTextInTheCallersBufferAndNoMore) {
  auto menu = com::Make<CMarlixDLContextMenu>();
  win::UniqueMenu popup(CreatePopupMenu());
  EXPECT_EQ(menu->QueryContextMenu(popup.Get(), 0, 100, 200, CMF_DEFAULTONLY), S_OK);
  EXPECT_EQ(menu->QueryContextMenu(popup.Get(), 0, 100, 200, CMF_NORMAL), MAKE_HRESULT(0, 0, 1));
  EXPECT_EQ(GetMenuItemCount(popup.Get()), 1);
  char buffer[64];
  std::memset(buffer, 'x', sizeof(buffer));
  EXPECT_EQ(menu->GetCommandString(0, GCS_HELPTEXTW, nullptr, buffer, 32), S_OK);
  EXPECT_EQ(std::memcmp(buffer, "Explorer Bar command help text\0x", 32), 0) << "the narrow text and its terminator";
}
}  // namespace
