// Scratch registry roots for tests, deleted again when the test ends.
#include "support/registry_sandbox.h"
#include <atomic>
#include <stdexcept>
namespace {
std::atomic<unsigned> g_sandboxes{0};
const wchar_t kScratchRoot[] = L"Software\\MarlixTestScratch";
}  // namespace
RegistrySandbox::RegistrySandbox(std::vector<HKEY> roots) {
  unsigned n = ++g_sandboxes;
  for (HKEY root : roots) {
    std::wstring path = std::wstring(kScratchRoot) + L"\\" + std::to_wstring(GetCurrentProcessId()) + L"-" +
                        std::to_wstring(n) + L"-" + std::to_wstring(reinterpret_cast<ULONG_PTR>(root) & 0xFF);
    RegDeleteTreeW(HKEY_CURRENT_USER, path.c_str());
    HKEY scratch = nullptr;
    if (RegCreateKeyExW(HKEY_CURRENT_USER, path.c_str(), 0, nullptr, 0, KEY_ALL_ACCESS, nullptr, &scratch,
                        nullptr) != ERROR_SUCCESS)
      throw std::runtime_error("cannot create scratch key");
    overrides_.push_back({root, path, scratch});
  }
  // Redirect only after every scratch key exists: once HKCU is redirected, new
  // scratch paths would land inside the first sandbox.
  for (auto& o : overrides_)
    if (RegOverridePredefKey(o.root, o.scratch) != ERROR_SUCCESS) throw std::runtime_error("cannot redirect root");
}
RegistrySandbox::~RegistrySandbox() {
  for (auto& o : overrides_) RegOverridePredefKey(o.root, nullptr);
  for (auto& o : overrides_) {
    RegCloseKey(o.scratch);
    RegDeleteTreeW(HKEY_CURRENT_USER, o.path.c_str());
  }
}
const std::wstring& RegistrySandbox::ScratchPath(HKEY root) const {
  for (auto& o : overrides_)
    if (o.root == root) return o.path;
  throw std::logic_error("root not redirected");
}
bool RegKeyExists(HKEY root, const std::wstring& path) {
  HKEY k = nullptr;
  if (RegOpenKeyExW(root, path.c_str(), 0, KEY_READ, &k) != ERROR_SUCCESS) return false;
  RegCloseKey(k);
  return true;
}
std::wstring RegReadString(HKEY root, const std::wstring& path, const wchar_t* value) {
  wchar_t buf[1024] = {};
  DWORD size = sizeof(buf) - sizeof(wchar_t);
  if (RegGetValueW(root, path.c_str(), value, RRF_RT_REG_SZ | RRF_RT_REG_EXPAND_SZ | RRF_NOEXPAND, nullptr, buf,
                   &size) != ERROR_SUCCESS)
    return L"<missing>";
  return buf;
}
DWORD RegReadDword(HKEY root, const std::wstring& path, const wchar_t* value, DWORD fallback) {
  DWORD v = 0, size = sizeof(v);
  if (RegGetValueW(root, path.c_str(), value, RRF_RT_REG_DWORD, nullptr, &v, &size) != ERROR_SUCCESS) return fallback;
  return v;
}
void RegWriteString(HKEY root, const std::wstring& path, const wchar_t* value, const std::wstring& data) {
  RegSetKeyValueW(root, path.c_str(), value, REG_SZ, data.c_str(), DWORD((data.size() + 1) * sizeof(wchar_t)));
}
void RegWriteDword(HKEY root, const std::wstring& path, const wchar_t* value, DWORD data) {
  RegSetKeyValueW(root, path.c_str(), value, REG_DWORD, &data, sizeof(data));
}
