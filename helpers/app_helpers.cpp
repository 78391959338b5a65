#include "helpers/app_helpers.h"

#include <windows.h>
#include <shlobj.h>

#include <cwchar>
#include <vector>

#include "helpers/file_helpers.h"
#include "marlix_version.h"
#include "base/win_handles.h"

namespace kld::ft {

namespace {

constexpr wchar_t kModuleVersion[] = MARLIX_VERSION_WIDE;

// Keeps its last value, so a long path costs the retries once.
DWORD pathBufferSize = MAX_PATH;


// A plain flag: the callers are the threads that show windows.
bool appPathKnown = false;
std::wstring appPath;

// The one-time hand-over: whoever starts the application may leave a folder here.
bool TakeHandedOverAppPath(std::wstring* path) {
  win::UniqueHKey key;
  if (RegOpenKeyExW(HKEY_CURRENT_USER, L"Software\\Gravon", 0, KEY_QUERY_VALUE | KEY_SET_VALUE,
                    key.Put()) != ERROR_SUCCESS) {
    return false;
  }
  wchar_t buffer[261] = {};
  DWORD size = 522;
  if (RegQueryValueExW(key.Get(), L"AppPath", nullptr, nullptr, reinterpret_cast<BYTE*>(buffer),
                       &size) != ERROR_SUCCESS) {
    return false;
  }
  RegDeleteValueW(key.Get(), L"AppPath");
  if (size == 0) return false;
  path->assign(buffer, wcsnlen(buffer, size / sizeof(wchar_t)));
  return true;
}

}  // namespace

std::wstring GetExecutablePath() {
  std::vector<wchar_t> buffer;
  for (;;) {
    buffer.assign(pathBufferSize, L'\0');
    DWORD length = GetModuleFileNameW(nullptr, buffer.data(), pathBufferSize);
    if (length == pathBufferSize && GetLastError() == ERROR_INSUFFICIENT_BUFFER) {
      pathBufferSize += MAX_PATH;
      continue;
    }
    return std::wstring(buffer.data(), length < pathBufferSize ? length : 0);
  }
}

std::wstring AppNameOfExecutable(const std::wstring& executablePath) {
  DWORD ignored = 0;
  DWORD size = GetFileVersionInfoSizeW(executablePath.c_str(), &ignored);
  if (size) {
    std::vector<BYTE> block(size);
    void* value = nullptr;
    UINT length = 0;
    if (GetFileVersionInfoW(executablePath.c_str(), 0, size, block.data()) &&
        VerQueryValueW(block.data(), L"\\StringFileInfo\\040904B0\\ProductName", &value, &length) &&
        value && length) {
      std::wstring product(static_cast<const wchar_t*>(value),
                           wcsnlen(static_cast<const wchar_t*>(value), length));
      if (!product.empty()) return product;
    }
  }
  std::wstring name = GetNamePart(executablePath.c_str());
  size_t dot = name.find(L'.');
  if (dot != std::wstring::npos) name.resize(dot);
  return name;
}

std::wstring AppVersionFor(const std::wstring& name) {
  if (_wcsicmp(name.c_str(), L"Gravon Tools") == 0 || _wcsicmp(name.c_str(), L"Gravon Office") == 0) {
    return L"9";
  }
  if (_wcsicmp(name.c_str(), L"Gravon GIS Office") == 0) return L"8.1";
  return kModuleVersion;
}

// Read at the first question, not while the module loads: the host's version block must
// not be read under the loader lock. One-time initialisation keeps racing callers apart.
namespace {

INIT_ONCE appNameOnce = INIT_ONCE_STATIC_INIT;
std::wstring appName;

BOOL CALLBACK ComputeAppName(PINIT_ONCE, PVOID, PVOID*) noexcept {
  try {
    appName = AppNameOfExecutable(GetExecutablePath());
    return TRUE;
  } catch (...) {
    return FALSE;  // out of memory: the next question tries again
  }
}

}  // namespace

std::wstring GetAppNameW() {
  InitOnceExecuteOnce(&appNameOnce, ComputeAppName, nullptr, nullptr);
  return appName;
}

std::wstring GetAppVersionW() { return AppVersionFor(GetAppNameW()); }

std::wstring GetAppPathW() {
  if (!appPathKnown) {
    std::wstring path;
    if (!TakeHandedOverAppPath(&path)) path = GetDirectoryPart(GetExecutablePath().c_str());
    appPath = std::move(path);
    appPathKnown = true;
  }
  return appPath;
}

std::wstring GetCommonDataDirW() {
  wchar_t folder[MAX_PATH] = {};
  if (FAILED(SHGetFolderPathW(nullptr, CSIDL_COMMON_APPDATA | CSIDL_FLAG_CREATE, nullptr,
                              SHGFP_TYPE_CURRENT, folder))) {
    return GetAppPathW();
  }
  std::wstring path = std::wstring(folder) + L"\\FENROD\\";
  CreateDirectoryPath(path.c_str(), nullptr);
  return path;
}

std::wstring GetLanguagesRootDirW(const wchar_t* name) {
  std::wstring app = GetAppPathW();
  if (FileExists((app + L"components\\NotInstalledApp.txt").c_str(), true)) {
    return app + L"Languages\\";
  }
  return GetCommonDataDirW() + (name ? name : L"") + L"\\" + GetAppVersionW() + L"\\Languages\\";
}

namespace test_only {
void ForgetAppPath() {
  appPathKnown = false;
  appPath.clear();
}
}  // namespace test_only

}  // namespace kld::ft
