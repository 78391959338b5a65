// Helpers for tests that drive the download dialog as a person would, from a second
// thread, against the stand-in library beside the test program.
#pragma once
#include <windows.h>
#include <functional>
#include <string>
#include <vector>

namespace commtest {

// The folder of this test program, with a trailing backslash.
std::wstring ProgramFolder();

// Writes MarlixComm.txt beside the program and empties MarlixComm.log.
void ConfigureStandIn(const std::string& settings);
// The lines of MarlixComm.log.
std::vector<std::string> StandInLog();
void AppendStandInLog(const std::string& line);

// Runs `script` on a second thread while the calling thread runs `modal`; returns what
// `modal` returned. If the script ends with the dialog still open, or a wait times out,
// the dialog is closed by force so the test cannot hang.
INT_PTR RunWithDriver(const std::function<INT_PTR()>& modal, const std::function<void()>& script);

// Calls from the driver thread. Waits give up after `timeoutMs`.
HWND WaitForDialog(DWORD timeoutMs = 10000);
std::wstring ControlText(HWND dialog, int id);
bool WaitForControlText(HWND dialog, int id, const std::wstring& text, DWORD timeoutMs = 10000);
void Click(HWND dialog, int id);
// A message box owned by `owner`, or null after the timeout.
HWND WaitForMessageBox(HWND owner, DWORD timeoutMs = 10000);
std::wstring MessageBoxText(HWND box);
void PressOk(HWND box);
bool WaitUntilGone(HWND window, DWORD timeoutMs = 10000);

// Copies this program (and optionally a DLL as MarlixComm.dll) into a new folder, runs the
// one test `filter` there and returns its exit code (-1 if it could not run or hung).
int RunCopyOfProgram(const std::wstring& folderName, const std::wstring& dllToCopy,
                     const std::string& filter);

// Whether the named file exists.
bool FileExistsAt(const std::wstring& path);
ULONGLONG FileSizeAt(const std::wstring& path);

}  // namespace commtest
