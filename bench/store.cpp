// Cost of the store's level lookups against a bare registry walk over the same 1,000 keys.
#include <windows.h>

#include <algorithm>
#include <cstdio>
#include <string>
#include <vector>

#include "store/station_record.h"

namespace {

constexpr int kLevels = 1000;
constexpr int kRounds = 7;

double Seconds(LARGE_INTEGER a, LARGE_INTEGER b) {
  static LARGE_INTEGER freq = [] { LARGE_INTEGER f; QueryPerformanceFrequency(&f); return f; }();
  return double(b.QuadPart - a.QuadPart) / double(freq.QuadPart);
}

template <class F>
double Median(F&& run) {
  std::vector<double> times;
  for (int i = 0; i < kRounds; ++i) {
    LARGE_INTEGER a, b;
    QueryPerformanceCounter(&a);
    run();
    QueryPerformanceCounter(&b);
    times.push_back(Seconds(a, b));
  }
  std::sort(times.begin(), times.end());
  return times[kRounds / 2];
}

void Populate() {
  HKEY levels = nullptr;
  RegCreateKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &levels,
                  nullptr);
  for (int n = 0; n < kLevels; ++n) {
    HKEY key = nullptr;
    RegCreateKeyExW(levels, (L"Station " + std::to_wstring(n)).c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &key,
                    nullptr);
    CStationRecord record;
    record.Name = L"Level " + std::to_wstring(n);
    WriteStation(record, key);
    RegCloseKey(key);
  }
  RegCloseKey(levels);
}

// The name of the level that an enumeration reaches last.
std::wstring LastEnumeratedName() {
  HKEY levels = nullptr;
  RegOpenKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, KEY_READ, &levels);
  DWORD count = 0;
  RegQueryInfoKeyW(levels, nullptr, nullptr, nullptr, &count, nullptr, nullptr, nullptr, nullptr, nullptr, nullptr,
                   nullptr);
  wchar_t key[260], name[261] = {};
  DWORD length = 260, size = 520;
  RegEnumKeyExW(levels, count - 1, key, &length, nullptr, nullptr, nullptr, nullptr);
  RegGetValueW(levels, key, L"Name", RRF_RT_REG_SZ, nullptr, name, &size);
  RegCloseKey(levels);
  return name;
}

// What the registry itself needs to visit every level's name.
int BareWalk() {
  HKEY levels = nullptr;
  RegOpenKeyExW(HKEY_CURRENT_USER, GetLevelsKeyName().c_str(), 0, KEY_READ, &levels);
  int seen = 0;
  for (DWORD i = 0;; ++i) {
    wchar_t key[260];
    DWORD length = 260;
    if (RegEnumKeyExW(levels, i, key, &length, nullptr, nullptr, nullptr, nullptr) != ERROR_SUCCESS) break;
    HKEY sub = nullptr;
    if (RegOpenKeyExW(levels, key, 0, KEY_QUERY_VALUE, &sub) != ERROR_SUCCESS) continue;
    wchar_t name[261];
    DWORD size = 520;
    if (RegQueryValueExW(sub, L"Name", nullptr, nullptr, reinterpret_cast<BYTE*>(name), &size) == ERROR_SUCCESS)
      ++seen;
    RegCloseKey(sub);
  }
  RegCloseKey(levels);
  return seen;
}

}  // namespace

int main() {
  const std::wstring scratchPath = L"Software\\MarlixBenchScratch\\" + std::to_wstring(GetCurrentProcessId());
  HKEY scratch = nullptr;
  if (RegCreateKeyExW(HKEY_CURRENT_USER, scratchPath.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &scratch,
                      nullptr) != ERROR_SUCCESS ||
      RegOverridePredefKey(HKEY_CURRENT_USER, scratch) != ERROR_SUCCESS) {
    std::printf("cannot make the scratch key\n");
    return 1;
  }

  Populate();
  const std::wstring last = LastEnumeratedName();
  bool ok = true;
  double bare = Median([&] { ok &= BareWalk() == kLevels; });
  double findLast = Median([&] {
    CStationRecord record;
    record.Name = last;
    ok &= FindStation(record) == S_OK;
  });
  double fullWalk = Median([&] {
    CStationRecord record;
    record.Name = L"no such level";
    ok &= FindStation(record) == E_FAIL;
  });

  RegOverridePredefKey(HKEY_CURRENT_USER, nullptr);
  RegCloseKey(scratch);
  RegDeleteTreeW(HKEY_CURRENT_USER, scratchPath.c_str());
  RegDeleteKeyW(HKEY_CURRENT_USER, L"Software\\MarlixBenchScratch");

  std::printf("%d levels, median of %d rounds%s\n", kLevels, kRounds, ok ? "" : " (RESULTS WRONG)");
  std::printf("bare walk (enumerate + open + query Name): %8.2f ms\n", bare * 1e3);
  std::printf("FindStation of the last level:             %8.2f ms  ratio %.2f\n", findLast * 1e3, findLast / bare);
  std::printf("full store walk (find of an absent name):  %8.2f ms  ratio %.2f\n", fullWalk * 1e3, fullWalk / bare);
  return ok ? 0 : 1;
}
