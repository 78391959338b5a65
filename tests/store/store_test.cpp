// Levels a surveyor saves read back whole, and bad store contents or clipboard blocks are survived.
#include <gtest/gtest.h>
#include <cstring>
#include <string>
#include <tuple>
#include <vector>
#include "base/win_handles.h"
#include "store/pidl_manager.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"
#include <sddl.h>  // after <windows.h>
namespace {
using List = win::UniqueCoMem<ITEMIDLIST>;
const HKEY kUser = HKEY_CURRENT_USER;
const std::wstring kBase = L"Software\\Gravon\\Shell Extensions\\Marlix DL View", kLevels = kBase + L"\\Levels";
std::wstring LevelPath(int n) { return kLevels + L"\\Station " + std::to_wstring(n); }
std::wstring NameAt(int n) { return RegReadString(kUser, LevelPath(n), L"Name"); }
CStationRecord Named(const std::wstring& name) { CStationRecord r; r.Name = name; return r; }
HRESULT Add(const std::wstring& name) { CStationRecord r = Named(name); return AddStation(r); }
HRESULT Find(const std::wstring& name) { CStationRecord r = Named(name); return FindStation(r); }
CStationRecord Full(const std::wstring& name, int seed) {
  CStationRecord r = Named(name);
  for (int* n : {&r.Port, &r.BaudRate, &r.StopBits, &r.Parity, &r.DataBits, &r.Flow, &r.CheckSum}) *n = ++seed;
  r.Manufacturer = L"note " + name;
  r.Model = L"HRB1X";
  return r;
}
auto Fields(const CStationRecord& r) {
  return std::tie(r.Name, r.Port, r.BaudRate, r.StopBits, r.Parity, r.DataBits, r.Flow, r.CheckSum, r.Manufacturer,
                  r.Model);
}
void WriteRaw(const std::wstring& path, const wchar_t* value, DWORD type, const void* data, DWORD size) {
  ASSERT_EQ(RegSetKeyValueW(kUser, path.c_str(), value, type, data, size), ERROR_SUCCESS);
}
struct Store : ::testing::Test {
  RegistrySandbox sandbox;
  CPidlMgr m;
};
TEST_F(Store, PathsParsingNameAndValidity) {
  List one(m.CreateItem(PIDL_LEVEL, L"abc", 8));
  wchar_t buffer[MAX_PATH];
  EXPECT_EQ(m.GetPath(one.Get(), buffer, MAX_PATH), 3u);
  EXPECT_STREQ(buffer, L"abc");
  List full(m.CreateListFromPath(L"/Marlix Digital Levels/L1/file1.tkf"));
  UINT needed = m.GetPath(full.Get(), nullptr, 0);
  EXPECT_EQ(needed, 21u + 1 + 2 + 1 + 9 + 1 + 1);
  std::vector<wchar_t> small(8, 0x5555);
  EXPECT_EQ(m.GetPath(full.Get(), small.data(), 6), 5u);
  EXPECT_STREQ(small.data(), L"Marli") << "a destination too small gets a cut, terminated text";
  EXPECT_EQ(small[6], wchar_t(0x5555)) << "and nothing past its length";
  List longPath(m.CreateListFromPath((L"R\\" + std::wstring(259, L'n') + L"\\file1.tkf").c_str()));
  EXPECT_EQ(m.GetPath(longPath.Get(), buffer, MAX_PATH), UINT(MAX_PATH - 1));
  List level(m.CreateItemFromPath(L"R\\Mine")), other(m.CreateItemFromPath(L"R\\mine")), root(m.CreateRoot());
  EXPECT_FALSE(m.IsValid(level.Get())) << "validity asks the store";
  EXPECT_TRUE(m.IsValid(root.Get()) && m.IsValid(nullptr)) << "the root and no list are always valid";
  ASSERT_EQ(Add(L"Mine"), S_OK);
  EXPECT_TRUE(m.IsValid(level.Get()));
  EXPECT_FALSE(m.IsValid(other.Get()));
}
TEST_F(Store, AFindOnNoStoreMakesTheKeys) {
  CStationRecord r = Full(L"A", 0);
  EXPECT_EQ(FindStation(r), E_FAIL);
  EXPECT_TRUE(RegKeyExists(kUser, kLevels)) << "even a find makes the keys";
  EXPECT_EQ(UpdateStation(L"A", r), E_INVALIDARG);
  EXPECT_EQ(DeleteStation(r), E_INVALIDARG);
}
// A Levels key that takes no lasting child: every creation fails, and Add must give up.
TEST_F(Store, AddGivesUpOnAFailureOtherThanAnExistingKey) {
  HKEY levels = nullptr;
  ASSERT_EQ(RegCreateKeyExW(kUser, kLevels.c_str(), 0, nullptr, REG_OPTION_VOLATILE, KEY_ALL_ACCESS, nullptr, &levels,
                            nullptr), ERROR_SUCCESS);
  RegCloseKey(levels);
  static HRESULT added = E_PENDING;
  HANDLE adding = CreateThread(nullptr, 0, [](void*) -> DWORD { return added = Add(L"new"), 0; }, nullptr, 0, nullptr);
  const bool ended = WaitForSingleObject(adding, 10000) == WAIT_OBJECT_0;
  if (!ended) TerminateThread(adding, 0);
  CloseHandle(adding);
  EXPECT_TRUE(ended) << "AddStation went on trying";
  EXPECT_EQ(added, E_FAIL);
}
TEST_F(Store, NumbersFillGapsNamesCountCaseAndDeleteTakesTheTree) {
  for (int n : {0, 2}) RegWriteString(kUser, LevelPath(n), L"Name", L"taken");
  for (const wchar_t* name : {L"abc", L"ABC"}) ASSERT_EQ(Add(name), S_OK) << name;
  EXPECT_EQ(NameAt(1) + L"|" + NameAt(3), L"abc|ABC") << "numbers fill gaps";
  EXPECT_EQ(MakeUniqueStationName(L"Abc"), L"Abc");
  EXPECT_EQ(MakeUniqueStationName(L"abc"), L"abc (2)");
  ASSERT_EQ(Add(L"abc (2)"), S_OK);
  EXPECT_EQ(MakeUniqueStationName(L"abc"), L"abc (3)");
  for (const wchar_t* sub : {L"\\x\\y\\z", L"\\w"}) RegWriteDword(kUser, LevelPath(1) + sub, L"v", 1);
  EXPECT_EQ(DeleteStation(Named(L"Abc")), E_INVALIDARG);
  ASSERT_EQ(DeleteStation(Named(L"abc")), S_OK);
  EXPECT_FALSE(RegKeyExists(kUser, LevelPath(1)));
  EXPECT_EQ(DeleteStation(Named(L"abc")), E_INVALIDARG);
  ASSERT_EQ(Add(L"next"), S_OK);
  EXPECT_EQ(NameAt(1), L"next") << "a freed number comes back";
  CStationRecord a = Full(L"A", 0), b = Full(L"B", 20), renamed = Full(L"C", 40), clash = Full(L"A", 60);
  for (CStationRecord* r : {&a, &b}) ASSERT_EQ(AddStation(*r), S_OK);
  EXPECT_EQ(UpdateStation(L"B", renamed), S_OK) << "renames in place";
  EXPECT_EQ(NameAt(6), L"C");
  EXPECT_EQ(RegReadDword(kUser, LevelPath(6), L"Port"), 41u);
  EXPECT_EQ(UpdateStation(L"B", renamed), E_INVALIDARG);
  EXPECT_EQ(UpdateStation(L"C", clash), S_OK) << "onto a held name: both keys now say A, a find yields the first";
  EXPECT_EQ(NameAt(6), L"A");
  CStationRecord found = Named(L"A");
  ASSERT_EQ(FindStation(found), S_OK);
  EXPECT_TRUE(Fields(found) == Fields(a));
}
TEST_F(Store, OnlyWhatReadsBackWholeIsWrittenAndLockedLevels) {
  const std::wstring longest(kMaxStationNameLength, L'a'), note(kMaxStationTextLength, L'n');
  CStationRecord full = Full(longest, 3);
  full.Manufacturer = note;
  ASSERT_EQ(AddStation(full), S_OK);
  CStationRecord found = Named(longest);
  ASSERT_EQ(FindStation(found), S_OK);
  EXPECT_TRUE(Fields(found) == Fields(full)) << "the longest name and note read back, and the fields after them";
  CStationRecord again = Named(longest);
  EXPECT_EQ(AddStation(again), E_INVALIDARG);
  EXPECT_TRUE(Fields(again) == Fields(full)) << "adding a taken name fails and hands back the stored level";
  const std::tuple<std::wstring, std::wstring, std::wstring> unstorable[] = {  // name, note, model
      {longest + L"a", L"", L""},
      {L"", L"", L""},
      {L"a\\b", L"", L""},
      {L"a/b", L"", L""},
      {L"n", note + L"n", L""},
      {L"m", L"", note + L"m"},
  };
  for (const auto& [name, text, model] : unstorable) {
    CStationRecord bad = Named(name);
    bad.Manufacturer = text, bad.Model = model;
    EXPECT_EQ(AddStation(bad), kUnstorableStation) << testing::PrintToString(name);
    EXPECT_EQ(UpdateStation(longest, bad), kUnstorableStation) << testing::PrintToString(name);
  }
  EXPECT_FALSE(RegKeyExists(kUser, LevelPath(1))) << "no key is left behind";
  EXPECT_EQ(NameAt(0), longest) << "and no rename happened";
  const std::wstring copy = L"Copy of " + longest.substr(0, kMaxStationNameLength - 8);
  EXPECT_EQ(FreeCopyName(longest, L"Copy of "), copy) << "cut to the longest name";
  ASSERT_EQ(Add(copy), S_OK);
  EXPECT_EQ(FreeCopyName(longest, L"Copy of ").substr(0, 16), L"Copy of Copy of ");
  ASSERT_EQ(Add(L"x"), S_OK);
  EXPECT_EQ(FreeCopyName(L"x", L""), L"") << "a name the prefix can't change: none";
  RegWriteString(kUser, LevelPath(5), L"Name", L"locked");
  win::UniqueHKey locked;
  ASSERT_EQ(RegOpenKeyExW(kUser, LevelPath(5).c_str(), 0, KEY_ALL_ACCESS, locked.Put()), ERROR_SUCCESS);
  PSECURITY_DESCRIPTOR sd = nullptr;  // everyone: no setting of values, all else allowed
  ASSERT_TRUE(ConvertStringSecurityDescriptorToSecurityDescriptorW(L"D:(D;;0x2;;;WD)(A;;0xF003D;;;WD)",
                                                                   SDDL_REVISION_1, &sd, nullptr));
  EXPECT_EQ(RegSetKeySecurity(locked.Get(), DACL_SECURITY_INFORMATION, sd), ERROR_SUCCESS);
  LocalFree(sd);
  EXPECT_EQ(Find(L"locked"), E_FAIL) << "a level key that refuses full access is passed over";
  std::wstring unterminated(260, L'd');
  WriteRaw(LevelPath(10), L"Name", REG_BINARY, unterminated.data(), 520);
  EXPECT_EQ(Find(unterminated), S_OK) << "520 bytes with no terminator, and an odd size, still end inside the buffer";
  WriteRaw(LevelPath(11), L"Name", REG_BINARY, L"odd!", 5);
  EXPECT_EQ(Find(L"od"), E_FAIL);
  EXPECT_EQ(Find(L"odd"), S_OK);
}
// Column widths from a value of the wrong size are not taken.
TEST_F(Store, DisplaySettingsOfAnotherSizeAreRefused) {
  const int numbers[5] = {33, 44, 55, 66, 77};
  WriteRaw(kBase, L"Display Settings", REG_BINARY, numbers, 17);
  EXPECT_FALSE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[0], 100);
  WriteRaw(kBase, L"Display Settings", REG_BINARY, numbers, 16);
  EXPECT_TRUE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[1], 44) << "16 bytes: the first two count";
  ColumnWidths[0] = ColumnWidths[1] = 100;
}
std::vector<BYTE> Bytes(HGLOBAL h) {
  win::GlobalLockGuard<const BYTE> lock(h);
  return {lock.Get(), lock.Get() + lock.Size()};
}
std::vector<CStationRecord> Unpacked(const std::vector<BYTE>& bytes) {
  win::UniqueHGlobal h(GlobalAlloc(GMEM_MOVEABLE, bytes.size()));
  std::memcpy(win::GlobalLockGuard<BYTE>(h.Get()).Get(), bytes.data(), bytes.size());
  std::vector<CStationRecord> out;
  EXPECT_EQ(UnpackStations(h.Get(), out), S_OK);
  return out;
}
TEST(PackedStations, DamagedBlocksYieldOnlyTheWholeRecordsBefore) {
  const std::vector<CStationRecord> records = {Full(L"one", 1), Full(L"two", 2)};
  win::UniqueHGlobal h(PackStations(records));
  std::vector<BYTE> bytes = Bytes(h.Get());
  const size_t firstEnd = 4 + 4 + bytes[4];
  bytes.resize(firstEnd + 4 + bytes[firstEnd]);
  for (size_t cut : {firstEnd, firstEnd + 2, firstEnd + 9, bytes.size() - 1}) {
    auto out = Unpacked(std::vector<BYTE>(bytes.begin(), bytes.begin() + cut));
    ASSERT_EQ(out.size(), 1u) << cut;
    EXPECT_TRUE(Fields(out[0]) == Fields(records[0]));
  }
  EXPECT_TRUE(Unpacked({1, 0}).empty());
  auto patched = [&](size_t at, BYTE value) { auto copy = bytes; copy[at] = value; return Unpacked(copy).size(); };
  EXPECT_EQ(patched(3, 0x7F), 2u) << "a count beyond the records";
  EXPECT_EQ(patched(firstEnd + 1, 0x40), 1u) << "a size past the end";
  EXPECT_EQ(patched(7, 0xFF), 0u);
  EXPECT_GE(patched(4, 0), 1u) << "a short size is trusted";
  std::vector<BYTE> open(bytes.begin(), bytes.end() - 10);  // a last string without its terminator
  open.insert(open.end(), {'x', 0, 1, 1, 1, 1, 1, 1, 1, 1});
  EXPECT_EQ(Unpacked(open).size(), 1u);
}
}  // namespace
