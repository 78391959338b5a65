// Shared by the data object tests and the clipboard driver: item lists built byte by
// byte, and a helper thread that works the download dialog like a user.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <atomic>
#include <functional>
#include <set>
#include <string>
#include <thread>
#include <vector>

// A full list: root, level and (optionally) the virtual file, from the task allocator.
LPITEMIDLIST MakeFullList(const std::wstring& level, bool withFile);

// Waits on a helper thread for the download dialog of `dialogThread`, runs `whileOpen`
// there, then clicks `button` (220 Start or 2 Cancel). Whatever of that thread is still
// open after the limit (the dialog, a message box) is dismissed, so no test can hang.
class DialogDriver {
 public:
  DialogDriver(DWORD dialogThread, int button, std::function<void(HWND)> whileOpen = {},
               DWORD limitMs = 30000);
  ~DialogDriver() { Finish(); }
  // Joins the thread; true if the dialog came up and was clicked.
  bool Finish();
  bool DialogSeen() const { return seen_; }

 private:
  void Run(DWORD dialogThread, int button, DWORD limitMs);

  std::function<void(HWND)> whileOpen_;
  std::atomic<bool> stop_{false}, seen_{false}, clicked_{false};
  std::thread thread_;
};

// Whether the bytes are the job the stand-in instrument library sends.
bool IsStandInJob(const std::vector<char>& bytes);

// Points this process's temporary folder (TMP, TEMP) at a fresh folder of its own for its
// lifetime, so downloads of test programs running side by side never meet.
class PrivateTempDir {
 public:
  PrivateTempDir();
  ~PrivateTempDir();
  PrivateTempDir(const PrivateTempDir&) = delete;
  PrivateTempDir& operator=(const PrivateTempDir&) = delete;

 private:
  std::wstring dir_, oldTmp_, oldTemp_;
};

std::wstring TempDir();
bool FileExists(const std::wstring& path);
// Names of the TKF*.txt files in the temporary folder, as downloads leave them.
std::set<std::wstring> TransferFiles();
