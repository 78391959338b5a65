#include "helpers/filelog.h"

#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <string_view>

#include "base/boundary.h"
#include "base/win_handles.h"
#include "helpers/format_text.h"

namespace kld::ft {

namespace test_only {
void (*BeforeFilelogRetry)() = nullptr;
void (*RestoreStreams)() = nullptr;
}

namespace {

win::UniqueFile logFile;
std::string logPath;
std::atomic<unsigned> outputMode{3};
std::atomic<unsigned> logLevel{255};
SRWLOCK logMutex = SRWLOCK_INIT;

void WriteRaw(HANDLE target, std::string_view bytes) {
  DWORD written = 0;
  WriteFile(target, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr);
}

// A continuation line is indented by the prefix's width; writing needs no memory.
void WriteBlanks(HANDLE target, size_t count) {
  static constexpr char kBlanks[] = "                                ";
  for (size_t step; count; count -= step) {
    step = count < sizeof kBlanks - 1 ? count : sizeof kBlanks - 1;
    WriteRaw(target, std::string_view(kBlanks, step));
  }
}

}  // namespace

std::string FormatTextV(const char* format, va_list args) { return format_detail::FormatV(format, args); }

std::string FormatText(const char* format, ...) {
  va_list args;
  va_start(args, format);
  std::string text = FormatTextV(format, args);
  va_end(args);
  return text;
}

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
  return FormatText("%02u:%02u:%02u.%04u %6u ", time.wHour, time.wMinute, time.wSecond, time.wMilliseconds,
                    static_cast<unsigned>(GetCurrentThreadId()));
}

void WriteLogEntry(const std::string& prefix, const std::string& text) {
  const unsigned mode = outputMode.load();
  win::ExclusiveLock lock(&logMutex);
  HANDLE console = GetStdHandle(STD_OUTPUT_HANDLE);
  bool first = true;
  for (size_t begin = 0; begin < text.size();) {
    size_t end = text.find_first_of("\r\n", begin);
    if (end == std::string::npos) end = text.size();
    if (end > begin) {
      // Empty lines are dropped; every other line gets the prefix or its width of blanks.
      const std::string_view line(text.data() + begin, end - begin);
      if (mode & 1) {
        if (first) {
          WriteRaw(logFile.Get(), prefix);
        } else {
          WriteBlanks(logFile.Get(), prefix.size());
        }
        WriteRaw(logFile.Get(), line);
        WriteRaw(logFile.Get(), "\r\n");
      }
      if (mode & 4) {
        WriteRaw(console, line);
        WriteRaw(console, "\r\n");
      }
      first = false;
    }
    begin = end + 1;
  }
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

  wchar_t processId[16] = {};
  _ultow(GetCurrentProcessId(), processId, 10);
  const std::wstring path = folder + base + L"_" + processId + L".log";
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
  if (test_only::RestoreStreams) test_only::RestoreStreams();
  logFile.Reset();
}

std::string FilelogPath() { return logPath; }

void LogTextA(const char* format, ...) {
  if (!logFile) return;
  va_list args;
  va_start(args, format);
  boundary::CallVoid([&] { WriteLogEntry(LogEntryPrefix(), FormatTextV(format, args)); });
  va_end(args);
}

unsigned SetFilelogMode(unsigned mode) { return outputMode.exchange(mode); }
unsigned SetFilelogLevel(unsigned level) { return logLevel.exchange(level); }
unsigned GetFilelogLevel() { return logLevel.load(); }

}  // namespace kld::ft
