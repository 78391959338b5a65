#include "store/station_record.h"

#include <climits>
#include <cstdint>
#include <cstring>
#include <cwchar>

#include <shlwapi.h>

#include "base/win_handles.h"
#include "base/resource_ids.h"
#include "store/string_table.h"

int ColumnWidths[2] = {100, 100};

namespace {

// Windows' formatter: the C library's would bring a whole printf into the module.
std::wstring DecimalText(int n) {
  wchar_t text[16] = {};
  wnsprintfW(text, 16, L"%d", n);
  return text;
}

constexpr DWORD kStringReadBytes = 520;  // 260 characters with the terminator
constexpr DWORD kKeyNameChars = 260;

LONG OpenLevelsKey(win::UniqueHKey& key) {
  return RegCreateKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr,
                         key.Put(), nullptr);
}

// A string value as every reader of the store takes it: at most 520 bytes, an odd last byte
// kept as a character of its own, and no terminator needed.
LONG ReadString(HKEY key, const wchar_t* value, std::wstring& out) {
  // One spare character so that a value stored without its terminator still ends.
  wchar_t buffer[kStringReadBytes / sizeof(wchar_t) + 1] = {};
  DWORD size = kStringReadBytes;
  LONG rc = RegQueryValueExW(key, value, nullptr, nullptr, reinterpret_cast<BYTE*>(buffer), &size);
  if (rc != ERROR_SUCCESS) return rc;
  out.assign(buffer, wcsnlen(buffer, (size + 1) / sizeof(wchar_t)));
  return ERROR_SUCCESS;
}

LONG ReadNumber(HKEY key, const wchar_t* value, int& out) {
  DWORD number = 0, size = sizeof(number);
  LONG rc = RegQueryValueExW(key, value, nullptr, nullptr, reinterpret_cast<BYTE*>(&number), &size);
  if (rc == ERROR_SUCCESS) out = static_cast<int>(number);
  return rc;
}

LONG WriteString(HKEY key, const wchar_t* value, const std::wstring& text) {
  return RegSetValueExW(key, value, 0, REG_SZ, reinterpret_cast<const BYTE*>(text.c_str()),
                        static_cast<DWORD>((text.size() + 1) * sizeof(wchar_t)));
}

LONG WriteNumber(HKEY key, const wchar_t* value, int number) {
  DWORD data = static_cast<DWORD>(number);
  return RegSetValueExW(key, value, 0, REG_DWORD, reinterpret_cast<const BYTE*>(&data), sizeof(data));
}

// Finds the level by exact name; on success `levelKey` is open on it and `keyName` holds its key name.
bool FindLevelKey(HKEY levels, const std::wstring& name, win::UniqueHKey& levelKey, wchar_t* keyName) {
  for (DWORD index = 0;; ++index) {
    DWORD length = kKeyNameChars;
    if (RegEnumKeyExW(levels, index, keyName, &length, nullptr, nullptr, nullptr, nullptr) != ERROR_SUCCESS)
      return false;
    // Opened, not created: a key another process deletes meanwhile must not come back empty.
    if (RegOpenKeyExW(levels, keyName, 0, KEY_ALL_ACCESS, levelKey.Put()) != ERROR_SUCCESS) continue;
    std::wstring stored;
    if (ReadString(levelKey.Get(), L"Name", stored) != ERROR_SUCCESS) continue;
    if (stored == name) return true;
  }
}

// Packed records are unaligned little-endian bytes.
void PutBytes(BYTE*& at, const void* data, size_t size) {
  std::memcpy(at, data, size);
  at += size;
}
void PutNumber(BYTE*& at, int number) {
  uint32_t data = static_cast<uint32_t>(number);
  PutBytes(at, &data, sizeof(data));
}
void PutString(BYTE*& at, const std::wstring& text) { PutBytes(at, text.c_str(), (text.size() + 1) * 2); }

size_t PackedSize(const CStationRecord& r) {
  return (r.Name.size() + 1) * 2 + (r.Manufacturer.size() + 1) * 2 + (r.Model.size() + 1) * 2 + 7 * 4;
}

// Reads within [at, end); false when the block ends first.
class Reader {
 public:
  Reader(const BYTE* at, const BYTE* end) : at_(at), end_(end) {}
  bool Number(uint32_t& out) {
    if (static_cast<size_t>(end_ - at_) < sizeof(out)) return false;
    std::memcpy(&out, at_, sizeof(out));
    at_ += sizeof(out);
    return true;
  }
  bool Number(int& out) {
    uint32_t data;
    if (!Number(data)) return false;
    out = static_cast<int>(data);
    return true;
  }
  bool String(std::wstring& out) {
    std::wstring text;
    for (;;) {
      if (end_ - at_ < 2) return false;
      wchar_t c = static_cast<wchar_t>(at_[0] | (at_[1] << 8));
      at_ += 2;
      if (c == 0) break;
      text.push_back(c);
    }
    out = std::move(text);
    return true;
  }

 private:
  const BYTE* at_;
  const BYTE* end_;
};

bool UnpackRecord(Reader& in, CStationRecord& r) {
  return in.String(r.Name) && in.Number(r.Port) && in.Number(r.BaudRate) && in.Number(r.StopBits) &&
         in.Number(r.Parity) && in.Number(r.DataBits) && in.String(r.Manufacturer) && in.String(r.Model) &&
         in.Number(r.Flow) && in.Number(r.CheckSum);
}

bool LevelNameTaken(const std::wstring& name) {
  CStationRecord probe;
  probe.Name = name;
  return FindStation(probe) == S_OK;
}

}  // namespace

CStationRecord::CStationRecord() : Model(LoadTranslatedString(IDS_MODEL_HRA20)) {}

std::wstring GetBaseKeyName() { return L"Software\\Gravon\\Shell Extensions\\Marlix DL View"; }

std::wstring GetLevelsKeyName() { return GetBaseKeyName() + L"\\Levels"; }

bool DiagnosticLogWanted() {
  DWORD value = 0, size = sizeof(value);
  return RegGetValueW(HKEY_CURRENT_USER, GetBaseKeyName().c_str(), L"Diagnostic Log", RRF_RT_REG_DWORD, nullptr,
                      &value, &size) == ERROR_SUCCESS &&
         value == 1;
}

bool LoadDisplaySettings() {
  ColumnWidths[0] = ColumnWidths[1] = 100;
  win::UniqueHKey base;
  if (RegOpenKeyExW(HKEY_CURRENT_USER, GetBaseKeyName().c_str(), 0, KEY_ALL_ACCESS, base.Put()) != ERROR_SUCCESS)
    return false;
  // A value shorter than two widths leaves the defaults where it has no bytes.
  int32_t settings[4] = {100, 100, 0, 0};
  DWORD size = sizeof(settings);
  LONG rc = RegQueryValueExW(base.Get(), L"Display Settings", nullptr, nullptr, reinterpret_cast<BYTE*>(settings),
                             &size);
  base.Reset();
  if (rc != ERROR_SUCCESS) return false;
  ColumnWidths[0] = settings[0];
  ColumnWidths[1] = settings[1];
  return true;
}

bool SaveDisplaySettings() {
  win::UniqueHKey base;
  if (RegCreateKeyExW(HKEY_CURRENT_USER, GetBaseKeyName().c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr,
                      base.Put(), nullptr) != ERROR_SUCCESS)
    return false;
  int32_t settings[3] = {ColumnWidths[0], ColumnWidths[1], 0};
  return RegSetValueExW(base.Get(), L"Display Settings", 0, REG_BINARY, reinterpret_cast<const BYTE*>(settings),
                        sizeof(settings)) == ERROR_SUCCESS;
}

LONG ReadStation(CStationRecord& r, HKEY key) {
  LONG rc;
  if ((rc = ReadString(key, L"Name", r.Name)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadNumber(key, L"Port", r.Port)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadNumber(key, L"StopBits", r.StopBits)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadNumber(key, L"BaudRate", r.BaudRate)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadNumber(key, L"Parity", r.Parity)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadNumber(key, L"DataBits", r.DataBits)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadString(key, L"Manufacturer", r.Manufacturer)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadString(key, L"Model", r.Model)) != ERROR_SUCCESS) return rc;
  if ((rc = ReadNumber(key, L"Flow", r.Flow)) != ERROR_SUCCESS) return rc;
  return ReadNumber(key, L"CheckSum", r.CheckSum);
}

void WriteStation(const CStationRecord& r, HKEY key) {
  if (WriteString(key, L"Name", r.Name) != ERROR_SUCCESS) return;
  if (WriteNumber(key, L"Port", r.Port) != ERROR_SUCCESS) return;
  if (WriteNumber(key, L"BaudRate", r.BaudRate) != ERROR_SUCCESS) return;
  if (WriteNumber(key, L"StopBits", r.StopBits) != ERROR_SUCCESS) return;
  if (WriteNumber(key, L"Parity", r.Parity) != ERROR_SUCCESS) return;
  if (WriteNumber(key, L"DataBits", r.DataBits) != ERROR_SUCCESS) return;
  if (WriteString(key, L"Manufacturer", r.Manufacturer) != ERROR_SUCCESS) return;
  if (WriteString(key, L"Model", r.Model) != ERROR_SUCCESS) return;
  if (WriteNumber(key, L"Flow", r.Flow) != ERROR_SUCCESS) return;
  WriteNumber(key, L"CheckSum", r.CheckSum);
}

std::vector<std::wstring> ListStationNames() {
  std::vector<std::wstring> names;
  win::UniqueHKey levels;
  if (OpenLevelsKey(levels) != ERROR_SUCCESS) return names;
  for (DWORD index = 0;; ++index) {
    wchar_t keyName[kKeyNameChars];
    DWORD length = kKeyNameChars;
    if (RegEnumKeyExW(levels.Get(), index, keyName, &length, nullptr, nullptr, nullptr, nullptr) != ERROR_SUCCESS)
      return names;
    // Listing needs no more than reading.
    win::UniqueHKey level;
    std::wstring name;
    if (RegOpenKeyExW(levels.Get(), keyName, 0, KEY_READ, level.Put()) == ERROR_SUCCESS &&
        ReadString(level.Get(), L"Name", name) == ERROR_SUCCESS)
      names.push_back(std::move(name));
  }
}

HRESULT FindStation(CStationRecord& record, wchar_t* keyName, DWORD* keyNameLength) {
  win::UniqueHKey levels;
  if (OpenLevelsKey(levels) != ERROR_SUCCESS) return E_FAIL;
  win::UniqueHKey levelKey;
  wchar_t found[kKeyNameChars];
  if (!FindLevelKey(levels.Get(), record.Name, levelKey, found)) return E_FAIL;
  ReadStation(record, levelKey.Get());  // a gap in the values still counts as found
  if (keyName && keyNameLength && *keyNameLength != 0) {
    wcsncpy(keyName, found, *keyNameLength);
    *keyNameLength = static_cast<DWORD>(wcsnlen(keyName, *keyNameLength)) + 1;
  }
  return S_OK;
}

bool IsStorableStation(const CStationRecord& record) {
  return !record.Name.empty() && record.Name.size() <= kMaxStationNameLength &&
         record.Name.find_first_of(L"\\/") == std::wstring::npos && record.Manufacturer.size() <= kMaxStationTextLength &&
         record.Model.size() <= kMaxStationTextLength;
}

HRESULT AddStation(CStationRecord& record) {
  // Checked before anything is made: a level that can't be read back would stay as a hidden key.
  if (!IsStorableStation(record)) return kUnstorableStation;
  if (FindStation(record) == S_OK) return E_INVALIDARG;
  win::UniqueHKey levels;
  if (OpenLevelsKey(levels) != ERROR_SUCCESS) return E_FAIL;
  // Numbers start at 0 and a freed number is taken again; only a key made by this call is ours.
  // Any failure but "that key exists" ends the search: a deleted Levels key or a full
  // hive would otherwise hold the caller's thread for 2^31 calls.
  for (int n = 0; n < INT_MAX; ++n) {
    std::wstring name = L"Station " + DecimalText(n);
    win::UniqueHKey key;
    DWORD disposition = 0;
    if (RegCreateKeyExW(levels.Get(), name.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, key.Put(), &disposition) !=
        ERROR_SUCCESS)
      return E_FAIL;
    if (disposition != REG_CREATED_NEW_KEY) continue;
    WriteStation(record, key.Get());
    return S_OK;
  }
  return E_FAIL;
}

// Update and delete begin alike: the stored level's key name, then the open Levels key.
// E_INVALIDARG if no level has the name, E_FAIL for an empty key name, else the registry code.
static HRESULT FindKeyAndOpenLevels(CStationRecord stored, wchar_t (&keyName)[kKeyNameChars], win::UniqueHKey& levels) {
  DWORD length = kKeyNameChars;
  if (FindStation(stored, keyName, &length) != S_OK) return E_INVALIDARG;
  if (length == 0) return E_FAIL;
  return OpenLevelsKey(levels);
}

HRESULT UpdateStation(const std::wstring& oldName, const CStationRecord& record) {
  if (!IsStorableStation(record)) return kUnstorableStation;
  CStationRecord stored = record;
  stored.Name = oldName;
  wchar_t keyName[kKeyNameChars];
  win::UniqueHKey levels;
  if (HRESULT hr = FindKeyAndOpenLevels(stored, keyName, levels); hr != S_OK) return hr;
  win::UniqueHKey key;
  DWORD disposition = 0;
  LONG rc = RegCreateKeyExW(levels.Get(), keyName, 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, key.Put(), &disposition);
  if (rc == ERROR_SUCCESS && disposition == REG_OPENED_EXISTING_KEY) WriteStation(record, key.Get());
  // Deleted by another process since it was found: the empty key just made goes again.
  if (rc == ERROR_SUCCESS && disposition == REG_CREATED_NEW_KEY) {
    key.Reset();
    RegDeleteKeyW(levels.Get(), keyName);
  }
  return rc;
}

LONG DeleteKeyTree(HKEY parent, const wchar_t* name) {
  if (!name || !*name) return ERROR_BADKEY;
  {
    win::UniqueHKey key;
    LONG rc = RegOpenKeyExW(parent, name, 0, DELETE | KEY_ENUMERATE_SUB_KEYS, key.Put());
    if (rc != ERROR_SUCCESS) return rc;
    for (;;) {
      wchar_t child[kKeyNameChars];
      DWORD length = kKeyNameChars;
      rc = RegEnumKeyExW(key.Get(), 0, child, &length, nullptr, nullptr, nullptr, nullptr);
      if (rc == ERROR_NO_MORE_ITEMS) break;
      if (rc != ERROR_SUCCESS) return rc;
      if ((rc = DeleteKeyTree(key.Get(), child)) != ERROR_SUCCESS) return rc;
    }
  }
  return RegDeleteKeyW(parent, name);
}

HRESULT DeleteStation(const CStationRecord& record) {
  wchar_t keyName[kKeyNameChars];
  win::UniqueHKey levels;
  if (HRESULT hr = FindKeyAndOpenLevels(record, keyName, levels); hr != S_OK) return hr;
  return DeleteKeyTree(levels.Get(), keyName);
}

std::wstring MakeUniqueStationName(const std::wstring& base) {
  for (unsigned i = 1;; ++i) {
    std::wstring candidate = i > 1 ? base + L" (" + DecimalText(i) + L")" : base;
    if (!LevelNameTaken(candidate)) return candidate;
  }
}

std::wstring FreeCopyName(const std::wstring& name, const std::wstring& prefix) {
  std::wstring candidate = name;
  while (LevelNameTaken(candidate)) {
    std::wstring next = prefix + candidate;
    if (next.size() > kMaxStationNameLength) {
      next.resize(kMaxStationNameLength);
      if (IS_HIGH_SURROGATE(next.back())) next.pop_back();  // never half a character
    }
    if (next == candidate) return {};
    candidate = std::move(next);
  }
  return candidate;
}

HGLOBAL PackStations(const std::vector<CStationRecord>& records) {
  size_t total = 4;
  for (const auto& r : records) total += 4 + PackedSize(r);
  win::UniqueHGlobal memory(GlobalAlloc(GMEM_MOVEABLE | GMEM_ZEROINIT | GMEM_SHARE, total));
  if (!memory) return nullptr;
  {
    win::GlobalLockGuard<BYTE> lock(memory.Get());
    BYTE* at = lock.Get();
    if (!at) return nullptr;
    PutNumber(at, static_cast<int>(records.size()));
    for (const auto& r : records) {
      PutNumber(at, static_cast<int>(PackedSize(r)));
      PutString(at, r.Name);
      PutNumber(at, r.Port);
      PutNumber(at, r.BaudRate);
      PutNumber(at, r.StopBits);
      PutNumber(at, r.Parity);
      PutNumber(at, r.DataBits);
      PutString(at, r.Manufacturer);
      PutString(at, r.Model);
      PutNumber(at, r.Flow);
      PutNumber(at, r.CheckSum);
    }
  }
  return memory.Release();
}

HRESULT UnpackStations(HGLOBAL block, std::vector<CStationRecord>& records) {
  win::GlobalLockGuard<const BYTE> lock(block);
  const BYTE* begin = lock.Get();
  if (!begin) return S_OK;
  const BYTE* end = begin + lock.Size();
  Reader header(begin, end);
  uint32_t count = 0;
  if (!header.Number(count) || count < 1) return S_OK;
  const BYTE* at = begin + 4;
  for (uint32_t i = 0; i < count; ++i) {
    Reader sizeField(at, end);
    uint32_t size = 0;
    if (!sizeField.Number(size)) break;
    const BYTE* body = at + 4;
    // The size is trusted to find the next record, but never beyond the block.
    if (size > static_cast<size_t>(end - body)) break;
    Reader in(body, end);
    CStationRecord r;
    if (!UnpackRecord(in, r)) break;
    records.push_back(std::move(r));
    at = body + size;
  }
  return S_OK;
}
