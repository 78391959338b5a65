#include "stand_in_files.h"

#include <cstdlib>
#include <vector>

extern "C" IMAGE_DOS_HEADER __ImageBase;

namespace standin {

namespace {
SRWLOCK logLock = SRWLOCK_INIT;

std::string Trim(const std::string& text) {
  size_t first = text.find_first_not_of(" \t\r\n");
  if (first == std::string::npos) return {};
  size_t last = text.find_last_not_of(" \t\r\n");
  return text.substr(first, last - first + 1);
}
}  // namespace

std::wstring BesideModule(const wchar_t* fileName) {
  wchar_t path[MAX_PATH] = {};
  DWORD length = GetModuleFileNameW(reinterpret_cast<HMODULE>(&__ImageBase), path, MAX_PATH);
  std::wstring folder(path, length);
  size_t cut = folder.find_last_of(L"\\/");
  folder.resize(cut == std::wstring::npos ? 0 : cut + 1);
  return folder + fileName;
}

Settings Settings::Load() {
  Settings settings;
  HANDLE file = CreateFileW(BesideModule(L"MarlixComm.txt").c_str(), GENERIC_READ,
                            FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, OPEN_EXISTING, 0, nullptr);
  if (file == INVALID_HANDLE_VALUE) return settings;
  std::string text;
  char buffer[4096];
  DWORD read = 0;
  while (ReadFile(file, buffer, sizeof buffer, &read, nullptr) && read > 0 && text.size() < 65536)
    text.append(buffer, read);
  CloseHandle(file);

  size_t start = 0;
  while (start < text.size()) {
    size_t end = text.find('\n', start);
    if (end == std::string::npos) end = text.size();
    std::string line = text.substr(start, end - start);
    start = end + 1;
    size_t hash = line.find('#');
    if (hash != std::string::npos) line.resize(hash);
    size_t equals = line.find('=');
    if (equals == std::string::npos) continue;
    settings.values_[Trim(line.substr(0, equals))] = Trim(line.substr(equals + 1));
  }
  return settings;
}

int Settings::Number(const std::string& key, int fallback) const {
  auto it = values_.find(key);
  if (it == values_.end() || it->second.empty()) return fallback;
  return static_cast<int>(std::strtol(it->second.c_str(), nullptr, 0));
}

void Log(const std::string& line) {
  AcquireSRWLockExclusive(&logLock);
  HANDLE file = CreateFileW(BesideModule(L"MarlixComm.log").c_str(), FILE_APPEND_DATA,
                            FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr,
                            OPEN_ALWAYS, 0, nullptr);
  if (file != INVALID_HANDLE_VALUE) {
    std::string text = line + "\r\n";
    DWORD written = 0;
    WriteFile(file, text.data(), static_cast<DWORD>(text.size()), &written, nullptr);
    CloseHandle(file);
  }
  ReleaseSRWLockExclusive(&logLock);
}

}  // namespace standin
