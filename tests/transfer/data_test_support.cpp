#include "data_test_support.h"

#include <chrono>
#include <cstring>

#include "tools/marlix_comm/survey_job.h"

namespace {

void AppendId(std::vector<BYTE>& bytes, DWORD type, const std::wstring& text) {
  const size_t textBytes = (text.size() + 1) * 2;
  const USHORT cb = static_cast<USHORT>(19 + textBytes);
  const size_t at = bytes.size();
  bytes.resize(at + cb, 0);
  std::memcpy(&bytes[at], &cb, 2);
  std::memcpy(&bytes[at + 2], &type, 4);
  std::memcpy(&bytes[at + 14], text.c_str(), textBytes);
}

bool IsDialog(HWND w, bool download) {
  wchar_t cls[16] = {}, title[64] = {};
  GetClassNameW(w, cls, 16);
  GetWindowTextW(w, title, 64);
  return IsWindowVisible(w) && std::wcscmp(cls, L"#32770") == 0 &&
         (!download || std::wcscmp(title, L"Download file from Digital Level") == 0);
}

BOOL CALLBACK FindDownloadDialog(HWND w, LPARAM found) {
  if (!IsDialog(w, true)) return TRUE;
  *reinterpret_cast<HWND*>(found) = w;
  return FALSE;
}

// Cancel for the download dialog, OK for a message box.
BOOL CALLBACK DismissOne(HWND w, LPARAM) {
  if (IsDialog(w, false)) PostMessageW(w, WM_COMMAND, IsDialog(w, true) ? IDCANCEL : IDOK, 0);
  return TRUE;
}

}  // namespace

LPITEMIDLIST MakeFullList(const std::wstring& level, bool withFile) {
  std::vector<BYTE> bytes;
  AppendId(bytes, 1, L"Marlix Digital Levels");
  AppendId(bytes, 2, level);
  if (withFile) AppendId(bytes, 3, L"file1.tkf");
  bytes.resize(bytes.size() + 2, 0);
  auto* list = static_cast<LPITEMIDLIST>(CoTaskMemAlloc(bytes.size()));
  std::memcpy(list, bytes.data(), bytes.size());
  return list;
}

DialogDriver::DialogDriver(DWORD dialogThread, int button, std::function<void(HWND)> whileOpen, DWORD limitMs)
    : whileOpen_(std::move(whileOpen)), thread_([=, this] { Run(dialogThread, button, limitMs); }) {}

bool DialogDriver::Finish() {
  stop_ = true;
  if (thread_.joinable()) thread_.join();
  return clicked_;
}

void DialogDriver::Run(DWORD dialogThread, int button, DWORD limitMs) {
  const auto deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(limitMs);
  HWND dialog = nullptr;
  while (!stop_ && !dialog && std::chrono::steady_clock::now() < deadline) {
    EnumThreadWindows(dialogThread, FindDownloadDialog, reinterpret_cast<LPARAM>(&dialog));
    if (!dialog) Sleep(10);
  }
  if (dialog) {
    seen_ = true;
    if (whileOpen_) whileOpen_(dialog);
    SendMessageW(GetDlgItem(dialog, button), BM_CLICK, 0, 0);
    clicked_ = true;
  }
  while (!stop_) {
    if (std::chrono::steady_clock::now() >= deadline) EnumThreadWindows(dialogThread, DismissOne, 0);
    Sleep(50);
  }
}

namespace {
std::wstring Env(const wchar_t* name) {
  wchar_t value[MAX_PATH] = {};
  return GetEnvironmentVariableW(name, value, MAX_PATH) ? value : L"";
}
}  // namespace

PrivateTempDir::PrivateTempDir() : oldTmp_(Env(L"TMP")), oldTemp_(Env(L"TEMP")) {
  static int n = 0;
  dir_ = TempDir() + L"marlix_data_" + std::to_wstring(GetCurrentProcessId()) + L"_" + std::to_wstring(++n);
  CreateDirectoryW(dir_.c_str(), nullptr);
  SetEnvironmentVariableW(L"TMP", dir_.c_str());
  SetEnvironmentVariableW(L"TEMP", dir_.c_str());
}

PrivateTempDir::~PrivateTempDir() {
  SetEnvironmentVariableW(L"TMP", oldTmp_.empty() ? nullptr : oldTmp_.c_str());
  SetEnvironmentVariableW(L"TEMP", oldTemp_.empty() ? nullptr : oldTemp_.c_str());
  WIN32_FIND_DATAW found;
  HANDLE h = FindFirstFileW((dir_ + L"\\*").c_str(), &found);
  if (h != INVALID_HANDLE_VALUE) {
    do DeleteFileW((dir_ + L"\\" + found.cFileName).c_str());
    while (FindNextFileW(h, &found));
    FindClose(h);
  }
  RemoveDirectoryW(dir_.c_str());
}

std::wstring TempDir() {
  wchar_t dir[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, dir);
  return dir;
}

bool FileExists(const std::wstring& path) { return GetFileAttributesW(path.c_str()) != INVALID_FILE_ATTRIBUTES; }

std::set<std::wstring> TransferFiles() {
  std::set<std::wstring> names;
  WIN32_FIND_DATAW found;
  HANDLE h = FindFirstFileW((TempDir() + L"TKF*.txt").c_str(), &found);
  if (h == INVALID_HANDLE_VALUE) return names;
  do names.insert(found.cFileName);
  while (FindNextFileW(h, &found));
  FindClose(h);
  return names;
}

namespace {
// The stand-in stamps its job with the time of writing; all else is fixed.
std::string WithoutDate(std::string job) {
  size_t at = job.find("\r\nDATE,");
  if (at != std::string::npos) job.erase(at, job.find("\r\n", at + 2) - at);
  return job;
}
}  // namespace

bool IsStandInJob(const std::vector<char>& bytes) {
  return !bytes.empty() &&
         WithoutDate(std::string(bytes.begin(), bytes.end())) == WithoutDate(standin::MakeSurveyJob(0));
}
