#include <gtest/gtest.h>

#include "server/class_creators.h"
#include "server/class_ids.h"
#include "shell/shell_folder.h"
#include "shell/shell_test_util.h"
#include "support/registry_sandbox.h"

namespace {

std::wstring Path(IShellFolder* folder, bool parsing) {
  wchar_t path[MAX_PATH];
  return static_cast<CMarlixDLShellFolder*>(folder)->GetFolderPath(path, MAX_PATH, parsing) ? path : L"<failed>";
}

// A root folder and its level "Alpha" over an empty store; every object must let go of the module.
class ShellFolder : public ::testing::Test {
 protected:
  void TearDown() override {
    root_.Reset();
    level_.Reset();
    EXPECT_EQ(com::ModuleLockCount(), before_);
  }
  long before_ = com::ModuleLockCount();
  RegistrySandbox sandbox_;
  com::ComPtr<CMarlixDLShellFolder> root_ = com::Make<CMarlixDLShellFolder>();
  HRESULT initialized_ = root_->Initialize(nullptr);
  UniqueList alpha_ = MakeId(PIDL_LEVEL, L"Alpha"), file_ = MakeId(PIDL_FILE, L"file1.tkf");
  com::ComPtr<IShellFolder> level_ = Bind(root_.Get(), alpha_.Get());
};

TEST_F(ShellFolder, PositionsAddressesAndInterfaces) {
  EXPECT_EQ(initialized_, S_OK);
  EXPECT_EQ(Path(root_.Get(), false), L"\\Marlix Digital Levels");
  EXPECT_EQ(Path(root_.Get(), true), kParsingRoot);
  EXPECT_EQ(Path(level_.Get(), false), L"\\Marlix Digital Levels\\Alpha");
  EXPECT_EQ(Path(level_.Get(), true), kParsingRoot + L"\\Alpha");
  wchar_t tiny[8];
  EXPECT_FALSE(root_->GetFolderPath(tiny, 8, false));
  EXPECT_FALSE(root_->GetFolderPath(nullptr, 8, false));
  UniqueList any = MakeFull(L"Elsewhere\\Beta");
  EXPECT_EQ(static_cast<CMarlixDLShellFolder*>(level_.Get())->Initialize(any.Get()), S_OK);
  EXPECT_EQ(Path(level_.Get(), false), L"\\Marlix Digital Levels") << "Initialize ignores its argument";
  com::ComPtr<IPersist> persist;
  ASSERT_EQ(level_.As(&persist), S_OK);
  CLSID clsid{};
  EXPECT_EQ(persist->GetClassID(&clsid), S_OK);
  EXPECT_TRUE(IsEqualCLSID(clsid, CLSID_MarlixDLShellFolder));
  com::ComPtr<IUnknown> other;
  EXPECT_EQ(level_->QueryInterface(IID_IPersistFolder, other.PutVoid()), S_OK);
  EXPECT_EQ(level_->QueryInterface(IID_IShellFolder2, other.PutVoid()), E_NOINTERFACE);
  EXPECT_EQ(level_->BindToObject(file_.Get(), nullptr, IID_IShellFolder, other.PutVoid()), E_INVALIDARG);
  EXPECT_EQ(root_->BindToObject(alpha_.Get(), nullptr, IID_IDropTarget, other.PutVoid()), E_NOINTERFACE);
  EXPECT_EQ(root_->BindToStorage(alpha_.Get(), nullptr, IID_IStream, other.PutVoid()), E_NOTIMPL);
  EXPECT_EQ(root_->SetNameOf(nullptr, alpha_.Get(), L"x", 0, nullptr), E_NOTIMPL);
  EXPECT_EQ(CreateMarlixDLShellFolder(IID_IShellFolder, other.PutVoid()), S_OK);
}

TEST_F(ShellFolder, ParsesNamesWithoutAskingTheStore) {
  struct Row { IShellFolder* folder; const wchar_t* name; HRESULT hr; IdList ids; };
  const Row rows[] = {
      {root_.Get(), L"Nowhere", S_OK, {{PIDL_LEVEL, L"Nowhere"}}},
      {root_.Get(), L"A/file1.tkf", S_OK, {{PIDL_LEVEL, L"A"}, {PIDL_FILE, L"file1.tkf"}}},
      {root_.Get(), L"A\\B\\C", E_INVALIDARG, {}},
      {root_.Get(), L"", S_OK, {}},
      {level_.Get(), L"file1.tkf", S_OK, {{PIDL_FILE, L"file1.tkf"}}},
      {level_.Get(), L"x\\y", S_OK, {{PIDL_LEVEL, L"Alpha"}, {PIDL_FILE, L"x"}}},
      {level_.Get(), L"x\\y\\z", E_INVALIDARG, {}},
  };
  for (const Row& row : rows) {
    SCOPED_TRACE(testing::Message() << (row.folder == level_.Get() ? "level: " : "root: ") << row.name);
    std::wstring text = row.name;
    PIDLIST_RELATIVE result = reinterpret_cast<PIDLIST_RELATIVE>(1);
    ULONG eaten = 77, attributes = 88;
    EXPECT_EQ(row.folder->ParseDisplayName(nullptr, nullptr, text.data(), &eaten, &result, &attributes), row.hr);
    EXPECT_EQ(Ids(result), row.ids);
    EXPECT_EQ(eaten, 77u);
    EXPECT_EQ(attributes, 88u);
    CoTaskMemFree(result);
  }
}

TEST_F(ShellFolder, EnumeratesThroughItsOwnPath) {
  SeedLevel(0, L"Alpha");
  SeedLevel(1, L"Beta");
  std::vector<std::wstring> names;
  for (const UniqueList& item : Enum(root_.Get(), SHCONTF_FOLDERS | SHCONTF_NONFOLDERS)) {
    names.push_back(Name(root_.Get(), item.Get(), SHGDN_INFOLDER));
    auto level = Bind(root_.Get(), item.Get());
    auto files = Enum(level.Get(), SHCONTF_NONFOLDERS);
    ASSERT_EQ(files.size(), 1u);
    EXPECT_EQ(Name(level.Get(), files[0].Get(), SHGDN_FORPARSING), kParsingRoot + L"\\" + names.back() + L"\\file1.tkf");
  }
  EXPECT_EQ(names, (std::vector<std::wstring>{L"Alpha", L"Beta"}));
}

TEST_F(ShellFolder, AttributesStartFullAndValidateOnlyTheFirstItem) {
  SeedLevel(0, L"Alpha");
  UniqueList gone = MakeId(PIDL_LEVEL, L"Gone"), rootId = MakeId(PIDL_ROOT, L"Marlix Digital Levels");
  struct Row { std::vector<LPCITEMIDLIST> items; SFGAOF in, out; HRESULT hr; };
  Row rows[] = {
      {{}, 0, 0xFFFFFFFF, S_OK}, {{alpha_.Get()}, 0, SFGAO_FOLDER | SFGAO_DROPTARGET, S_OK},
      {{file_.Get()}, SFGAO_FOLDER, SFGAO_CANCOPY, S_OK}, {{rootId.Get()}, 0, 0, S_OK},
      {{alpha_.Get(), file_.Get()}, 0, 0, S_OK}, {{gone.Get()}, 0, 0, E_FAIL},
      {{alpha_.Get(), gone.Get()}, 0, SFGAO_FOLDER | SFGAO_DROPTARGET, S_OK}};
  for (Row& row : rows) {
    SFGAOF attributes = row.in;
    EXPECT_EQ(root_->GetAttributesOf(static_cast<UINT>(row.items.size()), row.items.data(), &attributes), row.hr)
        << "row " << &row - rows;
    if (SUCCEEDED(row.hr)) { EXPECT_EQ(attributes, row.out) << "row " << &row - rows; }
  }
}

TEST_F(ShellFolder, DisplayNamesByFlagsAndOrder) {
  struct Row { SHGDNF flags; HRESULT hr; std::wstring text; };
  const Row rows[] = {
      {SHGDN_NORMAL, S_OK, L"Alpha"}, {SHGDN_INFOLDER, S_OK, L"Alpha"}, {SHGDN_FORADDRESSBAR, S_OK, L"Alpha"},
      {SHGDN_FORADDRESSBAR | SHGDN_INFOLDER, S_OK, L"Alpha"}, {SHGDN_FORPARSING, S_OK, kParsingRoot + L"\\Alpha"},
      {SHGDN_FORPARSING | SHGDN_INFOLDER, S_OK, L"Alpha"}, {SHGDN_FORPARSING | 0x02, S_OK, L""},
      {0x02, E_INVALIDARG, L""}, {SHGDN_FORADDRESSBAR | 0x02, E_INVALIDARG, L""}, {SHGDN_FOREDITING, E_INVALIDARG, L""},
      {SHGDN_FORPARSING | SHGDN_FORADDRESSBAR, E_INVALIDARG, L""}};
  for (const Row& row : rows) {
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
  UniqueList aaa = MakeId(PIDL_FILE, L"aaa");
  EXPECT_EQ(root_->CompareIDs(0, a.Get(), aaa.Get()), 0) << "different types are never ordered";
}

TEST_F(ShellFolder, HandsOutObjectsWithTheItemsFullList) {
  LPCITEMIDLIST items[] = {file_.Get(), file_.Get()};
  com::ComPtr<IQueryInfo> info;
  ASSERT_EQ(level_->GetUIObjectOf(nullptr, 1, items, IID_IQueryInfo, nullptr, info.PutVoid()), S_OK);
  win::UniqueCoMem<wchar_t> tip;
  ASSERT_EQ(info->GetInfoTip(0, tip.Put()), S_OK);
  EXPECT_STREQ(tip.Get(), L"Marlix Digital Levels\\Alpha\\file1.tkf");
  com::ComPtr<IExtractIconW> icon;
  ASSERT_EQ(level_->GetUIObjectOf(nullptr, 1, items, IID_IExtractIconW, nullptr, icon.PutVoid()), S_OK);
  int index = -1;
  UINT flags = 0;
  icon->GetIconLocation(0, nullptr, 0, &index, &flags);
  EXPECT_EQ(index, 2);
  com::ComPtr<IUnknown> other;
  EXPECT_EQ(level_->GetUIObjectOf(nullptr, 1, items, IID_IDataObject, nullptr, other.PutVoid()), S_OK);
  EXPECT_TRUE(other);
  EXPECT_EQ(root_->CreateViewObject(nullptr, IID_IContextMenu, other.PutVoid()), S_OK);
  EXPECT_TRUE(other);
  EXPECT_EQ(root_->CreateViewObject(nullptr, IID_IDropTarget, other.PutVoid()), E_NOINTERFACE);
  EXPECT_EQ(level_->GetUIObjectOf(nullptr, 2, items, IID_IQueryInfo, nullptr, other.PutVoid()), E_FAIL);
  EXPECT_EQ(level_->GetUIObjectOf(nullptr, 0, items, IID_IQueryInfo, nullptr, other.PutVoid()), E_FAIL);
  EXPECT_EQ(level_->GetUIObjectOf(nullptr, 1, items, IID_IContextMenu, nullptr, other.PutVoid()), E_NOINTERFACE);
  EXPECT_FALSE(other);
}

}  // namespace
