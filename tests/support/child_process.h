// Another program started by a test, waited for with a deadline and never left running.
#pragma once
#include <windows.h>
#include <string>
#include <vector>
namespace child {
// The program is started at construction with its arguments (quoted where they hold a blank),
// the caller's environment and no window of its own, its output written to the file `output`
// if one is named; it is ended at destruction if still running.
class Process {
 public:
  Process(const std::wstring& program, const std::vector<std::wstring>& arguments, const std::wstring& output = {});
  ~Process();
  Process(const Process&) = delete;
  Process& operator=(const Process&) = delete;
  bool Started() const { return process_ != nullptr; }
  HANDLE Handle() const { return process_; }
  // Waits until the program ends, at most `milliseconds`; past the deadline it is ended and
  // false comes back.
  bool Wait(DWORD milliseconds);
  // The program's exit code, or kNotEnded while it runs (or never started).
  DWORD ExitCode() const;
  void Kill();
  static constexpr DWORD kNotEnded = STILL_ACTIVE;
  static constexpr DWORD kKilled = 0xDEAD;
 private:
  HANDLE process_ = nullptr;
};
// Starts the program, waits for it, and gives its exit code (kKilled past the deadline).
DWORD Run(const std::wstring& program, const std::vector<std::wstring>& arguments, DWORD milliseconds);
// The running test program's own path, to start copies of it.
std::wstring SelfPath();
}  // namespace child
