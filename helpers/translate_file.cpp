#include "helpers/translate_file.h"

#include "base/boundary.h"
#include "base/win_handles.h"

namespace kld::ft {

namespace {

void ReplaceAll(std::wstring& text, const wchar_t* pattern, wchar_t by) {
  size_t at = text.find(pattern);
  if (at == std::wstring::npos) return;
  std::wstring out;
  out.reserve(text.size());
  size_t from = 0;
  for (; at != std::wstring::npos; at = text.find(pattern, from)) {
    out.append(text, from, at - from);
    out += by;
    from = at + 2;
  }
  out.append(text, from, std::wstring::npos);
  text.swap(out);
}

bool IsLineEnd(wchar_t c) { return c == L'\r' || c == L'\n'; }

}  // namespace

std::wstring UnescapeTranslationText(std::wstring text) {
  ReplaceAll(text, L"\\n", L'\n');
  ReplaceAll(text, L"\\t", L'\t');
  ReplaceAll(text, L"\\r", L'\r');
  ReplaceAll(text, L"\\\\", L'\\');
  return text;
}

HRESULT CTranslateFile::Load(const wchar_t* path) {
  win::UniqueFile file(CreateFileW(path, GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING,
                                   FILE_ATTRIBUTE_NORMAL, nullptr));
  if (!file) return HRESULT_FROM_WIN32(GetLastError());
  LARGE_INTEGER size{};
  if (!GetFileSizeEx(file.Get(), &size)) return HRESULT_FROM_WIN32(GetLastError());
  if (size.QuadPart < 2) return E_FAIL;
  if (static_cast<unsigned long long>(size.QuadPart) > SIZE_MAX) return E_OUTOFMEMORY;
  win::UniqueHandle mapping(CreateFileMappingW(file.Get(), nullptr, PAGE_READONLY, 0, 0, nullptr));
  if (!mapping) return HRESULT_FROM_WIN32(GetLastError());
  win::UniqueView view(MapViewOfFileEx(mapping.Get(), FILE_MAP_READ, 0, 0, 0, nullptr));
  if (!view) return HRESULT_FROM_WIN32(GetLastError());

  const auto* bytes = static_cast<const unsigned char*>(view.Get());
  if (bytes[0] != 0xFF || bytes[1] != 0xFE) return E_FAIL;
  const size_t count = (static_cast<size_t>(size.QuadPart) - 2) / sizeof(wchar_t);
  return boundary::Call([&] {
    Parse(reinterpret_cast<const wchar_t*>(bytes + 2), count);
    return S_OK;
  });
}

void CTranslateFile::Parse(const wchar_t* text, size_t count) {
  bool haveSource = false;
  std::wstring source;
  size_t pos = 0;
  while (pos < count) {
    while (pos < count && IsLineEnd(text[pos])) ++pos;
    const size_t begin = pos;
    while (pos < count && !IsLineEnd(text[pos])) ++pos;
    if (begin == pos || text[begin] != L'[') continue;
    size_t close = pos;
    while (close > begin + 1 && text[close - 1] != L']') --close;
    if (close == begin + 1) continue;  // no closing bracket: not a counting line
    std::wstring line(text + begin + 1, close - 1 - (begin + 1));
    if (!haveSource) {
      if (line.empty()) continue;
      source.swap(line);
      haveSource = true;
    } else {
      haveSource = false;
      if (!line.empty()) AddPair(std::move(source), std::move(line));
    }
  }
}

void CTranslateFile::AddPair(std::wstring source, std::wstring translation) {
  source = UnescapeTranslationText(std::move(source));
  translation = UnescapeTranslationText(std::move(translation));
  forward_.try_emplace(source, translation);
  reverse_.try_emplace(std::move(translation), std::move(source));
}

std::wstring CTranslateFile::Find(const std::wstring& text, bool reverse) const {
  const auto& map = reverse ? reverse_ : forward_;
  auto found = map.find(text);
  if (found != map.end()) return found->second;
  size_t marker = text.find(L"#$");
  if (marker != std::wstring::npos) {
    found = map.find(text.substr(0, marker));
    if (found != map.end()) return found->second;
  }
  return {};
}

}  // namespace kld::ft
