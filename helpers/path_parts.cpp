#include "helpers/path_parts.h"

namespace kld::ft {

namespace {

bool IsSeparator(wchar_t c) { return c == L'\\' || c == L'/'; }

size_t NextSeparator(const std::wstring& text, size_t from) {
  size_t at = text.find_first_of(L"\\/", from);
  return at == std::wstring::npos ? text.size() : at;
}

}  // namespace

CPathParts::CPathParts(const wchar_t* path) {
  const std::wstring text(path ? path : L"");
  size_t start = 0;
  if (!text.empty() && text[0] == L'\\') {
    network = 1;
    start = (text.size() > 1 && text[1] == L'\\') ? 2 : 1;
    size_t end = NextSeparator(text, start);
    server = text.substr(start, end - start);
    start = end;
    if (start < text.size()) {
      end = NextSeparator(text, start + 1);
      drive = text.substr(start + 1, end - start - 1);
      start = end;
    }
  } else {
    size_t colon = text.find(L':');
    if (colon != std::wstring::npos) {
      drive = text.substr(0, colon);
      start = colon + 1;
    }
  }
  size_t separator = std::wstring::npos;
  for (size_t i = text.size(); i > start; --i) {
    if (IsSeparator(text[i - 1])) { separator = i - 1; break; }
  }
  size_t nameStart = separator == std::wstring::npos ? start : separator + 1;
  size_t dot = text.rfind(L'.');
  size_t nameEnd = text.size();
  if (dot != std::wstring::npos && dot >= nameStart) {
    extension = text.substr(dot);
    nameEnd = dot;
  }
  title = text.substr(nameStart, nameEnd - nameStart);
  if (separator != std::wstring::npos) directory = text.substr(start, separator - start);
}

std::wstring CPathParts::Compose(unsigned fields) const {
  std::wstring path;
  if ((fields & Server) && !server.empty()) path += L"\\\\" + server;
  if ((fields & Drive) && !drive.empty()) path += network ? L"\\" + drive : drive + L":";
  if ((fields & Directory) && !directory.empty()) {
    path += directory + L"\\";
  } else if (!path.empty()) {
    path += L"\\";
  }
  if (fields & Title) path += title;
  if (fields & Extension) path += extension;
  return path;
}

CPathComponents::CPathComponents(const wchar_t* path, std::wstring delimiterSet)
    : delimiters(std::move(delimiterSet)) {
  const std::wstring text(path ? path : L"");
  size_t pos = 0;
  while (pos < text.size()) {
    size_t begin = text.find_first_not_of(delimiters, pos);
    if (begin == std::wstring::npos) break;
    size_t end = text.find_first_of(delimiters, begin);
    if (end == std::wstring::npos) end = text.size();
    components.push_back(text.substr(begin, end - begin));
    pos = end;
  }
}

std::wstring CPathComponents::Join() const {
  std::wstring path;
  const wchar_t glue = delimiters.empty() ? L'\\' : delimiters[0];
  for (size_t i = 0; i < components.size(); ++i) {
    if (i) path += glue;
    path += components[i];
  }
  return path;
}

CPathComponents CPathComponents::SubPath(size_t first, size_t count) const {
  CPathComponents part;
  part.delimiters = delimiters;
  if (first > components.size() || count > components.size() - first) return part;
  part.components.assign(components.begin() + first, components.begin() + first + count);
  return part;
}

}  // namespace kld::ft
