// Each test gets a registry of its own, so a user's levels and registrations are never touched by a run.
#pragma once
#include <windows.h>
#include <string>
#include <vector>
// The roots are redirected onto fresh scratch keys for the life of the object.
class RegistrySandbox {
 public:
  explicit RegistrySandbox(std::vector<HKEY> roots = {HKEY_CURRENT_USER});
  ~RegistrySandbox();
  RegistrySandbox(const RegistrySandbox&) = delete;
  RegistrySandbox& operator=(const RegistrySandbox&) = delete;
  // The real path of the scratch key behind a redirected root, under the real HKEY_CURRENT_USER.
  const std::wstring& ScratchPath(HKEY root) const;
 private:
  struct Override { HKEY root; std::wstring path; HKEY scratch; };
  std::vector<Override> overrides_;
};
bool RegKeyExists(HKEY root, const std::wstring& path);
std::wstring RegReadString(HKEY root, const std::wstring& path, const wchar_t* value);
DWORD RegReadDword(HKEY root, const std::wstring& path, const wchar_t* value, DWORD fallback = 0xDEADBEEF);
void RegWriteString(HKEY root, const std::wstring& path, const wchar_t* value, const std::wstring& data);
void RegWriteDword(HKEY root, const std::wstring& path, const wchar_t* value, DWORD data);
