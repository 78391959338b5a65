// Shared by the data object tests and the clipboard driver.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <atomic>
#include <functional>
#include <set>
#include <string>
#include <thread>
#include <vector>

FORMATETC Request(const wchar_t* format, DWORD tymed, LONG index = -1);
// Item ids built byte by byte (size, type, text from byte 14), with the list's terminator.
std::vector<BYTE> IdList(std::initializer_list<std::pair<DWORD, std::wstring>> ids);
// A full list of root, level and (optionally) the virtual file, from the task allocator.
LPITEMIDLIST MakeFullList(const std::wstring& level, bool withFile);

// Works the download dialog of the calling thread from a helper thread: once it shows, runs
// `whileOpen` and clicks `button` (220 Start, IDCANCEL); Finish tells whether it did. Past the
// limit it cancels that thread's dialogs and confirms its message boxes, so no test can hang.
class DialogDriver {
 public:
  explicit DialogDriver(int button, std::function<void()> whileOpen = {}, DWORD limitMs = 30000);
  ~DialogDriver() { Finish(); }
  bool Finish() { stop_ = true; if (thread_.joinable()) thread_.join(); return clicked_; }
 private:
  std::function<void()> whileOpen_;
  std::atomic<bool> stop_{false}, clicked_{false};
  std::thread thread_;
};

// Reads up to the first short read; whether the bytes are the stand-in library's job.
std::vector<char> ReadAll(IStream* stream);
bool IsStandInJob(const std::vector<char>& bytes);

// The temporary folder: one of this process's own, made at start and removed at exit, so
// test programs running side by side never see each other's downloads.
std::wstring TempDir();
std::set<std::wstring> TransferFiles();  // the TKF*.txt files downloads leave there
