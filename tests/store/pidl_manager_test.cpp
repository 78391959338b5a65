#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "helpers/win_handles.h"
#include "store/pidl_manager.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {

using List = win::UniqueCoMem<ITEMIDLIST>;
using Ids = std::vector<std::pair<int, std::wstring>>;

const USHORT kTerminator = 0;
const LPCITEMIDLIST kEmpty = reinterpret_cast<LPCITEMIDLIST>(&kTerminator);

const BYTE* Raw(LPCITEMIDLIST list) { return reinterpret_cast<const BYTE*>(list); }

Ids IdsOf(CPidlMgr& m, LPCITEMIDLIST list) {
  Ids ids;
  for (UINT i = 0; i < m.GetCount(list); ++i) {
    List one(m.CopyFrom(list, i));
    ids.emplace_back(CPidlMgr::GetType(one.Get()), CPidlMgr::GetTextCopy(one.Get()));
  }
  return ids;
}

TEST(PathComponents, CutsAtBothDelimitersAndSkipsEmpties) {
  using V = std::vector<std::wstring>;
  EXPECT_EQ(PathComponents(nullptr), V{});
  EXPECT_EQ(PathComponents(L"\\/\\\\//"), V{});
  EXPECT_EQ(PathComponents(L"R//A\\\\B/"), (V{L"R", L"A", L"B"}));
  EXPECT_EQ(PathComponents(L"\\R\\A b\\B\\C"), (V{L"R", L"A b", L"B", L"C"}));
  EXPECT_EQ(PathComponent(L"/R/A/B", 1), L"A");
  EXPECT_EQ(PathComponent(L"/R/A/B", 3), L"");
}

TEST(PidlFormat, IdBytesAndListsFromPaths) {
  CPidlMgr m;
  List file(m.CreateItem(PIDL_FILE, L"file1.tkf", 20));
  ASSERT_TRUE(file);
  const BYTE* b = Raw(file.Get());
  EXPECT_EQ(b[0] | (b[1] << 8), 39);
  EXPECT_EQ(b[2] | (b[3] << 8) | (b[4] << 16) | (b[5] << 24), 3);
  EXPECT_EQ(std::memcmp(b + 14, L"file1.tkf", 20), 0);
  EXPECT_EQ(b[39] | b[40], 0);
  EXPECT_EQ(m.GetSize(file.Get()), 41u);
  List low(m.CreateItem(PIDL_LEVEL, L"ab", 0x10006));  // only the low 16 bits of the size count
  EXPECT_EQ(IdSize(low.Get()), 25);
  List root(m.CreateRoot());
  EXPECT_EQ(IdsOf(m, root.Get()), (Ids{{1, L"Marlix Digital Levels"}}));

  for (const wchar_t* path : {L"", L"\\//"}) {
    EXPECT_EQ(m.CreateItemFromPath(path), nullptr);
    EXPECT_EQ(m.CreateListFromPath(path), nullptr);
  }
  struct Case { const wchar_t* path; Ids item; Ids list; };
  const Case cases[] = {
      {L"R", {{1, L"R"}}, {{1, L"R"}}},
      {L"\\R\\A", {{2, L"A"}}, {{1, L"R"}, {2, L"A"}}},
      {L"R/A/B", {{2, L"A"}}, {{1, L"R"}, {2, L"A"}, {3, L"B"}}},
      {L"R\\A\\B\\C", {{2, L"A"}}, {{1, L"R"}, {2, L"A"}, {3, L"B"}}},
  };
  for (const auto& c : cases) {
    List item(m.CreateItemFromPath(c.path)), list(m.CreateListFromPath(c.path));
    EXPECT_EQ(IdsOf(m, item.Get()), c.item) << c.path;
    EXPECT_EQ(IdsOf(m, list.Get()), c.list) << c.path;
  }
}

TEST(PidlLists, RawOperationsOnNullEmptyAndFullLists) {
  CPidlMgr m;
  List full(m.CreateListFromPath(L"R\\Level\\file1.tkf"));
  EXPECT_EQ(m.GetSize(nullptr) + m.GetCount(nullptr) + m.GetCount(kEmpty), 0u);
  EXPECT_EQ(m.GetSize(kEmpty), 2u);
  EXPECT_EQ(m.GetCount(full.Get()), 3u);
  EXPECT_EQ(m.GetLast(kEmpty), nullptr);
  EXPECT_EQ(CPidlMgr::GetTextCopy(m.GetLast(full.Get())), L"file1.tkf");
  EXPECT_EQ(Raw(m.GetNext(full.Get())), Raw(full.Get()) + 19 + 4);
  EXPECT_EQ(m.Concatenate(nullptr, nullptr), nullptr);

  for (LPITEMIDLIST made : {m.Concatenate(nullptr, full.Get()), m.Concatenate(full.Get(), nullptr)}) {
    List copy(made);
    ASSERT_TRUE(copy);
    EXPECT_NE(copy.Get(), full.Get());
    EXPECT_EQ(std::memcmp(copy.Get(), full.Get(), m.GetSize(full.Get())), 0);
  }

  List tail(m.CopyFrom(full.Get(), 1)), parent(m.CopyParent(full.Get())), root(m.CreateRoot());
  EXPECT_EQ(IdsOf(m, tail.Get()), (Ids{{2, L"Level"}, {3, L"file1.tkf"}}));
  EXPECT_EQ(IdsOf(m, parent.Get()), (Ids{{1, L"R"}, {2, L"Level"}}));
  EXPECT_EQ(m.CopyFrom(full.Get(), 3), nullptr);
  EXPECT_EQ(m.CopyFrom(kEmpty, 0), nullptr);
  EXPECT_EQ(m.CopyParent(root.Get()), nullptr);
  List joined(m.Concatenate(parent.Get(), tail.Get()));
  EXPECT_EQ(m.GetSize(joined.Get()), m.GetSize(parent.Get()) + m.GetSize(tail.Get()) - 2);
  EXPECT_EQ(m.GetCount(joined.Get()), 4u);

  // The kind of a list is that of its last id; an empty or null list is none.
  List level(m.CreateListFromPath(L"R\\L"));
  struct Case { LPCITEMIDLIST list; bool root, folder, file; };
  for (const Case& c : {Case{root.Get(), true, true, false}, Case{level.Get(), false, true, false},
                        Case{full.Get(), false, false, true}, Case{kEmpty, false, false, false},
                        Case{nullptr, false, false, false}}) {
    EXPECT_EQ(m.IsRoot(c.list), c.root);
    EXPECT_EQ(m.IsTopLevel(c.list), c.root);
    EXPECT_EQ(m.IsFolder(c.list), c.folder);
    EXPECT_EQ(m.IsFile(c.list), c.file);
  }
}

TEST(PidlLists, PathsAndTheParsingName) {
  CPidlMgr m;
  List one(m.CreateItem(PIDL_LEVEL, L"abc", 8));
  wchar_t buffer[MAX_PATH];
  EXPECT_EQ(m.GetPath(one.Get(), buffer, MAX_PATH), 3u);
  EXPECT_STREQ(buffer, L"abc");
  EXPECT_EQ(m.GetPath(one.Get(), nullptr, 0), 5u);

  List full(m.CreateListFromPath(L"/Marlix Digital Levels/L1/file1.tkf"));
  UINT needed = m.GetPath(full.Get(), nullptr, 0);
  EXPECT_EQ(needed, 21u + 1 + 2 + 1 + 9 + 1 + 1);
  std::vector<wchar_t> exact(needed);
  EXPECT_EQ(m.GetPath(full.Get(), exact.data(), needed), needed - 2);
  EXPECT_STREQ(exact.data(), L"Marlix Digital Levels\\L1\\file1.tkf");

  // A destination too small gets a cut, terminated text, and nothing past its length.
  wchar_t small[8];
  std::memset(small, 0x55, sizeof(small));
  EXPECT_EQ(m.GetPath(full.Get(), small, 6), 5u);
  EXPECT_STREQ(small, L"Marli");
  EXPECT_EQ(small[6], wchar_t(0x5555));
  List longPath(m.CreateListFromPath((L"R\\" + std::wstring(259, L'n') + L"\\file1.tkf").c_str()));
  EXPECT_EQ(m.GetPath(longPath.Get(), buffer, MAX_PATH), UINT(MAX_PATH - 1));

  wchar_t name[64];
  EXPECT_EQ(m.GetRootParsingName(nullptr, 0), 41u);
  EXPECT_EQ(m.GetRootParsingName(name, 64), 41u);
  EXPECT_STREQ(name, L"::{D8B818CA-E47C-49a1-96A5-C2AA5FB57F15}");
  EXPECT_EQ(m.GetRootParsingName(name, 3), 3u);
}

TEST(PidlLists, CompareIgnoresCaseAndNeverOrdersTypes) {
  CPidlMgr m;
  List a(m.CreateItemFromPath(L"R\\alpha")), upper(m.CreateItemFromPath(L"R\\ALPHA")),
      b(m.CreateItemFromPath(L"R\\beta")), file(m.CreateItem(PIDL_FILE, L"aaa", 8));
  EXPECT_EQ(m.Compare(0, a.Get(), upper.Get()), 0);
  EXPECT_EQ(m.Compare(0, a.Get(), file.Get()), 0);
  EXPECT_EQ(m.Compare(0, nullptr, a.Get()), 0);
  int raw = m.Compare(0, a.Get(), b.Get());
  EXPECT_LT(raw, 0);
  EXPECT_EQ(m.Compare(-1, a.Get(), b.Get()), -raw);
  EXPECT_EQ(m.Compare(3, a.Get(), b.Get()), 3 * raw);
}

TEST(PidlLists, ValidityAsksTheStore) {
  RegistrySandbox sandbox;
  CPidlMgr m;
  List level(m.CreateItemFromPath(L"R\\Mine")), other(m.CreateItemFromPath(L"R\\mine")), root(m.CreateRoot());
  EXPECT_FALSE(m.IsValid(level.Get()));
  EXPECT_TRUE(m.IsValid(root.Get()));
  EXPECT_TRUE(m.IsValid(nullptr));
  CStationRecord record;
  record.Name = L"Mine";
  ASSERT_EQ(AddStation(record), S_OK);
  EXPECT_TRUE(m.IsValid(level.Get()));
  EXPECT_FALSE(m.IsValid(other.Get()));
}

}  // namespace
