#include <gtest/gtest.h>
#include <atomic>
#include <cstdlib>
#include <functional>
#include <cstring>
#include <thread>
#include "base/module_instance.h"
#include "base/resource_ids.h"
#include "shell/context_menu.h"
#include "shell/enum_id_list.h"
#include "shell/extract_icon.h"
#include "shell/item_services.h"
#include "shell/query_info.h"
#include "shell/shell_folder.h"
#include "shell/shell_test_util.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {
std::wstring Path(IShellFolder* folder, bool parsing) {
  wchar_t path[MAX_PATH];
  return static_cast<CMarlixDLShellFolder*>(folder)->GetFolderPath(path, MAX_PATH, parsing) ? path : L"<failed>";
}
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
using Texts = std::vector<std::wstring>;

// An enumerator; null if Create failed (the object is gone then).
com::ComPtr<CMarlixDLEnumIDList> Enumerate(const wchar_t* path, DWORD flags, HRESULT expected = S_OK) {
  auto* list = new CMarlixDLEnumIDList();
  HRESULT hr = E_UNEXPECTED;
  list->Create(path, flags, &hr);
  EXPECT_EQ(hr, expected) << path;
  return SUCCEEDED(hr) ? com::ComPtr<CMarlixDLEnumIDList>::Attach(list) : nullptr;
}

// "type:text" of each remaining item, each a single id.
Texts Walk(IEnumIDList* list) {
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

// Enumeration through the folder is the shell32 client's test.
TEST_F(ShellFolder, PathsBindingAndAttributesOfTheFirstItemOnly) {
  EXPECT_EQ(initialized_, S_OK);
  EXPECT_EQ(Path(root_.Get(), false), L"\\Marlix Digital Levels");
  EXPECT_EQ(Path(root_.Get(), true), kParsingRoot);
  EXPECT_EQ(Path(level_.Get(), false), L"\\Marlix Digital Levels\\Alpha");
  EXPECT_EQ(Path(level_.Get(), true), kParsingRoot + L"\\Alpha");
  wchar_t tiny[8];
  EXPECT_FALSE(root_->GetFolderPath(tiny, 8, false));
  com::ComPtr<IUnknown> other;
  EXPECT_EQ(level_->BindToObject(file_.Get(), nullptr, IID_IShellFolder, other.PutVoid()), E_INVALIDARG);
  UniqueList tooLong = MakeId(PIDL_LEVEL, std::wstring(240, L'l').c_str());  // a name written by an old version
  com::ComPtr<IEnumIDList> none;
  EXPECT_EQ(Bind(root_.Get(), tooLong.Get())->EnumObjects(nullptr, SHCONTF_FOLDERS, none.Put()), E_FAIL) << "not every level";
  SeedLevel(0, L"Alpha");
  // Attributes start full; only the first item is looked for in the store.
  UniqueList gone = MakeId(PIDL_LEVEL, L"Gone"), rootId = MakeId(PIDL_ROOT, L"Marlix Digital Levels");
  struct Row { std::vector<LPCITEMIDLIST> items; SFGAOF in, out; HRESULT hr; };
  Row rows[] = {
      {{}, 0, 0xFFFFFFFF, S_OK},
      {{alpha_.Get()}, 0, SFGAO_FOLDER | SFGAO_DROPTARGET, S_OK},
      {{file_.Get()}, SFGAO_FOLDER, SFGAO_CANCOPY, S_OK},
      {{rootId.Get()}, 0, 0, S_OK},
      {{alpha_.Get(), file_.Get()}, 0, 0, S_OK},
      {{gone.Get()}, 0, 0, E_FAIL},
      {{alpha_.Get(), gone.Get()}, 0, SFGAO_FOLDER | SFGAO_DROPTARGET, S_OK}};
  for (Row& row : rows) {
    SFGAOF attributes = row.in;
    EXPECT_EQ(root_->GetAttributesOf(static_cast<UINT>(row.items.size()), row.items.data(), &attributes), row.hr)
        << "row " << &row - rows;
    if (SUCCEEDED(row.hr)) { EXPECT_EQ(attributes, row.out) << "row " << &row - rows; }
  }
}

TEST_F(ShellFolder, ParsesWithoutTheStoreNamesByFlagsAndOrders) {
  struct Parse { IShellFolder* folder; const wchar_t* name; HRESULT hr; IdList ids; };
  const Parse parses[] = {
      {root_.Get(), L"Nowhere", S_OK, {{PIDL_LEVEL, L"Nowhere"}}},
      {root_.Get(), L"A/file1.tkf", S_OK, {{PIDL_LEVEL, L"A"}, {PIDL_FILE, L"file1.tkf"}}},
      {root_.Get(), L"A\\B\\C", E_INVALIDARG, {}},
      {root_.Get(), L"", S_OK, {}},
      {level_.Get(), L"file1.tkf", S_OK, {{PIDL_FILE, L"file1.tkf"}}},
      {level_.Get(), L"x\\y", S_OK, {{PIDL_LEVEL, L"Alpha"}, {PIDL_FILE, L"x"}}},
      {level_.Get(), L"x\\y\\z", E_INVALIDARG, {}}};
  for (const Parse& row : parses) {
    SCOPED_TRACE(testing::Message() << (row.folder == level_.Get() ? "level: " : "root: ") << row.name);
    std::wstring text = row.name;
    PIDLIST_RELATIVE result = reinterpret_cast<PIDLIST_RELATIVE>(1);
    ULONG eaten = 77, attributes = 88;
    EXPECT_EQ(row.folder->ParseDisplayName(nullptr, nullptr, text.data(), &eaten, &result, &attributes), row.hr);
    EXPECT_EQ(Ids(result), row.ids);
    EXPECT_EQ(std::make_pair(eaten, attributes), std::make_pair(77ul, 88ul)) << "eaten and attributes left alone";
    CoTaskMemFree(result);
  }
  struct Named { SHGDNF flags; HRESULT hr; std::wstring text; };
  const Named names[] = {
      {SHGDN_NORMAL, S_OK, L"Alpha"},
      {SHGDN_INFOLDER, S_OK, L"Alpha"},
      {SHGDN_FORADDRESSBAR, S_OK, L"Alpha"},
      {SHGDN_FORADDRESSBAR | SHGDN_INFOLDER, S_OK, L"Alpha"},
      {SHGDN_FORPARSING, S_OK, kParsingRoot + L"\\Alpha"},
      {SHGDN_FORPARSING | SHGDN_INFOLDER, S_OK, L"Alpha"},
      {SHGDN_FORPARSING | 0x02, S_OK, L""},
      {0x02, E_INVALIDARG, L""},
      {SHGDN_FORADDRESSBAR | 0x02, E_INVALIDARG, L""},
      {SHGDN_FOREDITING, E_INVALIDARG, L""},
      {SHGDN_FORPARSING | SHGDN_FORADDRESSBAR, E_INVALIDARG, L""}};
  for (const Named& row : names) {
    HRESULT hr = E_FAIL;
    std::wstring text = Name(root_.Get(), alpha_.Get(), row.flags, &hr);
    EXPECT_EQ(hr, row.hr) << std::hex << row.flags;
    if (SUCCEEDED(row.hr)) { EXPECT_EQ(text, row.text) << std::hex << row.flags; }
  }
  UniqueList two = MakeFull(L"Marlix Digital Levels\\Alpha");
  EXPECT_EQ(Name(root_.Get(), two.Get(), SHGDN_NORMAL), L"Marlix Digital Levels\\Alpha");
  UniqueList a = MakeId(PIDL_LEVEL, L"alpha"), b = MakeId(PIDL_LEVEL, L"Beta"), upper = MakeId(PIDL_LEVEL, L"ALPHA");
  EXPECT_LT(root_->CompareIDs(0, a.Get(), b.Get()), 0);
  EXPECT_GT(root_->CompareIDs(0, b.Get(), a.Get()), 0);
  EXPECT_GT(root_->CompareIDs(-1, a.Get(), b.Get()), 0) << "the parameter is a direction";
  EXPECT_EQ(root_->CompareIDs(0, a.Get(), upper.Get()), 0);
  EXPECT_EQ(root_->CompareIDs(0, a.Get(), file_.Get()), 0) << "different types are never ordered";
}

TEST_F(Shell, EnumeratorListsLevelsInRegistryOrderAndTheLevelsOneFile) {
  SeedLevel(0, L"Alpha");
  SeedLevel(1, L"beta");
  RegWriteDword(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\Station 2", L"Port", 3);  // no "Name"
  SeedLevel(3, L"Gamma/West");
  if (auto list = Enumerate(kRoot, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS)) {
    EXPECT_EQ(com::ModuleLockCount(), before_ + 1) << "a living enumerator holds the module";
    const Texts levels{L"2:Alpha", L"2:beta", L"2:Gamma"};
    EXPECT_EQ(Walk(list.Get()), levels);
    SeedLevel(4, L"Late");
    EXPECT_EQ(list->Reset(), S_OK);
    EXPECT_EQ(Walk(list.Get()), levels) << "Reset gives the same items; later store changes don't show";
  }
  EXPECT_EQ(com::ModuleLockCount(), before_);
  // Only the folders and non-folders bits count; an empty path is the root; a level needn't be in the store.
  const Texts all{L"2:Alpha", L"2:beta", L"2:Gamma", L"2:Late"};
  EXPECT_EQ(Walk(Enumerate(L"", SHCONTF_FOLDERS).Get()), all);
  EXPECT_EQ(Walk(Enumerate(L"", SHCONTF_FOLDERS | SHCONTF_INCLUDEHIDDEN).Get()), all);
  EXPECT_EQ(Walk(Enumerate(kRoot, SHCONTF_NONFOLDERS).Get()), Texts{});
  EXPECT_EQ(Walk(Enumerate(L"\\Marlix Digital Levels\\Delta", SHCONTF_FOLDERS | SHCONTF_NONFOLDERS).Get()),
            Texts{L"3:file1.tkf"});
  EXPECT_EQ(Walk(Enumerate(L"\\Marlix Digital Levels\\Delta", SHCONTF_FOLDERS).Get()), Texts{});
}

TEST_F(Shell, EnumeratorOverNoStoreOddNamesAndPathsWithoutComponents) {
  EXPECT_EQ(Walk(Enumerate(kRoot, SHCONTF_FOLDERS).Get()), Texts{});
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, GetLevelsKeyName())) << "a missing store key is created";
  EXPECT_FALSE(Enumerate(L"\\/\\", SHCONTF_FOLDERS, E_OUTOFMEMORY));
  EXPECT_EQ(com::ModuleLockCount(), before_) << "a failed Create destroyed the object";
  // A value stored without its terminator ends where its bytes end; a name too long is invisible.
  std::wstring full(259, L'n');
  HKEY raw = nullptr;
  ASSERT_EQ(RegCreateKeyExW(HKEY_CURRENT_USER, (GetLevelsKeyName() + L"\\Station 0").c_str(), 0, nullptr, 0,
                            KEY_ALL_ACCESS, nullptr, &raw, nullptr), ERROR_SUCCESS);
  win::UniqueHKey level(raw);
  ASSERT_EQ(RegSetValueExW(raw, L"Name", 0, REG_SZ, reinterpret_cast<const BYTE*>(full.data()), 518), ERROR_SUCCESS);
  SeedLevel(1, std::wstring(300, L'x'));
  // An odd size lists as the store reads it, so the level can be found by what is listed.
  ASSERT_EQ(RegSetKeyValueW(HKEY_CURRENT_USER, (GetLevelsKeyName() + L"\\Station 2").c_str(), L"Name", REG_BINARY,
                            L"odd!", 5), ERROR_SUCCESS);
  EXPECT_EQ(Walk(Enumerate(kRoot, SHCONTF_FOLDERS).Get()), (Texts{L"2:" + full, L"2:odd"}));
}

TEST_F(Shell, EnumeratorNextSkipResetCloneAsTheShellExpects) {
  SeedLevel(0, L"A");
  SeedLevel(1, L"B");
  auto list = Enumerate(kRoot, SHCONTF_FOLDERS);
  ASSERT_TRUE(list);
  LPITEMIDLIST items[3] = {};
  ULONG fetched = 9;
  EXPECT_EQ(list->Next(0, items, nullptr), S_OK);
  EXPECT_EQ(list->Next(3, items, &fetched), S_FALSE);
  EXPECT_EQ(fetched, 2u);
  UniqueList first(items[0]), second(items[1]);
  list->Reset();
  EXPECT_EQ(list->Next(1, items, nullptr), S_OK);
  UniqueList again(items[0]);
  EXPECT_NE(again.Get(), first.Get()) << "each Next hands out a new copy";
  EXPECT_EQ(Ids(again.Get()), Ids(first.Get()));
  list->Reset();
  EXPECT_EQ(list->Skip(0), S_OK);
  EXPECT_EQ(list->Skip(2), S_OK);
  EXPECT_EQ(Walk(list.Get()), Texts{});
  list->Reset();
  EXPECT_EQ(list->Skip(3), S_FALSE);
  EXPECT_EQ(Walk(list.Get()), Texts{}) << "Skip past the end stands at the end";
  com::ComPtr<IEnumIDList> made;
  ASSERT_EQ(CreateMarlixDLEnumIDList(IID_IEnumIDList, made.PutVoid()), S_OK);
  EXPECT_EQ(Walk(made.Get()), Texts{}) << "made by its class object, an enumerator is empty";
}

TEST_F(Shell, ImageListsHoldThreePicturesAtBothSizesAndIconsComeFromThem) {
  LoadImageLists();
  LoadImageLists();  // a second load replaces the lists
  ASSERT_TRUE(LargeImageList && SmallImageList);
  for (auto [list, x, y] : {std::tuple{LargeImageList.Get(), SM_CXICON, SM_CYICON},
                             std::tuple{SmallImageList.Get(), SM_CXSMICON, SM_CYSMICON}}) {
    int cx = 0, cy = 0;
    EXPECT_EQ(ImageList_GetImageCount(list), 3);
    ImageList_GetIconSize(list, &cx, &cy);
    EXPECT_EQ(std::make_pair(cx, cy), std::make_pair(GetSystemMetrics(x), GetSystemMetrics(y)));
  }
  // Each place holds its own picture: the icon nearest to each entry is the one meant for it.
  for (auto [list, x] : {std::pair{LargeImageList.Get(), SM_CXICON}, std::pair{SmallImageList.Get(), SM_CXSMICON}}) {
    const int size = GetSystemMetrics(x);
    for (int place = 0; place < 3; ++place) {
      const auto entry = Pixels(size, [&](HDC dc) { ImageList_Draw(list, place, dc, 0, 0, ILD_NORMAL); });
      EXPECT_EQ(NearestIcon(entry, size), kIconOrder[place]) << "size " << size << ", place " << place;
    }
  }
  // A picture that can't be loaded keeps its place: the indexes never shift.
  LoadImageLists(GetModuleHandleW(L"kernel32.dll"));
  EXPECT_EQ(ImageList_GetImageCount(LargeImageList.Get()), 3);
  EXPECT_EQ(ImageList_GetImageCount(SmallImageList.Get()), 3);
  LoadImageLists();
  // The index follows the last id; a relative list has no parent id.
  auto icon = com::Make<CMarlixDLExtractIcon>();
  struct Row { UniqueList list; int index; } rows[] = {
      {MakeFull(L"Marlix Digital Levels\\Alpha"), 0},
      {MakeFull(L"Marlix Digital Levels"), 1},
      {MakeFull(L"Marlix Digital Levels\\Alpha\\file1.tkf"), 2},
      {MakeId(PIDL_LEVEL, L"Beta"), 0}};
  for (Row& row : rows) {
    SCOPED_TRACE(testing::Message() << "row " << &row - rows);
    ASSERT_TRUE(icon->SetItem(row.list.Get()));
    int index = -1, again = -1;
    UINT flags = 0;
    wchar_t file[8] = L"keep";  // not written to
    EXPECT_EQ(icon->GetIconLocation(GIL_FORSHELL, file, 8, &index, &flags), S_OK);
    EXPECT_EQ(flags, static_cast<UINT>(GIL_NOTFILENAME));
    icon->GetIconLocation(0, nullptr, 0, &again, &flags);
    EXPECT_EQ(std::make_pair(index, again), std::make_pair(row.index, row.index)) << "with and without a buffer";
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
  // A tip object made by its class object has no list: an empty tip.
  com::ComPtr<IQueryInfo> made;
  ASSERT_EQ(CreateMarlixDLQueryInfo(IID_IQueryInfo, made.PutVoid()), S_OK);
  win::UniqueCoMem<wchar_t> tip;
  EXPECT_EQ(made->GetInfoTip(0, tip.Put()), S_OK);
  EXPECT_STREQ(tip.Get(), L"");
}

// Its texts and the codes of its refusals are the code's; the rules are where they go.
TEST_F(Shell, ContextMenuHasOneSampleEntryAndPutsNarrowTextsInWideBuffers) {
  auto menu = com::Make<CMarlixDLContextMenu>();
  win::UniqueMenu popup(CreatePopupMenu());
  EXPECT_EQ(menu->QueryContextMenu(popup.Get(), 0, 100, 200, CMF_DEFAULTONLY), S_OK);
  EXPECT_EQ(GetMenuItemCount(popup.Get()), 0);
  EXPECT_EQ(menu->QueryContextMenu(popup.Get(), 0, 100, 200, CMF_NORMAL), MAKE_HRESULT(0, 0, 1));
  ASSERT_EQ(GetMenuItemCount(popup.Get()), 1);
  EXPECT_EQ(GetMenuItemID(popup.Get(), 0), 100u);
  char buffer[64];
  std::memset(buffer, 'x', sizeof(buffer));
  EXPECT_EQ(menu->GetCommandString(0, GCS_HELPTEXTW, nullptr, buffer, 32), S_OK);
  EXPECT_EQ(std::memcmp(buffer, "Explorer Bar command help text\0x", 32), 0) << "the narrow text and its terminator, nothing more";
  CMINVOKECOMMANDINFO info{sizeof(info)};
  info.lpVerb = "open";
  EXPECT_EQ(menu->InvokeCommand(&info), E_INVALIDARG) << "no verb of its own";
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
