#include "data_test_support.h"

#include <chrono>
#include <cstring>
#include <vector>


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

bool IsDialogClass(HWND w) {
  wchar_t cls[16] = {};
  GetClassNameW(w, cls, 16);
  return std::wcscmp(cls, L"#32770") == 0;
}

bool IsDownloadDialog(HWND w) {
  wchar_t title[64] = {};
  GetWindowTextW(w, title, 64);
  return IsDialogClass(w) && std::wcscmp(title, L"Download file from Digital Level") == 0;
}

BOOL CALLBACK FindDialog(HWND w, LPARAM found) {
  if (!IsWindowVisible(w) || !IsDownloadDialog(w)) return TRUE;
  *reinterpret_cast<HWND*>(found) = w;
  return FALSE;
}

// Cancel for the dialog, OK for a message box.
BOOL CALLBACK DismissOne(HWND w, LPARAM) {
  if (!IsWindowVisible(w) || !IsDialogClass(w)) return TRUE;
  PostMessageW(w, WM_COMMAND, IsDownloadDialog(w) ? IDCANCEL : IDOK, 0);
  return TRUE;
}

}  // namespace

LPITEMIDLIST MakeFullList(const std::wstring& level, bool withFile) {
  std::vector<BYTE> bytes;
  AppendId(bytes, 1, L"Marlix Digital Levels");
  AppendId(bytes, 2, level);
  if (withFile) AppendId(bytes, 3, L"file1.tkf");
  bytes.push_back(0);
  bytes.push_back(0);
  auto* list = static_cast<LPITEMIDLIST>(CoTaskMemAlloc(bytes.size()));
  std::memcpy(list, bytes.data(), bytes.size());
  return list;
}

DialogDriver::DialogDriver(DWORD dialogThread, int button, std::function<void(HWND)> whileOpen,
                           DWORD limitMs)
    : whileOpen_(std::move(whileOpen)) {
  thread_ = std::thread([=, this] { Run(dialogThread, button, limitMs); });
}

DialogDriver::~DialogDriver() { Finish(); }

bool DialogDriver::Finish() {
  stop_ = true;
  if (thread_.joinable()) thread_.join();
  return clicked_;
}

void DialogDriver::Run(DWORD dialogThread, int button, DWORD limitMs) {
  using Clock = std::chrono::steady_clock;
  const auto start = Clock::now();
  const auto deadline = start + std::chrono::milliseconds(limitMs);
  HWND dialog = nullptr;
  while (!stop_ && Clock::now() < deadline) {
    EnumThreadWindows(dialogThread, FindDialog, reinterpret_cast<LPARAM>(&dialog));
    if (dialog) break;
    Sleep(10);
  }
  if (dialog) {
    msToDialog_ = std::chrono::duration<double, std::milli>(Clock::now() - start).count();
    seen_ = true;
    if (whileOpen_) whileOpen_(dialog);
    if (HWND b = GetDlgItem(dialog, button)) {
      SendMessageW(b, BM_CLICK, 0, 0);
      clicked_ = true;
    }
  }
  // Until released: anything of the dialog's thread that outlives the limit is dismissed.
  while (!stop_) {
    if (Clock::now() >= deadline) EnumThreadWindows(dialogThread, DismissOne, 0);
    Sleep(50);
  }
}

std::wstring TempDir() {
  wchar_t dir[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, dir);
  return dir;
}

bool FileExists(const std::wstring& path) {
  return GetFileAttributesW(path.c_str()) != INVALID_FILE_ATTRIBUTES;
}

std::wstring ListTransferFiles() {
  std::wstring names;
  WIN32_FIND_DATAW found;
  HANDLE h = FindFirstFileW((TempDir() + L"TKF*.txt").c_str(), &found);
  if (h == INVALID_HANDLE_VALUE) return names;
  do {
    names += found.cFileName;
    names += L";";
  } while (FindNextFileW(h, &found));
  FindClose(h);
  return names;
}
