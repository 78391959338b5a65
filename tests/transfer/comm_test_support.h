// Drives the download dialog as a person would, from a second thread, against the
// stand-in library beside the test program.
#pragma once
#include <windows.h>
#include <functional>
#include <string>
#include <vector>

namespace commtest {

std::wstring ProgramFolder();  // with a trailing backslash

// Writes MarlixComm.txt beside the program and empties MarlixComm.log.
void ConfigureStandIn(const std::string& settings);
std::vector<std::string> StandInLog();
void AppendStandInLog(const std::string& line);

// Runs `script` on a second thread while this thread runs `modal`. Whatever the script
// leaves open is closed by force afterwards, so a failing test cannot hang.
INT_PTR RunWithDriver(const std::function<INT_PTR()>& modal, const std::function<void()>& script);

// Driver calls; every wait gives up after 10 s.
HWND WaitForDialog();
std::wstring ControlText(HWND dialog, int id);
bool WaitForControlText(HWND dialog, int id, const std::wstring& text);
void Click(HWND dialog, int id);
HWND WaitForMessageBox(HWND owner);  // null if none came
std::wstring MessageBoxText(HWND box);
void PressOk(HWND box);
bool WaitUntilGone(HWND window);

// Copies this program (and a DLL as MarlixComm.dll, unless empty) into a folder of its
// own and runs the one test `filter` there. Its exit code, or -1.
int RunCopyOfProgram(const std::wstring& folderName, const std::wstring& dll, const std::string& filter);

}  // namespace commtest
