// Facts of this process for the log: the locale, a module's version, memory in use. Apart from
// the machine's header, so that a module writing only these links none of that.
#include <windows.h>
#include <psapi.h>

#include <string>
#include <vector>

#include "helpers/filelog.h"

namespace kld::ft {

std::string FormatByteSize(double bytes, const char* format) {
  static const char kUnits[] = "KMGTPEZY";
  int steps = 0;
  while (bytes >= 1024 && steps < 10) {
    bytes /= 1024;
    ++steps;
  }
  std::string unit = steps == 0 ? "" : std::string(1, kUnits[steps <= 8 ? steps - 1 : 7]);
  return FormatText(format, bytes, unit.c_str());
}

void DumpLocaleInfo() {
  wchar_t name[LOCALE_NAME_MAX_LENGTH] = {}, point[8] = {};
  GetLocaleInfoW(LOCALE_USER_DEFAULT, LOCALE_SNAME, name, LOCALE_NAME_MAX_LENGTH);
  GetLocaleInfoW(LOCALE_USER_DEFAULT, LOCALE_SDECIMAL, point, 8);
  std::string decimal = NarrowText(point);
  WriteLogText(FormatText("Locale name is '%s'. Decimal point: '%c'", NarrowText(name).c_str(),
                      decimal.empty() ? '.' : decimal[0]));
}

void DumpModuleVersion(HMODULE module) {
  wchar_t path[MAX_PATH] = {};
  if (!GetModuleFileNameW(module, path, MAX_PATH)) return;
  DWORD ignored = 0;
  const DWORD size = GetFileVersionInfoSizeW(path, &ignored);
  std::vector<BYTE> block(size);
  VS_FIXEDFILEINFO* info = nullptr;
  UINT length = 0;
  if (!size || !GetFileVersionInfoW(path, 0, size, block.data()) ||
      !VerQueryValueW(block.data(), L"\\", reinterpret_cast<void**>(&info), &length) || length < sizeof(*info))
    return;
  WriteLogText(FormatText("Version of module '%s' is '%u.%u.%u.%u'", NarrowText(path).c_str(),
                      static_cast<unsigned>(HIWORD(info->dwFileVersionMS)), static_cast<unsigned>(LOWORD(info->dwFileVersionMS)),
                      static_cast<unsigned>(HIWORD(info->dwFileVersionLS)), static_cast<unsigned>(LOWORD(info->dwFileVersionLS))));
}

void DumpProcessMemoryInfo() {
  PROCESS_MEMORY_COUNTERS counters{};
  counters.cb = sizeof counters;
  if (!K32GetProcessMemoryInfo(GetCurrentProcess(), &counters, sizeof counters)) return;
  WriteLogText(FormatText("Process memory usage. Working set: %s. Page file usage: %s",
                      FormatByteSize(static_cast<double>(counters.WorkingSetSize)).c_str(),
                      FormatByteSize(static_cast<double>(counters.PagefileUsage)).c_str()));
}

}  // namespace kld::ft
