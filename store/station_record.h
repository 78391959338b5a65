// The level record and the per-user registry store of levels.
#pragma once
#include <windows.h>
#include <string>
#include <vector>

// One digital level: a user's name on a set of serial-line settings. A plain value.
class CStationRecord {
 public:
  CStationRecord();

  std::wstring Name;
  int Port = 1;
  int BaudRate = 9600;
  int StopBits = 1;  // 1, 2, or 15 for one and a half
  int Parity = 0;    // 0 none, 1 even, 2 odd
  int DataBits = 8;
  int Flow = 0;      // 0 none, 1 Xon/Xoff
  int CheckSum = 1;  // 0 not set, 1 set
  std::wstring Manufacturer;  // the user's note
  std::wstring Model;
};

// The longest name a level may have: the longest address built from it, the file's parsing
// name "::{D8B818CA-E47C-49a1-96A5-C2AA5FB57F15}\<name>\file1.tkf", then fills a 260-character
// buffer exactly. Every other road (folder, path, tip, status text, copy) has room to spare.
inline constexpr size_t kMaxStationNameLength = 208;
// The longest note or model text: what a registry read of 520 bytes gives back.
inline constexpr size_t kMaxStationTextLength = 259;
// What the store answers for a record it would not be able to read back whole, or whose
// name the namespace could not show as one level (empty, or with a path separator in it).
inline constexpr HRESULT kUnstorableStation = static_cast<HRESULT>(0x8000000BL);  // E_BOUNDS
bool IsStorableStation(const CStationRecord& record);

// Widths of the view's two columns, read at module start and written at module end.
extern int ColumnWidths[2];

std::wstring GetBaseKeyName();
std::wstring GetLevelsKeyName();

// The support switch of the diagnostic log: a DWORD "Diagnostic Log" of 1 under the base key.
// Off when missing or anything else.
bool DiagnosticLogWanted();

// True if the stored "Display Settings" were read; the widths are 100 otherwise.
bool LoadDisplaySettings();
bool SaveDisplaySettings();

// 0, or the code of the first value that could not be read; fields not reached keep their contents.
LONG ReadStation(CStationRecord& record, HKEY key);
// Stops silently at the first value that cannot be written.
void WriteStation(const CStationRecord& record, HKEY key);

// The names of the stored levels, in the registry's order, as every reader of the store takes
// them; none if the store can't be opened. Levels without a readable "Name" are not among them.
std::vector<std::wstring> ListStationNames();

// Finds a level by exact name and fills `record` from the store. With a buffer and a
// non-zero *keyNameLength, also gives the level's key name and sets the length to its length + 1.
HRESULT FindStation(CStationRecord& record, wchar_t* keyName = nullptr, DWORD* keyNameLength = nullptr);
// E_INVALIDARG if the name is taken, in which case `record` now holds the stored level;
// kUnstorableStation, with nothing written, for a record that could not be read back.
HRESULT AddStation(CStationRecord& record);
// kUnstorableStation, with nothing written, for a record that could not be read back.
HRESULT UpdateStation(const std::wstring& oldName, const CStationRecord& record);
HRESULT DeleteStation(const CStationRecord& record);
// The base, or the base with " (2)", " (3)", ... : the first name no level has.
std::wstring MakeUniqueStationName(const std::wstring& base);
// The name a pasted level takes: `name` while free, else `prefix` in front as often as needed,
// cut to kMaxStationNameLength. Empty once the prefixes fill the whole name and it is still taken.
std::wstring FreeCopyName(const std::wstring& name, const std::wstring& prefix);

// Deletes a key and everything below it. ERROR_BADKEY for an empty name.
LONG DeleteKeyTree(HKEY parent, const wchar_t* name);

// The private clipboard format of packed levels, and its form: a count, then a size and a
// packed record each.
inline constexpr wchar_t kStationsFormat[] = L"Marlix Total Stations";
// The handle is global memory (0x2042) owned by the caller; null if it could not be made.
HGLOBAL PackStations(const std::vector<CStationRecord>& records);
// Appends the records found in the block; stops at the first damaged one. Returns 0.
HRESULT UnpackStations(HGLOBAL block, std::vector<CStationRecord>& records);
