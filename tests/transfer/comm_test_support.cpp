#include "transfer/comm_test_support.h"

#include "transfer/download_dialog.h"

namespace commtest {

namespace {
constexpr DWORD kPollMs = 20;

std::wstring StandInFile(const wchar_t* name) { return ProgramFolder() + name; }

void WriteWholeFile(const std::wstring& path, const std::string& bytes) {
  HANDLE file = CreateFileW(path.c_str(), GENERIC_WRITE, FILE_SHARE_READ, nullptr, CREATE_ALWAYS,
                            FILE_ATTRIBUTE_NORMAL, nullptr);
  if (file == INVALID_HANDLE_VALUE) return;
  DWORD written = 0;
  WriteFile(file, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
  CloseHandle(file);
}

template <class Condition>
bool WaitFor(Condition condition, DWORD timeoutMs) {
  ULONGLONG end = GetTickCount64() + timeoutMs;
  while (!condition()) {
    if (GetTickCount64() > end) return false;
    Sleep(kPollMs);
  }
  return true;
}

struct BoxSearch {
  HWND owner;
  HWND found;
};

BOOL CALLBACK FindOwnedBox(HWND window, LPARAM param) {
  auto* search = reinterpret_cast<BoxSearch*>(param);
  wchar_t className[16] = {};
  GetClassNameW(window, className, 16);
  if (window != search->owner && GetWindow(window, GW_OWNER) == search->owner &&
      wcscmp(className, L"#32770") == 0 && IsWindowVisible(window)) {
    search->found = window;
    return FALSE;
  }
  return TRUE;
}

HWND OwnedBox(HWND owner) {
  BoxSearch search{owner, nullptr};
  EnumWindows(FindOwnedBox, reinterpret_cast<LPARAM>(&search));
  return search.found;
}

// Ends whatever the script left open: message boxes first, then the dialog.
void ForceClose() {
  HWND dialog = DownloadDialogWindow;
  if (!dialog) return;
  for (int i = 0; i < 5; ++i) {
    HWND box = OwnedBox(dialog);
    if (!box) break;
    PressOk(box);
    Sleep(100);
  }
  PostMessageW(dialog, WM_COMMAND, IDOK, 0);
}

struct DriverContext {
  const std::function<void()>* script;
};

DWORD WINAPI DriverThread(void* param) {
  auto* context = static_cast<DriverContext*>(param);
  (*context->script)();
  HWND dialog = DownloadDialogWindow;
  if (dialog && !WaitUntilGone(dialog, 10000)) ForceClose();
  return 0;
}
}  // namespace

std::wstring ProgramFolder() {
  wchar_t path[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, path, MAX_PATH);
  std::wstring folder(path);
  folder.resize(folder.find_last_of(L"\\/") + 1);
  return folder;
}

void ConfigureStandIn(const std::string& settings) {
  WriteWholeFile(StandInFile(L"MarlixComm.txt"), settings);
  WriteWholeFile(StandInFile(L"MarlixComm.log"), "");
}

std::vector<std::string> StandInLog() {
  std::vector<std::string> lines;
  HANDLE file = CreateFileW(StandInFile(L"MarlixComm.log").c_str(), GENERIC_READ,
                            FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, OPEN_EXISTING, 0, nullptr);
  if (file == INVALID_HANDLE_VALUE) return lines;
  std::string text;
  char buffer[4096];
  DWORD read = 0;
  while (ReadFile(file, buffer, sizeof buffer, &read, nullptr) && read > 0) text.append(buffer, read);
  CloseHandle(file);
  size_t start = 0;
  while (start < text.size()) {
    size_t end = text.find("\r\n", start);
    if (end == std::string::npos) end = text.size();
    lines.push_back(text.substr(start, end - start));
    start = end + 2;
  }
  return lines;
}

void AppendStandInLog(const std::string& line) {
  HANDLE file = CreateFileW(StandInFile(L"MarlixComm.log").c_str(), FILE_APPEND_DATA,
                            FILE_SHARE_READ | FILE_SHARE_WRITE, nullptr, OPEN_ALWAYS, 0, nullptr);
  if (file == INVALID_HANDLE_VALUE) return;
  std::string text = line + "\r\n";
  DWORD written = 0;
  WriteFile(file, text.data(), static_cast<DWORD>(text.size()), &written, nullptr);
  CloseHandle(file);
}

INT_PTR RunWithDriver(const std::function<INT_PTR()>& modal, const std::function<void()>& script) {
  DriverContext context{&script};
  HANDLE driver = CreateThread(nullptr, 0, DriverThread, &context, 0, nullptr);
  INT_PTR result = modal();
  if (driver) {
    if (WaitForSingleObject(driver, 30000) != WAIT_OBJECT_0) TerminateThread(driver, 1);
    CloseHandle(driver);
  }
  return result;
}

HWND WaitForDialog(DWORD timeoutMs) {
  HWND dialog = nullptr;
  WaitFor([&] {
    dialog = DownloadDialogWindow;
    return dialog && IsWindowVisible(dialog);
  }, timeoutMs);
  return dialog && IsWindowVisible(dialog) ? dialog : nullptr;
}

std::wstring ControlText(HWND dialog, int id) {
  wchar_t text[2048] = {};
  GetDlgItemTextW(dialog, id, text, 2048);
  return text;
}

bool WaitForControlText(HWND dialog, int id, const std::wstring& text, DWORD timeoutMs) {
  return WaitFor([&] { return ControlText(dialog, id) == text; }, timeoutMs);
}

void Click(HWND dialog, int id) { PostMessageW(GetDlgItem(dialog, id), BM_CLICK, 0, 0); }

HWND WaitForMessageBox(HWND owner, DWORD timeoutMs) {
  HWND box = nullptr;
  WaitFor([&] { return (box = OwnedBox(owner)) != nullptr; }, timeoutMs);
  return box;
}

std::wstring MessageBoxText(HWND box) { return ControlText(box, 0xFFFF); }

void PressOk(HWND box) { PostMessageW(box, WM_COMMAND, IDOK, 0); }

bool WaitUntilGone(HWND window, DWORD timeoutMs) {
  return WaitFor([&] { return !IsWindow(window); }, timeoutMs);
}

int RunCopyOfProgram(const std::wstring& folderName, const std::wstring& dllToCopy,
                     const std::string& filter) {
  wchar_t temp[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, temp);
  std::wstring folder = std::wstring(temp) + L"marlix_" + folderName + L"_" +
                        std::to_wstring(GetCurrentProcessId()) + L"\\";
  CreateDirectoryW(folder.c_str(), nullptr);
  wchar_t self[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, self, MAX_PATH);
  std::wstring program = folder + L"comm_tests_copy.exe";
  if (!CopyFileW(self, program.c_str(), FALSE)) return -1;
  std::wstring library = folder + L"MarlixComm.dll";
  if (!dllToCopy.empty() && !CopyFileW(dllToCopy.c_str(), library.c_str(), FALSE)) return -1;

  std::wstring commandLine = L"\"" + program + L"\" --gtest_also_run_disabled_tests --gtest_filter=" +
                             std::wstring(filter.begin(), filter.end());
  STARTUPINFOW startup{};
  startup.cb = sizeof startup;
  PROCESS_INFORMATION process{};
  int exitCode = -1;
  if (CreateProcessW(program.c_str(), commandLine.data(), nullptr, nullptr, FALSE, 0, nullptr,
                     folder.c_str(), &startup, &process)) {
    if (WaitForSingleObject(process.hProcess, 60000) == WAIT_OBJECT_0) {
      DWORD code = 0;
      GetExitCodeProcess(process.hProcess, &code);
      exitCode = static_cast<int>(code);
    } else {
      TerminateProcess(process.hProcess, 99);
      WaitForSingleObject(process.hProcess, 5000);
    }
    CloseHandle(process.hThread);
    CloseHandle(process.hProcess);
  }
  for (const wchar_t* name : {L"comm_tests_copy.exe", L"MarlixComm.dll", L"MarlixComm.log", L"MarlixComm.txt"})
    DeleteFileW((folder + name).c_str());
  RemoveDirectoryW(folder.c_str());
  return exitCode;
}

bool FileExistsAt(const std::wstring& path) {
  return GetFileAttributesW(path.c_str()) != INVALID_FILE_ATTRIBUTES;
}

ULONGLONG FileSizeAt(const std::wstring& path) {
  WIN32_FILE_ATTRIBUTE_DATA data{};
  if (!GetFileAttributesExW(path.c_str(), GetFileExInfoStandard, &data)) return 0;
  return (static_cast<ULONGLONG>(data.nFileSizeHigh) << 32) | data.nFileSizeLow;
}

}  // namespace commtest
