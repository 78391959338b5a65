#include <gtest/gtest.h>

#include "server/class_creators.h"
#include "shell/enum_id_list.h"
#include "shell/shell_test_util.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {

const wchar_t kRoot[] = L"\\Marlix Digital Levels";
const wchar_t kLevel[] = L"\\Marlix Digital Levels\\Alpha";

// Creates an enumerator; null if Create failed (the object is gone then).
com::ComPtr<CMarlixDLEnumIDList> Enumerate(const wchar_t* path, DWORD flags, HRESULT* hr) {
  auto* list = new CMarlixDLEnumIDList();
  list->Create(path, flags, hr);
  return SUCCEEDED(*hr) ? com::ComPtr<CMarlixDLEnumIDList>::Attach(list) : nullptr;
}

std::vector<std::wstring> Walk(IEnumIDList* list) {
  std::vector<std::wstring> texts;
  LPITEMIDLIST item = nullptr;
  ULONG fetched = 0;
  while (list->Next(1, &item, &fetched) == S_OK) {
    auto ids = Ids(item);
    EXPECT_EQ(ids.size(), 1u);
    texts.push_back(std::to_wstring(ids[0].first) + L":" + ids[0].second);
    CoTaskMemFree(item);
  }
  EXPECT_EQ(fetched, 0u);
  return texts;
}

TEST(EnumIDList, RootListsLevelsInRegistryOrderAndSkipsUnnamedKeys) {
  RegistrySandbox sandbox;
  long before = com::ModuleLockCount();
  SeedLevel(0, L"Alpha");
  SeedLevel(1, L"beta");
  RegWriteDword(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\Station 2", L"Port", 3);  // no "Name"
  SeedLevel(3, L"Gamma/West");
  HRESULT hr = E_FAIL;
  {
    auto list = Enumerate(kRoot, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &hr);
    ASSERT_EQ(hr, S_OK);
    EXPECT_EQ(com::ModuleLockCount(), before + 1) << "a living enumerator holds the module";
    EXPECT_EQ(Walk(list.Get()), (std::vector<std::wstring>{L"2:Alpha", L"2:beta", L"2:Gamma"}));
    // Store changes after creation don't show.
    SeedLevel(4, L"Late");
    EXPECT_EQ(list->Reset(), S_OK);
    EXPECT_EQ(Walk(list.Get()).size(), 3u) << "after Reset the same items come again";
  }
  EXPECT_EQ(com::ModuleLockCount(), before);

  // Only the folders bit and the non-folders bit count; an empty path is the root.
  for (DWORD flags : {DWORD(SHCONTF_FOLDERS), DWORD(SHCONTF_FOLDERS | SHCONTF_INCLUDEHIDDEN)}) {
    auto list = Enumerate(L"", flags, &hr);
    ASSERT_EQ(hr, S_OK);
    EXPECT_EQ(Walk(list.Get()).size(), 4u);
  }
  auto files = Enumerate(kRoot, SHCONTF_NONFOLDERS, &hr);
  ASSERT_EQ(hr, S_OK);
  LPITEMIDLIST item = reinterpret_cast<LPITEMIDLIST>(1);
  ULONG fetched = 7;
  EXPECT_EQ(files->Next(1, &item, &fetched), S_FALSE);
  EXPECT_EQ(fetched, 0u);
}

TEST(EnumIDList, LevelListsTheOneVirtualFile) {
  RegistrySandbox sandbox;
  HRESULT hr = E_FAIL;
  auto both = Enumerate(kLevel, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS, &hr);
  ASSERT_EQ(hr, S_OK);
  EXPECT_EQ(Walk(both.Get()), (std::vector<std::wstring>{L"3:file1.tkf"}));
  auto folders = Enumerate(kLevel, SHCONTF_FOLDERS, &hr);
  ASSERT_EQ(hr, S_OK);
  EXPECT_TRUE(Walk(folders.Get()).empty());
}

TEST(EnumIDList, RootWithoutStoreCreatesTheKeyAndAPathWithoutComponentsFails) {
  RegistrySandbox sandbox;
  long before = com::ModuleLockCount();
  HRESULT hr = E_FAIL;
  {
    auto list = Enumerate(kRoot, SHCONTF_FOLDERS, &hr);
    ASSERT_EQ(hr, S_OK);
    EXPECT_TRUE(Walk(list.Get()).empty());
    EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, GetLevelsKeyName()));
  }
  EXPECT_FALSE(Enumerate(L"\\/\\", SHCONTF_FOLDERS, &hr));
  EXPECT_EQ(hr, E_OUTOFMEMORY);
  EXPECT_EQ(com::ModuleLockCount(), before) << "a failed Create destroyed the object";
}

TEST(EnumIDList, NameValuesAreReadWithinTheirBuffer) {
  RegistrySandbox sandbox;
  const std::wstring key = GetLevelsKeyName() + L"\\Station 0";
  // A value stored without its terminator ends where its bytes end.
  std::wstring full(259, L'n');
  HKEY raw = nullptr;
  ASSERT_EQ(RegCreateKeyExW(HKEY_CURRENT_USER, key.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &raw, nullptr),
            ERROR_SUCCESS);
  win::UniqueHKey level(raw);
  ASSERT_EQ(RegSetValueExW(level.Get(), L"Name", 0, REG_SZ, reinterpret_cast<const BYTE*>(full.data()), 518),
            ERROR_SUCCESS);
  SeedLevel(1, std::wstring(300, L'x'));  // too long: invisible
  HRESULT hr = E_FAIL;
  auto list = Enumerate(kRoot, SHCONTF_FOLDERS, &hr);
  ASSERT_EQ(hr, S_OK);
  EXPECT_EQ(Walk(list.Get()), (std::vector<std::wstring>{L"2:" + full}));
}

TEST(EnumIDList, NextSkipResetCloneAsTheShellExpects) {
  RegistrySandbox sandbox;
  SeedLevel(0, L"A");
  SeedLevel(1, L"B");
  HRESULT hr = E_FAIL;
  auto list = Enumerate(kRoot, SHCONTF_FOLDERS, &hr);
  ASSERT_EQ(hr, S_OK);
  LPITEMIDLIST items[3] = {};
  EXPECT_EQ(list->Next(2, items, nullptr), E_INVALIDARG);
  EXPECT_EQ(list->Next(0, items, nullptr), S_OK);
  ULONG fetched = 9;
  EXPECT_EQ(list->Next(3, items, &fetched), S_FALSE);
  EXPECT_EQ(fetched, 2u);
  LPITEMIDLIST first = items[0];
  CoTaskMemFree(items[1]);
  list->Reset();
  EXPECT_EQ(list->Next(1, items, nullptr), S_OK);
  EXPECT_NE(items[0], first) << "each Next hands out a new copy";
  EXPECT_EQ(Ids(items[0]), Ids(first));
  CoTaskMemFree(items[0]);
  CoTaskMemFree(first);

  list->Reset();
  EXPECT_EQ(list->Skip(0), S_OK);
  EXPECT_EQ(list->Skip(2), S_OK);
  EXPECT_EQ(list->Next(1, items, &fetched), S_FALSE);
  list->Reset();
  EXPECT_EQ(list->Skip(3), S_FALSE);
  EXPECT_EQ(list->Next(1, items, &fetched), S_FALSE) << "Skip past the end stands at the end";

  IEnumIDList* clone = reinterpret_cast<IEnumIDList*>(1);
  EXPECT_EQ(list->Clone(&clone), E_NOTIMPL);
  EXPECT_EQ(clone, nullptr);

  // Made by its class object, an enumerator is empty.
  com::ComPtr<IEnumIDList> made;
  ASSERT_EQ(CreateMarlixDLEnumIDList(IID_IEnumIDList, made.PutVoid()), S_OK);
  EXPECT_EQ(made->Next(1, items, &fetched), S_FALSE);
}

}  // namespace
