// Starting and ending the programs a test drives beside itself, with a deadline on each wait.
#include "support/child_process.h"
namespace child {
Process::Process(const std::wstring& program, const std::vector<std::wstring>& arguments, const std::wstring& output) {
  std::wstring command = L"\"" + program + L"\"";
  for (const std::wstring& argument : arguments)
    command += argument.find(L' ') == std::wstring::npos ? L" " + argument : L" \"" + argument + L"\"";
  STARTUPINFOW startup{sizeof(startup)};
  SECURITY_ATTRIBUTES inherit{sizeof(inherit), nullptr, TRUE};
  HANDLE file = output.empty() ? INVALID_HANDLE_VALUE
                               : CreateFileW(output.c_str(), GENERIC_WRITE, FILE_SHARE_READ, &inherit, CREATE_ALWAYS, 0, nullptr);
  const bool redirect = file != INVALID_HANDLE_VALUE;
  if (redirect) startup.dwFlags = STARTF_USESTDHANDLES, startup.hStdOutput = startup.hStdError = file;
  PROCESS_INFORMATION info{};
  const BOOL started = CreateProcessW(program.c_str(), command.data(), nullptr, nullptr, redirect, 0, nullptr, nullptr,
                                      &startup, &info);
  if (redirect) CloseHandle(file);
  if (!started) return;
  CloseHandle(info.hThread);
  process_ = info.hProcess;
}
Process::~Process() {
  Kill();
  if (process_) CloseHandle(process_);
}
bool Process::Wait(DWORD milliseconds) {
  if (!process_) return false;
  if (WaitForSingleObject(process_, milliseconds) == WAIT_OBJECT_0) return true;
  Kill();
  return false;
}
DWORD Process::ExitCode() const {
  DWORD code = kNotEnded;
  if (process_) GetExitCodeProcess(process_, &code);
  return code;
}
void Process::Kill() {
  if (process_ && WaitForSingleObject(process_, 0) == WAIT_TIMEOUT) {
    TerminateProcess(process_, kKilled);
    WaitForSingleObject(process_, 5000);
  }
}
DWORD Run(const std::wstring& program, const std::vector<std::wstring>& arguments, DWORD milliseconds) {
  Process process(program, arguments);
  return process.Wait(milliseconds) ? process.ExitCode() : Process::kKilled;
}
std::wstring SelfPath() {
  wchar_t path[MAX_PATH] = {};
  GetModuleFileNameW(nullptr, path, MAX_PATH);
  return path;
}
}  // namespace child
