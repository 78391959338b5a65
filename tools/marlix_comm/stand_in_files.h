// The stand-in's control file and call log, both beside the stand-in DLL.
#pragma once
#include <windows.h>
#include <cstdarg>
#include <cstdio>
#include <map>
#include <string>

namespace standin {

// key=value lines of MarlixComm.txt; '#' starts a comment. Missing file: all defaults.
class Settings {
 public:
  static Settings Load();
  int Number(const std::string& key, int fallback) const;

 private:
  std::map<std::string, std::string> values_;
};

// Appends one line to MarlixComm.log. Safe from any thread.
void Log(const std::string& line);

// printf into a string; longer results are cut at 511 characters.
inline std::string Format(const char* format, ...) {
  char buffer[512];
  va_list args;
  va_start(args, format);
  int n = std::vsnprintf(buffer, sizeof buffer, format, args);
  va_end(args);
  return n < 0 ? std::string() : std::string(buffer, static_cast<size_t>(n < 512 ? n : 511));
}

// A path beside the stand-in DLL.
std::wstring BesideModule(const wchar_t* fileName);

}  // namespace standin
