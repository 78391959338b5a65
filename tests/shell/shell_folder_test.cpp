#include <gtest/gtest.h>

#include "server/class_creators.h"
#include "server/class_ids.h"
#include "shell/shell_folder.h"
#include "shell/shell_test_util.h"
#include "support/registry_sandbox.h"

namespace {

const std::wstring kParsingRoot = L"::{D8B818CA-E47C-49a1-96A5-C2AA5FB57F15}";

com::ComPtr<CMarlixDLShellFolder> Root() {
  auto folder = com::Make<CMarlixDLShellFolder>();
  EXPECT_EQ(folder->Initialize(nullptr), S_OK);
  return folder;
}

com::ComPtr<IShellFolder> Bind(IShellFolder* parent, LPCITEMIDLIST item) {
  com::ComPtr<IShellFolder> child;
  EXPECT_EQ(parent->BindToObject(item, nullptr, IID_IShellFolder, child.PutVoid()), S_OK);
  return child;
}

std::wstring DisplayName(IShellFolder* folder, LPCITEMIDLIST item, SHGDNF flags, HRESULT* hr = nullptr) {
  STRRET strret{};
  HRESULT result = folder->GetDisplayNameOf(item, flags, &strret);
  if (hr) *hr = result;
  return SUCCEEDED(result) ? TakeStrRet(strret) : L"<failed>";
}

std::wstring FolderPath(CMarlixDLShellFolder* folder, bool parsing) {
  wchar_t path[MAX_PATH];
  EXPECT_TRUE(folder->GetFolderPath(path, MAX_PATH, parsing));
  return path;
}

TEST(ShellFolder, PositionsAndAddressesAtBothDepths) {
  long before = com::ModuleLockCount();
  {
    auto root = Root();
    EXPECT_EQ(FolderPath(root.Get(), false), L"\\Marlix Digital Levels");
    EXPECT_EQ(FolderPath(root.Get(), true), kParsingRoot);
    wchar_t tiny[8];
    EXPECT_FALSE(root->GetFolderPath(tiny, 8, false));
    EXPECT_FALSE(root->GetFolderPath(nullptr, 8, false));

    UniqueList alpha = MakeId(PIDL_LEVEL, L"Alpha");
    auto level = Bind(root.Get(), alpha.Get());
    auto* levelFolder = static_cast<CMarlixDLShellFolder*>(level.Get());
    EXPECT_EQ(FolderPath(levelFolder, false), L"\\Marlix Digital Levels\\Alpha");
    EXPECT_EQ(FolderPath(levelFolder, true), kParsingRoot + L"\\Alpha");

    // Initialize ignores its argument: the folder stands at the root again.
    UniqueList any = MakeFull(L"Elsewhere\\Beta");
    EXPECT_EQ(levelFolder->Initialize(any.Get()), S_OK);
    EXPECT_EQ(FolderPath(levelFolder, false), L"\\Marlix Digital Levels");

    CLSID clsid{};
    com::ComPtr<IPersist> persist;
    ASSERT_EQ(level.As(&persist), S_OK);
    EXPECT_EQ(persist->GetClassID(&clsid), S_OK);
    EXPECT_TRUE(IsEqualCLSID(clsid, CLSID_MarlixDLShellFolder));
    com::ComPtr<IPersistFolder> persistFolder;
    EXPECT_EQ(level.As(&persistFolder), S_OK);
    com::ComPtr<IShellFolder2> folder2;
    EXPECT_EQ(level.As(&folder2), E_NOINTERFACE);

    UniqueList file = MakeId(PIDL_FILE, L"file1.tkf");
    com::ComPtr<IShellFolder> none;
    EXPECT_EQ(level->BindToObject(file.Get(), nullptr, IID_IShellFolder, none.PutVoid()), E_INVALIDARG);
    EXPECT_EQ(root->BindToObject(alpha.Get(), nullptr, IID_IDropTarget, none.PutVoid()), E_NOINTERFACE);
    EXPECT_EQ(root->BindToStorage(alpha.Get(), nullptr, IID_IStream, none.PutVoid()), E_NOTIMPL);
    EXPECT_EQ(root->SetNameOf(nullptr, alpha.Get(), L"x", 0, nullptr), E_NOTIMPL);

    com::ComPtr<IShellFolder> made;
    EXPECT_EQ(CreateMarlixDLShellFolder(IID_IShellFolder, made.PutVoid()), S_OK);
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
}

TEST(ShellFolder, ParsesNamesWithoutAskingTheStore) {
  RegistrySandbox sandbox;
  auto root = Root();
  auto parse = [](IShellFolder* folder, const wchar_t* name, HRESULT* hr) {
    std::wstring text = name;
    PIDLIST_RELATIVE result = reinterpret_cast<PIDLIST_RELATIVE>(1);
    ULONG eaten = 77, attributes = 88;
    *hr = folder->ParseDisplayName(nullptr, nullptr, text.data(), &eaten, &result, &attributes);
    EXPECT_EQ(eaten, 77u);
    EXPECT_EQ(attributes, 88u);
    auto ids = Ids(result);
    CoTaskMemFree(result);
    return ids;
  };
  using IdList = std::vector<std::pair<tagPIDLTYPE, std::wstring>>;
  HRESULT hr = E_FAIL;
  EXPECT_EQ(parse(root.Get(), L"Nowhere", &hr), (IdList{{PIDL_LEVEL, L"Nowhere"}}));
  EXPECT_EQ(hr, S_OK);
  EXPECT_EQ(parse(root.Get(), L"A/file1.tkf", &hr), (IdList{{PIDL_LEVEL, L"A"}, {PIDL_FILE, L"file1.tkf"}}));
  EXPECT_EQ(hr, S_OK);
  EXPECT_TRUE(parse(root.Get(), L"A\\B\\C", &hr).empty());
  EXPECT_EQ(hr, E_INVALIDARG);
  EXPECT_TRUE(parse(root.Get(), L"", &hr).empty());
  EXPECT_EQ(hr, S_OK);

  UniqueList alpha = MakeId(PIDL_LEVEL, L"Alpha");
  auto level = Bind(root.Get(), alpha.Get());
  EXPECT_EQ(parse(level.Get(), L"file1.tkf", &hr), (IdList{{PIDL_FILE, L"file1.tkf"}}));
  EXPECT_EQ(parse(level.Get(), L"x\\y", &hr), (IdList{{PIDL_LEVEL, L"Alpha"}, {PIDL_FILE, L"x"}}));
  EXPECT_EQ(hr, S_OK);
  EXPECT_TRUE(parse(level.Get(), L"x\\y\\z", &hr).empty());
  EXPECT_EQ(hr, E_INVALIDARG);
}

TEST(ShellFolder, EnumeratesThroughItsOwnPath) {
  RegistrySandbox sandbox;
  SeedLevel(0, L"Alpha");
  SeedLevel(1, L"Beta");
  long before = com::ModuleLockCount();
  {
    auto root = Root();
    com::ComPtr<IEnumIDList> list;
    ASSERT_EQ(root->EnumObjects(nullptr, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, list.Put()), S_OK);
    std::vector<std::wstring> names;
    LPITEMIDLIST item = nullptr;
    while (list->Next(1, &item, nullptr) == S_OK) {
      names.push_back(DisplayName(root.Get(), item, SHGDN_INFOLDER));
      auto level = Bind(root.Get(), item);
      com::ComPtr<IEnumIDList> files;
      ASSERT_EQ(level->EnumObjects(nullptr, SHCONTF_NONFOLDERS, files.Put()), S_OK);
      LPITEMIDLIST file = nullptr;
      ASSERT_EQ(files->Next(1, &file, nullptr), S_OK);
      EXPECT_EQ(DisplayName(level.Get(), file, SHGDN_FORPARSING), kParsingRoot + L"\\" + names.back() + L"\\file1.tkf");
      CoTaskMemFree(file);
      CoTaskMemFree(item);
    }
    EXPECT_EQ(names, (std::vector<std::wstring>{L"Alpha", L"Beta"}));
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
}

TEST(ShellFolder, AttributesStartFullAndValidateOnlyTheFirstItem) {
  RegistrySandbox sandbox;
  SeedLevel(0, L"Alpha");
  auto root = Root();
  UniqueList alpha = MakeId(PIDL_LEVEL, L"Alpha");
  UniqueList gone = MakeId(PIDL_LEVEL, L"Gone");
  UniqueList file = MakeId(PIDL_FILE, L"file1.tkf");
  UniqueList rootId = MakeId(PIDL_ROOT, L"Marlix Digital Levels");
  auto attributesOf = [&](std::vector<LPCITEMIDLIST> items, SFGAOF mask, HRESULT* hr) {
    SFGAOF attributes = mask;
    *hr = root->GetAttributesOf(static_cast<UINT>(items.size()), items.data(), &attributes);
    return attributes;
  };
  HRESULT hr = E_FAIL;
  EXPECT_EQ(attributesOf({}, 0, &hr), 0xFFFFFFFFu);
  EXPECT_EQ(hr, S_OK);
  EXPECT_EQ(attributesOf({alpha.Get()}, 0, &hr), 0x20000100u);
  EXPECT_EQ(attributesOf({file.Get()}, SFGAO_FOLDER, &hr), 0x00000001u);
  EXPECT_EQ(attributesOf({rootId.Get()}, 0, &hr), 0u);
  EXPECT_EQ(attributesOf({alpha.Get(), file.Get()}, 0, &hr), 0u);
  EXPECT_EQ(hr, S_OK);
  attributesOf({gone.Get()}, 0, &hr);
  EXPECT_EQ(hr, E_FAIL);
  EXPECT_EQ(attributesOf({alpha.Get(), gone.Get()}, 0, &hr), 0x20000100u);
  EXPECT_EQ(hr, S_OK);
}

TEST(ShellFolder, DisplayNamesByFlags) {
  auto root = Root();
  UniqueList alpha = MakeId(PIDL_LEVEL, L"Alpha");
  UniqueList two = MakeFull(L"Marlix Digital Levels\\Alpha");
  struct Case { SHGDNF flags; HRESULT hr; std::wstring text; };
  const Case cases[] = {
      {SHGDN_NORMAL, S_OK, L"Alpha"},
      {SHGDN_INFOLDER, S_OK, L"Alpha"},
      {SHGDN_FORADDRESSBAR, S_OK, L"Alpha"},
      {SHGDN_FORADDRESSBAR | SHGDN_INFOLDER, S_OK, L"Alpha"},
      {0x02, E_INVALIDARG, L""},
      {SHGDN_FORADDRESSBAR | 0x02, E_INVALIDARG, L""},
      {SHGDN_FORPARSING, S_OK, kParsingRoot + L"\\Alpha"},
      {SHGDN_FORPARSING | SHGDN_INFOLDER, S_OK, L"Alpha"},
      {SHGDN_FORPARSING | 0x02, S_OK, L""},
      {SHGDN_FOREDITING, E_INVALIDARG, L""},
      {SHGDN_FORPARSING | SHGDN_FORADDRESSBAR, E_INVALIDARG, L""},
  };
  for (const Case& c : cases) {
    HRESULT hr = E_FAIL;
    std::wstring text = DisplayName(root.Get(), alpha.Get(), c.flags, &hr);
    EXPECT_EQ(hr, c.hr) << std::hex << c.flags;
    if (SUCCEEDED(c.hr)) EXPECT_EQ(text, c.text) << std::hex << c.flags;
  }
  EXPECT_EQ(DisplayName(root.Get(), two.Get(), SHGDN_NORMAL), L"Marlix Digital Levels\\Alpha");
}

TEST(ShellFolder, ComparesByRawPathOrder) {
  auto root = Root();
  UniqueList a = MakeId(PIDL_LEVEL, L"alpha"), b = MakeId(PIDL_LEVEL, L"Beta"), upper = MakeId(PIDL_LEVEL, L"ALPHA");
  UniqueList file = MakeId(PIDL_FILE, L"aaa");
  EXPECT_LT(root->CompareIDs(0, a.Get(), b.Get()), 0);
  EXPECT_GT(root->CompareIDs(0, b.Get(), a.Get()), 0);
  EXPECT_GT(root->CompareIDs(-1, a.Get(), b.Get()), 0) << "the parameter is a direction";
  EXPECT_EQ(root->CompareIDs(0, a.Get(), upper.Get()), 0);
  EXPECT_EQ(root->CompareIDs(0, a.Get(), file.Get()), 0) << "different types are never ordered";
}

TEST(ShellFolder, HandsOutObjectsWithTheItemsFullList) {
  long before = com::ModuleLockCount();
  {
    auto root = Root();
    UniqueList alpha = MakeId(PIDL_LEVEL, L"Alpha");
    auto level = Bind(root.Get(), alpha.Get());
    UniqueList file = MakeId(PIDL_FILE, L"file1.tkf");
    LPCITEMIDLIST items[] = {file.Get(), file.Get()};

    com::ComPtr<IQueryInfo> info;
    ASSERT_EQ(level->GetUIObjectOf(nullptr, 1, items, IID_IQueryInfo, nullptr, info.PutVoid()), S_OK);
    win::UniqueCoMem<wchar_t> tip;
    ASSERT_EQ(info->GetInfoTip(0, tip.Put()), S_OK);
    EXPECT_STREQ(tip.Get(), L"Marlix Digital Levels\\Alpha\\file1.tkf");

    com::ComPtr<IExtractIconW> icon;
    ASSERT_EQ(level->GetUIObjectOf(nullptr, 1, items, IID_IExtractIconW, nullptr, icon.PutVoid()), S_OK);
    int index = -1;
    UINT flags = 0;
    icon->GetIconLocation(0, nullptr, 0, &index, &flags);
    EXPECT_EQ(index, 2);

    com::ComPtr<IDataObject> data;
    EXPECT_EQ(level->GetUIObjectOf(nullptr, 1, items, IID_IDataObject, nullptr, data.PutVoid()), S_OK);
    EXPECT_TRUE(data);

    com::ComPtr<IUnknown> none;
    EXPECT_EQ(level->GetUIObjectOf(nullptr, 2, items, IID_IQueryInfo, nullptr, none.PutVoid()), E_FAIL);
    EXPECT_EQ(level->GetUIObjectOf(nullptr, 0, items, IID_IQueryInfo, nullptr, none.PutVoid()), E_FAIL);
    EXPECT_EQ(level->GetUIObjectOf(nullptr, 1, items, IID_IContextMenu, nullptr, none.PutVoid()), E_NOINTERFACE);
    EXPECT_FALSE(none);

    com::ComPtr<IContextMenu> menu;
    EXPECT_EQ(root->CreateViewObject(nullptr, IID_IContextMenu, menu.PutVoid()), S_OK);
    EXPECT_TRUE(menu);
    EXPECT_EQ(root->CreateViewObject(nullptr, IID_IDropTarget, none.PutVoid()), E_NOINTERFACE);
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
}

}  // namespace
