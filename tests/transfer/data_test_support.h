// Shared by the data object tests and the clipboard driver: item lists built byte by
// byte, and a helper thread that works the download dialog like a user.
#pragma once
#include <windows.h>
#include <shlobj.h>

#include <atomic>
#include <functional>
#include <string>
#include <thread>

// A full list: root, level and (optionally) the virtual file, from the task allocator.
LPITEMIDLIST MakeFullList(const std::wstring& level, bool withFile);

// Waits on a helper thread for the download dialog of this process, runs `whileOpen`
// there, then clicks `button` (220 Start or 2 Cancel). Whatever is still open after the
// time limit (the dialog, a message box) is dismissed so that no test can hang.
class DialogDriver {
 public:
  DialogDriver(DWORD dialogThread, int button, std::function<void(HWND)> whileOpen = {},
               DWORD limitMs = 20000);
  ~DialogDriver();
  DialogDriver(const DialogDriver&) = delete;
  DialogDriver& operator=(const DialogDriver&) = delete;

  // Joins the thread; true if the dialog appeared and was clicked before the limit.
  bool Finish();
  bool DialogSeen() const { return seen_; }
  // Milliseconds from construction to the dialog's first appearance.
  double MsToDialog() const { return msToDialog_; }

 private:
  void Run(DWORD dialogThread, int button, DWORD limitMs);

  std::function<void(HWND)> whileOpen_;
  std::atomic<bool> stop_{false};
  std::atomic<bool> seen_{false};
  std::atomic<bool> clicked_{false};
  double msToDialog_ = -1;
  std::thread thread_;
};

std::wstring TempDir();
bool FileExists(const std::wstring& path);
// Files in the temporary folder named TKF*.txt, as the download leaves them.
std::wstring ListTransferFiles();
