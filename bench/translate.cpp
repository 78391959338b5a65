// Cost of a translated string lookup against the English one, and the parse rate of a
// 5,000-pair translation file against a bare scan of its bytes, side by side in one run.
#include <windows.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <string>
#include <vector>

#include "helpers/app_helpers.h"
#include "helpers/translate_file.h"
#include "helpers/translate_manager.h"
#include "base/module_instance.h"
#include "store/string_table.h"

namespace {

constexpr int kPairs = 5000;
constexpr LANGID kEnglish = 1033, kGerman = 1031;
// Ids of in-use table texts; all of them get a translation in the file.
const UINT kIds[] = {350, 351, 352, 353, 354, 355, 356, 357, 359, 360, 361, 362, 363, 364, 1000,
                     1001, 1002, 1003, 1004, 1005, 1006, 1007, 1008, 1009, 1010, 1011, 1012, 1013,
                     1015, 1016, 1017, 1018, 1022, 1023, 1024, 1025, 1026, 1028, 1029, 1030, 1031};

double Now() {
  static const double frequency = [] { LARGE_INTEGER f; QueryPerformanceFrequency(&f); return double(f.QuadPart); }();
  LARGE_INTEGER t;
  QueryPerformanceCounter(&t);
  return double(t.QuadPart) / frequency;
}

double Median(std::vector<double> v) {
  std::sort(v.begin(), v.end());
  return v[v.size() / 2];
}

std::wstring Escape(const std::wstring& text) {
  std::wstring out;
  for (wchar_t c : text) {
    if (c == L'\\') out += L"\\\\";
    else if (c == L'\n') out += L"\\n";
    else if (c == L'\t') out += L"\\t";
    else if (c == L'\r') out += L"\\r";
    else out += c;
  }
  return out;
}

void WriteFileBytes(const std::wstring& path, const std::wstring& text) {
  HANDLE file = CreateFileW(path.c_str(), GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  DWORD written = 0;
  WriteFile(file, "\xFF\xFE", 2, &written, nullptr);
  WriteFile(file, text.data(), DWORD(text.size() * sizeof(wchar_t)), &written, nullptr);
  CloseHandle(file);
}

// The table's texts first, then filler sentences up to kPairs pairs.
std::wstring BuildFile() {
  std::wstring text = L"; benchmark translation\r\n";
  int pairs = 0;
  for (UINT id : kIds) {
    std::wstring english = LoadTranslatedString(id);
    text += L"[" + Escape(english) + L"]\r\n[DE " + Escape(english) + L"]\r\n";
    ++pairs;
  }
  for (; pairs < kPairs; ++pairs) {
    std::wstring n = std::to_wstring(pairs);
    text += L"[The sentence number " + n + L" of a long dialog text]\r\n[Der Satz Nummer " + n +
            L" eines langen Dialogtextes]\r\n";
  }
  return text;
}

// Reads every byte of the mapped file and counts line ends: the floor for any parser.
size_t BareScan(const std::wstring& path) {
  HANDLE file = CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                            FILE_ATTRIBUTE_NORMAL, nullptr);
  DWORD size = GetFileSize(file, nullptr);
  HANDLE mapping = CreateFileMappingW(file, nullptr, PAGE_READONLY, 0, 0, nullptr);
  const auto* view = static_cast<const wchar_t*>(MapViewOfFile(mapping, FILE_MAP_READ, 0, 0, 0));
  size_t lines = 0;
  for (size_t i = 1; i < size / 2; ++i) lines += view[i] == L'\n';
  UnmapViewOfFile(view);
  CloseHandle(mapping);
  CloseHandle(file);
  return lines;
}

}  // namespace

int main() {
  const std::wstring app = kld::ft::GetAppPathW();
  const std::wstring title = std::filesystem::path(kld::ft::GetExecutablePath()).stem().wstring();
  std::filesystem::create_directories(app + L"components");
  HANDLE marker = CreateFileW((app + L"components\\NotInstalledApp.txt").c_str(), GENERIC_WRITE, 0,
                              nullptr, CREATE_ALWAYS, 0, nullptr);
  CloseHandle(marker);
  std::filesystem::create_directories(app + L"Languages\\de-DE");
  const std::wstring path = app + L"Languages\\de-DE\\" + title + L".txt";
  WriteFileBytes(path, BuildFile());

  // A German thread's lookup is the English lookup plus TranslateText; this process runs
  // in English, so the German path is taken by adding that call.
  const int kRounds = 15, kLoops = 200;
  std::vector<double> english, german;
  size_t sink = 0;
  const std::wstring sample =
      kld::ft::TranslateText(LoadTranslatedString(1001), kEnglish, kGerman, ModuleInstance(), nullptr);
  if (sample != L"DE Marlix Digital Levels") {
    std::printf("the translation file was not found\n");
    return 1;
  }
  for (int round = 0; round < kRounds; ++round) {
    double t0 = Now();
    for (int loop = 0; loop < kLoops; ++loop)
      for (UINT id : kIds) sink += LoadTranslatedString(id).size();
    double t1 = Now();
    for (int loop = 0; loop < kLoops; ++loop)
      for (UINT id : kIds)
        sink += kld::ft::TranslateText(LoadTranslatedString(id), kEnglish, kGerman, ModuleInstance(), nullptr).size();
    double t2 = Now();
    english.push_back(t1 - t0);
    german.push_back(t2 - t1);
  }
  const double lookups = double(kLoops) * (sizeof kIds / sizeof kIds[0]);
  std::printf("LoadTranslatedString, English:           %8.3f us per string\n", Median(english) / lookups * 1e6);
  std::printf("LoadTranslatedString, %d-pair file:    %8.3f us per string\n", kPairs, Median(german) / lookups * 1e6);
  std::printf("ratio translated / English:              %8.2f\n", Median(german) / Median(english));

  std::vector<double> parse, scan;
  for (int round = 0; round < kRounds; ++round) {
    double t0 = Now();
    kld::ft::CTranslateFile file;
    file.Load(path.c_str());
    sink += file.Size();
    double t1 = Now();
    sink += BareScan(path);
    double t2 = Now();
    parse.push_back(t1 - t0);
    scan.push_back(t2 - t1);
  }
  const double megabytes = double(std::filesystem::file_size(path)) / (1 << 20);
  std::printf("parse of the file:  %8.1f MB/s (%.2f ms)\n", megabytes / Median(parse), Median(parse) * 1e3);
  std::printf("bare scan:          %8.1f MB/s (%.2f ms)\n", megabytes / Median(scan), Median(scan) * 1e3);
  std::printf("ratio parse / bare scan time:            %8.2f\n", Median(parse) / Median(scan));
  std::printf("(checksum %zu)\n", sink);

  std::filesystem::remove_all(app + L"components");
  std::filesystem::remove_all(app + L"Languages");
  return 0;
}
