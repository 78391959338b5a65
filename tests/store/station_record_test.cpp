#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <tuple>
#include <vector>

#include "helpers/win_handles.h"
#include "store/station_record.h"
#include "support/registry_sandbox.h"

namespace {

const HKEY kUser = HKEY_CURRENT_USER;
const std::wstring kBase = L"Software\\Gravon\\Shell Extensions\\Marlix DL View";
const std::wstring kLevels = kBase + L"\\Levels";

std::wstring LevelPath(int n) { return kLevels + L"\\Station " + std::to_wstring(n); }
std::wstring NameAt(int n) { return RegReadString(kUser, LevelPath(n), L"Name"); }

CStationRecord Named(const std::wstring& name) {
  CStationRecord r;
  r.Name = name;
  return r;
}

CStationRecord Full(const std::wstring& name, int seed) {
  CStationRecord r = Named(name);
  int* numbers[] = {&r.Port, &r.BaudRate, &r.StopBits, &r.Parity, &r.DataBits, &r.Flow, &r.CheckSum};
  for (int i = 0; i < 7; ++i) *numbers[i] = seed + i + 1;
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

TEST(StationStore, DefaultsAndAStoreThatCannotBeReached) {
  CStationRecord fresh;
  EXPECT_TRUE(Fields(fresh) ==
              std::make_tuple(std::wstring(), 1, 9600, 1, 0, 8, 0, 1, std::wstring(), std::wstring(L"HRA20")));
  RegistrySandbox sandbox;
  CStationRecord r = Full(L"A", 0);
  EXPECT_EQ(FindStation(r), E_FAIL);
  EXPECT_TRUE(RegKeyExists(kUser, kLevels)) << "even a find makes the keys";
  EXPECT_EQ(UpdateStation(L"A", r), E_INVALIDARG);
  EXPECT_EQ(DeleteStation(r), E_INVALIDARG);

  // With the user's root on a deleted key nothing below it can be made.
  HKEY gone = nullptr;
  ASSERT_EQ(RegCreateKeyExW(kUser, L"gone", 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &gone, nullptr), ERROR_SUCCESS);
  ASSERT_EQ(RegDeleteKeyW(kUser, L"gone"), ERROR_SUCCESS);
  ASSERT_EQ(RegOverridePredefKey(kUser, gone), ERROR_SUCCESS);
  HRESULT find = FindStation(r), add = AddStation(r);
  bool saved = SaveDisplaySettings(), loaded = LoadDisplaySettings();
  RegOverridePredefKey(kUser, nullptr);
  RegCloseKey(gone);
  EXPECT_EQ(find, E_FAIL);
  EXPECT_EQ(add, E_FAIL);
  EXPECT_FALSE(saved);
  EXPECT_FALSE(loaded);
}

TEST(StationStore, AddWritesEveryValueAndFindReadsThemBack) {
  RegistrySandbox sandbox;
  CStationRecord added = Full(L"Level one", 10);
  ASSERT_EQ(AddStation(added), S_OK);
  DWORD type = 0, size = 0;
  RegGetValueW(kUser, LevelPath(0).c_str(), L"Name", RRF_RT_ANY, &type, nullptr, &size);
  EXPECT_EQ(std::make_pair(type, size), std::make_pair(DWORD(REG_SZ), DWORD(20)));
  EXPECT_EQ(RegReadDword(kUser, LevelPath(0), L"StopBits"), 13u);

  CStationRecord found = Named(L"Level one");
  wchar_t keyName[260] = {};
  DWORD length = 260;
  ASSERT_EQ(FindStation(found, keyName, &length), S_OK);
  EXPECT_TRUE(Fields(found) == Fields(added));
  EXPECT_STREQ(keyName, L"Station 0");
  EXPECT_EQ(length, 10u);

  // A short buffer gets the name cut as wcsncpy does; a zero length leaves it alone.
  wchar_t shortName[4] = {L'x', L'x', L'x', L'x'};
  length = 3;
  ASSERT_EQ(FindStation(found, shortName, &length), S_OK);
  EXPECT_EQ(std::wstring(shortName, 4), L"Stax");
  EXPECT_EQ(length, 4u);
  length = 0;
  ASSERT_EQ(FindStation(found, shortName, &length), S_OK);
  EXPECT_EQ(length, 0u);

  // Adding a taken name fails and hands back the stored level.
  CStationRecord again = Named(L"Level one");
  EXPECT_EQ(AddStation(again), E_INVALIDARG);
  EXPECT_TRUE(Fields(again) == Fields(added));
  EXPECT_FALSE(RegKeyExists(kUser, LevelPath(1)));
}

TEST(StationStore, NumbersFillGapsNamesCountCaseAndDeleteTakesTheTree) {
  RegistrySandbox sandbox;
  RegWriteString(kUser, LevelPath(0), L"Name", L"zero");
  RegWriteString(kUser, LevelPath(2), L"Name", L"two");
  CStationRecord abc = Named(L"abc"), upper = Named(L"ABC"), second = Named(L"abc (2)"), next = Named(L"next");
  ASSERT_EQ(AddStation(abc), S_OK);
  ASSERT_EQ(AddStation(upper), S_OK);
  EXPECT_EQ(NameAt(1), L"abc");
  EXPECT_EQ(NameAt(3), L"ABC");

  EXPECT_EQ(MakeUniqueStationName(L"Abc"), L"Abc");
  EXPECT_EQ(MakeUniqueStationName(L"abc"), L"abc (2)");
  ASSERT_EQ(AddStation(second), S_OK);
  EXPECT_EQ(MakeUniqueStationName(L"abc"), L"abc (3)");

  RegWriteDword(kUser, LevelPath(1) + L"\\x\\y\\z", L"v", 1);
  RegWriteDword(kUser, LevelPath(1) + L"\\w", L"v", 1);
  EXPECT_EQ(DeleteStation(Named(L"Abc")), E_INVALIDARG);
  ASSERT_EQ(DeleteStation(Named(L"abc")), S_OK);
  EXPECT_FALSE(RegKeyExists(kUser, LevelPath(1)));
  EXPECT_EQ(DeleteStation(Named(L"abc")), E_INVALIDARG);
  ASSERT_EQ(AddStation(next), S_OK);
  EXPECT_EQ(NameAt(1), L"next") << "a freed number comes back";

  win::UniqueHKey levels;
  ASSERT_EQ(RegOpenKeyExW(kUser, kLevels.c_str(), 0, KEY_ALL_ACCESS, levels.Put()), ERROR_SUCCESS);
  EXPECT_EQ(DeleteKeyTree(levels.Get(), L""), LONG(ERROR_BADKEY));
  EXPECT_EQ(DeleteKeyTree(levels.Get(), L"absent"), LONG(ERROR_FILE_NOT_FOUND));
}

TEST(StationStore, UpdateRenamesInPlaceAndDoesNotGuardNames) {
  RegistrySandbox sandbox;
  CStationRecord a = Full(L"A", 0), b = Full(L"B", 20), renamed = Full(L"C", 40), clash = Full(L"A", 60);
  ASSERT_EQ(AddStation(a), S_OK);
  ASSERT_EQ(AddStation(b), S_OK);
  EXPECT_EQ(UpdateStation(L"B", renamed), S_OK);
  EXPECT_EQ(NameAt(1), L"C");
  EXPECT_EQ(RegReadDword(kUser, LevelPath(1), L"Port"), 41u);
  EXPECT_EQ(UpdateStation(L"B", renamed), E_INVALIDARG);

  // Onto a held name: both keys now say "A", and a find yields the first.
  EXPECT_EQ(UpdateStation(L"C", clash), S_OK);
  EXPECT_EQ(NameAt(1), L"A");
  CStationRecord found = Named(L"A");
  ASSERT_EQ(FindStation(found), S_OK);
  EXPECT_TRUE(Fields(found) == Fields(a));
}

TEST(StationStore, ReadKeepsItsOrderAndIgnoresTypes) {
  RegistrySandbox sandbox;
  const std::wstring key = LevelPath(0);
  RegWriteString(kUser, key, L"Name", L"gap");
  RegWriteDword(kUser, key, L"Port", 5);
  RegWriteDword(kUser, key, L"StopBits", 2);
  RegWriteDword(kUser, key, L"Parity", 1);  // behind the missing "BaudRate": not reached
  CStationRecord r = Full(L"gap", 100);
  ASSERT_EQ(FindStation(r), S_OK) << "a gap still counts as found";
  EXPECT_EQ(std::tie(r.Port, r.StopBits, r.BaudRate, r.Parity), std::make_tuple(5, 2, 102, 104));

  win::UniqueHKey level;
  ASSERT_EQ(RegOpenKeyExW(kUser, key.c_str(), 0, KEY_READ, level.Put()), ERROR_SUCCESS);
  EXPECT_EQ(ReadStation(r, level.Get()), LONG(ERROR_FILE_NOT_FOUND));

  // A short binary number reads; a number wider than 4 bytes stops the read.
  const WORD small = 7;
  const BYTE wide[8] = {1, 2, 3, 4, 5, 6, 7, 8};
  RegWriteDword(kUser, key, L"BaudRate", 1);
  WriteRaw(key, L"DataBits", REG_BINARY, &small, sizeof(small));
  WriteRaw(key, L"Manufacturer", REG_DWORD, L"hi", 4);
  WriteRaw(key, L"Model", REG_SZ, L"HRA40", 12);
  WriteRaw(key, L"Flow", REG_BINARY, wide, sizeof(wide));
  CStationRecord typed = Full(L"gap", 200);
  EXPECT_EQ(ReadStation(typed, level.Get()), LONG(ERROR_MORE_DATA));
  EXPECT_EQ(std::tie(typed.DataBits, typed.Manufacturer, typed.Model, typed.Flow),
            std::make_tuple(7, std::wstring(L"hi"), std::wstring(L"HRA40"), 206));
}

TEST(StationStore, NamesAtAndPastTheReadLimit) {
  RegistrySandbox sandbox;
  CStationRecord n259 = Named(std::wstring(259, L'a')), probe = n259;
  ASSERT_EQ(AddStation(n259), S_OK);
  EXPECT_EQ(FindStation(probe), S_OK);

  // 260 characters need 522 bytes: never matched, so a second add makes a second key.
  CStationRecord n260 = Named(std::wstring(260, L'b')), twice = n260;
  ASSERT_EQ(AddStation(n260), S_OK);
  EXPECT_EQ(FindStation(twice), E_FAIL);
  ASSERT_EQ(AddStation(twice), S_OK);
  EXPECT_TRUE(RegKeyExists(kUser, LevelPath(2)));

  // A level key that refuses full access is passed over like a foreign one.
  RegWriteString(kUser, LevelPath(5), L"Name", L"locked");
  win::UniqueHKey locked;
  ASSERT_EQ(RegOpenKeyExW(kUser, LevelPath(5).c_str(), 0, KEY_ALL_ACCESS, locked.Put()), ERROR_SUCCESS);
  SECURITY_DESCRIPTOR sd;
  InitializeSecurityDescriptor(&sd, SECURITY_DESCRIPTOR_REVISION);
  BYTE aclBytes[128];
  auto* acl = reinterpret_cast<ACL*>(aclBytes);
  InitializeAcl(acl, sizeof(aclBytes), ACL_REVISION);
  BYTE everyone[SECURITY_MAX_SID_SIZE];
  DWORD sidSize = sizeof(everyone);
  CreateWellKnownSid(WinWorldSid, nullptr, everyone, &sidSize);
  AddAccessDeniedAce(acl, ACL_REVISION, KEY_SET_VALUE, everyone);
  AddAccessAllowedAce(acl, ACL_REVISION, KEY_ALL_ACCESS & ~KEY_SET_VALUE, everyone);
  SetSecurityDescriptorDacl(&sd, TRUE, acl, FALSE);
  ASSERT_EQ(RegSetKeySecurity(locked.Get(), DACL_SECURITY_INFORMATION, &sd), ERROR_SUCCESS);
  CStationRecord lockedLevel = Named(L"locked");
  EXPECT_EQ(FindStation(lockedLevel), E_FAIL);

  // Exactly 520 bytes with no terminator, and an odd size, still end inside the buffer.
  std::wstring full(260, L'd');
  WriteRaw(LevelPath(10), L"Name", REG_BINARY, full.data(), 520);
  CStationRecord unterminated = Named(full);
  EXPECT_EQ(FindStation(unterminated), S_OK);
  WriteRaw(LevelPath(11), L"Name", REG_BINARY, L"odd!", 5);
  CStationRecord cut = Named(L"od"), odd = Named(L"odd");
  EXPECT_EQ(FindStation(cut), E_FAIL);
  EXPECT_EQ(FindStation(odd), S_OK);
}

TEST(StationStore, DisplaySettings) {
  RegistrySandbox sandbox;
  ColumnWidths[0] = ColumnWidths[1] = 7;
  EXPECT_FALSE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[0] + ColumnWidths[1], 200);
  EXPECT_FALSE(RegKeyExists(kUser, kBase));
  ColumnWidths[0] = 150;
  ASSERT_TRUE(SaveDisplaySettings());
  DWORD size = 0, type = 0;
  RegGetValueW(kUser, kBase.c_str(), L"Display Settings", RRF_RT_ANY, &type, nullptr, &size);
  EXPECT_EQ(std::make_pair(type, size), std::make_pair(DWORD(REG_BINARY), DWORD(12)));
  ColumnWidths[0] = ColumnWidths[1] = 0;
  EXPECT_TRUE(LoadDisplaySettings());
  EXPECT_EQ(std::make_pair(ColumnWidths[0], ColumnWidths[1]), std::make_pair(150, 100));

  const int numbers[5] = {33, 44, 55, 66, 77};
  WriteRaw(kBase, L"Display Settings", REG_BINARY, numbers, 17);
  EXPECT_FALSE(LoadDisplaySettings());
  EXPECT_EQ(ColumnWidths[0], 100);
  WriteRaw(kBase, L"Display Settings", REG_BINARY, numbers, 16);
  EXPECT_TRUE(LoadDisplaySettings());
  EXPECT_EQ(std::make_pair(ColumnWidths[0], ColumnWidths[1]), std::make_pair(33, 44));
  ColumnWidths[0] = ColumnWidths[1] = 100;
}

std::vector<BYTE> Bytes(HGLOBAL h) {
  win::GlobalLockGuard<const BYTE> lock(h);
  return std::vector<BYTE>(lock.Get(), lock.Get() + lock.Size());
}

std::vector<CStationRecord> Unpacked(const std::vector<BYTE>& bytes) {
  win::UniqueHGlobal h(GlobalAlloc(GMEM_MOVEABLE, bytes.size()));
  std::memcpy(win::GlobalLockGuard<BYTE>(h.Get()).Get(), bytes.data(), bytes.size());
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
  EXPECT_GE(bytes.size(), 4u + 3 * (4 + 28) + (6 + 11 + 6 + 1 + 6 + 6 + 12 + 17 + 6) * 2);
  EXPECT_EQ(bytes[0], 3);
  EXPECT_EQ(bytes[4], (6 + 11 + 6) * 2 + 28);  // size of the first packed record
  EXPECT_EQ(bytes[8 + 12], 2);                  // its Port, right behind the name's terminator

  std::vector<CStationRecord> out = {Named(L"kept")};
  ASSERT_EQ(UnpackStations(h.Get(), out), S_OK);
  ASSERT_EQ(out.size(), 4u);
  EXPECT_EQ(out[0].Name, L"kept");
  for (size_t i = 0; i < records.size(); ++i) EXPECT_TRUE(Fields(out[i + 1]) == Fields(records[i])) << i;

  win::UniqueHGlobal empty(PackStations({}));
  EXPECT_TRUE(Unpacked(Bytes(empty.Get())).empty());
  EXPECT_EQ(UnpackStations(nullptr, out), S_OK);
  EXPECT_EQ(out.size(), 4u);
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

  auto patched = [&](size_t at, BYTE value) {
    std::vector<BYTE> copy = bytes;
    copy[at] = value;
    return Unpacked(copy).size();
  };
  EXPECT_EQ(patched(3, 0x7F), 2u) << "a count beyond the records";
  EXPECT_EQ(patched(firstEnd + 1, 0x40), 1u) << "a size past the end";
  EXPECT_EQ(patched(7, 0xFF), 0u);
  EXPECT_GE(patched(4, 0), 1u) << "a short size is trusted";

  std::vector<BYTE> open(bytes.begin(), bytes.end() - 10);  // a last string without its terminator
  open.insert(open.end(), {'x', 0, 1, 1, 1, 1, 1, 1, 1, 1});
  EXPECT_EQ(Unpacked(open).size(), 1u);
}

}  // namespace
