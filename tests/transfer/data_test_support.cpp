// Shared pieces of the transfer tests, built as the shell and the instrument would hand them over.
#include "data_test_support.h"

#include <cstring>
#include <filesystem>

#include "tools/marlix_comm/survey_job.h"

FORMATETC Request(const wchar_t* format, DWORD tymed, LONG index) {
  return {CLIPFORMAT(RegisterClipboardFormatW(format)), nullptr, DVASPECT_CONTENT, index, tymed};
}

std::vector<BYTE> IdBytes(std::initializer_list<std::pair<DWORD, std::wstring>> ids) {
  std::vector<BYTE> bytes;
  for (auto& [type, text] : ids) {
    const size_t at = bytes.size(), textBytes = (text.size() + 1) * 2;
    const USHORT cb = USHORT(19 + textBytes);
    bytes.resize(at + cb, 0);
    std::memcpy(&bytes[at], &cb, 2);
    std::memcpy(&bytes[at + 2], &type, 4);
    std::memcpy(&bytes[at + 14], text.c_str(), textBytes);
  }
  bytes.resize(bytes.size() + 2, 0);
  return bytes;
}

LPITEMIDLIST MakeFullList(const std::wstring& level, bool withFile) {
  const std::vector<BYTE> bytes = withFile ? IdBytes({{1, L"Marlix Digital Levels"}, {2, level}, {3, L"file1.tkf"}})
                                           : IdBytes({{1, L"Marlix Digital Levels"}, {2, level}});
  return static_cast<LPITEMIDLIST>(std::memcpy(CoTaskMemAlloc(bytes.size()), bytes.data(), bytes.size()));
}

std::vector<char> ReadAll(IStream* stream) {
  std::vector<char> all;
  char block[4096];
  for (ULONG got = sizeof block; got == sizeof block && stream->Read(block, sizeof block, &got) == S_OK;)
    all.insert(all.end(), block, block + got);
  return all;
}

bool IsStandInJob(const std::vector<char>& bytes) {
  auto withoutDate = [](std::string job) {  // the stand-in stamps its job with the time of writing
    const size_t at = job.find("\r\nDATE,");
    if (at != std::string::npos) job.erase(at, job.find("\r\n", at + 2) - at);
    return job;
  };
  return !bytes.empty() && withoutDate({bytes.begin(), bytes.end()}) == withoutDate(standin::MakeSurveyJob(0));
}

std::wstring TempDir() {
  wchar_t dir[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, dir);
  return dir;
}

static struct PrivateTemp {
  const std::wstring dir = TempDir() + L"marlix_data_" + std::to_wstring(GetCurrentProcessId()) + L"\\";
  PrivateTemp() {
    CreateDirectoryW(dir.c_str(), nullptr);
    SetEnvironmentVariableW(L"TMP", dir.c_str());
    SetEnvironmentVariableW(L"TEMP", dir.c_str());
  }
  ~PrivateTemp() { std::error_code ignored; std::filesystem::remove_all(dir, ignored); }
} privateTemp;

std::set<std::wstring> TransferFiles() {
  std::set<std::wstring> names;
  WIN32_FIND_DATAW found;
  HANDLE h = FindFirstFileW((TempDir() + L"TKF*.txt").c_str(), &found);
  for (BOOL more = h != INVALID_HANDLE_VALUE; more; more = FindNextFileW(h, &found)) names.insert(found.cFileName);
  if (h != INVALID_HANDLE_VALUE) FindClose(h);
  return names;
}
