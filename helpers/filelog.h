// The support library's diagnostic log: one narrow text file per process in the
// temporary folder, closed unless a component starts it.
#pragma once
#include <windows.h>
#include <cstdarg>
#include <streambuf>
#include <string>

namespace kld::ft {

// Opens "<name>_<pid>.log" in the temporary folder after deleting every earlier
// "<name>_*.log". False if a log is already open and `restart` is false.
bool StartFilelog(const wchar_t* name, bool restart);
void StopFilelog();
// The full path of the log file, empty before the first start.
std::string FilelogPath();

// Puts log buffers under std::clog and std::wclog; StopFilelog restores the former ones.
// Only the tests use them, so they live in the support library, outside the module.
void RedirectLogStreams();
void RestoreLogStreams();

// One entry stamped with UTC time and thread id. Wide strings in formats take %ls. LogTextA is skipped while no file is
// open; LogTextW always writes, and a write without a file simply fails.
void LogTextA(const char* format, ...);
void LogTextW(const wchar_t* format, ...);
// "<message> - 0x<code> (<file>, <line>)" and the descriptions that are known.
void LogError(const char* file, int line, const wchar_t* text, HRESULT code, ...);

// Bit 0 writes to the file, bit 2 to standard output. Both return the former value.
unsigned SetFilelogMode(unsigned mode);
unsigned SetFilelogLevel(unsigned level);
unsigned GetFilelogLevel();

// The writer of every entry: lines split at CR and LF, empty ones dropped, further
// lines indented by the prefix's width.
void WriteLogEntry(const std::string& prefix, const std::string& text);
std::string LogEntryPrefix();
std::string NarrowText(const std::wstring& text);
// printf-style text; wide strings in either width's format take %ls, narrow ones %hs.
std::string FormatText(const char* format, ...);
std::wstring FormatText(const wchar_t* format, ...);
std::string FormatTextV(const char* format, va_list args);
std::wstring FormatTextV(const wchar_t* format, va_list args);
// One entry with the current time, whether or not a file is open.
void WriteLogText(const std::string& text);
void WriteLogText(const std::wstring& text);

// Collects characters and writes them as one entry at each sync.
template <class Char>
class CFilelogStreamBufferT : public std::basic_streambuf<Char> {
  using Base = std::basic_streambuf<Char>;

 public:
  using int_type = typename Base::int_type;
  using traits_type = typename Base::traits_type;

 protected:
  int_type overflow(int_type c) override {
    if (traits_type::eq_int_type(c, traits_type::eof())) {
      sync();
      return traits_type::not_eof(c);
    }
    text_ += traits_type::to_char_type(c);
    return c;
  }
  int sync() override {
    WriteLogText(text_);
    text_.clear();
    return 0;
  }

 private:
  std::basic_string<Char> text_;
};

namespace test_only {
// Called between the two attempts to create the log file.
extern void (*BeforeFilelogRetry)();
// Set by RedirectLogStreams for StopFilelog: a module that never redirects links no stream code.
extern void (*RestoreStreams)();
}  // namespace test_only

// Header of machine and process facts.
void DumpSystemInfo();
void DumpLocaleInfo();
void DumpProcessMemoryInfo();
// "Version of module '<path>' is '<a.b.c.d>'", from the module's version resource.
void DumpModuleVersion(HMODULE module);
// "1.5Mb"-style sizes: divided by 1024 while above, unit from "KMGTPEZY".
std::string FormatByteSize(double bytes, const char* format = "%0.2f%sb");

}  // namespace kld::ft
