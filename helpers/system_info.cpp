// The log's header of machine and process facts.
#include <windows.h>

#include <cstdio>
#include <ctime>
#include <string>

#include "helpers/app_helpers.h"
#include "helpers/filelog.h"
#include "base/win_handles.h"

namespace kld::ft {

namespace {

std::wstring RegistryText(const wchar_t* path, const wchar_t* value) {
  wchar_t buffer[260] = {};
  DWORD size = sizeof buffer - sizeof(wchar_t);
  if (RegGetValueW(HKEY_LOCAL_MACHINE, path, value, RRF_RT_REG_SZ, nullptr, buffer, &size) !=
      ERROR_SUCCESS) {
    return {};
  }
  return buffer;
}

// RtlGetVersion tells the truth where GetVersionEx is shimmed.
void DumpOperatingSystem() {
  RTL_OSVERSIONINFOW version{sizeof version};
  using RtlGetVersionFn = LONG(WINAPI*)(RTL_OSVERSIONINFOW*);
  auto rtlGetVersion = reinterpret_cast<RtlGetVersionFn>(
      reinterpret_cast<void*>(GetProcAddress(GetModuleHandleW(L"ntdll.dll"), "RtlGetVersion")));
  if (rtlGetVersion) rtlGetVersion(&version);
  const wchar_t* key = L"SOFTWARE\\Microsoft\\Windows NT\\CurrentVersion";
  std::wstring product = RegistryText(key, L"ProductName");
  std::string text = "Operating system: " + NarrowText(product.empty() ? L"Windows" : product) +
                     FormatText("\nVersion %lu.%lu build %lu %s", version.dwMajorVersion,
                            version.dwMinorVersion, version.dwBuildNumber,
                            NarrowText(version.szCSDVersion).c_str());
  WriteLogText(text);
  int cleanBoot = GetSystemMetrics(SM_CLEANBOOT);
  if (cleanBoot > 0) {
    WriteLogText(FormatText("System started in Safe Mode%s", cleanBoot == 2 ? " with network support" : ""));
  }
}

void DumpDisplay() {
  HDC screen = GetDC(nullptr);
  int dpi = screen ? GetDeviceCaps(screen, LOGPIXELSX) : 0;
  if (screen) ReleaseDC(nullptr, screen);
  WriteLogText(FormatText("Screen resolution: %ux%u. DPI: %i", GetSystemMetrics(SM_CXSCREEN),
                      GetSystemMetrics(SM_CYSCREEN), dpi));
  WriteLogText(FormatText("Virtual screen resolution: %ux%u", GetSystemMetrics(SM_CXVIRTUALSCREEN),
                      GetSystemMetrics(SM_CYVIRTUALSCREEN)));
}

void DumpDisks() {
  wchar_t drives[512] = {};
  DWORD length = GetLogicalDriveStringsW(511, drives);
  if (length == 0 || length > 511) return;
  for (const wchar_t* drive = drives; *drive; drive += wcslen(drive) + 1) {
    if (GetDriveTypeW(drive) != DRIVE_FIXED) continue;
    ULARGE_INTEGER available{}, total{}, free{};
    if (!GetDiskFreeSpaceExW(drive, &available, &total, &free)) continue;
    const std::string name = NarrowText(drive);
    WriteLogText(FormatText("Hard disk '%s' space: %s of %s", name.c_str(),
                        FormatByteSize(static_cast<double>(free.QuadPart), "%0.2f%sb").c_str(),
                        FormatByteSize(static_cast<double>(total.QuadPart), "%0.2f%sb").c_str()));
    DWORD flags = 0;
    if (!GetVolumeInformationW(drive, nullptr, 0, nullptr, nullptr, &flags, nullptr, 0)) continue;
    std::string names;
    if (flags & FILE_READ_ONLY_VOLUME) names += "FILE_READ_ONLY_VOLUME ";
    if (flags & FILE_SEQUENTIAL_WRITE_ONCE) names += "FILE_SEQUENTIAL_WRITE_ONCE ";
    if (!names.empty()) {
      names.pop_back();
      WriteLogText(FormatText("Hard disk '%s' has follow flags: %s", name.c_str(), names.c_str()));
    }
  }
}

void DumpDateTimeInfo() {
  char stamp[128] = {};
  std::time_t now = std::time(nullptr);
  if (const std::tm* local = std::localtime(&now)) std::strftime(stamp, sizeof stamp, "%X %x", local);
  WriteLogText(FormatText("Local time: %s", stamp));
  TIME_ZONE_INFORMATION zone{};
  GetTimeZoneInformation(&zone);
  const long offset = -zone.Bias;  // minutes east of UTC
  const unsigned magnitude = static_cast<unsigned>(offset < 0 ? -offset : offset);
  WriteLogText(FormatText("User time zone is '%s' (UTC %s%02u:%02u)", NarrowText(zone.StandardName).c_str(),
                      offset < 0 ? "-" : "+", magnitude / 60, magnitude % 60));
}

}  // namespace

void DumpSystemInfo() {
  DumpOperatingSystem();
  wchar_t language[LOCALE_NAME_MAX_LENGTH] = {};
  GetLocaleInfoW(MAKELCID(GetUserDefaultUILanguage(), SORT_DEFAULT), LOCALE_SNAME, language,
                 LOCALE_NAME_MAX_LENGTH);
  WriteLogText(FormatText("Default UI language for current user is '%s'", NarrowText(language).c_str()));
  SYSTEM_INFO system{};
  GetNativeSystemInfo(&system);
  if (system.dwNumberOfProcessors) {
    WriteLogText(FormatText("Number of concurrent threads supported: %u", system.dwNumberOfProcessors));
  }
  DumpDisplay();
  MEMORYSTATUSEX memory{sizeof memory};
  GlobalMemoryStatusEx(&memory);
  WriteLogText(FormatText("Physical memory: %s. Page file: %s",
                      FormatByteSize(static_cast<double>(memory.ullTotalPhys)).c_str(),
                      FormatByteSize(static_cast<double>(memory.ullTotalPageFile)).c_str()));
  DumpDisks();
  DumpDateTimeInfo();
  WriteLogText(FormatText("%u-bit build. %s version. %s", 64u, "Release", __DATE__));
  WriteLogText(FormatText("Command line: %s", NarrowText(GetCommandLineW()).c_str()));
  WriteLogText(FormatText("Process id: %u", static_cast<unsigned>(GetCurrentProcessId())));
  const std::wstring app = GetAppNameW();
  WriteLogText(FormatText("Languages root directory: %s", NarrowText(GetLanguagesRootDirW(app.c_str())).c_str()));
  WriteLogText(FormatText("Help root directory: %s", NarrowText(GetAppPathW() + L"Help\\").c_str()));
}

}  // namespace kld::ft
