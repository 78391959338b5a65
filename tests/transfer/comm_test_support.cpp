#include "transfer/comm_test_support.h"

#include "transfer/download_dialog.h"

namespace commtest {

namespace {
template <class Condition>
bool WaitFor(Condition condition) {
  for (ULONGLONG end = GetTickCount64() + 10000; !condition(); Sleep(20))
    if (GetTickCount64() > end) return false;
  return true;
}

void WriteWholeFile(const std::wstring& path, const std::string& bytes, DWORD disposition) {
  HANDLE file = CreateFileW(path.c_str(), disposition == OPEN_ALWAYS ? FILE_APPEND_DATA : GENERIC_WRITE,
                            FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, disposition, 0, nullptr);
  if (file == INVALID_HANDLE_VALUE) return;
  DWORD written = 0;
  WriteFile(file, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
  CloseHandle(file);
}

HWND OwnedBox(HWND owner) {
  struct Search { HWND owner, found; } search{owner, nullptr};
  EnumWindows([](HWND window, LPARAM param) -> BOOL {
    auto* s = reinterpret_cast<Search*>(param);
    wchar_t name[16] = {};
    GetClassNameW(window, name, 16);
    if (window == s->owner || GetWindow(window, GW_OWNER) != s->owner || wcscmp(name, L"#32770")) return TRUE;
    s->found = window;
    return FALSE;
  }, reinterpret_cast<LPARAM>(&search));
  return search.found;
}

DWORD WINAPI DriverThread(void* script) {
  (*static_cast<const std::function<void()>*>(script))();
  HWND dialog = DownloadDialogWindow;
  if (!dialog || WaitUntilGone(dialog)) return 0;
  for (HWND box; (box = OwnedBox(dialog)) != nullptr; Sleep(100)) PressOk(box);
  PostMessageW(dialog, WM_COMMAND, IDOK, 0);
  return 0;
}
}  // namespace

std::wstring ProgramFolder() {
  wchar_t path[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, path, MAX_PATH);
  std::wstring folder(path);
  return folder.substr(0, folder.find_last_of(L"\\/") + 1);
}

void ConfigureStandIn(const std::string& settings) {
  WriteWholeFile(ProgramFolder() + L"MarlixComm.txt", settings, CREATE_ALWAYS);
  WriteWholeFile(ProgramFolder() + L"MarlixComm.log", "", CREATE_ALWAYS);
}

void AppendStandInLog(const std::string& line) {
  WriteWholeFile(ProgramFolder() + L"MarlixComm.log", line + "\r\n", OPEN_ALWAYS);
}

std::vector<std::string> StandInLog() {
  std::vector<std::string> lines;
  HANDLE file = CreateFileW((ProgramFolder() + L"MarlixComm.log").c_str(), GENERIC_READ,
                            FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, OPEN_EXISTING, 0, nullptr);
  if (file == INVALID_HANDLE_VALUE) return lines;
  std::string text;
  char buffer[4096];
  for (DWORD read = 0; ReadFile(file, buffer, sizeof buffer, &read, nullptr) && read > 0;) text.append(buffer, read);
  CloseHandle(file);
  for (size_t start = 0, end; start < text.size(); start = end + 2) {
    end = text.find("\r\n", start);
    if (end == std::string::npos) end = text.size();
    lines.push_back(text.substr(start, end - start));
  }
  return lines;
}

INT_PTR RunWithDriver(const std::function<INT_PTR()>& modal, const std::function<void()>& script) {
  HANDLE driver = CreateThread(nullptr, 0, DriverThread, const_cast<std::function<void()>*>(&script), 0, nullptr);
  INT_PTR result = modal();
  if (driver && WaitForSingleObject(driver, 30000) != WAIT_OBJECT_0) TerminateThread(driver, 1);
  if (driver) CloseHandle(driver);
  return result;
}

HWND WaitForDialog() {
  HWND dialog = nullptr;
  return WaitFor([&] { return (dialog = DownloadDialogWindow) && IsWindowVisible(dialog); }) ? dialog : nullptr;
}

std::wstring ControlText(HWND dialog, int id) {
  wchar_t text[2048] = {};
  GetDlgItemTextW(dialog, id, text, 2048);
  return text;
}

bool WaitForControlText(HWND dialog, int id, const std::wstring& text) {
  return WaitFor([&] { return ControlText(dialog, id) == text; });
}

void Click(HWND dialog, int id) { PostMessageW(GetDlgItem(dialog, id), BM_CLICK, 0, 0); }

HWND WaitForMessageBox(HWND owner) {
  HWND box = nullptr;
  WaitFor([&] { return (box = OwnedBox(owner)) != nullptr && IsWindowVisible(box); });
  return box;
}

std::wstring MessageBoxText(HWND box) { return ControlText(box, 0xFFFF); }

void PressOk(HWND box) { PostMessageW(box, WM_COMMAND, IDOK, 0); }

bool WaitUntilGone(HWND window) { return WaitFor([&] { return !IsWindow(window); }); }

int RunCopyOfProgram(const std::wstring& folderName, const std::wstring& dll, const std::string& filter) {
  wchar_t temp[MAX_PATH] = {}, self[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, temp);
  GetModuleFileNameW(nullptr, self, MAX_PATH);
  std::wstring folder = temp + (L"marlix_" + folderName) + std::to_wstring(GetCurrentProcessId()) + L"\\";
  CreateDirectoryW(folder.c_str(), nullptr);
  std::wstring program = folder + L"comm_tests_copy.exe";
  int exitCode = -1;
  if (CopyFileW(self, program.c_str(), FALSE) &&
      (dll.empty() || CopyFileW(dll.c_str(), (folder + L"MarlixComm.dll").c_str(), FALSE))) {
    std::wstring commandLine = L"\"" + program + L"\" --gtest_also_run_disabled_tests --gtest_filter=" +
                               std::wstring(filter.begin(), filter.end());
    STARTUPINFOW startup{sizeof startup};
    PROCESS_INFORMATION process{};
    if (CreateProcessW(program.c_str(), commandLine.data(), nullptr, nullptr, FALSE, 0, nullptr,
                       folder.c_str(), &startup, &process)) {
      DWORD code = 0;
      if (WaitForSingleObject(process.hProcess, 60000) == WAIT_OBJECT_0 &&
          GetExitCodeProcess(process.hProcess, &code))
        exitCode = static_cast<int>(code);
      else TerminateProcess(process.hProcess, 99);
      CloseHandle(process.hThread);
      CloseHandle(process.hProcess);
    }
  }
  Sleep(200);  // let the copy's image go before deleting it
  for (const wchar_t* name : {L"comm_tests_copy.exe", L"MarlixComm.dll", L"MarlixComm.log", L"MarlixComm.txt"})
    DeleteFileW((folder + name).c_str());
  RemoveDirectoryW(folder.c_str());
  return exitCode;
}

}  // namespace commtest
