// The stand-in's control file and call log, both beside the stand-in DLL.
#pragma once
#include <windows.h>
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

// A path beside the stand-in DLL.
std::wstring BesideModule(const wchar_t* fileName);

}  // namespace standin
