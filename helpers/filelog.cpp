#include "helpers/filelog.h"

#include <oaidl.h>
#include <oleauto.h>

#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <iostream>
#include <mutex>
#include <vector>

#include "base/boundary.h"
#include "base/com_base.h"
#include "base/win_handles.h"
#include "helpers/error_reporter.h"

namespace kld::ft {

namespace test_only {
void (*BeforeFilelogRetry)() = nullptr;
}

namespace {

win::UniqueFile logFile;
std::string logPath;
std::atomic<unsigned> outputMode{3};
std::atomic<unsigned> logLevel{255};
std::mutex logMutex;

CFilelogStreamBufferT<char> clogBuffer;
CFilelogStreamBufferT<wchar_t> wclogBuffer;
std::streambuf* savedClog = nullptr;
std::wstreambuf* savedWclog = nullptr;

// The streams outlive this module's buffers: give them back before those go.
struct StreamGuard {
  ~StreamGuard() { RestoreLogStreams(); }
} streamGuard;

void WriteRaw(HANDLE target, const std::string& bytes) {
  DWORD written = 0;
  WriteFile(target, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
}

std::string FormatA(const char* format, va_list args) {
  if (!format) return {};
  va_list copy;
  va_copy(copy, args);
  int length = std::vsnprintf(nullptr, 0, format, copy);
  va_end(copy);
  if (length <= 0) return {};
  std::string text(static_cast<size_t>(length) + 1, '\0');
  std::vsnprintf(text.data(), text.size(), format, args);
  text.resize(static_cast<size_t>(length));
  return text;
}

std::wstring FormatW(const wchar_t* format, va_list args) {
  if (!format) return {};
  std::vector<wchar_t> buffer(256);
  for (;;) {
    va_list copy;
    va_copy(copy, args);
    int length = std::vswprintf(buffer.data(), buffer.size(), format, copy);
    va_end(copy);
    if (length >= 0) return std::wstring(buffer.data(), static_cast<size_t>(length));
    if (buffer.size() >= (1u << 24)) return {};
    buffer.resize(buffer.size() * 4);
  }
}

std::wstring SystemDescription(HRESULT code) {
  win::UniqueLocal buffer;
  DWORD length = FormatMessageW(FORMAT_MESSAGE_FROM_SYSTEM | FORMAT_MESSAGE_ALLOCATE_BUFFER |
                                    FORMAT_MESSAGE_IGNORE_INSERTS,
                                nullptr, static_cast<DWORD>(code), 0, reinterpret_cast<LPWSTR>(buffer.Put()), 0, nullptr);
  std::wstring text(buffer && length ? std::wstring(static_cast<const wchar_t*>(buffer.Get()), length) : std::wstring());
  text.resize(text.size() >= 2 ? text.size() - 2 : 0);
  return text;
}

std::wstring ErrorInfoDescription() {
  com::ComPtr<IErrorInfo> info;
  if (GetErrorInfo(0, info.Put()) != S_OK || !info) return {};
  win::UniqueBstr description;
  if (FAILED(info->GetDescription(description.Put())) || !description) return {};
  return std::wstring(description.Get(), SysStringLen(description.Get()));
}

}  // namespace

std::string NarrowText(const std::wstring& text) {
  if (text.empty()) return {};
  int size = WideCharToMultiByte(CP_ACP, 0, text.data(), static_cast<int>(text.size()), nullptr, 0,
                                 nullptr, nullptr);
  if (size <= 0) return {};
  std::string narrow(static_cast<size_t>(size), '\0');
  WideCharToMultiByte(CP_ACP, 0, text.data(), static_cast<int>(text.size()), narrow.data(), size,
                      nullptr, nullptr);
  return narrow;
}

std::string LogEntryPrefix() {
  SYSTEMTIME time;
  GetSystemTime(&time);
  char prefix[64];
  std::snprintf(prefix, sizeof prefix, "%02u:%02u:%02u.%04u %6u ", time.wHour, time.wMinute,
                time.wSecond, time.wMilliseconds, static_cast<unsigned>(GetCurrentThreadId()));
  return prefix;
}

void WriteLogEntry(const std::string& prefix, const std::string& text) {
  boundary::CallVoid([&] {
    std::vector<std::string> lines;
    size_t begin = 0;
    while (begin < text.size()) {
      size_t end = text.find_first_of("\r\n", begin);
      if (end == std::string::npos) end = text.size();
      if (end > begin) lines.push_back(text.substr(begin, end - begin));
      begin = end + 1;
    }
    if (lines.empty()) return;
    const unsigned mode = outputMode.load();
    const std::string indent(prefix.size(), ' ');
    std::lock_guard<std::mutex> lock(logMutex);
    HANDLE console = GetStdHandle(STD_OUTPUT_HANDLE);
    for (size_t i = 0; i < lines.size(); ++i) {
      const std::string line = lines[i] + "\r\n";
      if (mode & 1) {
        WriteRaw(logFile.Get(), i == 0 ? prefix : indent);
        WriteRaw(logFile.Get(), line);
      }
      if (mode & 4) WriteRaw(console, line);
    }
  });
}

bool StartFilelog(const wchar_t* name, bool restart) {
  if (logFile) {
    if (!restart) return false;
    StopFilelog();
  }
  const std::wstring base(name ? name : L"");
  wchar_t temp[MAX_PATH] = {};
  GetTempPathW(MAX_PATH, temp);
  const std::wstring folder(temp);

  // The whole rotation: earlier logs of this name go, unless someone holds them open.
  WIN32_FIND_DATAW found;
  if (win::UniqueFind search(FindFirstFileW((folder + base + L"_*.log").c_str(), &found)); search) {
    do {
      DeleteFileW((folder + found.cFileName).c_str());
    } while (FindNextFileW(search.Get(), &found));
  }
  CreateDirectoryW(folder.c_str(), nullptr);

  const std::wstring path = folder + base + L"_" + std::to_wstring(GetCurrentProcessId()) + L".log";
  const auto create = [&] {
    logFile.Reset(CreateFileW(path.c_str(), GENERIC_WRITE, FILE_SHARE_READ, nullptr, CREATE_ALWAYS,
                              FILE_ATTRIBUTE_NORMAL, nullptr));
  };
  create();
  if (!logFile) {
    Sleep(1);
    if (test_only::BeforeFilelogRetry) test_only::BeforeFilelogRetry();
    create();
  }
  logPath = NarrowText(path);
  return true;
}

void StopFilelog() {
  RestoreLogStreams();
  logFile.Reset();
}

std::string FilelogPath() { return logPath; }

void RedirectLogStreams() {
  if (!savedClog) savedClog = std::clog.rdbuf(&clogBuffer);
  if (!savedWclog) savedWclog = std::wclog.rdbuf(&wclogBuffer);
}

void RestoreLogStreams() {
  if (savedClog) std::clog.rdbuf(savedClog);
  if (savedWclog) std::wclog.rdbuf(savedWclog);
  savedClog = nullptr;
  savedWclog = nullptr;
}

void WriteLogText(const std::string& text) { WriteLogEntry(LogEntryPrefix(), text); }

void WriteLogText(const std::wstring& text) { WriteLogEntry(LogEntryPrefix(), NarrowText(text)); }

void LogTextA(const char* format, ...) {
  if (!logFile) return;
  va_list args;
  va_start(args, format);
  boundary::CallVoid([&] { WriteLogEntry(LogEntryPrefix(), FormatA(format, args)); });
  va_end(args);
}

void LogTextW(const wchar_t* format, ...) {
  va_list args;
  va_start(args, format);
  boundary::CallVoid([&] { WriteLogEntry(LogEntryPrefix(), NarrowText(FormatW(format, args))); });
  va_end(args);
}

void LogError(const char* file, int line, const wchar_t* text, HRESULT code, ...) {
  va_list args;
  va_start(args, code);
  const std::wstring message = boundary::CallOr(std::wstring(), [&] { return FormatW(text ? text : L"", args); });
  va_end(args);
  boundary::CallVoid([&] {
    char head[64];
    std::snprintf(head, sizeof head, " - 0x%08X (", static_cast<unsigned>(code));
    std::string entry = NarrowText(message) + head + (file ? file : "") + ", " +
                        std::to_string(line) + ")";
    std::wstring internal;
    for (size_t i = 0; i < ErrorReporterCount() && internal.empty(); ++i) {
      internal = ErrorReporterAt(i)->GetErrorText(code, nullptr, nullptr, nullptr);
    }
    const std::pair<const char*, std::wstring> details[] = {
        {"\r\nInternal description: ", internal},
        {"\r\nSystem description: ", SystemDescription(code)},
        {"\r\nIErrorInfo description: ", ErrorInfoDescription()},
    };
    for (const auto& [label, description] : details) {
      if (!description.empty()) entry += label + NarrowText(description);
    }
    WriteLogEntry(LogEntryPrefix(), entry);
  });
}

unsigned SetFilelogMode(unsigned mode) { return outputMode.exchange(mode); }
unsigned SetFilelogLevel(unsigned level) { return logLevel.exchange(level); }
unsigned GetFilelogLevel() { return logLevel.load(); }

}  // namespace kld::ft
