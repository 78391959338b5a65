#include "helpers/file_helpers.h"

#include "helpers/path_parts.h"
#include "base/win_handles.h"

namespace kld::ft {

namespace {

bool IsFolder(const std::wstring& path) {
  DWORD attributes = GetFileAttributesW(path.c_str());
  return attributes != INVALID_FILE_ATTRIBUTES && (attributes & FILE_ATTRIBUTE_DIRECTORY);
}

}  // namespace

size_t FindLastSeparator(const std::wstring& path) {
  size_t back = path.rfind(L'\\');
  size_t slash = path.rfind(L'/');
  if (back == std::wstring::npos) return slash;
  if (slash == std::wstring::npos) return back;
  return back > slash ? back : slash;
}

std::wstring GetDirectoryPart(const wchar_t* path) {
  if (!path) return {};
  std::wstring text(path);
  size_t separator = FindLastSeparator(text);
  return separator == std::wstring::npos ? std::wstring() : text.substr(0, separator + 1);
}

std::wstring GetNamePart(const wchar_t* path) {
  if (!path) return {};
  std::wstring text(path);
  size_t separator = FindLastSeparator(text);
  return separator == std::wstring::npos ? text : text.substr(separator + 1);
}

std::wstring GetTitlePart(const wchar_t* path) {
  std::wstring title = GetNamePart(path);
  size_t dot = title.rfind(L'.');
  if (dot != std::wstring::npos) title.resize(dot);
  if (title.empty() && path) return path;
  return title;
}

std::wstring AddTrailingSeparator(const wchar_t* path) {
  std::wstring text(path ? path : L"");
  if (!text.empty() && text.back() != L'\\' && text.back() != L'/') text += L'\\';
  return text;
}

bool FileExists(const wchar_t* path, bool openForReading) {
  if (!path) return false;
  if (openForReading) {
    win::UniqueFile file(CreateFileW(path, GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                                     FILE_ATTRIBUTE_NORMAL, nullptr));
    return static_cast<bool>(file);
  }
  WIN32_FIND_DATAW data;
  return static_cast<bool>(win::UniqueFind(FindFirstFileW(path, &data)));
}

bool CreateDirectoryPath(const wchar_t* path, LPSECURITY_ATTRIBUTES securityAttributes) {
  if (!path) return false;
  if (IsFolder(path)) return true;
  CPathComponents components(path);
  const size_t count = components.Size();
  size_t existing = count;
  while (existing > 0 && !IsFolder(components.SubPath(0, existing).Join())) --existing;
  if (existing == 0) return false;
  for (size_t n = existing + 1; n <= count; ++n) {
    if (!CreateDirectoryW(components.SubPath(0, n).Join().c_str(), securityAttributes)) return false;
  }
  return true;
}

}  // namespace kld::ft
