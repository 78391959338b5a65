#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "helpers/win_handles.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {

const std::wstring kBase = L"Software\\Gravon\\Shell Extensions\\Marlix DL View";
const std::wstring kLevels = kBase + L"\\Levels";

std::wstring LevelPath(int n) { return kLevels + L"\\Station " + std::to_wstring(n); }

CStationRecord Named(const std::wstring& name) {
  CStationRecord r;
  r.Name = name;
  return r;
}

CStationRecord Full(const std::wstring& name, int seed) {
  CStationRecord r;
  r.Name = name;
  r.Port = seed + 1;
  r.BaudRate = seed + 2;
  r.StopBits = seed + 3;
  r.Parity = seed + 4;
  r.DataBits = seed + 5;
  r.Flow = seed + 6;
  r.CheckSum = seed + 7;
  r.Manufacturer = L"note " + name;
  r.Model = L"HRB1X";
  return r;
}

void ExpectSame(const CStationRecord& a, const CStationRecord& b) {
  EXPECT_EQ(a.Name, b.Name);
  EXPECT_EQ(a.Port, b.Port);
  EXPECT_EQ(a.BaudRate, b.BaudRate);
  EXPECT_EQ(a.StopBits, b.StopBits);
  EXPECT_EQ(a.Parity, b.Parity);
  EXPECT_EQ(a.DataBits, b.DataBits);
  EXPECT_EQ(a.Flow, b.Flow);
  EXPECT_EQ(a.CheckSum, b.CheckSum);
  EXPECT_EQ(a.Manufacturer, b.Manufacturer);
  EXPECT_EQ(a.Model, b.Model);
}

void WriteRaw(const std::wstring& path, const wchar_t* value, DWORD type, const void* data, DWORD size) {
  ASSERT_EQ(RegSetKeyValueW(HKEY_CURRENT_USER, path.c_str(), value, type, data, size), ERROR_SUCCESS);
}

DWORD ValueSize(const std::wstring& path, const wchar_t* value, DWORD* type = nullptr) {
  DWORD size = 0;
  if (RegGetValueW(HKEY_CURRENT_USER, path.c_str(), value, RRF_RT_ANY | RRF_NOEXPAND, type, nullptr, &size) !=
      ERROR_SUCCESS)
    return 0;
  return size;
}

TEST(StationRecord, DefaultsAndKeyNames) {
  CStationRecord r;
  EXPECT_EQ(r.Name, L"");
  EXPECT_EQ(r.Port, 1);
  EXPECT_EQ(r.BaudRate, 9600);
  EXPECT_EQ(r.StopBits, 1);
  EXPECT_EQ(r.Parity, 0);
  EXPECT_EQ(r.DataBits, 8);
  EXPECT_EQ(r.Flow, 0);
  EXPECT_EQ(r.CheckSum, 1);
  EXPECT_EQ(r.Manufacturer, L"");
  EXPECT_EQ(r.Model, L"HRA20");
  EXPECT_EQ(GetBaseKeyName(), kBase);
  EXPECT_EQ(GetLevelsKeyName(), kLevels);
}

TEST(StationStore, FindOnEmptyRegistryMakesTheKeysAndFails) {
  RegistrySandbox sandbox;
  CStationRecord r = Named(L"A");
  EXPECT_EQ(FindStation(r), E_FAIL);
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, kLevels));
  EXPECT_EQ(UpdateStation(L"A", r), E_INVALIDARG);
  EXPECT_EQ(DeleteStation(r), E_INVALIDARG);
}

TEST(StationStore, AddWritesEveryValueAndFindReadsThemBack) {
  RegistrySandbox sandbox;
  CStationRecord added = Full(L"Level one", 10);
  ASSERT_EQ(AddStation(added), S_OK);
  const std::wstring key = LevelPath(0);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, key, L"Name"), L"Level one");
  EXPECT_EQ(RegReadDword(HKEY_CURRENT_USER, key, L"Port"), 11u);
  EXPECT_EQ(RegReadDword(HKEY_CURRENT_USER, key, L"CheckSum"), 17u);
  DWORD type = 0;
  EXPECT_EQ(ValueSize(key, L"Name", &type), (9u + 1) * 2);
  EXPECT_EQ(type, DWORD(REG_SZ));
  EXPECT_EQ(ValueSize(key, L"StopBits", &type), 4u);
  EXPECT_EQ(type, DWORD(REG_DWORD));

  CStationRecord found = Named(L"Level one");
  wchar_t keyName[260] = {};
  DWORD length = 260;
  ASSERT_EQ(FindStation(found, keyName, &length), S_OK);
  ExpectSame(found, added);
  EXPECT_STREQ(keyName, L"Station 0");
  EXPECT_EQ(length, 10u);

  // A short buffer gets a cut name, and a zero length leaves the buffer alone.
  wchar_t shortName[4] = {L'x', L'x', L'x', L'x'};
  length = 3;
  ASSERT_EQ(FindStation(found, shortName, &length), S_OK);
  EXPECT_EQ(std::wstring(shortName, 3), L"Sta");
  EXPECT_EQ(shortName[3], L'x');
  EXPECT_EQ(length, 4u);
  length = 0;
  ASSERT_EQ(FindStation(found, shortName, &length), S_OK);
  EXPECT_EQ(length, 0u);

  // Adding a taken name fails and hands back the stored level.
  CStationRecord again = Named(L"Level one");
  EXPECT_EQ(AddStation(again), E_INVALIDARG);
  ExpectSame(again, added);
  EXPECT_FALSE(RegKeyExists(HKEY_CURRENT_USER, LevelPath(1)));
}

TEST(StationStore, NumbersFillGapsAndNamesCountCase) {
  RegistrySandbox sandbox;
  RegWriteString(HKEY_CURRENT_USER, LevelPath(0), L"Name", L"zero");
  RegWriteString(HKEY_CURRENT_USER, LevelPath(2), L"Name", L"two");
  CStationRecord abc = Named(L"abc"), upper = Named(L"ABC");
  ASSERT_EQ(AddStation(abc), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, LevelPath(1), L"Name"), L"abc");
  ASSERT_EQ(AddStation(upper), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, LevelPath(3), L"Name"), L"ABC");

  EXPECT_EQ(MakeUniqueStationName(L"Abc"), L"Abc");
  EXPECT_EQ(MakeUniqueStationName(L"abc"), L"abc (2)");
  CStationRecord second = Named(L"abc (2)");
  ASSERT_EQ(AddStation(second), S_OK);
  EXPECT_EQ(MakeUniqueStationName(L"abc"), L"abc (3)");

  // Deleting frees the number for the next level.
  ASSERT_EQ(DeleteStation(Named(L"abc")), S_OK);
  EXPECT_FALSE(RegKeyExists(HKEY_CURRENT_USER, LevelPath(1)));
  CStationRecord next = Named(L"next");
  ASSERT_EQ(AddStation(next), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, LevelPath(1), L"Name"), L"next");
}

TEST(StationStore, UpdateRenamesInPlaceAndDoesNotGuardNames) {
  RegistrySandbox sandbox;
  CStationRecord a = Full(L"A", 0), b = Full(L"B", 20);
  ASSERT_EQ(AddStation(a), S_OK);
  ASSERT_EQ(AddStation(b), S_OK);

  CStationRecord renamed = Full(L"C", 40);
  EXPECT_EQ(UpdateStation(L"B", renamed), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, LevelPath(1), L"Name"), L"C");
  EXPECT_EQ(RegReadDword(HKEY_CURRENT_USER, LevelPath(1), L"Port"), 41u);
  EXPECT_EQ(UpdateStation(L"B", renamed), E_INVALIDARG);

  // Onto a held name: both keys now say "A", and the find yields the first.
  CStationRecord clash = Full(L"A", 60);
  EXPECT_EQ(UpdateStation(L"C", clash), S_OK);
  EXPECT_EQ(RegReadString(HKEY_CURRENT_USER, LevelPath(1), L"Name"), L"A");
  CStationRecord found = Named(L"A");
  ASSERT_EQ(FindStation(found), S_OK);
  ExpectSame(found, a);
}

TEST(StationStore, DeleteRemovesTheWholeTree) {
  RegistrySandbox sandbox;
  CStationRecord a = Named(L"A");
  ASSERT_EQ(AddStation(a), S_OK);
  RegWriteDword(HKEY_CURRENT_USER, LevelPath(0) + L"\\x\\y\\z", L"v", 1);
  RegWriteDword(HKEY_CURRENT_USER, LevelPath(0) + L"\\w", L"v", 1);
  EXPECT_EQ(DeleteStation(Named(L"a")), E_INVALIDARG);
  EXPECT_EQ(DeleteStation(Named(L"A")), S_OK);
  EXPECT_FALSE(RegKeyExists(HKEY_CURRENT_USER, LevelPath(0)));
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, kLevels));
  EXPECT_EQ(DeleteStation(Named(L"A")), E_INVALIDARG);

  win::UniqueHKey levels;
  ASSERT_EQ(RegOpenKeyExW(HKEY_CURRENT_USER, kLevels.c_str(), 0, KEY_ALL_ACCESS, levels.Put()), ERROR_SUCCESS);
  EXPECT_EQ(DeleteKeyTree(levels.Get(), L""), LONG(ERROR_BADKEY));
  EXPECT_EQ(DeleteKeyTree(levels.Get(), nullptr), LONG(ERROR_BADKEY));
  EXPECT_EQ(DeleteKeyTree(levels.Get(), L"absent"), LONG(ERROR_FILE_NOT_FOUND));
}

TEST(StationStore, ReadStopsAtTheFirstMissingValueInItsOrder) {
  RegistrySandbox sandbox;
  const std::wstring key = LevelPath(0);
  RegWriteString(HKEY_CURRENT_USER, key, L"Name", L"gap");
  RegWriteDword(HKEY_CURRENT_USER, key, L"Port", 5);
  RegWriteDword(HKEY_CURRENT_USER, key, L"StopBits", 2);
  RegWriteDword(HKEY_CURRENT_USER, key, L"Parity", 1);  // after the gap: not reached
  CStationRecord r = Full(L"gap", 100);
  ASSERT_EQ(FindStation(r), S_OK);
  EXPECT_EQ(r.Port, 5);
  EXPECT_EQ(r.StopBits, 2);
  EXPECT_EQ(r.BaudRate, 102);
  EXPECT_EQ(r.Parity, 104);
  EXPECT_EQ(r.Model, L"HRB1X");

  win::UniqueHKey level;
  ASSERT_EQ(RegOpenKeyExW(HKEY_CURRENT_USER, key.c_str(), 0, KEY_READ, level.Put()), ERROR_SUCCESS);
  EXPECT_EQ(ReadStation(r, level.Get()), LONG(ERROR_FILE_NOT_FOUND));

  // The type is not looked at: a short binary number reads, a long one stops the read.
  RegWriteDword(HKEY_CURRENT_USER, key, L"BaudRate", 1);
  const WORD small = 7;
  WriteRaw(key, L"DataBits", REG_BINARY, &small, sizeof(small));
  WriteRaw(key, L"Manufacturer", REG_DWORD, L"hi", 4);
  const BYTE wide[8] = {1, 2, 3, 4, 5, 6, 7, 8};
  WriteRaw(key, L"Model", REG_SZ, L"HRA40", 12);
  WriteRaw(key, L"Flow", REG_BINARY, wide, sizeof(wide));
  CStationRecord typed = Full(L"gap", 200);
  EXPECT_EQ(ReadStation(typed, level.Get()), LONG(ERROR_MORE_DATA));
  EXPECT_EQ(typed.DataBits, 7);
  EXPECT_EQ(typed.Manufacturer, L"hi");
  EXPECT_EQ(typed.Model, L"HRA40");
  EXPECT_EQ(typed.Flow, 206);
}

TEST(StationStore, NamesAtAndPastTheReadLimit) {
  RegistrySandbox sandbox;
  CStationRecord n259 = Named(std::wstring(259, L'a'));
  ASSERT_EQ(AddStation(n259), S_OK);
  CStationRecord probe = Named(std::wstring(259, L'a'));
  EXPECT_EQ(FindStation(probe), S_OK);

  // 260 characters need 522 bytes: never matched, so a second add makes a second key.
  CStationRecord n260 = Named(std::wstring(260, L'b'));
  ASSERT_EQ(AddStation(n260), S_OK);
  CStationRecord twice = Named(std::wstring(260, L'b'));
  EXPECT_EQ(FindStation(twice), E_FAIL);
  ASSERT_EQ(AddStation(twice), S_OK);
  EXPECT_TRUE(RegKeyExists(HKEY_CURRENT_USER, LevelPath(2)));
  CStationRecord longer = Named(std::wstring(300, L'c'));
  ASSERT_EQ(AddStation(longer), S_OK);
  EXPECT_EQ(FindStation(longer), E_FAIL);

  // Exactly 520 bytes with no terminator, and an odd size, still end inside the buffer.
  std::wstring full(260, L'd');
  WriteRaw(LevelPath(10), L"Name", REG_BINARY, full.data(), 520);
  CStationRecord unterminated = Named(full);
  EXPECT_EQ(FindStation(unterminated), S_OK);
  WriteRaw(LevelPath(11), L"Name", REG_BINARY, L"odd!", 5);
  CStationRecord odd = Named(L"od");
  EXPECT_EQ(FindStation(odd), E_FAIL);
  odd.Name = std::wstring(L"od") + wchar_t(L'd' & 0xFF);
  EXPECT_EQ(FindStation(odd), S_OK);
}

TEST(StationStore, DisplaySettings) {
  RegistrySandbox sandbox;
  ColumnWidths[0] = ColumnWidths[1] = 7;
  EXPECT_FALSE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[0], 100);
  EXPECT_EQ(ColumnWidths[1], 100);
  EXPECT_FALSE(RegKeyExists(HKEY_CURRENT_USER, kBase));

  ColumnWidths[0] = 150;
  ColumnWidths[1] = 60;
  ASSERT_TRUE(SaveDisplaySettings());
  DWORD type = 0;
  EXPECT_EQ(ValueSize(kBase, L"Display Settings", &type), 12u);
  EXPECT_EQ(type, DWORD(REG_BINARY));
  ColumnWidths[0] = ColumnWidths[1] = 0;
  EXPECT_TRUE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[0], 150);
  EXPECT_EQ(ColumnWidths[1], 60);

  const BYTE tooLong[17] = {1};
  WriteRaw(kBase, L"Display Settings", REG_BINARY, tooLong, sizeof(tooLong));
  EXPECT_FALSE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[0], 100);
  const int sixteen[4] = {33, 44, 55, 66};
  WriteRaw(kBase, L"Display Settings", REG_BINARY, sixteen, sizeof(sixteen));
  EXPECT_TRUE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[0], 33);
  EXPECT_EQ(ColumnWidths[1], 44);
  ColumnWidths[0] = ColumnWidths[1] = 100;
}

TEST(StationStore, UnreachableRootFailsWithoutChange) {
  RegistrySandbox sandbox;
  // Redirect the user's root onto a key that has been deleted: nothing below it can be made.
  HKEY gone = nullptr;
  ASSERT_EQ(RegCreateKeyExW(HKEY_CURRENT_USER, L"gone", 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &gone, nullptr),
            ERROR_SUCCESS);
  ASSERT_EQ(RegDeleteKeyW(HKEY_CURRENT_USER, L"gone"), ERROR_SUCCESS);
  ASSERT_EQ(RegOverridePredefKey(HKEY_CURRENT_USER, gone), ERROR_SUCCESS);
  CStationRecord r = Full(L"A", 0);
  HRESULT find = FindStation(r), add = AddStation(r), update = UpdateStation(L"A", r), del = DeleteStation(r);
  bool saved = SaveDisplaySettings();
  bool loaded = LoadDisplaySettings();
  RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
  RegCloseKey(gone);
  EXPECT_EQ(find, E_FAIL);
  EXPECT_EQ(add, E_FAIL);
  EXPECT_EQ(update, E_INVALIDARG);
  EXPECT_EQ(del, E_INVALIDARG);
  EXPECT_FALSE(saved);
  EXPECT_FALSE(loaded);
}

// --- packed records ---

std::vector<BYTE> Bytes(HGLOBAL h) {
  win::GlobalLockGuard<const BYTE> lock(h);
  return std::vector<BYTE>(lock.Get(), lock.Get() + lock.Size());
}

HGLOBAL Block(const std::vector<BYTE>& bytes) {
  HGLOBAL h = GlobalAlloc(GMEM_MOVEABLE, bytes.size());
  win::GlobalLockGuard<BYTE> lock(h);
  std::memcpy(lock.Get(), bytes.data(), bytes.size());
  return h;
}

std::vector<CStationRecord> Unpacked(const std::vector<BYTE>& bytes) {
  win::UniqueHGlobal h(Block(bytes));
  std::vector<CStationRecord> out;
  EXPECT_EQ(UnpackStations(h.Get(), out), S_OK);
  return out;
}

TEST(PackedStations, RoundTripKeepsEveryFieldAndTheLayout) {
  const std::vector<CStationRecord> records = {Full(L"first", 1), Full(L"", 50), Full(L"third level", -9)};
  win::UniqueHGlobal h(PackStations(records));
  ASSERT_TRUE(h);
  EXPECT_EQ(GlobalFlags(h.Get()) & GMEM_DDESHARE, UINT(GMEM_DDESHARE));
  std::vector<BYTE> bytes = Bytes(h.Get());
  size_t expected = 4;
  for (const auto& r : records) expected += 4 + (r.Name.size() + r.Manufacturer.size() + r.Model.size() + 3) * 2 + 28;
  ASSERT_GE(bytes.size(), expected);
  EXPECT_EQ(bytes[0], 3);
  EXPECT_EQ(bytes[4], (6 + 11 + 6) * 2 + 28);  // size of the first packed record
  EXPECT_EQ(bytes[8], L'f');
  EXPECT_EQ(bytes[8 + 12], 2);  // Port right behind the name's terminator

  std::vector<CStationRecord> out = {Named(L"kept")};
  ASSERT_EQ(UnpackStations(h.Get(), out), S_OK);
  ASSERT_EQ(out.size(), 4u);
  EXPECT_EQ(out[0].Name, L"kept");
  for (size_t i = 0; i < records.size(); ++i) ExpectSame(out[i + 1], records[i]);

  win::UniqueHGlobal empty(PackStations({}));
  EXPECT_EQ(Bytes(empty.Get()).size() >= 4, true);
  std::vector<CStationRecord> none;
  EXPECT_EQ(UnpackStations(empty.Get(), none), S_OK);
  EXPECT_TRUE(none.empty());
  EXPECT_EQ(UnpackStations(nullptr, none), S_OK);
  EXPECT_TRUE(none.empty());
}

TEST(PackedStations, DamagedBlocksYieldOnlyTheWholeRecordsBefore) {
  const std::vector<CStationRecord> records = {Full(L"one", 1), Full(L"two", 2)};
  win::UniqueHGlobal h(PackStations(records));
  std::vector<BYTE> bytes = Bytes(h.Get());
  const size_t firstEnd = 4 + 4 + bytes[4];
  bytes.resize(firstEnd + 4 + bytes[firstEnd]);

  // Cut anywhere inside the second record: only the first survives.
  for (size_t cut : {firstEnd, firstEnd + 2, firstEnd + 9, bytes.size() - 1}) {
    auto out = Unpacked(std::vector<BYTE>(bytes.begin(), bytes.begin() + cut));
    ASSERT_EQ(out.size(), 1u) << cut;
    ExpectSame(out[0], records[0]);
  }
  EXPECT_TRUE(Unpacked({1, 0}).empty());

  // A count larger than the records present.
  std::vector<BYTE> lying = bytes;
  lying[0] = 0xFF;
  lying[3] = 0x7F;
  EXPECT_EQ(Unpacked(lying).size(), 2u);

  // A size pointing past the end stops before that record.
  lying = bytes;
  lying[firstEnd + 1] = 0x40;
  EXPECT_EQ(Unpacked(lying).size(), 1u);
  lying = bytes;
  lying[7] = 0xFF;
  EXPECT_TRUE(Unpacked(lying).empty());

  // A size smaller than the record is trusted: the next record is looked for where it points.
  lying = bytes;
  lying[4] = 0;
  auto out = Unpacked(lying);
  ASSERT_GE(out.size(), 1u);
  EXPECT_EQ(out[0].Name, L"one");

  // A last string with no terminator inside the block.
  std::vector<BYTE> open = bytes;
  open.resize(open.size() - 8 - 2);
  open.push_back('x');
  open.push_back(0);
  open.resize(open.size() + 8, 1);
  EXPECT_EQ(Unpacked(open).size(), 1u);
}

}  // namespace
