#include <gtest/gtest.h>

#include "server/class_creators.h"
#include "shell/enum_id_list.h"
#include "shell/shell_test_util.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {

const wchar_t kRoot[] = L"\\Marlix Digital Levels";
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

TEST(EnumIDList, ListsLevelsInRegistryOrderAndTheLevelsOneFile) {
  RegistrySandbox sandbox;
  long before = com::ModuleLockCount();
  SeedLevel(0, L"Alpha");
  SeedLevel(1, L"beta");
  RegWriteDword(HKEY_CURRENT_USER, GetLevelsKeyName() + L"\\Station 2", L"Port", 3);  // no "Name"
  SeedLevel(3, L"Gamma/West");
  if (auto list = Enumerate(kRoot, SHCONTF_FOLDERS | SHCONTF_NONFOLDERS)) {
    EXPECT_EQ(com::ModuleLockCount(), before + 1) << "a living enumerator holds the module";
    const Texts levels{L"2:Alpha", L"2:beta", L"2:Gamma"};
    EXPECT_EQ(Walk(list.Get()), levels);
    SeedLevel(4, L"Late");
    EXPECT_EQ(list->Reset(), S_OK);
    EXPECT_EQ(Walk(list.Get()), levels) << "Reset gives the same items; later store changes don't show";
  }
  EXPECT_EQ(com::ModuleLockCount(), before);
  // Only the folders and non-folders bits count; an empty path is the root; a level needn't be in the store.
  const Texts all{L"2:Alpha", L"2:beta", L"2:Gamma", L"2:Late"};
  EXPECT_EQ(Walk(Enumerate(L"", SHCONTF_FOLDERS).Get()), all);
  EXPECT_EQ(Walk(Enumerate(L"", SHCONTF_FOLDERS | SHCONTF_INCLUDEHIDDEN).Get()), all);
  EXPECT_EQ(Walk(Enumerate(kRoot, SHCONTF_NONFOLDERS).Get()), Texts{});
  EXPECT_EQ(Walk(Enumerate(L"\\Marlix Digital Levels\\Delta", SHCONTF_FOLDERS | SHCONTF_NONFOLDERS).Get()),
            Texts{L"3:file1.tkf"});
  EXPECT_EQ(Walk(Enumerate(L"\\Marlix Digital Levels\\Delta", SHCONTF_FOLDERS).Get()), Texts{});
}

TEST(EnumIDList, StoreWithoutKeyOrWithOddNamesAndPathsWithoutComponents) {
  RegistrySandbox sandbox;
  long before = com::ModuleLockCount();
  EXPECT_EQ(Walk(Enumerate(kRoot, SHCONTF_FOLDERS).Get()), Texts{});
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, GetLevelsKeyName())) << "a missing store key is created";
  EXPECT_FALSE(Enumerate(L"\\/\\", SHCONTF_FOLDERS, E_OUTOFMEMORY));
  EXPECT_EQ(com::ModuleLockCount(), before) << "a failed Create destroyed the object";
  // A value stored without its terminator ends where its bytes end; a name too long is invisible.
  std::wstring full(259, L'n');
  HKEY raw = nullptr;
  ASSERT_EQ(RegCreateKeyExW(HKEY_CURRENT_USER, (GetLevelsKeyName() + L"\\Station 0").c_str(), 0, nullptr, 0,
                            KEY_ALL_ACCESS, nullptr, &raw, nullptr), ERROR_SUCCESS);
  win::UniqueHKey level(raw);
  ASSERT_EQ(RegSetValueExW(raw, L"Name", 0, REG_SZ, reinterpret_cast<const BYTE*>(full.data()), 518), ERROR_SUCCESS);
  SeedLevel(1, std::wstring(300, L'x'));
  EXPECT_EQ(Walk(Enumerate(kRoot, SHCONTF_FOLDERS).Get()), Texts{L"2:" + full});
}

TEST(EnumIDList, NextSkipResetCloneAsTheShellExpects) {
  RegistrySandbox sandbox;
  SeedLevel(0, L"A");
  SeedLevel(1, L"B");
  auto list = Enumerate(kRoot, SHCONTF_FOLDERS);
  ASSERT_TRUE(list);
  LPITEMIDLIST items[3] = {};
  ULONG fetched = 9;
  EXPECT_EQ(list->Next(2, items, nullptr), E_INVALIDARG);
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
  IEnumIDList* clone = reinterpret_cast<IEnumIDList*>(1);
  EXPECT_EQ(list->Clone(&clone), E_NOTIMPL);
  EXPECT_EQ(clone, nullptr);
  com::ComPtr<IEnumIDList> made;
  ASSERT_EQ(CreateMarlixDLEnumIDList(IID_IEnumIDList, made.PutVoid()), S_OK);
  EXPECT_EQ(Walk(made.Get()), Texts{}) << "made by its class object, an enumerator is empty";
}

}  // namespace
