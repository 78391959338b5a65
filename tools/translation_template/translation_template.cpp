// Writes the template a translator fills in: each string of the module's table that the
// module shows, as a source line and an empty translation line. Untouched pairs stay inert.
//   translation_template <output>          write the template
//   translation_template --check <file>    fail if <file> differs from what would be written
#include <windows.h>

#include <algorithm>
#include <cstdio>
#include <set>
#include <string>
#include <vector>

#include "helpers/translate_file.h"
#include "base/module_instance.h"

namespace {

// Entries that stay in the table but that no code asks for.
const std::set<UINT> kUnused = {270, 271, 272, 273, 358, 1014, 1027, 1032, 1033, 1034, 1043, 1105, 1113, 2010};

struct Entry {
  UINT id;
  std::wstring text;
};

BOOL CALLBACK CollectBlock(HMODULE module, LPCWSTR type, LPWSTR name, LONG_PTR param) {
  if (!IS_INTRESOURCE(name)) return TRUE;
  const UINT block = static_cast<UINT>(reinterpret_cast<ULONG_PTR>(name));
  HRSRC info = FindResourceExW(module, type, name, MAKELANGID(LANG_ENGLISH, SUBLANG_ENGLISH_US));
  HGLOBAL loaded = info ? LoadResource(module, info) : nullptr;
  const auto* data = loaded ? static_cast<const WCHAR*>(LockResource(loaded)) : nullptr;
  if (!data) return TRUE;
  const size_t total = SizeofResource(module, info) / sizeof(WCHAR);
  auto* entries = reinterpret_cast<std::vector<Entry>*>(param);
  size_t pos = 0;
  for (UINT place = 0; place < 16 && pos < total; ++place) {
    const size_t length = data[pos];
    if (length > total - pos - 1) break;
    if (length) entries->push_back({(block - 1) * 16 + place, std::wstring(data + pos + 1, length)});
    pos += 1 + length;
  }
  return TRUE;
}

// Backslashes first, so that the reader's replacements, made in the order \n \t \r \\,
// give the text back.
std::wstring Escape(const std::wstring& text) {
  std::wstring out;
  for (wchar_t c : text) {
    switch (c) {
      case L'\\': out += L"\\\\"; break;
      case L'\n': out += L"\\n"; break;
      case L'\t': out += L"\\t"; break;
      case L'\r': out += L"\\r"; break;
      default: out += c;
    }
  }
  return out;
}

std::wstring BuildTemplate(bool* faithful) {
  std::vector<Entry> entries;
  EnumResourceNamesW(ModuleInstance(), RT_STRING, CollectBlock, reinterpret_cast<LONG_PTR>(&entries));
  std::wstring out =
      L"; Translation template of Marlix Digital Levels (UTF-16LE with byte order mark).\r\n"
      L"; Each English text stands in brackets, followed by an empty pair of brackets:\r\n"
      L"; write the translation between the second pair. Pairs left empty are ignored.\r\n"
      L"; Lines that do not begin with [ are comments. Escapes: \\n \\t \\r \\\\\r\n";
  *faithful = true;
  // One pair per distinct text: the first pair of a text is the only one that counts.
  std::vector<std::pair<std::wstring, std::wstring>> pairs;  // ids, text
  for (const Entry& entry : entries) {
    if (kUnused.count(entry.id)) continue;
    // A backslash before n, t or r can't be written in this format.
    for (size_t i = 0; i + 1 < entry.text.size(); ++i) {
      if (entry.text[i] == L'\\' && wcschr(L"ntr", entry.text[i + 1])) *faithful = false;
    }
    auto same = std::find_if(pairs.begin(), pairs.end(), [&](const auto& p) { return p.second == entry.text; });
    if (same != pairs.end()) {
      same->first += L", " + std::to_wstring(entry.id);
    } else {
      pairs.emplace_back(std::to_wstring(entry.id), entry.text);
    }
  }
  for (const auto& [ids, text] : pairs) out += L"\r\n; " + ids + L"\r\n[" + Escape(text) + L"]\r\n[]\r\n";
  return out;
}

std::string FileBytes(const std::wstring& text) {
  std::string bytes("\xFF\xFE", 2);
  bytes.append(reinterpret_cast<const char*>(text.data()), text.size() * sizeof(wchar_t));
  return bytes;
}

std::string ReadFileBytes(const wchar_t* path) {
  HANDLE file = CreateFileW(path, GENERIC_READ, FILE_SHARE_READ, nullptr, OPEN_EXISTING, 0, nullptr);
  if (file == INVALID_HANDLE_VALUE) return {};
  std::string bytes;
  char chunk[65536];
  DWORD read = 0;
  while (ReadFile(file, chunk, sizeof chunk, &read, nullptr) && read) bytes.append(chunk, read);
  CloseHandle(file);
  return bytes;
}

}  // namespace

int wmain(int argc, wchar_t** argv) {
  const bool check = argc == 3 && std::wstring(argv[1]) == L"--check";
  if (argc != 2 && !check) {
    std::fprintf(stderr, "usage: translation_template [--check] <file>\n");
    return 2;
  }
  const wchar_t* path = argv[argc - 1];
  bool faithful = true;
  const std::string bytes = FileBytes(BuildTemplate(&faithful));
  if (!faithful) std::fprintf(stderr, "warning: a text holds a backslash before n, t or r\n");
  if (check) {
    if (ReadFileBytes(path) != bytes) {
      std::fprintf(stderr, "%ls is out of date: rebuild target translation_template_doc\n", path);
      return 1;
    }
    return 0;
  }
  HANDLE file = CreateFileW(path, GENERIC_WRITE, 0, nullptr, CREATE_ALWAYS, 0, nullptr);
  if (file == INVALID_HANDLE_VALUE) {
    std::fprintf(stderr, "cannot write %ls\n", path);
    return 1;
  }
  DWORD written = 0;
  const bool ok = WriteFile(file, bytes.data(), static_cast<DWORD>(bytes.size()), &written, nullptr) &&
                  written == bytes.size();
  CloseHandle(file);
  return ok ? 0 : 1;
}
